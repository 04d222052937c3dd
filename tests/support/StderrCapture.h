#ifndef QUELTA_TESTS_SUPPORT_STDERRCAPTURE_H_
#define QUELTA_TESTS_SUPPORT_STDERRCAPTURE_H_

// Collects everything written to descriptor 2 while the object exists.
//
//     StderrCapture err;
//     ...
//     EXPECT_EQ("text\n", err.text());
// Not thread-safe to construct and destroy; other threads may write while it exists.

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <string>

class StderrCapture {
public:
    StderrCapture() : _file(std::tmpfile()), _stderr(::dup(STDERR_FILENO)) {
        // O_APPEND, so that several descriptors of the same file do not overwrite each other.
        ::fcntl(::fileno(_file), F_SETFL, O_APPEND);
        ::dup2(::fileno(_file), STDERR_FILENO);
    }
    ~StderrCapture() {
        ::dup2(_stderr, STDERR_FILENO);
        ::close(_stderr);
        std::fclose(_file);
    }
    StderrCapture(const StderrCapture&) = delete;
    StderrCapture& operator=(const StderrCapture&) = delete;

    // Returns: everything written so far, also by child processes.
    std::string text() const {
        std::string all;
        char buf[4096];
        ssize_t count = 0;
        while ((count = ::pread(::fileno(_file), buf, sizeof(buf),
                                static_cast<off_t>(all.size()))) > 0) {
            all.append(buf, static_cast<std::size_t>(count));
        }
        return all;
    }

private:
    std::FILE* const _file;
    const int _stderr;  // a duplicate of the original descriptor
};

#endif  // QUELTA_TESTS_SUPPORT_STDERRCAPTURE_H_
