#ifndef QUELTA_TESTS_SUPPORT_ALLOCATIONPROBE_H_
#define QUELTA_TESTS_SUPPORT_ALLOCATIONPROBE_H_

// Counts the allocations that the current thread makes through operator new while a probe lives,
// and lets a chosen one fail. A program that uses it lists support/AllocationProbe.cpp, which
// replaces operator new and delete, among its sources.
//
//     AllocationProbe probe(3);   // the third allocation from here on throws std::bad_alloc
//     ...
//     EXPECT_EQ(0, probe.live());
//
// Not thread-safe; one probe at a time, used by the thread that made it.

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
};

#endif  // QUELTA_TESTS_SUPPORT_ALLOCATIONPROBE_H_
