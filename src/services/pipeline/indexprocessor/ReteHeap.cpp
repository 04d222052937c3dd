// The program's operator new and delete. A network of the stress test is some five million small
// objects; most of the time that it takes to build, walk and delete them goes to where they lie.

#include <new>

#include "util/SmallObjectHeap.h"

namespace {

constinit SmallObjectHeap heap;

// Asks whoever set a new-handler to find memory, until there is some or nobody to ask.
[[gnu::noinline]] void* allocateWithHandler(std::size_t size) {
    for (;;) {
        const std::new_handler handler = std::get_new_handler();
        if (handler == nullptr) {
            throw std::bad_alloc();
        }
        handler();
        if (void* const memory = heap.allocate(size); memory != nullptr) {
            return memory;
        }
    }
}

}  // namespace

void* operator new(std::size_t size) {
    void* const memory = heap.allocate(size);
    return memory != nullptr ? memory : allocateWithHandler(size);
}

void operator delete(void* memory) noexcept {
    heap.release(memory);
}

void operator delete(void* memory, std::size_t size) noexcept {
    heap.release(memory, size);
}
