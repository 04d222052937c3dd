#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <new>
#include <stdexcept>
#include <string>
#include <vector>

#include "support/FileAppender.h"
#include "support/InChild.h"
#include "support/RecordedWrites.h"
#include "support/ScriptedLibc.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"
#include "util/LogFormat.h"
#include "util/Logger.h"
#include "util/internal/LogGlobals.h"
#include "util/internal/LogRouting.h"

namespace {

using Written = std::vector<const LogAppender*>;

LogAppender* appender(const char* name) {
    return LogAppender::find(name, true);
}

void expectInChild(const std::string& standardError, void (*body)()) {
    const ChildRun run = inChild(body);
    EXPECT_EQ(0, run.status);
    EXPECT_EQ(standardError, run.err);
}

// Initializes logging with a channel for the reports of the logging subsystem.
LogChannel& channelNamedLogger(LogLevel minlevel, const std::vector<LogAppender*>& appenders) {
    LogChannel& channel = *LogChannel::find("Logger", true);
    channel.minlevel = minlevel;
    channel._appenders = appenders;
    Logger::initialize();
    return channel;
}

TEST(LogFallbackTest, WritesLevelAndMessageWithOneCall) {
    const std::string nearlyLong(1024 - 9, 'x');  // "DEBUG - " and the newline fill 1024 bytes
    const struct {
        int level;
        std::string message, expected;
    } rows[] = {
        {DEBUG, "text", "DEBUG - text\n"},
        {INFO, "", "INFO - \n"},
        {NOTICE, "two\nlines", "NOTICE - two\nlines\n"},
        {EMERG, "100% %d %m", "EMERG - 100% %d %m\n"},
        {9, "text", "??? - text\n"},
        {-1, "text", "??? - text\n"},
        {INFO, std::string("a\0b", 3), std::string("INFO - a\0b\n", 11)},
        {DEBUG, nearlyLong, "DEBUG - " + nearlyLong + "\n"},
        {DEBUG, nearlyLong + "x", "DEBUG - " + nearlyLong + "x\n"},
        {DEBUG, std::string(100000, 'y'), "DEBUG - " + std::string(100000, 'y') + "\n"},
    };
    for (const auto& row : rows) {
        const StderrCapture err;
        const ScriptedCalls writes("write");
        fallback_to_stderr(static_cast<LogLevel>(row.level), row.message);
        EXPECT_EQ(row.expected, err.text());
        EXPECT_EQ(1u, writes.calls());
    }
}

TEST(LogFallbackTest, IgnoresTheResultOfTheCall) {
    ScriptedCalls writes("write");
    writes.fail(EIO).limit(3).fail(EINTR);
    const StderrCapture err;
    fallback_to_stderr(INFO, "lost");
    fallback_to_stderr(INFO, "cut");
    fallback_to_stderr(INFO, "interrupted");
    EXPECT_EQ("INF", err.text());
    EXPECT_EQ(3u, writes.calls());
}

TEST(LogFallbackTest, KeepsErrnoForTheCallerOfALogger) {
    const Logger logger("name");
    Logger copy(logger);  // goes to the fallback
    ScriptedCalls writes("write");
    writes.fail(EIO, 2);
    errno = ENOENT;
    copy.info("%d", 1);
    copy.info(std::string("text"));
    EXPECT_EQ(ENOENT, errno);
    EXPECT_EQ(2u, writes.calls());
}

TEST(LogFallbackTest, ShowsTheFormatOfAnUnknownLoggersMessageThatCannotBeFormatted) {
    const Logger logger("name");
    Logger copy(logger);
    ScriptedCalls formats("vsnprintf");
    formats.give(-1, 20);
    const StderrCapture err;
    copy.debug("%s %d", "text", 1);
    EXPECT_EQ("DEBUG - %s %d\n", err.text());
}

TEST(LogReportTest, ReachesTheRootAppenderBeforeInitialization) {
    expectInChild("report 1\n", [] {
        LogFormat::internal(nullptr, WARN, "report %d", 1);
        LogFormat::internal(nullptr, DEBUG, "suppressed %d", 1);
    });
}

TEST(LogReportTest, IgnoresTheRootChannelBeforeInitialization) {
    expectInChild("report\n", [] {
        rootChannel().minlevel = EMERG;
        rootChannel()._appenders = {appender("A1")};
        LogFormat::internal(nullptr, INFO, "report");
        rootChannel().minlevel = DEBUG;
        LogFormat::internal(nullptr, DEBUG, "suppressed");
    });
}

TEST(LogReportTest, FallsBackWhenTheRootAppenderItselfFails) {
    expectInChild("CRIT - report\n",
                  [] { LogFormat::internal(&rootAppender(), CRIT, "%s", "report"); });
}

TEST(LogReportTest, WaitsForItsChannelLikeAnyLogger) {
    expectInChild("", [] {
        const RecordedWrites writes;
        LogFormat::internal(nullptr, WARN, "before");
        EXPECT_STREQ("Logger", uninitialized_loggers->_channel_name);
        channelNamedLogger(ERROR, {appender("A1")});
        LogFormat::internal(nullptr, WARN, "suppressed");
        LogFormat::internal(nullptr, ERROR, "after");
        EXPECT_EQ("WARN Logger before\nERROR Logger after\n", writes.text());
        EXPECT_EQ((Written{&rootAppender(), appender("A1")}), writes.appenders());
    });
}

TEST(LogReportTest, IsBoundAtOnceWhenItsFirstReportComesLater) {
    expectInChild("", [] {
        channelNamedLogger(DEBUG, {appender("A1")});
        const RecordedWrites writes;
        LogFormat::internal(nullptr, DEBUG, "report");
        EXPECT_EQ("DEBUG Logger report\n", writes.text());
        EXPECT_EQ(Written{appender("A1")}, writes.appenders());
    });
}

TEST(LogReportTest, SparesTheAppenderThatFailed) {
    expectInChild("WARN - nobody left\n", [] {
        LogChannel& channel = channelNamedLogger(INFO, {appender("A1"), appender("A2")});
        const RecordedWrites writes;
        LogFormat::internal(appender("A1"), WARN, "one left");
        EXPECT_EQ(Written{appender("A2")}, writes.appenders());
        channel._appenders = {appender("A1"), appender("A1")};
        LogFormat::internal(appender("A1"), WARN, "nobody left");
        EXPECT_EQ(1u, writes.messages().size());
    });
}

TEST(LogReportTest, PutsTheTextOfErrnoForPercentMAndKeepsIt) {
    expectInChild("", [] {
        const RecordedWrites writes([](const RecordedWrites::Message&) { errno = EIO; });
        errno = ENOSPC;
        LogFormat::internal(nullptr, ERROR, "Error writing to \"%s\": %m", "x");
        EXPECT_EQ(ENOSPC, errno);
        EXPECT_EQ(
            std::string("ERROR Logger Error writing to \"x\": ") + std::strerror(ENOSPC) + '\n',
            writes.text());
        LogFormat::internal(nullptr, DEBUG, "suppressed");
        EXPECT_EQ(ENOSPC, errno);
    });
}

TEST(LogReportTest, DoesNotFormatWhatItSuppresses) {
    expectInChild("", [] {
        const ScriptedCalls formats("vsnprintf");
        LogFormat::internal(nullptr, DEBUG, "%d", 1);
        EXPECT_EQ(0u, formats.calls());
    });
}

TEST(LogReportTest, FallsBackWhenAnAppenderThrows) {
    expectInChild("ERROR - report 1\n", [] {
        const RecordedWrites writes(
            [](const RecordedWrites::Message&) { throw std::runtime_error("thrown"); });
        errno = ENOSPC;
        LogFormat::internal(nullptr, ERROR, "report %d", 1);
        EXPECT_EQ(ENOSPC, errno);
    });
}

TEST(LogReportTest, ShowsTheFormatWhenItCannotBeFormatted) {
    expectInChild("ERROR - report %d\n", [] {
        ScriptedCalls formats("vsnprintf");
        formats.give(-1, 20);
        LogFormat::internal(nullptr, ERROR, "report %d", 1);
    });
}

// The first report goes to the second appender, which fails in turn, and to the third.
TEST(LogReportTest, EachOfTwoFailingAppendersIsReportedToTheRest) {
    for (const bool third : {true, false}) {
        const TempDir dir;
        const std::string missing = dir.file("missing/b.log");
        const std::string secondReport =
            "Error opening \"" + missing + "\": No such file or directory\n";
        const ChildRun run = inChild([&] {
            LogAppender full;
            LogAppender unopened;
            FileAppender good(dir.file("good.log"));
            ASSERT_TRUE(full.setAttribute("fileName", "/dev/full", Pathname()));
            ASSERT_TRUE(unopened.setAttribute("fileName", missing.c_str(), Pathname()));
            LogChannel& channel = channelNamedLogger(INFO, {&full, &unopened});
            if (third) {
                channel._appenders.push_back(&good);
            }
            full.write(stampedAt(1000), "lost");
        });
        EXPECT_EQ(0, run.status);
        EXPECT_EQ(third ? "" : "ERROR - " + secondReport, run.err);
        EXPECT_EQ(
            third ? secondReport + "Error writing to \"/dev/full\": No space left on device\n" : "",
            readFile(dir.file("good.log")));
    }
}

TEST(LogReportTest, WarningsOfAnAppendersSetupGoToTheOthersOnly) {
    const struct {
        const char* file;
        const char* limit;
        const char* backups;
        std::size_t warnings;
    } rows[] = {{"", "0", "0", 1}, {"", "0", "1", 2},          {"", "5", "0", 2},
                {"", "5", "1", 3}, {"/dev/null", "0", "1", 1}, {"/no/such/file", "0", "0", 1}};
    for (const auto& row : rows) {
        const ChildRun run = inChild([&] {
            LogAppender& a1 = *appender("A1");
            ASSERT_TRUE(a1.setAttribute("fileName", row.file, Pathname()));
            ASSERT_TRUE(a1.setAttribute("maxFileSize", row.limit, Pathname()));
            ASSERT_TRUE(a1.setAttribute("maxBackupIndex", row.backups, Pathname()));
            channelNamedLogger(INFO, {&a1, appender("A2")});
            const RecordedWrites writes;
            a1.finalSetup("A1");
            EXPECT_EQ(Written(row.warnings, appender("A2")), writes.appenders());
        });
        EXPECT_EQ(0, run.status) << row.file << ' ' << row.limit << ' ' << row.backups;
    }
}

}  // namespace
