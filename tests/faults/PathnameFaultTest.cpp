// Which call each operation of Pathname makes, with what, and what it makes of the result.

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>
#include <functional>
#include <string>

#include "support/ScriptedLibc.h"
#include "support/TempDir.h"
#include "util/FileDescriptor.h"
#include "util/Pathname.h"

namespace {

using testing::ElementsAre;

// A path that normalising would change.
const char* const ODD_PATH = "//x/..//y/";
const Pathname ODD(ODD_PATH);

std::string openCall(int flags, const char* permissions) {
    return "open " + ODD + ' ' + std::to_string(flags) + ' ' + permissions;
}

TEST(PathnameFaultTest, EachOperationMakesItsOneCallWithThePathUnchanged) {
    struct stat info;
    long mtime = 7;
    long long size = 7;
    char buf[8];
    const struct {
        std::string function, arguments;  // after the path
        std::function<bool()> operation;
    } rows[] = {
        {"stat", "", [&] { return ODD.stat(&info); }},
        {"stat", "", [&] { return ODD.isDir(); }},
        {"stat", "", [&] { return ODD.isReg(); }},
        {"stat", "", [&] { return ODD.getMtime(&mtime); }},
        {"stat", "", [&] { return ODD.getSize(&size); }},
        {"access", " 0", [&] { return ODD.exists(); }},
        {"access", " 4", [&] { return ODD.r_ok(); }},
        {"access", " 2", [&] { return ODD.w_ok(); }},
        {"access", " 6", [&] { return ODD.rw_ok(); }},
        {"fopen", " r+", [&] { return ODD.fopen("r+") != nullptr; }},
        {"mkdir", " 0700", [&] { return ODD.mkdir(Pathname::MKDIR_PRIVATE); }},
        {"mkdir", " 0770", [&] { return ODD.mkdir(Pathname::MKDIR_GROUP_RW); }},
        {"mkdir", " 0777", [&] { return ODD.mkdir(Pathname::MKDIR_PUBLIC); }},
        {"mkdir", " 0755", [&] { return ODD.mkdir(Pathname::MKDIR_WORLD_READ); }},
        {"rmdir", "", [&] { return ODD.rmdir(); }},
        {"unlink", "", [&] { return ODD.unlink(); }},
        {"remove", "", [&] { return ODD.remove(); }},
        {"truncate", " 5000000000", [&] { return ODD.truncate(5000000000LL); }},
        {"readlink", " 8", [&] { return ODD.readlink(buf, sizeof buf); }},
        {"symlink", " a//b", [&] { return ODD.symlinkTo("a//b"); }},
        {"rename", " a//b", [&] { return ODD.renameTo("a//b"); }},
        {"open", " 0 00", [&] { return ODD.copyTo("a"); }},
    };
    for (const auto& row : rows) {
        ScriptedCalls calls(row.function.c_str());
        calls.fail(EIO);
        const RecordedCalls seen;
        errno = 0;
        EXPECT_FALSE(row.operation()) << row.function;
        EXPECT_EQ(EIO, errno) << row.function;
        EXPECT_THAT(seen.calls(), ElementsAre(row.function + ' ' + ODD + row.arguments));
        // What is true for 0 alone. An open or fopen gives no 0, and a stat fills a structure.
        if (row.function != "stat" && row.function.find("open") == std::string::npos) {
            calls.give(0).give(1);
            EXPECT_TRUE(row.operation()) << row.function;
            EXPECT_FALSE(row.operation()) << row.function;
        }
    }
    EXPECT_EQ(7, mtime);
    EXPECT_EQ(7, size);
}

TEST(PathnameFaultTest, EachOpenUsesItsFlagsAndPermissionsAndHoldsTheResult) {
    constexpr auto UNKNOWN = static_cast<Pathname::CreateMode>(77);
    const struct {
        Pathname::CreateMode mode;
        const char* permissions;
    } modes[] = {{Pathname::CREATE_NORMAL, "0644"},
                 {Pathname::CREATE_PRIVATE, "0600"},
                 {Pathname::CREATE_READABLE_NONPUBLIC, "0440"},
                 {UNKNOWN, "0644"}};
    using Open = FileDescriptor (Pathname::*)(Pathname::CreateMode) const;
    const struct {
        int flags;
        Open open;
    } rows[] = {{O_WRONLY | O_CREAT | O_EXCL, &Pathname::openCreateOnly},
                {O_WRONLY | O_CREAT | O_TRUNC, &Pathname::openCreateOrReplace},
                {O_WRONLY | O_CREAT | O_APPEND, &Pathname::openCreateOrAppend},
                {O_RDWR | O_CREAT | O_TRUNC, &Pathname::openReadWriteOrCreate}};
    for (const int number : {-1, 0, 5000}) {
        ScriptedCalls opens("open");
        opens.give(number, 100);
        for (const auto& row : rows) {
            for (const auto& [mode, permissions] : modes) {
                const RecordedCalls seen;
                EXPECT_EQ(number, (ODD.*row.open)(mode)._osdep);
                EXPECT_THAT(seen.calls(), ElementsAre(openCall(row.flags, permissions)));
            }
        }
        const RecordedCalls seen;
        EXPECT_EQ(number, ODD.openReadOnly()._osdep);
        EXPECT_EQ(number, ODD.openReadOnlySafer()._osdep);
        EXPECT_THAT(seen.calls(),
                    ElementsAre(openCall(O_RDONLY, "00"), openCall(O_RDONLY | O_NONBLOCK, "00")));
    }
}

TEST(PathnameFaultTest, OpenLikeAModelTakesItsPermissionBits) {
    const TempDir dir;
    const std::string model = dir.file("model");
    writeFile(model, "");
    const struct {
        mode_t bits;
        const char* permissions;
    } rows[] = {{0644, "0644"}, {0400, "0400"}, {0751, "0751"}, {04755, "0755"}};
    for (const auto& row : rows) {
        ASSERT_EQ(0, ::chmod(model.c_str(), row.bits));
        const ScopedFileDescriptor descriptor(model);
        ScriptedCalls opens("open");
        opens.give(-1);
        const RecordedCalls seen;
        EXPECT_EQ(-1, ODD.openCreateOrReplace(descriptor)._osdep);
        EXPECT_THAT(seen.calls(),
                    ElementsAre(openCall(O_WRONLY | O_CREAT | O_TRUNC, row.permissions)));
    }
    const RecordedCalls seen;
    EXPECT_EQ(-1, ODD.openCreateOrReplace(FileDescriptor(-1))._osdep);
    EXPECT_EQ(EBADF, errno);
    EXPECT_THAT(seen.calls(), ElementsAre());
}

}  // namespace
