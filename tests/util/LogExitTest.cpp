// What is logged while the process ends.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <string>

#include "support/InChild.h"
#include "support/TempDir.h"
#include "util/LogAppender.h"
#include "util/Logger.h"
#include "util/Pathname.h"

namespace {

// Set in children only: what the process does after the last destructor of a static object.
int verdict = -1;  // descriptor for the outcome
Logger* lateLogger = nullptr;

__attribute__((destructor)) void afterAllDestructors() {
    if (verdict >= 0) {
        const bool open = ::fcntl(STDERR_FILENO, F_GETFD) != -1;
        lateLogger->error("too late for anyone");
        ::dprintf(verdict, "%s", open ? "open" : "closed");
    }
}

struct LogsAtExit {
    ~LogsAtExit() { logger.warn("from a destructor"); }
    Logger logger{"exit"};
};

}  // namespace

TEST(LogExitTest, StandardErrorIsClosedAfterTheLastMessage) {
    const TempDir dir;
    const ChildRun run = inChild([&] {
        static const LogsAtExit logsAtExit;
        Logger::initialize();
        verdict = ::open(dir.file("verdict").c_str(), O_WRONLY | O_CREAT, 0600);
        lateLogger = new Logger("late");
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("from a destructor\n", run.err);
    EXPECT_EQ("closed", readFile(dir.file("verdict")));
}

TEST(LogExitTest, AppendersAndTheirLayoutsServeDestructors) {
    const struct {
        const char* layout;
        const char* expected;
    } table[] = {{"layout=SimpleLayout", "WARN    : from a destructor\n"},
                 {"layout=BasicLayout", "0 WARN exit from a destructor\n"},
                 {"layout=PatternLayout", "from a destructor\n"},
                 {"layout.ConversionPattern=<%m>", "<from a destructor>"}};
    for (const auto& row : table) {
        const TempDir dir;
        writeFile(dir.file("log.cfg"), "rootCategory=WARN,A\nappender.A.fileName=" +
                                           dir.file("a.log") + "\nappender.A." + row.layout + "\n");
        const ChildRun run = inChild([&] {
            static const LogsAtExit logsAtExit;  // destroyed after all that initialize makes
            EXPECT_TRUE(Logger::initialize(Pathname(dir.file("log.cfg")), Pathname()));
        });
        EXPECT_EQ(0, run.status);
        EXPECT_EQ("", run.err);
        EXPECT_EQ(row.expected, readFile(dir.file("a.log")));
    }
}
