#include "util/HugePages.h"

#include <sys/mman.h>

#include <cerrno>
#include <cstdint>

void adviseHugePages(void* memory, std::size_t size) noexcept {
    constexpr std::uintptr_t PAGE_SIZE = std::uintptr_t{2} << 20;  // as on x86-64 and arm64
    const auto from = reinterpret_cast<std::uintptr_t>(memory);
    const std::uintptr_t begin = (from + PAGE_SIZE - 1) & ~(PAGE_SIZE - 1);
    const std::uintptr_t end = (from + size) & ~(PAGE_SIZE - 1);
    if (begin < end) {
        const int error = errno;
        ::madvise(static_cast<char*>(memory) + (begin - from), end - begin, MADV_HUGEPAGE);
        errno = error;
    }
}
