#ifndef QUELTA_TESTS_SUPPORT_SCRIPTEDPTHREAD_H_
#define QUELTA_TESTS_SUPPORT_SCRIPTEDPTHREAD_H_

// The pthread functions that a test can make fail or count through ScriptedCalls. A program that
// uses this lists support/ScriptedPthread.cpp among its sources and ${scripted_pthread} in its
// WRAP.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cstddef>
#include <cstring>
#include <ctime>
#include <string>

#include "support/ScriptedCalls.h"
#include "util/Mutex.h"

// The arguments of the latest calls on this thread.
struct SeenByPthread {
    clockid_t clock = -1;       // of the latest timed wait
    timespec deadline = {};     // of the latest timed wait
    std::size_t stackSize = 0;  // of the last created thread
};
extern thread_local SeenByPthread seenByPthread;

// If not null, called at the start of every wrapped call with the name of the function.
extern std::atomic<void (*)(const char* function)> onPthreadCall;

// The text for a call that failed with `error` on a thread with that name.
inline std::string pthreadFailure(const std::string& function, int error,
                                  const std::string& threadName = "Main Thread") {
    return threadName + ": about to throw a PthreadException: " + function + ": " +
           std::strerror(error);
}

// The text of the PthreadException that `act` throws; empty if it throws none.
template <typename Act>
std::string thrownBy(Act act) {
    try {
        act();
    } catch (const PthreadException& e) {
        return e.what();
    }
    return "";
}

// Matches the whole output of a failed assertion.
inline testing::Matcher<const std::string&> failedAssertion(const std::string& file,
                                                            const std::string& expression) {
    return testing::AllOf(testing::StartsWith(file + ":"),
                          testing::EndsWith(": failed assertion `" + expression + "'\n"));
}

#endif  // QUELTA_TESTS_SUPPORT_SCRIPTEDPTHREAD_H_
