#ifndef QUELTA_TESTS_SUPPORT_ALLOCATIONPROBE_H_
#define QUELTA_TESTS_SUPPORT_ALLOCATIONPROBE_H_

// Counts the allocations that the current thread makes through operator new while a probe lives,
// and lets a chosen one fail. A program that uses it lists support/AllocationProbe.cpp, which
// replaces operator new and delete, among its sources.
//
//     REQUIRE_ALLOCATION_PROBE();  // first in the case
//     AllocationProbe probe(3);    // the third allocation from here on throws std::bad_alloc
//     ...
//     EXPECT_EQ(0, probe.live());
//
// Not thread-safe; one probe at a time, used by the thread that made it.

#include <gtest/gtest.h>

#include <cstddef>

class AllocationProbe {
public:
    // Counts; the `failing`th allocation, counted from 1, throws. 0: none does.
    explicit AllocationProbe(std::size_t failing = 0);
    ~AllocationProbe();
    AllocationProbe(const AllocationProbe&) = delete;
    AllocationProbe& operator=(const AllocationProbe&) = delete;

    // Allocations tried so far, the failing one included.
    std::size_t count() const;
    // Allocations less releases: what has leaked when everything made since has been destroyed.
    long live() const;
    // Stops counting and failing.
    void stop();

    // False where a program cannot replace operator new: clang's thread sanitizer brings its own.
    static bool available();
};

// Skips the case where there is nothing to be counted.
#define REQUIRE_ALLOCATION_PROBE()                              \
    if (!AllocationProbe::available()) {                        \
        GTEST_SKIP() << "operator new cannot be replaced here"; \
    }                                                           \
    static_assert(true, "takes the semicolon")

#endif  // QUELTA_TESTS_SUPPORT_ALLOCATIONPROBE_H_
