#include <gtest/gtest.h>
#include <sys/wait.h>

#include <cstdio>
#include <string>

#include "support/TempDir.h"

namespace {

struct ProgramRun {
    int status = -1;     // exit status; a sanitizer's report changes it
    std::string output;  // standard error
};

ProgramRun run(const std::string& environment, const std::string& program,
               const std::string& arguments = "") {
    const std::string command = environment + " '" + program + "' " + arguments + " 2>&1";
    std::FILE* const pipe = ::popen(command.c_str(), "r");
    ProgramRun result;
    char buf[4096];
    std::size_t count = 0;
    while ((count = std::fread(buf, 1, sizeof buf, pipe)) > 0) {
        result.output.append(buf, count);
    }
    const int status = ::pclose(pipe);
    result.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    return result;
}

// The address sanitizer then stops at every use of another unit's object that is not made yet.
const char STRICT[] = "ASAN_OPTIONS=check_initialization_order=1:strict_init_order=1";
const char ACROSS[] = "QT_TALK_ACROSS=1";

TEST(LoggerStaticOrderTest, StaticObjectsLogWhileTheyAreMadeAndDestroyed) {
    const struct {
        const char *program, *expected;
    } rows[] = {
        {ALPHA_FIRST,
         "Alpha made\nlocal made\nBeta made\nlocal made\n"
         "Alpha main\nBeta main\n"
         "Beta destroyed\nlocal destroyed\nAlpha destroyed\nlocal destroyed\n"},
        {BETA_FIRST,
         "Beta made\nlocal made\nAlpha made\nlocal made\n"
         "Alpha main\nBeta main\n"
         "Alpha destroyed\nlocal destroyed\nBeta destroyed\nlocal destroyed\n"},
    };
    for (const auto& row : rows) {
        const ProgramRun result = run(STRICT, row.program);
        EXPECT_EQ(0, result.status) << row.program;
        EXPECT_EQ(row.expected, result.output) << row.program;
    }
}

// A logger that is not made yet cannot tell its level, and so keeps nothing back.
TEST(LoggerStaticOrderTest, UnitsLogThroughLoggersThatAreNotMadeYetOrGone) {
    const struct {
        const char *program, *expected;
    } rows[] = {
        {ALPHA_FIRST,
         "Alpha made\nINFO - Beta made\nDEBUG - Beta made\nlocal made\n"
         "Beta made\nAlpha made\nlocal made\n"
         "Alpha main\nBeta main\n"
         "Beta destroyed\nAlpha destroyed\nlocal destroyed\n"
         "Alpha destroyed\nBeta destroyed\nlocal destroyed\n"},
        {BETA_FIRST,
         "Beta made\nINFO - Alpha made\nDEBUG - Alpha made\nlocal made\n"
         "Alpha made\nBeta made\nlocal made\n"
         "Alpha main\nBeta main\n"
         "Alpha destroyed\nBeta destroyed\nlocal destroyed\n"
         "Beta destroyed\nAlpha destroyed\nlocal destroyed\n"},
    };
    for (const auto& row : rows) {
        const ProgramRun result = run(ACROSS, row.program);
        EXPECT_EQ(0, result.status) << row.program;
        EXPECT_EQ(row.expected, result.output) << row.program;
    }
}

// Standard error must not close before the loggers that were made before the first message.
TEST(LoggerStaticOrderTest, DestructorsLogIfNothingWasLoggedBeforeMain) {
    const struct {
        const char *program, *expected;
    } rows[] = {
        {ALPHA_FIRST,
         "Alpha main\nBeta main\n"
         "Beta destroyed\nlocal destroyed\nAlpha destroyed\nlocal destroyed\n"},
        {BETA_FIRST,
         "Alpha main\nBeta main\n"
         "Alpha destroyed\nlocal destroyed\nBeta destroyed\nlocal destroyed\n"},
    };
    for (const auto& row : rows) {
        const ProgramRun result = run("QT_TALK_LATE=1", row.program);
        EXPECT_EQ(0, result.status) << row.program;
        EXPECT_EQ(row.expected, result.output) << row.program;
    }
}

TEST(LoggerStaticOrderTest, ConfiguredChannelsAndFilesServeUntilTheEnd) {
    for (const char* const program : {ALPHA_FIRST, BETA_FIRST}) {
        const TempDir dir;
        writeFile(dir.file("log.cfg"),
                  "rootCategory=INFO,rootAppender\n"
                  "appender.A=File\n"
                  "appender.A.fileName=${QUELTA_HOME}/alpha.log\n"
                  "appender.A.layout.ConversionPattern=%p %c %m%n\n"
                  "category.Alpha=DEBUG,A\n");
        const ProgramRun result =
            run(ACROSS, program, "'" + dir.file("log.cfg") + "' '" + dir.path() + "'");
        EXPECT_EQ(0, result.status) << program;
        EXPECT_NE(std::string::npos, result.output.find("Beta main\n")) << program;
        const std::string twice = "INFO Alpha Alpha destroyed\nDEBUG Alpha Alpha destroyed\n";
        EXPECT_EQ("INFO Alpha Alpha main\nDEBUG Alpha Alpha main\n" + twice + twice,
                  readFile(dir.file("alpha.log")))
            << program;
    }
}

}  // namespace
