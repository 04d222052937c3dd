#include "util/LogAppender.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <iterator>
#include <limits>
#include <string>
#include <type_traits>

#include "support/FileAppender.h"
#include "support/InChild.h"
#include "support/RootLayout.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"
#include "util/LogFormat.h"
#include "util/Pathname.h"

namespace {

const Pathname NO_HOME;

std::string formatted(const LogFormat* layout, const std::string& message) {
    std::string line;
    layout->apply(line, stampedAt(0, WARN), message);
    return line;
}

}  // namespace

TEST(LogAppenderTest, StartsClosedWithoutFileLimitBackupsAndLayout) {
    const LogAppender appender;
    EXPECT_EQ(-1, appender._fd._osdep);
    EXPECT_EQ("", appender._filename);
    EXPECT_EQ(0, appender._maxSize);
    EXPECT_EQ(0, appender._curSize);
    EXPECT_EQ(0U, appender._maxBackupIndex);
    EXPECT_EQ(nullptr, appender._fmt);
}

TEST(LogAppenderTest, KeepsTheOrderOfItsFields) {
    const LogAppender a;
    const void* const fields[] = {&a._fd,      &a._filename,       &a._maxSize,
                                  &a._curSize, &a._maxBackupIndex, &a._fmt,
                                  &a._mutex,   &a._inodeNum,       &a._lastCheck};
    for (std::size_t i = 1; i < std::size(fields); ++i) {
        EXPECT_LT(fields[i - 1], fields[i]) << i;
    }
    static_assert(std::is_same_v<std::int64_t, file_offset_t>);
    static_assert(std::is_same_v<file_offset_t, decltype(LogAppender::_curSize)>);
    static_assert(std::is_same_v<std::uint32_t, decltype(LogAppender::_maxBackupIndex)>);
}

TEST(LogAppenderTest, RootAppenderWritesTheBareMessageToStandardError) {
    const LogAppender& root = rootAppender();
    EXPECT_EQ(STDERR_FILENO, root._fd._osdep);
    EXPECT_EQ("", root._filename);
    EXPECT_EQ(0, root._maxSize);
    EXPECT_EQ(0U, root._maxBackupIndex);
    EXPECT_EQ(&defaultFormat(), root._fmt);

    const StderrCapture err;
    rootAppender().write(stampedAt(0), "a message");
    EXPECT_EQ("a message\n", err.text());
}

TEST(LogAppenderTest, RootAppenderIsNotRotatedOnStandardError) {
    const StderrCapture err;
    ASSERT_TRUE(rootAppender().setAttribute("maxFileSize", "1", NO_HOME));
    rootAppender().write(stampedAt(0), "one");
    rootAppender().write(stampedAt(100), "two");
    ASSERT_TRUE(rootAppender().setAttribute("maxFileSize", "0", NO_HOME));
    EXPECT_EQ("one\ntwo\n", err.text());
    EXPECT_EQ(STDERR_FILENO, rootAppender()._fd._osdep);
}

TEST(LogAppenderTest, RootAppenderGivenAFileLeavesStandardErrorForIt) {
    const TempDir dir;
    const std::string file = dir.file("root.log");
    const ChildRun run = inChild([&] {
        ASSERT_TRUE(rootAppender().setAttribute("fileName", file.c_str(), NO_HOME));
        rootAppender().write(stampedAt(1000), "to the file");
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
    EXPECT_EQ("to the file\n", readFile(file));
}

TEST(LogAppenderTest, FindMakesAnAppenderOnlyWhenAskedTo) {
    EXPECT_EQ(nullptr, LogAppender::find("find.A", false));
    EXPECT_EQ(0U, appenders().count("find.A"));
    LogAppender* const made = LogAppender::find("find.A", true);
    ASSERT_NE(nullptr, made);
    EXPECT_EQ(made, LogAppender::find("find.A", true));
    EXPECT_EQ(made, LogAppender::find("find.A", false));
    EXPECT_EQ(made, appenders().at("find.A"));
    EXPECT_NE(made, LogAppender::find("find.B", true));
    EXPECT_NE(nullptr, LogAppender::find("", true));
    EXPECT_EQ(nullptr, LogAppender::find("find.a", false));
}

TEST(LogAppenderTest, FindKnowsTheRootAppenderWithoutAnEntry) {
    EXPECT_EQ(&rootAppender(), LogAppender::find("rootAppender", false));
    EXPECT_EQ(&rootAppender(), LogAppender::find("rootAppender", true));
    EXPECT_EQ(0U, appenders().count("rootAppender"));
}

TEST(LogAppenderTest, FileNameTakesTheHomeDirectoryForItsVariable) {
    const struct {
        const char* value;
        const char* home;
        const char* expected;
    } table[] = {
        {"/tmp/a.log", "/srv/q", "/tmp/a.log"},
        {"${QUELTA_HOME}/var/log/x.log", "/srv/q", "/srv/q/var/log/x.log"},
        {"${QUELTA_HOME}x.log", "/srv/q", "/srv/qx.log"},
        {"${QUELTA_HOME}", "/srv/q", "/srv/q"},
        {"${QUELTA_HOME}", "", "${QUELTA_HOME}"},
        {"${QUELTA_HOME}/x.log", "", "${QUELTA_HOME}/x.log"},
        {"/a/${QUELTA_HOME}", "/srv/q", "/a/${QUELTA_HOME}"},
        {"${QUELTA_HOME", "/srv/q", "${QUELTA_HOME"},
        {"${quelta_home}/x", "/srv/q", "${quelta_home}/x"},
        {"${QUELTA_HOME}${QUELTA_HOME}", "/srv/q", "/srv/q${QUELTA_HOME}"},
        {"", "/srv/q", ""},
        {"a b\r", "/srv/q", "a b\r"},
    };
    for (const auto& row : table) {
        LogAppender appender;
        EXPECT_TRUE(appender.setAttribute("fileName", row.value, Pathname(row.home)));
        EXPECT_EQ(row.expected, appender._filename) << row.value;
    }
}

TEST(LogAppenderTest, FileNameGivenTwiceJoinsBothValues) {
    LogAppender appender;
    ASSERT_TRUE(appender.setAttribute("fileName", "/tmp/a", NO_HOME));
    ASSERT_TRUE(appender.setAttribute("fileName", "/b.log", NO_HOME));
    EXPECT_EQ("/tmp/a/b.log", appender._filename);
}

TEST(LogAppenderTest, FileNameWithTheHomeVariableBeginsAnew) {
    LogAppender appender;
    ASSERT_TRUE(appender.setAttribute("fileName", "/tmp/a", Pathname("/srv/q")));
    ASSERT_TRUE(appender.setAttribute("fileName", "${QUELTA_HOME}/b", Pathname("/srv/q")));
    EXPECT_EQ("/srv/q/b", appender._filename);
}

TEST(LogAppenderTest, NumbersArePlainDecimalsThatFit) {
    const struct {
        const char* text;
        bool size;
        bool backups;
    } table[] = {
        {"0", true, true},
        {"1", true, true},
        {"25000000", true, true},
        {"4294967295", true, true},
        {"4294967296", true, false},
        {"9223372036854775807", true, false},
        {"9223372036854775808", false, false},
        {"18446744073709551616", false, false},
        {"99999999999999999999999999", false, false},
        {"", false, false},
        {"0100", false, false},
        {"007", false, false},
        {"00", false, false},
        {"+5", false, false},
        {"-5", false, false},
        {"-0", false, false},
        {"10MB", false, false},
        {"1 ", false, false},
        {" 1", false, false},
        {"1\r", false, false},
        {"0x10", false, false},
        {"1.0", false, false},
        {"1e3", false, false},
        {"\xd9\xa1", false, false},
    };
    for (const auto& row : table) {
        LogAppender appender;
        appender._maxSize = 77;
        appender._maxBackupIndex = 77;
        EXPECT_EQ(row.size, appender.setAttribute("maxFileSize", row.text, NO_HOME)) << row.text;
        EXPECT_EQ(row.size ? std::stoll(row.text) : 77, appender._maxSize) << row.text;
        EXPECT_EQ(row.backups, appender.setAttribute("maxBackupIndex", row.text, NO_HOME))
            << row.text;
        EXPECT_EQ(row.backups ? std::stoul(row.text) : 77, appender._maxBackupIndex) << row.text;
    }
}

TEST(LogAppenderTest, LayoutsAreSelectedByName) {
    LogAppender appender;
    ASSERT_TRUE(appender.setAttribute("layout", "PatternLayout", NO_HOME));
    EXPECT_EQ(nullptr, appender._fmt);
    ASSERT_TRUE(appender.setAttribute("layout", "SimpleLayout", NO_HOME));
    EXPECT_EQ("WARN    : text\n", formatted(appender._fmt, "text"));
    ASSERT_TRUE(appender.setAttribute("layout", "PatternLayout", NO_HOME));
    EXPECT_EQ("WARN    : text\n", formatted(appender._fmt, "text"));
    ASSERT_TRUE(appender.setAttribute("layout", "BasicLayout", NO_HOME));
    EXPECT_EQ("%R %p %c %m%n", appender._fmt->_fmt);
    ASSERT_TRUE(appender.setAttribute("layout.ConversionPattern", "<%m>", NO_HOME));
    EXPECT_EQ("<text>", formatted(appender._fmt, "text"));
    ASSERT_TRUE(appender.setAttribute("layout.ConversionPattern", "", NO_HOME));
    EXPECT_EQ("", formatted(appender._fmt, "text"));
}

TEST(LogAppenderTest, NamedLayoutsAreShared) {
    LogAppender a;
    LogAppender b;
    for (const char* const name : {"BasicLayout", "SimpleLayout"}) {
        ASSERT_TRUE(a.setAttribute("layout", name, NO_HOME));
        ASSERT_TRUE(b.setAttribute("layout", name, NO_HOME));
        EXPECT_EQ(a._fmt, b._fmt) << name;
    }
}

TEST(LogAppenderTest, UnknownKeysAndLayoutsChangeNothing) {
    const struct {
        const char* key;
        const char* value;
    } table[] = {
        {"filename", "/tmp/a"},
        {"FileName", "/tmp/a"},
        {"fileName ", "/tmp/a"},
        {"maxfilesize", "1"},
        {"maxBackup", "1"},
        {"Layout", "SimpleLayout"},
        {"layout", "simpleLayout"},
        {"layout", "SimpleLayout "},
        {"layout", "BasicLayoutX"},
        {"layout", ""},
        {"layout.conversionPattern", "%m"},
        {"layout.", "%m"},
        {"ConversionPattern", "%m"},
        {"", "x"},
    };
    for (const auto& row : table) {
        LogAppender appender;
        EXPECT_FALSE(appender.setAttribute(row.key, row.value, NO_HOME)) << row.key;
        EXPECT_EQ("", appender._filename) << row.key;
        EXPECT_EQ(0, appender._maxSize) << row.key;
        EXPECT_EQ(0U, appender._maxBackupIndex) << row.key;
        EXPECT_EQ(nullptr, appender._fmt) << row.key;
    }
}

TEST(LogAppenderTest, SetupWithoutFileTurnsToStandardErrorAndSaysWhatItIgnores) {
    const struct {
        long long maxSize;
        unsigned backups;
        const char* expected;
    } table[] = {
        {0, 0, "Appender \"E\" has no filename, assuming stderr\n"},
        {0, 3,
         "Appender \"E\" has no filename, assuming stderr\n"
         "Appender \"E\" has maxBackupIndex set without specifying a filename, ignoring\n"},
        {1, 0,
         "Appender \"E\" has no filename, assuming stderr\n"
         "Appender \"E\" has maxSize set without specifying a filename, ignoring\n"},
        {5, 3,
         "Appender \"E\" has no filename, assuming stderr\n"
         "Appender \"E\" has maxBackupIndex set without specifying a filename, ignoring\n"
         "Appender \"E\" has maxSize set without specifying a filename, ignoring\n"},
    };
    for (const auto& row : table) {
        const StderrCapture err;
        LogAppender appender;
        appender._maxSize = row.maxSize;
        appender._maxBackupIndex = row.backups;
        appender.finalSetup("E");
        EXPECT_EQ(row.expected, err.text());
        EXPECT_EQ(STDERR_FILENO, appender._fd._osdep);
        EXPECT_EQ(0, appender._maxSize);
        EXPECT_EQ(0U, appender._maxBackupIndex);
        EXPECT_EQ(rootAppender()._fmt, appender._fmt);
        appender.write(stampedAt(0), "line");
        EXPECT_EQ(std::string(row.expected) + "line\n", err.text());
    }
}

TEST(LogAppenderTest, SetupIgnoresBackupsWithoutALimit) {
    const TempDir dir;
    const StderrCapture err;
    const FileAppender log(dir.file("a.log"), 0, 3);
    EXPECT_EQ("Appender \"Test\" has maxBackupIndex set without specifying maxSize, ignoring\n",
              err.text());
    EXPECT_EQ(0U, log._maxBackupIndex);
}

TEST(LogAppenderTest, SetupCreatesTheFileAndClosesItAgain) {
    const TempDir dir;
    const FileAppender log(dir.file("a.log"), 10, 1);
    EXPECT_EQ("", readFile(dir.file("a.log")));
    EXPECT_FALSE(log._fd.valid());
}

TEST(LogAppenderTest, SetupReportsAPathThatCannotBeOpenedAndTriesAgainWithEachLine) {
    const TempDir dir;
    const std::string file = dir.file("missing/a.log");
    const std::string report = "Error opening \"" + file + "\": No such file or directory\n";
    const StderrCapture err;
    FileAppender log(file);
    EXPECT_EQ(report, err.text());
    log.line("lost");
    EXPECT_EQ(report + report, err.text());
    std::filesystem::create_directory(dir.file("missing"));
    log.line("written");
    EXPECT_EQ(report + report, err.text());
    EXPECT_EQ("written\n", readFile(file));
}

TEST(LogAppenderTest, SetupClosesAFileThatAReportHasAlreadyOpened) {
    const TempDir dir;
    LogAppender appender;
    ASSERT_TRUE(appender.setAttribute("fileName", dir.file("a.log").c_str(), NO_HOME));
    appender.write(stampedAt(1000), "before the setup");  // in the root appender's layout
    const int descriptor = appender._fd._osdep;
    ASSERT_GE(descriptor, 0);
    appender.finalSetup("E");
    EXPECT_FALSE(appender._fd.valid());
    struct stat status;
    EXPECT_EQ(-1, ::fstat(descriptor, &status));
    EXPECT_EQ("before the setup\n", readFile(dir.file("a.log")));
}

TEST(LogAppenderTest, WarnsOfItsSettingsOnTheLoggerOfTheSubsystem) {
    const TempDir dir;
    const StderrCapture err;
    const RootLayout layout("%p %c %m%n");
    LogAppender bare;
    bare._maxSize = 5;
    bare._maxBackupIndex = 3;
    bare.finalSetup("bare");
    LogAppender unlimited;
    unlimited._filename = dir.file("a.log");
    unlimited._maxBackupIndex = 3;
    unlimited.finalSetup("unlimited");
    const std::string prefix = "WARN Logger Appender ";
    EXPECT_EQ(
        prefix + "\"bare\" has no filename, assuming stderr\n" +  //
            prefix + "\"bare\" has maxBackupIndex set without specifying a filename, ignoring\n" +
            prefix + "\"bare\" has maxSize set without specifying a filename, ignoring\n" + prefix +
            "\"unlimited\" has maxBackupIndex set without specifying maxSize, ignoring\n",
        err.text());
}

TEST(LogAppenderTest, AFileThatCannotBeOpenedIsAnErrorAndALineThatCannotBeWrittenIsCritical) {
    const TempDir dir;
    const StderrCapture err;
    const RootLayout layout("%p %c %m%n");
    const std::string missing = dir.file("missing/a.log");
    const FileAppender unopened(missing);
    FileAppender full("/dev/full");
    full.line("lost");
    EXPECT_EQ("ERROR Logger Error opening \"" + missing +
                  "\": No such file or directory\n"
                  "CRIT Logger Error writing to \"/dev/full\": No space left on device\n",
              err.text());
}

TEST(LogAppenderTest, AppendsToAnExistingFile) {
    const TempDir dir;
    writeFile(dir.file("a.log"), "old\n");
    FileAppender log(dir.file("a.log"));
    log.line("new");
    EXPECT_EQ("old\nnew\n", readFile(dir.file("a.log")));
    EXPECT_EQ(8, log._curSize);
}

TEST(LogAppenderTest, WritesTheMessageAsItStands) {
    const TempDir dir;
    FileAppender log(dir.file("a.log"));
    const std::string message("%s %n \0 \x80\xff\n\x1b[0m", 16);
    log.line(message);
    EXPECT_EQ(message + "\n", readFile(dir.file("a.log")));
}

TEST(LogAppenderTest, ALineWithoutTextIsNoFailure) {
    const TempDir dir;
    const StderrCapture err;
    LogAppender appender;
    ASSERT_TRUE(appender.setAttribute("fileName", dir.file("a.log").c_str(), NO_HOME));
    ASSERT_TRUE(appender.setAttribute("layout.ConversionPattern", "", NO_HOME));
    appender.finalSetup("E");
    appender.write(stampedAt(1000), "text");
    EXPECT_TRUE(appender._fd.valid());
    EXPECT_EQ("", readFile(dir.file("a.log")));
    EXPECT_EQ("", err.text());
}

TEST(LogAppenderTest, CreatesFilesWithTheUsualPermissionsLessTheMask) {
    const TempDir dir;
    for (const mode_t mask : {0U, 022U, 027U, 077U}) {
        const std::string file = dir.file("mask" + std::to_string(mask));
        const mode_t before = ::umask(mask);
        {
            FileAppender log(file, 1, 1);
            log.line("rotated");
        }
        ::umask(before);
        struct stat status;
        ASSERT_EQ(0, ::stat(file.c_str(), &status)) << file;
        EXPECT_EQ(0644U & ~mask, status.st_mode & 07777U) << file;
    }
}

TEST(LogAppenderTest, AWriteErrorOnStandardErrorKeepsTheDescriptor) {
    LogAppender appender;
    appender._fmt = &defaultFormat();
    appender._fd = FileDescriptor(::open("/dev/full", O_WRONLY));
    ASSERT_TRUE(appender._fd.valid());
    const StderrCapture err;
    appender.write(stampedAt(0), "lost");
    EXPECT_TRUE(appender._fd.valid());
    EXPECT_EQ("Error writing to \"\": No space left on device\n", err.text());
    appender._fd.close();
}

TEST(LogAppenderTest, AFullDeviceIsReportedForEachLineThatIsLost) {
    const StderrCapture err;
    FileAppender log("/dev/full");
    log.line("one");
    EXPECT_FALSE(log._fd.valid());
    log.line("two");
    const std::string report = "Error writing to \"/dev/full\": No space left on device\n";
    EXPECT_EQ(report + report, err.text());
}
