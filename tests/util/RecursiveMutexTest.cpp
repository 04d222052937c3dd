#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <csignal>
#include <thread>
#include <vector>

#include "support/FieldOrder.h"
#include "support/ScriptedPthread.h"
#include "support/Workers.h"
#include "util/Mutex.h"

namespace {

bool isFree(RecursiveMutex& mutex) {
    return onForeignThread([&] {
        const bool taken = mutex.tryLock();
        if (taken) {
            mutex.unlock();
        }
        return taken;
    });
}

bool isFree(Mutex& mutex) {
    return onForeignThread([&] { return mutex.tryLock() && mutex.NOLOG_unlock() == 0; });
}

TEST(RecursiveMutexTest, IsNobodysAtFirst) {
    RecursiveMutex mutex;
    EXPECT_FALSE(mutex._owner_valid);
    EXPECT_EQ(0U, mutex._owner_count);
    EXPECT_TRUE(isFree(mutex));
    EXPECT_TRUE(standInOrder({&mutex._mutex, &mutex._owner_mutex, &mutex._owner,
                              &mutex._owner_valid, &mutex._owner_count}));
}

TEST(RecursiveMutexTest, LockedThreeTimesNeedsThreeUnlocks) {
    RecursiveMutex mutex;
    mutex.lock();
    mutex.lock();
    EXPECT_TRUE(mutex.tryLock());
    EXPECT_EQ(3U, mutex._owner_count);
    EXPECT_TRUE(mutex._owner_valid);
    EXPECT_TRUE(mutex._owner == PthreadToken::self());
    for (int held = 3; held > 0; --held) {
        EXPECT_FALSE(isFree(mutex)) << held;
        EXPECT_FALSE(isFree(mutex._mutex)) << held;
        mutex.unlock();
    }
    EXPECT_TRUE(isFree(mutex));
    EXPECT_FALSE(mutex._owner_valid);
    EXPECT_EQ(0U, mutex._owner_count);
}

TEST(RecursiveMutexTest, TryLockClaimsAFreeMutexAndCountsItsOwner) {
    RecursiveMutex mutex;
    EXPECT_TRUE(mutex.tryLock());
    EXPECT_EQ(1U, mutex._owner_count);
    EXPECT_TRUE(mutex.tryLock());
    EXPECT_EQ(2U, mutex._owner_count);
    EXPECT_FALSE(onForeignThread([&] { return mutex.tryLock(); }));
    EXPECT_EQ(2U, mutex._owner_count);
    mutex.unlock();
    mutex.unlock();
}

// Deliberate: unlock() does not compare the caller with the owner.
TEST(RecursiveMutexTest, UnlockDoesNotAskWhoTheOwnerIs) {
    RecursiveMutex mutex;
    mutex.lock();
    mutex._owner = PthreadToken();
    mutex.unlock();
    EXPECT_TRUE(isFree(mutex));
    EXPECT_FALSE(mutex._owner_valid);
}

TEST(RecursiveMutexTest, IsNotTakenAgainByAFormerOwner) {
    RecursiveMutex mutex;
    mutex.lock();
    mutex.unlock();
    EXPECT_TRUE(mutex._owner == PthreadToken::self());
    // Held, and not claimed yet by whoever holds it.
    mutex._mutex.lock();
    EXPECT_FALSE(mutex.tryLock());
    EXPECT_EQ(0U, mutex._owner_count);
    mutex._mutex.unlock();
}

TEST(RecursiveMutexTest, ForgetsAnOwnerThatHasLetGo) {
    RecursiveMutex mutex;
    mutex.lock();
    mutex.unlock();
    std::thread other([&] {
        mutex.lock();
        mutex._owner_mutex.lock();
        EXPECT_TRUE(mutex._owner == PthreadToken::self());
        mutex._owner_mutex.unlock();
        mutex.unlock();
    });
    other.join();
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
    while (tries.calls() < 2) {
        std::this_thread::yield();
    }
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
                    while (!mutex.tryLock()) {
                        std::this_thread::yield();
                    }
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
    EXPECT_FALSE(mutex._owner_valid);
    EXPECT_EQ(0U, mutex._owner_count);
    EXPECT_TRUE(isFree(mutex._mutex));
    EXPECT_TRUE(isFree(mutex._owner_mutex));
}

TEST(RecursiveMutexTest, AssertsOnUnlockWithoutLock) {
    RecursiveMutex mutex;
    EXPECT_EXIT(mutex.unlock(), testing::KilledBySignal(SIGABRT),
                failedAssertion("src/util/Mutex.cpp", "_owner_count > 0"));
    mutex.lock();
    mutex.unlock();
    EXPECT_EXIT(mutex.unlock(), testing::KilledBySignal(SIGABRT),
                failedAssertion("src/util/Mutex.cpp", "_owner_count > 0"));
}

TEST(RecursiveMutexTest, AssertsWhenItsOwnerHoldsNothing) {
    RecursiveMutex mutex;
    mutex.lock();
    mutex._owner_count = 0;
    EXPECT_EXIT((void)mutex.tryLock(), testing::KilledBySignal(SIGABRT),
                failedAssertion("src/util/Mutex.cpp", "_owner_count > 0"));
    mutex._owner_count = 1;
    mutex.unlock();
}

TEST(RecursiveMutexTest, DestroysItsFirstMutexWhenTheSecondFails) {
    const StderrCapture err;
    ScriptedCalls inits("pthread_mutex_init");
    inits.pass().give(ENOMEM);
    ScriptedCalls destroys("pthread_mutex_destroy");
    EXPECT_EQ(pthreadFailure("pthread_mutex_init", "Cannot allocate memory"),
              thrownBy([] { RecursiveMutex mutex; }));
    EXPECT_EQ(2U, inits.calls());
    EXPECT_EQ(1U, destroys.calls());
}

TEST(RecursiveMutexTest, StaysFreeWhenItCannotBeClaimed) {
    RecursiveMutex mutex;
    const std::string text = pthreadFailure("pthread_mutex_lock", "Invalid argument");
    expectFailure("pthread_mutex_lock", EINVAL, text, [&] { mutex.lock(); });
    EXPECT_TRUE(isFree(mutex));
    expectFailure("pthread_mutex_lock", EINVAL, text, [&] { (void)mutex.tryLock(); });
    EXPECT_TRUE(isFree(mutex));

    // The same behind a wait: not taken at first, then locked, then not claimed.
    const StderrCapture err;
    ScriptedCalls tries("pthread_mutex_trylock");
    tries.give(EBUSY);
    ScriptedCalls locks("pthread_mutex_lock");
    locks.pass(2).give(EINVAL);
    EXPECT_EQ(text, thrownBy([&] { mutex.lock(); }));
    EXPECT_TRUE(isFree(mutex));
}

TEST(RecursiveMutexTest, IsStillHeldWhenItCannotBeUnlocked) {
    RecursiveMutex mutex;
    mutex.lock();
    {
        const StderrCapture err;
        ScriptedCalls unlocks("pthread_mutex_unlock");
        unlocks.pass().give(EPERM);
        EXPECT_EQ(pthreadFailure("pthread_mutex_unlock", "Operation not permitted"),
                  thrownBy([&] { mutex.unlock(); }));
    }
    EXPECT_TRUE(mutex._owner_valid);
    EXPECT_EQ(1U, mutex._owner_count);
    EXPECT_FALSE(isFree(mutex));
    mutex.unlock();
    EXPECT_TRUE(isFree(mutex));
}

TEST(RecursiveMutexTest, DebuggingAidChangesNothing) {
    RecursiveMutex mutex;
    mutex.assertIsLocked();
    EXPECT_TRUE(isFree(mutex));
    mutex.lock();
    mutex.assertIsLocked();
    EXPECT_EQ(1U, mutex._owner_count);
    mutex.unlock();
}

}  // namespace
