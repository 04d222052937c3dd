#include "util/Timeval.h"

#include <gtest/gtest.h>

#include <string>

#include "support/AllStrings.h"
#include "support/Examples.h"
#include "support/SlowMilliseconds.h"

namespace {

// What a conversion stores: the milliseconds and the number of characters, or "none" if it finds no
// number.
std::string convert(const std::string& text) {
    unsigned long long msecs = 77;
    unsigned long charCount = 77;
    if (convert_string_to_milliseconds(text.c_str(), &msecs, &charCount)) {
        return std::to_string(msecs) + ' ' + std::to_string(charCount);
    }
    EXPECT_EQ(0u, msecs) << text;
    EXPECT_EQ(0u, charCount) << text;
    return "none";
}

TEST(ConvertMillisecondsTest, ReadsDecimalSeconds) {
    expectEach(convert, {"0 > 0 1", "1.5 > 1500 3", "12 > 12000 2", "007 > 7000 3", ".25 > 250 3",
                         "  2 > 2000 3", " \t 2s > 2000 4", "1.5s > 1500 3", "1.2.3 > 1200 3",
                         "1 2 > 1000 1", "1,5 > 1000 1"});
}

TEST(ConvertMillisecondsTest, RoundsHalfUpButNeverToZero) {
    expectEach(convert, {"0.0004 > 1 6", "0.0001 > 1 6", "0.00049 > 1 7", "0.00000001 > 1 10",
                         "0.0000 > 0 6", "0.000000000 > 0 11", "0.0005 > 1 6", "0.0014 > 1 6",
                         "0.0015 > 2 6", "0.00149999 > 1 10", "1.0004 > 1000 6", "1.9995 > 2000 6",
                         "1.9994 > 1999 6"});
}

TEST(ConvertMillisecondsTest, APointIsReadOnlyBeforeADigitOrTheEnd) {
    expectEach(convert, {"5.s > 5000 1", "5. > 5000 2", "5. 5 > 5000 1", ". > 0 1", "  . > 0 3",
                         ".s > none", ". 5 > none", "..5 > none", "5..5 > 5000 1", " > none",
                         " \t > none", "abc > none", "-1 > none", "+1 > none", "\n1 > none"});
}

TEST(ConvertMillisecondsTest, WhatDoesNotFitIsAllOnes) {
    expectEach(convert, {"18446744073709551 > 18446744073709551000 17",
                         "18446744073709551.615 > 18446744073709551615 21",
                         "18446744073709551.6144 > 18446744073709551614 22",
                         "18446744073709551.6154 > 18446744073709551615 22",
                         "18446744073709551.616 > 18446744073709551615 21",
                         "18446744073709551.9 > 18446744073709551615 19",
                         "18446744073709552 > 18446744073709551615 17",
                         "18446744073709552.5x > 18446744073709551615 19",
                         "19000000000000000 > 18446744073709551615 17",
                         "99999999999999999999999999999999999999999 > 18446744073709551615 41",
                         // Further digits must not bring a wrapped value back into range.
                         "184467440737095520000 > 18446744073709551615 21"});
}

TEST(ConvertMillisecondsTest, TheCountMayBeNull) {
    unsigned long long msecs = 77;
    EXPECT_TRUE(convert_string_to_milliseconds("3", &msecs, nullptr));
    EXPECT_EQ(3000u, msecs);
    EXPECT_FALSE(convert_string_to_milliseconds("x", &msecs, nullptr));
    EXPECT_EQ(0u, msecs);
}

TEST(ConvertMillisecondsTest, AgreesWithTheSlowVersionOnEveryShortText) {
    const std::size_t compared = forEachString("045. s", 7, [](const std::string& text) {
        ASSERT_EQ(convertSlowly(text), convert(text)) << '"' << text << '"';
    });
    EXPECT_EQ(335923u, compared);
}

}  // namespace
