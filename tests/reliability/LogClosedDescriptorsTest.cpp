// Logging in a process that starts with any of the descriptors 0, 1 and 2 closed.

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "support/NumberedLines.h"
#include "support/TempDir.h"
#include "util/Logger.h"
#include "util/Pathname.h"

namespace {

constexpr unsigned LINES = 200;

// The inode of each descriptor's file; 0 if the descriptor is closed.
using Files = std::array<ino_t, 3>;

Files filesOfStandardDescriptors() {
    Files files{};
    for (int fd = 0; fd < 3; ++fd) {
        struct stat status {};
        files[static_cast<std::size_t>(fd)] = ::fstat(fd, &status) == 0 ? status.st_ino : 0;
    }
    return files;
}

// Whether open descriptors are unchanged and closed ones are still closed, except that the first of
// them may now be the log file.
bool nothingIsReopened(const Files& before, const std::string& log) {
    const Files now = filesOfStandardDescriptors();
    Files expected = before;
    const auto free = std::find(expected.begin(), expected.end(), ino_t{0});
    struct stat status {};
    if (free != expected.end() && ::stat(log.c_str(), &status) == 0) {
        *free = status.st_ino;
    }
    return now == expected;
}

// Does what a typical program does: configures logging, logs lines and exits.
[[noreturn]] void runProgram(const TempDir& dir, unsigned closed) {
    for (int fd = 0; fd < 3; ++fd) {
        if ((closed >> fd & 1U) != 0) {
            ::close(fd);
        }
    }
    const Files before = filesOfStandardDescriptors();
    const bool configured = Logger::initialize(Pathname(dir.file("log.cfg")), Pathname(dir.path()));
    static Logger logger("Closed");
    for (unsigned number = 0; number < LINES; ++number) {
        logger.info(numberedLine(0, number));
    }
    if (!nothingIsReopened(before, dir.file("app.log"))) {
        std::exit(9);
    }
    std::exit(configured ? 7 : 8);
}

}  // namespace

TEST(LogClosedDescriptorsTest, TheExitStatusIsUnchangedAndEveryLineIsWhole) {
    for (unsigned closed = 0; closed < 8; ++closed) {
        const TempDir dir;
        writeFile(dir.file("log.cfg"),
                  "rootCategory=INFO,A\n"
                  "appender.A.fileName=${QUELTA_HOME}/app.log\n"
                  "appender.A.maxFileSize=4000\n"
                  "appender.A.maxBackupIndex=50\n"
                  "appender.A.layout.ConversionPattern=%m%n\n");
        std::fflush(nullptr);
        const pid_t child = ::fork();
        if (child == 0) {
            runProgram(dir, closed);
        }
        int status = 0;
        ASSERT_EQ(child, ::waitpid(child, &status, 0));
        EXPECT_TRUE(WIFEXITED(status)) << "closed: " << closed;
        EXPECT_EQ(7, WEXITSTATUS(status)) << "closed: " << closed;
        expectEveryLine(textOfGenerations(dir.file("app.log")), 1, LINES);
    }
}
