#ifndef QUELTA_TESTS_SUPPORT_ALLOCATIONPROBE_H_
#define QUELTA_TESTS_SUPPORT_ALLOCATIONPROBE_H_

// Counts the calls of operator new by the current thread while a probe exists. It can make one of
// them fail, or all above a size. A program that uses it has COUNT_ALLOCATIONS in its quelta_test.
//
//     REQUIRE_ALLOCATION_PROBE();  // first in the case
//     AllocationProbe probe(3);    // the third allocation from now on throws std::bad_alloc
//     ...
//     EXPECT_EQ(0, probe.live());
//
// Not thread-safe; one probe at a time, used by the thread that constructed it.

#include <gtest/gtest.h>

#include <cstddef>
#include <new>

class AllocationProbe {
public:
    // Starts counting. The `failing`th allocation, counted from 1, fails; 0: none.
    explicit AllocationProbe(std::size_t failing = 0);
    ~AllocationProbe();
    AllocationProbe(const AllocationProbe&) = delete;
    AllocationProbe& operator=(const AllocationProbe&) = delete;

    // Makes every allocation of more than `bytes` bytes fail, too.
    void refuseBeyond(std::size_t bytes);
    // Returns: the number of allocations so far, including failed ones.
    std::size_t count() const;
    // Returns: allocations minus deallocations: the number of leaks once everything is destroyed.
    long live() const;
    // Stops counting; allocations no longer fail.
    void stop();

    // False if a program cannot replace operator new, because clang's thread sanitizer has its own.
    static bool available();
};

// The result of an operation during which one allocation failed.
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
