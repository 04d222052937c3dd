#include "util/DCUtils.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <climits>
#include <cmath>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <random>
#include <string>
#include <type_traits>
#include <utility>

#include "support/AllStrings.h"
#include "support/AllocationProbe.h"

namespace {

using namespace std::string_literals;

// Takes over an array that a function returned; "(null)" for null.
std::string taken(char* array) {
    const std::unique_ptr<char[]> owner(array);
    return array == nullptr ? "(null)" : array;
}

// Each overload by its type: what a pointer, a literal and a string select, and what comes back.
TEST(DCUtilsTest, OverloadsAreSelectedByTheTypeOfTheText) {
    static_cast<void>(static_cast<bool (*)(const char*, const char*)>(&startsWith));
    static_cast<void>(static_cast<bool (*)(const std::string&, const std::string&)>(&startsWith));
    static_cast<void>(static_cast<char* (*)(char*, long, int*)>(&ltoa));
    static_cast<void>(static_cast<std::string& (*)(long, std::string&)>(&ltoa));
    static_assert(std::is_same_v<char*, decltype(strip(NULL))>);
    static_assert(std::is_same_v<char*, decltype(strip("literal"))>);
    static_assert(std::is_same_v<std::string, decltype(strip(std::string()))>);
    static_assert(std::is_same_v<char*, decltype(lowercase(NULL))>);
    static_assert(std::is_same_v<char*, decltype(lowercase("literal"))>);
    static_assert(std::is_same_v<void, decltype(lowercase(std::declval<std::string&>()))>);
    static_assert(std::is_same_v<char*(const char*), decltype(copystr)>);
    static_assert(std::is_same_v<char*(const char*), decltype(substituteEnvs)>);
    static_assert(std::is_same_v<char*(const char*, const char*), decltype(my_strcasestr)>);
    static_assert(std::is_same_v<char*(const Pathname&), decltype(readText)>);
    static_assert(std::is_same_v<bool(const Pathname&, const char*), decltype(writeText)>);
    static_assert(std::is_same_v<bool(std::FILE*, char*, int), decltype(readLine)>);
    static_assert(std::is_same_v<const char*(bool), decltype(bool2str)>);
    static_assert(std::is_same_v<bool(const char*), decltype(toBool)>);
    static_assert(std::is_same_v<void(char*, const char*), decltype(initMap)>);
    static_assert(std::is_same_v<long(const std::string&, bool&), decltype(getLong)>);
    static_assert(std::is_same_v<double(const std::string&), decltype(getDouble)>);
    static_assert(std::is_same_v<std::string(unsigned), decltype(pad)>);
    static_assert(
        std::is_same_v<void(const std::string&, std::string&, unsigned), decltype(getPunct)>);
    EXPECT_EQ(nullptr, copystr(NULL));
    EXPECT_EQ(nullptr, strip(NULL));
    EXPECT_EQ(nullptr, lowercase(NULL));
    EXPECT_EQ(nullptr, substituteEnvs(NULL));
    EXPECT_FALSE(toBool(NULL));
}

TEST(DCUtilsTest, TellsWhetherATextStartsWithAPrefix) {
    const struct {
        const char *text, *prefix;
        bool expected;
    } rows[] = {
        {"abc", "ab", true}, {"abc", "abc", true}, {"ab", "abc", false},
        {"abc", "", true},   {"", "", true},       {"", "a", false},
        {"abc", "b", false}, {"abc", "AB", false}, {"\xe4x", "\xe4", true},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(row.expected, startsWith(row.text, row.prefix)) << row.text << ' ' << row.prefix;
        EXPECT_EQ(row.expected, startsWith(std::string(row.text), std::string(row.prefix)))
            << row.text << ' ' << row.prefix;
    }
}

TEST(DCUtilsTest, NothingStartsWithOrIsNull) {
    const char* const null = nullptr;
    EXPECT_FALSE(startsWith(null, "a"));
    EXPECT_FALSE(startsWith(null, ""));
    EXPECT_FALSE(startsWith("a", null));
    EXPECT_FALSE(startsWith(null, null));
}

TEST(DCUtilsTest, ComparesTextsAndStringsWithEachOther) {
    EXPECT_TRUE(startsWith("abc"s, "ab"));
    EXPECT_TRUE(startsWith("abc", "ab"s));
    EXPECT_FALSE(startsWith("abc"s, "b"));
    EXPECT_FALSE(startsWith(nullptr, "a"));
    EXPECT_FALSE(startsWith("a", NULL));
}

TEST(DCUtilsTest, StringsStartWithPrefixesBehindAnEmbeddedNul) {
    EXPECT_TRUE(startsWith("a\0b"s, "a\0b"s));
    EXPECT_FALSE(startsWith("a\0b"s, "a\0c"s));
}

TEST(DCUtilsTest, ComparesPrefixesIgnoringCase) {
    const struct {
        const char *text, *prefix;
        bool expected;
    } rows[] = {
        {"HELLO", "hel", true}, {"hello", "HEL", true}, {"hello", "", true}, {"", "", true},
        {"he", "hello", false}, {"hello", "el", false}, {"h[", "h{", false},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(row.expected, startsCaseWith(row.text, row.prefix))
            << row.text << ' ' << row.prefix;
    }
}

TEST(DCUtilsTest, TellsWhetherATextEndsWithASuffix) {
    const struct {
        std::string text, suffix;
        bool expected;
    } rows[] = {
        {"abc", "bc", true}, {"abc", "abc", true}, {"bc", "abc", false},    {"abc", "", true},
        {"", "", true},      {"", "a", false},     {"abcb", "bc", false},   {"bcbc", "bc", true},
        {"aaa", "aa", true}, {"abc", "C", false},  {"a\0b"s, "\0b"s, true},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(row.expected, endsWith(row.text, row.suffix)) << row.text << ' ' << row.suffix;
    }
}

TEST(DCUtilsTest, EndsWithAgreesWithTheLastOccurrence) {
    const std::size_t texts = forEachString("ab", 5, [](const std::string& text) {
        forEachString("ab", 3, [&](const std::string& suffix) {
            const std::size_t last = text.rfind(suffix);
            const bool expected = last != std::string::npos && last == text.size() - suffix.size();
            EXPECT_EQ(expected, endsWith(text, suffix)) << text << ' ' << suffix;
        });
    });
    EXPECT_EQ(63u, texts);
}

TEST(DCUtilsTest, FindsLowerCaseTextsWhateverTheCaseOfTheText) {
    const struct {
        const char *text, *part;
        int offset;  // -1: not found
    } rows[] = {
        {"Hello World", "world", 6},
        {"Hello World", "World", -1},
        {"HELLO", "l", 2},
        {"HELLO", "", 0},
        {"", "", 0},
        {"", "a", -1},
        {"abc", "abcd", -1},
        {"\xc4"
         "A",
         "a", 1},
    };
    for (const auto& row : rows) {
        const char* const expected = row.offset < 0 ? nullptr : row.text + row.offset;
        EXPECT_EQ(expected, my_strcasestr(row.text, row.part)) << row.text << ' ' << row.part;
    }
}

TEST(DCUtilsTest, StripsWhiteSpaceAroundAText) {
    const struct {
        const char *text, *expected;
    } rows[] = {
        {"", ""},
        {"  ", ""},
        {" a b ", "a b"},
        {"a", "a"},
        {"\t\n\v\f\r x", "x"},
        {"x \t\r\n", "x"},
        {"\xa0x\xa0", "\xa0x\xa0"},
        {" \x01 ", "\x01"},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(row.expected, taken(strip(row.text))) << '"' << row.text << '"';
        EXPECT_EQ(row.expected, strip(std::string(row.text))) << '"' << row.text << '"';
    }
    EXPECT_EQ(nullptr, strip(nullptr));
}

TEST(DCUtilsTest, StrippingAStringStopsAtAnEmbeddedNul) {
    EXPECT_EQ("a", strip(" a \0 b"s));
    EXPECT_EQ("", strip("\0a"s));
}

TEST(DCUtilsTest, LowersEveryByteOfACopy) {
    EXPECT_EQ("hello 1[]{}", taken(lowercase("HeLLo 1[]{}")));
    EXPECT_EQ("", taken(lowercase("")));
    EXPECT_EQ("\xc4\xff", taken(lowercase("\xc4\xff")));
    EXPECT_EQ(nullptr, lowercase(nullptr));
}

TEST(DCUtilsTest, LowersAStringInPlacePastAnEmbeddedNul) {
    std::string text = "AB\0CD\xc4"s;
    lowercase(text);
    EXPECT_EQ("ab\0cd\xc4"s, text);
    std::string empty;
    lowercase(empty);
    EXPECT_EQ("", empty);
}

TEST(DCUtilsTest, ReplacesEveryOccurrenceInPlace) {
    const struct {
        std::string text, find, replacement, expected;
    } rows[] = {
        {"aaa", "a", "aa", "aaaaaa"}, {"aaa", "aa", "b", "ba"}, {"abab", "ab", "", ""},
        {"abc", "x", "y", "abc"},     {"", "a", "b", ""},       {"Aa", "a", "b", "Ab"},
        {"a\0a"s, "\0"s, "-", "a-a"}, {"aab", "ab", "b", "ab"}, {"abc", "", "x", "abc"},
    };
    for (const auto& row : rows) {
        std::string text = row.text;
        replaceAllString(text, row.find, row.replacement);
        EXPECT_EQ(row.expected, text) << row.text << ' ' << row.find;
    }
}

TEST(DCUtilsTest, ReplacesInACopyIgnoringTheCaseOfTheTextAlone) {
    const struct {
        const char *text, *find, *replacement, *expected;
    } rows[] = {
        {"Hello HELLO", "hello", "x", "x x"},
        {"Hello HELLO", "Hello", "x", "Hello HELLO"},
        {"Some Text Here", "text", "TEXT", "Some TEXT Here"},
        {"AAA", "aa", "b", "bA"},
        {"abab", "ab", "", ""},
        {"Keep Case", "x", "y", "Keep Case"},
        {"A", "a", "aa", "aa"},
        {"", "a", "b", ""},
        {"Text", "", "b", "Text"},
        {"\xc4"
         "A\xc4",
         "a", "-", "\xc4-\xc4"},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(row.expected, taken(replaceString(row.text, row.find, row.replacement)))
            << row.text << ' ' << row.find;
    }
}

TEST(DCUtilsTest, PadsWithFourSpacesPerLevel) {
    EXPECT_EQ("", pad(0));
    EXPECT_EQ("    ", pad(1));
    EXPECT_EQ(std::string(12, ' '), pad(3));
    EXPECT_EQ(400u, pad(100).size());
}

TEST(DCUtilsTest, SubstitutesEnvironmentVariables) {
    ::setenv("QT_NAME", "value", 1);
    ::setenv("QT_EMPTY", "", 1);
    ::setenv("1b", "one-b", 1);
    ::setenv("QT_DOLLAR", "$QT_NAME", 1);
    ::unsetenv("QT_UNSET");
    const struct {
        const char *text, *expected;
    } rows[] = {
        {"", ""},
        {"plain", "plain"},
        {"$QT_NAME", "value"},
        {"<$QT_NAME>", "<value>"},
        {"$QT_NAME/$QT_NAME", "value/value"},
        {"$QT_NAME$QT_NAME", "valuevalue"},
        {"a$QT_EMPTY.", "a."},
        {"a$QT_UNSET.", "a."},
        {"a$1b", "aone-b"},
        {"$QT_NAMEx", ""},
        {"${QT_NAME}", "{QT_NAME}"},
        {"$$", ""},
        {"$", ""},
        {"a$ b", "a b"},
        {"$$QT_NAME", "value"},
        {"\\$QT_NAME", "\\value"},
        {"$QT_DOLLAR", "$QT_NAME"},
        {"$QT_NAME\xe4", "value\xe4"},
        {"$\xe4", "\xe4"},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(row.expected, taken(substituteEnvs(row.text))) << row.text;
    }
    EXPECT_EQ(nullptr, substituteEnvs(nullptr));
}

TEST(DCUtilsTest, FillsAnEscapeMap) {
    char map[257];
    std::memset(map, 77, sizeof map);
    initMap(map, "a\xff\t");
    for (int byte = 0; byte < 256; ++byte) {
        char expected = 0;
        switch (byte) {
            case 'a':
            case 0xff:
                expected = 1;
                break;
            case '\t':
                expected = 't';
                break;  // the escape wins over the set
            case '\r':
                expected = 'r';
                break;
            case '\\':
                expected = '\\';
                break;
            case '"':
                expected = '"';
                break;
            default:
                break;
        }
        EXPECT_EQ(expected, map[byte]) << byte;
    }
    EXPECT_EQ(77, map[256]) << "written past the end";
}

std::string punctOf(const std::string& text, unsigned max_len) {
    std::string out;
    getPunct(text, out, max_len);
    return out;
}

TEST(DCUtilsTest, OutlinesThePunctuationOfALine) {
    const struct {
        std::string text;
        unsigned max_len;
        const char* expected;
    } rows[] = {
        {"cp /a/b.txt dir/1.0", 10, "_//._/."},
        {"a, b; c", 10, ",_;_"},
        {"a,b,c", 2, ",,"},
        {"a,b,c", 1, ","},
        {"a,b,c", 0, ""},
        {"", 10, ""},
        {"\n,,", 10, ""},
        {",\n;", 10, ","},
        {",\0;"s, 10, ","},
        {"\0,"s, 10, ""},
        {"one\ttwo", 5, "t"},
        {"x:\\word", 10, ":\\\\"},
        {"a\rb", 10, "\\r"},
        {"say \"x\"", 10, "_\\\"\\\""},
        {"\\\\\\", 2, "\\\\\\\\"},
        {" ,;-#$%&+./:=?@'|*(){}<>[]^!", 28, "_,;-#$%&+./:=?@'|*(){}<>[]^!"},
        {"_~`\x7f\x80\xff", 10, ""},
        {"a,b", UINT_MAX, ","},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(row.expected, punctOf(row.text, row.max_len)) << row.text << ' ' << row.max_len;
    }
}

TEST(DCUtilsTest, AppendsTheOutline) {
    std::string out = "before";
    getPunct("a;b", out, 5);
    EXPECT_EQ("before;", out);
}

TEST(DCUtilsTest, ReservesRoomForTheWholeOutline) {
    for (const unsigned limit : {100U, 5000U}) {
        std::string out = "before";
        getPunct("", out, limit);
        EXPECT_LE(6 + 2 * limit + 1, out.capacity());
    }
}

TEST(DCUtilsTest, AnOutlineDoesWithoutTheRoomThatIsNotToBeHad) {
    REQUIRE_ALLOCATION_PROBE();
    std::string out = "before";
    {
        const AllocationProbe allocations(1);
        getPunct("a;b", out, 5000);
        EXPECT_EQ(1U, allocations.count());
    }
    EXPECT_EQ("before;", out);
}

TEST(DCUtilsTest, NamesTruthValues) {
    EXPECT_STREQ("True", bool2str(true));
    EXPECT_STREQ("False", bool2str(false));
    EXPECT_EQ(bool2str(true), bool2str(true));
}

TEST(DCUtilsTest, ReadsTruthValues) {
    for (const char* const text : {"", "false", "FALSE", "False", "no", "No", "NO", "0"}) {
        EXPECT_FALSE(toBool(text)) << text;
    }
    EXPECT_FALSE(toBool(nullptr));
    for (const char* const text :
         {"true", "yes", "off", "n", "f", "1", "00", " ", " no", "no ", "0.0", "falsely"}) {
        EXPECT_TRUE(toBool(text)) << text;
    }
}

TEST(DCUtilsTest, WritesNumbersInDecimal) {
    const struct {
        long value;
        const char* expected;
    } rows[] = {
        {0, "0"},
        {7, "7"},
        {-7, "-7"},
        {10, "10"},
        {-45, "-45"},
        {2147483647, "2147483647"},
        {-2147483647, "-2147483647"},
        {LONG_MAX, "9223372036854775807"},
        {-LONG_MAX, "-9223372036854775807"},
        {LONG_MIN, "-9223372036854775808"},
    };
    for (const auto& row : rows) {
        char buf[22];
        std::memset(buf, 'x', sizeof buf);
        int len = -1;
        EXPECT_EQ(buf, ltoa(buf, row.value, &len));
        EXPECT_STREQ(row.expected, buf);
        EXPECT_EQ('x', buf[std::strlen(row.expected) + 1]) << "written past the end";
        EXPECT_EQ(static_cast<int>(std::strlen(row.expected)) - 1, len) << row.expected;
        EXPECT_EQ(buf, ltoa(buf, row.value, nullptr));
        EXPECT_STREQ(row.expected, buf);

        std::string out = "n=";
        EXPECT_EQ(&out, &ltoa(row.value, out));
        EXPECT_EQ("n=" + std::string(row.expected), out);
    }
}

TEST(DCUtilsTest, WritesNumbersLikeTheStandardLibrary) {
    std::mt19937_64 random(20010203);
    for (int i = 0; i < 20000; ++i) {
        const long value = static_cast<long>(random()) >> (random() % 64);
        std::string out;
        EXPECT_EQ(std::to_string(value), ltoa(value, out));
    }
}

TEST(DCUtilsTest, ReadsLongs) {
    const struct {
        std::string text;
        long value;
        bool successful;
    } rows[] = {
        {"0", 0, true},
        {"12", 12, true},
        {"-12", -12, true},
        {"+12", 12, true},
        {" \t\n12", 12, true},
        {"007", 7, true},
        {"9223372036854775807", LONG_MAX, true},
        {"-9223372036854775808", LONG_MIN, true},
        {"9223372036854775808", LONG_MAX, false},
        {"-9223372036854775809", LONG_MIN, false},
        {"12x", 12, false},
        {"12 ", 12, false},
        {"0x10", 0, false},
        {"", 0, false},
        {" ", 0, false},
        {"x", 0, false},
        {"-", 0, false},
        {"12\0"s, 12, false},
    };
    for (const auto& row : rows) {
        for (const int stale : {0, ERANGE}) {
            errno = stale;
            bool successful = !row.successful;
            EXPECT_EQ(row.value, getLong(row.text, successful)) << row.text;
            EXPECT_EQ(row.successful, successful) << row.text;
            EXPECT_EQ(0, errno) << row.text;
        }
    }
}

TEST(DCUtilsTest, ReadsDoubles) {
    const struct {
        std::string text;
        double expected;
    } rows[] = {
        {"0", 0},
        {"1", 1},
        {"-1", -1},
        {"-.5", -0.5},
        {"1e3", 1000},
        {"1.5", 1.5},
        {"9.5", 9.5},
        {"5.", 5},
        {"0x10", 16},
        {"-inf", -HUGE_VAL},
        {"", -9.99e99},
        {"+1", -9.99e99},
        {".5", -9.99e99},
        {" 1", -9.99e99},
        {"1.0 ", -9.99e99},
        {"1x", -9.99e99},
        {"-", -9.99e99},
        {"inf", -9.99e99},
        {"1e999", -9.99e99},
        {"-1e999", -9.99e99},
        {"1e-999", -9.99e99},
        {"1\0"s, -9.99e99},
        {"1,5", -9.99e99},
        {"nan", -9.99e99},
    };
    for (const auto& row : rows) {
        for (const int stale : {0, ERANGE}) {
            errno = stale;
            EXPECT_EQ(row.expected, getDouble(row.text)) << row.text;
        }
    }
}

TEST(DCUtilsTest, ClearsTheErrorOfAFailedDouble) {
    errno = 0;
    EXPECT_EQ(-9.99e99, getDouble("1e999"));
    EXPECT_EQ(0, errno);
}

}  // namespace
