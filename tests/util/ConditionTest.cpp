#include <gtest/gtest.h>

#include <cerrno>
#include <chrono>
#include <climits>
#include <cstring>
#include <ctime>
#include <mutex>
#include <thread>
#include <type_traits>
#include <vector>

#include "support/ScriptedPthread.h"
#include "support/Workers.h"
#include "util/Mutex.h"

namespace {

static_assert(std::is_base_of_v<ConditionBaseClass, ConditionWakeAll>);

bool isFree(Mutex& mutex) {
    return onForeignThread([&] { return mutex.tryLock() && mutex.NOLOG_unlock() == 0; });
}

timespec monotonicNow() {
    timespec now{};
    ::clock_gettime(CLOCK_MONOTONIC, &now);
    return now;
}

TEST(ConditionTest, WaitersContinueWhenAllAreWoken) {
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
                    condition.wait(mutex, 60);
                } else {
                    condition.wait(mutex);
                }
            }
            ++passed;
        });
    }
    for (bool all = false; !all;) {
        const std::lock_guard<Mutex> held(mutex);
        all = waiting == 8;
    }
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

TEST(ConditionTest, OneWaiterContinuesWhenOneIsWoken) {
    Mutex mutex;
    ConditionBaseClass condition;
    ScriptedCalls broadcasts("pthread_cond_broadcast");
    int tickets = 0;
    int passed = 0;
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&] {
            const std::lock_guard<Mutex> held(mutex);
            while (tickets == 0) {
                condition.wait(mutex);
            }
            --tickets;
            ++passed;
        });
    }
    for (int i = 1; i <= 4; ++i) {
        mutex.lock();
        ++tickets;
        condition.internal_wake_one();
        mutex.unlock();
        for (bool done = false; !done;) {
            const std::lock_guard<Mutex> held(mutex);
            done = passed == i;
        }
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(0U, broadcasts.calls());
}

TEST(ConditionTest, HasDefaultAttributes) {
    seenByPthread.condAttributes = true;
    const ConditionBaseClass condition;
    EXPECT_FALSE(seenByPthread.condAttributes);
}

TEST(ConditionTest, EachWakeIsItsOwnCall) {
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

TEST(ConditionTest, TimedWaitIsTrueWhenWoken) {
    for (const unsigned timeout : {60U, UINT_MAX}) {
        Mutex mutex;
        ConditionWakeAll condition;
        bool waiting = false;
        std::thread waker([&] {
            for (bool seen = false; !seen;) {
                const std::lock_guard<Mutex> held(mutex);
                seen = waiting;
            }
            const std::lock_guard<Mutex> held(mutex);
            condition.wake_all();
        });
        mutex.lock();
        waiting = true;
        EXPECT_TRUE(condition.wait(mutex, timeout)) << timeout;
        EXPECT_FALSE(isFree(mutex));
        mutex.unlock();
        waker.join();
    }
}

TEST(ConditionTest, TimedWaitIsFalseWhenTheTimeIsUp) {
    const StderrCapture err;
    Mutex mutex;
    ConditionWakeAll condition;
    mutex.lock();
    const auto start = std::chrono::steady_clock::now();
    while (condition.wait(mutex, 1)) {}
    EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::seconds(1));
    EXPECT_FALSE(isFree(mutex));
    mutex.unlock();
    EXPECT_EQ("", err.text());
}

TEST(ConditionTest, TimedWaitOfNothingIsFalseAtOnce) {
    Mutex mutex;
    ConditionWakeAll condition;
    mutex.lock();
    const auto start = std::chrono::steady_clock::now();
    EXPECT_FALSE(condition.wait(mutex, 0));
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(5));
    EXPECT_FALSE(isFree(mutex));
    mutex.unlock();
}

TEST(ConditionTest, TimedWaitCountsFromTheCallOnAClockThatNobodySets) {
    for (const unsigned timeout : {0U, 1U, 3600U, 2147483648U, 4294967295U}) {
        Mutex mutex;
        ConditionWakeAll condition;
        ScriptedCalls waits("pthread_cond_clockwait");
        waits.give(ETIMEDOUT);
        const timespec before = monotonicNow();
        EXPECT_FALSE(condition.wait(mutex, timeout));
        const timespec after = monotonicNow();

        EXPECT_EQ(CLOCK_MONOTONIC, seenByPthread.clock);
        const long long deadline = seenByPthread.deadline.tv_sec * 1000000000LL +
                                   seenByPthread.deadline.tv_nsec - timeout * 1000000000LL;
        EXPECT_LE(before.tv_sec * 1000000000LL + before.tv_nsec, deadline) << timeout;
        EXPECT_GE(after.tv_sec * 1000000000LL + after.tv_nsec, deadline) << timeout;
    }
}

TEST(ConditionTest, TimedWaitGivesBackWhatTheCallSays) {
    const StderrCapture err;
    Mutex mutex;
    ConditionWakeAll condition;
    ScriptedCalls waits("pthread_cond_clockwait");
    waits.give(0).give(ETIMEDOUT).give(EPERM);
    EXPECT_TRUE(condition.wait(mutex, 5));
    EXPECT_FALSE(condition.wait(mutex, 5));
    EXPECT_EQ("", err.text());
    const std::string text =
        pthreadFailure("pthread_cond_timedwait_relative_np", "Operation not permitted");
    EXPECT_EQ(text, thrownBy([&] { condition.wait(mutex, 5); }));
    EXPECT_EQ(text + "\n", err.text());
}

TEST(ConditionTest, DebuggingAidChangesNothing) {
    const ConditionBaseClass condition;
    pthread_cond_t before;
    std::memcpy(&before, &condition._pthread_cond, sizeof(before));
    condition.verify_mem();
    EXPECT_EQ(0, std::memcmp(&before, &condition._pthread_cond, sizeof(before)));
}

}  // namespace
