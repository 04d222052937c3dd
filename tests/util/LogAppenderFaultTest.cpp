// System calls and allocations that fail under an appender: what is reported, what is lost, and
// that neither an exception nor a changed errno reaches the caller.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <pthread.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <string>

#include "support/FileAppender.h"
#include "support/RootLayout.h"
#include "support/ScriptedCalls.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"

namespace fs = std::filesystem;

extern "C" {
int __real_open(const char*, int, ...);
int __wrap_open(const char* path, int flags, ...) {
    std::va_list args;
    va_start(args, flags);
    const mode_t mode = (flags & O_CREAT) != 0 ? va_arg(args, mode_t) : 0;
    va_end(args);
    return scriptedCall("open", [&] { return __real_open(path, flags, mode); });
}
int __real_fstat(int, struct stat*);
int __wrap_fstat(int fd, struct stat* status) {
    return scriptedCall("fstat", [&] { return __real_fstat(fd, status); });
}
int __real_stat(const char*, struct stat*);
int __wrap_stat(const char* path, struct stat* status) {
    return scriptedCall("stat", [&] { return __real_stat(path, status); });
}
int __real_access(const char*, int);
int __wrap_access(const char* path, int mode) {
    return scriptedCall("access", [&] { return __real_access(path, mode); });
}
int __real_rename(const char*, const char*);
int __wrap_rename(const char* from, const char* to) {
    return scriptedCall("rename", [&] { return __real_rename(from, to); });
}
int __real_unlink(const char*);
int __wrap_unlink(const char* path) {
    return scriptedCall("unlink", [&] { return __real_unlink(path); });
}
int __real_close(int);
int __wrap_close(int fd) {
    return scriptedCall("close", [&] { return __real_close(fd); });
}
ssize_t __real_write(int, const void*, size_t);
ssize_t __wrap_write(int fd, const void* buf, size_t size) {
    return scriptedCall("write", size,
                        [&](std::size_t limit) { return __real_write(fd, buf, limit); });
}
int __real_pthread_mutex_lock(pthread_mutex_t*);
int __wrap_pthread_mutex_lock(pthread_mutex_t* mutex) {
    return scriptedCall("pthread_mutex_lock", [&] { return __real_pthread_mutex_lock(mutex); });
}
int __real_pthread_mutex_unlock(pthread_mutex_t*);
int __wrap_pthread_mutex_unlock(pthread_mutex_t* mutex) {
    return scriptedCall("pthread_mutex_unlock", [&] { return __real_pthread_mutex_unlock(mutex); });
}
}

namespace {

class LogAppenderFault : public testing::Test {
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

TEST_F(LogAppenderFault, AnOpenThatFailsLosesTheLineAndIsTriedAgain) {
    for (const int error : {ENFILE, EACCES, EROFS, ENOSPC}) {
        ScriptedCalls opens("open");
        opens.fail(error);
        const std::string before = _err.text();
        line("lost");
        EXPECT_EQ(before + report("Error opening", error), _err.text());
        EXPECT_FALSE(_log._fd.valid());
    }
    line("written");
    EXPECT_EQ("written\n", readFile(_file));
}

TEST_F(LogAppenderFault, AnFstatThatFailsClosesTheFileAgain) {
    ScriptedCalls fstats("fstat");
    fstats.fail(EIO);
    ScriptedCalls closes("close");
    line("lost");
    EXPECT_EQ(report("Error calling fstat on", EIO), _err.text());
    EXPECT_EQ(1U, closes.calls());
    EXPECT_FALSE(_log._fd.valid());
    line("written");
    EXPECT_EQ("written\n", readFile(_file));
}

TEST_F(LogAppenderFault, AStatThatFailsOpensTheFileAnew) {
    line("one", 1000);
    ScriptedCalls stats("stat");
    stats.fail(EACCES);
    ScriptedCalls opens("open");
    line("two", 1006);
    EXPECT_EQ(1U, opens.calls());
    EXPECT_EQ("one\ntwo\n", readFile(_file));
    EXPECT_EQ("", _err.text());
}

TEST_F(LogAppenderFault, AWriteThatFailsLosesTheLineAndClosesTheFile) {
    line("one");
    for (const int error : {ENOSPC, EIO, EFBIG, EPIPE}) {
        ScriptedCalls writes("write");
        writes.fail(error);
        const std::string before = _err.text();
        line("lost");
        EXPECT_EQ(before + report("Error writing to", error), _err.text());
        EXPECT_FALSE(_log._fd.valid());
    }
    line("two");
    EXPECT_EQ("one\ntwo\n", readFile(_file));
    EXPECT_EQ(8, _log._curSize);
}

TEST_F(LogAppenderFault, ALineCutShortCountsWithTheBytesThatWentOut) {
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

TEST_F(LogAppenderFault, InterruptionsAndShortWritesLoseNothing) {
    ScriptedCalls writes("write");
    writes.fail(EINTR, 3).limit(1).fail(EINTR).limit(2).limit(1).fail(EINTR);
    line("12345678");
    EXPECT_EQ("12345678\n", readFile(_file));
    EXPECT_EQ("", _err.text());
}

TEST_F(LogAppenderFault, ARotationThatCannotOpenTheNewFileKeepsTheLine) {
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
// moved; the line just written, and those to come, are safe whatever fails.
TEST_F(LogAppenderFault, ARenameThatFailsCostsNoMoreThanTheBackupThatDidNotMove) {
    // The highest file moves first: 3 to 4, 2 to 3, 1 to 2, and the file itself to 1.
    const struct {
        const char* files[5];
        const char* next;  // the file after one more line, which leads to another rotation
    } rows[] = {{{"", "base\n", "1", "2", nullptr}, ""},
                {{"", "base\n", "1", nullptr, "3"}, ""},
                {{"", "base\n", nullptr, "2", "3"}, ""},
                {{"base\n", nullptr, "1", "2", "3"}, "base\nmore\n"}};
    unsigned failing = 0;
    for (const auto& row : rows) {
        SCOPED_TRACE(failing);
        const TempDir dir;
        FileAppender log(dir.file("app.log"), 1, 4);
        for (const char* const backup : {"1", "2", "3"}) {
            writeFile(dir.file("app.log.") + backup, backup);
        }
        ScriptedCalls renames("rename");
        renames.pass(failing++).fail(EBUSY);
        log.line("base");
        EXPECT_EQ(4U, renames.calls());
        for (unsigned suffix = 0; suffix < 5; ++suffix) {
            std::string name = "app.log";
            if (suffix > 0) {
                name += "." + std::to_string(suffix);
            }
            ASSERT_EQ(row.files[suffix] != nullptr, fs::exists(dir.file(name))) << name;
            if (row.files[suffix] != nullptr) {
                EXPECT_EQ(row.files[suffix], readFile(dir.file(name))) << name;
            }
        }
        log.line("more");
        EXPECT_EQ(*row.next == '\0' ? "more\n" : row.next, readFile(dir.file("app.log.1")));
        EXPECT_EQ("", _err.text());
    }
}

TEST_F(LogAppenderFault, ADeletionThatFailsLeavesTheFileToGoOnWith) {
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

TEST_F(LogAppenderFault, WithoutTheLockTheLineIsWrittenAndNothingUnlocked) {
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

TEST_F(LogAppenderFault, TheLockIsTakenAndLeftOncePerLine) {
    ScriptedCalls locks("pthread_mutex_lock");
    ScriptedCalls unlocks("pthread_mutex_unlock");
    _log.line("one");
    EXPECT_EQ(1U, locks.calls());
    EXPECT_EQ(1U, unlocks.calls());
}

TEST_F(LogAppenderFault, ALineCostsOneWriteAndAnIdentityCheckEveryFiveSeconds) {
    line("first", 1000);
    ScriptedCalls writes("write");
    ScriptedCalls stats("stat");
    ScriptedCalls fstats("fstat");
    ScriptedCalls opens("open");
    for (int i = 0; i < 2000; ++i) {
        _log.line("text", 1000 + i / 100);  // until 1019
    }
    EXPECT_EQ(2000U, writes.calls());
    EXPECT_EQ(3U, stats.calls());  // at 1006, 1012 and 1018
    EXPECT_EQ(0U, fstats.calls());
    EXPECT_EQ(0U, opens.calls());
}

TEST_F(LogAppenderFault, EveryRotationClosesTheFileThatItLeaves) {
    _log._maxSize = 1;
    _log._maxBackupIndex = 2;
    line("first");
    ScriptedCalls opens("open");
    ScriptedCalls closes("close");
    for (int i = 0; i < 5; ++i) {
        line("text");
    }
    EXPECT_EQ(5U, opens.calls());
    EXPECT_EQ(5U, closes.calls());
}

TEST_F(LogAppenderFault, StandardErrorIsNeverExamined) {
    LogAppender appender;
    appender.finalSetup("E");
    ScriptedCalls stats("stat");
    ScriptedCalls fstats("fstat");
    appender.write(stampedAt(1000), "a");
    appender.write(stampedAt(2000), "b");
    EXPECT_EQ(0U, stats.calls());
    EXPECT_EQ(0U, fstats.calls());
}

TEST_F(LogAppenderFault, TheSetupLeavesNoDescriptorOpenWhateverHappens) {
    ScriptedCalls opens("open");
    opens.fail(EMFILE).pass();
    ScriptedCalls closes("close");
    FileAppender failing(_dir.file("b.log"));
    EXPECT_EQ(0U, closes.calls());
    EXPECT_EQ("Error opening \"" + _dir.file("b.log") + "\": " + std::strerror(EMFILE) + "\n",
              _err.text());
    FileAppender working(_dir.file("b.log"));
    EXPECT_EQ(1U, closes.calls());
    EXPECT_FALSE(working._fd.valid());
}
