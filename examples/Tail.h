#ifndef QUELTA_EXAMPLES_TAIL_H_
#define QUELTA_EXAMPLES_TAIL_H_

// Reads standard input, or a file that grows, in whole lines. A file is followed by its name:
//
//     Logger logger("Follow");
//     Tail tail(Pathname("/var/log/syslog"), logger);
//     std::string lines;
//     while (tail.read(lines)) {
//         std::fputs(lines.c_str(), stdout);
//     }
//
// When another file takes the name, the old one is read to its end first. A file that is truncated
// is read from its start again. A file that does not exist is waited for. If a file is replaced
// twice between two calls, the lines of the one in between are lost.
// Not thread-safe; one thread at a time per object.

#include <sys/types.h>

#include <string>

#include "util/FileDescriptor.h"
#include "util/Logger.h"
#include "util/Pathname.h"

class Tail {
public:
    // Reads a file, or standard input if `path` is empty. `logger` gets the problems.
    Tail(const Pathname& path, Logger& logger) : _path(path), _logger(logger) {}

    // Replaces `lines` by what was added since the last call, some 64 kB at most. The start of a
    // line waits for the rest, until the end of its file. Does not wait for input.
    // Returns: whether there may be more already.
    // Errors: std::runtime_error for standard input. For a file the first of several is logged and
    // printed, and the next call tries again.
    bool read(std::string& lines);

    // Returns: whether standard input has ended; false for a file.
    bool ended() const { return _ended; }

private:
    bool isReplaced() const;
    ssize_t readSome(char* data, std::size_t size);
    void fail();

    Pathname _path;
    Logger& _logger;
    ScopedFileDescriptor _file;
    std::string _rest;  // the start of a line
    bool _ended = false;
    bool _failed = false;  // the last read, and it was reported
};

#endif  // QUELTA_EXAMPLES_TAIL_H_
