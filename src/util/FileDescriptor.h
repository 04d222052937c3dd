#ifndef QUELTA_UTIL_FILEDESCRIPTOR_H_
#define QUELTA_UTIL_FILEDESCRIPTOR_H_

// A POSIX file descriptor as a value.
//
//     const ScopedFileDescriptor source(Pathname("in.txt"));  // closed at the end of the scope
//     if (!source.valid() || !source.copyTo(Pathname("out.txt"))) {
//         std::perror("in.txt");
//     }
//
// Files are opened with Pathname's open operations, so this header includes Pathname.h.
//
// The plain class copies the number, owns nothing and never closes by itself; the two scoped
// classes close at the end of their scope. Any negative number means "no file". Every failure is a
// result (-1, 0 or false) with errno as the system call left it; nothing is logged, and only the
// allocation of a long formatted text can throw.
// Not thread-safe; one thread at a time per object. Several threads may use one open file as far as
// the operating system allows. A thread can be cancelled in every call that can block, except the
// close in a destructor.

#include <sys/stat.h>
#include <sys/types.h>
#include <sys/uio.h>

#include <cstdarg>
#include <string>

#include "util/Pathname.h"

// The number of a descriptor, which its user closes.
class FileDescriptor {
public:
    // Takes the number of an open descriptor, or a negative one for no file. Implicit, so that a
    // number can be passed where a descriptor is expected.
    FileDescriptor(int descriptor) noexcept : _osdep(descriptor) {}

    // Returns: whether there is a file.
    [[nodiscard]] bool valid() const noexcept { return _osdep >= 0; }

    // Reads `len` bytes with as many calls as necessary, at least one. A call that a signal
    // interrupts is repeated.
    // Returns: the number of bytes read. Fewer than `len` mean end of file, or an error after these
    // bytes; 0 means end of file; -1 means an error before the first byte.
    // Deliberate: an error after some bytes is not reported; the next call returns it.
    [[nodiscard]] ssize_t read(void* buf, unsigned long len) const;
    // Writes `len` bytes, or a whole text, in the same way.
    // Returns: the number of bytes written. Fewer than given mean that the file takes no more, or
    // an error after these bytes; -1 means an error before the first byte.
    // Deliberate: an error after some bytes is not reported; the next call returns it.
    [[nodiscard]] ssize_t write(const void* buf, unsigned long len) const;
    [[nodiscard]] ssize_t write(const std::string& text) const;
    // Writes `count` buffers with a single call.
    // Returns: the number of bytes written, which may be fewer than given, or -1.
    [[nodiscard]] ssize_t writev(const struct iovec* buffers, unsigned int count) const;

    // Formats like vprintf and writes the text. Write errors are not reported.
    // Errors: std::bad_alloc, for a text of more than 255 bytes or one that cannot be formatted.
    // Cost: no allocation up to 255 bytes.
    void vformat(const char* fmt, std::va_list args) const __attribute__((format(printf, 2, 0)));
    // The same as vformat, with the arguments of printf.
    void format(const char* fmt, ...) const __attribute__((format(printf, 2, 3)));

    // Makes the descriptor close (or stay open) when the process executes another program; does
    // nothing if the flag is already as wanted or cannot be changed.
    void setCloseOnExec(bool on) const;

    // Fills *result by fstat.
    // Errors: false.
    [[nodiscard]] bool stat(struct stat* result) const;
    // Replaces *size by the file's size in bytes.
    // Errors: false, and *size is unchanged.
    [[nodiscard]] bool getSize(long long* size) const;
    // Moves to an offset in bytes from the start of the file.
    // Errors: false.
    bool seek_set(long long offset) const;
    // Moves to the end of the file.
    // Returns: the offset of the end, in bytes, or -1.
    long long seekEof() const;
    // Returns: the offset in bytes from the start of the file, or -1.
    [[nodiscard]] long long curPos() const;
    // Waits until the file's data are on its device.
    void sync() const;

    // Copies from the current offset to the end of the file, and stops at the first failure; what
    // was copied by then stays.
    // Errors: false with errno; ENOSPC if a write of the destination returns 0.
    // Cost: 8192 bytes of stack, no heap.
    bool copyTo(FileDescriptor dest) const;
    // Copies in the same way to a file that is created with this one's permission bits, or emptied
    // first.
    // Requires: it is not the file that is read.
    bool copyTo(const Pathname& dest) const;

    // Closes the descriptor; does nothing and returns true if it is negative.
    // Returns: whether the call returned 0. The descriptor is -1 afterwards in any case, because
    // the system releases it even if the call is interrupted.
    bool close();

protected:
    static constexpr int NO_FILE = -1;  // after a close, and by default

    // Closes the descriptor and restores errno.
    void close_saveErrno();

    int _osdep;  // the operating system's number; negative for no file
};

// Owns its descriptor: closes it at destruction and before it takes another by assignment.
//
// Deliberate: copying and assigning share the number, and each owner closes it. So do not copy one;
// nothing in this library does. Self-assignment is a no-op, but only for the same object: assigning
// another object with the same number closes that number first.
class ScopedFileDescriptor : public FileDescriptor {
public:
    // Refers to no file.
    ScopedFileDescriptor() : FileDescriptor(NO_FILE) {}
    // Shares the number, which both objects will close.
    ScopedFileDescriptor(const ScopedFileDescriptor& other) = default;
    // Opens the file for reading; not valid() if that fails.
    ScopedFileDescriptor(const Pathname& path);
    // Takes over an open file.
    explicit ScopedFileDescriptor(const FileDescriptor& other) : FileDescriptor(other) {}
    // Closes the file, if there is one. errno is kept.
    ~ScopedFileDescriptor() { close_saveErrno(); }

    // Closes the current file, if there is one, and takes over an open one. errno is kept.
    ScopedFileDescriptor& operator=(const FileDescriptor& other);
    ScopedFileDescriptor& operator=(const ScopedFileDescriptor& other);
    // Deleted: the temporary owner that a path converts to would close what is assigned.
    ScopedFileDescriptor& operator=(const Pathname& path) = delete;
};

// The same as ScopedFileDescriptor, but opens its file without blocking, so that a FIFO or device
// does not hang the caller.
class ScopedSaferFileDescriptor : public FileDescriptor {
public:
    // Refers to no file.
    ScopedSaferFileDescriptor() : FileDescriptor(NO_FILE) {}
    // Shares the number, which both objects will close.
    ScopedSaferFileDescriptor(const ScopedSaferFileDescriptor& other) = default;
    // Opens the file for reading, without blocking; not valid() if that fails.
    ScopedSaferFileDescriptor(const Pathname& path);
    // Takes over an open file.
    explicit ScopedSaferFileDescriptor(const FileDescriptor& other) : FileDescriptor(other) {}
    // Closes the file, if there is one. errno is kept.
    ~ScopedSaferFileDescriptor() { close_saveErrno(); }

    // Closes the current file, if there is one, and takes over an open one. errno is kept.
    ScopedSaferFileDescriptor& operator=(const FileDescriptor& other);
    ScopedSaferFileDescriptor& operator=(const ScopedSaferFileDescriptor& other);
    // Deleted: the temporary owner that a path converts to would close what is assigned.
    ScopedSaferFileDescriptor& operator=(const Pathname& path) = delete;
};

#endif  // QUELTA_UTIL_FILEDESCRIPTOR_H_
