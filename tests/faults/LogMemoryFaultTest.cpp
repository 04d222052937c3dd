// Memory that runs out while a message is logged.

#include <gtest/gtest.h>

#include <cerrno>
#include <string>

#include "support/AllocationProbe.h"
#include "support/FileAppender.h"
#include "support/InChild.h"
#include "support/TempDir.h"
#include "util/LogChannel.h"
#include "util/internal/LogGlobals.h"

// Each allocation of the call fails once.
TEST(LogMemoryFaultTest, AMessageReachesTheFileOrStandardErrorOnce) {
    REQUIRE_ALLOCATION_PROBE();
    const std::string text = "a message that is too long to be kept without an allocation";
    std::size_t n = 1;
    for (bool reached = true; reached; ++n) {
        const TempDir dir;
        const std::string file = dir.file("app.log");
        const ChildRun run = inChild([&] {
            FileAppender log(file);
            rootChannel()._appenders = {&log};
            Logger logger("any");
            Logger::initialize();
            errno = EDOM;
            const FailedAllocation failed = failAllocation(n, [&] { logger.info(text); });
            EXPECT_EQ(EDOM, errno);
            EXPECT_FALSE(failed.thrown);
            EXPECT_EQ(0, failed.live);
            logger.info(failed.reached ? "reached" : "done");
        });
        EXPECT_EQ(0, run.status) << n;
        const std::string log = readFile(file);
        reached = log.ends_with("reached\n");
        EXPECT_TRUE((log.starts_with(text + "\n") && run.err.empty()) ||
                    (log == "reached\n" && run.err == "INFO - " + text + "\n"))
            << n << ": " << log << run.err;
    }
    EXPECT_GT(n, 2U);
}

TEST(LogMemoryFaultTest, AFormattedMessageNeedsNoMemoryExceptForItsLine) {
    REQUIRE_ALLOCATION_PROBE();
    const TempDir dir;
    const std::string text(250, 'x');
    const ChildRun run = inChild([&] {
        FileAppender log(dir.file("app.log"));
        rootChannel()._appenders = {&log};
        Logger logger("any");
        Logger::initialize();
        logger.info("opens the file");
        AllocationProbe probe;
        logger.info("%s %d", text.c_str(), 42);
        probe.stop();
        EXPECT_EQ(1U, probe.count());
    });
    EXPECT_EQ(0, run.status) << run.err;
    EXPECT_EQ("opens the file\n" + text + " 42\n", readFile(dir.file("app.log")));
}
