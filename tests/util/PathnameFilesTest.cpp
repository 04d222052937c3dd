#include "util/Pathname.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <functional>
#include <string>
#include <type_traits>
#include <vector>

#include "support/TempDir.h"
#include "util/FileDescriptor.h"

namespace {

// While it lives, each wrapped call is noted as text and fails with EIO, or returns a chosen
// number.
struct CallLog {
    explicit CallLog(int number = -1) : result(number) { current = this; }
    ~CallLog() { current = nullptr; }

    const int result;
    std::vector<std::string> calls;
    static CallLog* current;
};

CallLog* CallLog::current = nullptr;

std::string octal(unsigned bits) {
    char text[16];
    std::snprintf(text, sizeof text, "0%o", bits);
    return text;
}

// Notes the call when there is a log, and makes it otherwise.
template <typename Real>
auto logged(const std::string& call, Real real) -> decltype(real()) {
    using Result = decltype(real());
    if (CallLog::current == nullptr) {
        return real();
    }
    CallLog::current->calls.push_back(call);
    errno = EIO;
    if constexpr (std::is_pointer_v<Result>) {
        return nullptr;
    } else {
        return CallLog::current->result;
    }
}

}  // namespace

extern "C" {
int __real_stat(const char* path, struct stat* result);
int __wrap_stat(const char* path, struct stat* result) {
    return logged(std::string("stat ") + path, [&] { return __real_stat(path, result); });
}
int __real_access(const char* path, int mode);
int __wrap_access(const char* path, int mode) {
    return logged(std::string("access ") + path + ' ' + std::to_string(mode),
                  [&] { return __real_access(path, mode); });
}
FILE* __real_fopen(const char* path, const char* mode);
FILE* __wrap_fopen(const char* path, const char* mode) {
    return logged(std::string("fopen ") + path + ' ' + mode,
                  [&] { return __real_fopen(path, mode); });
}
int __real_mkdir(const char* path, mode_t mode);
// The runtimes of clang's sanitizers make the folder of their reports with this, before they can
// watch any code.
#ifdef __clang__
__attribute__((no_sanitize("address", "undefined"), disable_sanitizer_instrumentation))
#endif
int __wrap_mkdir(const char* path, mode_t mode) {
    if (CallLog::current == nullptr) {
        return __real_mkdir(path, mode);
    }
    return logged(std::string("mkdir ") + path + ' ' + octal(mode),
                  [&] { return __real_mkdir(path, mode); });
}
int __real_rmdir(const char* path);
int __wrap_rmdir(const char* path) {
    return logged(std::string("rmdir ") + path, [&] { return __real_rmdir(path); });
}
int __real_unlink(const char* path);
int __wrap_unlink(const char* path) {
    return logged(std::string("unlink ") + path, [&] { return __real_unlink(path); });
}
int __real_remove(const char* path);
int __wrap_remove(const char* path) {
    return logged(std::string("remove ") + path, [&] { return __real_remove(path); });
}
int __real_truncate(const char* path, off_t length);
int __wrap_truncate(const char* path, off_t length) {
    return logged(std::string("truncate ") + path + ' ' + std::to_string(length),
                  [&] { return __real_truncate(path, length); });
}
ssize_t __real_readlink(const char* path, char* buf, size_t size);
ssize_t __wrap_readlink(const char* path, char* buf, size_t size) {
    return logged(std::string("readlink ") + path + ' ' + std::to_string(size),
                  [&] { return __real_readlink(path, buf, size); });
}
int __real_symlink(const char* target, const char* link);
int __wrap_symlink(const char* target, const char* link) {
    return logged(std::string("symlink ") + target + ' ' + link,
                  [&] { return __real_symlink(target, link); });
}
int __real_rename(const char* from, const char* to);
int __wrap_rename(const char* from, const char* to) {
    return logged(std::string("rename ") + from + ' ' + to,
                  [&] { return __real_rename(from, to); });
}
int __real_open(const char* path, int flags, ...);
int __wrap_open(const char* path, int flags, ...) {
    mode_t mode = 0;
    if ((flags & O_CREAT) != 0) {
        va_list args;
        va_start(args, flags);
        mode = va_arg(args, mode_t);
        va_end(args);
    }
    return logged(
        std::string("open ") + path + ' ' + octal(static_cast<unsigned>(flags)) + ' ' + octal(mode),
        [&] { return __real_open(path, flags, mode); });
}
}

namespace {

// A path that normalising would change.
const Pathname odd("//x/..//y/");

std::string openCall(int flags, unsigned permissions) {
    return "open //x/..//y/ " + octal(static_cast<unsigned>(flags)) + ' ' + octal(permissions);
}

TEST(PathnameFilesTest, EachOperationMakesItsOneCallWithThePathUnchanged) {
    struct stat info;
    long mtime = 7;
    long long size = 7;
    char buf[8];
    using Operation = std::function<bool()>;
    const struct {
        std::string call;
        Operation operation;
    } rows[] = {
        {"stat //x/..//y/", [&] { return odd.stat(&info); }},
        {"stat //x/..//y/", [&] { return odd.isDir(); }},
        {"stat //x/..//y/", [&] { return odd.isReg(); }},
        {"stat //x/..//y/", [&] { return odd.getMtime(&mtime); }},
        {"stat //x/..//y/", [&] { return odd.getSize(&size); }},
        {"access //x/..//y/ 0", [&] { return odd.exists(); }},
        {"access //x/..//y/ 4", [&] { return odd.r_ok(); }},
        {"access //x/..//y/ 2", [&] { return odd.w_ok(); }},
        {"access //x/..//y/ 6", [&] { return odd.rw_ok(); }},
        {"fopen //x/..//y/ r+", [&] { return odd.fopen("r+") != nullptr; }},
        {"mkdir //x/..//y/ 0700", [&] { return odd.mkdir(Pathname::MKDIR_PRIVATE); }},
        {"mkdir //x/..//y/ 0770", [&] { return odd.mkdir(Pathname::MKDIR_GROUP_RW); }},
        {"mkdir //x/..//y/ 0777", [&] { return odd.mkdir(Pathname::MKDIR_PUBLIC); }},
        {"mkdir //x/..//y/ 0755", [&] { return odd.mkdir(Pathname::MKDIR_WORLD_READ); }},
        {"rmdir //x/..//y/", [&] { return odd.rmdir(); }},
        {"unlink //x/..//y/", [&] { return odd.unlink(); }},
        {"remove //x/..//y/", [&] { return odd.remove(); }},
        {"truncate //x/..//y/ 5000000000", [&] { return odd.truncate(5000000000LL); }},
        {"readlink //x/..//y/ 8", [&] { return odd.readlink(buf, sizeof buf); }},
        {"symlink //x/..//y/ a//b", [&] { return odd.symlinkTo("a//b"); }},
        {"rename //x/..//y/ a//b", [&] { return odd.renameTo("a//b"); }},
        {openCall(O_RDONLY, 0), [&] { return odd.copyTo("a"); }},
    };
    for (const auto& row : rows) {
        CallLog log;
        errno = 0;
        EXPECT_FALSE(row.operation()) << row.call;
        EXPECT_EQ(EIO, errno) << row.call;
        EXPECT_THAT(log.calls, testing::ElementsAre(row.call));
    }
    EXPECT_EQ(7, mtime);
    EXPECT_EQ(7, size);
}

TEST(PathnameFilesTest, AnOperationIsTrueExactlyWhenItsCallReturnedZero) {
    struct stat info;
    char buf[8];
    using Operation = std::function<bool()>;
    const Operation operations[] = {
        [&] { return odd.stat(&info); },
        [&] { return odd.exists(); },
        [&] { return odd.r_ok(); },
        [&] { return odd.w_ok(); },
        [&] { return odd.rw_ok(); },
        [&] { return odd.mkdir(Pathname::MKDIR_PUBLIC); },
        [&] { return odd.rmdir(); },
        [&] { return odd.unlink(); },
        [&] { return odd.remove(); },
        [&] { return odd.truncate(0); },
        // An empty link text is the only one that is true: see there.
        [&] { return odd.readlink(buf, sizeof buf); },
        [&] { return odd.symlinkTo("a"); },
        [&] { return odd.renameTo("a"); },
    };
    for (const int result : {-1, 0, 1}) {
        for (const Operation& operation : operations) {
            CallLog log(result);
            EXPECT_EQ(result == 0, operation()) << result;
            ASSERT_EQ(1u, log.calls.size());
        }
    }
}

TEST(PathnameFilesTest, AnOpenHoldsWhateverNumberItGot) {
    for (const int number : {0, 5000}) {
        CallLog log(number);
        EXPECT_EQ(number, odd.openReadOnly()._osdep);
        EXPECT_EQ(number, odd.openReadOnlySafer()._osdep);
        EXPECT_EQ(number, odd.openCreateOnly(Pathname::CREATE_NORMAL)._osdep);
        EXPECT_EQ(number, odd.openCreateOrReplace(Pathname::CREATE_NORMAL)._osdep);
        EXPECT_EQ(number, odd.openCreateOrAppend(Pathname::CREATE_NORMAL)._osdep);
        EXPECT_EQ(number, odd.openReadWriteOrCreate(Pathname::CREATE_NORMAL)._osdep);
    }
}

TEST(PathnameFilesTest, EachOpenUsesItsFlagsAndPermissions) {
    using Operation = std::function<FileDescriptor()>;
    constexpr auto beyond = static_cast<Pathname::CreateMode>(77);
    const struct {
        int flags;
        unsigned permissions;
        Operation operation;
    } rows[] = {
        {O_RDONLY, 0, [] { return odd.openReadOnly(); }},
        {O_RDONLY | O_NONBLOCK, 0, [] { return odd.openReadOnlySafer(); }},
        {O_WRONLY | O_CREAT | O_EXCL, 0644,
         [] { return odd.openCreateOnly(Pathname::CREATE_NORMAL); }},
        {O_WRONLY | O_CREAT | O_EXCL, 0600,
         [] { return odd.openCreateOnly(Pathname::CREATE_PRIVATE); }},
        {O_WRONLY | O_CREAT | O_EXCL, 0440,
         [] { return odd.openCreateOnly(Pathname::CREATE_READABLE_NONPUBLIC); }},
        {O_WRONLY | O_CREAT | O_EXCL, 0644, [] { return odd.openCreateOnly(beyond); }},
        {O_WRONLY | O_CREAT | O_TRUNC, 0644,
         [] { return odd.openCreateOrReplace(Pathname::CREATE_NORMAL); }},
        {O_WRONLY | O_CREAT | O_TRUNC, 0600,
         [] { return odd.openCreateOrReplace(Pathname::CREATE_PRIVATE); }},
        {O_WRONLY | O_CREAT | O_APPEND, 0644,
         [] { return odd.openCreateOrAppend(Pathname::CREATE_NORMAL); }},
        {O_WRONLY | O_CREAT | O_APPEND, 0440,
         [] { return odd.openCreateOrAppend(Pathname::CREATE_READABLE_NONPUBLIC); }},
        {O_RDWR | O_CREAT | O_TRUNC, 0644,
         [] { return odd.openReadWriteOrCreate(Pathname::CREATE_NORMAL); }},
        {O_RDWR | O_CREAT | O_TRUNC, 0600,
         [] { return odd.openReadWriteOrCreate(Pathname::CREATE_PRIVATE); }},
    };
    for (const auto& row : rows) {
        CallLog log;
        errno = 0;
        EXPECT_EQ(-1, row.operation()._osdep);
        EXPECT_EQ(EIO, errno);
        EXPECT_THAT(log.calls, testing::ElementsAre(openCall(row.flags, row.permissions)));
    }
}

TEST(PathnameFilesTest, OpenLikeAModelTakesItsPermissionBits) {
    const TempDir dir;
    const std::string model = dir.file("model");
    writeFile(model, "");
    for (const mode_t bits : {0644u, 0400u, 0751u, 04755u}) {
        ASSERT_EQ(0, ::chmod(model.c_str(), bits));
        const ScopedFileDescriptor descriptor{Pathname(model)};
        ASSERT_TRUE(descriptor.valid());
        CallLog log;
        EXPECT_EQ(-1, odd.openCreateOrReplace(descriptor)._osdep);
        EXPECT_THAT(log.calls,
                    testing::ElementsAre(openCall(O_WRONLY | O_CREAT | O_TRUNC, bits & 0777)));
    }
}

TEST(PathnameFilesTest, OpensNothingWhenTheModelCannotBeExamined) {
    CallLog log;
    EXPECT_EQ(-1, odd.openCreateOrReplace(FileDescriptor(-1))._osdep);
    EXPECT_EQ(EBADF, errno);
    EXPECT_TRUE(log.calls.empty());
}

TEST(PathnameFilesTest, MapsCreateModesToPermissions) {
    EXPECT_EQ(mode_t{0644}, createmode_to_perm(Pathname::CREATE_NORMAL));
    EXPECT_EQ(mode_t{0600}, createmode_to_perm(Pathname::CREATE_PRIVATE));
    EXPECT_EQ(mode_t{0440}, createmode_to_perm(Pathname::CREATE_READABLE_NONPUBLIC));
    for (const int beyond : {-1, 3, 1000000}) {
        EXPECT_EQ(mode_t{0644}, createmode_to_perm(static_cast<Pathname::CreateMode>(beyond)));
    }
}

TEST(PathnameFilesTest, MkdirAssertsItsModeBeforeItCreatesAnything) {
    const TempDir dir;
    const Pathname made = dir.file("made");
    for (const int beyond : {-1, 4}) {
        EXPECT_EXIT(made.mkdir(static_cast<Pathname::MkdirMode>(beyond)),
                    testing::KilledBySignal(SIGABRT),
                    "^src/util/PathnameFiles.cpp:[0-9]+: failed assertion "
                    "`mode == MKDIR_PRIVATE'\n$");
        EXPECT_FALSE(made.exists());
    }
}

TEST(PathnameFilesTest, TellsWhatAPathNames) {
    const TempDir dir;
    const Pathname file = dir.file("file"), folder = dir.path(), absent = dir.file("absent");
    writeFile(file, "12345");
    const struct timespec times[] = {{0, UTIME_OMIT}, {1700000001, 0}};
    ASSERT_EQ(0, ::utimensat(AT_FDCWD, file.c_str(), times, 0));

    EXPECT_TRUE(file.exists() && file.isReg() && file.r_ok() && file.w_ok() && file.rw_ok());
    EXPECT_FALSE(file.isDir());
    EXPECT_TRUE(folder.exists() && folder.isDir());
    EXPECT_FALSE(folder.isReg());
    EXPECT_FALSE(absent.exists() || absent.isDir() || absent.isReg() || absent.r_ok() ||
                 absent.w_ok() || absent.rw_ok());
    EXPECT_EQ(ENOENT, errno);

    long mtime = 0;
    long long size = 0;
    struct stat info;
    EXPECT_TRUE(file.getMtime(&mtime) && file.getSize(&size) && file.stat(&info));
    EXPECT_EQ(1700000001, mtime);
    EXPECT_EQ(5, size);
    EXPECT_EQ(5, info.st_size);
    EXPECT_FALSE(absent.getMtime(&mtime) || absent.getSize(&size) || absent.stat(&info));
    EXPECT_EQ(1700000001, mtime);
    EXPECT_EQ(5, size);
}

TEST(PathnameFilesTest, ChangesWhatAPathNames) {
    const TempDir dir;
    const Pathname a = dir.file("a"), b = dir.file("b"), folder = dir.file("folder");
    std::FILE* const stream = a.fopen("w");
    ASSERT_NE(nullptr, stream);
    std::fputs("hello", stream);
    std::fclose(stream);
    EXPECT_EQ(nullptr, b.fopen("r"));

    EXPECT_TRUE(a.truncate(2));
    EXPECT_TRUE(a.renameTo(b));
    EXPECT_FALSE(a.exists());
    EXPECT_EQ("he", readFile(b));
    EXPECT_TRUE(b.unlink());
    EXPECT_FALSE(b.unlink());

    EXPECT_TRUE(folder.mkdir(Pathname::MKDIR_PRIVATE));
    EXPECT_FALSE(folder.mkdir(Pathname::MKDIR_PRIVATE));
    EXPECT_EQ(EEXIST, errno);
    struct stat info;
    ASSERT_TRUE(folder.stat(&info));
    EXPECT_EQ(0700u, info.st_mode & 0777);
    EXPECT_TRUE(folder.rmdir());
    EXPECT_FALSE(folder.rmdir());
    EXPECT_TRUE(folder.mkdir(Pathname::MKDIR_PUBLIC));
    EXPECT_TRUE(folder.remove());
    EXPECT_FALSE(folder.remove());
}

TEST(PathnameFilesTest, TruncatesAndMeasuresPastFourGigabytes) {
    const TempDir dir;
    const Pathname sparse = dir.file("sparse");
    writeFile(sparse, "x");
    long long size = 0;
    EXPECT_TRUE(sparse.truncate(5368709123LL));
    EXPECT_TRUE(sparse.getSize(&size));
    EXPECT_EQ(5368709123LL, size);
}

TEST(PathnameFilesTest, ReadlinkIsTrueForAnEmptyTextOnly) {
    const TempDir dir;
    const Pathname link = dir.file("link");
    EXPECT_TRUE(Pathname("some//target").symlinkTo(link));
    char buf[] = "................";
    EXPECT_FALSE(link.readlink(buf, sizeof buf));
    EXPECT_STREQ("some//target....", buf);
    EXPECT_FALSE(link.readlink(buf, 4));
    EXPECT_FALSE(Pathname(dir.path()).readlink(buf, sizeof buf));
    EXPECT_EQ(EINVAL, errno);
}

TEST(PathnameFilesTest, FollowsLinksButRenamesAndRemovesThemselves) {
    const TempDir dir;
    const Pathname target = dir.file("target"), link = dir.file("link");
    writeFile(target, "abc");
    ASSERT_TRUE(target.symlinkTo(link));
    EXPECT_TRUE(link.isReg());
    EXPECT_TRUE(link.remove());
    EXPECT_TRUE(target.exists());
    EXPECT_FALSE(link.exists());
}

}  // namespace
