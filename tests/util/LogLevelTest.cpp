#include "util/LogLevel.h"

#include <gtest/gtest.h>

#include <climits>
#include <cstring>
#include <type_traits>

namespace {

TEST(LogLevelTest, NamesEveryLevel) {
    const struct {
        int value;
        const char* text;
        std::size_t length;
    } rows[] = {
        {0, "DEBUG", 5}, {1, "INFO", 4},      {2, "NOTICE", 6}, {3, "WARN", 4},
        {4, "ERROR", 5}, {5, "CRIT", 4},      {6, "ALERT", 5},  {7, "FATAL", 5},
        {8, "EMERG", 5}, {9, "???", 3},       {10, "???", 3},   {255, "???", 3},
        {256, "???", 3}, {INT_MAX, "???", 3}, {-1, "???", 3},   {INT_MIN, "???", 3},
    };
    for (const auto& row : rows) {
        std::size_t length = 99;
        EXPECT_STREQ(row.text, loglevel2str(&length, static_cast<LogLevel>(row.value)))
            << row.value;
        EXPECT_EQ(row.length, length) << row.value;
        EXPECT_EQ(std::strlen(row.text), length) << row.value;
    }
}

TEST(LogLevelTest, NumbersTheLevelsInAscendingOrder) {
    EXPECT_EQ(0, DEBUG);
    EXPECT_EQ(1, INFO);
    EXPECT_EQ(2, NOTICE);
    EXPECT_EQ(3, WARN);
    EXPECT_EQ(4, ERROR);
    EXPECT_EQ(5, CRIT);
    EXPECT_EQ(6, ALERT);
    EXPECT_EQ(7, FATAL);
    EXPECT_EQ(8, EMERG);
}

TEST(LogLevelTest, IsStoredInThirtyTwoBits) {
    static_assert(std::is_same_v<std::int32_t, std::underlying_type_t<LogLevel>>);
    EXPECT_EQ(4u, sizeof(LogLevel));
}

TEST(LogLevelTest, IsAPlainEnumerationOfGlobalNames) {
    static_assert(std::is_convertible_v<LogLevel, int>);
    EXPECT_EQ(LogLevel::INFO, ::INFO);
    EXPECT_EQ(LogLevel::DEBUG, ::DEBUG);
}

}  // namespace
