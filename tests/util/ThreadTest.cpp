#include "util/Thread.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <string>
#include <thread>
#include <type_traits>
#include <vector>

#include "support/FieldOrder.h"
#include "support/InChild.h"
#include "support/ScriptedPthread.h"
#include "support/Workers.h"

namespace {

static_assert(std::is_polymorphic_v<Thread> && std::is_polymorphic_v<InThreadActor>);
static_assert(std::has_virtual_destructor_v<Thread>);
static_assert(std::has_virtual_destructor_v<InThreadActor>);
static_assert(std::is_base_of_v<InThreadActor, Thread::JoinHelper>);
static_assert(!std::is_copy_constructible_v<Thread> && !std::is_copy_assignable_v<Thread>);
static_assert(Thread::s_stackSize == 1048576);
static_assert(std::is_same_v<decltype(&Thread::callMain), void* (*)(void*)>);
static_assert(std::is_same_v<decltype(&Thread::current), Thread* (*)()>);
static_assert(std::is_same_v<decltype(&Thread::currentName), const char* (*)()>);
static_assert(std::is_same_v<decltype(&Thread::mainThreadDying), void (*)()>);
static_assert(std::is_same_v<decltype(&Thread::name), const char* (Thread::*)() const>);
static_assert(std::is_same_v<decltype(&Thread::isCurrent), bool (Thread::*)() const>);
static_assert(std::is_same_v<decltype(&ActiveThreads::add), void (*)(Thread*)>);
static_assert(std::is_same_v<decltype(&ActiveThreads::remove), void (*)(void*)>);

// Tells when it is deleted.
class Mortal : public Worker {
public:
    Mortal(bool& deleted, std::function<void()> body)
        : Worker("Mortal", std::move(body)), _deleted(deleted) {}
    ~Mortal() override { _deleted = true; }

private:
    bool& _deleted;
};

class NullActor : public InThreadActor {
public:
    void callback() override {}
};

TEST(ThreadTest, OfTheMainThreadIsRunningAndJoined) {
    const Thread& main = mainThread();
    EXPECT_STREQ("Main Thread", main.name());
    EXPECT_TRUE(main._token == PthreadToken::self());
    EXPECT_TRUE(main.isCurrent());
    EXPECT_TRUE(main._did_join);
    EXPECT_TRUE(main._ready_to_run);
    EXPECT_EQ(&main, main._jhelp._thr);
}

TEST(ThreadTest, OfTheMainThreadIsNotRegistered) {
    mainThread();
    EXPECT_EQ(nullptr, Thread::current());
    EXPECT_STREQ("Main Thread", Thread::currentName());
    EXPECT_EQ(0U, ActiveThreads::_nthreads);
    EXPECT_EQ(nullptr, ActiveThreads::_ptrs);
}

TEST(ThreadTest, OfTheMainThreadCanNeitherGoNorBeJoined) {
    EXPECT_EXIT(mainThread().go(), testing::KilledBySignal(SIGABRT),
                failedAssertion("src/util/Thread.cpp", "!_ready_to_run"));
    EXPECT_EXIT(mainThread().join(), testing::KilledBySignal(SIGABRT),
                failedAssertion("src/util/Thread.cpp", "!_did_join"));
}

TEST(ThreadTest, WorkerIsNeitherRunningNorJoinedAtFirst) {
    const char* const name = "Sorter";
    bool ran = false;
    Worker worker(name, [&] { ran = true; });
    EXPECT_EQ(static_cast<const void*>(name), worker.name());
    EXPECT_FALSE(worker._did_join);
    EXPECT_FALSE(worker._ready_to_run);
    EXPECT_EQ(&worker, worker._jhelp._thr);
    EXPECT_FALSE(worker.isCurrent());
    worker.go();
    EXPECT_TRUE(worker._ready_to_run);
    worker.join();
    EXPECT_TRUE(worker._did_join);
    EXPECT_TRUE(ran);
}

TEST(ThreadTest, WorkerRunsOnlyAfterGo) {
    ScriptedCalls waits("pthread_cond_wait");
    std::atomic<bool> ran{false};
    Worker worker("Sorter", [&] { ran = true; });
    while (waits.calls() == 0) {
        std::this_thread::yield();
    }
    EXPECT_FALSE(ran);
    worker.go();
    worker.join();
    EXPECT_TRUE(ran);
}

TEST(ThreadTest, WorkerKeepsWaitingWhenItIsWokenWithoutGo) {
    ScriptedCalls waits("pthread_cond_wait");
    std::atomic<bool> ran{false};
    Worker worker("Sorter", [&] { ran = true; });
    while (waits.calls() == 0) {
        std::this_thread::yield();
    }
    while (waits.calls() == 1 && !ran) {
        worker._ready_to_run_cond.wake_all();
        std::this_thread::yield();
    }
    EXPECT_FALSE(ran);
    worker.go();
    worker.join();
    EXPECT_TRUE(ran);
}

TEST(ThreadTest, WorkerRunsOnceHoweverTheStartIsRaced) {
    for (int round = 0; round < 1000; ++round) {
        int runs = 0;
        Worker worker("Racer", [&] { ++runs; });
        for (int pause = round % 4; pause > 0; --pause) {
            std::this_thread::yield();
        }
        worker.go();
        worker.join();
        ASSERT_EQ(1, runs) << round;
    }
}

TEST(ThreadTest, WorkerFindsItself) {
    Thread* found = nullptr;
    std::string name;
    bool current = false;
    bool same = false;
    bool other = true;
    bool main = true;
    Worker idle("Idle", [] {});
    Worker worker("Sorter", [&] {
        found = Thread::current();
        name = Thread::currentName();
        current = found->isCurrent();
        same = *found == *found && !(*found != *found);
        other = *found == idle || !(*found != idle) || idle.isCurrent();
        main = mainThread().isCurrent();
    });
    worker.go();
    worker.join();
    idle.go();
    idle.join();
    EXPECT_EQ(&worker, found);
    EXPECT_EQ("Sorter", name);
    EXPECT_TRUE(current);
    EXPECT_TRUE(same);
    EXPECT_FALSE(other);
    EXPECT_FALSE(main);
}

TEST(ThreadTest, ThreadThatNoThreadStandsForIsTheMainThreadByName) {
    EXPECT_EQ("Main Thread", onForeignThread([] { return std::string(Thread::currentName()); }));
    EXPECT_EQ(nullptr, onForeignThread([] { return Thread::current(); }));
}

TEST(ThreadTest, CurrentNameTakesNoLock) {
    runWorker("Sorter", [] {
        ScriptedCalls locks("pthread_mutex_lock");
        ScriptedCalls tries("pthread_mutex_trylock");
        EXPECT_STREQ("Sorter", Thread::currentName());
        EXPECT_NE(nullptr, Thread::current());
        EXPECT_EQ(0U, locks.calls() + tries.calls());
    });
    ScriptedCalls locks("pthread_mutex_lock");
    EXPECT_STREQ("Main Thread", Thread::currentName());
    EXPECT_EQ(0U, locks.calls());
}

TEST(ThreadTest, WorkersGetAStackOfOneMebibyte) {
    mainThread();
    Worker worker("Sorter", [] {});
    EXPECT_NE(nullptr, seenByPthread.attributes);
    EXPECT_EQ(1048576U, seenByPthread.stackSize);
    worker.go();
    worker.join();
}

TEST(ThreadTest, KeepsItsFieldsInOrder) {
    const Thread& main = mainThread();
    EXPECT_TRUE(standInOrder({&main._token, &main._name, &main._did_join, &main._ready_to_run,
                              &main._ready_to_run_cond, &main._jhelp}));
}

TEST(ThreadTest, StartRoutineRunsTheBodyAsThatThreadAndReturnsNull) {
    std::vector<std::string> names;
    Worker worker("Sorter", [&] { names.emplace_back(Thread::currentName()); });
    worker.go();
    worker.join();
    // The handshake is over, so whoever calls the routine now goes through at once.
    EXPECT_TRUE(onForeignThread(
        [&] { return Thread::callMain(&worker) == nullptr && Thread::current() == &worker; }));
    EXPECT_EQ((std::vector<std::string>{"Sorter", "Sorter"}), names);
    EXPECT_EQ(0U, ActiveThreads::_nthreads);
}

TEST(ThreadTest, WithoutABodyOfItsOwnRunsNone) {
    mainThread();
    Thread thread("Plain");
    thread.go();
    thread.join();
}

TEST(ThreadTest, AssertsOnASecondGo) {
    EXPECT_EXIT(
        {
            Worker worker("Sorter", [] {});
            worker.go();
            worker.go();
        },
        testing::KilledBySignal(SIGABRT), failedAssertion("src/util/Thread.cpp", "!_ready_to_run"));
}

TEST(ThreadTest, AssertsOnASecondJoin) {
    EXPECT_EXIT(
        {
            Worker worker("Sorter", [] {});
            worker.go();
            worker.join();
            worker.join();
        },
        testing::KilledBySignal(SIGABRT), failedAssertion("src/util/Thread.cpp", "!_did_join"));
}

TEST(ThreadTest, AssertsOnDestructionBeforeJoin) {
    EXPECT_EXIT({ const Worker worker("Sorter", [] {}); }, testing::KilledBySignal(SIGABRT),
                failedAssertion("src/util/Thread.cpp", "_did_join || !checkThreadErrors"));
    EXPECT_EXIT(
        {
            std::atomic<bool> running{false};
            Worker worker("Sorter", [&] { running = true; });
            worker.go();
            while (!running) {
                std::this_thread::yield();
            }
        },
        testing::KilledBySignal(SIGABRT),
        failedAssertion("src/util/Thread.cpp", "_did_join || !checkThreadErrors"));
}

TEST(ThreadTest, IsNotMadeWhenItsThreadCannotBeCreated) {
    mainThread();
    bool ran = false;
    expectFailure("pthread_create", EAGAIN,
                  pthreadFailure("pthread_create", "Resource temporarily unavailable"),
                  [&] { const Worker worker("Sorter", [&] { ran = true; }); });
    EXPECT_FALSE(ran);
    EXPECT_EQ(0U, ActiveThreads::_nthreads);
}

TEST(ThreadTest, CanGoAgainWhenTheWakeFailed) {
    ScriptedCalls waits("pthread_cond_wait");
    int runs = 0;
    Worker worker("Sorter", [&] { ++runs; });
    while (waits.calls() == 0) {
        std::this_thread::yield();
    }
    expectFailure("pthread_cond_broadcast", EINVAL,
                  pthreadFailure("pthread_cond_broadcast", "Invalid argument"),
                  [&] { worker.go(); });
    EXPECT_FALSE(worker._ready_to_run);
    worker.go();
    worker.join();
    EXPECT_EQ(1, runs);
}

// Deliberate: a join that failed counts as done, so the object can be destroyed.
TEST(ThreadTest, CountsAsJoinedWhenTheJoinFailed) {
    auto* const worker = new Worker("Sorter", [] {});
    const pthread_t token = worker->_token._token;
    worker->go();
    expectFailure("pthread_join", EDEADLK,
                  pthreadFailure("pthread_join", "Resource deadlock avoided"),
                  [&] { worker->join(); });
    EXPECT_TRUE(worker->_did_join);
    EXPECT_EQ(0, ::pthread_join(token, nullptr));
    EXPECT_NO_THROW(delete worker);
}

TEST(ThreadTest, DestructionReportsAConditionThatCannotBeDestroyed) {
    auto* const worker = new Worker("Sorter", [] {});
    worker->go();
    worker->join();
    expectFailure("pthread_cond_destroy", EBUSY,
                  pthreadFailure("pthread_cond_destroy", "Device or resource busy"),
                  [&] { delete worker; });
}

TEST(ThreadTest, DestroysBothItsConditions) {
    mainThread();
    ScriptedCalls inits("pthread_cond_init");
    ScriptedCalls destroys("pthread_cond_destroy");
    runWorker("Sorter", [] {});
    EXPECT_EQ(2U, inits.calls());
    EXPECT_EQ(2U, destroys.calls());
}

TEST(JoinHelperTest, JoinsAndDeletesItsThread) {
    bool ran = false;
    bool deleted = false;
    auto* const mortal = new Mortal(deleted, [&] { ran = true; });
    InThreadActor* const actor = mortal->joinHelper();
    EXPECT_EQ(&mortal->_jhelp, actor);
    mortal->go();
    EXPECT_FALSE(deleted);
    actor->callback();
    EXPECT_TRUE(ran);
    EXPECT_TRUE(deleted);
}

TEST(JoinHelperTest, MayRunOnAnotherThread) {
    bool deleted = false;
    auto* const mortal = new Mortal(deleted, [] {});
    mortal->go();
    runWorker("Loop", [&] { mortal->joinHelper()->callback(); });
    EXPECT_TRUE(deleted);
}

TEST(InThreadActorTest, IsPendingNowhereAtFirst) {
    const NullActor actor;
    EXPECT_FALSE(actor._wantWake);
    EXPECT_FALSE(actor._ran);
    EXPECT_EQ(nullptr, actor._next);
    EXPECT_TRUE(standInOrder({&actor._wantWake, &actor._cond, &actor._ran, &actor._next}));
}

TEST(MainThreadDyingTest, LetsAWorkerThatNeverRanBeDestroyed) {
    const ChildRun run = inChild([] {
        for (int round = 0; round < 50; ++round) {
            bool ran = false;
            {
                Worker worker("Sorter", [&] { ran = true; });
                for (int pause = round % 4; pause > 0; --pause) {
                    std::this_thread::yield();
                }
                Thread::mainThreadDying();
            }
            EXPECT_FALSE(ran);
            EXPECT_EQ(static_cast<unsigned>(round + 1), seenByPthread.detached);
        }
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

// Until then the thread still reads the object that is about to end.
TEST(MainThreadDyingTest, LetsGoOfAThreadOnlyWhenItHasLeftItsStart) {
    const ChildRun run = inChild([] {
        static const Thread* leaving = nullptr;
        static bool left = true;
        onDetach = [] { left = left && leaving->_start == Thread::STARTED; };
        for (int round = 0; round < 50; ++round) {
            const Worker worker("Sorter", [] {});
            leaving = &worker;
            Thread::mainThreadDying();
        }
        onDetach = nullptr;
        EXPECT_EQ(50U, seenByPthread.detached);
        EXPECT_TRUE(left);
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(MainThreadDyingTest, LetsARunningWorkerOutliveItsObject) {
    const ChildRun run = inChild([] {
        std::atomic<bool> running{false};
        std::atomic<bool> destroyed{false};
        std::atomic<bool> done{false};
        std::string name;
        auto body = [&] {
            running = true;
            while (!destroyed) {
                std::this_thread::yield();
            }
            name = Thread::currentName();
            done = true;
        };
        // The body outlives the object; a std::function within it would not.
        class Runner : public Thread {
        public:
            explicit Runner(decltype(body)& run) : Thread("Runner"), _run(run) {}
            void main() override { _run(); }

        private:
            decltype(body)& _run;
        };
        mainThread();
        auto* const runner = new Runner(body);
        runner->go();
        while (!running) {
            std::this_thread::yield();
        }
        Thread::mainThreadDying();
        delete runner;
        destroyed = true;
        while (!done) {
            std::this_thread::yield();
        }
        EXPECT_EQ("Runner", name);
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(MainThreadDyingTest, LetsAThreadThatCouldNotBeCreatedBeJoined) {
    const ChildRun run = inChild([] {
        mainThread();
        Thread::mainThreadDying();
        ScriptedCalls creations("pthread_create");
        creations.give(EAGAIN, 2);
        ScriptedCalls joins("pthread_join");
        {
            Worker worker("Sorter", [] {});
            worker.go();
            worker.join();
        }
        {
            const Worker worker("Sorter", [] {});
        }
        EXPECT_EQ(2U, creations.calls());
        EXPECT_EQ(0U, joins.calls());
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(MainThreadDyingTest, StillJoinsAndStillAssertsOnASecondJoin) {
    const ChildRun run = inChild([] {
        Thread::mainThreadDying();
        bool ran = false;
        runWorker("Sorter", [&] { ran = true; });
        EXPECT_TRUE(ran);
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EXIT(
        {
            Thread::mainThreadDying();
            mainThread().join();
        },
        testing::KilledBySignal(SIGABRT), failedAssertion("src/util/Thread.cpp", "!_did_join"));
}

}  // namespace
