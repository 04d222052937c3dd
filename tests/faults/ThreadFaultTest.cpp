// Failing pthread calls, and main threads created too late or twice. Every case runs in a child
// process: there is one main thread's object per process, and mainThreadDying() cannot be undone.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <exception>
#include <iterator>
#include <string>
#include <vector>

#include "support/InChild.h"
#include "support/ScriptedPthread.h"
#include "support/Workers.h"
#include "util/Logger.h"
#include "util/Thread.h"

namespace {

// A pthread call that is checked, and code whose first such call fails.
struct CheckedCall {
    const char* function;
    int error;
    void (*run)();
    const char* reported = function;
};

class UnlockedAtEnd {
public:
    explicit UnlockedAtEnd(Mutex& mutex) : _mutex(mutex) {}
    ~UnlockedAtEnd() { _mutex.NOLOG_unlock(); }

private:
    Mutex& _mutex;
};

// Takes every key that is left, except one that libc++ creates for exceptions. Returns: the keys.
std::vector<pthread_key_t> exhaustKeys() {
    static_cast<void>(std::uncaught_exceptions());
    std::vector<pthread_key_t> keys;
    pthread_key_t key = 0;
    while (::pthread_key_create(&key, nullptr) == 0) {
        keys.push_back(key);
    }
    return keys;
}

// Leaves a pointer with a key that does not exist.
void breakKey(TSP_Implementor& pointer) {
    ::pthread_key_delete(pointer._key);
    pointer._key = static_cast<pthread_key_t>(-1);
}

const CheckedCall THROWING[] = {
    {"pthread_mutex_init", ENOMEM, [] { const Mutex mutex; }},
    {"pthread_mutex_lock", EINVAL,
     [] {
         Mutex mutex;
         mutex.lock();
     }},
    {"pthread_mutex_unlock", EPERM,
     [] {
         Mutex mutex;
         mutex.lock();
         const UnlockedAtEnd later(mutex);
         mutex.unlock();
     }},
    {"pthread_mutex_trylock", EAGAIN,
     [] {
         Mutex mutex;
         EXPECT_FALSE(mutex.tryLock());
     }},
    {"pthread_cond_init", EAGAIN, [] { const ConditionBaseClass condition; }},
    {"pthread_cond_wait", EPERM,
     [] {
         Mutex mutex;
         ConditionBaseClass().wait(mutex);
     }},
    {"pthread_cond_clockwait", EINVAL,
     [] {
         Mutex mutex;
         EXPECT_FALSE(ConditionBaseClass().wait(mutex, 0));
     },
     // Deliberate: the name of a relative wait, which this is to the caller.
     "pthread_cond_timedwait_relative_np"},
    {"pthread_cond_signal", EINVAL, [] { ConditionBaseClass().internal_wake_one(); }},
    {"pthread_cond_broadcast", EINVAL, [] { ConditionBaseClass().internal_wake_all(); }},
    {"pthread_cond_broadcast", EPERM, [] { ConditionWakeAll().wake_all(); }},
    {"pthread_key_create", EAGAIN,
     [] {
         exhaustKeys();
         TSP_Implementor pointer(nullptr);
         EXPECT_EQ(nullptr, pointer.get());
         pointer.set(&pointer);
         EXPECT_EQ(nullptr, pointer.get());
     }},
    {"pthread_setspecific", EINVAL,
     [] {
         static auto* const pointer = new TSP_Implementor(nullptr);
         breakKey(*pointer);
         pointer->set(pointer);
     }},
    {"pthread_attr_init", ENOMEM, [] { const Thread main; }},
    {"pthread_create", EAGAIN, [] { const Worker worker("Sorter", [] {}); }},
    {"pthread_create", EAGAIN,
     [] {
         Worker worker("Sorter", [] { ADD_FAILURE() << "created"; });
         worker.go();
         worker.join();
     }},
};

// Destructors are noexcept, so the exception ends the process.
const CheckedCall TERMINATING[] = {
    {"pthread_mutex_destroy", EBUSY, [] { const Mutex mutex; }},
    {"pthread_cond_destroy", EBUSY, [] { const ConditionBaseClass condition; }},
    {"pthread_cond_destroy", EBUSY, [] { runWorker("Sorter", [] {}); }},
    {"pthread_key_delete", EINVAL, [] { const TSP_Implementor pointer(nullptr); }},
    {"pthread_mutex_lock", EINVAL,
     [] {
         Mutex mutex;
         if (mutex.tryLock()) {
             const ScopedMutexUnlocker unlocker(mutex);
         }
     }},
};

const std::string NOT_REGISTERED =
    "Could not construct ThreadSpecificPointer<Thread> in ActiveThreads::add\n";

TEST(PthreadObjectTest, LogsAndThrowsTheSameTextForEveryFailedCall) {
    for (const CheckedCall& call : THROWING) {
        SCOPED_TRACE(call.function);
        const std::string text = pthreadFailure(call.reported, call.error);
        const ChildRun run = inChild([&] {
            ScriptedCalls calls(call.function);
            calls.give(call.error);
            errno = ENOENT;
            EXPECT_EQ(text, thrownBy(call.run));
        });
        EXPECT_EQ(0, run.status);
        EXPECT_EQ(text + "\n", run.err);
    }
}

// Deliberate: destructors are checked too; they are noexcept, so a failure ends the process.
TEST(PthreadObjectTest, TerminatesWhenADestructorFails) {
    for (const CheckedCall& call : TERMINATING) {
        SCOPED_TRACE(call.function);
        EXPECT_EXIT(
            {
                ScriptedCalls calls(call.function);
                calls.give(call.error);
                call.run();
            },
            testing::KilledBySignal(SIGABRT),
            testing::StartsWith(pthreadFailure(call.reported, call.error) + "\n"));
    }
}

TEST(PthreadObjectTest, IgnoresEveryFailedCallOnceTheMainThreadIsDying) {
    std::vector<CheckedCall> all(std::begin(THROWING), std::end(THROWING));
    all.insert(all.end(), std::begin(TERMINATING), std::end(TERMINATING));
    for (const CheckedCall& call : all) {
        SCOPED_TRACE(call.function);
        const ChildRun run = inChild([&] {
            Thread::mainThreadDying();
            ScriptedCalls calls(call.function);
            calls.give(call.error);
            EXPECT_EQ("", thrownBy(call.run));
        });
        EXPECT_EQ(0, run.status);
        EXPECT_EQ("", run.err);
    }
}

TEST(PthreadObjectTest, NamesTheCallingThreadWhateverItsName) {
    const ChildRun run = inChild([] {
        EXPECT_EQ("", thrownBy([] { PthreadObject::checkPtRes("pthread_thing", 0); }));
        std::string text;
        runWorker("100%s %m", [&] {
            text = thrownBy([] { PthreadObject::checkPtRes("pthread_%d%n", EINVAL); });
        });
        EXPECT_EQ(pthreadFailure("pthread_%d%n", EINVAL, "100%s %m"), text);
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ(pthreadFailure("pthread_%d%n", EINVAL, "100%s %m") + "\n", run.err);
}

// Returns: what `report` writes to standard error if only the logger "Thread" has this level.
template <typename Report>
std::string atLevel(const char* level, Report report) {
    const ChildRun run = inChild([&] {
        Logger::setChannelLevel(nullptr, "EMERG");
        Logger::setChannelLevel("Thread", level);
        Logger::initialize();
        report();
    });
    EXPECT_EQ(0, run.status);
    return run.err;
}

TEST(PthreadObjectTest, WarnsOnTheLoggerNamedThread) {
    const auto fail = [] { thrownBy([] { PthreadObject::checkPtRes("f", EINVAL); }); };
    EXPECT_EQ(pthreadFailure("f", EINVAL) + "\n", atLevel("WARN", fail));
    EXPECT_EQ("", atLevel("ERROR", fail));
}

TEST(ThreadTest, MainThreadMustExistBeforeAnyWorkerAndOnlyOnce) {
    for (const bool dying : {false, true}) {
        const ChildRun run = inChild([&] {
            if (dying) {
                Thread::mainThreadDying();
            }
            ScriptedCalls creations("pthread_create");
            EXPECT_EQ("Thread created before main thread!",
                      thrownBy([] { Thread worker("Early"); }));
            EXPECT_EQ(0U, creations.calls());
            {
                const Thread main;
                EXPECT_EQ("Main Thread created twice!", thrownBy([] { Thread second; }));
            }
            EXPECT_EQ("Main Thread created twice!", thrownBy([] { Thread third; }));
            Thread worker("Later");
            worker.go();
            worker.join();
        });
        EXPECT_EQ(0, run.status);
        EXPECT_EQ("", run.err);
    }
}

TEST(ThreadTest, OnlyWarnsAboutAStackSizeThatCannotBeSet) {
    const auto start = [] {
        ScriptedCalls sizes("pthread_attr_setstacksize");
        sizes.give(EINVAL);
        errno = ENOENT;
        const Thread main;
        Thread worker("Sorter");
        worker.go();
        worker.join();
    };
    EXPECT_EQ("cannot override thread stack size: pthread_attr_setstacksize(): Invalid argument\n",
              atLevel("WARN", start));
    EXPECT_EQ("", atLevel("ERROR", start));
}

// Deliberate: a join that failed counts as done, so the object can be destroyed.
TEST(ThreadTest, CountsAsJoinedWhenTheJoinFailed) {
    const ChildRun run = inChild([] {
        Worker worker("Sorter", [] {});
        worker.go();
        ScriptedCalls joins("pthread_join");
        joins.give(EDEADLK);
        EXPECT_EQ(pthreadFailure("pthread_join", EDEADLK), thrownBy([&] { worker.join(); }));
        EXPECT_TRUE(worker._did_join);
        EXPECT_EQ(0, ::pthread_join(worker._token._token, nullptr));
    });
    EXPECT_EQ(0, run.status);
}

TEST(RecursiveMutexTest, DestroysItsFirstMutexWhenTheSecondFails) {
    const ChildRun run = inChild([] {
        ScriptedCalls inits("pthread_mutex_init");
        inits.pass().give(ENOMEM);
        ScriptedCalls destroys("pthread_mutex_destroy");
        EXPECT_EQ(pthreadFailure("pthread_mutex_init", ENOMEM),
                  thrownBy([] { const RecursiveMutex mutex; }));
        EXPECT_EQ(1U, destroys.calls());
    });
    EXPECT_EQ(0, run.status);
}

TEST(MutexTest, UncheckedCallsNeitherLogNorThrow) {
    const ChildRun run = inChild([] {
        Mutex mutex;
        ScriptedCalls locks("pthread_mutex_lock");
        locks.give(EINVAL);
        EXPECT_FALSE(mutex.NOLOG_lock());
        ScriptedCalls unlocks("pthread_mutex_unlock");
        unlocks.give(EPERM);
        EXPECT_EQ(EPERM, mutex.NOLOG_unlock());
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(ActiveThreadsTest, LeavesAWorkerUnregisteredWithoutAKey) {
    const auto start = [] {
        mainThread();
        const std::vector<pthread_key_t> keys = exhaustKeys();
        runWorker("Sorter", [] {
            EXPECT_EQ(nullptr, Thread::current());
            EXPECT_STREQ("Main Thread", Thread::currentName());
        });
        EXPECT_EQ(0U, ActiveThreads::_nthreads);
        for (const pthread_key_t key : keys) {
            ::pthread_key_delete(key);
        }
        runWorker("Next", [] { EXPECT_STREQ("Next", Thread::currentName()); });
    };
    EXPECT_EQ(pthreadFailure("pthread_key_create", EAGAIN) + "\n" + NOT_REGISTERED,
              atLevel("WARN", start));
    EXPECT_EQ(NOT_REGISTERED, atLevel("ERROR", start));
    EXPECT_EQ("", atLevel("CRIT", start));
}

TEST(ActiveThreadsTest, PassesOnAValueThatCannotBeStored) {
    const ChildRun run = inChild([] {
        ActiveThreads::add(&mainThread());
        ActiveThreads::_ptrs->release();
        breakKey(ActiveThreads::_ptrs->_impl);
        EXPECT_EQ(pthreadFailure("pthread_setspecific", EINVAL),
                  thrownBy([] { ActiveThreads::add(&mainThread()); }));
    });
    EXPECT_EQ(0, run.status);
}

TEST(ActiveThreadsTest, TerminatesWhenAWorkerCannotRegisterOrUnregister) {
    const struct {
        const char* function;
        void (*act)(Worker& worker);
    } rows[] = {
        {"pthread_mutex_lock", [](Worker&) { waitUntil([] { return false; }); }},
        {"pthread_key_delete",
         [](Worker& worker) {
             worker.go();
             worker.join();
         }},
    };
    for (const auto& row : rows) {
        EXPECT_EXIT(
            {
                ScriptedCalls calls(row.function);
                calls.give(EINVAL);
                Worker worker("Sorter", [] {});
                row.act(worker);
            },
            testing::KilledBySignal(SIGABRT),
            testing::StartsWith(pthreadFailure(row.function, EINVAL) + "\n"));
    }
}

// The logger is destroyed after the locks, so it still reports the failure.
TEST(ThreadTest, DestroysItsTwoLocksAtExit) {
    for (const unsigned before : {0U, 1U}) {
        EXPECT_EXIT(
            {
                static auto* const destroys = new ScriptedCalls("pthread_mutex_destroy");
                destroys->pass(before).give(EBUSY);
                std::exit(0);
            },
            testing::KilledBySignal(SIGABRT),
            testing::HasSubstr(pthreadFailure("pthread_mutex_destroy", EBUSY)));
    }
}

}  // namespace
