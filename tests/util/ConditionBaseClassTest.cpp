#include <gtest/gtest.h>

#include <cerrno>
#include <chrono>
#include <ctime>
#include <mutex>
#include <thread>
#include <vector>

#include "support/ScriptedPthread.h"
#include "support/StderrCapture.h"
#include "support/Workers.h"
#include "util/Mutex.h"

namespace {

long long nanoseconds(const timespec& time) {
    return time.tv_sec * 1000000000LL + time.tv_nsec;
}

long long monotonicNow() {
    timespec now{};
    ::clock_gettime(CLOCK_MONOTONIC, &now);
    return nanoseconds(now);
}

TEST(ConditionBaseClassTest, WakesAllWaiters) {
    Mutex mutex;
    ConditionWakeAll condition;
    bool open = false;
    int waiting = 0;
    int passed = 0;
    std::vector<std::thread> threads;
    for (int i = 0; i < 8; ++i) {
        threads.emplace_back([&, timed = i % 2 == 0] {
            const std::lock_guard<Mutex> held(mutex);
            ++waiting;
            while (!open) {
                if (timed) {
                    EXPECT_TRUE(condition.wait(mutex, 60));
                } else {
                    condition.wait(mutex);
                }
            }
            ++passed;
        });
    }
    waitUntil([&] {
        const std::lock_guard<Mutex> held(mutex);
        return waiting == 8;
    });
    mutex.lock();
    EXPECT_EQ(0, passed);
    open = true;
    condition.wake_all();
    mutex.unlock();
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(8, passed);
}

TEST(ConditionBaseClassTest, EachWakeIsItsOwnCall) {
    ConditionWakeAll condition;
    ScriptedCalls signals("pthread_cond_signal");
    ScriptedCalls broadcasts("pthread_cond_broadcast");
    condition.internal_wake_one();
    EXPECT_EQ(1U, signals.calls());
    EXPECT_EQ(0U, broadcasts.calls());
    condition.internal_wake_all();
    condition.wake_all();
    EXPECT_EQ(1U, signals.calls());
    EXPECT_EQ(2U, broadcasts.calls());
}

TEST(ConditionBaseClassTest, TimedWaitEndsWhenTheTimeIsUp) {
    const StderrCapture err;
    Mutex mutex;
    ConditionWakeAll condition;
    mutex.lock();
    for (const unsigned timeout : {0U, 1U}) {
        const auto start = std::chrono::steady_clock::now();
        while (condition.wait(mutex, timeout)) {}
        const auto waited = std::chrono::steady_clock::now() - start;
        EXPECT_GE(waited, std::chrono::seconds(timeout));
        EXPECT_LT(waited, std::chrono::seconds(timeout + 10));
        EXPECT_FALSE(isFree(mutex));
    }
    mutex.unlock();
    EXPECT_EQ("", err.text());
}

TEST(ConditionBaseClassTest, TimedWaitCountsFromTheCallOnTheMonotonicClock) {
    for (const unsigned timeout : {0U, 1U, 3600U, 2147483648U, 4294967295U}) {
        Mutex mutex;
        ConditionWakeAll condition;
        ScriptedCalls waits("pthread_cond_clockwait");
        waits.give(ETIMEDOUT);
        const long long before = monotonicNow();
        EXPECT_FALSE(condition.wait(mutex, timeout));
        EXPECT_EQ(CLOCK_MONOTONIC, seenByPthread.clock);
        const long long start = nanoseconds(seenByPthread.deadline) - timeout * 1000000000LL;
        EXPECT_LE(before, start) << timeout;
        EXPECT_GE(monotonicNow(), start) << timeout;
    }
}

TEST(ConditionBaseClassTest, DebuggingAidDoesNotWake) {
    Mutex mutex;
    ConditionBaseClass condition;
    condition.verify_mem();
    mutex.lock();
    EXPECT_FALSE(condition.wait(mutex, 0));
    mutex.unlock();
}

}  // namespace
