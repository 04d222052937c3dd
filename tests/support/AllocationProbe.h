#ifndef QUELTA_TESTS_SUPPORT_ALLOCATIONPROBE_H_
#define QUELTA_TESTS_SUPPORT_ALLOCATIONPROBE_H_

// Counts the allocations that the current thread makes through operator new while a probe lives,
// and makes a chosen one fail, or all that are too large. A program that uses it has
// COUNT_ALLOCATIONS in its quelta_test.
//
//     REQUIRE_ALLOCATION_PROBE();  // first in the case
//     AllocationProbe probe(3);    // the third allocation from here on throws std::bad_alloc
//     ...
//     EXPECT_EQ(0, probe.live());
//
// Not thread-safe; one probe at a time, used by the thread that made it.

#include <gtest/gtest.h>

#include <cstddef>
#include <new>

class AllocationProbe {
public:
    // Counts; the `failing`th allocation, counted from 1, fails. 0: none does.
    explicit AllocationProbe(std::size_t failing = 0);
    ~AllocationProbe();
    AllocationProbe(const AllocationProbe&) = delete;
    AllocationProbe& operator=(const AllocationProbe&) = delete;

    // Makes every allocation of more than `bytes` bytes fail, too.
    void refuseBeyond(std::size_t bytes);
    // Returns: the allocations tried so far, failed ones included.
    std::size_t count() const;
    // Returns: allocations less releases, which is what has leaked once everything is destroyed.
    long live() const;
    // Stops counting and failing.
    void stop();

    // False if a program cannot replace operator new: clang's thread sanitizer brings its own.
    static bool available();
};

// What an operation did while one of its allocations failed.
struct FailedAllocation {
    bool reached = false;  // the operation made that allocation
    bool thrown = false;   // the operation threw std::bad_alloc
    long live = 0;         // see AllocationProbe
};

// Runs `operation` once with its `n`th allocation failing, counted from 1.
template <typename Operation>
FailedAllocation failAllocation(std::size_t n, Operation operation) {
    FailedAllocation result;
    AllocationProbe probe(n);
    try {
        operation();
    } catch (const std::bad_alloc&) {
        result.thrown = true;
    }
    probe.stop();
    result.reached = probe.count() >= n;
    result.live = probe.live();
    return result;
}

// Skips the case if allocations cannot be counted.
#define REQUIRE_ALLOCATION_PROBE()                              \
    if (!AllocationProbe::available()) {                        \
        GTEST_SKIP() << "operator new cannot be replaced here"; \
    }                                                           \
    static_assert(true, "takes the semicolon")

#endif  // QUELTA_TESTS_SUPPORT_ALLOCATIONPROBE_H_
