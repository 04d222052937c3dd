#include <gtest/gtest.h>

#include <csignal>
#include <thread>
#include <vector>

#include "support/ScriptedPthread.h"
#include "support/Workers.h"
#include "util/Mutex.h"

namespace {

TEST(RecursiveMutexTest, LockedThreeTimesNeedsThreeUnlocks) {
    RecursiveMutex mutex;
    EXPECT_FALSE(mutex._owner_valid);
    EXPECT_EQ(0U, mutex._owner_count);
    EXPECT_TRUE(mutex.tryLock());
    EXPECT_EQ(1U, mutex._owner_count);
    mutex.lock();
    EXPECT_TRUE(mutex.tryLock());
    EXPECT_EQ(3U, mutex._owner_count);
    EXPECT_TRUE(mutex._owner_valid);
    EXPECT_TRUE(mutex._owner == PthreadToken::self());
    mutex.assertIsLocked();
    for (int held = 3; held > 0; --held) {
        EXPECT_FALSE(isFree(mutex)) << held;
        mutex.unlock();
    }
    EXPECT_TRUE(isFree(mutex));
    EXPECT_FALSE(mutex._owner_valid);
    EXPECT_EQ(0U, mutex._owner_count);
}

// Deliberate: unlock() does not compare the caller with the owner.
TEST(RecursiveMutexTest, UnlockDoesNotCheckTheOwner) {
    RecursiveMutex mutex;
    mutex.lock();
    mutex._owner = PthreadToken();
    mutex.unlock();
    EXPECT_TRUE(isFree(mutex));
    EXPECT_FALSE(mutex._owner_valid);
}

TEST(RecursiveMutexTest, ForgetsAFormerOwner) {
    RecursiveMutex mutex;
    mutex.lock();
    mutex.unlock();
    EXPECT_TRUE(onForeignThread([&] {
        mutex.lock();
        const bool owns = mutex._owner == PthreadToken::self();
        mutex.unlock();
        return owns;
    }));
    mutex.lock();
    mutex.unlock();
    // Locked by another thread that has not recorded itself as the owner yet.
    mutex._mutex.lock();
    EXPECT_FALSE(mutex.tryLock());
    mutex._mutex.unlock();
}

TEST(RecursiveMutexTest, LockWaitsForTheOtherOwner) {
    RecursiveMutex mutex;
    ScriptedCalls tries("pthread_mutex_trylock");
    mutex.lock();
    bool released = false;
    std::thread other([&] {
        mutex.lock();
        EXPECT_TRUE(released);
        EXPECT_EQ(1U, mutex._owner_count);
        EXPECT_TRUE(mutex._owner == PthreadToken::self());
        mutex.unlock();
    });
    waitUntil([&] { return tries.calls() == 2; });
    released = true;
    mutex.unlock();
    other.join();
    EXPECT_TRUE(isFree(mutex));
}

TEST(RecursiveMutexTest, ExcludesEightThreadsFromEachOther) {
    constexpr int ROUNDS = 2000;
    RecursiveMutex mutex;
    int plain = 0;
    std::vector<std::thread> threads;
    for (int i = 0; i < 8; ++i) {
        threads.emplace_back([&mutex, &plain, i] {
            for (int round = 0; round < ROUNDS; ++round) {
                const int depth = 1 + (round + i) % 3;
                if (round % 2 == 0) {
                    mutex.lock();
                } else {
                    waitUntil([&] { return mutex.tryLock(); });
                }
                for (int more = 1; more < depth; ++more) {
                    mutex.lock();
                }
                ++plain;
                for (int held = 0; held < depth; ++held) {
                    mutex.unlock();
                }
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(8 * ROUNDS, plain);
    EXPECT_EQ(0U, mutex._owner_count);
    EXPECT_TRUE(isFree(mutex._mutex));
    EXPECT_TRUE(isFree(mutex._owner_mutex));
}

TEST(RecursiveMutexTest, AssertsOnUnlockWithoutLock) {
    RecursiveMutex mutex;
    EXPECT_EXIT(mutex.unlock(), testing::KilledBySignal(SIGABRT),
                failedAssertion("src/util/Mutex.cpp", "_owner_count > 0"));
}

TEST(RecursiveMutexTest, AssertsThatItsOwnerHoldsIt) {
    RecursiveMutex mutex;
    mutex.lock();
    mutex._owner_count = 0;
    EXPECT_EXIT((void)mutex.tryLock(), testing::KilledBySignal(SIGABRT),
                failedAssertion("src/util/Mutex.cpp", "_owner_count > 0"));
    mutex._owner_count = 1;
    mutex.unlock();
}

}  // namespace
