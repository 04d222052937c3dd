#include "support/AllocationProbe.h"

#include <cstdlib>
#include <new>

namespace {

struct State {
    bool counting;
    std::size_t failing;
    std::size_t count;
    long live;
};

thread_local State state = {};

void* allocate(std::size_t size) {
    if (state.counting) {
        if (++state.count == state.failing) {
            throw std::bad_alloc();
        }
        ++state.live;
    }
    void* const block = std::malloc(size == 0 ? 1 : size);
    if (block == nullptr) {
        throw std::bad_alloc();
    }
    return block;
}

void release(void* block) {
    if (state.counting && block != nullptr) {
        --state.live;
    }
    std::free(block);
}

}  // namespace

void* operator new(std::size_t size) {
    return allocate(size);
}
void* operator new[](std::size_t size) {
    return allocate(size);
}
void operator delete(void* block) noexcept {
    release(block);
}
void operator delete[](void* block) noexcept {
    release(block);
}
void operator delete(void* block, std::size_t) noexcept {
    release(block);
}
void operator delete[](void* block, std::size_t) noexcept {
    release(block);
}

AllocationProbe::AllocationProbe(std::size_t failing) {
    state = {true, failing, 0, 0};
}
AllocationProbe::~AllocationProbe() {
    stop();
}
std::size_t AllocationProbe::count() const {
    return state.count;
}
long AllocationProbe::live() const {
    return state.live;
}
void AllocationProbe::stop() {
    state.counting = false;
}
