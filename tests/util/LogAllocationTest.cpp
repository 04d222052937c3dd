// Memory that runs out at any moment while a line is written or the configuration is read.

#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <new>
#include <string>

#include "support/AllocationProbe.h"
#include "support/FileAppender.h"
#include "support/InChild.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"
#include "util/LogChannel.h"
#include "util/LogInternal.h"

namespace fs = std::filesystem;

namespace {

// Longer than any small string.
const std::string LINE = "a line that is too long to be kept without an allocation";

std::string everythingIn(const TempDir& dir) {
    std::string all;
    for (const auto& entry : fs::directory_iterator(dir.path())) {
        all += readFile(entry.path());
    }
    return all;
}

unsigned countOf(const std::string& what, const std::string& text) {
    unsigned count = 0;
    for (std::size_t at = 0; (at = text.find(what, at)) != std::string::npos; at += what.size()) {
        ++count;
    }
    return count;
}

long openFiles() {
    const fs::directory_iterator entries("/proc/self/fd");
    return std::distance(fs::begin(entries), fs::end(entries));
}

}  // namespace

TEST(LogAllocation, ALineIsEitherWrittenOrRefusedAndTheLockIsFree) {
    REQUIRE_ALLOCATION_PROBE();
    bool refused = false;
    bool failed = true;
    for (std::size_t n = 1; failed; ++n) {
        const TempDir dir;
        const StderrCapture err;
        FileAppender log(dir.file("a-name-that-is-too-long-for-a-small-string.log"), 1, 3);
        const LogMsgMetadata mdata = stampedAt(1000);
        bool thrown = false;
        errno = EDOM;
        {
            AllocationProbe probe(n);
            try {
                log.write(mdata, LINE);
            } catch (const std::bad_alloc&) {
                thrown = true;
            }
            failed = probe.count() >= n;
            EXPECT_EQ(0, probe.live()) << n;
        }
        EXPECT_EQ(EDOM, errno) << n;
        EXPECT_TRUE(log._mutex.tryLock()) << n;
        log._mutex.NOLOG_unlock();
        EXPECT_EQ(thrown ? 0U : 1U, countOf(LINE, everythingIn(dir))) << n;
        log.line("next");
        EXPECT_EQ(1U, countOf("next\n", everythingIn(dir))) << n;
        EXPECT_EQ("", err.text()) << n;
        refused = refused || thrown;
    }
    EXPECT_TRUE(refused);
}

TEST(LogAllocation, AMessageReachesTheFileOrStandardErrorExactlyOnce) {
    REQUIRE_ALLOCATION_PROBE();
    std::size_t n = 1;
    for (bool failed = true; failed; ++n) {
        const TempDir dir;
        const std::string flag = dir.file("failed");
        const ChildRun run = inChild([&] {
            FileAppender log(dir.file("a-name-that-is-too-long-for-a-small-string.log"), 1, 3);
            Logger::initialize();
            Logger logger("any");
            LogChannel channel;
            channel._appenders = {&log};
            logger._channel = &channel;
            AllocationProbe probe(n);
            errno = EDOM;
            logger.info(LINE);
            EXPECT_EQ(EDOM, errno);
            EXPECT_EQ(0, probe.live());
            const bool reached = probe.count() >= n;
            probe.stop();
            if (reached) {
                writeFile(flag, "");
            }
            logger.info("next");
        });
        failed = fs::exists(flag);
        EXPECT_EQ(0, run.status) << n;
        EXPECT_EQ(1U, countOf(LINE, everythingIn(dir) + run.err)) << n;
        EXPECT_EQ(1U, countOf("next", everythingIn(dir))) << n;
    }
    EXPECT_GT(n, 2U);
}

TEST(LogAllocation, TheReportOfALostLineIsGivenUpWithoutHarm) {
    REQUIRE_ALLOCATION_PROBE();
    bool failed = true;
    for (std::size_t n = 1; failed; ++n) {
        const StderrCapture err;
        FileAppender log("/dev/full");
        const LogMsgMetadata mdata = stampedAt(1000);
        {
            AllocationProbe probe(n);
            try {
                log.write(mdata, LINE);
            } catch (const std::bad_alloc&) {}
            failed = probe.count() >= n;
            EXPECT_EQ(0, probe.live()) << n;
        }
        EXPECT_TRUE(log._mutex.tryLock()) << n;
        log._mutex.NOLOG_unlock();
        const std::string before = err.text();
        log.line("lost");
        EXPECT_EQ(before + "Error writing to \"/dev/full\": No space left on device\n", err.text());
    }
}

TEST(LogAllocation, AttributesAndAppendersCanBeTriedAgain) {
    REQUIRE_ALLOCATION_PROBE();
    const struct {
        const char* key;
        const char* value;
    } table[] = {{"fileName", "${QUELTA_HOME}/a/name/that/is/longer/than/any/small/string"},
                 {"fileName", "/a/name/that/is/longer/than/any/small/string/of/any/library"},
                 {"maxFileSize", "1"},
                 {"layout", "SimpleLayout"},
                 {"layout", "BasicLayout"},
                 {"layout.ConversionPattern", "%d{DATE} %m and some more than sixteen atoms%n"}};
    const Pathname home("/a/home/that/is/longer/than/any/small/string");
    const std::string name = "a name that is longer than any small string";
    for (const auto& row : table) {
        const ChildRun run = inChild([&] {
            const std::string key = row.key;
            LogAppender expected;
            bool failed = true;
            for (std::size_t n = 1; failed; ++n) {
                LogAppender* found = nullptr;
                {
                    AllocationProbe probe(n);
                    try {
                        found = LogAppender::find(name + std::to_string(n), true);
                        (void)found->setAttribute(key, row.value, home);
                    } catch (const std::bad_alloc&) {}
                    failed = probe.count() >= n;
                }
                found = LogAppender::find(name + std::to_string(n), true);
                ASSERT_NE(nullptr, found);
                if (failed) {
                    EXPECT_TRUE(found->setAttribute(key, row.value, home));
                }
                if (n == 1) {
                    EXPECT_TRUE(expected.setAttribute(key, row.value, home));
                }
                EXPECT_EQ(expected._filename, found->_filename);
                EXPECT_EQ(expected._maxSize, found->_maxSize);
                EXPECT_EQ(expected._fmt == nullptr, found->_fmt == nullptr);
            }
        });
        EXPECT_EQ(0, run.status) << row.key;
        EXPECT_EQ("", run.err) << row.key;
    }
}

TEST(LogAllocation, ReadingTheConfigurationCanBeTriedAgain) {
    REQUIRE_ALLOCATION_PROBE();
    const TempDir dir;
    const std::string cfg = dir.file("log.cfg");
    writeFile(cfg,
              "log4cpp.rootCategory=WARN,an-appender-with-quite-a-long-name<!-- a\n"
              "comment -->\n"
              "appender.an-appender-with-quite-a-long-name.fileName=${QUELTA_HOME}/app.log\n"
              "appender.an-appender-with-quite-a-long-name.layout=SimpleLayout\n"
              "appender.an-appender-with-quite-a-long-name.layout.ConversionPattern=%p %m%n\n"
              "category.a-category-with-quite-a-long-name=DEBUG\n"
              "a line that is no good and longer than a small string\n"
              "category.another-category-with-a-long-name=BOGUS,UNKNOWN\n");
    const std::string expected =
        "WARN " + cfg +
        ":7: Parse error at \"a line that is no good and longer than a small "
        "string\"\nWARN " +
        cfg +
        ":8: Parse error at "
        "\"another-category-with-a-long-name=BOGUS,UNKNOWN\"\n";
    const Pathname home(dir.path());
    std::size_t n = 1;
    for (bool failed = true; failed; ++n) {
        fs::remove(dir.file("app.log"));
        fs::remove(dir.file("failed"));
        const ChildRun run = inChild([&] {
            Logger waiting("a-category-with-quite-a-long-name");
            const Pathname file(cfg);
            const long before = openFiles();
            bool reached = false;
            {
                AllocationProbe probe(n);
                try {
                    EXPECT_TRUE(Logger::initialize(file, home));
                } catch (const std::bad_alloc&) {
                    EXPECT_FALSE(logger_initialized);
                }
                reached = probe.count() >= n;
            }
            EXPECT_EQ(before, openFiles() - (fs::exists(dir.file("app.log")) ? 1 : 0));
            if (reached) {
                writeFile(dir.file("failed"), "");
            }
            if (!logger_initialized) {
                EXPECT_TRUE(Logger::initialize(file, home));
                EXPECT_EQ(expected, readFile(dir.file("app.log")));
            }
            waiting.debug("text");
            EXPECT_EQ(1U, countOf("DEBUG text\n", readFile(dir.file("app.log"))));
        });
        failed = fs::exists(dir.file("failed"));
        ASSERT_EQ(0, run.status) << n << '\n' << run.err;
    }
    EXPECT_GT(n, 20U);
}

// Configurations that leave things to be made for the first time when logging has begun already.
TEST(LogAllocation, StartingFromLittleEndsInTheExceptionOrIsDone) {
    REQUIRE_ALLOCATION_PROBE();
    const char* const configs[] = {nullptr,
                                   "",
                                   "bad and longer than a small string\n",
                                   "rootCategory=WARN\n",
                                   "category.a-category-with-quite-a-long-name=WARN\n",
                                   "appender.an-appender-with-quite-a-long-name=x\n"};
    const TempDir dir;
    const Pathname cfg(dir.file("log.cfg"));
    for (const char* const config : configs) {
        if (config != nullptr) {
            writeFile(cfg, config);
        }
        SCOPED_TRACE(config == nullptr ? "none" : config);
        bool failed = true;
        for (std::size_t n = 1; failed; ++n) {
            fs::remove(dir.file("failed"));
            const ChildRun run = inChild([&] {
                Logger waiting("another-category-with-a-long-name");
                bool thrown = false;
                {
                    AllocationProbe probe(n);
                    try {
                        EXPECT_EQ(config != nullptr, Logger::initialize(cfg, Pathname()));
                    } catch (const std::bad_alloc&) {
                        thrown = true;
                    }
                    if (probe.count() >= n) {
                        probe.stop();
                        writeFile(dir.file("failed"), "");
                    }
                }
                EXPECT_EQ(!thrown, logger_initialized);
                if (thrown) {
                    EXPECT_EQ(config != nullptr, Logger::initialize(cfg, Pathname()));
                }
                EXPECT_NE(nullptr, waiting._channel);
                EXPECT_EQ(nullptr, uninitialized_loggers);
            });
            failed = fs::exists(dir.file("failed"));
            ASSERT_EQ(0, run.status) << n << '\n' << run.err;
        }
    }
}
