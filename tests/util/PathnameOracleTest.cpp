#include "util/Pathname.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/AllStrings.h"
#include "support/PathOracles.h"

namespace {

const std::string ALPHABET = "/.a";
constexpr std::size_t MAX_LENGTH = 7;
constexpr std::size_t PATH_COUNT = 3280;  // (3^8 - 1) / 2

// What a changing operation leaves of a path.
std::string after(void (Pathname::*operation)(), const std::string& text) {
    Pathname path(text);
    (path.*operation)();
    return path;
}

TEST(PathnameOracleTest, EditsEveryShortPathAsTheSlowVersions) {
    const std::size_t compared = forEachString(ALPHABET, MAX_LENGTH, [](const std::string& text) {
        const Pathname path(text);
        ASSERT_EQ(path_oracle::removeDotDotSlash(text), after(&Pathname::removeDotDotSlash, text))
            << text;
        ASSERT_EQ(path_oracle::removeDoubleSeps(text), after(&Pathname::removeDoubleSeps, text))
            << text;
        ASSERT_EQ(path_oracle::removeDoubleSeps(text), Pathname::removeDoubleSeps(path)) << text;
        ASSERT_EQ(path_oracle::stripElement(text), after(&Pathname::stripElement, text)) << text;
        ASSERT_EQ(path_oracle::stripElement(text), path.toParent()) << text;
        ASSERT_EQ(path_oracle::withoutTrailingSeps(text),
                  after(&Pathname::removeTrailingSeps, text))
            << text;
        ASSERT_EQ(path_oracle::toLeaf(text), path.toLeaf()) << text;
        ASSERT_EQ(path_oracle::ext(text), path.ext()) << text;
        ASSERT_EQ(path_oracle::basenameWithoutExt(text), path.basenameWithoutExt()) << text;
    });
    EXPECT_EQ(PATH_COUNT, compared);
}

TEST(PathnameOracleTest, JoinsEveryPairOfShortPathsAsTheSlowVersion) {
    std::vector<std::string> texts;
    forEachString(ALPHABET, MAX_LENGTH, [&](const std::string& text) { texts.push_back(text); });
    ASSERT_EQ(PATH_COUNT, texts.size());
    for (const std::string& text : texts) {
        const Pathname path(text);
        for (const std::string& elem : texts) {
            if (path / elem != path_oracle::join(text, elem)) {
                FAIL() << '"' << text << "\" / \"" << elem << "\" gives \"" << path / elem << '"';
            }
        }
        Pathname self(text);
        const Pathname& itself = self;
        self /= itself;
        ASSERT_EQ(path_oracle::join(text, text), self);
    }
}

// What the operations are for, on each path.
TEST(PathnameOracleTest, EditedPathsKeepTheirPromises) {
    forEachString(ALPHABET, MAX_LENGTH, [](const std::string& text) {
        const std::string confined = '/' + after(&Pathname::removeDotDotSlash, text) + '/';
        ASSERT_EQ(std::string::npos, confined.find("/../")) << text;
        ASSERT_EQ(std::string::npos, after(&Pathname::removeDoubleSeps, text).find("//")) << text;
        const Pathname leaf = Pathname(text).toLeaf();
        ASSERT_FALSE(leaf.empty()) << text;
        ASSERT_TRUE(leaf == "/" || !leaf.containsSep()) << text;
    });
}

}  // namespace
