#include "util/Mutex.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <type_traits>

#include "support/ScriptedPthread.h"
#include "support/Workers.h"

namespace {

static_assert(!std::is_copy_constructible_v<Mutex> && !std::is_copy_assignable_v<Mutex>);

// The destructors are ordinary ones, so the wrappers can be members of any class.
struct Base {
    virtual ~Base() = default;
};
struct Holder : Base {
    Mutex mutex;
    RecursiveMutex recursive;
    ConditionWakeAll condition;
    ThreadSpecificPointer<int> pointer{nullptr};
};
static_assert(std::is_nothrow_destructible_v<Holder>);
static_assert(std::is_nothrow_destructible_v<ScopedMutexUnlocker>);
static_assert(std::is_nothrow_destructible_v<Thread>);

TEST(PthreadTokenTest, TellsThreadsApart) {
    const PthreadToken here = PthreadToken::self();
    EXPECT_NE(0, ::pthread_equal(here._token, ::pthread_self()));
    EXPECT_TRUE(here == PthreadToken::self());
    EXPECT_FALSE(here != PthreadToken::self());
    EXPECT_TRUE(onForeignThread([&] { return here != PthreadToken::self(); }));
    EXPECT_FALSE(onForeignThread([&] { return here == PthreadToken::self(); }));
}

TEST(PthreadExceptionTest, CopiesCarryTheMessage) {
    static_assert(std::is_base_of_v<std::runtime_error, PthreadException>);
    auto original = std::make_unique<PthreadException>(std::string("first").c_str());
    const PthreadException copy(*original);
    PthreadException assigned("second");
    EXPECT_STREQ("second", assigned.what());
    assigned = *original;
    original.reset();
    EXPECT_STREQ("first", copy.what());
    EXPECT_STREQ("first", assigned.what());
}

TEST(MutexTest, ExcludesEveryThreadWhileItIsLocked) {
    Mutex mutex;
    EXPECT_TRUE(isFree(mutex));
    mutex.lock();
    EXPECT_FALSE(isFree(mutex));
    EXPECT_FALSE(mutex.tryLock()) << "not recursive";
    mutex.unlock();
    EXPECT_TRUE(mutex.tryLock());
    EXPECT_FALSE(isFree(mutex));
    mutex.unlock();
    EXPECT_TRUE(isFree(mutex));
}

TEST(MutexTest, UncheckedCallsLockAndUnlockToo) {
    Mutex mutex;
    EXPECT_TRUE(mutex.NOLOG_lock());
    EXPECT_FALSE(isFree(mutex));
    EXPECT_EQ(0, mutex.NOLOG_unlock());
    EXPECT_TRUE(isFree(mutex));
}

TEST(MutexTest, IsInitializedAndDestroyedByThePthreadCalls) {
    ScriptedCalls inits("pthread_mutex_init");
    ScriptedCalls destroys("pthread_mutex_destroy");
    {
        const Mutex mutex;
        EXPECT_EQ(1U, inits.calls());
        EXPECT_EQ(0U, destroys.calls());
    }
    EXPECT_EQ(1U, inits.calls());
    EXPECT_EQ(1U, destroys.calls());
}

TEST(MutexTest, DebuggingAidsLeaveALockAsItIs) {
    Mutex mutex;
    mutex.lock();
    mutex.assertIsLocked();
    mutex.verify_mem();
    mutex.debrec_set();
    mutex.debrec_clear();
    EXPECT_FALSE(isFree(mutex));
    mutex.unlock();
    EXPECT_TRUE(isFree(mutex));
}

TEST(ScopedMutexUnlockerTest, UnlocksForItsLifeAndLocksAgain) {
    Mutex mutex;
    mutex.lock();
    {
        const ScopedMutexUnlocker unlocked(&mutex);
        EXPECT_TRUE(isFree(mutex));
    }
    EXPECT_FALSE(isFree(mutex));
    try {
        const ScopedMutexUnlocker unlocked(mutex);
        EXPECT_TRUE(isFree(mutex));
        throw 1;
    } catch (int) {
        EXPECT_FALSE(isFree(mutex));
    }
    mutex.unlock();
}

}  // namespace
