// Date formats at fixed stamps in fixed zones.

#include <gtest/gtest.h>

#include <clocale>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

#include "support/LogLine.h"
#include "support/TempDir.h"
#include "support/TimeZone.h"
#include "util/LogFormat.h"
#include "util/Logger.h"

namespace {

const Logger logger("date");
constexpr long long STAMP = 981173106;  // 2001-02-03 04:05:06 UTC, a Saturday
constexpr char BERLIN[] = "CET-1CEST,M3.5.0,M10.5.0/3";
constexpr char NEW_YORK[] = "EST5EDT,M3.2.0,M11.1.0";
constexpr char CHATHAM[] = "<+1245>-12:45<+1345>,M9.5.0/2:45,M4.1.0/3:45";

std::string dateOf(const std::string& format, long long sec, long long usec = 0) {
    const LogFormattedDate date(format.data(), format.size());
    CachedTm tm;
    std::string out;
    date.fmt(out, tm, stampedAt(logger, INFO, sec, usec));
    return out;
}

// The pieces of a compiled date, milliseconds as "%l".
std::vector<std::string> piecesOf(const std::string& format) {
    const LogFormattedDate date(format.data(), format.size());
    std::vector<std::string> pieces;
    for (const LogFormattedDate::Atom* a = date._atoms; a != date._atom_end; ++a) {
        pieces.emplace_back(a->what == LogFormattedDate::Atom::MSEC ? "%l" : a->str);
    }
    return pieces;
}

using Pieces = std::vector<std::string>;

}  // namespace

TEST(LogFormattedDateTest, NamesAndTheirAbsence) {
    const TimeZone utc("UTC0");
    EXPECT_EQ("03 Feb 2001 04:05:06,007", dateOf("DATE", STAMP, 7500));
    EXPECT_EQ("2001-02-03 04:05:06,007", dateOf("ISO8601", STAMP, 7500));
    EXPECT_EQ("04:05:06,007", dateOf("ABSOLUTE", STAMP, 7500));
    EXPECT_EQ("2001-02-03 04:05:06,007", dateOf("", STAMP, 7500));
    const LogMsgMetadata mdata = stampedAt(logger, INFO, STAMP, 7500);
    EXPECT_EQ("2001-02-03 04:05:06,007", lineOf("%d", mdata, ""));
    EXPECT_EQ("2001-02-03 04:05:06,007", lineOf("%d{}", mdata, ""));
    EXPECT_EQ("04:05:06,007", lineOf("%d{ABSOLUTE}", mdata, ""));
}

TEST(LogFormattedDateTest, ANullFormatSelectsIso8601WhateverItsLength) {
    const TimeZone utc("UTC0");
    for (const std::size_t length : {0u, 4u}) {
        const LogFormattedDate date(nullptr, length);
        CachedTm tm;
        std::string out;
        date.fmt(out, tm, stampedAt(logger, INFO, STAMP));
        EXPECT_EQ("2001-02-03 04:05:06,000", out);
    }
}

TEST(LogFormattedDateTest, AppendsToWhatIsThere) {
    const TimeZone utc("UTC0");
    const LogFormattedDate date("%H%l", 4);
    CachedTm tm;
    std::string out = "at ";
    date.fmt(out, tm, stampedAt(logger, INFO, STAMP, 7000));
    date.fmt(out, tm, stampedAt(logger, INFO, STAMP, 8000));
    EXPECT_EQ("at 0400704008", out);
}

TEST(LogFormattedDateTest, OnlyAWholeNameInItsOwnCaseIsAName) {
    for (const char* const text : {"absolute", "Date", "iso8601", "DAT", "DATES", " DATE", "DATE ",
                                   "ISO860", "ABSOLUTELY", "ISO8601,DATE"}) {
        EXPECT_EQ(text, dateOf(text, STAMP));
    }
    EXPECT_EQ("absolute", lineOf("%d{absolute}", stampedAt(logger, INFO, STAMP), ""));
}

TEST(LogFormattedDateTest, ANameIsComparedOverItsGivenLength) {
    const TimeZone utc("UTC0");
    const LogFormattedDate date("ABSOLUTE and more", 8);
    CachedTm tm;
    std::string out;
    date.fmt(out, tm, stampedAt(logger, INFO, STAMP));
    EXPECT_EQ("04:05:06,000", out);
}

TEST(LogFormattedDateTest, CustomPatterns) {
    const TimeZone utc("UTC0");
    EXPECT_EQ("02-03-2001 04:05:06.999", dateOf("%m-%d-%Y %H:%M:%S.%l", STAMP, 999999));
    EXPECT_EQ("Sat Feb  3 04:05:06 2001", dateOf("%c", STAMP));
    EXPECT_EQ("Saturday, February 034 05 6", dateOf("%A, %B %j %V %w", STAMP));
    EXPECT_EQ("04:05:06 AM", dateOf("%r", STAMP));
    EXPECT_EQ("AM am", dateOf("%p %P", STAMP));
    EXPECT_EQ("981173106", dateOf("%s", STAMP));
    EXPECT_EQ("100%", dateOf("100%%", STAMP));
    EXPECT_EQ("no conversion", dateOf("no conversion", STAMP));
    EXPECT_EQ("%", dateOf("%", STAMP));
}

TEST(LogFormattedDateTest, MillisecondsAreCutNotRounded) {
    for (const auto& [usec, text] : {std::pair{0, "000"},
                                     {1, "000"},
                                     {999, "000"},
                                     {1000, "001"},
                                     {7500, "007"},
                                     {10000, "010"},
                                     {99999, "099"},
                                     {100000, "100"},
                                     {500000, "500"},
                                     {999999, "999"}}) {
        EXPECT_EQ(text, dateOf("%l", STAMP, usec));
        EXPECT_EQ(text, dateOf("%l", -1, usec)) << "before 1970";
    }
}

TEST(LogFormattedDateTest, EveryPercentLIsMilliseconds) {
    EXPECT_EQ(Pieces({"%l"}), piecesOf("%l"));
    EXPECT_EQ(Pieces({"%l", "%l"}), piecesOf("%l%l"));
    EXPECT_EQ(Pieces({"a", "%l", "b", "%l", "%Hc"}), piecesOf("a%lb%l%Hc"));
    EXPECT_EQ(Pieces({"%H:%M"}), piecesOf("%H:%M"));
    EXPECT_EQ(Pieces({"l%"}), piecesOf("l%"));
    EXPECT_EQ(Pieces({"%Y-%m-%d %H:%M:%S,", "%l"}), piecesOf(""));
    EXPECT_EQ(Pieces({"%d %b %Y %H:%M:%S,", "%l"}), piecesOf("DATE"));
    EXPECT_EQ(Pieces({"%H:%M:%S,", "%l"}), piecesOf("ABSOLUTE"));
}

TEST(LogFormattedDateTest, ADoubledPercentSignDoesNotHideMilliseconds) {
    EXPECT_EQ(Pieces({"%", "%l"}), piecesOf("%%l"));
    EXPECT_EQ(Pieces({"%%", "%l"}), piecesOf("%%%l"));
    EXPECT_EQ("%042", dateOf("%%l", STAMP, 42000));
}

TEST(LogFormattedDateTest, AFlaggedLIsTheHourOfStrftime) {
    const TimeZone utc("UTC0");
    EXPECT_EQ("4", dateOf("%-l", STAMP, 42000));
    EXPECT_EQ("04", dateOf("%0l", STAMP, 42000));
}

TEST(LogFormattedDateTest, PiecesAreCopiedAndPushedAtTheHead) {
    std::string format = "%Y%l%H";
    const LogFormattedDate date(format.data(), format.size());
    format.assign(format.size(), '#');
    ASSERT_NE(nullptr, date._sstor);
    EXPECT_STREQ("%H", date._sstor->str);
    EXPECT_EQ(date._atoms[2].str, date._sstor->str);
    ASSERT_NE(nullptr, date._sstor->next);
    EXPECT_STREQ("%Y", date._sstor->next->str);
    EXPECT_EQ(nullptr, date._sstor->next->next);
}

TEST(LogFormattedDateTest, StoredStringsAreTerminated) {
    LogFormattedDate date("%l", 2);
    const char* const stored = date.store_string("abcdef", 3);
    EXPECT_STREQ("abc", stored);
    EXPECT_STREQ("", date.store_string("abc", 0));
    EXPECT_EQ(stored, date._sstor->next->str);
}

TEST(LogFormattedDateTest, ArraysGrowFrom16ByDoubling) {
    std::string format;
    Pieces expected;
    for (int atoms = 1; atoms <= 66; ++atoms) {
        expected.push_back(atoms % 2 == 1 ? "%l" : std::to_string(atoms));
        format += expected.back();
        const LogFormattedDate date(format.data(), format.size());
        const std::uint32_t capacity = atoms <= 16 ? 16 : atoms <= 32 ? 32 : atoms <= 64 ? 64 : 128;
        EXPECT_EQ(capacity, date._max_atoms) << atoms << " atoms";
        ASSERT_EQ(expected, piecesOf(format)) << "growth keeps the atoms";
    }
}

TEST(LogFormattedDateTest, EndsOfWhat32BitsOfSecondsHold) {
    const TimeZone utc("UTC0");
    EXPECT_EQ("1970-01-01 00:00:00,000", dateOf("", 0));
    EXPECT_EQ("1969-12-31 23:59:59,999", dateOf("", -1, 999999));
    EXPECT_EQ("2038-01-19 03:14:07,999", dateOf("", 2147483647, 999999));
    EXPECT_EQ("1901-12-13 20:45:52,000", dateOf("", -2147483648LL));
}

TEST(LogFormattedDateTest, TheZoneIsThatOfTheProcess) {
    const std::string format = "%Y-%m-%d %H:%M:%S %z %Z";
    const struct {
        const char* zone;
        const char* text;
    } zones[] = {
        {"UTC0", "2001-02-03 04:05:06 +0000 UTC"},    {BERLIN, "2001-02-03 05:05:06 +0100 CET"},
        {NEW_YORK, "2001-02-02 23:05:06 -0500 EST"},  {"NPT-5:45", "2001-02-03 09:50:06 +0545 NPT"},
        {CHATHAM, "2001-02-03 17:50:06 +1345 +1345"}, {"<-12>12", "2001-02-02 16:05:06 -1200 -12"},
        {"<+14>-14", "2001-02-03 18:05:06 +1400 +14"}};
    for (const auto& zone : zones) {
        const TimeZone local(zone.zone);
        EXPECT_EQ(zone.text, dateOf(format, STAMP)) << zone.zone;
    }
}

TEST(LogFormattedDateTest, EachLineConvertsItsOwnStampInTheZoneOfItsMoment) {
    const LogFormat layout("%d{%d %H:%M:%S}");
    {
        const TimeZone utc("UTC0");
        EXPECT_EQ("03 04:05:06", lineOf(layout, stampedAt(logger, INFO, STAMP), ""));
        EXPECT_EQ("03 04:05:07", lineOf(layout, stampedAt(logger, INFO, STAMP + 1), ""));
        EXPECT_EQ("03 04:05:06", lineOf(layout, stampedAt(logger, INFO, STAMP), ""));
    }
    const TimeZone berlin(BERLIN);
    EXPECT_EQ("03 05:05:06", lineOf(layout, stampedAt(logger, INFO, STAMP), ""));
}

TEST(LogFormattedDateTest, DatesOfOneLineShareTheStamp) {
    const TimeZone utc("UTC0");
    EXPECT_EQ("04:05:06,007|2001|03 Feb 2001 04:05:06,007",
              lineOf("%d{ABSOLUTE}|%d{%Y}|%d{DATE}", stampedAt(logger, INFO, STAMP, 7000), ""));
}

TEST(LogFormattedDateTest, LongPiecesAreComplete) {
    for (const std::size_t length : {62u, 63u, 64u, 65u, 126u, 127u, 128u, 129u, 1000u, 2000000u}) {
        const std::string text(length, 'x');
        EXPECT_EQ(text, dateOf(text, STAMP)) << length;
        EXPECT_EQ("000" + text + "000", dateOf("%l" + text + "%l", STAMP)) << length;
    }
    std::string format;
    std::string expected;
    for (int i = 0; i < 40; ++i) {
        format += "%Y ";
        expected += "2001 ";
    }
    EXPECT_EQ(expected, dateOf(format, STAMP));
}

TEST(LogFormattedDateTest, ATextBeyondTheCapAppendsNothing) {
    const std::size_t cap = std::size_t{1} << 20;
    EXPECT_EQ(cap - 1, dateOf("%" + std::to_string(cap - 1) + "d", STAMP).size());
    EXPECT_EQ("000", dateOf("%" + std::to_string(cap) + "d%l", STAMP));
    EXPECT_EQ("000", dateOf("%l%2000000d", STAMP));
}

TEST(LogFormattedDateTest, ALongPieceHasACapOf256TimesItsLength) {
    const std::size_t cap = std::size_t{256} * 8192;
    const std::string filler(8192 - 9, 'x');
    const auto piece = [&](std::size_t text) {
        return filler + "%" + std::to_string(text - filler.size()) + "d";
    };
    ASSERT_EQ(8192u, piece(cap).size());
    EXPECT_EQ(cap - 1, dateOf(piece(cap - 1), STAMP).size());
    EXPECT_EQ(0u, dateOf(piece(cap), STAMP).size());
}

TEST(LogFormattedDateTest, AZoneWithoutANameAppendsNothing) {
    const TempDir dir;
    // One type of local time: no offset, no daylight saving, and a name without a character.
    const std::string header = "TZif" + std::string(16, '\0');
    const std::string counts("\0\0\0\0\0\0\0\0\0\0\0\0\0\0\0\0\0\0\0\1\0\0\0\1", 24);
    writeFile(dir.file("nameless"), header + counts + std::string(7, '\0'));
    const TimeZone nameless((":" + dir.file("nameless")).c_str());
    EXPECT_EQ("2001-02-03 04:05:06,000", dateOf("", STAMP));
    EXPECT_EQ("", dateOf("%Z", STAMP));
    EXPECT_EQ("000000", dateOf("%l%Z%l", STAMP));
    EXPECT_EQ("<>", dateOf("<%Z>", STAMP));
    EXPECT_EQ("[     ]", lineOf("[%5d{%Z}]", stampedAt(logger, INFO, STAMP), ""));
}

TEST(LogFormattedDateTest, ALanguageWithoutAmAndPmAppendsNothing) {
    const TempDir dir;
    const std::string command = "localedef --no-archive -c -i de_DE -f UTF-8 '" +
                                dir.file("de_DE.UTF-8") + "' >/dev/null 2>&1";
    const bool made = std::system(command.c_str()) != -1;
    ::setenv("LOCPATH", dir.path().c_str(), 1);
    const bool chosen = std::setlocale(LC_TIME, "de_DE.UTF-8") != nullptr;
    const std::string text = chosen ? dateOf("%l%p%l%^p%l%p%p", STAMP) : "";
    const std::string mixed = chosen ? dateOf("<%p>", STAMP) : "";
    std::setlocale(LC_TIME, "C");
    ::unsetenv("LOCPATH");
    if (!made || !chosen) {
        GTEST_SKIP() << "no localedef, or no source of a German locale";
    }
    EXPECT_EQ("000000000", text);
    EXPECT_EQ("<>", mixed);
}

TEST(LogFormattedDateTest, AmAndPmPaddedBeyondTheFirstBufferAppendNothing) {
    const TimeZone utc("UTC0");
    EXPECT_EQ(std::string(61, ' ') + "AM", dateOf("%_63p", STAMP));
    EXPECT_EQ("", dateOf("%_64p", STAMP));
    EXPECT_EQ(std::string(62, ' ') + "AM.", dateOf("%_64p.", STAMP));
}

TEST(CachedTmTest, IsFilledByTheFirstCallOnly) {
    const TimeZone utc("UTC0");
    CachedTm tm;
    EXPECT_FALSE(tm._stampSet);
    char buf[16];
    EXPECT_EQ(4u, tm.ftime(buf, sizeof(buf), "%Y", stampedAt(logger, INFO, STAMP)));
    EXPECT_STREQ("2001", buf);
    EXPECT_TRUE(tm._stampSet);
    EXPECT_EQ(101, tm._stamp.tm_year);
    EXPECT_EQ(4u, tm.ftime(buf, sizeof(buf), "%Y", stampedAt(logger, INFO, 0)));
    EXPECT_STREQ("2001", buf);
    EXPECT_EQ(0u, tm.ftime(buf, 4, "%Y", stampedAt(logger, INFO, STAMP))) << "no room";
}

TEST(LogFormattedDateDeathTest, AtomCountAboveTheCapacityIsAsserted) {
    LogFormattedDate date("%l", 2);
    EXPECT_DEATH(
        {
            date._max_atoms = 0;
            date.new_atom();
        },
        "^src/util/LogFormattedDate\\.cpp:[0-9]+: failed assertion `natoms == _max_atoms'\n$");
}
