// Whole lines: patterns against messages, levels, widths, names, epochs.

#include "util/LogFormat.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cctype>
#include <ctime>
#include <string>
#include <thread>
#include <vector>

#include "support/LogLine.h"
#include "support/TimeZone.h"
#include "util/Logger.h"
#include "util/Thread.h"
#include "util/internal/LogGlobals.h"

namespace {

const Logger net("net.Http");
constexpr long long STAMP = 981173106;  // 2001-02-03 04:05:06 UTC

struct Row {
    const char* pattern;
    LogLevel level;
    const char* message;
    const char* line;
};

void expectLines(std::initializer_list<Row> rows) {
    for (const Row& row : rows) {
        EXPECT_EQ(row.line, lineOf(row.pattern, stampedAt(net, row.level, STAMP), row.message))
            << "pattern \"" << row.pattern << '"';
    }
}

// Runs a layout on a thread of its own.
class Worker : public Thread {
public:
    explicit Worker(const char* name) : Thread(name) {}
    void main() override { line = lineOf("[%t]", stampedAt(net, INFO, STAMP), ""); }

    std::string line;
};

}  // namespace

TEST(LogFormatTest, BuiltInLayouts) {
    epoch_timeval().set(STAMP - 65, 0);
    expectLines({{"%m%n", INFO, "x", "x\n"},
                 {"%m%n", INFO, "", "\n"},
                 {"%-8p: %m%n", INFO, "hello", "INFO    : hello\n"},
                 {"%-8p: %m%n", NOTICE, "hello", "NOTICE  : hello\n"},
                 {"%R %p %c %m%n", WARN, "hello", "65 WARN net.Http hello\n"}});
}

TEST(LogFormatTest, LevelsAreNamed) {
    expectLines({{"%p", DEBUG, "", "DEBUG"},
                 {"%p", INFO, "", "INFO"},
                 {"%p", NOTICE, "", "NOTICE"},
                 {"%p", WARN, "", "WARN"},
                 {"%p", ERROR, "", "ERROR"},
                 {"%p", CRIT, "", "CRIT"},
                 {"%p", ALERT, "", "ALERT"},
                 {"%p", FATAL, "", "FATAL"},
                 {"%p", EMERG, "", "EMERG"},
                 {"%p", static_cast<LogLevel>(9), "", "???"},
                 {"%5p", static_cast<LogLevel>(-1), "", "  ???"}});
}

TEST(LogFormatTest, ShortTextsArePadded) {
    expectLines({{"[%8p]", INFO, "", "[    INFO]"},
                 {"[%08p]", INFO, "", "[0000INFO]"},
                 {"[%-8p]", INFO, "", "[INFO    ]"},
                 {"[%-08p]", INFO, "", "[INFO    ]"},
                 {"[%4p]", INFO, "", "[INFO]"},
                 {"[%3p]", INFO, "", "[INFO]"},
                 {"[%5p]", INFO, "", "[ INFO]"},
                 {"[%3m]", INFO, "", "[   ]"},
                 {"[%03m]", INFO, "", "[000]"},
                 {"[%-3m]", INFO, "", "[   ]"},
                 {"[%10c]", INFO, "", "[  net.Http]"},
                 {"[%-10c]", INFO, "", "[net.Http  ]"}});
}

TEST(LogFormatTest, LongTextsLoseTheirEnd) {
    expectLines({{"[%.3p]", ERROR, "", "[ERR]"},
                 {"[%.5p]", ERROR, "", "[ERROR]"},
                 {"[%.4p]", ERROR, "", "[ERRO]"},
                 {"[%.0m]", INFO, "gone", "[]"},
                 {"[%.m]", INFO, "kept", "[kept]"},
                 {"[%.3c]", INFO, "", "[net]"},
                 {"[%5.3m]", INFO, "ab", "[   ab]"},
                 {"[%-5.3m]", INFO, "ab", "[ab   ]"},
                 {"[%05.3m]", INFO, "abc", "[00abc]"},
                 {"[%3.5m]", INFO, "abcdefg", "[abcde]"}});
}

TEST(LogFormatTest, ACutTextIsNotPadded) {
    expectLines({{"[%5.3m]", INFO, "abcd", "[abc]"},
                 {"[%-5.3m]", INFO, "abcd", "[abc]"},
                 {"[%05.0m]", INFO, "a", "[]"},
                 {"[%5.0m]", INFO, "", "[     ]"}});
}

TEST(LogFormatTest, LiteralsAreNeitherPaddedNorCut) {
    expectLines({{"%%", INFO, "", "%"},
                 {"100%% of %m", INFO, "it", "100% of it"},
                 {"%%m", INFO, "x", "%m"},
                 {"%%%%%m%%", INFO, "x", "%%x%"},
                 {" a\tb\n", INFO, "", " a\tb\n"}});
}

TEST(LogFormatTest, TheNewlineKeepsItsWidths) {
    expectLines({{"a%3n", INFO, "", "a  \n"},
                 {"a%-3n", INFO, "", "a\n  "},
                 {"a%03n", INFO, "", "a00\n"},
                 {"a%.0n", INFO, "", "a"}});
}

TEST(LogFormatTest, ArgumentsOfOtherConversionsAreIgnored) {
    expectLines({{"%c{2}", INFO, "", "net.Http"},
                 {"%c{2", INFO, "", ""},
                 {"%p{x}%m{}%n{n}|", WARN, "msg", "WARNmsg\n|"}});
}

TEST(LogFormatTest, UnknownConversionsVanish) {
    expectLines({{"a%qb", INFO, "", "ab"},
                 {"a%-12.30qb", INFO, "", "ab"},
                 {"a%Mb%Cc%Pd", INFO, "msg", "abcd"},
                 {"a%q{%m}b", INFO, "msg", "ab"},
                 {"a% mb", INFO, "msg", "amb"}});
}

TEST(LogFormatTest, AnIncompleteConversionEndsThePattern) {
    expectLines({{"%m%", INFO, "msg", "msg"},
                 {"%m%-08.3", INFO, "msg", "msg"},
                 {"%m%d{%H %p %n", INFO, "msg", "msg"}});
}

TEST(LogFormatTest, AppendsToWhatIsThere) {
    std::string out = "before ";
    const LogFormat layout("%5m|");
    layout.apply(out, stampedAt(net, INFO, STAMP), "x");
    layout.apply(out, stampedAt(net, INFO, STAMP), "y");
    EXPECT_EQ("before     x|    y|", out);
}

TEST(LogFormatTest, WidthsReachOnlyTheTextOfTheirOwnConversion) {
    std::string out = "0123456789";
    LogFormat("%.2d{%Y}%3m").apply(out, stampedAt(net, INFO, STAMP), "x");
    EXPECT_EQ("012345678920  x", out);
}

TEST(LogFormatTest, NulBytesInAMessageAreKept) {
    const std::string message("a\0b\0", 4);
    EXPECT_EQ(std::string("[  a\0b\0]", 8), lineOf("[%6m]", stampedAt(net, INFO, STAMP), message));
    EXPECT_EQ(std::string("a\0", 2), lineOf("%.2m", stampedAt(net, INFO, STAMP), message));
}

TEST(LogFormatTest, ConversionsInAMessageHaveNoMeaning) {
    EXPECT_EQ("100%n %m %s\n", lineOf("%m%n", stampedAt(net, INFO, STAMP), "100%n %m %s"));
}

TEST(LogFormatTest, LongMessagesAreComplete) {
    const std::string message(100000, 'x');
    EXPECT_EQ("INFO " + message + "\n", lineOf("%p %m%n", stampedAt(net, INFO, STAMP), message));
}

TEST(LogFormatTest, TheCategoryIsTheNameOfTheLoggerThatWrote) {
    const Logger unnamed("");
    EXPECT_EQ("[]", lineOf("[%c]", stampedAt(unnamed, INFO, STAMP), ""));
    EXPECT_EQ("[   ]", lineOf("[%3c]", stampedAt(unnamed, INFO, STAMP), ""));
    Logger shortened("net.Http");
    shortened._channel_name_len = 3;
    EXPECT_EQ("[net]", lineOf("[%c]", stampedAt(shortened, INFO, STAMP), ""))
        << "of the length that the logger knows";
}

TEST(LogFormatTest, ThreadsAreNamed) {
    EXPECT_EQ("[Main Thread]", lineOf("[%t]", stampedAt(net, INFO, STAMP), ""));
    EXPECT_EQ("[Main]", lineOf("[%.4t]", stampedAt(net, INFO, STAMP), ""));
    Thread mainThread;
    Worker worker("Rotator");
    worker.go();
    worker.join();
    EXPECT_EQ("[Rotator]", worker.line);
}

TEST(LogFormatTest, TimeSinceTheEpochOfLogging) {
    epoch_timeval().set(1000, 500000);
    struct Instant {
        long long sec;
        long long usec;
        const char* line;  // milliseconds, seconds
    };
    for (const Instant& at :
         {Instant{1000, 500000, "0 0"}, Instant{1000, 500001, "1 0"}, Instant{1000, 501000, "1 0"},
          Instant{1001, 499999, "1000 1"}, Instant{1001, 499000, "999 0"},
          Instant{1001, 500000, "1000 1"}, Instant{1001, 500001, "1001 1"},
          Instant{1011, 0, "10500 10"}, Instant{2147483647, 999999, "2147482647500 2147482647"}}) {
        EXPECT_EQ(at.line, lineOf("%r %R", stampedAt(net, INFO, at.sec, at.usec), ""));
    }
}

TEST(LogFormatTest, TimeBeforeTheEpochPrintsUnsigned) {
    epoch_timeval().set(1000, 500000);
    struct Instant {
        long long sec;
        long long usec;
        const char* line;
    };
    for (const Instant& at :
         {Instant{1000, 499999, "0 0"}, Instant{1000, 499000, "18446744073709551615 0"},
          Instant{999, 500001, "18446744073709550617 0"},
          Instant{999, 500000, "18446744073709550616 18446744073709551615"},
          Instant{0, 0, "18446744073708551116 18446744073709550616"}}) {
        EXPECT_EQ(at.line, lineOf("%r %R", stampedAt(net, INFO, at.sec, at.usec), ""));
    }
}

TEST(LogFormatTest, NumbersAreFittedIntoWidths) {
    epoch_timeval().set(STAMP - 12, 0);
    expectLines({{"[%8r]", INFO, "", "[   12000]"},
                 {"[%08r]", INFO, "", "[00012000]"},
                 {"[%-8r]", INFO, "", "[12000   ]"},
                 {"[%.2r]", INFO, "", "[12]"},
                 {"[%5R]", INFO, "", "[   12]"}});
    epoch_timeval().set(STAMP + 1, 0);
    expectLines({{"[%22r]", INFO, "", "[  18446744073709550616]"}});
}

TEST(LogFormatTest, ProcessorTimeIsThatOfTheProcess) {
    const std::clock_t before = std::clock();
    const std::string line = lineOf("%u", stampedAt(net, INFO, STAMP), "");
    const std::clock_t after = std::clock();
    for (const char c : line) {
        ASSERT_TRUE(std::isdigit(static_cast<unsigned char>(c))) << line;
    }
    EXPECT_LE(before, std::stoll(line));
    EXPECT_GE(after, std::stoll(line));
}

TEST(LogFormatTest, DatesAreFittedIntoWidths) {
    const TimeZone utc("UTC0");
    expectLines({{"[%12d{ABSOLUTE}]", INFO, "", "[04:05:06,000]"},
                 {"[%14d{ABSOLUTE}]", INFO, "", "[  04:05:06,000]"},
                 {"[%014d{ABSOLUTE}]", INFO, "", "[0004:05:06,000]"},
                 {"[%-14d{ABSOLUTE}]", INFO, "", "[04:05:06,000  ]"},
                 {"[%.8d{ABSOLUTE}]", INFO, "", "[04:05:06]"},
                 {"[%.10d]", INFO, "", "[2001-02-03]"}});
}

TEST(LogFormatTest, AWholeLine) {
    const TimeZone utc("UTC0");
    EXPECT_EQ("02-03-2001 04:05:06.007 INFO  net.Http - hello\n",
              lineOf("%d{%m-%d-%Y %H:%M:%S.%l} %-5p %c - %m%n", stampedAt(net, INFO, STAMP, 7500),
                     "hello"));
}

TEST(LogFormatTest, OneLayoutServesManyThreads) {
    const TimeZone utc("UTC0");
    const LogFormat layout("%d %-5p %c [%t] %06.3m%n");
    const std::string expected = "2001-02-03 04:05:06,007 WARN  net.Http [Main Thread] 0000ab\n";
    std::atomic<int> wrong = 0;
    std::vector<std::thread> threads;
    for (int i = 0; i < 8; ++i) {
        threads.emplace_back([&] {
            const LogMsgMetadata mdata = stampedAt(net, WARN, STAMP, 7500);
            for (int line = 0; line < 500; ++line) {
                wrong += lineOf(layout, mdata, "ab") != expected;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(0, wrong);
}

TEST(LogFormatDeathTest, AnUnknownKindIsAsserted) {
    LogFormat layout("%m");
    layout._atoms[0].what = static_cast<LogFormat::Atom::Kind>(9);
    std::string out;
    EXPECT_DEATH(layout.apply(out, stampedAt(net, INFO, STAMP), ""),
                 "^src/util/LogFormat\\.cpp:[0-9]+: "
                 "failed assertion `a->what == Atom::TIME_FMT'\n$");
}
