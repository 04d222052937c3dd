#include "util/Timeval.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <ostream>
#include <span>
#include <string>

#include "support/AllStrings.h"

namespace {

constexpr unsigned long long ALL_ONES = 18446744073709551615ULL;

struct Conversion {
    bool found;
    unsigned long long msecs;
    unsigned long charCount;

    bool operator==(const Conversion&) const = default;
};

std::ostream& operator<<(std::ostream& out, const Conversion& c) {
    return out << (c.found ? "true " : "false ") << c.msecs << " ms, " << c.charCount << " read";
}

Conversion convert(const std::string& text) {
    Conversion result = {false, 77, 77};
    result.found = convert_string_to_milliseconds(text.c_str(), &result.msecs, &result.charCount);
    return result;
}

struct Row {
    const char* text;
    Conversion expected;
};

void expectConversions(std::span<const Row> rows) {
    for (const auto& [text, expected] : rows) {
        EXPECT_EQ(expected, convert(text)) << '"' << text << '"';
    }
}

TEST(ConvertMillisecondsTest, ReadsDecimalSeconds) {
    const Row rows[] = {
        {"0", {true, 0, 1}},         {"1.5", {true, 1500, 3}},  {"12", {true, 12000, 2}},
        {"007", {true, 7000, 3}},    {".25", {true, 250, 3}},   {"  2", {true, 2000, 3}},
        {" \t 2s", {true, 2000, 4}}, {"1.5s", {true, 1500, 3}}, {"1.2.3", {true, 1200, 3}},
        {"1 2", {true, 1000, 1}},    {"1,5", {true, 1000, 1}},
    };
    expectConversions(rows);
}

TEST(ConvertMillisecondsTest, RoundsHalfUpButNeverToZero) {
    const Row rows[] = {
        {"0.0004", {true, 1, 6}},      {"0.0001", {true, 1, 6}},    {"0.00049", {true, 1, 7}},
        {"0.00000001", {true, 1, 10}}, {"0.0000", {true, 0, 6}},    {"0.000000000", {true, 0, 11}},
        {"0.0005", {true, 1, 6}},      {"0.0014", {true, 1, 6}},    {"0.0015", {true, 2, 6}},
        {"0.00149999", {true, 1, 10}}, {"1.0004", {true, 1000, 6}}, {"1.9995", {true, 2000, 6}},
        {"1.9994", {true, 1999, 6}},
    };
    expectConversions(rows);
}

TEST(ConvertMillisecondsTest, APointIsReadOnlyBeforeADigitOrTheEnd) {
    const Row rows[] = {
        {"5.s", {true, 5000, 1}}, {"5.", {true, 5000, 2}}, {"5. 5", {true, 5000, 1}},
        {".", {true, 0, 1}},      {"  .", {true, 0, 3}},   {".s", {false, 0, 0}},
        {". 5", {false, 0, 0}},   {"..5", {false, 0, 0}},  {"5..5", {true, 5000, 1}},
        {"", {false, 0, 0}},      {" \t", {false, 0, 0}},  {"abc", {false, 0, 0}},
        {"-1", {false, 0, 0}},    {"+1", {false, 0, 0}},   {"\n1", {false, 0, 0}},
    };
    expectConversions(rows);
}

TEST(ConvertMillisecondsTest, WhatDoesNotFitIsAllOnes) {
    const Row rows[] = {
        {"18446744073709551", {true, 18446744073709551000ULL, 17}},
        {"18446744073709551.615", {true, ALL_ONES, 21}},
        {"18446744073709551.6144", {true, ALL_ONES - 1, 22}},
        {"18446744073709551.6154", {true, ALL_ONES, 22}},
        {"18446744073709551.616", {true, ALL_ONES, 21}},
        {"18446744073709551.9", {true, ALL_ONES, 19}},
        {"18446744073709552", {true, ALL_ONES, 17}},
        {"18446744073709552.5x", {true, ALL_ONES, 19}},
        {"19000000000000000", {true, ALL_ONES, 17}},
        {"99999999999999999999999999999999999999999", {true, ALL_ONES, 41}},
        // Further digits must not bring a wrapped value back into range.
        {"184467440737095520000", {true, ALL_ONES, 21}},
    };
    expectConversions(rows);
}

TEST(ConvertMillisecondsTest, TheCountMayBeNull) {
    unsigned long long msecs = 77;
    EXPECT_TRUE(convert_string_to_milliseconds("3", &msecs, nullptr));
    EXPECT_EQ(3000u, msecs);
    EXPECT_FALSE(convert_string_to_milliseconds("x", &msecs, nullptr));
    EXPECT_EQ(0u, msecs);
}

// The same from the digits as text: tenths of milliseconds by padding, rounding and comparing.
Conversion convertSlowly(const std::string& text) {
    const std::string digits = "0123456789";
    const std::size_t start = std::min(text.find_first_not_of(" \t"), text.size());
    const std::size_t wholeEnd = std::min(text.find_first_not_of(digits, start), text.size());
    std::size_t end = wholeEnd;
    std::string fraction;
    if (wholeEnd < text.size() && text[wholeEnd] == '.') {
        const std::size_t fractionEnd =
            std::min(text.find_first_not_of(digits, wholeEnd + 1), text.size());
        fraction = text.substr(wholeEnd + 1, fractionEnd - wholeEnd - 1);
        if (!fraction.empty() || wholeEnd + 1 == text.size()) {
            end = fractionEnd;
        }
    }
    if (end == start) {
        return {false, 0, 0};
    }
    const std::string tenths =
        '0' + text.substr(start, wholeEnd - start) + (fraction + "0000").substr(0, 4);
    unsigned long long msecs = (std::stoull(tenths) + 5) / 10;
    if (msecs == 0 && fraction.find_first_not_of('0') != std::string::npos) {
        msecs = 1;
    }
    return {true, msecs, end};
}

TEST(ConvertMillisecondsTest, AgreesWithTheSlowVersionOnEveryShortText) {
    const std::size_t compared = forEachString("045. s", 7, [](const std::string& text) {
        ASSERT_EQ(convertSlowly(text), convert(text)) << '"' << text << '"';
    });
    EXPECT_EQ(335923u, compared);
}

}  // namespace
