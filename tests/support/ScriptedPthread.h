#ifndef QUELTA_TESTS_SUPPORT_SCRIPTEDPTHREAD_H_
#define QUELTA_TESTS_SUPPORT_SCRIPTEDPTHREAD_H_

// The pthread functions that a test can let fail, through ScriptedCalls, and what the latest calls
// of some of them were given. A program that uses this lists support/ScriptedPthread.cpp among its
// sources and ${scripted_pthread} in its WRAP.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <pthread.h>

#include <atomic>
#include <ctime>
#include <functional>
#include <memory>
#include <string>

#include "support/ScriptedCalls.h"
#include "support/StderrCapture.h"
#include "util/Mutex.h"

// Seen on the calling thread; reset by whoever looks.
struct SeenByPthread {
    const pthread_mutex_t* locked = nullptr;  // by the latest pthread_mutex_lock
    bool mutexAttributes = false;             // whether the latest mutex was given any
    bool condAttributes = false;              // whether the latest condition was given any
    clockid_t clock = -1;                     // of the latest timed wait
    timespec deadline = {};                   // of the latest timed wait
    const void* attributes = nullptr;         // of the latest thread created
    std::size_t stackSize = 0;                // within these attributes
    unsigned detached = 0;                    // calls of pthread_detach
};
extern thread_local SeenByPthread seenByPthread;

// Called at the beginning of pthread_key_delete, unless null.
extern std::atomic<void (*)()> onKeyDelete;

// Called at the beginning of pthread_detach, unless null.
extern std::atomic<void (*)()> onDetach;

// Called with the mutex at the beginning of pthread_mutex_destroy, unless null.
extern std::atomic<void (*)(const pthread_mutex_t*)> onMutexDestroy;

// The text of a failed call on a thread of that name.
inline std::string pthreadFailure(const std::string& function, const std::string& errorText,
                                  const std::string& threadName = "Main Thread") {
    return threadName + ": about to throw a PthreadException: " + function + ": " + errorText;
}

// The text of the PthreadException that `act` throws; empty when it throws none.
template <typename Act>
std::string thrownBy(Act act) {
    try {
        act();
    } catch (const PthreadException& e) {
        return e.what();
    }
    return "";
}

// Lets the next call of `function` give `error` while `act` runs, and expects that to be reported
// once, as a line on standard error, and thrown, with the same text.
template <typename Act>
void expectFailure(const char* function, int error, const std::string& text, Act act) {
    const StderrCapture err;
    ScriptedCalls calls(function);
    calls.give(error);
    EXPECT_EQ(text, thrownBy(act));
    EXPECT_EQ(text + "\n", err.text());
}

// Matches all that a failed assertion prints.
inline testing::Matcher<const std::string&> failedAssertion(const std::string& file,
                                                            const std::string& expression) {
    return testing::AllOf(testing::StartsWith(file + ":"),
                          testing::EndsWith(": failed assertion `" + expression + "'\n"));
}

#endif  // QUELTA_TESTS_SUPPORT_SCRIPTEDPTHREAD_H_
