// What a line costs and what happens when a call beneath it fails: conversions to local time,
// buffers given to strftime, allocations.

#include <gtest/gtest.h>

#include <ctime>
#include <functional>
#include <string>
#include <vector>

#include "support/AllocationProbe.h"
#include "support/LogLine.h"
#include "support/ScriptedLibc.h"
#include "util/LogFormat.h"
#include "util/Logger.h"

namespace {

using Strftime = std::function<std::size_t(char*, std::size_t, const char*, const struct tm*)>;

const Logger logger("calls");
constexpr long long STAMP = 981173106;  // 2001-02-03 04:05:06 UTC

std::size_t alwaysEmpty(char* buf, std::size_t, const char*, const struct tm*) {
    buf[0] = '\0';
    return 0;
}

// The sizes of the buffers that strftime is given for one piece.
std::vector<std::size_t> sizesFor(const std::string& piece, const Strftime& fake = alwaysEmpty) {
    const LogFormattedDate date(piece.data(), piece.size());
    CachedTm tm;
    std::string out;
    std::vector<std::size_t> sizes;
    const Replacement calls(replacement::strftime, [&](char* buf, std::size_t size, const char* fmt,
                                                       const struct tm* time) {
        sizes.push_back(size);
        return fake(buf, size, fmt, time);
    });
    date.fmt(out, tm, stampedAt(logger, INFO, STAMP));
    return sizes;
}

std::size_t allocationsFor(const char* pattern, const std::string& msg, std::string& out) {
    const LogFormat layout(pattern);
    const LogMsgMetadata mdata = stampedAt(logger, INFO, STAMP);
    layout.apply(out, mdata, msg);  // the first call makes what the C library keeps
    out.clear();
    AllocationProbe probe;
    layout.apply(out, mdata, msg);
    probe.stop();
    return probe.count();
}

}  // namespace

TEST(LogFormatCallsTest, LocalTimeIsConvertedAtMostOncePerLine) {
    const LogMsgMetadata mdata = stampedAt(logger, INFO, STAMP);
    const struct {
        const char* pattern;
        unsigned calls;
    } rows[] = {{"%m%n", 0},
                {"%r %R %u %p %t %c %m%n", 0},
                {"%d{%l}", 0},
                {"%d", 1},
                {"%d %d{ABSOLUTE} %d{DATE} %d{%H%l%M} %m", 1}};
    for (const auto& row : rows) {
        const LogFormat layout(row.pattern);
        const ScriptedCalls calls("localtime_r");
        lineOf(layout, mdata, "x");
        EXPECT_EQ(row.calls, calls.calls()) << row.pattern;
        lineOf(layout, mdata, "x");
        EXPECT_EQ(2 * row.calls, calls.calls()) << row.pattern << ": each line converts again";
    }
}

TEST(LogFormatCallsTest, OnlyAmAndPmMayBeEmpty) {
    for (const char* const piece :
         {"%p", "%p%p", "%_p", "%-p", "%^p", "%#p", "%12p", "%_90p", "%Ep", "%Op", "%#7Ep%p"}) {
        EXPECT_EQ(std::vector<std::size_t>{64}, sizesFor(piece)) << piece;
    }
    for (const char* const piece :
         {"%P",   "%p ",  " %p",  "%p%H",  "%H%p", "%",   "%p%", "%_", "%7",  "%E",
          "%EOp", "%OEp", "%^#p", "%12_p", "%E7p", "%+p", "%Z",  "p",  "%%p", "%pp"}) {
        EXPECT_EQ(15u, sizesFor(piece).size()) << piece;
    }
}

TEST(LogFormatCallsTest, ADigitZeroIsNoFlagOfAmAndPm) {
    EXPECT_EQ(std::vector<std::size_t>{64}, sizesFor("%0p"));
    EXPECT_EQ(std::vector<std::size_t>{64}, sizesFor("%_0p"));
    EXPECT_LT(1u, sizesFor("%0_p").size());
}

TEST(LogFormatCallsTest, AnEmptyPieceIsAskedForOnce) {
    const std::string piece("\0abc", 4);
    EXPECT_EQ(std::vector<std::size_t>{64}, sizesFor(piece));
}

TEST(LogFormatCallsTest, BuffersDoubleUpToOneMebibyte) {
    std::vector<std::size_t> expected;
    for (std::size_t size = 64; size <= (std::size_t{1} << 20); size *= 2) {
        expected.push_back(size);
    }
    EXPECT_EQ(expected, sizesFor("%Z"));
    EXPECT_EQ(expected, sizesFor(std::string(4096, 'x'))) << "256 times its length is the same";
}

TEST(LogFormatCallsTest, BuffersOfALongPieceReach256TimesItsLength) {
    EXPECT_LE(std::size_t{256} * 4097, sizesFor(std::string(4097, 'x')).back());
    EXPECT_EQ(std::size_t{256} * 8192, sizesFor(std::string(8192, 'x')).back());
    EXPECT_EQ(16u, sizesFor(std::string(8192, 'x')).size());
}

TEST(LogFormatCallsTest, ALengthThatIsNotBelowTheBufferIsTriedAgain) {
    EXPECT_EQ((std::vector<std::size_t>{64, 128, 256}),
              sizesFor("%p", [](char* buf, std::size_t size, const char*, const struct tm*) {
                  buf[0] = 'x';
                  return size < 256 ? size : 1;
              }));
}

TEST(LogFormatCallsTest, AShortDateNeedsOneCallPerPiece) {
    for (const std::size_t length : {std::size_t{1}, std::size_t{63}}) {
        EXPECT_EQ(std::vector<std::size_t>{64},
                  sizesFor("%Y-%m-%d %H:%M:%S",
                           [length](char* buf, std::size_t, const char*, const struct tm*) {
                               buf[0] = 'x';
                               return length;
                           }));
    }
}

TEST(LogFormatCallsTest, ALineIntoARoomyStringDoesNotAllocate) {
    REQUIRE_ALLOCATION_PROBE();
    std::string out;
    out.reserve(1000);
    EXPECT_EQ(0u, allocationsFor("%30d %d{%H%l} %-5p %08r %t %c - %m%n", "hello", out));
}
