#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "support/InChild.h"
#include "support/RecordedWrites.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"
#include "util/LogFormat.h"
#include "util/Logger.h"
#include "util/Timeval.h"
#include "util/internal/LogGlobals.h"

namespace {
std::vector<std::string> lookups;    // the names; "+" marks a lookup with creation
std::function<void()> duringLookup;  // called by each
}  // namespace

static void recordLookup(const std::string& name, bool create) {
    lookups.push_back(name + (create ? "+" : ""));
    if (duringLookup) {
        duringLookup();
    }
}

// The two forms of LogChannel::find.
// clang-format off
#define FIND_TEXT(prefix) prefix##__ZN10LogChannel4findEPKcb
#ifdef _LIBCPP_VERSION
#define FIND_STRING(prefix) \
    prefix##__ZN10LogChannel4findERKNSt3__112basic_stringIcNS0_11char_traitsIcEENS0_9allocatorIcEEEEb
#else
#define FIND_STRING(prefix) \
    prefix##__ZN10LogChannel4findERKNSt7__cxx1112basic_stringIcSt11char_traitsIcESaIcEEEb
#endif
// clang-format on
extern "C" {
LogChannel* FIND_TEXT(__real)(const char* name, bool create);
LogChannel* FIND_TEXT(__wrap)(const char* name, bool create) {
    recordLookup(name, create);
    return FIND_TEXT(__real)(name, create);
}
LogChannel* FIND_STRING(__real)(const std::string& name, bool create);
LogChannel* FIND_STRING(__wrap)(const std::string& name, bool create) {
    recordLookup(name, create);
    return FIND_STRING(__real)(name, create);
}
}

namespace {

// Logging is initialized once per process, so the cases that do it run in children.
void expectInChild(const std::string& standardError, void (*body)()) {
    const ChildRun run = inChild(body);
    EXPECT_EQ(0, run.status);
    EXPECT_EQ(standardError, run.err);
}

TEST(LoggerBindingTest, InitializationBindsWaitingLoggersNewestFirst) {
    expectInChild("", [] {
        const Logger oldest("oldest");
        const Logger middle("middle");
        const Logger newest("newest");
        LogChannel* const channel = LogChannel::find("middle", true);
        lookups.clear();
        EXPECT_FALSE(logger_initialized);
        duringLookup = [] { EXPECT_TRUE(logger_initialized); };
        Logger::initialize();
        ASSERT_LE(3u, lookups.size());
        EXPECT_EQ("newest", lookups[0]);
        EXPECT_EQ("middle", lookups[1]);
        EXPECT_EQ("oldest", lookups[2]);
        EXPECT_EQ(nullptr, uninitialized_loggers);
        EXPECT_EQ(nullptr, newest._next);
        EXPECT_EQ(&rootChannel(), oldest._channel);
        EXPECT_EQ(channel, middle._channel);
        EXPECT_EQ(&rootChannel(), newest._channel);
    });
}

TEST(LoggerBindingTest, TheConfigurationFileIsClosedBeforeChannelsAreSetUp) {
    const TempDir dir;
    const std::string cfg = dir.file("log.cfg");
    writeFile(cfg, "category.X=DEBUG\n");
    const ChildRun run = inChild([&] {
        lookups.clear();
        duringLookup = [&] {
            for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
                std::error_code gone;  // the iterator's own descriptor
                EXPECT_NE(cfg, std::filesystem::read_symlink(entry.path(), gone));
            }
        };
        EXPECT_TRUE(Logger::initialize(Pathname(cfg), Pathname()));
        ASSERT_FALSE(lookups.empty());
        EXPECT_EQ("X+", lookups[0]);
    });
    EXPECT_EQ(0, run.status);
}

TEST(LoggerBindingTest, LaterLoggersAreBoundAtOnce) {
    expectInChild("", [] {
        LogChannel* const channel = LogChannel::find("known", true);
        Logger::initialize();
        lookups.clear();
        const Logger known("known");
        const Logger unknown("unknown");
        EXPECT_EQ((std::vector<std::string>{"known", "unknown"}), lookups);
        EXPECT_EQ(channel, known._channel);
        EXPECT_EQ(&rootChannel(), unknown._channel);
        EXPECT_EQ(nullptr, uninitialized_loggers);
        EXPECT_EQ(nullptr, unknown._next);
    });
}

TEST(LoggerBindingTest, BindingHappensOnce) {
    expectInChild("", [] {
        const Logger waiting("name");
        Logger::initialize();
        const Logger early("name");
        EXPECT_TRUE(Logger::setChannelLevel("name", "DEBUG"));
        const Logger late("name");
        EXPECT_EQ(&rootChannel(), waiting._channel);
        EXPECT_EQ(&rootChannel(), early._channel);
        EXPECT_EQ(LogChannel::find("name", false), late._channel);
        EXPECT_FALSE(waiting.isDebugEnabled());
        EXPECT_TRUE(late.isDebugEnabled());
    });
}

TEST(LoggerBindingTest, ADestroyedLoggerIsNotBound) {
    expectInChild("", [] {
        const Logger kept("kept");
        std::make_unique<Logger>("gone").reset();
        lookups.clear();
        Logger::initialize();
        ASSERT_FALSE(lookups.empty());
        EXPECT_EQ("kept", lookups[0]);
        for (const std::string& name : lookups) {
            EXPECT_NE("gone", name);
        }
    });
}

TEST(LoggerBindingTest, InitializationFixesTheEpoch) {
    expectInChild("", [] {
        const Timeval before = Timeval::now();
        Logger::initialize();
        const Timeval after = Timeval::now();
        while (Timeval::now() <= after) {}
        EXPECT_LE(before, epoch_timeval());
        EXPECT_LE(epoch_timeval(), after);
        EXPECT_EQ(&epoch_timeval(), &epoch_timeval());
    });
}

TEST(LoggerBindingTest, AnEpochThatWasAskedForEarlierStays) {
    expectInChild("", [] {
        const Timeval epoch = epoch_timeval();
        while (Timeval::now() <= epoch) {}
        Logger::initialize();
        EXPECT_LE(epoch_timeval(), epoch);
    });
}

using LoggerBindingDeathTest = testing::Test;

TEST(LoggerBindingDeathTest, InitializingTwiceAborts) {
    EXPECT_DEATH(
        {
            Logger::initialize();
            Logger::initialize();
        },
        "^src/util/Logger\\.cpp:[0-9]+: failed assertion `!logger_initialized'\n$");
}

TEST(LoggerBindingTest, SetsTheLevelOfTheRootChannelForNull) {
    expectInChild("", [] {
        EXPECT_TRUE(Logger::setChannelLevel(nullptr, "CRIT"));
        EXPECT_EQ(CRIT, rootChannel().minlevel);
        EXPECT_FALSE(Logger::setChannelLevel(nullptr, "crit"));
        EXPECT_FALSE(Logger::setChannelLevel(nullptr, ""));
        EXPECT_EQ(CRIT, rootChannel().minlevel);
        EXPECT_TRUE(Logger::setChannelLevel(nullptr, "DEBUG"));
        EXPECT_EQ(DEBUG, rootChannel().minlevel);
    });
}

TEST(LoggerBindingTest, SetsTheLevelOfAChannelThatItCreates) {
    expectInChild("", [] {
        lookups.clear();
        EXPECT_TRUE(Logger::setChannelLevel("new", "FATAL"));
        EXPECT_EQ(std::vector<std::string>{"new+"}, lookups);
        EXPECT_EQ(FATAL, LogChannel::find("new", false)->minlevel);
        EXPECT_TRUE(Logger::setChannelLevel("new", "NOTICE"));
        EXPECT_EQ(NOTICE, LogChannel::find("new", false)->minlevel);
        EXPECT_EQ(INFO, rootChannel().minlevel);
    });
}

TEST(LoggerBindingTest, AWordThatIsNotALevelStillCreatesTheChannel) {
    expectInChild("", [] {
        EXPECT_FALSE(Logger::setChannelLevel("new", "loud"));
        EXPECT_NE(&rootChannel(), LogChannel::find("new", false));
        EXPECT_EQ(INFO, LogChannel::find("new", false)->minlevel);
    });
}

TEST(LoggerBindingTest, DebuggingIsEnabledByTheLevelOfTheBoundChannel) {
    expectInChild("", [] {
        LogChannel channel;
        Logger logger("name");
        for (int level = DEBUG; level <= EMERG; ++level) {
            // The root channel counts only while the logger is not bound.
            rootChannel().minlevel = level == DEBUG ? INFO : DEBUG;
            channel.minlevel = static_cast<LogLevel>(level);
            logger._channel = &channel;
            EXPECT_EQ(level == DEBUG, logger.isDebugEnabled()) << level;
            rootChannel().minlevel = static_cast<LogLevel>(level);
            logger._channel = nullptr;
            EXPECT_EQ(level == DEBUG, logger.isDebugEnabled()) << level;
        }
    });
}

TEST(LoggerBindingTest, DebuggingIsEnabledWhetherOrNotLoggingIsInitialized) {
    expectInChild("", [] {
        const Logger logger("name");
        const Logger copy(logger);
        EXPECT_FALSE(logger.isDebugEnabled());
        rootChannel().minlevel = DEBUG;
        EXPECT_TRUE(logger.isDebugEnabled());
        EXPECT_TRUE(copy.isDebugEnabled());
        Logger::initialize();
        EXPECT_TRUE(logger.isDebugEnabled());
        EXPECT_TRUE(copy.isDebugEnabled());
    });
}

TEST(LoggerBindingTest, TheRootChannelDecidesBeforeInitialization) {
    expectInChild("debug\nerror\n", [] {
        Logger logger("name");
        rootChannel().minlevel = DEBUG;
        logger.debug("%s", "debug");
        rootChannel().minlevel = ERROR;
        logger.warn("%s", "warn");
        logger.error("%s", "error");
    });
}

TEST(LoggerBindingTest, MessagesGoToTheBoundChannelAfterInitialization) {
    expectInChild("", [] {
        LogChannel* const channel = LogChannel::find("name", true);
        LogAppender* const appender = LogAppender::find("A1", true);
        channel->minlevel = WARN;
        channel->_appenders = {appender};
        Logger logger("name");
        Logger other("other");
        const RecordedWrites writes;
        logger.info("%s", "before");
        Logger::initialize();
        logger.info("%s", "suppressed");
        logger.warn("%s", "after");
        other.info("%s", "to the root appender");
        EXPECT_EQ("INFO name before\nWARN name after\nINFO other to the root appender\n",
                  writes.text());
        EXPECT_EQ((std::vector<const LogAppender*>{&rootAppender(), appender, &rootAppender()}),
                  writes.appenders());
    });
}

TEST(LoggerBindingTest, OnlyWaitingLoggersAreKnownBeforeInitialization) {
    expectInChild("", [] {
        const Logger logger("name");
        const Logger copy(logger);
        EXPECT_FALSE(LogFormat::check_for_unitialized_logger(&logger));
        EXPECT_TRUE(LogFormat::check_for_unitialized_logger(&copy));
        Logger::initialize();
        EXPECT_FALSE(LogFormat::check_for_unitialized_logger(&logger));
        EXPECT_FALSE(LogFormat::check_for_unitialized_logger(&copy));
    });
}

TEST(LoggerBindingTest, ACopyOfAWaitingLoggerGoesUnfilteredToStandardError) {
    expectInChild(
        "DEBUG - print 1\nDEBUG - string %d\nDEBUG - exception\nFATAL - last\n"
        "root channel\n",
        [] {
            const Logger logger("name");
            Logger copy(logger);
            EXPECT_EQ(logger._channel_name, copy._channel_name);
            EXPECT_EQ(logger._channel_name_len, copy._channel_name_len);
            copy.debug("print %d", 1);
            copy.debug(std::string("string %d"));
            copy.debug(std::runtime_error("exception"));
            copy.fatal("%s", "last");

            // It is never bound, so it keeps the root channel.
            LogChannel::find("name", true)->minlevel = EMERG;
            Logger::initialize();
            EXPECT_EQ(nullptr, copy._channel);
            copy.debug("%s", "suppressed");
            copy.info("%s", "root channel");
        });
}

TEST(LoggerBindingTest, ACopyOfABoundLoggerIsBound) {
    expectInChild("", [] {
        LogChannel* const channel = LogChannel::find("name", true);
        Logger::initialize();
        const Logger logger("name");
        const Logger copy(logger);
        EXPECT_EQ(channel, copy._channel);
    });
}

TEST(LoggerBindingTest, CopiesDoNotDisturbTheList) {
    expectInChild("", [] {
        const Logger oldest("oldest");
        Logger middle("middle");
        const Logger newest("newest");
        {
            const Logger copy(middle);
            EXPECT_EQ(&newest, uninitialized_loggers);
        }
        middle = Logger("other");
        middle = newest;
        Logger& self = middle;
        middle = self;
        EXPECT_STREQ("newest", middle._channel_name);
        EXPECT_EQ(6u, middle._channel_name_len);
        EXPECT_EQ(&newest, uninitialized_loggers);
        EXPECT_EQ(&middle, newest._next);
        EXPECT_EQ(&oldest, middle._next);
        Logger::initialize();
        EXPECT_EQ(&rootChannel(), middle._channel);
    });
}

// A static logger of another unit, before its constructor has run: memory full of zeros.
union NotYetConstructed {
    NotYetConstructed() {}
    ~NotYetConstructed() {}
    unsigned char bytes[sizeof(Logger)] = {};
    Logger logger;
};

TEST(LoggerBindingTest, ALoggerThatIsNotConstructedYetGoesUnfilteredToStandardError) {
    expectInChild("DEBUG - print 1\nINFO - string\n", [] {
        NotYetConstructed early;
        early.logger.debug("print %d", 1);
        early.logger.info(std::string("string"));
        EXPECT_FALSE(early.logger.isDebugEnabled());
    });
}

TEST(LoggerBindingTest, LoggersWorkAfterMain) {
    // Destroyed after the loggers of main and after all static ones.
    static struct AtExit {
        ~AtExit() {
            if (kept == nullptr) {
                return;
            }
            Logger made("made at exit");
            made.info("%s", "made at exit");
            kept->info("%s", "kept");
            made.debug("%s", "suppressed");
        }
        Logger* kept = nullptr;
    } atExit;
    expectInChild("made at exit\nkept\n", [] {
        static Logger kept("kept");
        atExit.kept = &kept;
        Logger::initialize();
    });
}

}  // namespace
