#include <random>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "support/AllStrings.h"
#include "support/MatcherOracle.h"
#include "util/WildcardMatcher.h"

namespace {

std::vector<std::string> allStrings(const std::string& alphabet, std::size_t longest) {
    std::vector<std::string> strings;
    forEachString(alphabet, longest, [&](const std::string& text) { strings.push_back(text); });
    return strings;
}

std::string randomWord(std::mt19937& draw, const std::string& alphabet, std::size_t longest) {
    std::string word(draw() % (longest + 1), ' ');
    for (char& c : word) {
        c = alphabet[draw() % alphabet.size()];
    }
    return word;
}

testing::AssertionResult agrees(WildcardMatcher& matcher, const std::string& text) {
    const std::string pattern = matcher.getOrigPattern();
    const oracle::Match expected = oracle::match(pattern, text);
    std::vector<std::string> parts{"stale"};
    const bool captured = matcher.isMatch(text.c_str(), parts);
    const bool matched = static_cast<const WildcardMatcher&>(matcher).isMatch(text.c_str());
    if (matched == expected.matched && captured == expected.matched && parts == expected.parts) {
        return testing::AssertionSuccess();
    }
    return testing::AssertionFailure()
           << "pattern \"" << pattern << "\", text \"" << text << "\": expected "
           << expected.matched << " with parts " << testing::PrintToString(expected.parts)
           << ", isMatch " << matched << ", with capture " << captured << " and parts "
           << testing::PrintToString(parts);
}

TEST(WildcardMatcherOracleTest, AgreesOnAllShortPatternsAndTexts) {
    const std::vector<std::string> texts = allStrings("ab", 6);
    ASSERT_EQ(127u, texts.size());
    const std::vector<std::string> patterns = allStrings("ab*", 6);
    ASSERT_EQ(1093u, patterns.size());
    for (const std::string& pattern : patterns) {
        WildcardMatcher matcher(pattern.c_str());
        for (const std::string& text : texts) {
            ASSERT_TRUE(agrees(matcher, text));
        }
    }
}

// The pattern is cut from the text now and then, so that long ones match too.
void compareRandomly(unsigned seed, const std::string& letters, std::size_t longestText) {
    SCOPED_TRACE("seed " + std::to_string(seed));
    std::mt19937 draw(seed);
    int matches = 0;
    for (int round = 0; round < 20000; ++round) {
        const std::string text = randomWord(draw, letters, longestText);
        std::string pattern = randomWord(draw, letters + "**", longestText / 2);
        if (draw() % 4 != 0) {
            pattern = text;
            for (std::size_t cuts = draw() % 6; cuts > 0 && !pattern.empty(); --cuts) {
                const std::size_t at = draw() % pattern.size();
                pattern.replace(at, draw() % 8, draw() % 8 == 0 ? "**" : "*");
            }
        }
        WildcardMatcher matcher(pattern.c_str());
        ASSERT_TRUE(agrees(matcher, text));
        matches += oracle::match(pattern, text).matched;
    }
    EXPECT_GT(matches, 1000);
    EXPECT_LT(matches, 19000);
}

TEST(WildcardMatcherOracleTest, AgreesOnRandomTextsOfTwoLetters) {
    compareRandomly(1, "ab", 40);
}

TEST(WildcardMatcherOracleTest, AgreesOnRandomTextsOfFourLetters) {
    compareRandomly(2, "abcd", 120);
}

TEST(WildcardMatcherOracleTest, AgreesOnRandomTextsOfManyLetters) {
    compareRandomly(3, "abcdefghijklmnopqrstuvwxyz .:/", 200);
}

TEST(WildcardMatcherOracleTest, AgreesOnRandomTextsOfBytesBeyond127) {
    compareRandomly(4,
                    "\x80\xff\xe4"
                    "a",
                    60);
}

TEST(WildcardMatcherOracleTest, AgreesOnLongRunsOfOneLetter) {
    for (std::size_t run = 0; run < 70; ++run) {
        const std::string text(run, 'a');
        for (std::size_t end = 1; end < 40; ++end) {
            WildcardMatcher back(("*" + std::string(end, 'a')).c_str());
            ASSERT_TRUE(agrees(back, text));
            ASSERT_TRUE(agrees(back, text + "b"));
            WildcardMatcher both(("a*" + std::string(end, 'a')).c_str());
            ASSERT_TRUE(agrees(both, text));
        }
    }
}

}  // namespace
