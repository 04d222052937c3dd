#include "util/SmallObjectHeap.h"

#include <sys/mman.h>

#include <cerrno>
#include <cstdlib>

#include "util/HugePages.h"

void* SmallObjectHeap::allocateSlowly(std::size_t size) noexcept {
    if (size <= LARGEST) {
        const std::lock_guard<std::mutex> lock(_mutex);
        void* object = take(classOf(size));
        if (object == nullptr && addBlock(classOf(size))) {
            object = take(classOf(size));
        }
        if (object != nullptr) {
            return object;
        }
    }
    return std::malloc(size == 0 ? 1 : size);
}

void SmallObjectHeap::releaseSlowly(void* object) noexcept {
    {
        const std::lock_guard<std::mutex> lock(_mutex);
        if (owns(object)) {
            keep(object, classOf(object));
            return;
        }
    }
    std::free(object);
}

// Gives the class a block to cut objects from. A block whose size the objects do not divide ends
// before the last piece.
bool SmallObjectHeap::addBlock(std::size_t sizeClass) noexcept {
    if ((_base == nullptr && !reserve()) ||
        _end - _nextBlock < static_cast<std::ptrdiff_t>(BLOCK)) {
        return false;
    }
    const std::size_t size = (sizeClass + 1) * GRAIN;
    _classOfBlock[static_cast<std::size_t>(_nextBlock - _base) / BLOCK] =
        static_cast<unsigned char>(sizeClass);
    _classes[sizeClass].next = _nextBlock;
    _classes[sizeClass].end = _nextBlock + BLOCK / size * size;
    _nextBlock += BLOCK;
    return true;
}

// Address space only: memory is taken as it is touched.
bool SmallObjectHeap::reserve() noexcept {
    const int error = errno;
    void* const range = _range == 0 ? MAP_FAILED
                                    : ::mmap(nullptr, _range, PROT_READ | PROT_WRITE,
                                             MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0);
    errno = error;
    if (range == MAP_FAILED) {
        _range = 0;
        return false;
    }
    adviseHugePages(range, _range);
    _base = static_cast<char*>(range);
    _nextBlock = _base;
    _end = _base + _range;
    return true;
}
