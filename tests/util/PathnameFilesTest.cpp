#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstdio>
#include <string>

#include "support/TempDir.h"
#include "util/Pathname.h"

namespace {

class PathnameFilesTest : public testing::Test {
protected:
    const TempDir _dir;
    const Pathname _a{_dir.file("a")}, _b{_dir.file("b")};
};

TEST_F(PathnameFilesTest, MapsCreateModesToPermissions) {
    EXPECT_EQ(mode_t{0644}, createmode_to_perm(Pathname::CREATE_NORMAL));
    EXPECT_EQ(mode_t{0600}, createmode_to_perm(Pathname::CREATE_PRIVATE));
    EXPECT_EQ(mode_t{0440}, createmode_to_perm(Pathname::CREATE_READABLE_NONPUBLIC));
    for (const int unknown : {-1, 3, 1000000}) {
        EXPECT_EQ(mode_t{0644}, createmode_to_perm(static_cast<Pathname::CreateMode>(unknown)));
    }
}

TEST_F(PathnameFilesTest, MkdirAssertsItsModeBeforeItCreatesAnything) {
    for (const int unknown : {-1, 4}) {
        EXPECT_EXIT(_a.mkdir(static_cast<Pathname::MkdirMode>(unknown)),
                    testing::KilledBySignal(SIGABRT),
                    "^src/util/PathnameFiles.cpp:[0-9]+: failed assertion "
                    "`mode == MKDIR_PRIVATE'\n$");
        EXPECT_FALSE(_a.exists());
    }
}

TEST_F(PathnameFilesTest, ExaminesFilesAndDirectories) {
    const Pathname directory = _dir.path();
    writeFile(_a, "12345");
    const struct timespec times[] = {{0, UTIME_OMIT}, {1700000001, 0}};
    ASSERT_EQ(0, ::utimensat(AT_FDCWD, _a.c_str(), times, 0));

    EXPECT_TRUE(_a.exists() && _a.isReg() && _a.r_ok() && _a.w_ok() && _a.rw_ok());
    EXPECT_FALSE(_a.isDir());
    EXPECT_TRUE(directory.exists() && directory.isDir());
    EXPECT_FALSE(directory.isReg());
    EXPECT_FALSE(_b.exists() || _b.isDir() || _b.isReg() || _b.r_ok() || _b.w_ok() || _b.rw_ok());
    EXPECT_EQ(ENOENT, errno);

    long mtime = 0;
    long long size = 0;
    struct stat info;
    EXPECT_TRUE(_a.getMtime(&mtime) && _a.getSize(&size) && _a.stat(&info));
    EXPECT_FALSE(_b.getMtime(&mtime) || _b.getSize(&size) || _b.stat(&info));
    EXPECT_EQ(1700000001, mtime);
    EXPECT_EQ(5, size);
    EXPECT_EQ(5, info.st_size);
}

TEST_F(PathnameFilesTest, ChangesFilesAndDirectories) {
    std::FILE* const stream = _a.fopen("w");
    ASSERT_NE(nullptr, stream);
    std::fputs("hello", stream);
    std::fclose(stream);
    EXPECT_EQ(nullptr, _b.fopen("r"));

    EXPECT_TRUE(_a.truncate(2));
    EXPECT_TRUE(_a.renameTo(_b));
    EXPECT_FALSE(_a.exists());
    EXPECT_EQ("he", readFile(_b));
    EXPECT_TRUE(_b.unlink());
    EXPECT_FALSE(_b.unlink());

    EXPECT_TRUE(_a.mkdir(Pathname::MKDIR_PRIVATE));
    EXPECT_FALSE(_a.mkdir(Pathname::MKDIR_PRIVATE));
    EXPECT_EQ(EEXIST, errno);
    struct stat info;
    ASSERT_TRUE(_a.stat(&info));
    EXPECT_EQ(0700u, info.st_mode & 0777);
    EXPECT_TRUE(_a.rmdir());
    EXPECT_FALSE(_a.rmdir());
    EXPECT_TRUE(_a.mkdir(Pathname::MKDIR_PUBLIC));
    EXPECT_TRUE(_a.remove());
    EXPECT_FALSE(_a.remove());
}

TEST_F(PathnameFilesTest, TruncatesAndMeasuresPastFourGigabytes) {
    writeFile(_a, "x");
    long long size = 0;
    EXPECT_TRUE(_a.truncate(5368709123LL));
    EXPECT_TRUE(_a.getSize(&size));
    EXPECT_EQ(5368709123LL, size);
}

TEST_F(PathnameFilesTest, ReadlinkIsFalseAlthoughItFillsTheBuffer) {
    EXPECT_TRUE(Pathname("some//target").symlinkTo(_a));
    char buf[] = "................";
    EXPECT_FALSE(_a.readlink(buf, sizeof buf));
    EXPECT_STREQ("some//target....", buf);
    EXPECT_FALSE(_a.readlink(buf, 4));
    EXPECT_FALSE(Pathname(_dir.path()).readlink(buf, sizeof buf));
    EXPECT_EQ(EINVAL, errno);
}

TEST_F(PathnameFilesTest, FollowsLinksButRemovesThemselves) {
    writeFile(_b, "abc");
    ASSERT_TRUE(_b.symlinkTo(_a));
    EXPECT_TRUE(_a.isReg());
    EXPECT_TRUE(_a.remove());
    EXPECT_TRUE(_b.exists());
    EXPECT_FALSE(_a.exists());
}

}  // namespace
