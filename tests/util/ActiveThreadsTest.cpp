#include <gtest/gtest.h>

#include <atomic>
#include <csignal>
#include <cstdint>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "support/ScriptedPthread.h"
#include "support/Workers.h"
#include "util/Thread.h"

namespace {

void expectNoRegistry() {
    EXPECT_EQ(0U, ActiveThreads::_nthreads);
    EXPECT_EQ(nullptr, ActiveThreads::_ptrs);
    EXPECT_TRUE(isFree(ActiveThreads::_mutex));
}

TEST(ActiveThreadsTest, ExistsWhileAnyWorkerRuns) {
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
    second.leave();
    expectNoRegistry();

    std::string name;
    runWorker("Again", [&] { name = Thread::currentName(); });
    EXPECT_EQ("Again", name);
    expectNoRegistry();
}

TEST(ActiveThreadsTest, HoldsWorkersThatHaveNotStartedYet) {
    ScriptedCalls waits("pthread_cond_wait");
    Worker worker("Sorter", [] {});
    waitUntil([&] { return waits.calls() > 0; });
    EXPECT_EQ(1U, registeredWorkers());
    worker.go();
    worker.join();
    expectNoRegistry();
}

// Workers end while others start, on four threads; a fifth thread is not registered.
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
                runWorker("Brief", [] {
                    EXPECT_NE(nullptr, Thread::current());
                    EXPECT_STREQ("Brief", Thread::currentName());
                });
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

TEST(ActiveThreadsTest, IsNotReadByAThreadThatIsNotRegistered) {
    // Reading this registry crashes.
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

// Deliberate: the deletion comes after the unlock.
TEST(ActiveThreadsTest, IsUnlockedWhenItsKeyIsDeleted) {
    static std::atomic<bool> asExpected;
    asExpected = false;
    onPthreadCall = [](const char* function) {
        if (std::string("pthread_key_delete") == function) {
            asExpected = ActiveThreads::_nthreads == 0 && ActiveThreads::_mutex.tryLock() &&
                         ActiveThreads::_mutex.NOLOG_unlock() == 0;
        }
    };
    runWorker("Sorter", [] {});
    onPthreadCall = nullptr;
    EXPECT_TRUE(asExpected);
}

// Cleanup functions run in the order in which their keys were created.
TEST(ActiveThreadsTest, KeepsTheNameOfAWorkerUntilItUnregisters) {
    static std::string names;
    names.clear();
    const auto addName = [](void*) { names += std::string(Thread::currentName()) + '\n'; };
    int value = 0;
    ThreadSpecificPointer<int> earlier(addName);
    std::unique_ptr<ThreadSpecificPointer<int>> later;
    runWorker("Sorter", [&] {
        earlier.set(&value);
        later = std::make_unique<ThreadSpecificPointer<int>>(addName);
        later->set(&value);
    });
    EXPECT_EQ("Sorter\nMain Thread\n", names);
}

TEST(ActiveThreadsTest, AssertsOnMisuse) {
    const struct {
        const char* expression;
        void (*misuse)();
    } rows[] = {
        {"_ptrs->get() == NULL",
         [] {
             ActiveThreads::add(&mainThread());
             ActiveThreads::add(&mainThread());
         }},
        {"_ptrs != NULL", [] { ActiveThreads::remove(nullptr); }},
        {"_ptrs == NULL",
         [] {
             ActiveThreads::_ptrs = new ThreadSpecificPointer<Thread>(nullptr);
             ActiveThreads::add(&mainThread());
         }},
    };
    for (const auto& row : rows) {
        EXPECT_EXIT(row.misuse(), testing::KilledBySignal(SIGABRT),
                    failedAssertion("src/util/Thread.cpp", row.expression));
    }
}

}  // namespace
