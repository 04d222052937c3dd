// Files that are moved, deleted or replaced under an appender, and clocks that step.

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <limits>
#include <string>

#include "support/FileAppender.h"
#include "support/InChild.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"

namespace fs = std::filesystem;

namespace {

// An appender that has written "first" at second 1000.
class LogAppenderIdentityTest : public testing::Test {
protected:
    LogAppenderIdentityTest() { _log.line("first", 1000); }

    TempDir _dir;
    const std::string _file = _dir.file("app.log");
    const std::string _moved = _dir.file("moved.log");
    FileAppender _log{_file};
};

}  // namespace

TEST_F(LogAppenderIdentityTest, AMoveIsNoticedAfterSixSecondsNotAfterFive) {
    fs::rename(_file, _moved);
    _log.line("at 1005", 1005);
    EXPECT_FALSE(fs::exists(_file));
    _log.line("at 1006", 1006);
    EXPECT_EQ("first\nat 1005\n", readFile(_moved));
    EXPECT_EQ("at 1006\n", readFile(_file));
}

TEST_F(LogAppenderIdentityTest, OnlyTheWholeSecondsOfAStampCount) {
    fs::rename(_file, _moved);
    LogMsgMetadata mdata = stampedAt(1005);
    mdata.stamp.set(1005, 999999);
    _log.write(mdata, "at 1005.999999");
    EXPECT_FALSE(fs::exists(_file));
    EXPECT_EQ("first\nat 1005.999999\n", readFile(_moved));
}

TEST_F(LogAppenderIdentityTest, ADeletionIsNoticedAfterSixSecondsNotAfterFive) {
    fs::remove(_file);
    _log.line("at 1005", 1005);
    EXPECT_FALSE(fs::exists(_file));
    _log.line("at 1006", 1006);
    EXPECT_EQ("at 1006\n", readFile(_file));
}

TEST_F(LogAppenderIdentityTest, AReplacedFileIsNoticedAfterSixSecondsNotAfterFive) {
    fs::rename(_file, _moved);
    writeFile(_file, "someone else's\n");
    _log.line("at 1005", 1005);
    EXPECT_EQ("someone else's\n", readFile(_file));
    _log.line("at 1006", 1006);
    EXPECT_EQ("someone else's\nat 1006\n", readFile(_file));
    EXPECT_EQ("first\nat 1005\n", readFile(_moved));
}

TEST_F(LogAppenderIdentityTest, AClockThatStepsBackLeadsToACheckAtOnce) {
    fs::rename(_file, _moved);
    _log.line("at 999", 999);
    EXPECT_EQ("at 999\n", readFile(_file));
    EXPECT_EQ("first\n", readFile(_moved));
}

TEST_F(LogAppenderIdentityTest, AfterTheClockSteppedBackTheSecondsCountFromThere) {
    _log.line("at 500", 500);
    fs::rename(_file, _moved);
    _log.line("at 505", 505);
    EXPECT_FALSE(fs::exists(_file));
    _log.line("at 506", 506);
    EXPECT_EQ("at 506\n", readFile(_file));
    EXPECT_EQ("first\nat 500\nat 505\n", readFile(_moved));
}

TEST_F(LogAppenderIdentityTest, AConfirmedFileIsTrustedForAnotherFiveSeconds) {
    _log.line("at 1006", 1006);
    fs::rename(_file, _moved);
    _log.line("at 1011", 1011);
    EXPECT_FALSE(fs::exists(_file));
    _log.line("at 1012", 1012);
    EXPECT_EQ("first\nat 1006\nat 1011\n", readFile(_moved));
    EXPECT_EQ("at 1012\n", readFile(_file));
}

TEST_F(LogAppenderIdentityTest, LinesInBetweenDoNotPutTheCheckOff) {
    fs::rename(_file, _moved);
    for (long long second = 1001; second <= 1005; ++second) {
        _log.line("between", second);
    }
    _log.line("at 1006", 1006);
    EXPECT_EQ("at 1006\n", readFile(_file));
}

TEST_F(LogAppenderIdentityTest, ATruncatedFileIsStillTheSameFile) {
    ASSERT_EQ(0, ::truncate(_file.c_str(), 0));
    _log.line("next", 1010);
    EXPECT_EQ("next\n", readFile(_file));
    // What was written counts, not what is left of it.
    EXPECT_EQ(11, _log._curSize);
}

TEST_F(LogAppenderIdentityTest, ALinkToTheMovedFileIsTheSameFile) {
    fs::rename(_file, _moved);
    fs::create_symlink(_moved, _file);
    _log.line("next", 1010);
    EXPECT_EQ("first\nnext\n", readFile(_moved));
    EXPECT_TRUE(fs::is_symlink(_file));
}

TEST_F(LogAppenderIdentityTest, TheSizeCountsAnewInTheNewFile) {
    fs::rename(_file, _moved);
    writeFile(_file, "0123456789");
    _log.line("next", 1010);
    EXPECT_EQ(15, _log._curSize);
}

TEST_F(LogAppenderIdentityTest, WhatStandsInTheWayIsReportedUntilItIsGone) {
    const std::string prefix = "Error opening \"" + _file + "\": ";
    const StderrCapture err;
    fs::rename(_file, _moved);
    fs::create_directory(_file);
    _log.line("lost", 1010);
    EXPECT_EQ(prefix + "Is a directory\n", err.text());
    fs::remove(_file);
    fs::create_symlink(_file, _file);
    _log.line("lost", 1011);
    EXPECT_EQ(prefix + "Is a directory\n" + prefix + "Too many levels of symbolic links\n",
              err.text());
    fs::remove(_file);
    _log.line("written", 1012);
    EXPECT_EQ("written\n", readFile(_file));
}

// In a child without root's rights, to which permissions mean nothing.
TEST_F(LogAppenderIdentityTest, AFileThatMayNotBeOpenedTakesLinesForAsLongAsItIsOpen) {
    const std::string directory = _dir.file("logs");
    const std::string file = directory + "/app.log";
    const std::string report = "Error opening \"" + file + "\": Permission denied\n";
    fs::permissions(_dir.path(), fs::perms::all);
    const ChildRun run = inChild([&] {
        if (::geteuid() == 0) {
            ASSERT_EQ(0, ::setuid(65534));
        }
        fs::create_directory(directory);
        FileAppender log(file);
        log.line("first", 1000);
        fs::permissions(file, fs::perms::none);
        log.line("still open", 1010);
        fs::permissions(directory, fs::perms::none);
        log.line("not to be found", 1020);
        fs::permissions(directory, fs::perms::all);
        log.line("not to be opened", 1020);
        fs::permissions(file, fs::perms::owner_write);
        log.line("written", 1020);
        fs::permissions(file, fs::perms::owner_all);
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ(report + report, run.err);
    EXPECT_EQ("first\nstill open\nwritten\n", readFile(file));
}

TEST_F(LogAppenderIdentityTest, TheFarthestStampsAreNoTrouble) {
    const StderrCapture err;
    const long long stamps[] = {2147483647, 0, -2147483648LL, 2147483647, 1000};
    std::string expected = "first\n";
    for (const long long second : stamps) {
        _log.line("x", second);
        expected += "x\n";
    }
    EXPECT_EQ(expected, readFile(_file));
    _log._lastCheck = std::numeric_limits<time_t>::min();
    _log.line("x", 2147483647);
    _log._lastCheck = std::numeric_limits<time_t>::max();
    _log.line("x", -1);
    EXPECT_EQ(expected + "x\nx\n", readFile(_file));
    EXPECT_EQ("", err.text());
}
