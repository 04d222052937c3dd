#include "Tail.h"

#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <stdexcept>
#include <string_view>

namespace {

constexpr std::size_t CHUNK = 65536;  // bytes of one read

}  // namespace

bool Tail::read(std::string& lines) {
    lines.clear();
    // Tested before the read, so that the old file is read to its end.
    const bool isLast = _path.empty() || isReplaced();
    char data[CHUNK];
    const ssize_t count = readSome(data, sizeof data);
    if (count < 0) {
        fail();
        return false;
    }
    _failed = false;
    const std::string_view added(data, static_cast<std::size_t>(count));
    const std::size_t newline = added.rfind('\n');
    if (newline != std::string_view::npos) {
        lines.swap(_rest);
        lines += added.substr(0, newline + 1);
    }
    _rest += added.substr(newline + 1);  // all of it if there is no newline
    if (count == 0 && isLast) {
        if (!_rest.empty()) {
            lines.swap(_rest);
            lines += '\n';
        }
        _file.close();
        _ended = _path.empty();
    }
    return count != 0 || isLast;
}

// Returns: whether the file has been truncated, or another one has its name. As long as that one is
// empty, the writer may still be using the old one.
bool Tail::isReplaced() const {
    struct stat named;
    struct stat open;
    if (!_path.stat(&named) || !_file.stat(&open)) {
        return false;
    }
    return named.st_ino == open.st_ino ? named.st_size < _file.curPos() : named.st_size > 0;
}

ssize_t Tail::readSome(char* data, std::size_t size) {
    if (!_path.empty()) {
        if (!_file.valid()) {
            _file = _path.openReadOnlySafer();
        }
        return _file.valid() ? _file.read(data, size) : -1;
    }
    struct pollfd input = {STDIN_FILENO, POLLIN, 0};
    if (::poll(&input, 1, 0) == 0) {
        errno = EAGAIN;
        return -1;
    }
    // FileDescriptor::read would wait until `data` is full.
    return ::read(STDIN_FILENO, data, size);
}

void Tail::fail() {
    if (_failed || errno == EAGAIN || errno == EINTR) {
        return;
    }
    _failed = true;
    std::string text;
    Logger::format(text, "cannot read %s: %m", _path.empty() ? "standard input" : _path.c_str());
    if (_path.empty()) {
        throw std::runtime_error(text);
    }
    _logger.error(text);
    std::fprintf(stderr, "log_watch: %s\n", text.c_str());
}
