// Reading lines and skipping comments, below the configuration reader.

#include <gtest/gtest.h>

#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include "util/internal/LogConfig.h"

namespace {
std::vector<int> pieceSizes;  // of the calls of fgets
}

extern "C" {
char* __real_fgets(char* buf, int size, std::FILE* file);
char* __wrap_fgets(char* buf, int size, std::FILE* file) {
    pieceSizes.push_back(size);
    return __real_fgets(buf, size, file);
}
}

namespace {

using File = std::unique_ptr<std::FILE, int (*)(std::FILE*)>;
using Lines = std::vector<std::string>;

File fileWith(const std::string& contents) {
    File file(std::tmpfile(), &std::fclose);
    EXPECT_EQ(contents.size(), std::fwrite(contents.data(), 1, contents.size(), file.get()));
    std::rewind(file.get());
    return file;
}

Lines linesOf(const std::string& contents) {
    const File file = fileWith(contents);
    Lines lines;
    std::string line = "left over";
    while (read_line(line, file.get())) {
        lines.push_back(line);
    }
    EXPECT_EQ("", line);
    return lines;
}

// The rule on the whole text: each newline ends a line; the text after the last newline is a line
// if it is not empty.
Lines splitAtNewlines(const std::string& contents) {
    Lines lines;
    std::size_t begin = 0;
    for (std::size_t end = 0; (end = contents.find('\n', begin)) != std::string::npos;
         begin = end + 1) {
        lines.push_back(contents.substr(begin, end - begin));
    }
    if (begin < contents.size()) {
        lines.push_back(contents.substr(begin));
    }
    return lines;
}

struct Skipped {
    bool closed;
    std::string result;
    unsigned lineno;
    std::string nextLine;
};

Skipped skip(const char* afterOpening, const std::string& contents) {
    const File file = fileWith(contents);
    Skipped skipped = {false, "before ", 7, ""};
    skipped.closed = handle_xml_comment(skipped.result, afterOpening, skipped.lineno, file.get());
    read_line(skipped.nextLine, file.get());
    return skipped;
}

}  // namespace

TEST(ReadLineTest, SplitsEveryShortTextAtItsNewlines) {
    const char alphabet[] = {'a', '\0', '\n', '\r'};
    for (unsigned length = 0; length <= 6; ++length) {
        for (unsigned code = 0; code < 1U << (2 * length); ++code) {
            std::string text;
            for (unsigned i = 0; i < length; ++i) {
                text += alphabet[code >> (2 * i) & 3U];
            }
            ASSERT_EQ(splitAtNewlines(text), linesOf(text)) << length << ' ' << code;
        }
    }
}

TEST(ReadLineTest, JoinsThePiecesOfLongLines) {
    for (const std::size_t middle : {127U, 254U, 381U, 1270U, 10000U}) {
        for (std::size_t length = middle - 3; length <= middle + 3; ++length) {
            const std::string line(length, 'x');
            const std::string zeros(length, '\0');
            EXPECT_EQ((Lines{line}), linesOf(line)) << length;
            EXPECT_EQ((Lines{line}), linesOf(line + "\n")) << length;
            EXPECT_EQ((Lines{line, "", "y"}), linesOf(line + "\n\ny")) << length;
            EXPECT_EQ((Lines{zeros}), linesOf(zeros)) << length;
            EXPECT_EQ((Lines{zeros, "y"}), linesOf(zeros + "\ny\n")) << length;
        }
    }
}

TEST(ReadLineTest, ReadsPiecesOf127Characters) {
    const File file = fileWith(std::string(300, 'x') + "\n");
    pieceSizes.clear();
    std::string line;
    EXPECT_TRUE(read_line(line, file.get()));
    EXPECT_EQ((std::vector<int>{128, 128, 128}), pieceSizes);  // each with room for a NUL
}

TEST(ReadLineTest, KeepsEveryByteExceptTheNewline) {
    std::string line;
    for (int byte = 0; byte < 256; ++byte) {
        if (byte != '\n') {
            line += static_cast<char>(byte);
        }
    }
    EXPECT_EQ((Lines{line, line}), linesOf(line + "\n" + line));
}

TEST(ReadLineTest, AfterTheEndThereAreNoMoreLines) {
    const File file = fileWith("only");
    std::string line;
    EXPECT_TRUE(read_line(line, file.get()));
    EXPECT_FALSE(read_line(line, file.get()));
    EXPECT_FALSE(read_line(line, file.get()));
}

TEST(HandleXmlCommentTest, AppendsWhatFollowsTheEnd) {
    const struct {
        const char* afterOpening;
        const char* contents;
        const char* result;
        unsigned lineno;
        const char* nextLine;
    } table[] = {
        {"-->", "next\n", "before ", 7, "next"},
        {" note -->after", "next\n", "before after", 7, "next"},
        {" note -->a --> b", "next\n", "before a --> b", 7, "next"},
        {" note <!-- -->after", "next\n", "before after", 7, "next"},
        {"--->after", "next\n", "before after", 7, "next"},
        {"", "-->after\nnext\n", "before after", 8, "next"},
        {" one", "two\n\nthree --> after\nnext\n", "before  after", 10, "next"},
        {" one --", "> not yet\n# hidden? -->after # kept\nnext", "before after # kept", 9, "next"},
        {" -- >", "-- >\n->\n-->", "before ", 10, ""},
    };
    for (const auto& row : table) {
        const Skipped skipped = skip(row.afterOpening, row.contents);
        EXPECT_TRUE(skipped.closed) << row.afterOpening;
        EXPECT_EQ(row.result, skipped.result) << row.afterOpening;
        EXPECT_EQ(row.lineno, skipped.lineno) << row.afterOpening;
        EXPECT_EQ(row.nextLine, skipped.nextLine) << row.afterOpening;
    }
}

TEST(HandleXmlCommentTest, FailsAtTheEndOfTheFileWithTheResultAsItWas) {
    for (const char* const contents : {"", "one\ntwo\n", "->", "--\n>"}) {
        const Skipped skipped = skip(" open", contents);
        EXPECT_FALSE(skipped.closed) << contents;
        EXPECT_EQ("before ", skipped.result) << contents;
        EXPECT_EQ(7 + linesOf(contents).size(), skipped.lineno) << contents;
    }
}

TEST(HandleXmlCommentTest, NulBytesDoNotHideTheEnd) {
    using namespace std::string_literals;
    const Skipped skipped = skip("", "a\0b\0-->x\0y\nnext\n"s);
    EXPECT_TRUE(skipped.closed);
    EXPECT_EQ("before x\0y"s, skipped.result);
    EXPECT_EQ(8U, skipped.lineno);
}
