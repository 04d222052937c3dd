#include "util/FileDescriptor.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <new>
#include <string>
#include <utility>
#include <vector>

#include "support/ScriptedCalls.h"
#include "support/TempDir.h"

namespace {

// The sizes that wrapped functions were called with, while a case listens.
std::vector<std::size_t>* heardSizes = nullptr;

struct Sizes {
    Sizes() { heardSizes = &seen; }
    ~Sizes() { heardSizes = nullptr; }
    std::vector<std::size_t> seen;
};

void hear(std::size_t size) {
    if (heardSizes != nullptr) {
        heardSizes->push_back(size);
    }
}

}  // namespace

extern "C" {
ssize_t __real_read(int fd, void* buf, size_t size);
ssize_t __wrap_read(int fd, void* buf, size_t size) {
    hear(size);
    return scriptedCall("read", size, [&](size_t limit) { return __real_read(fd, buf, limit); });
}
ssize_t __real_write(int fd, const void* buf, size_t size);
ssize_t __wrap_write(int fd, const void* buf, size_t size) {
    hear(size);
    return scriptedCall("write", size, [&](size_t limit) { return __real_write(fd, buf, limit); });
}
ssize_t __real_writev(int fd, const struct iovec* buffers, int count);
ssize_t __wrap_writev(int fd, const struct iovec* buffers, int count) {
    return scriptedCall("writev", [&] { return __real_writev(fd, buffers, count); });
}
int __real_close(int fd);
int __wrap_close(int fd) {
    return scriptedCall("close", [&] { return __real_close(fd); });
}
int __real_fstat(int fd, struct stat* result);
int __wrap_fstat(int fd, struct stat* result) {
    return scriptedCall("fstat", [&] { return __real_fstat(fd, result); });
}
int __real_fsync(int fd);
int __wrap_fsync(int fd) {
    return scriptedCall("fsync", [&] { return __real_fsync(fd); });
}
int __real_fcntl(int fd, int command, ...);
int __wrap_fcntl(int fd, int command, ...) {
    va_list args;
    va_start(args, command);
    const long argument = va_arg(args, long);
    va_end(args);
    return scriptedCall(command == F_SETFD ? "fcntl set" : "fcntl",
                        [&] { return __real_fcntl(fd, command, argument); });
}
int __real_vsnprintf(char* buf, size_t size, const char* fmt, va_list args);
int __wrap_vsnprintf(char* buf, size_t size, const char* fmt, va_list args) {
    hear(size);
    return scriptedCall("vsnprintf", [&] { return __real_vsnprintf(buf, size, fmt, args); });
}
void* __real__Znam(std::size_t size);
void* __wrap__Znam(std::size_t size) {
    void* const memory = scriptedCall("new[]", [&] { return __real__Znam(size); });
    if (memory == nullptr) {
        throw std::bad_alloc();
    }
    return memory;
}
void* __real__Znwm(std::size_t size);
void* __wrap__Znwm(std::size_t size) {
    return scriptedCall("new", [&] { return __real__Znwm(size); });
}
}

namespace {

using testing::ElementsAre;

// A file to write, and what has been written.
struct Output {
    Output() : path(dir.file("out")), file(path.openCreateOnly(Pathname::CREATE_NORMAL)) {}
    std::string text() const { return readFile(path); }

    const TempDir dir;
    const Pathname path;
    const ScopedFileDescriptor file;
};

// A file to read.
struct Input {
    explicit Input(const std::string& text) : path(dir.file("in")) {
        writeFile(path, text);
        file = path.openReadOnly();
    }

    const TempDir dir;
    const Pathname path;
    ScopedFileDescriptor file;
};

TEST(FileDescriptorCallsTest, WriteGoesOnAfterShortCountsAndInterruptions) {
    const Output out;
    ScriptedCalls writes("write");
    writes.fail(EINTR, 3).limit(1).fail(EINTR).limit(4).fail(EINTR);
    Sizes sizes;
    EXPECT_EQ(10, out.file.write("0123456789"));
    EXPECT_EQ("0123456789", out.text());
    EXPECT_THAT(sizes.seen, ElementsAre(10, 10, 10, 10, 9, 9, 5, 5));
}

TEST(FileDescriptorCallsTest, ReadGoesOnAfterShortCountsAndInterruptions) {
    const Input in("0123456789");
    ScriptedCalls reads("read");
    reads.fail(EINTR, 2).limit(3).fail(EINTR).limit(1);
    char buf[10] = {};
    Sizes sizes;
    EXPECT_EQ(10, in.file.read(buf, sizeof buf));
    EXPECT_EQ("0123456789", std::string(buf, sizeof buf));
    EXPECT_THAT(sizes.seen, ElementsAre(10, 10, 10, 7, 7, 6));
}

TEST(FileDescriptorCallsTest, AnErrorAfterSomeBytesIsAShortCount) {
    const Output out;
    for (const int error : {ENOSPC, EIO, EAGAIN}) {
        ScriptedCalls writes("write");
        writes.limit(2).limit(1).fail(EINTR).fail(error);
        EXPECT_EQ(3, out.file.write("abcdef"));
        EXPECT_EQ(4u, writes.calls());
    }
    EXPECT_EQ("abcabcabc", out.text());

    const Input in("abcdef");
    ScriptedCalls reads("read");
    reads.limit(4).fail(EIO);
    char buf[6];
    EXPECT_EQ(4, in.file.read(buf, sizeof buf));
    EXPECT_EQ(2u, reads.calls());
}

TEST(FileDescriptorCallsTest, AnErrorBeforeTheFirstByteIsReported) {
    const Output out;
    char byte;
    for (const int error : {ENOSPC, EIO, EAGAIN, EBADF}) {
        ScriptedCalls failing("write"), failingRead("read");
        failing.fail(EINTR).fail(error);
        failingRead.fail(EINTR).fail(error);
        errno = 0;
        EXPECT_EQ(-1, out.file.write("abc"));
        EXPECT_EQ(error, errno);
        errno = 0;
        EXPECT_EQ(-1, out.file.read(&byte, 1));
        EXPECT_EQ(error, errno);
        EXPECT_EQ(2u, failing.calls());
        EXPECT_EQ(2u, failingRead.calls());
    }
    EXPECT_EQ("", out.text());
}

TEST(FileDescriptorCallsTest, AZeroCountEndsTheTransfer) {
    const Output out;
    ScriptedCalls writes("write");
    writes.limit(2).give(0).give(0);
    EXPECT_EQ(2, out.file.write("abc"));
    EXPECT_EQ(0, out.file.write("abc"));
    EXPECT_EQ(3u, writes.calls());
}

TEST(FileDescriptorCallsTest, ATransferOfNothingIsStillACall) {
    const Output out;
    ScriptedCalls writes("write"), reads("read");
    writes.pass().fail(EPERM);
    EXPECT_EQ(0, out.file.write("", 0));
    EXPECT_EQ(-1, out.file.write(std::string()));
    EXPECT_EQ(EPERM, errno);
    EXPECT_EQ(2u, writes.calls());
    char byte;
    const FileDescriptor null = Pathname("/dev/null").openReadOnly();
    EXPECT_EQ(0, null.read(&byte, 0));
    EXPECT_EQ(1u, reads.calls());
    EXPECT_TRUE(FileDescriptor(null).close());
}

TEST(FileDescriptorCallsTest, WritevIsOneCallWithoutRetry) {
    const Output out;
    const struct iovec none = {nullptr, 0};
    ScriptedCalls writevs("writev");
    writevs.fail(EINTR).give(1);
    EXPECT_EQ(-1, out.file.writev(&none, 1));
    EXPECT_EQ(EINTR, errno);
    EXPECT_EQ(1, out.file.writev(&none, 1));
    EXPECT_EQ(2u, writevs.calls());
}

TEST(FileDescriptorCallsTest, SyncIsOneCall) {
    const Output out;
    ScriptedCalls syncs("fsync");
    syncs.fail(EINTR);
    out.file.sync();
    EXPECT_EQ(1u, syncs.calls());
}

TEST(FileDescriptorCallsTest, CloseOnExecIsSetOnlyWhenItChanges) {
    const Output out;
    const struct {
        bool on;
        unsigned sets;
        int flags;
    } rows[] = {{false, 0, 0}, {true, 1, FD_CLOEXEC}, {true, 0, FD_CLOEXEC}, {false, 1, 0}};
    for (const auto& row : rows) {
        ScriptedCalls gets("fcntl"), sets("fcntl set");
        out.file.setCloseOnExec(row.on);
        EXPECT_EQ(1u, gets.calls());
        EXPECT_EQ(row.sets, sets.calls());
        EXPECT_EQ(row.flags, __real_fcntl(out.file._osdep, F_GETFD));
    }
}

TEST(FileDescriptorCallsTest, CloseOnExecDoesNothingWhenTheFlagsCannotBeRead) {
    const Output out;
    ScriptedCalls gets("fcntl"), sets("fcntl set");
    gets.fail(EBADF);
    out.file.setCloseOnExec(true);
    EXPECT_EQ(0u, sets.calls());
    EXPECT_EQ(0, __real_fcntl(out.file._osdep, F_GETFD));
}

TEST(FileDescriptorCallsTest, OtherDescriptorFlagsStay) {
    const Output out;
    ScriptedCalls gets("fcntl"), sets("fcntl set");
    gets.give(FD_CLOEXEC | 0x40).give(0x40);
    out.file.setCloseOnExec(true);
    out.file.setCloseOnExec(false);
    EXPECT_EQ(0u, sets.calls());
}

TEST(FileDescriptorCallsTest, SizeIsUntouchedWhenFstatFails) {
    const Output out;
    ScriptedCalls stats("fstat");
    stats.fail(EIO, 2);
    long long size = 7;
    struct stat info;
    EXPECT_FALSE(out.file.getSize(&size));
    EXPECT_FALSE(out.file.stat(&info));
    EXPECT_EQ(EIO, errno);
    EXPECT_EQ(7, size);
}

// --- Formatting ----------------------------------------------------------------------------------

TEST(FileDescriptorCallsTest, ShortTextsAllocateNothing) {
    const Output out;
    const std::string text(255, 'x');
    ScriptedCalls arrays("new[]"), objects("new"), passes("vsnprintf");
    out.file.format("%s", text.c_str());
    const unsigned allocations = arrays.calls() + objects.calls();
    EXPECT_EQ(0u, allocations);
    EXPECT_EQ(1u, passes.calls());
    EXPECT_EQ(text, out.text());
}

TEST(FileDescriptorCallsTest, ALongTextIsFormattedAgainInItsExactSize) {
    const Output out;
    const std::string text(256, 'x');
    ScriptedCalls arrays("new[]");
    Sizes sizes;
    out.file.format("%s", text.c_str());
    EXPECT_THAT(sizes.seen, ElementsAre(256, 257, 256));
    EXPECT_EQ(1u, arrays.calls());
    EXPECT_EQ(text, out.text());
}

TEST(FileDescriptorCallsTest, ANegativeResultDoublesTheBuffer) {
    const Output out;
    ScriptedCalls passes("vsnprintf");
    passes.fail(EOVERFLOW, 3);
    Sizes sizes;
    out.file.format("%d-%s-%d", 1, "two", 3);
    EXPECT_THAT(sizes.seen, ElementsAre(256, 512, 1024, 2048, 7));
    EXPECT_EQ("1-two-3", out.text());
}

TEST(FileDescriptorCallsTest, BothKindsOfRetryMayFollowEachOther) {
    const Output out;
    ScriptedCalls passes("vsnprintf");
    passes.give(300).fail(EOVERFLOW).give(602).pass();
    Sizes sizes;
    out.file.format("%d-%s-%d", 1, "two", 3);
    EXPECT_THAT(sizes.seen, ElementsAre(256, 301, 602, 603, 7));
    EXPECT_EQ("1-two-3", out.text());
}

TEST(FileDescriptorCallsTest, AFailedAllocationIsThrownAndWritesNothing) {
    const Output out;
    const std::string text(1000, 'x');
    ScriptedCalls arrays("new[]");
    arrays.fail(ENOMEM).pass().fail(ENOMEM);
    EXPECT_THROW(out.file.format("%s", text.c_str()), std::bad_alloc);
    // At the second buffer: the first one must not leak.
    ScriptedCalls passes("vsnprintf");
    passes.fail(EOVERFLOW, 2);
    EXPECT_THROW(out.file.format("%s", text.c_str()), std::bad_alloc);
    EXPECT_EQ("", out.text());
}

TEST(FileDescriptorCallsTest, AFormatterThatAlwaysFailsEndsInBadAlloc) {
    const Output out;
    ScriptedCalls passes("vsnprintf"), arrays("new[]");
    passes.fail(EILSEQ, 100);
    arrays.pass(10).fail(ENOMEM);
    Sizes sizes;
    EXPECT_THROW(out.file.format("text"), std::bad_alloc);
    EXPECT_EQ(256u << 10, sizes.seen.back());
    EXPECT_EQ(11u, sizes.seen.size());
}

TEST(FileDescriptorCallsTest, FormattedWritesSwallowTheirErrors) {
    const Output out;
    ScriptedCalls writes("write");
    writes.fail(ENOSPC).limit(2).fail(EINTR).fail(ENOSPC);
    out.file.format("%s", "abc");
    out.file.format("%s", "abc");
    EXPECT_EQ("ab", out.text());
}

// --- Copying -------------------------------------------------------------------------------------

TEST(FileDescriptorCallsTest, CopiesInChunksWithoutTheHeap) {
    const Input in(std::string(20000, 'x'));
    const Output out;
    std::vector<std::size_t> seen;
    unsigned allocations = 0;
    {
        Sizes sizes;
        sizes.seen.reserve(20);
        ScriptedCalls arrays("new[]"), objects("new");
        EXPECT_TRUE(in.file.copyTo(out.file));
        allocations = arrays.calls() + objects.calls();
        seen = sizes.seen;
    }
    EXPECT_EQ(0u, allocations);
    // The third read completes itself with a call that meets the end of the file, the fourth is it.
    EXPECT_THAT(seen, ElementsAre(8192, 8192, 8192, 8192, 8192, 4576, 3616, 8192));
    EXPECT_EQ(std::string(20000, 'x'), out.text());
}

TEST(FileDescriptorCallsTest, CopiesThroughShortCountsAndInterruptions) {
    const std::string text = std::string(9000, 'x') + "end";
    const Input in(text);
    const Output out;
    ScriptedCalls reads("read"), writes("write");
    reads.limit(5).fail(EINTR).limit(8000).fail(EINTR, 2).limit(1);
    writes.limit(100).fail(EINTR).limit(1).fail(EINTR);
    EXPECT_TRUE(in.file.copyTo(out.file));
    EXPECT_EQ(text, out.text());
}

TEST(FileDescriptorCallsTest, CopyStopsAtTheFirstReadThatFails) {
    const Input in(std::string(20000, 'x'));
    const Output out;
    ScriptedCalls reads("read");
    reads.pass().fail(EIO);
    errno = 0;
    EXPECT_FALSE(in.file.copyTo(out.file));
    EXPECT_EQ(EIO, errno);
    EXPECT_EQ(std::string(8192, 'x'), out.text());
}

TEST(FileDescriptorCallsTest, CopyStopsAtTheFirstWriteThatFails) {
    const Input in(std::string(20000, 'x'));
    const Output out;
    ScriptedCalls writes("write");
    writes.pass().limit(10).fail(ENOSPC, 2);
    errno = 0;
    EXPECT_FALSE(in.file.copyTo(out.file));
    EXPECT_EQ(ENOSPC, errno);
    EXPECT_EQ(std::string(8202, 'x'), out.text());
    // The short count of the second chunk, then the error by itself.
    EXPECT_EQ(4u, writes.calls());
}

TEST(FileDescriptorCallsTest, CopyGoesOnWhenAnErrorPasses) {
    const Input in("text");
    const Output out;
    ScriptedCalls writes("write");
    writes.limit(1).fail(EAGAIN);
    EXPECT_TRUE(in.file.copyTo(out.file));
    EXPECT_EQ("text", out.text());
}

TEST(FileDescriptorCallsTest, CopyTakesAWriteOfNothingForAFullDevice) {
    const Input in("text");
    const Output out;
    ScriptedCalls writes("write");
    writes.give(0);
    errno = 0;
    EXPECT_FALSE(in.file.copyTo(out.file));
    EXPECT_EQ(ENOSPC, errno);
}

TEST(FileDescriptorCallsTest, AFailedCopyKeepsItsErrorWhileTheDestinationCloses) {
    const Input in("text");
    const Pathname to = in.dir.file("to");
    ScriptedCalls writes("write"), closes("close");
    writes.fail(EFBIG, 2);
    closes.fail(EIO);
    errno = 0;
    EXPECT_FALSE(in.file.copyTo(to));
    EXPECT_EQ(EFBIG, errno);
    EXPECT_EQ(1u, closes.calls());
    errno = 0;
    EXPECT_FALSE(in.path.copyTo(to));
    EXPECT_EQ(EFBIG, errno);
    EXPECT_EQ(3u, closes.calls());
}

TEST(FileDescriptorCallsTest, CopyOpensNoDestinationWithoutASourceOrItsPermissions) {
    const Input in("text");
    const Pathname to = in.dir.file("to");
    ScriptedCalls stats("fstat");
    stats.fail(EIO);
    EXPECT_FALSE(FileDescriptor(-1).copyTo(to));
    EXPECT_EQ(0u, stats.calls());
    EXPECT_FALSE(in.file.copyTo(to));
    EXPECT_EQ(EIO, errno);
    EXPECT_FALSE(to.exists());
}

// --- Closing -------------------------------------------------------------------------------------

TEST(FileDescriptorCallsTest, CloseIsNeverRepeatedAndAlwaysForgetsTheNumber) {
    for (const int error : {EINTR, EIO, EBADF}) {
        ScriptedCalls closes("close");
        closes.fail(error);
        FileDescriptor file(5000);
        errno = 0;
        EXPECT_FALSE(file.close());
        EXPECT_EQ(error, errno);
        EXPECT_EQ(-1, file._osdep);
        EXPECT_TRUE(file.close());
        EXPECT_EQ(1u, closes.calls());
    }
}

TEST(FileDescriptorCallsTest, ClosingNoFileMakesNoCall) {
    ScriptedCalls closes("close");
    for (const int number : {-1, -2}) {
        FileDescriptor none(number);
        EXPECT_TRUE(none.close());
    }
    EXPECT_EQ(0u, closes.calls());
}

TEST(FileDescriptorCallsTest, CleanUpLeavesErrnoAsItWas) {
    ScriptedCalls closes("close");
    closes.fail(EIO).give(0);
    FileDescriptor file(5000);
    errno = ENOENT;
    file.close_saveErrno();
    EXPECT_EQ(ENOENT, errno);
    EXPECT_EQ(-1, file._osdep);
    file = FileDescriptor(5000);
    file.close_saveErrno();
    EXPECT_EQ(ENOENT, errno);
    EXPECT_EQ(2u, closes.calls());
}

template <typename Scoped>
class ScopedFileDescriptorTest : public testing::Test {
protected:
    // Nothing here is a real descriptor: every close is taken for done.
    ScopedFileDescriptorTest() { _closes.give(0, 100); }
    unsigned closes() const { return _closes.calls(); }

private:
    ScriptedCalls _closes{"close"};
};

using ScopedTypes = testing::Types<ScopedFileDescriptor, ScopedSaferFileDescriptor>;
TYPED_TEST_SUITE(ScopedFileDescriptorTest, ScopedTypes);

TYPED_TEST(ScopedFileDescriptorTest, StartsWithoutAFile) {
    {
        const TypeParam none;
        EXPECT_EQ(-1, none._osdep);
    }
    EXPECT_EQ(0u, this->closes());
}

TYPED_TEST(ScopedFileDescriptorTest, ClosesAtTheEndOfItsScopeAndKeepsErrno) {
    {
        const TypeParam owner(FileDescriptor(5000));
        EXPECT_EQ(5000, owner._osdep);
        EXPECT_EQ(0u, this->closes());
        errno = ENOENT;
    }
    EXPECT_EQ(1u, this->closes());
    EXPECT_EQ(ENOENT, errno);
}

TYPED_TEST(ScopedFileDescriptorTest, ClosesNothingThatIsClosedAlready) {
    {
        TypeParam owner(FileDescriptor(5000));
        EXPECT_TRUE(owner.close());
        EXPECT_EQ(-1, owner._osdep);
    }
    EXPECT_EQ(1u, this->closes());
}

TYPED_TEST(ScopedFileDescriptorTest, CopiesShareTheNumberAndEachCloses) {
    {
        const TypeParam owner(FileDescriptor(5000));
        const TypeParam copy(owner);
        EXPECT_EQ(5000, owner._osdep);
        EXPECT_EQ(5000, copy._osdep);
    }
    EXPECT_EQ(2u, this->closes());
}

TYPED_TEST(ScopedFileDescriptorTest, AssignmentClosesFirstAndTakesTheNumber) {
    {
        TypeParam owner(FileDescriptor(5000));
        const FileDescriptor plain(5001);
        EXPECT_EQ(&owner, &(owner = plain));
        EXPECT_EQ(5001, owner._osdep);
        EXPECT_EQ(1u, this->closes());

        const TypeParam other(FileDescriptor(5002));
        EXPECT_EQ(&owner, &(owner = other));
        EXPECT_EQ(5002, owner._osdep);
        EXPECT_EQ(5002, other._osdep);
        EXPECT_EQ(2u, this->closes());

        owner = FileDescriptor(-1);
        EXPECT_EQ(3u, this->closes());
        owner = FileDescriptor(5003);
        EXPECT_EQ(3u, this->closes());
    }
    EXPECT_EQ(5u, this->closes());
}

TYPED_TEST(ScopedFileDescriptorTest, AssignmentToItselfChangesNothing) {
    TypeParam owner(FileDescriptor(5000));
    const TypeParam& itself = owner;
    const FileDescriptor& plainItself = owner;
    owner = itself;
    owner = plainItself;
    EXPECT_EQ(5000, owner._osdep);
    EXPECT_EQ(0u, this->closes());
}

TYPED_TEST(ScopedFileDescriptorTest, AnotherObjectWithTheSameNumberIsNotItself) {
    TypeParam owner(FileDescriptor(5000));
    const FileDescriptor plain(5000);
    owner = plain;
    EXPECT_EQ(1u, this->closes());
    const TypeParam copy(owner);
    owner = copy;
    EXPECT_EQ(2u, this->closes());
    EXPECT_EQ(5000, owner._osdep);
}

TYPED_TEST(ScopedFileDescriptorTest, AssignmentKeepsErrnoWhenTheCloseFails) {
    ScriptedCalls failing("close");
    failing.fail(EIO).give(0, 10);
    TypeParam owner(FileDescriptor(5000));
    errno = ENOENT;
    owner = FileDescriptor(5001);
    EXPECT_EQ(ENOENT, errno);
    EXPECT_EQ(5001, owner._osdep);
    owner.close();
}

}  // namespace
