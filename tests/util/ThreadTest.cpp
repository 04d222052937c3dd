#include "util/Thread.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <csignal>
#include <cstring>
#include <string>
#include <thread>
#include <type_traits>

#include "support/InChild.h"
#include "support/ScriptedPthread.h"
#include "support/Workers.h"

namespace {

static_assert(std::has_virtual_destructor_v<Thread>);
static_assert(std::has_virtual_destructor_v<InThreadActor>);
static_assert(std::is_base_of_v<InThreadActor, Thread::JoinHelper>);
static_assert(!std::is_copy_constructible_v<Thread> && !std::is_copy_assignable_v<Thread>);

const auto ABORTED = testing::KilledBySignal(SIGABRT);
const std::string SOURCE = "src/util/Thread.cpp";

class NullActor : public InThreadActor {
public:
    void callback() override {}
};

TEST(ThreadTest, MainThreadIsRunningAndJoined) {
    const Thread& main = mainThread();
    EXPECT_STREQ("Main Thread", main.name());
    EXPECT_TRUE(main.isCurrent());
    EXPECT_TRUE(main._did_join);
    EXPECT_TRUE(main._ready_to_run);
    EXPECT_EQ(&main, main._jhelp._thr);
}

// Deliberate: the main thread has an object, but no entry in the registry.
TEST(ThreadTest, ThreadNotCreatedByThreadIsNamedMainThread) {
    mainThread();
    EXPECT_EQ(nullptr, Thread::current());
    EXPECT_STREQ("Main Thread", Thread::currentName());
    EXPECT_EQ(nullptr, onForeignThread([] { return Thread::current(); }));
    EXPECT_EQ("Main Thread", onForeignThread([] { return std::string(Thread::currentName()); }));
}

TEST(ThreadTest, WorkerFindsItself) {
    const char* const name = "Sorter";
    Thread* found = nullptr;
    std::string foundName;
    bool onlyItself = false;
    Worker idle("Idle", [] {});
    Worker worker(name, [&] {
        found = Thread::current();
        foundName = Thread::currentName();
        onlyItself = found->isCurrent() && !idle.isCurrent() && !mainThread().isCurrent() &&
                     *found == *found && !(*found != *found) && *found != idle && !(*found == idle);
    });
    EXPECT_EQ(static_cast<const void*>(name), worker.name());
    EXPECT_FALSE(worker.isCurrent());
    worker.go();
    worker.join();
    idle.go();
    idle.join();
    EXPECT_EQ(&worker, found);
    EXPECT_EQ("Sorter", foundName);
    EXPECT_TRUE(onlyItself);
}

TEST(ThreadTest, WorkerWaitsForGoHoweverOftenItIsWoken) {
    ScriptedCalls waits("pthread_cond_wait");
    std::atomic<bool> ran{false};
    Worker worker("Sorter", [&] { ran = true; });
    waitUntil([&] {
        worker._ready_to_run_cond.wake_all();
        return waits.calls() > 1 || ran;
    });
    EXPECT_FALSE(ran);
    EXPECT_FALSE(worker._ready_to_run);
    worker.go();
    EXPECT_TRUE(worker._ready_to_run);
    EXPECT_FALSE(worker._did_join);
    worker.join();
    EXPECT_TRUE(worker._did_join);
    EXPECT_TRUE(ran);
}

TEST(ThreadTest, WorkerRunsOnceIfGoComesBeforeItsWait) {
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

TEST(ThreadTest, GoWakesBeforeItUnlocks) {
    static std::string calls;
    calls.clear();
    Worker worker("Sorter", [] {});
    onPthreadCall = [](const char* function) {
        if (::gettid() == ::getpid()) {
            calls += std::string(function) + '\n';
        }
    };
    worker.go();
    onPthreadCall = nullptr;
    worker.join();
    EXPECT_EQ("pthread_mutex_lock\npthread_cond_broadcast\npthread_mutex_unlock\n", calls);
}

TEST(ThreadTest, FindingTheCurrentThreadTakesNoLock) {
    runWorker("Sorter", [] {
        ScriptedCalls locks("pthread_mutex_lock");
        ScriptedCalls tries("pthread_mutex_trylock");
        EXPECT_STREQ("Sorter", Thread::currentName());
        EXPECT_NE(nullptr, Thread::current());
        EXPECT_EQ(0U, locks.calls() + tries.calls());
    });
}

TEST(ThreadTest, WorkersGetAStackOfOneMebibyte) {
    static_assert(Thread::s_stackSize == 1048576);
    runWorker("Sorter", [] {});
    EXPECT_EQ(1048576U, seenByPthread.stackSize);
}

TEST(ThreadTest, StartRoutineReturnsNull) {
    std::string names;
    Worker worker("Sorter", [&] { names += Thread::currentName(); });
    worker.go();
    worker.join();
    // The worker has passed its wait for go(), so the routine runs main() on any thread.
    EXPECT_TRUE(onForeignThread([&] { return Thread::callMain(&worker) == nullptr; }));
    EXPECT_EQ("SorterSorter", names);
}

TEST(ThreadTest, AssertsOnMisuse) {
    const struct {
        const char* expression;
        void (*misuse)();
    } rows[] = {
        {"!_ready_to_run", [] { mainThread().go(); }},
        {"!_did_join", [] { mainThread().join(); }},
        {"!_did_join",
         [] {
             Thread::mainThreadDying();
             mainThread().join();
         }},
        {"!_ready_to_run",
         [] {
             Worker worker("Sorter", [] {});
             worker.go();
             worker.go();
         }},
        {"!_did_join",
         [] {
             Worker worker("Sorter", [] {});
             worker.go();
             worker.join();
             worker.join();
         }},
        {"_did_join || !checkThreadErrors", [] { const Worker worker("Sorter", [] {}); }},
        {"_did_join || !checkThreadErrors",
         [] {
             std::atomic<bool> running{false};
             Worker worker("Sorter", [&] { running = true; });
             worker.go();
             waitUntil([&] { return running.load(); });
         }},
    };
    for (const auto& row : rows) {
        EXPECT_EXIT(row.misuse(), ABORTED, failedAssertion(SOURCE, row.expression)) << &row - rows;
    }
}

TEST(ThreadTest, DyingMainThreadDestroysWorkersThatNeverStarted) {
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
        }
        waitUntil([] { return registeredWorkers() == 0; });
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(ThreadTest, TheDestructorWaitsUntilAWorkerThatNeverStartedIsDoneWithTheObject) {
    static std::atomic<bool> destroyed{false};
    static std::atomic<bool> woken{false};
    const ChildRun run = inChild([] {
        mainThread();
        {
            const Worker worker("Sorter", [] {});
            Thread::mainThreadDying();
            onPthreadCall = [](const char* function) {
                // The worker's answer to the destructor is its only broadcast.
                if (Thread::current() != nullptr &&
                    std::strcmp(function, "pthread_cond_broadcast") == 0) {
                    std::this_thread::sleep_for(std::chrono::milliseconds(50));
                    EXPECT_FALSE(destroyed);
                    woken = true;
                }
            };
        }
        destroyed = true;
        waitUntil([] { return woken.load(); });
        waitUntil([] { return registeredWorkers() == 0; });
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(ThreadTest, DyingMainThreadDestroysTheObjectOfARunningWorker) {
    // State that outlives the object, as the thread does.
    static std::atomic<bool> running{false};
    static std::atomic<bool> destroyed{false};
    static std::atomic<bool> named{false};
    class Runner : public Thread {
    public:
        Runner() : Thread((mainThread(), "Runner")) {}
        void main() override {
            running = true;
            waitUntil([] { return destroyed.load(); });
            named = std::string("Runner") == Thread::currentName();
            running = false;
        }
    };
    const ChildRun run = inChild([] {
        auto* const runner = new Runner;
        runner->go();
        waitUntil([] { return running.load(); });
        Thread::mainThreadDying();
        delete runner;
        destroyed = true;
        waitUntil([] { return !running; });
        EXPECT_TRUE(named);
        waitUntil([] { return registeredWorkers() == 0; });
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(JoinHelperTest, JoinsAndDeletesItsThread) {
    static bool deleted;
    class Mortal : public Worker {
    public:
        explicit Mortal(bool& ran) : Worker("Mortal", [&ran] { ran = true; }) {}
        ~Mortal() override { deleted = true; }
    };
    for (const bool onAnotherThread : {false, true}) {
        bool ran = false;
        deleted = false;
        auto* const mortal = new Mortal(ran);
        InThreadActor* const actor = mortal->joinHelper();
        mortal->go();
        EXPECT_FALSE(deleted);
        if (onAnotherThread) {
            runWorker("Loop", [&] { actor->callback(); });
        } else {
            actor->callback();
        }
        EXPECT_TRUE(ran);
        EXPECT_TRUE(deleted);
    }
}

TEST(InThreadActorTest, IsNotPendingAtFirst) {
    const NullActor actor;
    EXPECT_FALSE(actor._wantWake);
    EXPECT_FALSE(actor._ran);
    EXPECT_EQ(nullptr, actor._next);
}

}  // namespace
