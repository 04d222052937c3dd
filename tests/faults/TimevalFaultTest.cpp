#include <gtest/gtest.h>

#include <cerrno>

#include "support/ScriptedLibc.h"
#include "util/Timeval.h"

namespace {

TEST(TimevalFaultTest, SetToNowAbortsIfTheClockFails) {
    ScriptedCalls clock("gettimeofday");
    clock.fail(EFAULT);
    EXPECT_EXIT(Timeval().setToNow(), testing::KilledBySignal(SIGABRT), "^$");
}

TEST(TimevalFaultTest, LocaltimeAbortsUnlessItGetsTheSameStructureBack) {
    struct tm broken, other = {};
    {
        const Replacement zone(replacement::localtime_r,
                               [&](const time_t*, struct tm*) { return &other; });
        EXPECT_EXIT(Timeval().localtime(broken), testing::KilledBySignal(SIGABRT), "^$");
    }
    ScriptedCalls zone("localtime_r");
    zone.fail(EOVERFLOW);
    EXPECT_EXIT(Timeval().localtime(broken), testing::KilledBySignal(SIGABRT), "^$");
}

}  // namespace
