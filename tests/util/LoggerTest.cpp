#include "util/Logger.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <memory>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <vector>

#include "support/InChild.h"
#include "support/RecordedWrites.h"
#include "support/ScriptedLibc.h"
#include "support/StderrCapture.h"
#include "util/LogFormat.h"
#include "util/Timeval.h"
#include "util/internal/LogGlobals.h"

namespace {

// The six levels with entry points.
struct EntryPoint {
    LogLevel level;
    void (Logger::*print)(const char*, ...);
    void (Logger::*string)(const std::string&);
    void (Logger::*exception)(const std::exception&);
};
const EntryPoint ENTRY_POINTS[] = {
    {FATAL, &Logger::fatal, &Logger::fatal, &Logger::fatal},
    {CRIT, &Logger::crit, &Logger::crit, &Logger::crit},
    {ERROR, &Logger::error, &Logger::error, &Logger::error},
    {WARN, &Logger::warn, &Logger::warn, &Logger::warn},
    {INFO, &Logger::info, &Logger::info, &Logger::info},
    {DEBUG, &Logger::debug, &Logger::debug, &Logger::debug},
};

std::string nameOf(LogLevel level) {
    std::size_t ignored = 0;
    return loglevel2str(&ignored, level);
}

// A logger that is bound to a channel of its own without initializing logging: it still waits in
// the list, which is what makes it known.
class Bound {
public:
    explicit Bound(LogLevel minlevel) {
        channel.minlevel = minlevel;
        logger._channel = &channel;
    }
    LogChannel channel;
    Logger logger{"Bound"};
};

// The names of the waiting loggers in the order of the list, the test's own only.
std::string waiting() {
    std::string names;
    for (const Logger* logger = uninitialized_loggers; logger != nullptr; logger = logger->_next) {
        if (std::strlen(logger->_channel_name) == 1) {
            names += logger->_channel_name;
        }
    }
    return names;
}

TEST(LoggerTest, KeepsTheNameItIsGivenAndItsLength) {
    const char name[] = "Name";
    const Logger logger(name);
    EXPECT_EQ(name, logger._channel_name);
    EXPECT_EQ(4u, logger._channel_name_len);
    EXPECT_EQ(nullptr, logger._channel);
    EXPECT_EQ(0u, Logger("")._channel_name_len);
}

TEST(LoggerTest, IsAPlainObject) {
    static_assert(!std::is_polymorphic_v<Logger>);
    const Logger logger("Name");
    const void* const fields[] = {&logger._channel_name, &logger._channel_name_len,
                                  &logger._channel, &logger._next};
    for (std::size_t i = 0; i < 4; ++i) {
        EXPECT_EQ(reinterpret_cast<const char*>(&logger) + i * sizeof(void*), fields[i]) << i;
    }
    EXPECT_EQ(4 * sizeof(void*), sizeof(Logger));
}

TEST(LogMsgMetadataTest, IsStampedWhenItIsMade) {
    const Logger logger("Name");
    const Timeval before = Timeval::now();
    const LogMsgMetadata mdata(&logger, ALERT);
    const Timeval after = Timeval::now();
    EXPECT_LE(before, mdata.stamp);
    EXPECT_LE(mdata.stamp, after);
    EXPECT_EQ(&logger, mdata.category);
    EXPECT_EQ(ALERT, mdata.level);
}

TEST(LogMsgMetadataTest, KeepsTheOrderOfItsFields) {
    static_assert(std::is_same_v<CurrentTimeval, decltype(LogMsgMetadata::stamp)>);
    static_assert(std::is_same_v<const Logger*, decltype(LogMsgMetadata::category)>);
    static_assert(std::is_same_v<LogLevel, decltype(LogMsgMetadata::level)>);
    const Logger logger("Name");
    const LogMsgMetadata mdata(&logger, ALERT);
    EXPECT_LT(static_cast<const void*>(&mdata.stamp), static_cast<const void*>(&mdata.category));
    EXPECT_LT(static_cast<const void*>(&mdata.category), static_cast<const void*>(&mdata.level));
}

TEST(LoggerTest, WaitsInAListNewestFirst) {
    const std::string before = waiting();
    const Logger a("a");
    const Logger b("b");
    EXPECT_EQ("ba" + before, waiting());
    EXPECT_EQ(&b, uninitialized_loggers);
    EXPECT_EQ(&a, b._next);
}

TEST(LoggerTest, LeavesTheListWhenItIsDestroyed) {
    auto a = std::make_unique<Logger>("a");
    auto b = std::make_unique<Logger>("b");
    auto c = std::make_unique<Logger>("c");
    auto d = std::make_unique<Logger>("d");
    EXPECT_EQ("dcba", waiting());
    b.reset();
    EXPECT_EQ("dca", waiting());
    d.reset();
    EXPECT_EQ("ca", waiting());
    a.reset();
    EXPECT_EQ("c", waiting());
    c.reset();
    EXPECT_EQ("", waiting());
}

TEST(LoggerTest, PassesMessagesFromTheLevelOfItsChannelOn) {
    for (int minlevel = DEBUG; minlevel <= EMERG; ++minlevel) {
        for (const EntryPoint& entry : ENTRY_POINTS) {
            Bound bound(static_cast<LogLevel>(minlevel));
            const RecordedWrites writes;
            (bound.logger.*entry.print)("print %d", 1);
            (bound.logger.*entry.string)("string");
            (bound.logger.*entry.exception)(std::runtime_error("exception"));
            const std::string prefix = nameOf(entry.level) + " Bound ";
            const std::string expected =
                entry.level < minlevel
                    ? ""
                    : prefix + "print 1\n" + prefix + "string\n" + prefix + "exception\n";
            EXPECT_EQ(expected, writes.text()) << nameOf(entry.level) << ' ' << minlevel;
        }
    }
}

TEST(LoggerTest, FormatsManyArgumentsOfEveryKind) {
    Bound bound(DEBUG);
    const RecordedWrites writes;
    bound.logger.info("%d %ld %lld %c %s %.1f %p %zu %x %u %.2e", -1, -2L, -3LL, 'c', "s", 1.5,
                      static_cast<void*>(nullptr), sizeof(int), 255u, 7u, 12345.0);
    EXPECT_EQ("INFO Bound -1 -2 -3 c s 1.5 (nil) 4 ff 7 1.23e+04\n", writes.text());
}

TEST(LoggerTest, TakesStringsAndExceptionsAsTheyStand) {
    Bound bound(DEBUG);
    const RecordedWrites writes;
    bound.logger.info(std::string("100% %d %m %s"));
    bound.logger.info(std::runtime_error("50% %s %m"));
    bound.logger.info(std::string("a\0b", 3));
    EXPECT_EQ(
        std::string("INFO Bound 100% %d %m %s\nINFO Bound 50% %s %m\nINFO Bound a") + '\0' + "b\n",
        writes.text());
}

TEST(LoggerTest, PutsTheTextOfErrnoForPercentM) {
    Bound bound(DEBUG);
    const RecordedWrites writes;
    errno = ENOENT;
    bound.logger.error("open %s: %m", "x");
    EXPECT_EQ(std::string("ERROR Bound open x: ") + std::strerror(ENOENT) + '\n', writes.text());
}

TEST(LoggerTest, FormatsLongMessagesCompletely) {
    Bound bound(DEBUG);
    const std::string text(10000, 'x');
    const RecordedWrites writes;
    bound.logger.info("<%s>", text.c_str());
    EXPECT_EQ("INFO Bound <" + text + ">\n", writes.text());
}

TEST(LoggerTest, ASuppressedMessageIsNeitherFormattedNorStamped) {
    Bound bound(WARN);
    const ScriptedCalls formats("vsnprintf");
    const ScriptedCalls stamps("gettimeofday");
    const RecordedWrites writes;
    for (const EntryPoint& entry : ENTRY_POINTS) {
        if (entry.level < WARN) {
            (bound.logger.*entry.print)("%d %m", 1);
            (bound.logger.*entry.string)("text");
            (bound.logger.*entry.exception)(std::runtime_error("text"));
        }
    }
    bound.logger.debug("%d %m", 1);
    EXPECT_EQ("", writes.text());
    EXPECT_EQ(0u, formats.calls());
    EXPECT_EQ(0u, stamps.calls());
    bound.logger.warn("%d", 1);
    EXPECT_EQ(1u, formats.calls());
    EXPECT_EQ(1u, stamps.calls());
}

TEST(LoggerTest, AMessageKeepsErrno) {
    const RecordedWrites writes([](const RecordedWrites::Message&) { errno = EIO; });
    for (const LogLevel minlevel : {DEBUG, EMERG}) {
        Bound bound(minlevel);
        for (const EntryPoint& entry : ENTRY_POINTS) {
            errno = 12345;
            (bound.logger.*entry.print)("%d %m", 1);
            EXPECT_EQ(12345, errno);
            (bound.logger.*entry.string)("text");
            EXPECT_EQ(12345, errno);
            (bound.logger.*entry.exception)(std::runtime_error("x"));
            EXPECT_EQ(12345, errno);
        }
    }
}

// What an appender can throw at its caller.
enum Thrown { STANDARD, NUMBER, MEMORY };
void throwIt(Thrown what) {
    errno = EIO;
    switch (what) {
        case STANDARD:
            throw std::runtime_error("thrown by an appender");
        case NUMBER:
            throw 5;
        case MEMORY:
            throw std::bad_alloc();
    }
}

TEST(LoggerTest, WhatAnAppenderThrowsEndsOnStandardError) {
    for (const Thrown what : {STANDARD, NUMBER, MEMORY}) {
        Bound bound(DEBUG);
        const RecordedWrites writes([&](const RecordedWrites::Message&) { throwIt(what); });
        const StderrCapture err;
        errno = ENOENT;
        bound.logger.error("print %d %m", 1);
        bound.logger.info(std::string("string %d"));
        bound.logger.debug(std::runtime_error("exception %d"));
        EXPECT_EQ(ENOENT, errno);
        EXPECT_EQ(std::string("ERROR - print 1 ") + std::strerror(ENOENT) +
                      "\nINFO - string %d\nDEBUG - exception %d\n",
                  err.text());
    }
}

TEST(LoggerTest, AMessageThatCannotBeFormattedIsShownAsItsFormat) {
    Bound bound(DEBUG);
    const RecordedWrites writes;
    const StderrCapture err;
    const wchar_t surrogate[] = {0xd800, 0};
    errno = ENOENT;
    bound.logger.warn("wide %ls %m", surrogate);
    EXPECT_EQ(ENOENT, errno);
    EXPECT_EQ("WARN - wide %ls %m\n", err.text());
    EXPECT_EQ("", writes.text());
}

TEST(LoggerTest, BeforeInitializationTheBareMessageGoesToStandardErrorFromInfoOn) {
    Logger logger("Waiting");
    const StderrCapture err;
    for (const EntryPoint& entry : ENTRY_POINTS) {
        errno = ENOENT;
        (logger.*entry.print)("print %d", entry.level);
        (logger.*entry.string)("string " + nameOf(entry.level));
        (logger.*entry.exception)(std::runtime_error("exception"));
        EXPECT_EQ(ENOENT, errno);
    }
    EXPECT_EQ(
        "print 7\nstring FATAL\nexception\n"
        "print 5\nstring CRIT\nexception\n"
        "print 4\nstring ERROR\nexception\n"
        "print 3\nstring WARN\nexception\n"
        "print 1\nstring INFO\nexception\n",
        err.text());
}

}  // namespace
