#include "util/Mutex.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <mutex>
#include <string>
#include <type_traits>
#include <utility>

#include "support/InChild.h"
#include "support/ScriptedPthread.h"
#include "support/Workers.h"
#include "util/Logger.h"

namespace {

static_assert(std::is_base_of_v<PthreadObject, Mutex>);
static_assert(std::is_base_of_v<PthreadObject, ConditionBaseClass>);
static_assert(std::is_base_of_v<PthreadObject, TSP_Implementor>);
static_assert(std::is_base_of_v<PthreadObject, Thread>);
static_assert(std::is_empty_v<PthreadObject>);
static_assert(sizeof(Mutex) == sizeof(pthread_mutex_t));
static_assert(sizeof(ConditionWakeAll) == sizeof(pthread_cond_t));
static_assert(!std::is_copy_constructible_v<Mutex> && !std::is_copy_assignable_v<Mutex>);

static_assert(std::is_same_v<decltype(&Mutex::tryLock), bool (Mutex::*)()>);
static_assert(std::is_same_v<decltype(std::declval<Mutex&>().NOLOG_lock()), bool>);
static_assert(std::is_same_v<decltype(std::declval<Mutex&>().NOLOG_unlock()), int>);
static_assert(std::is_constructible_v<PthreadException, const char*>);

constinit Mutex staticMutex;

// Whether a thread other than the caller could take the mutex.
bool isFree(Mutex& mutex) {
    return onForeignThread([&] { return mutex.tryLock() && mutex.NOLOG_unlock() == 0; });
}

// Holds a mutex, and lets go of it without a check.
class Held {
public:
    explicit Held(Mutex& mutex) : _mutex(mutex) { _mutex.lock(); }
    ~Held() { _mutex.NOLOG_unlock(); }

private:
    Mutex& _mutex;
};

// One checked call of each wrapper. `run` calls `arm` right before what is to fail.
using Armed = std::unique_ptr<ScriptedCalls>;
struct CheckedCall {
    const char* function;
    const char* reported;
    int error;
    const char* errorText;
    void (*run)(const std::function<Armed()>& arm);
};

void noCleanup(void*) {}

const CheckedCall CHECKED_CALLS[] = {
    {"pthread_mutex_init", "pthread_mutex_init", ENOMEM, "Cannot allocate memory",
     [](const auto& arm) {
         const Armed armed = arm();
         Mutex mutex;
     }},
    {"pthread_mutex_destroy", "pthread_mutex_destroy", EBUSY, "Device or resource busy",
     [](const auto& arm) {
         auto* const mutex = new Mutex;
         const Armed armed = arm();
         delete mutex;
     }},
    {"pthread_mutex_lock", "pthread_mutex_lock", EINVAL, "Invalid argument",
     [](const auto& arm) {
         Mutex mutex;
         const Armed armed = arm();
         mutex.lock();
     }},
    {"pthread_mutex_unlock", "pthread_mutex_unlock", EPERM, "Operation not permitted",
     [](const auto& arm) {
         Mutex mutex;
         const Held held(mutex);
         const Armed armed = arm();
         mutex.unlock();
     }},
    {"pthread_mutex_trylock", "pthread_mutex_trylock", EAGAIN, "Resource temporarily unavailable",
     [](const auto& arm) {
         Mutex mutex;
         const Armed armed = arm();
         EXPECT_FALSE(mutex.tryLock());
     }},
    {"pthread_cond_init", "pthread_cond_init", EAGAIN, "Resource temporarily unavailable",
     [](const auto& arm) {
         const Armed armed = arm();
         ConditionBaseClass condition;
     }},
    {"pthread_cond_destroy", "pthread_cond_destroy", EBUSY, "Device or resource busy",
     [](const auto& arm) {
         auto* const condition = new ConditionBaseClass;
         const Armed armed = arm();
         delete condition;
     }},
    {"pthread_cond_wait", "pthread_cond_wait", EPERM, "Operation not permitted",
     [](const auto& arm) {
         Mutex mutex;
         ConditionBaseClass condition;
         const Held held(mutex);
         const Armed armed = arm();
         condition.wait(mutex);
     }},
    {"pthread_cond_clockwait", "pthread_cond_timedwait_relative_np", EINVAL, "Invalid argument",
     [](const auto& arm) {
         Mutex mutex;
         ConditionBaseClass condition;
         const Held held(mutex);
         const Armed armed = arm();
         EXPECT_FALSE(condition.wait(mutex, 0));
     }},
    {"pthread_cond_signal", "pthread_cond_signal", EINVAL, "Invalid argument",
     [](const auto& arm) {
         ConditionBaseClass condition;
         const Armed armed = arm();
         condition.internal_wake_one();
     }},
    {"pthread_cond_broadcast", "pthread_cond_broadcast", EINVAL, "Invalid argument",
     [](const auto& arm) {
         ConditionBaseClass condition;
         const Armed armed = arm();
         condition.internal_wake_all();
     }},
    {"pthread_cond_broadcast", "pthread_cond_broadcast", EPERM, "Operation not permitted",
     [](const auto& arm) {
         ConditionWakeAll condition;
         const Armed armed = arm();
         condition.wake_all();
     }},
    {"pthread_key_create", "pthread_key_create", EAGAIN, "Resource temporarily unavailable",
     [](const auto& arm) {
         const Armed armed = arm();
         TSP_Implementor pointer(noCleanup);
     }},
    {"pthread_key_delete", "pthread_key_delete", EINVAL, "Invalid argument",
     [](const auto& arm) {
         auto* const pointer = new TSP_Implementor(noCleanup);
         const Armed armed = arm();
         delete pointer;
     }},
    {"pthread_setspecific", "pthread_setspecific", ENOMEM, "Cannot allocate memory",
     [](const auto& arm) {
         TSP_Implementor pointer(noCleanup);
         const Armed armed = arm();
         int value = 0;
         pointer.set(&value);
     }},
};

std::function<Armed()> armFor(const CheckedCall& call) {
    return [&call] {
        auto armed = std::make_unique<ScriptedCalls>(call.function);
        armed->give(call.error);
        return armed;
    };
}

TEST(PthreadObjectTest, LogsAndThrowsTheSameTextForEveryFailedCall) {
    for (const CheckedCall& call : CHECKED_CALLS) {
        SCOPED_TRACE(call.function);
        const StderrCapture err;
        const std::string text = pthreadFailure(call.reported, call.errorText);
        EXPECT_EQ(text, thrownBy([&] { call.run(armFor(call)); }));
        EXPECT_EQ(text + "\n", err.text());
    }
}

TEST(PthreadObjectTest, IgnoresEveryFailedCallOnceTheMainThreadIsDying) {
    const ChildRun run = inChild([] {
        Thread::mainThreadDying();
        for (const CheckedCall& call : CHECKED_CALLS) {
            SCOPED_TRACE(call.function);
            EXPECT_NO_THROW(call.run(armFor(call)));
        }
        EXPECT_NO_THROW(PthreadObject::checkPtRes("pthread_thing", EINVAL));
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(PthreadObjectTest, LetsSuccessPass) {
    const StderrCapture err;
    EXPECT_NO_THROW(PthreadObject::checkPtRes("pthread_thing", 0));
    EXPECT_EQ("", err.text());
}

TEST(PthreadObjectTest, TakesTheErrorTextFromTheResultNotFromErrno) {
    const StderrCapture err;
    errno = ENOENT;
    EXPECT_EQ(pthreadFailure("pthread_thing", "Resource deadlock avoided"),
              thrownBy([] { PthreadObject::checkPtRes("pthread_thing", EDEADLK); }));
}

TEST(PthreadObjectTest, NamesTheThreadThatMadeTheCall) {
    const StderrCapture err;
    std::string text;
    runWorker("Sorter",
              [&] { text = thrownBy([] { PthreadObject::checkPtRes("pthread_thing", EINVAL); }); });
    EXPECT_EQ(pthreadFailure("pthread_thing", "Invalid argument", "Sorter"), text);
    EXPECT_EQ(text + "\n", err.text());
}

TEST(PthreadObjectTest, TakesNoNameForAFormat) {
    const StderrCapture err;
    std::string text;
    runWorker("100%s %m",
              [&] { text = thrownBy([] { PthreadObject::checkPtRes("pthread_%d%n", EINVAL); }); });
    EXPECT_EQ(pthreadFailure("pthread_%d%n", "Invalid argument", "100%s %m"), text);
    EXPECT_EQ(text + "\n", err.text());
}

TEST(PthreadObjectTest, ReportsNamesOfAnyLengthAndResultsWithoutAText) {
    const StderrCapture err;
    const std::string function(10000, 'f');
    const std::string text = pthreadFailure(function, "UNKNOWN ERROR");
    EXPECT_EQ(text, thrownBy([&] { PthreadObject::checkPtRes(function.c_str(), 9999); }));
    EXPECT_EQ(text + "\n", err.text());
    EXPECT_EQ(pthreadFailure("f", "UNKNOWN ERROR"),
              thrownBy([] { PthreadObject::checkPtRes("f", -1); }));
}

TEST(PthreadObjectTest, WarnsOnTheLoggerNamedThread) {
    const ChildRun run = inChild([] {
        Logger::setChannelLevel("Thread", "ERROR");
        Logger::initialize();
        EXPECT_THROW(PthreadObject::checkPtRes("pthread_thing", EINVAL), PthreadException);
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);

    const ChildRun louder = inChild([] {
        Logger::setChannelLevel(nullptr, "ERROR");
        Logger::setChannelLevel("Thread", "WARN");
        Logger::initialize();
        EXPECT_THROW(PthreadObject::checkPtRes("pthread_thing", EINVAL), PthreadException);
    });
    EXPECT_EQ(pthreadFailure("pthread_thing", "Invalid argument") + "\n", louder.err);
}

TEST(PthreadTokenTest, TellsThreadsApart) {
    const PthreadToken here = PthreadToken::self();
    EXPECT_TRUE(here == PthreadToken::self());
    EXPECT_FALSE(here != PthreadToken::self());
    EXPECT_NE(0, ::pthread_equal(here._token, ::pthread_self()));
    EXPECT_TRUE(onForeignThread([&] { return here != PthreadToken::self(); }));
    EXPECT_TRUE(onForeignThread([&] { return !(here == PthreadToken::self()); }));
    EXPECT_TRUE(here != PthreadToken());
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

TEST(MutexTest, IsFreeAtFirstAndExcludesOthersWhileLocked) {
    Mutex mutex;
    EXPECT_TRUE(isFree(mutex));
    mutex.lock();
    EXPECT_FALSE(isFree(mutex));
    mutex.unlock();
    EXPECT_TRUE(isFree(mutex));
}

TEST(MutexTest, TryLockIsFalseWhileHeldWithoutMessageOrException) {
    const StderrCapture err;
    Mutex mutex;
    EXPECT_TRUE(mutex.tryLock());
    EXPECT_FALSE(onForeignThread([&] { return mutex.tryLock(); }));
    mutex.unlock();
    EXPECT_TRUE(mutex.tryLock());
    mutex.unlock();
    EXPECT_EQ("", err.text());
}

TEST(MutexTest, HasDefaultAttributes) {
    seenByPthread.mutexAttributes = true;
    Mutex mutex;
    EXPECT_FALSE(seenByPthread.mutexAttributes);
    mutex.lock();
    EXPECT_FALSE(mutex.tryLock());
    mutex.unlock();
}

TEST(MutexTest, IsAsBeforeAfterAFailedCall) {
    Mutex mutex;
    expectFailure("pthread_mutex_lock", EINVAL,
                  pthreadFailure("pthread_mutex_lock", "Invalid argument"), [&] { mutex.lock(); });
    EXPECT_TRUE(isFree(mutex));
    mutex.lock();
    expectFailure("pthread_mutex_unlock", EPERM,
                  pthreadFailure("pthread_mutex_unlock", "Operation not permitted"),
                  [&] { mutex.unlock(); });
    EXPECT_FALSE(isFree(mutex));
    mutex.unlock();
    EXPECT_TRUE(isFree(mutex));
}

TEST(MutexTest, DestructionOfALockedMutexThrows) {
    const StderrCapture err;
    auto* const mutex = new Mutex;
    ScriptedCalls destroy("pthread_mutex_destroy");
    destroy.give(EBUSY);
    EXPECT_THROW(delete mutex, PthreadException);
    EXPECT_EQ(1U, destroy.calls());
}

TEST(MutexTest, UncheckedPairNeitherLogsNorThrows) {
    const StderrCapture err;
    Mutex mutex;
    {
        ScriptedCalls locks("pthread_mutex_lock");
        locks.give(EINVAL);
        EXPECT_FALSE(mutex.NOLOG_lock());
    }
    EXPECT_TRUE(mutex.NOLOG_lock());
    EXPECT_FALSE(isFree(mutex));
    {
        ScriptedCalls unlocks("pthread_mutex_unlock");
        unlocks.give(EPERM);
        EXPECT_EQ(EPERM, mutex.NOLOG_unlock());
    }
    EXPECT_EQ(0, mutex.NOLOG_unlock());
    EXPECT_TRUE(isFree(mutex));
    EXPECT_EQ("", err.text());
}

TEST(MutexTest, OfStaticStorageNeedsNoInitialization) {
    EXPECT_TRUE(isFree(staticMutex));
    const std::lock_guard<Mutex> held(staticMutex);
    EXPECT_FALSE(isFree(staticMutex));
}

TEST(MutexTest, IsInitializedAndDestroyedByThePthreadCalls) {
    ScriptedCalls inits("pthread_mutex_init");
    ScriptedCalls destroys("pthread_mutex_destroy");
    {
        Mutex mutex;
        EXPECT_EQ(1U, inits.calls());
        EXPECT_EQ(0U, destroys.calls());
    }
    EXPECT_EQ(1U, inits.calls());
    EXPECT_EQ(1U, destroys.calls());
}

TEST(MutexTest, DebuggingAidsChangeNothing) {
    Mutex mutex;
    for (int round = 0; round < 2; ++round) {
        pthread_mutex_t before;
        std::memcpy(&before, &mutex._pthread_mutex, sizeof(before));
        mutex.assertIsLocked();
        mutex.verify_mem();
        mutex.debrec_set();
        mutex.debrec_clear();
        EXPECT_EQ(0, std::memcmp(&before, &mutex._pthread_mutex, sizeof(before)));
        round == 0 ? mutex.lock() : mutex.unlock();
    }
}

TEST(ScopedMutexUnlockerTest, UnlocksForItsLifeAndLocksAgain) {
    Mutex mutex;
    mutex.lock();
    {
        const ScopedMutexUnlocker unlocked(&mutex);
        EXPECT_EQ(&mutex, unlocked._mutex);
        EXPECT_TRUE(isFree(mutex));
    }
    EXPECT_FALSE(isFree(mutex));
    {
        const ScopedMutexUnlocker unlocked(mutex);
        EXPECT_TRUE(isFree(mutex));
    }
    EXPECT_FALSE(isFree(mutex));
    mutex.unlock();
}

TEST(ScopedMutexUnlockerTest, LocksAgainWhenAnExceptionLeavesTheScope) {
    Mutex mutex;
    mutex.lock();
    try {
        const ScopedMutexUnlocker unlocked(&mutex);
        throw 1;
    } catch (int) {
        EXPECT_FALSE(isFree(mutex));
    }
    mutex.unlock();
}

TEST(ScopedMutexUnlockerTest, LeavesTheMutexHeldWhenItCannotUnlock) {
    Mutex mutex;
    mutex.lock();
    expectFailure("pthread_mutex_unlock", EPERM,
                  pthreadFailure("pthread_mutex_unlock", "Operation not permitted"),
                  [&] { const ScopedMutexUnlocker unlocked(&mutex); });
    EXPECT_FALSE(isFree(mutex));
    mutex.unlock();
}

TEST(ScopedMutexUnlockerTest, ReportsThatItCannotLockAgain) {
    Mutex mutex;
    mutex.lock();
    expectFailure("pthread_mutex_lock", EINVAL,
                  pthreadFailure("pthread_mutex_lock", "Invalid argument"),
                  [&] { const ScopedMutexUnlocker unlocked(&mutex); });
    EXPECT_TRUE(isFree(mutex));
}

}  // namespace
