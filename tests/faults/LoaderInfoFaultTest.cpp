// The common start-up when memory runs out at any of its allocations.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <new>
#include <string>

#include "support/AllocationProbe.h"
#include "support/Arguments.h"
#include "support/InChild.h"
#include "support/TempDir.h"
#include "util/LoaderInfo.h"
#include "util/LogInternal.h"
#include "util/Logger.h"

namespace fs = std::filesystem;

// A second init() does not free the popt context of the first.
extern "C" const char* __lsan_default_suppressions() {
    return "leak:poptGetContext\n";
}

namespace {

TEST(LoaderInfoTest, FailedStartUpCanBeRepeated) {
    REQUIRE_ALLOCATION_PROBE();
    // All names are too long for the buffer within a std::string.
    const TempDir dir;
    const std::string home = dir.file("an-installation-with-quite-a-long-name");
    const std::string database = "/a/database/with/quite/a/long/name";
    fs::create_directories(home + "/etc");
    writeFile(home + "/etc/log-cmdline.cfg",
              "rootCategory=WARN,an-appender-with-quite-a-long-name\n"
              "appender.an-appender-with-quite-a-long-name.fileName=${QUELTA_HOME}/app.log\n"
              "appender.an-appender-with-quite-a-long-name.layout.ConversionPattern=%p %m%n\n"
              "category.a-category-with-quite-a-long-name=DEBUG\n");
    const Arguments arguments({"-c", "elsewhere"});
    const auto startUp = [&] {
        LoaderInfo::common_main_setup(arguments.argc(), arguments.argv(), nullptr);
    };

    const std::string reached = dir.file("reached");  // created if the n-th allocation failed
    std::size_t n = 1;
    for (bool failed = true; failed; ++n) {
        fs::remove(reached);
        fs::remove(home + "/app.log");
        const ChildRun run = inChild([&] {
            ::dup2(::open("/dev/null", O_WRONLY), STDOUT_FILENO);
            ::setenv("QUELTA_HOME", (home + "//").c_str(), 1);
            ::setenv("QUELTA_DB", (database + "//").c_str(), 1);
            Logger logger("a-category-with-quite-a-long-name");
            try {
                AllocationProbe probe(n);
                startUp();
                if (probe.count() >= n) {
                    probe.stop();
                    writeFile(reached, "");
                }
            } catch (const std::bad_alloc&) {
                writeFile(reached, "");
                EXPECT_FALSE(logger_initialized);
                startUp();
            }
            const LoaderInfo& info = *LoaderInfo::getInstance();
            EXPECT_EQ(home, info.getQueltaHome());
            EXPECT_EQ(database, info.getQueltaDb());
            EXPECT_EQ(home, std::getenv("QUELTA_HOME"));
            EXPECT_EQ(database, std::getenv("QUELTA_DB"));
            EXPECT_EQ("queltad", info.getComponentName());
            EXPECT_TRUE(logger_initialized);
            logger.debug("text");
            EXPECT_EQ("DEBUG text\n", readFile(home + "/app.log"));
        });
        failed = fs::exists(reached);
        ASSERT_EQ(0, run.status) << n << '\n' << run.err;
        ASSERT_EQ("", run.err) << n;
    }
    EXPECT_GT(n, 20U);
}

}  // namespace
