// The C library's memory that runs out at any moment of the common start-up: what popt, the
// environment and standard output take, and operator new beneath everything else.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <new>
#include <sstream>
#include <string>

#include "support/Arguments.h"
#include "support/InChild.h"
#include "support/TempDir.h"
#include "util/LoaderInfo.h"
#include "util/internal/LogGlobals.h"
#include "util/Logger.h"

namespace fs = std::filesystem;

namespace {

// Allocations that succeed before one fails; negative: all succeed.
long allocationsLeft = -1;

bool takeAllocation() {
    if (allocationsLeft < 0 || allocationsLeft-- > 0) {
        return true;
    }
    errno = ENOMEM;
    return false;
}

}  // namespace

extern "C" {
void* __libc_malloc(std::size_t size);
void* __libc_calloc(std::size_t count, std::size_t size);
void* __libc_realloc(void* block, std::size_t size);

void* malloc(std::size_t size) noexcept {
    return takeAllocation() ? __libc_malloc(size) : nullptr;
}
void* calloc(std::size_t count, std::size_t size) noexcept {
    return takeAllocation() ? __libc_calloc(count, size) : nullptr;
}
void* realloc(void* block, std::size_t size) noexcept {
    return takeAllocation() ? __libc_realloc(block, size) : nullptr;
}
}

namespace {

// What a child said but for libxml2's own word about memory.
std::string withoutXmlErrors(const std::string& text) {
    std::istringstream in(text);
    std::string rest;
    for (std::string line; std::getline(in, line);) {
        if (line.find("Memory allocation failed") == std::string::npos) {
            rest += line + '\n';
        }
    }
    return rest;
}

}  // namespace

// Every start-up ends in one of four ways: done; done, but the configuration could not be opened;
// in the exception, and can be made again; in popt's own word about it.
TEST(LoaderInfoMallocTest, AStartUpNeverCrashes) {
    const TempDir dir;
    const std::string home = dir.file("an-installation-with-quite-a-long-name");
    const std::string config = home + "/etc/log-cmdline.cfg";
    fs::create_directories(home + "/etc");
    writeFile(config,
              "rootCategory=INFO,an-appender-with-quite-a-long-name\n"
              "appender.an-appender-with-quite-a-long-name.fileName=${QUELTA_HOME}/app.log\n");
    const Arguments arguments{"-c", "elsewhere"};
    const std::string unopened =
        "Couldn't open log file configuration \"" + config + "\": Cannot allocate memory\n";
    const std::string reached = dir.file("reached");

    unsigned done = 0;
    unsigned unconfigured = 0;
    bool failed = true;
    for (long n = 0; failed; ++n) {
        fs::remove(reached);
        fs::remove(home + "/app.log");
        const ChildRun run = inChild([&] {
            ::dup2(::open("/dev/null", O_WRONLY), STDOUT_FILENO);
            ::setenv("QUELTA_HOME", (home + "//").c_str(), 1);
            writeFile(reached, "");
            allocationsLeft = n;
            try {
                LoaderInfo::common_main_setup(arguments.argc(), arguments.argv(), nullptr);
            } catch (const std::bad_alloc&) {
                allocationsLeft = -1;
                EXPECT_FALSE(logger_initialized);
                LoaderInfo::common_main_setup(arguments.argc(), arguments.argv(), nullptr);
            }
            const bool untouched = allocationsLeft >= 0;
            allocationsLeft = -1;
            if (untouched) {
                fs::remove(reached);
            }
            EXPECT_TRUE(logger_initialized);
            EXPECT_EQ(home, LoaderInfo::getInstance()->getQueltaHome());
            Logger("Any").info("text");
        });
        failed = fs::exists(reached);
        const std::string err = withoutXmlErrors(run.err);
        if (err == "virtual memory exhausted.\n") {
            EXPECT_EQ(EXIT_FAILURE, run.status) << n;
        } else if (err == unopened + "text\n") {
            EXPECT_EQ(0, run.status) << n;
            ++unconfigured;
        } else {
            ASSERT_EQ(0, run.status) << n << '\n' << err;
            ASSERT_EQ("", err) << n;
            EXPECT_EQ("text\n", readFile(home + "/app.log")) << n;
            ++done;
        }
    }
    EXPECT_GT(done, 20U);
    EXPECT_GT(unconfigured, 0U);
}
