#include "util/DCUtils.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include "support/AllStrings.h"
#include "support/Examples.h"

namespace {

using namespace std::string_literals;

// Takes over an array that a function returned; "(null)" for null.
std::string taken(char* array) {
    const std::unique_ptr<char[]> owner(array);
    return array == nullptr ? "(null)" : array;
}

TEST(DCUtilsTest, NullGivesNullOrFalse) {
    for (char* (*function)(const char*) :
         {&copystr, static_cast<char* (*)(const char*)>(&strip),
          static_cast<char* (*)(const char*)>(&lowercase), &substituteEnvs}) {
        EXPECT_EQ(nullptr, function(nullptr));
        EXPECT_EQ("", taken(function("")));
    }
    const char* const null = nullptr;
    EXPECT_FALSE(startsWith(null, "a") || startsWith(null, ""));
    EXPECT_FALSE(startsWith("a", null) || startsWith(null, null));
    EXPECT_FALSE(toBool(nullptr));
}

TEST(DCUtilsTest, CopiesIntoANewArray) {
    for (const std::string& text : {"a"s, std::string(100000, 'x')}) {
        const std::unique_ptr<char[]> copy(copystr(text.c_str()));
        EXPECT_EQ(text, copy.get());
        EXPECT_NE(text.c_str(), copy.get());
    }
}

TEST(DCUtilsTest, FindsOutWhetherATextStartsWithAPrefix) {
    const struct {
        const char *text, *prefix;
        bool expected, ignoringCase;
    } rows[] = {
        {"abc", "ab", true, true},  {"abc", "abc", true, true},    {"ab", "abc", false, false},
        {"abc", "", true, true},    {"", "", true, true},          {"", "a", false, false},
        {"abc", "b", false, false}, {"abc", "AB", false, true},    {"ABC", "ab", false, true},
        {"h[", "h{", false, false}, {"\xe4x", "\xe4", true, true},
    };
    for (const auto& row : rows) {
        const std::string text = row.text, prefix = row.prefix;
        SCOPED_TRACE(text + ' ' + prefix);
        EXPECT_EQ(row.expected, startsWith(row.text, row.prefix));
        EXPECT_EQ(row.expected, startsWith(text, prefix));
        EXPECT_EQ(row.expected, startsWith(text, row.prefix));
        EXPECT_EQ(row.ignoringCase, startsCaseWith(row.text, row.prefix));
    }
}

TEST(DCUtilsTest, StringsStartWithPrefixesThatContainANul) {
    EXPECT_TRUE(startsWith("a\0b"s, "a\0b"s));
    EXPECT_FALSE(startsWith("a\0b"s, "a\0c"s));
}

TEST(DCUtilsTest, ATextEndsWithASuffixIfItsLastOccurrenceIsThere) {
    EXPECT_TRUE(endsWith("a\0b"s, "\0b"s));
    EXPECT_FALSE(endsWith("abc", "C"));
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
        {"\304A", "a", 1},
    };
    for (const auto& row : rows) {
        const char* const expected = row.offset < 0 ? nullptr : row.text + row.offset;
        EXPECT_EQ(expected, my_strcasestr(row.text, row.part)) << row.text << ' ' << row.part;
    }
}

TEST(DCUtilsTest, StripsWhiteSpaceAroundAText) {
    for (const std::string text : {"", "a", "a b", "\xa0x\xa0", "\x01"}) {
        for (const std::string blanks : {"", " ", "\t\n\v\f\r ", "  \n"}) {
            EXPECT_EQ(text, taken(strip((blanks + text).c_str())));
            EXPECT_EQ(text, taken(strip((text + blanks).c_str())));
            EXPECT_EQ(text, strip(blanks + text + blanks));
        }
    }
}

TEST(DCUtilsTest, StrippingAStringStopsAtAnEmbeddedNul) {
    EXPECT_EQ("a", strip(" a \0 b"s));
    EXPECT_EQ("", strip("\0a"s));
}

TEST(DCUtilsTest, LowersACopyOrAStringInPlace) {
    for (const std::string& text : {"HeLLo 1[]{}"s, "\xc4\xff"s}) {
        const std::string expected = text[0] == 'H' ? "hello 1[]{}" : text;
        EXPECT_EQ(expected, taken(lowercase(text.c_str())));
        std::string lowered = text + "\0A"s;
        lowercase(lowered);
        EXPECT_EQ(expected + "\0a"s, lowered);
    }
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
        {"\304A\304", "a", "-", "\304-\304"},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(row.expected, taken(replaceString(row.text, row.find, row.replacement)))
            << row.text << ' ' << row.find;
    }
}

TEST(DCUtilsTest, PadsWithFourSpacesPerLevel) {
    EXPECT_EQ("", pad(0));
    EXPECT_EQ(std::string(12, ' '), pad(3));
}

TEST(DCUtilsTest, SubstitutesEnvironmentVariables) {
    ::setenv("QT_NAME", "value", 1);
    ::setenv("QT_EMPTY", "", 1);
    ::setenv("1b", "one-b", 1);
    ::setenv("QT_DOLLAR", "$QT_NAME", 1);
    ::unsetenv("QT_UNSET");
    expectEach(
        [](const std::string& text) { return taken(substituteEnvs(text.c_str())); },
        {" > ", "plain > plain", "$QT_NAME > value", "[$QT_NAME] > [value]",
         "$QT_NAME/$QT_NAME > value/value", "$QT_NAME$QT_NAME > valuevalue", "a$QT_EMPTY. > a.",
         "a$QT_UNSET. > a.", "a$1b > aone-b", "$QT_NAMEx > ", "${QT_NAME} > {QT_NAME}", "$$ > ",
         "$ > ", "a$ b > a b", "$$QT_NAME > value", "\\$QT_NAME > \\value", "$QT_DOLLAR > $QT_NAME",
         "$QT_NAME\xe4 > value\xe4", "$\xe4 > \xe4"});
}

TEST(DCUtilsTest, FillsAnEscapeMap) {
    char map[257];
    std::memset(map, 77, sizeof map);
    initMap(map, "a\xff\t");
    std::string expected(256, '\0');
    expected['a'] = expected[0xff] = 1;
    expected['\t'] = 't';  // the escape wins over the set
    expected['\r'] = 'r';
    expected['\\'] = '\\';
    expected['"'] = '"';
    EXPECT_EQ(expected + char(77), std::string(map, sizeof map));
}

TEST(DCUtilsTest, OutlinesThePunctuationOfALine) {
    const auto outline = [](const std::string& text, unsigned max_len = 28) {
        std::string out;
        getPunct(text, out, max_len);
        return out;
    };
    expectEach(outline, {"cp /a/b.txt dir/1.0 > _//._/.", "a, b; c > ,_;_", " > ", "\n,, > ",
                         ",\n; > ,", ",\0; > ,"s, "\0, > "s, "one\ttwo > t", "x:\\word > :\\\\",
                         "a\rb > \\r", "say \"x\" > _\\\"\\\"", "_~`\x7f\x80\xff > "});
    EXPECT_EQ("_,;-#$%&+./:=?@'|*(){}<>[]^!", outline(" ,;-#$%&+./:=?@'|*(){}<>[]^!"));
    EXPECT_EQ(",,", outline("a,b,c", 2));
    EXPECT_EQ("", outline("a,b,c", 0));
    EXPECT_EQ("\\\\\\\\", outline("\\\\\\", 2));
}

TEST(DCUtilsTest, AppendsTheOutlineAfterReservingItsRoom) {
    for (const unsigned limit : {100U, 5000U}) {
        std::string out = "before";
        getPunct("a;b", out, limit);
        EXPECT_EQ("before;", out);
        EXPECT_LE(6 + 2 * limit + 1, out.capacity());
    }
}

TEST(DCUtilsTest, WritesAndReadsTruthValues) {
    EXPECT_STREQ("True", bool2str(true));
    EXPECT_STREQ("False", bool2str(false));
    for (const char* const text : {"", "false", "FALSE", "False", "no", "No", "NO", "0"}) {
        EXPECT_FALSE(toBool(text)) << text;
    }
    for (const char* const text :
         {"true", "yes", "off", "n", "f", "1", "00", " ", " no", "no ", "0.0", "falsely"}) {
        EXPECT_TRUE(toBool(text)) << text;
    }
}

TEST(DCUtilsTest, WritesNumbersInDecimal) {
    std::vector<long> values = {0, 7, -7, 10, -45, LONG_MAX, -LONG_MAX, LONG_MIN};
    std::mt19937_64 random(20010203);
    for (int i = 0; i < 20000; ++i) {
        values.push_back(static_cast<long>(random()) >> (random() % 64));
    }
    for (const long value : values) {
        const std::string expected = std::to_string(value);
        char buf[22];
        std::memset(buf, 'x', sizeof buf);
        int len = -1;
        ASSERT_EQ(buf, ltoa(buf, value, &len));
        ASSERT_EQ(expected + '\0', std::string(buf, expected.size() + 1));
        ASSERT_EQ('x', buf[expected.size() + 1]) << "written past the end";
        ASSERT_EQ(static_cast<int>(expected.size()) - 1, len) << expected;
        ASSERT_EQ(expected, ltoa(buf, value, nullptr));
        std::string out = "n=";
        ASSERT_EQ(&out, &ltoa(value, out));
        ASSERT_EQ("n=" + expected, out);
    }
}

TEST(DCUtilsTest, ReadsLongs) {
    const std::string largest = std::to_string(LONG_MAX), smallest = std::to_string(LONG_MIN);
    const std::string tooLarge = std::to_string(LONG_MAX + 1UL);
    const std::string tooSmall = '-' + std::to_string(LONG_MAX + 2UL);
    for (const int stale : {0, EDOM, ERANGE}) {
        const auto read = [stale](const std::string& text) {
            bool successful = false;
            errno = stale;
            const long value = getLong(text, successful);
            EXPECT_EQ(0, errno) << text;
            return std::to_string(value) + (successful ? "" : " failed");
        };
        expectEach(read, {"0 > 0", "12 > 12", "-12 > -12", "+12 > 12", " \t\n12 > 12", "007 > 7",
                          largest + " > " + largest, smallest + " > " + smallest});
        expectEach(read,
                   {tooLarge + " > " + largest + " failed", tooSmall + " > " + smallest + " failed",
                    "12x > 12 failed", "12  > 12 failed", "0x10 > 0 failed", " > 0 failed",
                    "  > 0 failed", "x > 0 failed", "- > 0 failed", "12\0 > 12 failed"s});
    }
}

TEST(DCUtilsTest, ReadsDoubles) {
    constexpr double FAILURE = -9.99e99;
    for (const int stale : {0, EDOM, ERANGE}) {
        const auto read = [stale](const std::string& text) {
            errno = stale;
            const double value = getDouble(text);
            EXPECT_EQ(0, errno) << text;
            return value == FAILURE ? "failed" : std::to_string(value).substr(0, 6);
        };
        expectEach(read, {"0 > 0.0000", "1 > 1.0000", "-1 > -1.000", "-.5 > -0.500", "1e3 > 1000.0",
                          "9.5 > 9.5000", "5. > 5.0000", "0x10 > 16.000", "-inf > -inf"});
        expectEach(read, {"1.0  > failed", "1x > failed", "- > failed", "1e999 > failed",
                          "-1e999 > failed", "1e-999 > failed", "1\0 > failed"s, "1,5 > failed"});
    }
    for (const char* const text : {"", "+1", ".5", " 1", "inf", "nan", "x"}) {
        EXPECT_EQ(FAILURE, getDouble(text)) << text;
    }
}

}  // namespace
