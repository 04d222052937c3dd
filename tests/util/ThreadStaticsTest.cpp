// Locks and threads before main and after it, from a unit that is initialized before the library's
// and destroyed after it.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <string>
#include <thread>
#include <vector>

#include "support/ScriptedPthread.h"
#include "support/Workers.h"
#include "util/internal/LogGlobals.h"
#include "util/Logger.h"
#include "util/Thread.h"

namespace {

constexpr int IN_ORDER = 42;
constexpr int NOT_DESTROYED = 43;
constexpr int OTHERWISE = 44;

const char* const FAILURE = "Main Thread: about to throw a PthreadException: f: Invalid argument";

std::string failure() {
    return thrownBy([] { PthreadObject::checkPtRes("f", EINVAL); });
}

// Decides about the exit status of a child after everything else was destroyed.
struct Judge {
    ~Judge() {
        if (judging) {
            ::_exit(lastWorkerRan && reportsWithoutLogger() ? statusOfLocks() : OTHERWISE);
        }
    }

    int statusOfLocks() const {
        const auto at = [this](const pthread_mutex_t* mutex) {
            return std::find(destroyed.begin(), destroyed.end(), mutex) - destroyed.begin();
        };
        const auto none = static_cast<std::ptrdiff_t>(destroyed.size());
        const auto start = at(startLock);
        const auto registry = at(&ActiveThreads::_mutex._pthread_mutex);
        if (start < registry && registry < none) {
            return IN_ORDER;
        }
        return start == none && registry == none ? NOT_DESTROYED : OTHERWISE;
    }

    // The unit's logger is gone by now.
    bool reportsWithoutLogger() const {
        const StderrCapture err;
        return failure() == lastFailure &&
               err.text() == (lastFailure.empty() ? "" : "WARN - " + lastFailure + "\n");
    }

    bool judging = false;
    bool lastWorkerRan = false;
    std::string lastFailure = FAILURE;
    const pthread_mutex_t* startLock = nullptr;
    std::vector<const pthread_mutex_t*> destroyed;
};
__attribute__((init_priority(102))) Judge judge;

// Uses locks and a worker before the library's statics exist, and a worker after main.
struct Early {
    Early() : firstOfAll(uninitialized_loggers == nullptr), name(Thread::currentName()) {
        Mutex mutex;
        mutex.lock();
        mutexWorks = !mutex.tryLock();
        mutex.unlock();
        runWorker("Early", [this] { workerName = Thread::currentName(); });
        onMutexDestroy = [](const pthread_mutex_t* destroyed) {
            if (judge.judging) {
                judge.destroyed.push_back(destroyed);
            }
        };
    }
    ~Early() {
        runWorker("Late",
                  [] { judge.lastWorkerRan = std::string("Late") == Thread::currentName(); });
    }

    bool firstOfAll;
    std::string name;
    bool mutexWorks = false;
    std::string workerName;
};
__attribute__((init_priority(103))) Early early;

// Reports a failure before the library's statics exist.
struct EarlyFailure {
    EarlyFailure() {
        const StderrCapture err;
        thrown = failure();
        printed = err.text();
    }

    std::string thrown;
    std::string printed;
};
__attribute__((init_priority(104))) EarlyFailure earlyFailure;

TEST(ThreadStaticsTest, EverythingWorksBeforeTheLibraryIsInitialized) {
    EXPECT_TRUE(early.firstOfAll);
    EXPECT_EQ("Main Thread", early.name);
    EXPECT_TRUE(early.mutexWorks);
    EXPECT_EQ(FAILURE, earlyFailure.thrown);
    EXPECT_EQ(std::string(FAILURE) + "\n", earlyFailure.printed);
    EXPECT_EQ("Early", early.workerName);
}

TEST(ThreadStaticsTest, LocksOutliveStaticObjectsAndAreDestroyedAtExit) {
    EXPECT_EXIT(
        {
            Logger::initialize();
            {
                ScriptedCalls creations("pthread_create");
                creations.give(EAGAIN);
                EXPECT_THROW(Worker("Never", [] {}), PthreadException);
            }
            Worker worker("Sorter", [] {});
            worker.go();
            judge.startLock = seenByPthread.locked;
            worker.join();
            judge.judging = true;
            std::exit(1);
        },
        testing::ExitedWithCode(IN_ORDER), "");
}

TEST(ThreadStaticsTest, LocksStayForWorkersThatNobodyJoined) {
    EXPECT_EXIT(
        {
            static std::atomic<bool> running{false};
            mainThread();
            class Endless : public Thread {
            public:
                Endless() : Thread("Endless") {}
                void main() override {
                    running = true;
                    while (running) {
                        std::this_thread::yield();
                    }
                }
            };
            auto* const endless = new Endless;
            endless->go();
            judge.startLock = seenByPthread.locked;
            while (!running) {
                std::this_thread::yield();
            }
            Thread::mainThreadDying();
            delete endless;
            judge.lastFailure = "";
            judge.judging = true;
            std::exit(1);
        },
        testing::ExitedWithCode(NOT_DESTROYED), "");
}

}  // namespace
