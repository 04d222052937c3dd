#include "util/Pathname.h"

#include <gtest/gtest.h>
#include <sys/wait.h>

#include <cstdio>
#include <random>
#include <string>
#include <vector>

#include "support/AllStrings.h"
#include "support/Examples.h"
#include "support/PathOracles.h"
#include "support/TempDir.h"

namespace {

TEST(PathnameShellTest, QuotesAsLittleAsItsClassesAllow) {
    const auto quoted = [](const Pathname& path) { return path.shellQuoted(); };
    expectEach(quoted, {" > \"\"", "plain > plain", "/b-c_d.e,f:g@h%i+j^k > /b-c_d.e,f:g@h%i+j^k"});
    // A blank alone, or with anything except '"', '$', '\\': double quotes.
    expectEach(quoted, {"a b > \"a b\"", "a\nb > \"a\nb\"", "it's here > \"it's here\""});
    // '"', '$', '\\' without a single quote: single quotes, and nothing escaped.
    expectEach(quoted, {"a$b > 'a$b'", "$x y > '$x y'"});
    // Specials and single quotes without a blank: backslashes.
    expectEach(quoted, {"a;b > a\\;b", "#&*;=?[]| > \\#\\&\\*\\;\\=\\?\\[\\]\\|", "' > \\'",
                        "it's > it\\'s"});
    // All of them: double quotes, and backslashes where they still matter.
    expectEach(quoted, {"it's $x > \"it's \\$x\""});
}

TEST(PathnameShellTest, LeavesOtherShellCharactersBare) {
    for (const char* path : {"(", ")", "<", ">", "`", "~", "!", "{", "}", "`a`(b)<c>~d!{e}\r\v"}) {
        EXPECT_EQ(path, Pathname(path).shellQuoted());
    }
}

TEST(PathnameShellTest, SplitsOneWordOffALine) {
    const struct {
        const char *line, *word, *rest;
    } rows[] = {
        {"  'a b'  c", "a b", "  c"},
        {"a b c", "a", " b c"},
        {"\t\n a\tb", "a", "\tb"},
        {"a\nb", "a", "\nb"},
        {"\"a b\" c", "a b", " c"},
        {"a'b c'd\"e f\"g h", "ab cde fg", " h"},
        {"a\\ b c", "a b", " c"},
        {"\\\n x", "\n", " x"},
        // Within double quotes a backslash escapes any character, not only the shell's few.
        {"\"\\a\\$\\\"\\n\"", "a$\"n", ""},
        {"$x;y&z", "$x;y&z", ""},
        {"\va", "\va", ""},
        {"a \"b", "a", " \"b"},
    };
    for (const auto& row : rows) {
        Pathname word("before");
        std::string rest = "before";
        EXPECT_TRUE(Pathname::splitArgShellQuoted(row.line, word, rest)) << row.line;
        EXPECT_EQ(row.word, word) << row.line;
        EXPECT_EQ(row.rest, rest) << row.line;
    }
}

TEST(PathnameShellTest, FindsNoWordInAnEmptyOrUnfinishedLine) {
    for (const char* line : {"", " ", "\t\n ", "''", "\"\"", "  ''  a", "\"\" a", "\"a", "'a",
                             "a'b c", "\"a\\\"", "\\", "a\\", "\"a\\"}) {
        Pathname word("before");
        std::string rest = "before";
        EXPECT_FALSE(Pathname::splitArgShellQuoted(line, word, rest)) << line;
        EXPECT_EQ("before", rest) << line;
    }
}

TEST(PathnameShellTest, TakesALineApartWordByWordInPlace) {
    std::string line = " one 'two 2' \"thr\\\"ee\" fo\\ ur ";
    std::vector<std::string> words;
    Pathname word;
    while (Pathname::splitArgShellQuoted(line, word, line)) {
        words.push_back(word);
    }
    EXPECT_EQ((std::vector<std::string>{"one", "two 2", "thr\"ee", "fo ur"}), words);
    EXPECT_EQ(" ", line);
}

TEST(PathnameShellTest, TheWordMayReplaceItsOwnLine) {
    Pathname line("'a b' c");
    std::string rest;
    EXPECT_TRUE(Pathname::splitArgShellQuoted(line, line, rest));
    EXPECT_EQ("a b", line);
    EXPECT_EQ(" c", rest);
}

TEST(PathnameShellTest, SplitsEveryShortLineAsTheSlowVersion) {
    const std::size_t compared = forEachString("a \\\"'", 7, [](const std::string& line) {
        Pathname word("before");
        std::string rest = "before", slowWord, slowRest = "before";
        const bool found = Pathname::splitArgShellQuoted(line, word, rest);
        ASSERT_EQ(path_oracle::splitArg(line, slowWord, slowRest), found) << line;
        ASSERT_EQ(slowWord, word) << line;
        ASSERT_EQ(slowRest, rest) << line;
    });
    EXPECT_EQ(97656u, compared);
}

// Quotes as the slow version, and gets the path back from the quoted word with another after it. An
// empty path is not a word.
void expectRoundTrip(const std::string& text) {
    const Pathname path(text);
    Pathname word;
    std::string rest = "before";
    ASSERT_EQ(path_oracle::shellQuoted(text), path.shellQuoted());
    const bool found = Pathname::splitArgShellQuoted(path.shellQuoted() + " next", word, rest);
    ASSERT_EQ(!text.empty(), found) << text;
    ASSERT_EQ(text, word);
    ASSERT_EQ(text.empty() ? "before" : " next", rest) << text;
}

TEST(PathnameShellTest, QuotedPathsComeBackFromTheSplit) {
    for (int c = 0; c <= 255; ++c) {
        expectRoundTrip(std::string(1, static_cast<char>(c)));
    }
    // A letter, and two of each class.
    EXPECT_EQ(299593u, forEachString("a \n\"$\\;'", 6, expectRoundTrip));

    constexpr unsigned SEED = 20240608;
    SCOPED_TRACE(SEED);
    std::mt19937 random(SEED);
    for (int i = 0; i < 20000; ++i) {
        std::string text(random() % 40, '\0');
        for (char& c : text) {
            c = static_cast<char>(random());
        }
        expectRoundTrip(text);
    }
}

// What the shell makes of words: each followed by a NUL.
std::string throughShell(const std::string& words) {
    const TempDir dir;
    writeFile(dir.file("words.sh"), "printf '%s\\0' " + words + '\n');
    std::FILE* const shell = ::popen(("/bin/sh " + dir.file("words.sh")).c_str(), "r");
    if (shell == nullptr) {
        return "no shell";
    }
    std::string output;
    for (int c = std::getc(shell); c != EOF; c = std::getc(shell)) {
        output += static_cast<char>(c);
    }
    EXPECT_EQ(0, ::pclose(shell));
    return output;
}

TEST(PathnameShellTest, TheShellReadsQuotedPathsAsTheyAre) {
    std::string words, expected;
    const auto add = [&](const std::string& text) {
        words += Pathname(text).shellQuoted() + ' ';
        expected += text + '\0';
    };
    EXPECT_EQ(8421u, forEachString("a/.- \t\n\"$\\#&*;=?[]|'", 3, add));
    EXPECT_EQ(expected, throughShell(words));
}

}  // namespace
