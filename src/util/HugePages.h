#ifndef QUELTA_UTIL_HUGEPAGES_H_
#define QUELTA_UTIL_HUGEPAGES_H_

// Large blocks of memory on large pages: fewer page faults while they are filled, fewer misses of
// the address cache while they are walked.
// Safe from any thread.

#include <cstddef>

// Asks the system to back the whole large pages within `size` bytes at `memory` by large pages. A
// hint: nothing happens where the system has none, and errno is kept.
void adviseHugePages(void* memory, std::size_t size) noexcept;

#endif  // QUELTA_UTIL_HUGEPAGES_H_
