#include "util/WildcardMatcher.h"

#include <cstring>
#include <memory>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/AllocationProbe.h"
#include "support/FieldOrder.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

static_assert(std::is_same_v<decltype(WildcardMatcher::_subStrings), char* [256]>);
static_assert(std::is_same_v<decltype(WildcardMatcher::_subStringCount), int>);
static_assert(std::is_same_v<decltype(WildcardMatcher::_isWord), int>);
static_assert(std::is_same_v<decltype(&WildcardMatcher::getPatternPrefix),
                             const char* (WildcardMatcher::*)() const>);
static_assert(std::is_same_v<decltype(&WildcardMatcher::getOrigPattern),
                             const char* (WildcardMatcher::*)() const>);
static_assert(std::is_same_v<decltype(&WildcardMatcher::debugOpaqueMatcher),
                             void (WildcardMatcher::*)() const>);
static_assert(std::is_convertible_v<const char*, WildcardMatcher>);
static_assert(!std::is_polymorphic_v<WildcardMatcher>);

// Matching without capture is a query; with capture it is none.
constexpr bool (WildcardMatcher::*asQuery)(const char*) const = &WildcardMatcher::isMatch;
constexpr bool (WildcardMatcher::*withCapture)(const char*, std::vector<std::string>&) =
    &WildcardMatcher::isMatch;

bool matches(const char* pattern, const char* text) {
    const WildcardMatcher matcher(pattern);
    const bool matched = matcher.isMatch(text);
    EXPECT_EQ(matched, matcher.isMatch(text, std::strlen(text))) << pattern << " on " << text;
    return matched;
}

std::string dump(const WildcardMatcher& matcher) {
    testing::internal::CaptureStdout();
    matcher.debugOpaqueMatcher();
    return testing::internal::GetCapturedStdout();
}

// Assigns. The copies of the earlier pattern stay allocated; the list keeps them reachable for leak
// checkers.
WildcardMatcher& assign(WildcardMatcher& target, const WildcardMatcher& source) {
    static auto& leaked = *new std::vector<const char*>;
    leaked.insert(leaked.end(), {target._needle, target._buffer});
    return target = source;
}

// "x*x*...x" with the given number of segments.
std::string manySegments(int count) {
    std::string pattern;
    for (int i = 0; i < count; ++i) {
        pattern += i == 0 ? "x" : "*x";
    }
    return pattern;
}

TEST(WildcardMatcherTest, MatchesAsTheRulesSay) {
    const struct {
        const char* pattern;
        const char* text;
        bool matched;
    } cases[] = {
        {"*ar", "fark", false},   {"*ar", "far", true},     {"*ar", "farar", true},
        {"*ar", "ar", true},      {"*ar", "arx", false},    {"*aa", "aaa", false},
        {"*aa", "aaaa", true},    {"*aa", "aa", true},      {"*aba", "ababa", false},
        {"*aba", "abaaba", true}, {"abc", "abc", true},     {"abc", "abcd", false},
        {"abc", "ab", false},     {"abc", "xabc", false},   {"abc", "ABC", false},
        {"abc", "", false},       {"a**b", "ab", true},     {"a**b", "axxb", true},
        {"a**b", "a", false},     {"ab*b", "ab", false},    {"ab*b", "abb", true},
        {"ab*b", "abxb", true},   {"ab*", "xab", false},    {"ab*", "ab", true},
        {"ab*", "abc", true},     {"ab*", "a", false},      {"*ab*", "xaby", true},
        {"*ab*", "ab", true},     {"*ab*", "a", false},     {"*ab*ab", "ab", false},
        {"*ab*ab", "abab", true}, {"*a*a*", "a", false},    {"a*b*c", "abc", true},
        {"a*b*c", "axbxc", true}, {"a*b*c", "acb", false},  {"a*bc*bd", "abcbd", true},
        {"", "", true},           {"", "abc", true},        {"*", "", true},
        {"*", "abc", true},       {"***", "", true},        {"***", "abc", true},
        {"?", "a", false},        {"[a]", "a", false},      {"\\*", "*", false},
        {"\\*", "\\x", true},     {"*\xff", "a\xff", true}, {"\x80*", "\x80", true},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(c.matched, matches(c.pattern, c.text)) << c.pattern << " against " << c.text;
        WildcardMatcher matcher(c.pattern);
        std::vector<std::string> parts;
        EXPECT_EQ(c.matched, matcher.isMatch(c.text, parts)) << c.pattern << " with capture";
    }
}

TEST(WildcardMatcherTest, RecordsWhatTheStarsCovered) {
    const struct {
        const char* pattern;
        const char* text;
        bool matched;
        std::vector<std::string> parts;
    } cases[] = {
        {"*ab*", "xaby", true, {"x", "y"}},
        {"ab*cd*", "abXcdY", true, {"X", "Y"}},
        {"ab*", "ab", true, {""}},
        {"*", "xyz", true, {"xyz"}},
        {"", "xyz", true, {"xyz"}},
        {"*", "", true, {""}},
        {"abc", "abc", true, {}},
        {"abc", "abd", false, {}},
        {"*a", "xayaza", true, {"x", "y", "z"}},
        {"*a", "xay", false, {"x"}},
        {"*a", "xy", false, {}},
        {"*aa", "aaa", false, {""}},
        {"ab*", "xab", false, {"xab"}},
        {"ab*c", "xabc", false, {}},
        {"a*b*", "axc", false, {"xc"}},
        {"a*b*c*", "a1b2d", false, {"1", "2d"}},
        {"a*b*c", "a1d", false, {}},
        {"a*b*c", "a1b2d", false, {"1"}},
        {"a*b*c", "a1b2c", true, {"1", "2"}},
        {"a*b*c", "a1b2c3c", true, {"1", "2", "3"}},
        {"a*b", "ab", true, {""}},
        {"a**b", "axb", true, {"x"}},
    };
    for (const auto& c : cases) {
        WildcardMatcher matcher(c.pattern);
        std::vector<std::string> parts{"left over"};
        EXPECT_EQ(c.matched, matcher.isMatch(c.text, parts)) << c.pattern << " on " << c.text;
        EXPECT_EQ(c.parts, parts) << c.pattern << " on " << c.text;
    }
}

TEST(WildcardMatcherTest, CompilesToSegmentsAndFlags) {
    const struct {
        const char* pattern;
        std::vector<std::string> segments;
        bool hardStart;
        bool hardEnd;
        int isWord;
        WildcardMatcher::MatchType type;
    } cases[] = {
        {"abc", {"abc"}, true, true, 1, WildcardMatcher::SINGLE_WORD_MATCHER},
        {"abc*", {"abc"}, true, false, 0, WildcardMatcher::MULTIFIX_MATCHER},
        {"*abc", {"abc"}, false, true, 0, WildcardMatcher::MULTIFIX_MATCHER},
        {"*abc*", {"abc"}, false, false, 0, WildcardMatcher::MULTIFIX_MATCHER},
        {"a*b*c", {"a", "b", "c"}, true, true, 0, WildcardMatcher::MULTIFIX_MATCHER},
        {"a**b", {"a", "b"}, true, true, 0, WildcardMatcher::MULTIFIX_MATCHER},
        {"**a**", {"a"}, false, false, 0, WildcardMatcher::MULTIFIX_MATCHER},
        {"", {}, false, false, 0, WildcardMatcher::ERROR_MATCHER},
        {"*", {}, false, false, 0, WildcardMatcher::ERROR_MATCHER},
        {"***", {}, false, false, 0, WildcardMatcher::ERROR_MATCHER},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.pattern);
        const WildcardMatcher matcher(c.pattern);
        ASSERT_EQ(static_cast<int>(c.segments.size()), matcher._subStringCount);
        for (std::size_t i = 0; i < c.segments.size(); ++i) {
            EXPECT_EQ(c.segments[i], matcher._subStrings[i]);
        }
        for (std::size_t i = c.segments.size(); i < 256; ++i) {
            EXPECT_EQ(nullptr, matcher._subStrings[i]);
        }
        EXPECT_EQ(c.hardStart, matcher._hardStart);
        EXPECT_EQ(c.hardEnd, matcher._hardEnd);
        EXPECT_EQ(c.isWord, matcher._isWord);
        EXPECT_EQ(c.type, matcher.getMatcherType());
        EXPECT_STREQ(c.pattern, matcher.getOrigPattern());
        EXPECT_EQ(c.hardStart ? matcher._subStrings[0] : nullptr, matcher.getHardStart());
        EXPECT_EQ(c.hardEnd ? matcher._subStrings[c.segments.size() - 1] : nullptr,
                  matcher.getHardEnd());
        EXPECT_EQ(c.isWord != 0 ? matcher._subStrings[0] : nullptr, matcher.getWord());
    }
}

TEST(WildcardMatcherTest, IsCalledThroughBothItsForms) {
    WildcardMatcher matcher("*ar");
    std::vector<std::string> parts;
    EXPECT_FALSE((matcher.*asQuery)("fark"));
    EXPECT_TRUE((matcher.*withCapture)("far", parts));
    EXPECT_THAT(parts, ElementsAre("f"));
}

TEST(WildcardMatcherTest, KeepsItsFieldsInOrder) {
    const WildcardMatcher matcher("");
    EXPECT_TRUE(
        standInOrder({&matcher._needle, &matcher._buffer, &matcher._hardEnd, &matcher._hardStart,
                      &matcher._subStrings, &matcher._subStringCount, &matcher._isWord}));
}

TEST(WildcardMatcherTest, NumbersItsKinds) {
    EXPECT_EQ(-1, WildcardMatcher::ERROR_MATCHER);
    EXPECT_EQ(0, WildcardMatcher::POSTFIX_MATCHER);
    EXPECT_EQ(1, WildcardMatcher::PREFIX_MATCHER);
    EXPECT_EQ(2, WildcardMatcher::MIDFIX_MATCHER);
    EXPECT_EQ(3, WildcardMatcher::MULTIFIX_MATCHER);
    EXPECT_EQ(4, WildcardMatcher::SINGLE_WORD_MATCHER);
}

// The three kinds that need a count of zero beside a hard flag are computed all the same.
TEST(WildcardMatcherTest, ComputesTheKindsThatNoPatternGives) {
    WildcardMatcher matcher("");
    matcher._hardStart = true;
    EXPECT_EQ(WildcardMatcher::PREFIX_MATCHER, matcher.getMatcherType());
    matcher._hardEnd = true;
    EXPECT_EQ(WildcardMatcher::MIDFIX_MATCHER, matcher.getMatcherType());
    matcher._hardStart = false;
    EXPECT_EQ(WildcardMatcher::POSTFIX_MATCHER, matcher.getMatcherType());
    matcher._isWord = 1;
    EXPECT_EQ(WildcardMatcher::SINGLE_WORD_MATCHER, matcher.getMatcherType());
}

TEST(WildcardMatcherTest, KeepsTwoCopiesOfThePattern) {
    char pattern[] = "ab*cd";
    const WildcardMatcher matcher(pattern);
    pattern[0] = 'x';
    EXPECT_STREQ("ab*cd", matcher.getOrigPattern());
    EXPECT_NE(matcher._needle, matcher._buffer);
    EXPECT_EQ(std::string("ab\0cd", 6), std::string(matcher._buffer, 6));
    EXPECT_EQ(matcher._buffer, matcher._subStrings[0]);
    EXPECT_EQ(matcher._buffer + 3, matcher._subStrings[1]);
}

TEST(WildcardMatcherTest, GivesTheLiteralPrefix) {
    EXPECT_STREQ("ab", WildcardMatcher("ab*cd").getPatternPrefix());
    EXPECT_STREQ("abc", WildcardMatcher("abc").getPatternPrefix());
    EXPECT_STREQ("", WildcardMatcher("*ab").getPatternPrefix());
    EXPECT_STREQ("", WildcardMatcher("").getPatternPrefix());
    EXPECT_STREQ("", WildcardMatcher("**").getPatternPrefix());
}

TEST(WildcardMatcherTest, DumpsTheCompiledForm) {
    EXPECT_EQ("hard start = ab\nsubstring 1 = cd\nhard end = ef\n",
              dump(WildcardMatcher("ab*cd*ef")));
    EXPECT_EQ("Single word = abc\n", dump(WildcardMatcher("abc")));
    EXPECT_EQ("", dump(WildcardMatcher("***")));
    EXPECT_EQ("", dump(WildcardMatcher("")));
    EXPECT_EQ("substring 0 = ab\nhard end = cd\n", dump(WildcardMatcher("*ab*cd")));
    EXPECT_EQ("hard start = ab\n", dump(WildcardMatcher("ab*")));
    EXPECT_EQ("substring 0 = ab\nsubstring 1 = c\n", dump(WildcardMatcher("*ab*c*")));
}

TEST(WildcardMatcherTest, CopiesShareNothing) {
    auto original = std::make_unique<WildcardMatcher>("a*b");
    const WildcardMatcher copy(*original);
    EXPECT_NE(original->_needle, copy._needle);
    EXPECT_NE(original->_buffer, copy._buffer);
    original.reset();
    EXPECT_TRUE(copy.isMatch("axb"));
    EXPECT_FALSE(copy.isMatch("axc"));
    EXPECT_STREQ("a*b", copy.getOrigPattern());
}

TEST(WildcardMatcherTest, AMoveLeavesAMatcherWithoutPattern) {
    static_assert(std::is_nothrow_move_constructible_v<WildcardMatcher>);
    WildcardMatcher original("a*b");
    const char* const text = original.getOrigPattern();
    WildcardMatcher taken(std::move(original));
    EXPECT_EQ(text, taken.getOrigPattern());
    EXPECT_TRUE(taken.isMatch("axb"));
    EXPECT_FALSE(taken.isMatch("axc"));
    EXPECT_EQ(nullptr, taken._subStrings[2]);
    EXPECT_EQ(nullptr, original.getOrigPattern());  // NOLINT(bugprone-use-after-move)
    EXPECT_TRUE(original.isMatch("anything"));
    EXPECT_STREQ("", original.getPatternPrefix());
    EXPECT_EQ("", dump(original));
    original = taken;
    EXPECT_TRUE(original.isMatch("axb"));
    EXPECT_FALSE(original.isMatch("axc"));
}

TEST(WildcardMatcherTest, AllocatesItsTwoCopiesAndNothingToMatch) {
    REQUIRE_ALLOCATION_PROBE();
    AllocationProbe allocations;
    {
        const WildcardMatcher matcher("some*thing*else");
        EXPECT_EQ(2U, allocations.count());
        EXPECT_TRUE(matcher.isMatch("something else"));
        EXPECT_FALSE(matcher.isMatch("nothing else"));
        EXPECT_EQ(2U, allocations.count());
    }
    EXPECT_EQ(0, allocations.live());
}

TEST(WildcardMatcherTest, TakesANullPatternForTheEmptyOne) {
    const WildcardMatcher matcher(nullptr);
    EXPECT_TRUE(matcher.isMatch(""));
    EXPECT_TRUE(matcher.isMatch("a"));
    EXPECT_EQ(nullptr, matcher.getOrigPattern());
    EXPECT_EQ(WildcardMatcher::ERROR_MATCHER, matcher.getMatcherType());
    EXPECT_TRUE(WildcardMatcher(matcher).isMatch("a"));
}

TEST(WildcardMatcherDeathTest, AssertsThatThereIsAText) {
    WildcardMatcher matcher("a");
    std::vector<std::string> parts;
    EXPECT_DEATH(static_cast<const WildcardMatcher&>(matcher).isMatch(nullptr),
                 "src/util/WildcardMatcher.cpp:[0-9]+: failed assertion `haystack != nullptr'");
    EXPECT_DEATH(matcher.isMatch(nullptr, parts), "failed assertion `haystack != nullptr'");
}

TEST(WildcardMatcherTest, HoldsUpTo256Segments) {
    const std::string pattern = manySegments(256);
    const WildcardMatcher matcher(pattern.c_str());
    EXPECT_EQ(256, matcher._subStringCount);
    EXPECT_TRUE(matcher.isMatch(std::string(256, 'x').c_str()));
    EXPECT_TRUE(matcher.isMatch(std::string(300, 'x').c_str()));
    EXPECT_FALSE(matcher.isMatch(std::string(255, 'x').c_str()));
    EXPECT_FALSE(matcher.isMatch((std::string(256, 'x') + "y").c_str()));
    const WildcardMatcher open((pattern + "*").c_str());
    EXPECT_TRUE(open.isMatch((std::string(256, 'x') + "y").c_str()));
    EXPECT_FALSE(open.isMatch(std::string(255, 'x').c_str()));
    WildcardMatcher moved{WildcardMatcher(matcher)};
    EXPECT_TRUE(moved.isMatch(std::string(256, 'x').c_str()));
    std::vector<std::string> parts;
    EXPECT_TRUE(moved.isMatch(std::string(256, 'x').c_str(), parts));
    EXPECT_EQ(255u, parts.size());
}

TEST(WildcardMatcherTest, RefusesMoreThan256Segments) {
    EXPECT_THROW(WildcardMatcher(manySegments(257).c_str()), std::length_error);
    EXPECT_THROW(WildcardMatcher(("*" + manySegments(300) + "*").c_str()), std::length_error);
    EXPECT_NO_THROW(WildcardMatcher(("*" + manySegments(256) + "*").c_str()));
    EXPECT_NO_THROW(WildcardMatcher(std::string(5000, '*').c_str()));
    EXPECT_NO_THROW(WildcardMatcher(std::string(5000, 'x').c_str()));
}

// Deliberate: assignment keeps count and flags, and appends after them to an emptied table.
TEST(WildcardMatcherTest, AssignmentAppendsOverAnEmptiedTable) {
    WildcardMatcher matcher("*ab*cd");
    const WildcardMatcher other("x*y");
    EXPECT_EQ(&matcher, &assign(matcher, other));
    EXPECT_STREQ("x*y", matcher.getOrigPattern());
    EXPECT_EQ(4, matcher._subStringCount);
    EXPECT_EQ(nullptr, matcher._subStrings[0]);
    EXPECT_EQ(nullptr, matcher._subStrings[1]);
    EXPECT_STREQ("x", matcher._subStrings[2]);
    EXPECT_STREQ("y", matcher._subStrings[3]);
    EXPECT_EQ(nullptr, matcher._subStrings[4]);
    EXPECT_TRUE(matcher._hardStart);
    EXPECT_TRUE(matcher._hardEnd);
    EXPECT_EQ(0, matcher._isWord);
    EXPECT_EQ(WildcardMatcher::MULTIFIX_MATCHER, matcher.getMatcherType());
    EXPECT_STREQ("", matcher.getPatternPrefix());
    EXPECT_EQ(nullptr, matcher.getHardStart());
    EXPECT_STREQ("y", matcher.getHardEnd());
    EXPECT_EQ("hard start = (null)\nsubstring 1 = (null)\nsubstring 2 = x\nhard end = y\n",
              dump(matcher));
    EXPECT_STREQ("x*y", other.getOrigPattern());
    const WildcardMatcher copy(matcher);
    EXPECT_TRUE(copy.isMatch("x1y")) << "a copy is compiled afresh";
    EXPECT_EQ(2, copy._subStringCount);
    EXPECT_EQ(WildcardMatcher::MULTIFIX_MATCHER, copy.getMatcherType());
    EXPECT_STREQ("x", copy.getPatternPrefix());
}

TEST(WildcardMatcherTest, AnObjectThatHadSegmentsMatchesNothingAfterAssignment) {
    const char* const patterns[] = {"abc", "abc*", "*abc", "*abc*", "a*b", "a*b*c", "", "*", "x"};
    const char* const texts[] = {"", "abc", "ab", "axb", "xabcx", "x", "a1b2c"};
    for (const char* const before : patterns) {
        for (const char* const after : patterns) {
            WildcardMatcher target(before);
            const int kept = target._subStringCount;
            assign(target, WildcardMatcher(after));
            WildcardMatcher fresh(after);
            for (const char* const text : texts) {
                const bool expected = kept == 0 && matches(after, text);
                std::vector<std::string> parts;
                EXPECT_EQ(expected, target.isMatch(text, parts))
                    << before << " = " << after << " on " << text;
                EXPECT_EQ(expected, static_cast<const WildcardMatcher&>(target).isMatch(text))
                    << before << " = " << after << " on " << text;
            }
            EXPECT_EQ(kept + fresh._subStringCount, target._subStringCount);
        }
    }
}

TEST(WildcardMatcherTest, AWordThatWasAssignedToStaysAWord) {
    WildcardMatcher matcher("abc");
    assign(matcher, WildcardMatcher("x*"));
    EXPECT_EQ(1, matcher._isWord);
    EXPECT_EQ(WildcardMatcher::SINGLE_WORD_MATCHER, matcher.getMatcherType());
    EXPECT_EQ(nullptr, matcher.getWord());
    EXPECT_EQ("Single word = (null)\n", dump(matcher));
    EXPECT_FALSE(matcher.isMatch("abc"));
    std::vector<std::string> parts{"left over"};
    EXPECT_FALSE(matcher.isMatch("x", parts));
    EXPECT_THAT(parts, IsEmpty());
}

TEST(WildcardMatcherTest, CaptureOnAnObjectThatWasAssignedToFollowsTheSameRules) {
    WildcardMatcher open("a*");
    assign(open, WildcardMatcher("*b*"));
    std::vector<std::string> parts;
    EXPECT_FALSE(open.isMatch("abc", parts));
    EXPECT_THAT(parts, ElementsAre("abc"));
    WildcardMatcher middle("*a*");
    assign(middle, WildcardMatcher("*b"));
    EXPECT_FALSE(middle.isMatch("ab", parts));
    EXPECT_THAT(parts, IsEmpty());
}

TEST(WildcardMatcherTest, AssignmentToItselfDoesNothing) {
    WildcardMatcher matcher("a*b");
    const char* const needle = matcher._needle;
    const WildcardMatcher& same = matcher;
    EXPECT_EQ(&matcher, &(matcher = same));
    EXPECT_EQ(needle, matcher._needle);
    EXPECT_EQ(2, matcher._subStringCount);
    EXPECT_TRUE(matcher.isMatch("axb"));
}

TEST(WildcardMatcherTest, AssignmentLeavesTheEarlierCopiesAllocated) {
    WildcardMatcher matcher("a*b");
    const char* const needle = matcher._needle;
    const char* const buffer = matcher._buffer;
    assign(matcher, WildcardMatcher("c"));
    EXPECT_STREQ("a*b", needle);
    EXPECT_STREQ("a", buffer);
}

TEST(WildcardMatcherTest, AnAssignmentThatWouldOverflowChangesNothing) {
    WildcardMatcher matcher(manySegments(200).c_str());
    const std::string text(200, 'x');
    EXPECT_THROW(assign(matcher, WildcardMatcher(manySegments(57).c_str())), std::length_error);
    EXPECT_EQ(manySegments(200), matcher.getOrigPattern());
    EXPECT_EQ(200, matcher._subStringCount);
    EXPECT_TRUE(matcher.isMatch(text.c_str()));
    assign(matcher, WildcardMatcher(manySegments(56).c_str()));
    EXPECT_EQ(256, matcher._subStringCount);
    EXPECT_STREQ("x", matcher._subStrings[255]);
    EXPECT_FALSE(matcher.isMatch(text.c_str()));
    EXPECT_THROW(assign(matcher, WildcardMatcher("x")), std::length_error);
    EXPECT_NO_THROW(assign(matcher, WildcardMatcher("***")));
    EXPECT_STREQ("***", matcher.getOrigPattern());
    EXPECT_FALSE(matcher.isMatch(text.c_str()));
}

}  // namespace
