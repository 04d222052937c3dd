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

class DCUtilsFilesTest : public testing::Test {
protected:
    // Opens a file with these contents.
    OpenFile opened(const std::string& contents, const char* mode = "r") const {
        writeFile(_path, contents);
        return OpenFile(std::fopen(_path.c_str(), mode), std::fclose);
    }

    const TempDir _dir;
    const Pathname _path{_dir.file("text")};
};

// Reads lines into a buffer of `bufSize` bytes until there is no more.
std::vector<std::string> linesOf(const OpenFile& file, int bufSize) {
    std::vector<std::string> lines;
    std::vector<char> buf(static_cast<std::size_t>(bufSize), 'x');
    while (readLine(file.get(), buf.data(), bufSize)) {
        lines.emplace_back(buf.data());
    }
    return lines;
}

using Lines = std::vector<std::string>;

TEST_F(DCUtilsFilesTest, ReadsLinesAndDiscardsTheRestOfLongOnes) {
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
        EXPECT_EQ(row.expected, linesOf(opened(row.contents), row.bufSize)) << row.contents;
    }
}

TEST_F(DCUtilsFilesTest, ClearsTheWholeBufferFirst) {
    const OpenFile file = opened("ab\n");
    char buf[8];
    std::memset(buf, 'x', sizeof buf);
    EXPECT_TRUE(readLine(file.get(), buf, sizeof buf));
    EXPECT_EQ("ab\n\0\0\0\0\0"s, std::string(buf, sizeof buf));
    EXPECT_FALSE(readLine(file.get(), buf, sizeof buf));
    EXPECT_EQ(std::string(sizeof buf, '\0'), std::string(buf, sizeof buf));
}

TEST_F(DCUtilsFilesTest, ReadsNothingIntoATinyBuffer) {
    const OpenFile file = opened("abc\n");
    for (const int bufSize : {2, 1, 0, -1}) {
        char buf[] = "xyz";
        EXPECT_FALSE(readLine(file.get(), buf, bufSize)) << bufSize;
        EXPECT_EQ(bufSize < 1 ? 'x' : '\0', buf[0]) << bufSize;
        EXPECT_EQ(bufSize < 2 ? 'y' : '\0', buf[1]) << bufSize;
        EXPECT_EQ('z', buf[2]) << bufSize;
    }
    EXPECT_EQ('a', std::getc(file.get()));
}

TEST_F(DCUtilsFilesTest, AReadErrorIsReportedLikeTheEnd) {
    const OpenFile file = opened("", "w");
    char buf[8];
    EXPECT_FALSE(readLine(file.get(), buf, sizeof buf));
}

TEST_F(DCUtilsFilesTest, WritesTexts) {
    const struct {
        const char *text, *expected;
    } rows[] = {{"one\ntwo", "one\ntwo"}, {"", ""}, {"x", "x"}, {nullptr, ""}};
    for (const auto& row : rows) {
        writeFile(_path, "what was there before");
        EXPECT_TRUE(writeText(_path, row.text));
        EXPECT_EQ(row.expected, readFile(_path));
    }
}

TEST_F(DCUtilsFilesTest, AFileThatCannotBeOpenedIsNeitherWrittenNorRead) {
    EXPECT_FALSE(writeText(Pathname(_dir.file("missing/out")), "x"));
    EXPECT_FALSE(writeText(Pathname(_dir.path()), "x"));
    EXPECT_EQ(nullptr, readText(Pathname(_dir.file("missing"))));
}

TEST_F(DCUtilsFilesTest, WritingIsNotChecked) {
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

TEST_F(DCUtilsFilesTest, ReadsWholeFiles) {
    for (const std::string& contents :
         {""s, "x"s, "one\ntwo\n"s, "a\0b"s, "\xff\xfe"s, std::string(100000, 'y')}) {
        writeFile(_path, contents);
        expectText(contents, _path);
    }
}

TEST_F(DCUtilsFilesTest, ReadsADirectoryAsAnEmptyText) {
    // It opens and has a size, but no bytes can be read.
    expectText("", Pathname(_dir.path()));
}

TEST_F(DCUtilsFilesTest, ReadsAFileThatIsLongerThanItsSize) {
    // A FIFO and a file in /proc have the size 0.
    const Pathname fifo(_dir.file("fifo"));
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
