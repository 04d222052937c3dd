#include "util/FileDescriptor.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/uio.h>
#include <unistd.h>

#include <cerrno>
#include <string_view>

#include "util/internal/ErrnoKeeper.h"
#include "util/internal/FormatText.h"

namespace {

// The one loop that completes a transfer: `call(done, remaining)` is one system call.
template <typename Call>
ssize_t transferAll(unsigned long len, Call call) {
    unsigned long done = 0;
    for (;;) {
        const ssize_t count = call(done, len - done);
        if (count > 0) {
            done += static_cast<unsigned long>(count);
            if (done == len) {
                return static_cast<ssize_t>(done);
            }
        } else if (count == 0 || errno != EINTR) {
            return done != 0 ? static_cast<ssize_t>(done) : count;
        }
    }
}

}  // namespace

ssize_t FileDescriptor::read(void* buf, unsigned long len) const {
    return transferAll(len, [this, buf](unsigned long done, unsigned long remaining) {
        return ::read(_osdep, static_cast<char*>(buf) + done, remaining);
    });
}

ssize_t FileDescriptor::write(const void* buf, unsigned long len) const {
    return transferAll(len, [this, buf](unsigned long done, unsigned long remaining) {
        return ::write(_osdep, static_cast<const char*>(buf) + done, remaining);
    });
}

ssize_t FileDescriptor::write(const std::string& text) const {
    return write(text.data(), text.size());
}

ssize_t FileDescriptor::writev(const struct iovec* buffers, unsigned int count) const {
    return ::writev(_osdep, buffers, static_cast<int>(count));
}

void FileDescriptor::vformat(const char* fmt, std::va_list args) const {
    formatText(fmt, args, [this](std::string_view text) {
        static_cast<void>(write(text.data(), text.size()));
    });
}

void FileDescriptor::format(const char* fmt, ...) const {
    std::va_list args;
    va_start(args, fmt);
    vformat(fmt, args);
    va_end(args);
}

void FileDescriptor::setCloseOnExec(bool on) const {
    const int flags = ::fcntl(_osdep, F_GETFD);
    if (flags < 0) {
        return;
    }
    const int wanted = on ? flags | FD_CLOEXEC : flags & ~FD_CLOEXEC;
    if (wanted != flags) {
        ::fcntl(_osdep, F_SETFD, wanted);
    }
}

bool FileDescriptor::stat(struct stat* result) const {
    return ::fstat(_osdep, result) == 0;
}

bool FileDescriptor::getSize(long long* size) const {
    struct stat info;
    if (!stat(&info)) {
        return false;
    }
    *size = info.st_size;
    return true;
}

bool FileDescriptor::seek_set(long long offset) const {
    return ::lseek(_osdep, offset, SEEK_SET) != -1;
}

long long FileDescriptor::seekEof() const {
    return ::lseek(_osdep, 0, SEEK_END);
}

long long FileDescriptor::curPos() const {
    return ::lseek(_osdep, 0, SEEK_CUR);
}

void FileDescriptor::sync() const {
    static_cast<void>(::fsync(_osdep));
}

bool FileDescriptor::copyTo(FileDescriptor dest) const {
    char chunk[8192];
    for (;;) {
        const ssize_t length = read(chunk, sizeof chunk);
        if (length <= 0) {
            return length == 0;
        }
        for (ssize_t done = 0; done < length;) {
            const ssize_t count =
                dest.write(chunk + done, static_cast<unsigned long>(length - done));
            if (count < 0) {
                return false;
            }
            if (count == 0) {
                errno = ENOSPC;
                return false;
            }
            done += count;
        }
    }
}

bool FileDescriptor::copyTo(const Pathname& dest) const {
    if (!valid()) {
        return false;
    }
    const ScopedFileDescriptor copy(dest.openCreateOrReplace(*this));
    return copy.valid() && copyTo(copy);
}

bool FileDescriptor::close() {
    if (!valid()) {
        return true;
    }
    const bool closed = ::close(_osdep) == 0;
    _osdep = NO_FILE;
    return closed;
}

void FileDescriptor::close_saveErrno() {
    const ErrnoKeeper keeper;
    close();
}

ScopedFileDescriptor::ScopedFileDescriptor(const Pathname& path)
    : FileDescriptor(path.openReadOnly()) {}

ScopedFileDescriptor& ScopedFileDescriptor::operator=(const FileDescriptor& other) {
    if (this != &other) {
        close_saveErrno();
        FileDescriptor::operator=(other);
    }
    return *this;
}

ScopedFileDescriptor& ScopedFileDescriptor::operator=(const ScopedFileDescriptor& other) {
    return *this = static_cast<const FileDescriptor&>(other);
}

ScopedSaferFileDescriptor::ScopedSaferFileDescriptor(const Pathname& path)
    : FileDescriptor(path.openReadOnlySafer()) {}

ScopedSaferFileDescriptor& ScopedSaferFileDescriptor::operator=(const FileDescriptor& other) {
    if (this != &other) {
        close_saveErrno();
        FileDescriptor::operator=(other);
    }
    return *this;
}

ScopedSaferFileDescriptor& ScopedSaferFileDescriptor::operator=(
    const ScopedSaferFileDescriptor& other) {
    return *this = static_cast<const FileDescriptor&>(other);
}
