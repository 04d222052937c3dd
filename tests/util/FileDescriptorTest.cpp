#include "util/FileDescriptor.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/uio.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <string>
#include <thread>
#include <type_traits>

#include "support/TempDir.h"

namespace {

std::string pattern(std::size_t size) {
    std::string text(size, '\0');
    for (std::size_t i = 0; i < size; ++i) {
        text[i] = static_cast<char>('a' + i % 23);
    }
    return text;
}

bool isOpen(int descriptor) {
    return ::fcntl(descriptor, F_GETFD) != -1;
}

mode_t permissions(const Pathname& path) {
    struct stat info;
    EXPECT_TRUE(path.stat(&info)) << path;
    return info.st_mode & 07777;
}

// Two ends of a pipe; write errors come back instead of a signal.
struct Pipe {
    Pipe() {
        int ends[2];
        EXPECT_EQ(0, ::pipe(ends));
        in = ends[0];
        out = ends[1];
    }
    ScopedFileDescriptor in, out;
};

// The umask of a scope.
struct Umask {
    explicit Umask(mode_t mask) : previous(::umask(mask)) {}
    ~Umask() { ::umask(previous); }
    const mode_t previous;
};

TEST(FileDescriptorTest, IsANumberAndNoMore) {
    EXPECT_EQ(sizeof(int), sizeof(FileDescriptor));
    EXPECT_EQ(sizeof(int), sizeof(ScopedFileDescriptor));
    EXPECT_EQ(sizeof(int), sizeof(ScopedSaferFileDescriptor));
    EXPECT_TRUE(std::is_trivially_destructible_v<FileDescriptor>);
    EXPECT_FALSE(std::is_polymorphic_v<FileDescriptor>);
}

TEST(FileDescriptorTest, IsValidUnlessNegative) {
    EXPECT_TRUE(FileDescriptor(0).valid());
    EXPECT_TRUE(FileDescriptor(7).valid());
    EXPECT_FALSE(FileDescriptor(-1).valid());
    EXPECT_FALSE(FileDescriptor(-7).valid());
}

TEST(FileDescriptorTest, ANumberServesForADescriptor) {
    EXPECT_TRUE((std::is_convertible_v<int, FileDescriptor>));
    FileDescriptor file = -1;
    EXPECT_FALSE(file.valid());
    file = 7;
    EXPECT_EQ(7, file._osdep);
}

TEST(FileDescriptorTest, ResultsHaveTheirTypes) {
    const FileDescriptor none(-1);
    const Pathname path;
    EXPECT_TRUE((std::is_same_v<ssize_t, decltype(none.read(nullptr, 0))>));
    EXPECT_TRUE((std::is_same_v<ssize_t, decltype(none.write(nullptr, 0))>));
    EXPECT_TRUE((std::is_same_v<ssize_t, decltype(none.write(std::string()))>));
    EXPECT_TRUE((std::is_same_v<ssize_t, decltype(none.writev(nullptr, 0u))>));
    EXPECT_TRUE((std::is_same_v<void, decltype(none.format("x"))>));
    EXPECT_TRUE((std::is_same_v<void, decltype(none.setCloseOnExec(true))>));
    EXPECT_TRUE((std::is_same_v<bool, decltype(none.seek_set(0))>));
    EXPECT_TRUE((std::is_same_v<long long, decltype(none.seekEof())>));
    EXPECT_TRUE((std::is_same_v<long long, decltype(none.curPos())>));
    EXPECT_TRUE((std::is_same_v<void, decltype(none.sync())>));
    EXPECT_TRUE((std::is_same_v<bool, decltype(none.copyTo(none))>));
    EXPECT_TRUE((std::is_same_v<bool, decltype(none.copyTo(path))>));
    EXPECT_TRUE((std::is_same_v<FileDescriptor, decltype(path.openReadOnly())>));
    EXPECT_TRUE((std::is_same_v<int, decltype(none._osdep)>));
}

TEST(FileDescriptorTest, CopiesTheNumberAndClosesNothing) {
    const TempDir dir;
    FileDescriptor file = Pathname(dir.file("a")).openCreateOnly(Pathname::CREATE_NORMAL);
    {
        const FileDescriptor copy(file);
        FileDescriptor assigned(-1);
        assigned = file;
        EXPECT_EQ(file._osdep, copy._osdep);
        EXPECT_EQ(file._osdep, assigned._osdep);
    }
    EXPECT_TRUE(isOpen(file._osdep));
    EXPECT_TRUE(file.close());
}

TEST(FileDescriptorTest, ReadsToTheEndOfTheFile) {
    const TempDir dir;
    writeFile(dir.file("a"), "hello");
    const ScopedFileDescriptor file{Pathname(dir.file("a"))};
    char buf[] = "..........";
    EXPECT_EQ(2, file.read(buf, 2));
    EXPECT_STREQ("he........", buf);
    EXPECT_EQ(0, file.read(buf, 0));
    EXPECT_EQ(3, file.read(buf, 10));
    EXPECT_STREQ("llo.......", buf);
    EXPECT_EQ(0, file.read(buf, 10));
}

TEST(FileDescriptorTest, WritesBytesAndStrings) {
    const TempDir dir;
    const Pathname path = dir.file("a");
    const ScopedFileDescriptor file = path.openCreateOnly(Pathname::CREATE_NORMAL);
    EXPECT_EQ(3, file.write("abcdef", 3));
    EXPECT_EQ(0, file.write("abcdef", 0));
    EXPECT_EQ(4, file.write(std::string("d\0ef", 4)));
    EXPECT_EQ(0, file.write(std::string()));
    EXPECT_EQ(std::string("abcd\0ef", 7), readFile(path));
}

TEST(FileDescriptorTest, WritesSeveralBuffersAtOnce) {
    const TempDir dir;
    const Pathname path = dir.file("a");
    const ScopedFileDescriptor file = path.openCreateOnly(Pathname::CREATE_NORMAL);
    std::string first = "ab", second = "cde";
    const struct iovec buffers[] = {{first.data(), first.size()}, {second.data(), second.size()}};
    EXPECT_EQ(5, file.writev(buffers, 2));
    EXPECT_EQ(2, file.writev(buffers, 1));
    EXPECT_EQ("abcdeab", readFile(path));
}

TEST(FileDescriptorTest, OperationsOnNoFileFailWithEbadf) {
    const FileDescriptor none(-1);
    char buf[4];
    struct stat info;
    long long size = 7;
    const struct iovec buffer = {buf, sizeof buf};
    const auto refused = [](bool failed) {
        const bool result = failed && errno == EBADF;
        errno = 0;
        return result;
    };
    errno = 0;
    EXPECT_TRUE(refused(none.read(buf, sizeof buf) == -1));
    EXPECT_TRUE(refused(none.write(buf, 0) == -1));
    EXPECT_TRUE(refused(none.write("text") == -1));
    EXPECT_TRUE(refused(none.writev(&buffer, 1) == -1));
    EXPECT_TRUE(refused(!none.stat(&info)));
    EXPECT_TRUE(refused(!none.getSize(&size)));
    EXPECT_TRUE(refused(!none.seek_set(0)));
    EXPECT_TRUE(refused(none.seekEof() == -1));
    EXPECT_TRUE(refused(none.curPos() == -1));
    EXPECT_TRUE(refused(!none.copyTo(FileDescriptor(-1))));
    EXPECT_EQ(7, size);
    none.format("%d", 5);
    none.setCloseOnExec(true);
    none.sync();
    EXPECT_FALSE(none.copyTo(Pathname("/dev/null")));
}

TEST(FileDescriptorTest, OperationsOnAClosedDescriptorFail) {
    const TempDir dir;
    FileDescriptor file = Pathname(dir.file("a")).openReadWriteOrCreate(Pathname::CREATE_NORMAL);
    const FileDescriptor stale(file);
    ASSERT_TRUE(file.close());
    char byte = 0;
    EXPECT_EQ(-1, stale.write(&byte, 1));
    EXPECT_EQ(EBADF, errno);
    EXPECT_EQ(-1, stale.read(&byte, 1));
    FileDescriptor again(stale);
    EXPECT_FALSE(again.close());
    EXPECT_EQ(-1, again._osdep);
}

TEST(FileDescriptorTest, CreateOnlyFailsOnAnExistingFile) {
    const TempDir dir;
    const Pathname path = dir.file("a");
    EXPECT_TRUE(ScopedFileDescriptor(path.openCreateOnly(Pathname::CREATE_NORMAL)).valid());
    EXPECT_EQ(-1, path.openCreateOnly(Pathname::CREATE_NORMAL)._osdep);
    EXPECT_EQ(EEXIST, errno);
}

TEST(FileDescriptorTest, CreateOrReplaceEmptiesAndAppendKeeps) {
    const TempDir dir;
    const Pathname path = dir.file("a");
    const auto openAppend = [&] { return path.openCreateOrAppend(Pathname::CREATE_NORMAL); };
    EXPECT_EQ(3, ScopedFileDescriptor(openAppend()).write("one"));
    EXPECT_EQ(3, ScopedFileDescriptor(openAppend()).write("two"));
    EXPECT_EQ("onetwo", readFile(path));
    const ScopedFileDescriptor file = path.openCreateOrReplace(Pathname::CREATE_NORMAL);
    EXPECT_EQ("", readFile(path));
    char byte;
    EXPECT_EQ(-1, file.read(&byte, 1));
}

TEST(FileDescriptorTest, AppendGoesToTheEndWhereverTheOffsetIs) {
    const TempDir dir;
    const Pathname path = dir.file("a");
    writeFile(path, "1234");
    const ScopedFileDescriptor file = path.openCreateOrAppend(Pathname::CREATE_NORMAL);
    EXPECT_TRUE(file.seek_set(0));
    EXPECT_EQ(1, file.write("5"));
    EXPECT_EQ("12345", readFile(path));
}

TEST(FileDescriptorTest, ReadWriteOrCreateEmptiesAnExistingFile) {
    const TempDir dir;
    const Pathname path = dir.file("a");
    writeFile(path, "old text");
    const ScopedFileDescriptor file = path.openReadWriteOrCreate(Pathname::CREATE_NORMAL);
    EXPECT_EQ("", readFile(path));
    EXPECT_EQ(3, file.write("new"));
    EXPECT_TRUE(file.seek_set(0));
    char buf[3];
    EXPECT_EQ(3, file.read(buf, sizeof buf));
    EXPECT_EQ("new", std::string(buf, 3));
}

TEST(FileDescriptorTest, NewFilesHaveTheirModeReducedByTheUmask) {
    const TempDir dir;
    const Umask mask(0026);
    const struct {
        Pathname::CreateMode mode;
        mode_t expected;
    } rows[] = {{Pathname::CREATE_NORMAL, 0640},
                {Pathname::CREATE_PRIVATE, 0600},
                {Pathname::CREATE_READABLE_NONPUBLIC, 0440}};
    for (const auto& row : rows) {
        const Pathname path = dir.file("mode" + std::to_string(row.mode));
        EXPECT_TRUE(ScopedFileDescriptor(path.openCreateOrAppend(row.mode)).valid());
        EXPECT_EQ(row.expected, permissions(path));
    }
}

TEST(FileDescriptorTest, OpenedDescriptorsSurviveExecUntilToldOtherwise) {
    const TempDir dir;
    const ScopedFileDescriptor file =
        Pathname(dir.file("a")).openCreateOnly(Pathname::CREATE_NORMAL);
    EXPECT_EQ(0, ::fcntl(file._osdep, F_GETFD));
    file.setCloseOnExec(true);
    EXPECT_EQ(FD_CLOEXEC, ::fcntl(file._osdep, F_GETFD));
    file.setCloseOnExec(true);
    EXPECT_EQ(FD_CLOEXEC, ::fcntl(file._osdep, F_GETFD));
    file.setCloseOnExec(false);
    EXPECT_EQ(0, ::fcntl(file._osdep, F_GETFD));
}

TEST(FileDescriptorTest, SaferOpenDoesNotHangOnAFifo) {
    const TempDir dir;
    const Pathname fifo = dir.file("fifo");
    ASSERT_EQ(0, ::mkfifo(fifo.c_str(), 0600));
    const ScopedSaferFileDescriptor in(fifo);
    ASSERT_TRUE(in.valid());
    EXPECT_NE(0, ::fcntl(in._osdep, F_GETFL) & O_NONBLOCK);
    char byte;
    EXPECT_EQ(0, in.read(&byte, 1));

    // It stays non-blocking: with a writer and no data, reading fails instead of waiting.
    const ScopedFileDescriptor out = fifo.openCreateOrAppend(Pathname::CREATE_NORMAL);
    EXPECT_EQ(-1, in.read(&byte, 1));
    EXPECT_EQ(EAGAIN, errno);
}

TEST(FileDescriptorTest, SeeksAndMeasures) {
    const TempDir dir;
    const ScopedFileDescriptor file =
        Pathname(dir.file("a")).openReadWriteOrCreate(Pathname::CREATE_NORMAL);
    EXPECT_EQ(0, file.curPos());
    EXPECT_EQ(5, file.write("12345"));
    EXPECT_EQ(5, file.curPos());
    EXPECT_TRUE(file.seek_set(2));
    EXPECT_EQ(2, file.curPos());
    EXPECT_FALSE(file.seek_set(-1));
    EXPECT_EQ(EINVAL, errno);
    EXPECT_EQ(2, file.curPos());
    EXPECT_EQ(5, file.seekEof());
    long long size = 0;
    struct stat info;
    EXPECT_TRUE(file.getSize(&size));
    EXPECT_TRUE(file.stat(&info));
    EXPECT_EQ(5, size);
    EXPECT_EQ(5, info.st_size);
    file.sync();
}

TEST(FileDescriptorTest, SeeksPastFourGigabytes) {
    constexpr long long offset = 5LL << 30;
    const TempDir dir;
    const Pathname path = dir.file("sparse");
    const ScopedFileDescriptor file = path.openReadWriteOrCreate(Pathname::CREATE_NORMAL);
    EXPECT_TRUE(file.seek_set(offset));
    EXPECT_EQ(offset, file.curPos());
    EXPECT_EQ(1, file.write("x"));
    EXPECT_EQ(offset + 1, file.seekEof());
    long long size = 0;
    EXPECT_TRUE(file.getSize(&size));
    EXPECT_EQ(offset + 1, size);
    EXPECT_TRUE(file.seek_set(offset));
    char byte = 0;
    EXPECT_EQ(1, file.read(&byte, 1));
    EXPECT_EQ('x', byte);
}

TEST(FileDescriptorTest, APipeCannotSeek) {
    const Pipe pipe;
    EXPECT_FALSE(pipe.in.seek_set(0));
    EXPECT_EQ(ESPIPE, errno);
    EXPECT_EQ(-1, pipe.in.seekEof());
    EXPECT_EQ(-1, pipe.in.curPos());
}

TEST(FileDescriptorTest, FormatsTextsAroundItsStackBuffer) {
    const TempDir dir;
    for (const int length : {0, 1, 254, 255, 256, 257, 511, 512, 5000}) {
        const Pathname path = dir.file(std::to_string(length));
        const std::string text = pattern(static_cast<std::size_t>(length));
        ScopedFileDescriptor(path.openCreateOnly(Pathname::CREATE_NORMAL))
            .format("%s", text.c_str());
        EXPECT_EQ(text, readFile(path)) << length;
    }
}

TEST(FileDescriptorTest, FormatsAllItsArgumentsOnEveryPass) {
    const TempDir dir;
    const Pathname path = dir.file("a");
    const std::string text = pattern(300);
    ScopedFileDescriptor(path.openCreateOnly(Pathname::CREATE_NORMAL))
        .format("%d|%s|%c%c|%5.2f", 42, text.c_str(), 'x', '\0', 2.5);
    EXPECT_EQ("42|" + text + "|x" + std::string(1, '\0') + "| 2.50", readFile(path));
}

// As a wrapper of the caller's own would use it; writes the text twice.
__attribute__((format(printf, 2, 3))) void formatTwice(const FileDescriptor& file, const char* fmt,
                                                       ...) {
    std::va_list args;
    va_start(args, fmt);
    file.vformat(fmt, args);
    file.vformat(fmt, args);
    va_end(args);
}

TEST(FileDescriptorTest, VformatLeavesTheArgumentsToItsCaller) {
    const TempDir dir;
    const Pathname path = dir.file("a");
    const std::string text = pattern(300);
    const ScopedFileDescriptor file = path.openCreateOnly(Pathname::CREATE_NORMAL);
    formatTwice(file, "%d %s;", 5, "short");
    formatTwice(file, "%s", text.c_str());
    EXPECT_EQ("5 short;5 short;" + text + text, readFile(path));
}

TEST(FileDescriptorTest, CopiesFromTheOffsetToTheEnd) {
    const TempDir dir;
    const Pathname from = dir.file("from"), to = dir.file("to");
    for (const std::size_t size : {0u, 1u, 8191u, 8192u, 8193u, 16384u, 100000u}) {
        const std::string text = pattern(size);
        writeFile(from, text);
        const ScopedFileDescriptor in(from);
        EXPECT_TRUE(in.copyTo(to)) << size;
        EXPECT_EQ(text, readFile(to));
        EXPECT_TRUE(in.copyTo(to)) << "nothing is left";
        EXPECT_EQ("", readFile(to));
        EXPECT_TRUE(in.seek_set(static_cast<long long>(size / 2)));
        EXPECT_TRUE(in.copyTo(to)) << size;
        EXPECT_EQ(text.substr(size / 2), readFile(to));
    }
}

TEST(FileDescriptorTest, CopiesToADestinationOfAnyKind) {
    const TempDir dir;
    const Pathname from = dir.file("from"), to = dir.file("to");
    writeFile(from, "text");
    const ScopedFileDescriptor out = to.openCreateOnly(Pathname::CREATE_NORMAL);
    const FileDescriptor plain(out);
    EXPECT_TRUE(ScopedFileDescriptor(from).copyTo(out));
    EXPECT_TRUE(ScopedFileDescriptor(from).copyTo(plain));
    EXPECT_TRUE(ScopedFileDescriptor(from).copyTo(out._osdep));
    EXPECT_EQ("texttexttext", readFile(to));
    for (const char* name : {"literal", "string", "path"}) {
        const std::string copy = dir.file(name);
        EXPECT_TRUE(ScopedFileDescriptor(from).copyTo(copy.c_str()));
        EXPECT_TRUE(ScopedFileDescriptor(from).copyTo(copy));
        EXPECT_TRUE(ScopedFileDescriptor(from).copyTo(Pathname(copy)));
        EXPECT_EQ("text", readFile(copy));
    }
}

TEST(FileDescriptorTest, CopyingNothingNeedsNoDestination) {
    EXPECT_TRUE(ScopedFileDescriptor(Pathname("/dev/null")).copyTo(FileDescriptor(-1)));
}

TEST(FileDescriptorTest, CopiesThroughPipes) {
    const TempDir dir;
    const Pathname to = dir.file("to");
    const std::string text = pattern(300000);
    Pipe first, second;
    std::thread feed([&] {
        EXPECT_EQ(300000, first.out.write(text));
        EXPECT_TRUE(first.out.close());
    });
    std::thread relay([&] {
        EXPECT_TRUE(first.in.copyTo(second.out));
        EXPECT_TRUE(second.out.close());
    });
    EXPECT_TRUE(second.in.copyTo(to));
    feed.join();
    relay.join();
    EXPECT_EQ(text, readFile(to));
}

TEST(FileDescriptorTest, ACopyHasItsSourcesPermissionsAndReplacesTheDestination) {
    const TempDir dir;
    const Umask mask(0);
    const Pathname from = dir.file("from"), fresh = dir.file("fresh"), old = dir.file("old");
    writeFile(from, "text");
    writeFile(old, "a much longer text");
    ASSERT_EQ(0, ::chmod(from.c_str(), 0651));
    ASSERT_EQ(0, ::chmod(old.c_str(), 0600));
    EXPECT_TRUE(ScopedFileDescriptor(from).copyTo(fresh));
    EXPECT_TRUE(from.copyTo(old));
    EXPECT_EQ("text", readFile(fresh));
    EXPECT_EQ("text", readFile(old));
    EXPECT_EQ(mode_t{0651}, permissions(fresh));
    EXPECT_EQ(mode_t{0600}, permissions(old)) << "an existing file keeps its own";

    const Umask tighter(0077);
    EXPECT_TRUE(fresh.unlink() && from.copyTo(fresh));
    EXPECT_EQ(mode_t{0600}, permissions(fresh));
}

TEST(FileDescriptorTest, CopyFailsWithoutASourceOrADestination) {
    const TempDir dir;
    const Pathname from = dir.file("from"), to = dir.file("to"), nowhere = dir.file("no/where");
    EXPECT_FALSE(from.copyTo(to));
    EXPECT_EQ(ENOENT, errno);
    EXPECT_FALSE(to.exists());
    writeFile(from, "text");
    errno = 0;
    EXPECT_FALSE(from.copyTo(nowhere));
    EXPECT_EQ(ENOENT, errno);
    errno = 0;
    EXPECT_FALSE(Pathname(dir.path()).copyTo(to)) << "a folder opens, but does not read";
    EXPECT_EQ(EISDIR, errno);
}

TEST(FileDescriptorTest, AFullDeviceStopsWritingAndCopying) {
    const TempDir dir;
    const Pathname from = dir.file("from");
    writeFile(from, pattern(10000));
    const ScopedFileDescriptor full =
        Pathname("/dev/full").openCreateOrAppend(Pathname::CREATE_NORMAL);
    ASSERT_TRUE(full.valid());
    errno = 0;
    EXPECT_EQ(-1, full.write("x"));
    EXPECT_EQ(ENOSPC, errno);
    full.format("%s", "swallowed");
    errno = 0;
    EXPECT_FALSE(ScopedFileDescriptor(from).copyTo(full));
    EXPECT_EQ(ENOSPC, errno);
    errno = 0;
    EXPECT_FALSE(from.copyTo("/dev/full"));
    EXPECT_EQ(ENOSPC, errno);
}

TEST(FileDescriptorTest, ClosingTwiceIsHarmless) {
    const TempDir dir;
    FileDescriptor file = Pathname(dir.file("a")).openCreateOnly(Pathname::CREATE_NORMAL);
    const int number = file._osdep;
    EXPECT_TRUE(file.close());
    EXPECT_EQ(-1, file._osdep);
    EXPECT_FALSE(isOpen(number));
    EXPECT_TRUE(file.close());
}

TEST(ScopedFileDescriptorTest, OpensForReading) {
    const TempDir dir;
    const Pathname path = dir.file("a");
    writeFile(path, "x");
    const ScopedFileDescriptor plain(path);
    const ScopedSaferFileDescriptor safer(path);
    EXPECT_EQ(O_RDONLY, ::fcntl(plain._osdep, F_GETFL) & (O_ACCMODE | O_NONBLOCK));
    EXPECT_EQ(O_RDONLY | O_NONBLOCK, ::fcntl(safer._osdep, F_GETFL) & (O_ACCMODE | O_NONBLOCK));
    EXPECT_TRUE(ScopedFileDescriptor(path.c_str()).valid());
    EXPECT_TRUE(ScopedSaferFileDescriptor(dir.file("a")).valid());
}

TEST(ScopedFileDescriptorTest, HoldsNoFileWhenItCannotBeOpened) {
    const TempDir dir;
    const Pathname absent = dir.file("absent");
    errno = 0;
    EXPECT_EQ(-1, ScopedFileDescriptor(absent)._osdep);
    EXPECT_EQ(ENOENT, errno);
    errno = 0;
    EXPECT_EQ(-1, ScopedSaferFileDescriptor(absent)._osdep);
    EXPECT_EQ(ENOENT, errno);
}

TEST(ScopedFileDescriptorTest, TakesWhatAnOpenReturns) {
    const TempDir dir;
    const Pathname path = dir.file("a");
    ScopedFileDescriptor file = path.openCreateOnly(Pathname::CREATE_NORMAL);
    const int first = file._osdep;
    EXPECT_TRUE(isOpen(first));
    file = path.openReadOnly();
    EXPECT_FALSE(isOpen(first)) << "the new file is open before the old one is closed";
    EXPECT_TRUE(isOpen(file._osdep));
}

}  // namespace
