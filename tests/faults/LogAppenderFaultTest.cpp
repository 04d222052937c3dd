// System calls that fail under an appender: what is reported, what is lost, in which order.

#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <string>

#include "support/FileAppender.h"
#include "support/InChild.h"
#include "support/ScriptedLibc.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"
#include "util/LogChannel.h"

namespace fs = std::filesystem;

namespace {

using Calls = std::vector<std::string>;

class LogAppenderFaultTest : public testing::Test {
protected:
    // Writes a line. Nothing may be thrown, or the case fails.
    void line(const std::string& text, long long seconds = 1000) {
        _log.line(text, seconds);
        EXPECT_TRUE(_log._mutex.tryLock()) << "still locked after " << text;
        _log._mutex.NOLOG_unlock();
    }
    std::string report(const char* what, int error) const {
        return std::string(what) + " \"" + _file + "\": " + std::strerror(error) + "\n";
    }

    TempDir _dir;
    const std::string _file = _dir.file("app.log");
    FileAppender _log{_file};
    StderrCapture _err;
};

}  // namespace

TEST_F(LogAppenderFaultTest, AFailedCallLosesTheLineAndIsTriedAgainWithTheNext) {
    const struct {
        const char* function;
        int error;
        const char* report;
    } rows[] = {{"open", ENFILE, "Error opening"},     {"open", EACCES, "Error opening"},
                {"open", EROFS, "Error opening"},      {"fstat", EIO, "Error calling fstat on"},
                {"write", ENOSPC, "Error writing to"}, {"write", EPIPE, "Error writing to"}};
    std::string written;
    for (const auto& row : rows) {
        const std::string before = _err.text();
        _log.closeFd();
        {
            // A close that fails, too, does not change the report.
            ScriptedCalls calls(row.function), closes("close");
            calls.fail(row.error);
            closes.fail(EBADF);
            line("lost");
            EXPECT_EQ(row.function == std::string("open") ? 0U : 1U, closes.calls());
        }
        EXPECT_EQ(before + report(row.report, row.error), _err.text());
        EXPECT_FALSE(_log._fd.valid());
        line(row.function);
        written += std::string(row.function) + "\n";
        EXPECT_EQ(written, readFile(_file));
        EXPECT_EQ(static_cast<long long>(written.size()), _log._curSize);
    }
}

TEST_F(LogAppenderFaultTest, AFileThatCannotBeExaminedIsReportedToTheOtherAppendersOnly) {
    const std::string other = _dir.file("other.log");
    const ChildRun run = inChild([&] {
        FileAppender listener(other);
        LogChannel::find("Logger", true)->_appenders = {&_log, &listener};
        Logger::initialize();
        ScriptedCalls fstats("fstat");
        fstats.fail(EIO);
        _log.line("lost");
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
    EXPECT_EQ("", readFile(_file));
    EXPECT_EQ(report("Error calling fstat on", EIO), readFile(other));
}

TEST_F(LogAppenderFaultTest, AStatThatFailsOpensTheFileAgain) {
    line("one", 1000);
    ScriptedCalls stats("stat");
    stats.fail(EACCES);
    ScriptedCalls opens("open");
    line("two", 1006);
    EXPECT_EQ(1U, opens.calls());
    EXPECT_EQ("one\ntwo\n", readFile(_file));
    EXPECT_EQ("", _err.text());
}

TEST_F(LogAppenderFaultTest, ALineCutShortCountsWithTheBytesThatWentOut) {
    ScriptedCalls writes("write");
    writes.limit(3).fail(ENOSPC);
    line("12345");
    EXPECT_EQ("", _err.text());
    EXPECT_TRUE(_log._fd.valid());
    EXPECT_EQ(3, _log._curSize);
    line("next");
    EXPECT_EQ("123next\n", readFile(_file));
    EXPECT_EQ(8, _log._curSize);
}

TEST_F(LogAppenderFaultTest, InterruptionsAndShortWritesLoseNothing) {
    ScriptedCalls opens("open"), writes("write");
    opens.fail(EINTR, 3);
    writes.fail(EINTR, 3).limit(1).fail(EINTR).limit(2).limit(1).fail(EINTR);
    line("12345678");
    EXPECT_EQ("12345678\n", readFile(_file));
    EXPECT_EQ("", _err.text());
}

TEST_F(LogAppenderFaultTest, ARotationThatCannotOpenTheNewFileKeepsTheLine) {
    _log._maxSize = 1;
    _log._maxBackupIndex = 1;
    ScriptedCalls opens("open");
    opens.pass().fail(ENFILE);
    line("one");
    EXPECT_EQ(report("Error opening", ENFILE), _err.text());
    EXPECT_EQ("one\n", readFile(_file + ".1"));
    EXPECT_FALSE(fs::exists(_file));
    _log._maxSize = 0;
    line("two");
    EXPECT_EQ("two\n", readFile(_file));
}

// Deliberate: renames are not checked. The file that stays gives way to the next one when that is
// moved. The line just written, and those to come, are safe whatever fails.
TEST_F(LogAppenderFaultTest, ARenameThatFailsCostsNoMoreThanTheBackupThatDidNotMove) {
    // The highest file moves first: 3 to 4, 2 to 3, 1 to 2, and the file itself to 1.
    const struct {
        const char* files[5];
        const char* next;  // the first backup after one more line, which leads to another rotation
    } rows[] = {{{"", "base\n", "1", "2", nullptr}, "more\n"},
                {{"", "base\n", "1", nullptr, "3"}, "more\n"},
                {{"", "base\n", nullptr, "2", "3"}, "more\n"},
                {{"base\n", nullptr, "1", "2", "3"}, "base\nmore\n"}};
    unsigned failing = 0;
    for (const auto& row : rows) {
        SCOPED_TRACE(failing);
        const TempDir dir;
        const std::string names[] = {dir.file("app.log"), dir.file("app.log.1"),
                                     dir.file("app.log.2"), dir.file("app.log.3"),
                                     dir.file("app.log.4")};
        FileAppender log(names[0], 1, 4);
        for (unsigned backup = 1; backup <= 3; ++backup) {
            writeFile(names[backup], std::to_string(backup));
        }
        ScriptedCalls renames("rename");
        renames.pass(failing++).fail(EBUSY);
        log.line("base");
        EXPECT_EQ(4U, renames.calls());
        for (unsigned suffix = 0; suffix < 5; ++suffix) {
            ASSERT_EQ(row.files[suffix] != nullptr, fs::exists(names[suffix])) << suffix;
            if (row.files[suffix] != nullptr) {
                EXPECT_EQ(row.files[suffix], readFile(names[suffix])) << suffix;
            }
        }
        log.line("more");
        EXPECT_EQ(row.next, readFile(names[1]));
        EXPECT_EQ("", _err.text());
    }
}

TEST_F(LogAppenderFaultTest, ADeletionThatFailsLeavesTheFileToGoOnWith) {
    _log._maxSize = 1;
    ScriptedCalls unlinks("unlink");
    unlinks.fail(EPERM);
    line("one");
    EXPECT_EQ("one\n", readFile(_file));
    EXPECT_EQ(4, _log._curSize);
    line("two");
    EXPECT_EQ("", readFile(_file));
    EXPECT_EQ("", _err.text());
}

TEST_F(LogAppenderFaultTest, WithoutTheLockTheLineIsWrittenAndNothingUnlocked) {
    {
        ScriptedCalls locks("pthread_mutex_lock");
        locks.give(EINVAL);
        ScriptedCalls unlocks("pthread_mutex_unlock");
        _log.line("one");
        EXPECT_EQ(1U, locks.calls());
        EXPECT_EQ(0U, unlocks.calls());
    }
    line("two");
    EXPECT_EQ("one\ntwo\n", readFile(_file));
    EXPECT_EQ("", _err.text());
}

TEST_F(LogAppenderFaultTest, ALineIsFormattedBeforeTheLockAndWrittenWithOneCall) {
    ASSERT_TRUE(_log.setAttribute("layout.ConversionPattern", "%.0u%m", Pathname()));
    line("opens the file");
    const RecordedCalls seen;
    _log.line("text");
    EXPECT_EQ((Calls{"clock", "pthread_mutex_lock", "write 4", "pthread_mutex_unlock"}),
              seen.calls());
}

TEST_F(LogAppenderFaultTest, ARotationClosesTheFileMovesTheBackupsAndOpensANewFile) {
    _log._maxSize = 10;
    _log._maxBackupIndex = 2;
    writeFile(_file + ".1", "1");
    writeFile(_file + ".2", "2");
    line("opens");
    const RecordedCalls seen;
    _log.line("rotates");
    const std::string one = _file + ".1";
    const std::string two = _file + ".2";
    EXPECT_EQ((Calls{"pthread_mutex_lock", "write 8", "close", "access " + _file + " 0",
                     "access " + one + " 0", "unlink " + two, "rename " + one + " " + two,
                     "rename " + _file + " " + one, "open " + _file + " 1089 0644", "fstat",
                     "pthread_mutex_unlock"}),
              seen.calls());
}

TEST_F(LogAppenderFaultTest, TheIdentityIsCheckedEveryFiveSeconds) {
    line("first", 1000);
    ScriptedCalls writes("write"), stats("stat"), opens("open");
    for (int i = 0; i < 2000; ++i) {
        _log.line("text", 1000 + i / 100);  // until 1019
    }
    EXPECT_EQ(2000U, writes.calls());
    EXPECT_EQ(3U, stats.calls());  // at 1006, 1012 and 1018
    EXPECT_EQ(0U, opens.calls());
}

TEST_F(LogAppenderFaultTest, StandardErrorIsNeverExamined) {
    LogAppender appender;
    appender.finalSetup("E");
    ScriptedCalls stats("stat"), fstats("fstat");
    appender.write(stampedAt(1000), "a");
    appender.write(stampedAt(2000), "b");
    EXPECT_EQ(0U, stats.calls() + fstats.calls());
}

TEST_F(LogAppenderFaultTest, TheSetupLeavesNoDescriptorOpenWhateverHappens) {
    ScriptedCalls opens("open"), closes("close");
    opens.fail(EMFILE).pass();
    LogAppender failing;
    failing._filename = _dir.file("b.log");
    failing.finalSetup("B");
    EXPECT_EQ(0U, closes.calls());
    EXPECT_EQ("Error opening \"" + _dir.file("b.log") + "\": " + std::strerror(EMFILE) + "\n",
              _err.text());
    failing.finalSetup("B");
    EXPECT_EQ(1U, closes.calls());
    EXPECT_FALSE(failing._fd.valid());
}
