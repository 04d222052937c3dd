#include "support/AllocationProbe.h"

#include <cstdlib>
#include <new>

#if defined(__has_feature)
#define QUELTA_HAS_FEATURE(name) __has_feature(name)
#else
#define QUELTA_HAS_FEATURE(name) 0
#endif

namespace {

struct State {
    bool counting;
    std::size_t failing;
    std::size_t largest;
    std::size_t count;
    long live;
};

thread_local State state = {};

[[maybe_unused]] void* allocate(std::size_t size) {
    if (state.counting) {
        if (++state.count == state.failing || size > state.largest) {
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

[[maybe_unused]] void* allocateOrNull(std::size_t size) noexcept {
    try {
        return allocate(size);
    } catch (const std::bad_alloc&) {
        return nullptr;
    }
}

[[maybe_unused]] void release(void* block) {
    if (state.counting && block != nullptr) {
        --state.live;
    }
    std::free(block);
}

}  // namespace

#if !QUELTA_HAS_FEATURE(thread_sanitizer)
void* operator new(std::size_t size) {
    return allocate(size);
}
void* operator new[](std::size_t size) {
    return allocate(size);
}
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    return allocateOrNull(size);
}
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept {
    return allocateOrNull(size);
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
void operator delete(void* block, const std::nothrow_t&) noexcept {
    release(block);
}
void operator delete[](void* block, const std::nothrow_t&) noexcept {
    release(block);
}
bool AllocationProbe::available() {
    return true;
}
#else
bool AllocationProbe::available() {
    return false;
}
#endif

AllocationProbe::AllocationProbe(std::size_t failing) {
    state = {true, failing, std::size_t(-1), 0, 0};
}
AllocationProbe::~AllocationProbe() {
    stop();
}
void AllocationProbe::refuseBeyond(std::size_t bytes) {
    state.largest = bytes;
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
