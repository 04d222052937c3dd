#ifndef QUELTA_UTIL_SMALLOBJECTHEAP_H_
#define QUELTA_UTIL_SMALLOBJECTHEAP_H_

// A heap for programs that make millions of small objects and keep them: a program may serve its
// operator new and delete from one. Larger objects, and all when address space is refused, come
// from malloc.
//
// Objects of one size class, a multiple of 16 bytes, lie side by side in blocks of 64 KiB without
// anything between them; the blocks lie in one range of address space, backed by large pages. So an
// address tells whose it is and, through its block, its size. Freed objects are kept in a list for
// each class and given out again, the latest first; memory is never returned to the system.
//
// Safe from any thread; serialised by `_mutex`, which is left alone while there is but one thread.
// Not for a child that a process with several threads forks and that allocates before it executes
// another program: a thread that is not there may hold the lock.

#include <sys/single_threaded.h>

#include <cstddef>
#include <mutex>

class SmallObjectHeap {
public:
    // The largest object that is not left to malloc, in bytes.
    static constexpr std::size_t LARGEST = 256;

    // Bytes of address space that a heap takes at its first use.
    static constexpr std::size_t RANGE = std::size_t{8} << 30;

    // A heap on less address space, at most RANGE bytes; nothing is reserved yet.
    constexpr explicit SmallObjectHeap(std::size_t range = RANGE) : _range(range) {}

    SmallObjectHeap(const SmallObjectHeap&) = delete;
    SmallObjectHeap& operator=(const SmallObjectHeap&) = delete;

    // Returns: `size` bytes aligned to 16, also for a size of 0; null when memory is exhausted.
    // Owns: the caller hands them back with release.
    void* allocate(std::size_t size) noexcept {
        if (size <= LARGEST && __libc_single_threaded) {
            void* const object = take(classOf(size));
            if (object != nullptr) {
                return object;
            }
        }
        return allocateSlowly(size);
    }

    // Takes back what allocate gave; null allowed.
    void release(void* object) noexcept {
        if (__libc_single_threaded && owns(object)) {
            keep(object, classOf(object));
        } else {
            releaseSlowly(object);
        }
    }

    // The same for an object that was allocated with this size.
    void release(void* object, std::size_t size) noexcept {
        if (__libc_single_threaded && owns(object)) {
            keep(object, classOf(size));
        } else {
            releaseSlowly(object);
        }
    }

private:
    static constexpr std::size_t GRAIN = 16;
    static constexpr std::size_t BLOCK = std::size_t{64} << 10;
    static constexpr std::size_t CLASS_COUNT = LARGEST / GRAIN;

    struct FreeObject {
        FreeObject* next;
    };

    struct SizeClass {
        FreeObject* freed = nullptr;
        char* next = nullptr;  // the untouched rest of the latest block
        char* end = nullptr;
    };

    static constexpr std::size_t classOf(std::size_t size) {
        return size == 0 ? 0 : (size - 1) / GRAIN;
    }

    std::size_t classOf(const void* object) const noexcept {
        const std::ptrdiff_t offset = static_cast<const char*>(object) - _base;
        return _classOfBlock[static_cast<std::size_t>(offset) / BLOCK];
    }

    bool owns(const void* object) const noexcept { return object >= _base && object < _nextBlock; }

    // Returns: an object of the class; null when there is none left without a new block.
    void* take(std::size_t sizeClass) noexcept {
        SizeClass& sizes = _classes[sizeClass];
        if (sizes.freed != nullptr) {
            FreeObject* const object = sizes.freed;
            sizes.freed = object->next;
            return object;
        }
        if (sizes.next == sizes.end) {
            return nullptr;
        }
        char* const object = sizes.next;
        sizes.next += (sizeClass + 1) * GRAIN;
        return object;
    }

    void keep(void* object, std::size_t sizeClass) noexcept {
        FreeObject* const freed = static_cast<FreeObject*>(object);
        freed->next = _classes[sizeClass].freed;
        _classes[sizeClass].freed = freed;
    }

    void* allocateSlowly(std::size_t size) noexcept;
    void releaseSlowly(void* object) noexcept;
    bool addBlock(std::size_t sizeClass) noexcept;
    bool reserve() noexcept;

    std::size_t _range;          // to reserve, in bytes; 0 once that has failed
    char* _base = nullptr;       // of the range; null before the first use
    char* _nextBlock = nullptr;  // the part of the range that no class has taken
    char* _end = nullptr;        // of the range
    SizeClass _classes[CLASS_COUNT] = {};
    unsigned char _classOfBlock[RANGE / BLOCK] = {};
    std::mutex _mutex;
};

#endif  // QUELTA_UTIL_SMALLOBJECTHEAP_H_
