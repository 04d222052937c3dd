#include "util/Timeval.h"

#include <gtest/gtest.h>
#include <sys/time.h>

#include <climits>
#include <cstdint>
#include <cstdio>
#include <random>
#include <sstream>
#include <string>

#include "support/Examples.h"
#include "support/TimeZone.h"

namespace {

constexpr long long MAX_SEC = 2147483647;

Timeval at(long long seconds, long long microseconds) {
    Timeval result;
    result._tv.tv_sec = seconds;
    result._tv.tv_usec = microseconds;
    return result;
}

std::string str(const Timeval& t) {
    return std::to_string(t._tv.tv_sec) + ':' + std::to_string(t._tv.tv_usec);
}

TEST(TimevalTest, StartsAtTheEpochAndCopiesBothFields) {
    Timeval assigned;
    EXPECT_EQ("0:0", str(assigned));
    const Timeval original = at(5, 7);
    const Timeval copy(original);
    assigned = original;
    EXPECT_EQ("5:7", str(copy));
    EXPECT_EQ("5:7", str(assigned));
}

TEST(TimevalTest, GivesWholeSecondsAndMilliseconds) {
    EXPECT_EQ(12, at(12, 345678).sec());
    EXPECT_EQ(12345, at(12, 345678).msec());
    EXPECT_EQ(12999, at(12, 999000).msec());
    EXPECT_EQ(-1, at(-1, 999999).sec());
    EXPECT_EQ(-1, at(-1, 999999).msec());
}

TEST(TimevalTest, SetCarriesMicrosecondsOutsideTheirRange) {
    const struct {
        long long seconds, microseconds;
        const char* expected;
    } rows[] = {{3, 0, "3:0"},
                {3, 999999, "3:999999"},
                {3, 1000000, "4:0"},
                {3, 2500000, "5:500000"},
                {3, -1, "2:999999"},
                {3, -1000000, "2:0"},
                {3, -1000001, "1:999999"},
                {-4, 10, "-4:10"}};
    for (const auto& row : rows) {
        Timeval t;
        t.set(row.seconds, row.microseconds);
        EXPECT_EQ(row.expected, str(t)) << row.seconds << ' ' << row.microseconds;
    }
}

TEST(TimevalTest, SetToNowLiesBetweenTwoReadingsOfTheClock) {
    struct timeval before, after;
    ASSERT_EQ(0, ::gettimeofday(&before, nullptr));
    const Timeval now = Timeval::now();
    const CurrentTimeval current;
    ASSERT_EQ(0, ::gettimeofday(&after, nullptr));
    EXPECT_LE(at(before.tv_sec, before.tv_usec), now);
    EXPECT_LE(now, current);
    EXPECT_LE(current, at(after.tv_sec, after.tv_usec));
}

TEST(TimevalTest, SetToMaxIsTheLargestInstant) {
    Timeval t;
    t.setToMax();
    EXPECT_EQ("2147483647:999999", str(t));
}

// A function of one text, an instant and a number, that gives the sum.
template <typename Number>
auto sumOf(void (Timeval::*add)(Number)) {
    return [add](const std::string& text) {
        long long seconds = 0, microseconds = 0;
        unsigned long long number = 0;
        EXPECT_EQ(3,
                  std::sscanf(text.c_str(), "%lld:%lld + %llu", &seconds, &microseconds, &number));
        Timeval sum = at(seconds, microseconds);
        (sum.*add)(static_cast<Number>(number));
        return str(sum);
    };
}

TEST(TimevalTest, AddSecSaturates) {
    expectEach(
        sumOf(&Timeval::addSec),
        {"1:2 + 3 > 4:2", "0:5 + 2147483647 > 2147483647:5", "0:5 + 2147483648 > 2147483647:999999",
         "2147483647:5 + 0 > 2147483647:5", "2147483647:5 + 1 > 2147483647:999999",
         "-2000000000:9 + 3000000000 > 1000000000:9", "-2147483648:9 + 4294967295 > 2147483647:9"});
    // An instant that only a 64-bit time_t holds.
    expectEach(sumOf(&Timeval::addSec), {"2147483648:0 + 0 > 2147483647:999999"});
}

TEST(TimevalTest, AddMsecCarriesAndSaturates) {
    expectEach(
        sumOf(&Timeval::addMsec),
        {"0:0 + 1 > 0:1000", "7:999999 + 999 > 8:998999", "7:999000 + 1 > 8:0",
         "0:0 + 2147483646999 > 2147483646:999000", "0:0 + 2147483647000 > 2147483647:999999",
         "-100:0 + 2147483647000 > 2147483647:999999", "1:1000 + 2147483646999 > 2147483647:999999",
         "0:1000 + 2147483646999 > 2147483647:0", "2147483647:999999 + 1 > 2147483647:999999",
         "-1:999999 + 1 > 0:999", "0:0 + 18446744073709551615 > 2147483647:999999"});
}

TEST(TimevalTest, AddMsecAssertsThatTheMicrosecondsWereInRange) {
    Timeval broken = at(0, 1999999);
    broken.addMsec(0);
    EXPECT_EQ("1:999999", str(broken));
    EXPECT_EXIT(at(0, 1999999).addMsec(1), testing::KilledBySignal(SIGABRT),
                "^src/util/Timeval.cpp:[0-9]+: failed assertion `_tv.tv_usec < 2000000'\n$");
}

// The additions as 32-bit machine arithmetic does them: wrap around, and notice by the sign.
std::string addIn32Bits(const Timeval& start, unsigned long long msecs, bool wholeSeconds) {
    const auto before = static_cast<std::int32_t>(start._tv.tv_sec);
    long long usec = start._tv.tv_usec;
    std::uint32_t sec = static_cast<std::uint32_t>(before);
    if (wholeSeconds) {
        sec += static_cast<std::uint32_t>(msecs);
    } else if (msecs >= 2147483647000ULL) {
        return "2147483647:999999";
    } else {
        sec += static_cast<std::uint32_t>(msecs / 1000);
        usec += static_cast<long>(msecs % 1000) * 1000;
        if (usec > 999999) {
            ++sec;
            usec -= 1000000;
        }
    }
    const auto after = static_cast<std::int32_t>(sec);
    return after < before ? "2147483647:999999" : str(at(after, usec));
}

TEST(TimevalTest, AdditionsAgreeWith32BitArithmetic) {
    constexpr unsigned SEED = 20240607;
    SCOPED_TRACE(SEED);
    std::mt19937_64 random(SEED);
    const long long edges[] = {-2147483648LL, -2147483647LL, -1, 0, 1, MAX_SEC - 1, MAX_SEC};
    for (int i = 0; i < 200000; ++i) {
        const auto any = static_cast<std::int32_t>(static_cast<std::uint32_t>(random()));
        const long long sec = i % 3 == 0 ? edges[random() % 7] : any;
        const long usec = i % 5 == 0 ? 999999 : static_cast<long>(random() % 1000000);
        const Timeval start = at(sec, usec);

        const auto secs = static_cast<unsigned>(random());
        Timeval plusSecs = start;
        plusSecs.addSec(secs);
        ASSERT_EQ(addIn32Bits(start, secs, true), str(plusSecs)) << str(start) << " + " << secs;

        const unsigned long long msecs = random() % 2200000000000ULL;
        Timeval plusMsecs = start;
        plusMsecs.addMsec(msecs);
        ASSERT_EQ(addIn32Bits(start, msecs, false), str(plusMsecs))
            << str(start) << " + " << msecs << " ms";
    }
}

TEST(TimevalTest, OrdersBySecondsThenMicroseconds) {
    const Timeval ascending[] = {at(-2, 999999), at(-1, 0), at(-1, 1),      at(0, 0),
                                 at(0, 1),       at(3, 5),  at(MAX_SEC, 0), at(MAX_SEC, 999999)};
    for (const Timeval& a : ascending) {
        for (const Timeval& b : ascending) {
            EXPECT_EQ(&a < &b, a < b) << str(a) << ' ' << str(b);
            EXPECT_EQ(&a <= &b, a <= b) << str(a) << ' ' << str(b);
            EXPECT_EQ(&a > &b, a > b) << str(a) << ' ' << str(b);
            EXPECT_EQ(&a >= &b, a >= b) << str(a) << ' ' << str(b);
        }
    }
}

// A function of one text, two instants, that gives their difference.
template <typename Result>
auto differenceOf(Result (*difference)(const Timeval&, const Timeval&)) {
    return [difference](const std::string& text) {
        long long values[4] = {};
        EXPECT_EQ(4, std::sscanf(text.c_str(), "%lld:%lld - %lld:%lld", &values[0], &values[1],
                                 &values[2], &values[3]));
        std::ostringstream out;
        out << difference(at(values[0], values[1]), at(values[2], values[3]));
        return out.str();
    };
}

TEST(TimevalTest, MsecDifferenceRoundsTheSubSecondPartUp) {
    const auto msecs = differenceOf(&Timeval::msecDifference);
    expectEach(msecs, {"5:5 - 5:5 > 0", "5:6 - 5:5 > 1", "5:1005 - 5:5 > 1", "5:1006 - 5:5 > 2",
                       "10:0 - 9:999999 > 1", "10:0 - 8:0 > 2000", "10:0 - 8:999000 > 1001",
                       "2147483647:999999 - -2147483648:0 > 4294967296000"});
    // A second is borrowed and its rest rounded up: less than a millisecond earlier is 0.
    expectEach(msecs, {"5:5 - 5:6 > 0", "5:0 - 5:999 > 0", "5:0 - 5:1000 > -1", "5:0 - 5:1001 > -1",
                       "8:0 - 10:0 > -2000", "-2147483648:0 - 2147483647:999999 > -4294967295999"});
}

TEST(TimevalTest, UsecDifferenceCountsTheSubSecondPartInMilliseconds) {
    expectEach(
        differenceOf(&Timeval::usecDifference),
        {"1:500000 - 0:0 > 1000500", "0:2500 - 0:0 > 2", "0:999 - 0:0 > 0", "0:1000 - 0:0 > 1",
         "1:0 - 0:1 > 999", "5:5 - 5:5 > 0", "0:0 - 0:1 > -999001", "0:0 - 1:500000 > -1999500",
         "2147483647:999999 - -2147483648:0 > 4294967295000999"});
}

TEST(TimevalTest, DescribesADifferenceInItsUnit) {
    const auto text = differenceOf(&Timeval::describeDifference);
    expectEach(text, {"5:5 - 5:5 > 0 microseconds", "0:999 - 0:0 > 0 microseconds",
                      "0:1000 - 0:0 > 1 microsecond", "0:2500 - 0:0 > 2 microseconds",
                      "0:999999 - 0:0 > 999 microseconds"});
    // From a second on the count is above 3000.
    expectEach(text, {"1:0 - 0:0 > 1000 milliseconds", "1:500000 - 0:0 > 1000 milliseconds",
                      "2:999000 - 0:0 > 2000 milliseconds", "2:2000 - 1:1000 > 1000 milliseconds",
                      "3:0 - 0:0 > 3000 milliseconds", "3:1 - 0:1 > 3000.0 milliseconds",
                      "1:1 - 0:0 > 1000.0 milliseconds", "1:500 - 0:500 > 1000.0 milliseconds",
                      "1:999000 - 0:1 > 1001.0 milliseconds"});
    expectEach(text, {"3:1000 - 0:0 > 3.000 seconds", "5:0 - 0:0 > 5.000 seconds",
                      "9:0 - 0:0 > 9.000 seconds", "10:0 - 0:0 > 10.00 seconds",
                      "99:0 - 0:0 > 99.00 seconds", "100:0 - 0:0 > 100.0 seconds",
                      "8000:0 - 0:0 > 8000.0 seconds"});
    expectEach(text, {"8000:1000 - 0:0 > 2.222 hours", "35819:0 - 0:0 > 9.950 hours",
                      "35820:0 - 0:0 >  9.95 hours", "36000:0 - 0:0 > 10.00 hours",
                      "358199:0 - 0:0 > 99.50 hours", "358200:0 - 0:0 >  99.5 hours",
                      "36000000:0 - 0:0 > 10000.0 hours",
                      "2147483647:999999 - -2147483648:0 > 1193046.5 hours"});
    // An earlier instant has a sign, even before the blanks that fill the field.
    expectEach(text, {"5:0 - 5:1 > -0 microseconds", "5:0 - 5:1000 > -1 microsecond",
                      "0:0 - 2:0 > -2000 milliseconds", "0:0 - 5:0 > -5.000 seconds",
                      "0:0 - 36000:0 > -10.00 hours", "0:0 - 35820:0 > - 9.95 hours",
                      "0:0 - 358200:0 > - 99.5 hours"});
}

TEST(TimevalTest, SinceIsTheDifferenceFromNow) {
    const Timeval hourAgo = at(Timeval::now().sec() - 3600, 0);
    EXPECT_GE(hourAgo.msecSince(), 3600000);
    EXPECT_LT(hourAgo.msecSince(), 3660000);
    EXPECT_GE(hourAgo.usecSince(), 3600000000LL);
    EXPECT_LT(hourAgo.usecSince(), 3660000000LL);
    EXPECT_EQ("-", at(Timeval::now().sec() + 36000, 0).describeSince().substr(0, 1));
    const std::string text = at(Timeval::now().sec() - 36030, 0).describeSince();
    EXPECT_EQ("10.01 hours", text);
}

TEST(TimevalTest, LocaltimeBreaksTheSecondsDownInTheZone) {
    const struct {
        const char *zone, *expected;
    } rows[] = {{"UTC0", "2023-11-14 22:13:20"},
                {"XST-05:30", "2023-11-15 03:43:20"},
                {"XST+8", "2023-11-14 14:13:20"}};
    for (const auto& row : rows) {
        const TimeZone zone(row.zone);
        struct tm broken = {};
        at(1700000000, 999999).localtime(broken);
        char text[30];
        std::strftime(text, sizeof text, "%F %T", &broken);
        EXPECT_STREQ(row.expected, text);
    }
}

TEST(TimevalTest, LocaltimeAbortsIfTheYearDoesNotFit) {
    struct tm broken;
    EXPECT_EXIT(at(LLONG_MAX, 0).localtime(broken), testing::KilledBySignal(SIGABRT), "^$");
}

TEST(CurrentTimevalTest, TakesBothFieldsOfATimeval) {
    CurrentTimeval current;
    EXPECT_EQ(&current, &(current = at(5, 7)));
    EXPECT_EQ("5:7", str(current));
    const Timeval& itself = current;
    current = itself;
    EXPECT_EQ("5:7", str(current));
}

}  // namespace
