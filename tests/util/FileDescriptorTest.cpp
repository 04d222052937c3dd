#include "util/FileDescriptor.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <pthread.h>
#include <sys/stat.h>
#include <sys/uio.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <functional>
#include <string>
#include <thread>
#include <type_traits>

#include "support/TempDir.h"

namespace {

std::string letters(std::size_t size) {
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

// A new file that is open for reading and writing, and another path beside it.
class FileDescriptorTest : public testing::Test {
protected:
    const TempDir _dir;
    const Pathname _path{_dir.file("a")};
    const Pathname _other{_dir.file("b")};
    const ScopedFileDescriptor _file{_path.openReadWriteOrCreate(Pathname::CREATE_NORMAL)};
};

struct Umask {
    explicit Umask(mode_t mask) : previous(::umask(mask)) {}
    ~Umask() { ::umask(previous); }
    const mode_t previous;
};

TEST_F(FileDescriptorTest, IsANumberThatIsValidUnlessNegative) {
    EXPECT_TRUE(FileDescriptor(0).valid() && FileDescriptor(7).valid());
    EXPECT_FALSE(FileDescriptor(-1).valid() || FileDescriptor(-7).valid());
    FileDescriptor file = -1;
    file = 7;
    EXPECT_EQ(7, file._osdep);
}

TEST_F(FileDescriptorTest, CopiesTheNumberAndClosesNothing) {
    {
        const FileDescriptor copy(_file);
        FileDescriptor assigned(-1);
        assigned = _file;
        EXPECT_EQ(_file._osdep, copy._osdep);
        EXPECT_EQ(_file._osdep, assigned._osdep);
    }
    EXPECT_TRUE(isOpen(_file._osdep));
}

TEST_F(FileDescriptorTest, ReadsToTheEndOfTheFile) {
    writeFile(_path, "hello");
    char buf[] = "..........";
    EXPECT_EQ(2, _file.read(buf, 2));
    EXPECT_STREQ("he........", buf);
    EXPECT_EQ(0, _file.read(buf, 0));
    EXPECT_EQ(3, _file.read(buf, 10));
    EXPECT_STREQ("llo.......", buf);
    EXPECT_EQ(0, _file.read(buf, 10));
}

TEST_F(FileDescriptorTest, TheEndOfTheFileIsNoInterruption) {
    char c = 0;
    errno = EINTR;
    EXPECT_EQ(0, _file.read(&c, 1));
}

TEST_F(FileDescriptorTest, WritesBytesStringsAndSeveralBuffers) {
    EXPECT_EQ(3, _file.write("abcdef", 3));
    EXPECT_EQ(0, _file.write("abcdef", 0));
    EXPECT_EQ(4, _file.write(std::string("d\0ef", 4)));
    EXPECT_EQ(0, _file.write(std::string()));
    std::string first = "gh", second = "ijk";
    const struct iovec buffers[] = {{first.data(), first.size()}, {second.data(), second.size()}};
    EXPECT_EQ(5, _file.writev(buffers, 2));
    EXPECT_EQ(2, _file.writev(buffers, 1));
    EXPECT_EQ(std::string("abcd\0efghijkgh", 14), readFile(_path));
}

TEST_F(FileDescriptorTest, OperationsWithoutAFileFailWithEbadf) {
    FileDescriptor closed(_path.openReadOnly());
    const FileDescriptor stale(closed);
    ASSERT_TRUE(closed.close());
    for (const FileDescriptor& none : {FileDescriptor(-1), stale}) {
        char buf[4] = {};
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
        EXPECT_FALSE(none.copyTo(_other));
        EXPECT_EQ(7, size);
        none.format("%d", 5);
        none.setCloseOnExec(true);
        none.sync();
    }
    EXPECT_FALSE(_other.exists());
}

TEST_F(FileDescriptorTest, CreateOnlyFailsOnAnExistingFile) {
    EXPECT_EQ(-1, _path.openCreateOnly(Pathname::CREATE_NORMAL)._osdep);
    EXPECT_EQ(EEXIST, errno);
    EXPECT_TRUE(ScopedFileDescriptor(_other.openCreateOnly(Pathname::CREATE_NORMAL)).valid());
}

TEST_F(FileDescriptorTest, CreateOrReplaceEmptiesAndAppendWritesAtTheEnd) {
    writeFile(_path, "one");
    const ScopedFileDescriptor append(_path.openCreateOrAppend(Pathname::CREATE_NORMAL));
    EXPECT_TRUE(append.seek_set(0));
    EXPECT_EQ(3, append.write("two"));
    EXPECT_EQ("onetwo", readFile(_path));
    const ScopedFileDescriptor replace(_path.openCreateOrReplace(Pathname::CREATE_NORMAL));
    EXPECT_EQ("", readFile(_path));
    char byte;
    EXPECT_EQ(-1, replace.read(&byte, 1));
}

TEST_F(FileDescriptorTest, ReadWriteOrCreateEmptiesAnExistingFile) {
    writeFile(_path, "old text");
    const ScopedFileDescriptor file(_path.openReadWriteOrCreate(Pathname::CREATE_NORMAL));
    EXPECT_EQ("", readFile(_path));
    EXPECT_EQ(3, file.write("new"));
    EXPECT_TRUE(file.seek_set(0));
    char buf[3];
    EXPECT_EQ(3, file.read(buf, sizeof buf));
    EXPECT_EQ("new", std::string(buf, 3));
}

TEST_F(FileDescriptorTest, NewFilesHaveTheirModeReducedByTheUmask) {
    const Umask mask(0026);
    const struct {
        Pathname::CreateMode mode;
        mode_t expected;
    } rows[] = {{Pathname::CREATE_NORMAL, 0640},
                {Pathname::CREATE_PRIVATE, 0600},
                {Pathname::CREATE_READABLE_NONPUBLIC, 0440}};
    for (const auto& row : rows) {
        EXPECT_TRUE(ScopedFileDescriptor(_other.openCreateOnly(row.mode)).valid());
        EXPECT_EQ(row.expected, permissions(_other));
        EXPECT_TRUE(_other.unlink());
    }
}

TEST_F(FileDescriptorTest, SetsAndClearsCloseOnExec) {
    EXPECT_EQ(0, ::fcntl(_file._osdep, F_GETFD));
    for (const bool on : {true, true, false, false}) {
        _file.setCloseOnExec(on);
        EXPECT_EQ(on ? FD_CLOEXEC : 0, ::fcntl(_file._osdep, F_GETFD));
    }
}

TEST_F(FileDescriptorTest, SaferOpenDoesNotHangOnAFifo) {
    ASSERT_EQ(0, ::mkfifo(_other.c_str(), 0600));
    // With a writer no open waits, so that a wrong flag fails here and hangs nowhere.
    ScopedFileDescriptor writer(_other.openReadWriteOrCreate(Pathname::CREATE_NORMAL));
    ASSERT_TRUE(writer.valid());
    const ScopedSaferFileDescriptor in = _other;
    ASSERT_EQ(O_NONBLOCK, ::fcntl(in._osdep, F_GETFL) & O_NONBLOCK);
    char byte;
    EXPECT_EQ(-1, in.read(&byte, 1));
    EXPECT_EQ(EAGAIN, errno);
    EXPECT_TRUE(writer.close());
    EXPECT_TRUE(ScopedSaferFileDescriptor(_other).valid());
    EXPECT_EQ(0, in.read(&byte, 1));
}

TEST_F(FileDescriptorTest, SeeksAndMeasuresPastFourGigabytes) {
    constexpr long long OFFSET = 5LL << 30;
    EXPECT_EQ(0, _file.curPos());
    EXPECT_TRUE(_file.seek_set(OFFSET));
    EXPECT_EQ(OFFSET, _file.curPos());
    EXPECT_FALSE(_file.seek_set(-1));
    EXPECT_EQ(EINVAL, errno);
    EXPECT_EQ(1, _file.write("x"));
    EXPECT_TRUE(_file.seek_set(2));
    EXPECT_EQ(OFFSET + 1, _file.seekEof());
    EXPECT_EQ(OFFSET + 1, _file.curPos());
    long long size = 0;
    struct stat info;
    EXPECT_TRUE(_file.getSize(&size) && _file.stat(&info));
    EXPECT_EQ(OFFSET + 1, size);
    EXPECT_EQ(OFFSET + 1, info.st_size);
}

// Runs `body`, which must reach a call that can block, in a thread that is cancelled.
// Returns: whether the cancellation ended the thread.
bool isCancelledIn(std::function<void()> body) {
    const auto start = [](void* argument) -> void* {
        ::pthread_cancel(::pthread_self());
        (*static_cast<std::function<void()>*>(argument))();
        return nullptr;
    };
    pthread_t thread;
    void* result = nullptr;
    EXPECT_EQ(0, ::pthread_create(&thread, nullptr, start, &body));
    EXPECT_EQ(0, ::pthread_join(thread, &result));
    return result == PTHREAD_CANCELED;
}

TEST_F(FileDescriptorTest, AThreadCanBeCancelledInCallsThatBlock) {
    char byte = 0;
    const struct iovec buffer = {&byte, 1};
    EXPECT_TRUE(isCancelledIn([&] { static_cast<void>(_file.read(&byte, 1)); }));
    EXPECT_TRUE(isCancelledIn([&] { static_cast<void>(_file.write("x")); }));
    EXPECT_TRUE(isCancelledIn([&] { static_cast<void>(_file.writev(&buffer, 1)); }));
    EXPECT_TRUE(isCancelledIn([&] { _file.sync(); }));
    EXPECT_TRUE(isCancelledIn([&] { _file.copyTo(_file); }));
    EXPECT_TRUE(isCancelledIn([&] { static_cast<void>(_path.openReadOnly()); }));
    EXPECT_EQ("", readFile(_path));
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

TEST_F(FileDescriptorTest, FormatsTextsOfAnyLength) {
    std::string expected;
    for (const std::size_t length : {0u, 1u, 254u, 255u, 256u, 257u, 511u, 512u, 5000u}) {
        const std::string text = letters(length);
        _file.format("%d|%s|%c%c|%5.2f;", 42, text.c_str(), 'x', '\0', 2.5);
        formatTwice(_file, "%s", text.c_str());
        expected += "42|" + text + "|x" + '\0' + "| 2.50;" + text + text;
    }
    EXPECT_EQ(expected, readFile(_path));
}

TEST_F(FileDescriptorTest, CopiesFromTheOffsetToTheEnd) {
    for (const std::size_t size : {0u, 1u, 8191u, 8192u, 8193u, 16384u, 100000u}) {
        const std::string text = letters(size);
        writeFile(_path, text);
        const ScopedFileDescriptor in = _path;
        EXPECT_TRUE(in.copyTo(_other)) << size;
        EXPECT_EQ(text, readFile(_other));
        EXPECT_TRUE(in.copyTo(_other)) << "nothing is left";
        EXPECT_EQ("", readFile(_other));
        EXPECT_TRUE(in.seek_set(static_cast<long long>(size / 2)));
        EXPECT_TRUE(in.copyTo(_other)) << size;
        EXPECT_EQ(text.substr(size / 2), readFile(_other));
    }
    EXPECT_TRUE(ScopedFileDescriptor("/dev/null").copyTo(FileDescriptor(-1)));
}

TEST_F(FileDescriptorTest, CopiesThroughAPipe) {
    const std::string text = letters(300000);
    int ends[2];
    ASSERT_EQ(0, ::pipe(ends));
    const ScopedFileDescriptor in((FileDescriptor(ends[0])));
    ScopedFileDescriptor out((FileDescriptor(ends[1])));
    EXPECT_FALSE(in.seek_set(0));
    EXPECT_EQ(ESPIPE, errno);
    EXPECT_EQ(-1, in.seekEof());
    EXPECT_EQ(-1, in.curPos());
    writeFile(_path, text);
    std::thread feed([&] {
        EXPECT_TRUE(_file.copyTo(out));
        EXPECT_TRUE(out.close());
    });
    EXPECT_TRUE(in.copyTo(_other.c_str()));
    feed.join();
    EXPECT_EQ(text, readFile(_other));
}

TEST_F(FileDescriptorTest, ACopyHasItsSourcesPermissionsAndReplacesTheDestination) {
    const Umask mask(0);
    const Pathname old = _dir.file("old");
    writeFile(_path, "text");
    writeFile(old, "a much longer text");
    ASSERT_EQ(0, ::chmod(_path.c_str(), 0651));
    ASSERT_EQ(0, ::chmod(old.c_str(), 0600));
    EXPECT_TRUE(ScopedFileDescriptor(_path).copyTo(_other));
    EXPECT_TRUE(_path.copyTo(old));
    EXPECT_EQ("text", readFile(_other));
    EXPECT_EQ("text", readFile(old));
    EXPECT_EQ(mode_t{0651}, permissions(_other));
    EXPECT_EQ(mode_t{0600}, permissions(old)) << "an existing file keeps its own";

    const Umask tighter(0077);
    EXPECT_TRUE(_other.unlink() && _path.copyTo(_other));
    EXPECT_EQ(mode_t{0600}, permissions(_other));
}

TEST_F(FileDescriptorTest, CopyFailsWithoutASourceOrADestination) {
    writeFile(_path, "text");
    const struct {
        Pathname from, to;
        int error;
    } rows[] = {{_dir.file("absent"), _other, ENOENT},
                {_path, _dir.file("no/where"), ENOENT},
                {_dir.path(), _other, EISDIR},
                {_path, "/dev/full", ENOSPC}};
    for (const auto& row : rows) {
        errno = 0;
        EXPECT_FALSE(row.from.copyTo(row.to)) << row.from << ' ' << row.to;
        EXPECT_EQ(row.error, errno) << row.from << ' ' << row.to;
    }
}

TEST_F(FileDescriptorTest, ClosingTwiceIsHarmless) {
    FileDescriptor file(_path.openReadOnly());
    const int number = file._osdep;
    EXPECT_TRUE(file.close());
    EXPECT_EQ(-1, file._osdep);
    EXPECT_FALSE(isOpen(number));
    EXPECT_TRUE(file.close());
}

template <typename Scoped>
class ScopedFileDescriptorTest : public FileDescriptorTest {};
using ScopedTypes = testing::Types<ScopedFileDescriptor, ScopedSaferFileDescriptor>;
TYPED_TEST_SUITE(ScopedFileDescriptorTest, ScopedTypes);

TYPED_TEST(ScopedFileDescriptorTest, IsMadeFromAPathButOnlyOnRequestFromADescriptor) {
    EXPECT_TRUE((std::is_convertible_v<const Pathname&, TypeParam>));
    EXPECT_FALSE((std::is_convertible_v<FileDescriptor, TypeParam>));
    EXPECT_FALSE((std::is_assignable_v<TypeParam&, Pathname>));
    EXPECT_FALSE(TypeParam().valid());
}

TYPED_TEST(ScopedFileDescriptorTest, OpensForReading) {
    const TypeParam file = this->_path;
    const int safer = std::is_same_v<TypeParam, ScopedSaferFileDescriptor> ? O_NONBLOCK : 0;
    EXPECT_EQ(O_RDONLY | safer, ::fcntl(file._osdep, F_GETFL) & (O_ACCMODE | O_NONBLOCK));
    errno = 0;
    EXPECT_EQ(-1, TypeParam(this->_other)._osdep);
    EXPECT_EQ(ENOENT, errno);
}

TYPED_TEST(ScopedFileDescriptorTest, TakesWhatAnOpenReturns) {
    TypeParam file(this->_path.openReadOnly());
    const int first = file._osdep;
    EXPECT_TRUE(isOpen(first));
    file = this->_path.openReadOnly();
    EXPECT_FALSE(isOpen(first)) << "the new file is open before the old one is closed";
    EXPECT_TRUE(isOpen(file._osdep));
}

}  // namespace
