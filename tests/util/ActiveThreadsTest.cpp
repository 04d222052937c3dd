#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstdint>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "support/AllocationProbe.h"
#include "support/InChild.h"
#include "support/ScriptedPthread.h"
#include "support/Workers.h"
#include "util/Logger.h"
#include "util/Thread.h"

namespace {

const std::string NOT_REGISTERED =
    "Could not construct ThreadSpecificPointer<Thread> in ActiveThreads::add\n";

bool registryIsFree() {
    return onForeignThread([] {
        return ActiveThreads::_mutex.tryLock() && ActiveThreads::_mutex.NOLOG_unlock() == 0;
    });
}

void expectNoRegistry() {
    EXPECT_EQ(0U, ActiveThreads::_nthreads);
    EXPECT_EQ(nullptr, ActiveThreads::_ptrs);
    EXPECT_TRUE(registryIsFree());
}

// A worker that stays in main() until it is let go.
class Resident {
public:
    explicit Resident(const char* name)
        : _worker(name, [this] {
              _running = true;
              while (!_leave) {
                  std::this_thread::yield();
              }
          }) {
        _worker.go();
        while (!_running) {
            std::this_thread::yield();
        }
    }
    void leave() {
        _leave = true;
        _worker.join();
    }

private:
    std::atomic<bool> _running{false};
    std::atomic<bool> _leave{false};
    Worker _worker;
};

TEST(ActiveThreadsTest, ExistsWhileAnyWorkerRuns) {
    ScriptedCalls creations("pthread_key_create");
    ScriptedCalls deletions("pthread_key_delete");
    expectNoRegistry();
    Resident first("First");
    EXPECT_EQ(1U, ActiveThreads::_nthreads);
    const auto* const registry = ActiveThreads::_ptrs;
    EXPECT_NE(nullptr, registry);
    Resident second("Second");
    EXPECT_EQ(2U, ActiveThreads::_nthreads);
    first.leave();
    EXPECT_EQ(1U, ActiveThreads::_nthreads);
    EXPECT_EQ(registry, ActiveThreads::_ptrs);
    EXPECT_EQ(0U, deletions.calls());
    second.leave();
    expectNoRegistry();
    EXPECT_EQ(1U, creations.calls());
    EXPECT_EQ(1U, deletions.calls());
}

TEST(ActiveThreadsTest, IsBuiltAgainAfterItsLastWorker) {
    ScriptedCalls creations("pthread_key_create");
    for (unsigned round = 1; round <= 20; ++round) {
        std::string name;
        runWorker("Again", [&] { name = Thread::currentName(); });
        EXPECT_EQ("Again", name);
        expectNoRegistry();
        EXPECT_EQ(round, creations.calls());
    }
}

TEST(ActiveThreadsTest, HoldsWorkersThatHaveNotRunYet) {
    ScriptedCalls waits("pthread_cond_wait");
    Worker worker("Sorter", [] {});
    while (waits.calls() == 0) {
        std::this_thread::yield();
    }
    EXPECT_EQ(1U, ActiveThreads::_nthreads);
    worker.go();
    worker.join();
    expectNoRegistry();
}

// Workers that end while others start, on four threads, and threads that are none of them.
TEST(ActiveThreadsTest, WithstandsWorkersThatEndWhileOthersStart) {
    mainThread();
    std::atomic<bool> over{false};
    std::thread stranger([&] {
        while (!over) {
            EXPECT_STREQ("Main Thread", Thread::currentName());
            EXPECT_EQ(nullptr, Thread::current());
        }
    });
    std::vector<std::thread> starters;
    for (int i = 0; i < 4; ++i) {
        starters.emplace_back([] {
            for (int round = 0; round < 250; ++round) {
                std::unique_ptr<Worker> worker;
                Worker* self = nullptr;
                worker = std::make_unique<Worker>("Brief", [&self] {
                    EXPECT_EQ(self, Thread::current());
                    EXPECT_STREQ("Brief", Thread::currentName());
                });
                self = worker.get();
                worker->go();
                worker->join();
            }
        });
    }
    for (std::thread& starter : starters) {
        starter.join();
    }
    over = true;
    stranger.join();
    expectNoRegistry();
}

TEST(ActiveThreadsTest, IsNotReadByAThreadThatNeverRegistered) {
    // A registry that cannot be read: whoever tries, crashes.
    ActiveThreads::_ptrs =
        reinterpret_cast<ThreadSpecificPointer<Thread>*>(static_cast<std::uintptr_t>(8));
    EXPECT_EQ(nullptr, Thread::current());
    EXPECT_STREQ("Main Thread", Thread::currentName());
    ActiveThreads::_ptrs = nullptr;
}

TEST(ActiveThreadsTest, AddAndRemoveWorkOnTheCallingThread) {
    Worker worker("Sorter", [] {});
    Resident resident("Resident");
    ActiveThreads::add(&worker);
    EXPECT_EQ(&worker, Thread::current());
    EXPECT_STREQ("Sorter", Thread::currentName());
    EXPECT_EQ(&worker, ActiveThreads::_ptrs->release());
    const unsigned before = ActiveThreads::_nthreads;
    ActiveThreads::remove(&worker);
    EXPECT_EQ(before - 1, ActiveThreads::_nthreads);
    EXPECT_EQ(nullptr, Thread::current());
    EXPECT_STREQ("Main Thread", Thread::currentName());
    resident.leave();
    worker.go();
    worker.join();
    expectNoRegistry();
}

TEST(ActiveThreadsTest, IsGoneAndUnlockedWhenItsKeyIsDeleted) {
    static std::atomic<bool> asExpected;
    asExpected = false;
    onKeyDelete = [] {
        asExpected = ActiveThreads::_ptrs == nullptr && ActiveThreads::_nthreads == 0 &&
                     ActiveThreads::_mutex.tryLock() && ActiveThreads::_mutex.NOLOG_unlock() == 0;
    };
    runWorker("Sorter", [] {});
    onKeyDelete = nullptr;
    EXPECT_TRUE(asExpected);
}

TEST(ActiveThreadsTest, LeavesAWorkerItsNameUntilItEnds) {
    static std::string nameAtCleanup;
    nameAtCleanup.clear();
    // Made first, so that its cleanup runs before that of the registry.
    ThreadSpecificPointer<int> earlier([](void*) { nameAtCleanup = Thread::currentName(); });
    int value = 0;
    runWorker("Sorter", [&] { earlier.set(&value); });
    EXPECT_EQ("Sorter", nameAtCleanup);
}

TEST(ActiveThreadsTest, IsNotAskedAfterAWorkerLeftIt) {
    static std::string nameAtCleanup;
    static Thread* threadAtCleanup;
    nameAtCleanup.clear();
    std::unique_ptr<ThreadSpecificPointer<int>> later;
    int value = 0;
    runWorker("Sorter", [&] {
        threadAtCleanup = Thread::current();
        later = std::make_unique<ThreadSpecificPointer<int>>([](void*) {
            nameAtCleanup = Thread::currentName();
            threadAtCleanup = Thread::current();
        });
        later->set(&value);
    });
    EXPECT_EQ("Main Thread", nameAtCleanup);
    EXPECT_EQ(nullptr, threadAtCleanup);
}

// Each failure inside add(), at the first call of the function.
struct FailedAdd {
    const char* function;
    int error;
    const char* errorText;
};
const FailedAdd FAILED_ADDS[] = {
    {"pthread_mutex_lock", EINVAL, "Invalid argument"},
    {"pthread_key_create", EAGAIN, "Resource temporarily unavailable"},
    {"pthread_mutex_unlock", EPERM, "Operation not permitted"},
    {"pthread_setspecific", ENOMEM, "Cannot allocate memory"},
};

TEST(ActiveThreadsTest, LeavesAWorkerUnregisteredWhenItCannotBeAdded) {
    mainThread();
    for (const FailedAdd& failure : FAILED_ADDS) {
        SCOPED_TRACE(failure.function);
        const StderrCapture err;
        std::string name;
        const Thread* current = &mainThread();
        {
            ScriptedCalls waits("pthread_cond_wait");
            ScriptedCalls calls(failure.function);
            calls.give(failure.error);
            Worker worker("Sorter", [&] {
                name = Thread::currentName();
                current = Thread::current();
            });
            while (waits.calls() == 0) {
                std::this_thread::yield();
            }
            expectNoRegistry();
            worker.go();
            worker.join();
        }
        EXPECT_EQ("Main Thread", name);
        EXPECT_EQ(nullptr, current);
        expectNoRegistry();
        EXPECT_EQ(pthreadFailure(failure.function, failure.errorText) + "\n" + NOT_REGISTERED,
                  err.text());
    }
    // The next one is registered again.
    std::string name;
    runWorker("Next", [&] { name = Thread::currentName(); });
    EXPECT_EQ("Next", name);
}

TEST(ActiveThreadsTest, SaysThatItHasNoMemoryForItself) {
    REQUIRE_ALLOCATION_PROBE();
    mainThread();
    const StderrCapture err;
    {
        const AllocationProbe probe(1);
        ActiveThreads::add(&mainThread());
    }
    EXPECT_EQ(nullptr, Thread::current());
    expectNoRegistry();
    EXPECT_EQ(NOT_REGISTERED, err.text());
}

TEST(ActiveThreadsTest, ReportsAWorkerThatCannotBeAddedAsAnErrorOfTheLoggerNamedThread) {
    for (const bool shown : {true, false}) {
        const ChildRun run = inChild([&] {
            Logger::setChannelLevel(nullptr, shown ? "FATAL" : "DEBUG");
            Logger::setChannelLevel("Thread", shown ? "ERROR" : "CRIT");
            Logger::initialize();
            ScriptedCalls creations("pthread_key_create");
            creations.give(EAGAIN);
            ActiveThreads::add(&mainThread());
        });
        EXPECT_EQ(0, run.status);
        EXPECT_EQ(shown ? NOT_REGISTERED : "", run.err);
    }
}

TEST(ActiveThreadsTest, KeepsTheOthersWhenAWorkerCannotBeAdded) {
    Resident resident("Resident");
    const auto* const registry = ActiveThreads::_ptrs;
    for (const FailedAdd& failure : FAILED_ADDS) {
        if (std::string("pthread_key_create") == failure.function) {
            continue;
        }
        SCOPED_TRACE(failure.function);
        const StderrCapture err;
        ScriptedCalls calls(failure.function);
        calls.give(failure.error);
        ActiveThreads::add(&mainThread());
        EXPECT_EQ(1U, ActiveThreads::_nthreads);
        EXPECT_EQ(registry, ActiveThreads::_ptrs);
        EXPECT_EQ(nullptr, Thread::current());
        EXPECT_TRUE(registryIsFree());
        EXPECT_EQ(pthreadFailure(failure.function, failure.errorText) + "\n" + NOT_REGISTERED,
                  err.text());
    }
    resident.leave();
    expectNoRegistry();
}

TEST(ActiveThreadsTest, IsSilentAboutAWorkerThatCannotBeAddedWhileDying) {
    const ChildRun run = inChild([] {
        Thread::mainThreadDying();
        for (const char* const function : {"pthread_key_create", "pthread_setspecific"}) {
            SCOPED_TRACE(function);
            ScriptedCalls calls(function);
            calls.give(EAGAIN);
            std::string name;
            runWorker("Sorter", [&] { name = Thread::currentName(); });
            EXPECT_EQ("Main Thread", name);
            expectNoRegistry();
        }
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(ActiveThreadsTest, ReportsAKeyThatCannotBeDeleted) {
    ActiveThreads::add(&mainThread());
    ActiveThreads::_ptrs->release();
    expectFailure("pthread_key_delete", EINVAL,
                  pthreadFailure("pthread_key_delete", "Invalid argument"),
                  [] { ActiveThreads::remove(nullptr); });
    expectNoRegistry();
}

// A thread that ends has nobody who could catch the exception.
TEST(ActiveThreadsTest, TerminatesWhenTheKeyCannotBeDeletedAtTheEndOfAThread) {
    EXPECT_EXIT(
        {
            ScriptedCalls deletions("pthread_key_delete");
            deletions.give(EINVAL);
            runWorker("Sorter", [] {});
        },
        testing::KilledBySignal(SIGABRT),
        testing::HasSubstr(pthreadFailure("pthread_key_delete", "Invalid argument") + "\n"));
}

TEST(ActiveThreadsTest, AssertsOnASecondAdd) {
    EXPECT_EXIT(
        {
            ActiveThreads::add(&mainThread());
            ActiveThreads::add(&mainThread());
        },
        testing::KilledBySignal(SIGABRT),
        failedAssertion("src/util/Thread.cpp", "_ptrs->get() == NULL"));
}

TEST(ActiveThreadsTest, AssertsOnRemoveWithoutRegistry) {
    EXPECT_EXIT(ActiveThreads::remove(nullptr), testing::KilledBySignal(SIGABRT),
                failedAssertion("src/util/Thread.cpp", "_ptrs != NULL"));
}

TEST(ActiveThreadsTest, AssertsOnARegistryThatNobodyIsIn) {
    EXPECT_EXIT(
        {
            ActiveThreads::_ptrs = new ThreadSpecificPointer<Thread>(nullptr);
            ActiveThreads::add(&mainThread());
        },
        testing::KilledBySignal(SIGABRT), failedAssertion("src/util/Thread.cpp", "_ptrs == NULL"));
}

}  // namespace
