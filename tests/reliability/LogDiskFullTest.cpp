// Logging to a full disk, and after space is available again.

#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/resource.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <string>

#include "support/FileAppender.h"
#include "support/InChild.h"
#include "support/NumberedLines.h"
#include "support/TempDir.h"
#include "util/LogChannel.h"
#include "util/internal/LogConfig.h"
#include "util/internal/LogGlobals.h"

namespace {

// Ten bytes with the newline.
const std::string LINE = "123456789";

// Limits the size of the files that this process writes.
void limitFileSize(rlim_t bytes) {
    rlimit limit{};
    ASSERT_EQ(0, ::getrlimit(RLIMIT_FSIZE, &limit));
    limit.rlim_cur = bytes;
    ASSERT_EQ(0, ::setrlimit(RLIMIT_FSIZE, &limit));
}

std::string repeated(const std::string& text, unsigned times) {
    std::string all;
    while (times-- > 0) {
        all += text;
    }
    return all;
}

// Configures an appender for each file. "Disk" logs to the first, "Logger" to both. Returns "Disk".
Logger& diskLogger(const std::string& file, const std::string& reports) {
    for (const auto& [name, path] : {std::pair("disk", file), std::pair("reports", reports)}) {
        LogAppender& appender = *LogAppender::find(name, true);
        EXPECT_TRUE(appender.setAttribute("fileName", path.c_str(), Pathname()));
        appender.finalSetup(name);
    }
    EXPECT_TRUE(setup_log_channel("Disk=INFO, disk"));
    EXPECT_TRUE(setup_log_channel("Logger=INFO, disk, reports"));
    static Logger logger("Disk");
    Logger::initialize();
    return logger;
}

}  // namespace

TEST(LogDiskFullTest, LostLinesAreReportedAndLoggingContinuesWhenThereIsRoom) {
    const ChildRun run = inChild([] {
        const TempDir dir;
        ::signal(SIGXFSZ, SIG_IGN);
        Logger& logger = diskLogger(dir.file("app.log"), dir.file("reports.log"));
        writeFile(dir.file("app.log"), std::string(1000, 'x') + "\n");
        limitFileSize(1041);
        for (int line = 0; line < 6; ++line) {
            logger.info(LINE);
        }
        // Four lines fit exactly; two are lost and reported.
        EXPECT_EQ(repeated(LINE + "\n", 4), readFile(dir.file("app.log")).substr(1001));
        const std::string report =
            "Error writing to \"" + dir.file("app.log") + "\": File too large\n";
        EXPECT_EQ(repeated(report, 2), readFile(dir.file("reports.log")));
        limitFileSize(2000);
        logger.info("room again");
        EXPECT_EQ(repeated(LINE + "\n", 4) + "room again\n",
                  readFile(dir.file("app.log")).substr(1001));
        EXPECT_EQ(repeated(report, 2), readFile(dir.file("reports.log")));
    });
    EXPECT_EQ(0, run.status) << run.err;
    EXPECT_EQ("", run.err);
}

TEST(LogDiskFullTest, AnIncompleteLineCountsWithItsWrittenBytes) {
    const ChildRun run = inChild([] {
        const TempDir dir;
        ::signal(SIGXFSZ, SIG_IGN);
        Logger& logger = diskLogger(dir.file("app.log"), dir.file("reports.log"));
        limitFileSize(15);
        logger.info(LINE);
        logger.info(LINE);  // five bytes of it fit
        EXPECT_EQ(LINE + "\n12345", readFile(dir.file("app.log")));
        EXPECT_EQ(15, LogAppender::find("disk", false)->_curSize);
        EXPECT_EQ("", readFile(dir.file("reports.log")));
    });
    EXPECT_EQ(0, run.status) << run.err;
    EXPECT_EQ("", run.err);
}

TEST(LogDiskFullTest, WithoutAnotherAppenderEachLostLineIsReportedOnStandardError) {
    const ChildRun run = inChild([] {
        const TempDir dir;
        int err[2];  // a pipe, because the limit does not apply to pipes
        ASSERT_EQ(0, ::pipe(err));
        ::dup2(err[1], STDERR_FILENO);
        ::signal(SIGXFSZ, SIG_IGN);
        FileAppender log(dir.file("app.log"));
        limitFileSize(10);
        log.line(LINE);
        log.line(LINE);
        log.line(LINE);
        EXPECT_EQ(LINE + "\n", readFile(dir.file("app.log")));
        limitFileSize(20);
        log.line(LINE);
        EXPECT_EQ(LINE + "\n" + LINE + "\n", readFile(dir.file("app.log")));
        char reported[1000];
        const ssize_t length = ::read(err[0], reported, sizeof reported);
        ASSERT_GT(length, 0);
        const std::string report =
            "Error writing to \"" + dir.file("app.log") + "\": File too large\n";
        EXPECT_EQ(repeated(report, 2), std::string(reported, static_cast<std::size_t>(length)));
    });
    EXPECT_EQ(0, run.status);
}

TEST(LogDiskFullTest, LoggingContinuesWhenAFullFileSystemIsCleared) {
    const TempDir dir;
    const ChildRun run = inChild([&dir] {
        if (::unshare(CLONE_NEWNS) != 0 ||
            ::mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0 ||
            ::mount("none", dir.path().c_str(), "tmpfs", 0, "size=64k") != 0) {
            GTEST_SKIP() << "mounting is not allowed here; the cases with a file size limit remain";
        }
        writeFile(dir.file("ballast"), std::string(40000, 'x'));
        FileAppender log(dir.file("app.log"), 8000, 100);
        const std::string line(99, 'y');
        unsigned written = 0;
        for (; textOfGenerations(dir.file("app.log")).size() == written * 100U; ++written) {
            log.line(line);
            ASSERT_LT(written, 1000U) << "the file system does not fill up";
        }
        const std::string before = textOfGenerations(dir.file("app.log"));
        std::filesystem::remove(dir.file("ballast"));
        log.line("room again");
        const std::string after = textOfGenerations(dir.file("app.log"));
        EXPECT_EQ(before + "room again\n", after);
    });
    EXPECT_EQ(0, run.status) << run.err;
}
