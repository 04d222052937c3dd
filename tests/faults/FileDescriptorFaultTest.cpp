#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <new>
#include <string>

#include "support/AllocationProbe.h"
#include "support/ScriptedLibc.h"
#include "support/TempDir.h"
#include "util/FileDescriptor.h"

namespace {

using testing::ElementsAre;

// A file to read, and one to write.
class FileDescriptorFaultTest : public testing::Test {
protected:
    void input(const std::string& text) {
        writeFile(_from, text);
        _in = _from.openReadOnly();
    }
    std::string output() const { return readFile(_to); }

    const TempDir _dir;
    const Pathname _from{_dir.file("in")};
    const Pathname _to{_dir.file("out")};
    ScopedFileDescriptor _in;
    const ScopedFileDescriptor _out{_to.openCreateOnly(Pathname::CREATE_NORMAL)};
};

TEST_F(FileDescriptorFaultTest, TransfersGoOnAfterShortCountsAndInterruptions) {
    ScriptedCalls writes("write"), reads("read");
    writes.fail(EINTR, 3).limit(1).fail(EINTR).limit(4).fail(EINTR);
    RecordedCalls seen;
    EXPECT_EQ(10, _out.write("0123456789"));
    EXPECT_THAT(seen.calls(), ElementsAre("write 10", "write 10", "write 10", "write 10", "write 9",
                                          "write 9", "write 5", "write 5"));
    EXPECT_EQ("0123456789", output());

    input("0123456789");
    reads.fail(EINTR, 2).limit(3).fail(EINTR).limit(1);
    seen.clear();
    char buf[10] = {};
    EXPECT_EQ(10, _in.read(buf, sizeof buf));
    EXPECT_THAT(seen.calls(),
                ElementsAre("read 10", "read 10", "read 10", "read 7", "read 7", "read 6"));
    EXPECT_EQ("0123456789", std::string(buf, sizeof buf));
}

TEST_F(FileDescriptorFaultTest, AnErrorAfterSomeBytesIsAShortCount) {
    input("abcdef");
    for (const int error : {ENOSPC, EIO, EAGAIN}) {
        ScriptedCalls writes("write"), reads("read");
        writes.limit(2).limit(1).fail(EINTR).fail(error);
        EXPECT_EQ(3, _out.write("abcdef"));
        EXPECT_EQ(4u, writes.calls());
        reads.limit(1).fail(error);
        char buf[6];
        EXPECT_EQ(1, _in.read(buf, sizeof buf));
        EXPECT_EQ(2u, reads.calls());
    }
    EXPECT_EQ("abcabcabc", output());
}

TEST_F(FileDescriptorFaultTest, AnErrorBeforeTheFirstByteIsReported) {
    char byte;
    for (const int error : {ENOSPC, EIO, EAGAIN, EBADF}) {
        ScriptedCalls writes("write"), reads("read");
        writes.fail(EINTR).fail(error);
        reads.fail(EINTR).fail(error);
        errno = 0;
        EXPECT_EQ(-1, _out.write("abc"));
        EXPECT_EQ(error, errno);
        errno = 0;
        EXPECT_EQ(-1, _out.read(&byte, 1));
        EXPECT_EQ(error, errno);
        EXPECT_EQ(2u, writes.calls());
        EXPECT_EQ(2u, reads.calls());
    }
}

TEST_F(FileDescriptorFaultTest, AZeroCountEndsTheTransfer) {
    ScriptedCalls writes("write");
    writes.limit(2).give(0).give(0);
    EXPECT_EQ(2, _out.write("abc"));
    EXPECT_EQ(0, _out.write("abc"));
    EXPECT_EQ(3u, writes.calls());
}

TEST_F(FileDescriptorFaultTest, ATransferOfNothingIsStillACall) {
    ScriptedCalls writes("write");
    writes.pass().fail(EPERM);
    EXPECT_EQ(0, _out.write("", 0));
    EXPECT_EQ(-1, _out.write(std::string()));
    EXPECT_EQ(EPERM, errno);
}

TEST_F(FileDescriptorFaultTest, WritevAndSyncAreNotRepeated) {
    const struct iovec none = {nullptr, 0};
    ScriptedCalls writevs("writev"), syncs("fsync");
    writevs.fail(EINTR).give(1);
    syncs.fail(EINTR);
    const RecordedCalls seen;
    EXPECT_EQ(-1, _out.writev(&none, 1));
    EXPECT_EQ(EINTR, errno);
    EXPECT_EQ(1, _out.writev(&none, 2));
    _out.sync();
    EXPECT_THAT(seen.calls(), ElementsAre("writev 1", "writev 2", "fsync"));
}

TEST_F(FileDescriptorFaultTest, CloseOnExecIsSetOnlyIfItChanges) {
    const struct {
        bool on;
        int flags;  // what the first call returns
        unsigned calls;
    } rows[] = {{false, 0, 1},          {true, 0, 2},  {true, FD_CLOEXEC, 1},
                {false, FD_CLOEXEC, 2}, {true, -1, 1}, {true, FD_CLOEXEC | 0x40, 1},
                {false, 0x40, 1}};
    for (const auto& row : rows) {
        ScriptedCalls calls("fcntl");
        calls.give(row.flags);
        int set = -1;
        const Replacement fcntl(replacement::fcntl,
                                [&](int, int, int value) { return set = value; });
        _out.setCloseOnExec(row.on);
        EXPECT_EQ(row.calls, calls.calls()) << row.flags;
        EXPECT_EQ(row.calls == 1 ? -1 : row.flags ^ FD_CLOEXEC, set) << row.flags;
    }
}

TEST_F(FileDescriptorFaultTest, SizeIsUntouchedWhenFstatFails) {
    ScriptedCalls stats("fstat");
    stats.fail(EIO, 2);
    long long size = 7;
    struct stat info;
    EXPECT_FALSE(_out.getSize(&size));
    EXPECT_FALSE(_out.stat(&info));
    EXPECT_EQ(EIO, errno);
    EXPECT_EQ(7, size);
}

// --- Formatting ----------------------------------------------------------------------------------

TEST_F(FileDescriptorFaultTest, AShortTextIsFormattedOnceAndAllocatesNothing) {
    REQUIRE_ALLOCATION_PROBE();
    for (const std::size_t length : {255u, 256u}) {
        const std::string text(length, 'x');
        AllocationProbe allocations;
        _out.format("%s", text.c_str());
        allocations.stop();
        EXPECT_EQ(length - 255, allocations.count());
        EXPECT_EQ(0, allocations.live());
    }
    EXPECT_EQ(std::string(511, 'x'), output());
}

TEST_F(FileDescriptorFaultTest, ATextThatDoesNotFitIsFormattedAgain) {
    ScriptedCalls passes("vsnprintf");
    // A buffer doubles after a negative result, and otherwise gets the exact size.
    passes.fail(EOVERFLOW, 2).give(1300).fail(EOVERFLOW).give(2602).pass();
    const RecordedCalls seen;
    _out.format("%d-%s-%d", 1, "two", 3);
    EXPECT_THAT(seen.calls(),
                ElementsAre("vsnprintf 256", "vsnprintf 512", "vsnprintf 1024", "vsnprintf 1301",
                            "vsnprintf 2602", "vsnprintf 2603", "write 7"));
    EXPECT_EQ("1-two-3", output());
}

TEST_F(FileDescriptorFaultTest, AFailedAllocationIsThrownAndWritesNothing) {
    REQUIRE_ALLOCATION_PROBE();
    for (const std::size_t n : {1u, 2u, 11u}) {
        // A formatter that never succeeds needs one more buffer each time.
        ScriptedCalls passes("vsnprintf");
        passes.fail(EILSEQ, 100);
        const FailedAllocation result = failAllocation(n, [&] { _out.format("text"); });
        EXPECT_TRUE(result.thrown);
        EXPECT_EQ(0, result.live);
        EXPECT_EQ(n, passes.calls());
    }
    EXPECT_EQ("", output());
}

TEST_F(FileDescriptorFaultTest, FormattedWritesIgnoreTheirErrors) {
    ScriptedCalls writes("write");
    writes.fail(ENOSPC).limit(2).fail(EINTR).fail(ENOSPC);
    _out.format("%s", "abc");
    _out.format("%s", "abc");
    EXPECT_EQ("ab", output());
}

// --- Copying -------------------------------------------------------------------------------------

TEST_F(FileDescriptorFaultTest, CopiesInChunksWithoutTheHeap) {
    REQUIRE_ALLOCATION_PROBE();
    input(std::string(20000, 'x'));
    {
        const AllocationProbe allocations;
        EXPECT_TRUE(_in.copyTo(_out));
        EXPECT_EQ(0u, allocations.count());
    }
    EXPECT_EQ(std::string(20000, 'x'), output());
    EXPECT_TRUE(_in.seek_set(0));
    const RecordedCalls seen;
    EXPECT_TRUE(_in.copyTo(_out));
    // The third read is short, so it is repeated and meets the end of the file; the last returns 0.
    EXPECT_THAT(seen.calls(), ElementsAre("read 8192", "write 8192", "read 8192", "write 8192",
                                          "read 8192", "read 4576", "write 3616", "read 8192"));
}

TEST_F(FileDescriptorFaultTest, CopiesThroughShortCountsAndErrorsThatPass) {
    const std::string text = std::string(9000, 'x') + "end";
    input(text);
    ScriptedCalls reads("read"), writes("write");
    reads.limit(5).fail(EINTR).limit(8000).fail(EINTR, 2).limit(1);
    writes.limit(100).fail(EINTR).limit(1).fail(EINTR).limit(1).fail(EAGAIN);
    EXPECT_TRUE(_in.copyTo(_out));
    EXPECT_EQ(text, output());
}

TEST_F(FileDescriptorFaultTest, CopyStopsAtTheFirstFailure) {
    const struct {
        const char* function;
        int error;  // 0: a write of nothing, which is taken for a full device
        std::size_t copied;
    } rows[] = {{"read", EIO, 8192}, {"write", EFBIG, 8202}, {"write", 0, 8202}};
    for (const auto& row : rows) {
        input(std::string(20000, 'x'));
        EXPECT_TRUE(_to.truncate(0) && _out.seek_set(0));
        ScriptedCalls calls(row.function);
        calls.pass();
        if (row.function == std::string("write")) {
            calls.limit(10);
        }
        if (row.error == 0) {
            calls.give(0, 2);
        } else {
            calls.fail(row.error, 2);
        }
        errno = 0;
        EXPECT_FALSE(_in.copyTo(_out)) << row.function;
        EXPECT_EQ(row.error == 0 ? ENOSPC : row.error, errno);
        EXPECT_EQ(std::string(row.copied, 'x'), output());
    }
}

TEST_F(FileDescriptorFaultTest, ClosingTheDestinationChangesNeitherTheResultNorErrno) {
    input("text");
    for (const int error : {0, EFBIG}) {
        ScriptedCalls writes("write"), closes("close");
        closes.fail(EIO, 3);
        if (error != 0) {
            writes.fail(error, 4);
        }
        errno = 0;
        EXPECT_EQ(error == 0, _in.copyTo(_to));
        EXPECT_EQ(error, errno);
        EXPECT_EQ(1u, closes.calls());
        EXPECT_EQ(error == 0, _from.copyTo(_to));
        EXPECT_EQ(error, errno);
        EXPECT_EQ(3u, closes.calls());
        EXPECT_TRUE(_in.seek_set(0));
    }
}

TEST_F(FileDescriptorFaultTest, CopyOpensNoDestinationIfTheSourceCannotBeExamined) {
    input("text");
    ScriptedCalls stats("fstat");
    stats.fail(EIO);
    EXPECT_FALSE(FileDescriptor(-1).copyTo(_dir.file("new")));
    EXPECT_EQ(0u, stats.calls());
    EXPECT_FALSE(_in.copyTo(_dir.file("new")));
    EXPECT_EQ(EIO, errno);
    EXPECT_FALSE(Pathname(_dir.file("new")).exists());
}

// --- Closing -------------------------------------------------------------------------------------

TEST_F(FileDescriptorFaultTest, CloseIsNeverRepeatedAndAlwaysForgetsTheNumber) {
    for (const int error : {EINTR, EIO, EBADF}) {
        ScriptedCalls closes("close");
        closes.fail(error);
        FileDescriptor file(5000);
        errno = 0;
        EXPECT_FALSE(file.close());
        EXPECT_EQ(error, errno);
        EXPECT_EQ(-1, file._osdep);
        EXPECT_TRUE(file.close());
        EXPECT_TRUE(FileDescriptor(-2).close());
        EXPECT_EQ(1u, closes.calls());
    }
}

template <typename Scoped>
class ScopedFileDescriptorFaultTest : public testing::Test {
protected:
    // No descriptor here is real. Every close fails and sets errno.
    ScopedFileDescriptorFaultTest() { _closes.fail(EIO, 100); }
    unsigned closes() const { return _closes.calls(); }

private:
    ScriptedCalls _closes{"close"};
};

using ScopedTypes = testing::Types<ScopedFileDescriptor, ScopedSaferFileDescriptor>;
TYPED_TEST_SUITE(ScopedFileDescriptorFaultTest, ScopedTypes);

TYPED_TEST(ScopedFileDescriptorFaultTest, ClosesAtTheEndOfItsScopeAndKeepsErrno) {
    {
        const TypeParam none;
        const TypeParam owner(FileDescriptor(5000));
        EXPECT_EQ(0u, this->closes());
        errno = ENOENT;
    }
    EXPECT_EQ(1u, this->closes());
    EXPECT_EQ(ENOENT, errno);
}

TYPED_TEST(ScopedFileDescriptorFaultTest, ClosesNothingThatIsClosedAlready) {
    {
        TypeParam owner(FileDescriptor(5000));
        EXPECT_FALSE(owner.close());
        EXPECT_EQ(-1, owner._osdep);
    }
    EXPECT_EQ(1u, this->closes());
}

TYPED_TEST(ScopedFileDescriptorFaultTest, CopiesShareTheNumberAndEachCloses) {
    {
        const TypeParam owner(FileDescriptor(5000));
        const TypeParam copy(owner);
        EXPECT_EQ(5000, owner._osdep);
        EXPECT_EQ(5000, copy._osdep);
    }
    EXPECT_EQ(2u, this->closes());
}

TYPED_TEST(ScopedFileDescriptorFaultTest, AssignmentClosesFirstKeepsErrnoAndTakesTheNumber) {
    {
        TypeParam owner(FileDescriptor(5000));
        const FileDescriptor plain(5001), same(5001);
        const TypeParam other(FileDescriptor(5002));
        errno = ENOENT;
        EXPECT_EQ(&owner, &(owner = plain));
        EXPECT_EQ(5001, owner._osdep);
        EXPECT_EQ(1u, this->closes());
        owner = same;  // another object with the same number
        EXPECT_EQ(2u, this->closes());
        EXPECT_EQ(&owner, &(owner = other));
        EXPECT_EQ(5002, owner._osdep);
        EXPECT_EQ(3u, this->closes());
        owner = FileDescriptor(-1);
        EXPECT_EQ(4u, this->closes());
        owner = FileDescriptor(5003);
        EXPECT_EQ(4u, this->closes());
        EXPECT_EQ(ENOENT, errno);
    }
    EXPECT_EQ(6u, this->closes());
}

TYPED_TEST(ScopedFileDescriptorFaultTest, AssignmentToItselfChangesNothing) {
    TypeParam owner(FileDescriptor(5000));
    const TypeParam& itself = owner;
    const FileDescriptor& plainItself = owner;
    owner = itself;
    owner = plainItself;
    EXPECT_EQ(5000, owner._osdep);
    EXPECT_EQ(0u, this->closes());
}

}  // namespace
