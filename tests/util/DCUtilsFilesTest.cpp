#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "support/TempDir.h"
#include "util/DCUtils.h"
#include "util/Pathname.h"

namespace {

using namespace std::string_literals;

using OpenFile = std::unique_ptr<FILE, int (*)(FILE*)>;

OpenFile opened(const std::string& path, const char* mode = "r") {
    return OpenFile(std::fopen(path.c_str(), mode), std::fclose);
}

// Reads lines into a buffer of `bufSize` bytes until there is none.
std::vector<std::string> linesOf(const std::string& contents, int bufSize) {
    const TempDir dir;
    writeFile(dir.file("text"), contents);
    const OpenFile file = opened(dir.file("text"));
    std::vector<std::string> lines;
    std::vector<char> buf(static_cast<std::size_t>(bufSize), 'x');
    while (readLine(file.get(), buf.data(), bufSize)) {
        lines.emplace_back(buf.data());
    }
    return lines;
}

using Lines = std::vector<std::string>;

TEST(DCUtilsFilesTest, ReadsLinesAndDiscardsTheRestOfLongOnes) {
    const struct {
        const char* contents;
        int bufSize;
        Lines expected;
    } rows[] = {
        {"", 10, {}},
        {"a\n\nbc\n", 10, {"a\n", "\n", "bc\n"}},
        {"a\nb", 10, {"a\n", "b"}},
        // A buffer of 6 bytes takes 4: "abc\n" and "abcd" fit, a newline after the latter does not.
        {"abc\nx\n", 6, {"abc\n", "x\n"}},
        {"abcd\nx\n", 6, {"abcd", "x\n"}},
        {"abcdefghijklmnop\nx\n", 6, {"abcd", "x\n"}},
        {"abcdefghijklmnop", 6, {"abcd"}},
        {"abcd", 6, {"abcd"}},
        {"abc\n\nb", 3, {"a", "\n", "b"}},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(row.expected, linesOf(row.contents, row.bufSize)) << row.contents;
    }
}

TEST(DCUtilsFilesTest, ClearsTheWholeBufferFirst) {
    const TempDir dir;
    writeFile(dir.file("text"), "ab\n");
    const OpenFile file = opened(dir.file("text"));
    char buf[8];
    std::memset(buf, 'x', sizeof buf);
    EXPECT_TRUE(readLine(file.get(), buf, sizeof buf));
    EXPECT_EQ("ab\n\0\0\0\0\0"s, std::string(buf, sizeof buf));
    EXPECT_FALSE(readLine(file.get(), buf, sizeof buf));
    EXPECT_EQ(std::string(sizeof buf, '\0'), std::string(buf, sizeof buf));
}

TEST(DCUtilsFilesTest, ReadsNothingIntoATinyBuffer) {
    const TempDir dir;
    writeFile(dir.file("text"), "abc\n");
    const OpenFile file = opened(dir.file("text"));
    for (const int bufSize : {2, 1, 0, -1}) {
        char buf[] = "xyz";
        EXPECT_FALSE(readLine(file.get(), buf, bufSize)) << bufSize;
        EXPECT_EQ(bufSize < 1 ? 'x' : '\0', buf[0]) << bufSize;
        EXPECT_EQ(bufSize < 2 ? 'y' : '\0', buf[1]) << bufSize;
        EXPECT_EQ('z', buf[2]) << bufSize;
    }
    EXPECT_EQ('a', std::getc(file.get()));
}

TEST(DCUtilsFilesTest, AReadErrorIsReportedLikeTheEnd) {
    const TempDir dir;
    const OpenFile file = opened(dir.file("text"), "w");
    char buf[8];
    EXPECT_FALSE(readLine(file.get(), buf, sizeof buf));
}

TEST(DCUtilsFilesTest, WritesTexts) {
    const TempDir dir;
    const Pathname path(dir.file("out"));
    const struct {
        const char *text, *expected;
    } rows[] = {{"one\ntwo", "one\ntwo"}, {"", ""}, {"x", "x"}, {nullptr, ""}};
    for (const auto& row : rows) {
        writeFile(path, "what was there before");
        EXPECT_TRUE(writeText(path, row.text));
        EXPECT_EQ(row.expected, readFile(path));
    }
}

TEST(DCUtilsFilesTest, AFileThatCannotBeOpenedIsNeitherWrittenNorRead) {
    const TempDir dir;
    EXPECT_FALSE(writeText(Pathname(dir.file("missing/out")), "x"));
    EXPECT_FALSE(writeText(Pathname(dir.path()), "x"));
    EXPECT_EQ(nullptr, readText(Pathname(dir.file("missing"))));
}

TEST(DCUtilsFilesTest, WritingIsNotChecked) {
    if (::access("/dev/full", W_OK) != 0) {
        GTEST_SKIP() << "no /dev/full";
    }
    EXPECT_TRUE(writeText(Pathname("/dev/full"), "x"));
}

// Reads a file and compares it, with the NUL that must follow.
void expectText(const std::string& expected, const Pathname& path) {
    const std::unique_ptr<char[]> text(readText(path));
    ASSERT_NE(nullptr, text) << path;
    EXPECT_EQ(expected + '\0', std::string(text.get(), expected.size() + 1)) << path;
}

TEST(DCUtilsFilesTest, ReadsWholeFiles) {
    const TempDir dir;
    const Pathname path(dir.file("text"));
    for (const std::string& contents :
         {""s, "x"s, "one\ntwo\n"s, "a\0b"s, "\xff\xfe"s, std::string(100000, 'y')}) {
        writeFile(path, contents);
        expectText(contents, path);
    }
}

TEST(DCUtilsFilesTest, ReadsADirectoryAsAnEmptyText) {
    const TempDir dir;  // it opens and has a size, but no bytes can be read
    expectText("", Pathname(dir.path()));
}

TEST(DCUtilsFilesTest, ReadsAFileThatIsLongerThanItsSize) {
    // A FIFO and a file in /proc have the size 0.
    const TempDir dir;
    const Pathname fifo(dir.file("fifo"));
    ASSERT_EQ(0, ::mkfifo(fifo.c_str(), 0600));
    for (const std::size_t size : {0u, 1u, 2u, 3u, 4u, 7u, 8u, 70000u}) {
        const std::string contents(size, 'z');
        std::thread writer([&] { writeFile(fifo, contents); });
        expectText(contents, fifo);
        writer.join();
    }
    const std::unique_ptr<char[]> status(readText(Pathname("/proc/self/status")));
    ASSERT_NE(nullptr, status);
    EXPECT_TRUE(startsWith(status.get(), "Name:"));
}

}  // namespace
