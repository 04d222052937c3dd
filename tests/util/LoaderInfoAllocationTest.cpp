// Memory that runs out at any moment of the common start-up.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <new>
#include <string>

#include "support/AllocationProbe.h"
#include "support/Arguments.h"
#include "support/InChild.h"
#include "support/ScriptedCalls.h"
#include "support/TempDir.h"
#include "util/LoaderInfo.h"
#include "util/internal/LogGlobals.h"
#include "util/Logger.h"

namespace fs = std::filesystem;

extern "C" poptContext __real_poptGetContext(const char* name, int argc, const char** argv,
                                             const struct poptOption* options, unsigned flags);
extern "C" poptContext __wrap_poptGetContext(const char* name, int argc, const char** argv,
                                             const struct poptOption* options, unsigned flags);

extern "C" poptContext __wrap_poptGetContext(const char* name, int argc, const char** argv,
                                             const struct poptOption* options, unsigned flags) {
    return scriptedCall("poptGetContext",
                        [&] { return __real_poptGetContext(name, argc, argv, options, flags); });
}

namespace {

// An installation whose names are all longer than a small string, in an environment that the
// start-up has to clean.
class LoaderInfoAllocationTest : public testing::Test {
protected:
    LoaderInfoAllocationTest() {
        fs::create_directories(_home + "/etc");
        writeFile(_home + "/etc/log-cmdline.cfg",
                  "log4cpp.rootCategory=WARN,an-appender-with-quite-a-long-name\n"
                  "appender.an-appender-with-quite-a-long-name.fileName=${QUELTA_HOME}/app.log\n"
                  "appender.an-appender-with-quite-a-long-name.layout.ConversionPattern=%p %m%n\n"
                  "category.a-category-with-quite-a-long-name=DEBUG\n");
    }

    void startUp() { LoaderInfo::common_main_setup(_arguments.argc(), _arguments.argv(), nullptr); }

    // Expects the record and the logging that a start-up leaves.
    void expectStarted(Logger& logger) {
        const LoaderInfo& info = *LoaderInfo::getInstance();
        EXPECT_EQ(_home, info.getQueltaHome());
        EXPECT_EQ(_database, info.getQueltaDb());
        EXPECT_EQ(_home, std::getenv("QUELTA_HOME"));
        EXPECT_EQ(_database, std::getenv("QUELTA_DB"));
        EXPECT_EQ("queltad", info.getComponentName());
        EXPECT_EQ(8089, info.getPort());
        EXPECT_TRUE(logger_initialized);
        logger.debug("text");
        EXPECT_EQ("DEBUG text\n", readFile(_home + "/app.log"));
    }

    // Runs a body in a child in which the environment stands and standard output is not seen.
    template <typename Body>
    ChildRun inFreshProcess(Body body) {
        return inChild([&] {
            ::dup2(::open("/dev/null", O_WRONLY), STDOUT_FILENO);
            ::setenv("QUELTA_HOME", (_home + "//").c_str(), 1);
            ::setenv("QUELTA_DB", (_database + "//").c_str(), 1);
            body();
        });
    }

    const TempDir _dir;
    const std::string _home = _dir.file("an-installation-with-quite-a-long-name");
    const std::string _database = "/a/database/with/quite/a/long/name";
    const Arguments _arguments{"-c", "elsewhere"};
};

}  // namespace

TEST_F(LoaderInfoAllocationTest, AStartUpThatFailedCanBeMadeAgain) {
    REQUIRE_ALLOCATION_PROBE();
    const std::string reached = _dir.file("reached");
    std::size_t n = 1;
    for (bool failed = true; failed; ++n) {
        fs::remove(reached);
        fs::remove(_home + "/app.log");
        const ChildRun run = inFreshProcess([&] {
            Logger logger("a-category-with-quite-a-long-name");
            bool thrown = false;
            {
                AllocationProbe probe(n);
                try {
                    startUp();
                } catch (const std::bad_alloc&) {
                    thrown = true;
                }
                if (probe.count() >= n) {
                    probe.stop();
                    writeFile(reached, "");
                }
            }
            // It either ends in the exception, before anything can be logged, or has done it all.
            EXPECT_EQ(!thrown, logger_initialized);
            if (thrown) {
                startUp();
            }
            expectStarted(logger);
        });
        failed = fs::exists(reached);
        ASSERT_EQ(0, run.status) << n << '\n' << run.err;
        ASSERT_EQ("", run.err) << n;
    }
    EXPECT_GT(n, 20U);
}

// Either at once, with what has been read already, or after the record has been begun anew.
TEST_F(LoaderInfoAllocationTest, OptionsThatCouldNotBeTakenCanBeTakenAgain) {
    REQUIRE_ALLOCATION_PROBE();
    const std::string reached = _dir.file("reached");
    const std::string value = "a value that is longer than any small string";
    const Arguments arguments{"-c", value.c_str(), "-h", value.c_str(), "-i",     value.c_str(),
                              "-n", value.c_str(), "-p", "1",           "--mode", value.c_str()};
    for (const bool anew : {false, true}) {
        std::size_t n = 1;
        for (bool failed = true; failed; ++n) {
            fs::remove(reached);
            const ChildRun run = inFreshProcess([&] {
                LoaderInfo& info = *LoaderInfo::getInstance();
                info.init(arguments.argc(), arguments.argv());
                bool thrown = false;
                {
                    AllocationProbe probe(n);
                    try {
                        info.populateFromCommandLine();
                    } catch (const std::bad_alloc&) {
                        thrown = true;
                    }
                }
                if (thrown) {
                    writeFile(reached, "");
                    if (anew) {
                        info.init(arguments.argc(), arguments.argv());
                    }
                    info.populateFromCommandLine();
                }
                EXPECT_EQ(value, info._commonConfigPath);
                EXPECT_EQ(value, info.getHost());
                EXPECT_EQ(value, info.getInstallName());
                EXPECT_EQ(value, info.getComponentName());
                EXPECT_EQ(value, info.getStartupMode());
                EXPECT_EQ(1, info.getPort());
                EXPECT_FALSE(info.isError());
            });
            failed = fs::exists(reached);
            ASSERT_EQ(0, run.status) << n << '\n' << run.err;
        }
        EXPECT_GT(n, 5U);
    }
}

// The library of the options takes its memory elsewhere and tells by a null context.
TEST_F(LoaderInfoAllocationTest, GoesOnWithoutAContextForTheOptions) {
    const ChildRun run = inFreshProcess([&] {
        Logger logger("a-category-with-quite-a-long-name");
        ScriptedCalls contexts("poptGetContext");
        contexts.fail(ENOMEM);
        startUp();
        EXPECT_EQ(nullptr, LoaderInfo::getInstance()->_poptContext);
        expectStarted(logger);
    });
    EXPECT_EQ(0, run.status) << run.err;
    EXPECT_EQ("", run.err);
}
