#ifndef QUELTA_TESTS_SUPPORT_INCHILD_H_
#define QUELTA_TESTS_SUPPORT_INCHILD_H_

// Runs the body of a case in a child process, for operations that work only once per process. The
// child calls exit, so destructors of static objects and leak checks run as in a program.
//
//     const ChildRun run = inChild([&] { EXPECT_TRUE(once()); });
//     EXPECT_EQ(0, run.status);     // 1: an expectation failed in the child
//     EXPECT_EQ("", run.err);       // its standard error
// Requires: no other threads at the time of the call.

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string>

#include "support/StderrCapture.h"

struct ChildRun {
    int status = -1;  // exit status; -1 if a signal killed the child
    std::string err;  // the text that it wrote to standard error
};

template <typename Body>
ChildRun inChild(Body body) {
    const StderrCapture capture;
    std::fflush(nullptr);
    const pid_t child = ::fork();
    if (child == 0) {
        try {
            body();
        } catch (...) {
            ADD_FAILURE() << "an exception in the child";
        }
        std::fflush(nullptr);
        std::exit(testing::Test::HasFailure() ? 1 : 0);
    }
    int status = -1;
    EXPECT_EQ(child, ::waitpid(child, &status, 0));
    ChildRun run;
    run.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    run.err = capture.text();
    return run;
}

#endif  // QUELTA_TESTS_SUPPORT_INCHILD_H_
