// The program's operator new and delete, which take memory from mimalloc, in huge pages where the
// system has them. Those of mimalloc itself abort when memory is exhausted; these throw.

#include <mimalloc.h>

#include <new>

[[maybe_unused]] static const bool HUGE_PAGES_ENABLED = [] {
    mi_option_enable(mi_option_large_os_pages);
    return true;
}();

void* operator new(std::size_t size) {
    void* const memory = mi_malloc(size);
    if (memory == nullptr) {
        throw std::bad_alloc();
    }
    return memory;
}

void operator delete(void* memory) noexcept {
    mi_free(memory);
}

void operator delete(void* memory, std::size_t size) noexcept {
    mi_free_size(memory, size);
}
