#include "util/Logger.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>
#include <stdexcept>

#include "util/Assert.h"
#include "util/ErrorText.h"
#include "util/LogAppender.h"
#include "util/LogFormat.h"
#include "util/LogInternal.h"
#include "util/Timeval.h"

constinit bool logger_initialized = false;
constinit Logger* uninitialized_loggers = nullptr;

Timeval& epoch_timeval() {
    static Timeval epoch = Timeval::now();
    return epoch;
}

namespace {

constexpr std::size_t FIRST_BUFFER_SIZE = 256;
constexpr std::size_t ERROR_TEXT_SIZE = 1000;

// A C library that does not tell the length it needs is given up at this buffer size: the format
// is at fault then (a wide character that has no multibyte form, say), and no size would do.
constexpr std::size_t MAX_GUESSED_SIZE = std::size_t{1024} * 1024;

// The format with every "%m" replaced by the text of `errnum`.
std::string withErrorText(const char* fmt, int errnum) {
    char text[ERROR_TEXT_SIZE];
    const char* const inserted = errorText(errnum, text, sizeof text) ? text : "UNKNOWN ERROR";

    std::string result;
    for (const char* p = fmt; *p != '\0'; ++p) {
        if (*p != '%' || (p[1] != 'm' && p[1] != '%')) {
            result += *p;
        } else if (*++p == 'm') {
            result += inserted;
        } else {
            result += "%%";  // a pair, whose second half begins no "%m"
        }
    }
    return result;
}

__attribute__((format(printf, 2, 0))) void formatInto(std::string& out, const char* fmt,
                                                      va_list ap) {
    char first[FIRST_BUFFER_SIZE];
    std::unique_ptr<char[]> larger;
    char* buf = first;
    std::size_t size = sizeof first;
    for (;;) {
        va_list attempt;
        va_copy(attempt, ap);
        const int length = std::vsnprintf(buf, size, fmt, attempt);
        va_end(attempt);
        if (length >= 0 && static_cast<std::size_t>(length) < size) {
            out.assign(buf, static_cast<std::size_t>(length));
            return;
        }
        // A text longer than an int can tell has cost seconds already; every further attempt would.
        if (length < 0 && (errno == EOVERFLOW || size >= MAX_GUESSED_SIZE)) {
            throw std::runtime_error("cannot format a log message");
        }
        size = length < 0 ? 2 * size : static_cast<std::size_t>(length) + 1;
        larger = std::make_unique_for_overwrite<char[]>(size);
        buf = larger.get();
    }
}

}  // namespace

Logger::Logger(const char* name)
    : _channel_name(name), _channel_name_len(std::strlen(name)), _channel(nullptr), _next(nullptr) {
    // Whatever is complete before this constructor is destroyed after this logger.
    rootAppender();
    if (logger_initialized) {
        _channel = LogChannel::find(name, false);
    } else {
        _next = uninitialized_loggers;
        uninitialized_loggers = this;
    }
}

// The link stays: it belongs to this logger's place in the list, if it has one.
Logger& Logger::operator=(const Logger& other) {
    _channel_name = other._channel_name;
    _channel_name_len = other._channel_name_len;
    _channel = other._channel;
    return *this;
}

Logger::~Logger() {
    for (Logger** link = &uninitialized_loggers; *link != nullptr; link = &(*link)->_next) {
        if (*link == this) {
            *link = _next;
            return;
        }
    }
}

bool Logger::isDebugEnabled() const {
    return (_channel != nullptr ? *_channel : rootChannel()).minlevel < INFO;
}

void Logger::initialize() {
    QUELTA_ASSERT(!logger_initialized);
    epoch_timeval();
    logger_initialized = true;
    while (uninitialized_loggers != nullptr) {
        Logger* const logger = uninitialized_loggers;
        uninitialized_loggers = logger->_next;
        logger->_next = nullptr;
        logger->_channel = LogChannel::find(logger->_channel_name, false);
    }
}

bool Logger::setChannelLevel(const char* name, const std::string& level) {
    LogChannel& channel = name == nullptr ? rootChannel() : *LogChannel::find(name, true);
    return channel.changeLevel(level);
}

void Logger::vformat(std::string& out, int errnum, const char* fmt, va_list ap) {
    if (std::strstr(fmt, "%m") == nullptr) {
        formatInto(out, fmt, ap);
        return;
    }
    const std::string expanded = withErrorText(fmt, errnum);
// The compiler has checked `fmt` where the caller wrote it.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
    formatInto(out, expanded.c_str(), ap);
#pragma GCC diagnostic pop
}

void Logger::format(std::string& out, const char* fmt, ...) {
    const int errnum = errno;
    va_list ap;
    va_start(ap, fmt);
    vformat(out, errnum, fmt, ap);
    va_end(ap);
}

void Logger::format(std::string& out, int errnum, const char* fmt, ...) {
    va_list ap;
    va_start(ap, fmt);
    vformat(out, errnum, fmt, ap);
    va_end(ap);
}

void Logger::fatal(const char* fmt, ...) {
    va_list ap;
    va_start(ap, fmt);
    LogFormat::do_log(this, FATAL, fmt, ap);
    va_end(ap);
}

void Logger::crit(const char* fmt, ...) {
    va_list ap;
    va_start(ap, fmt);
    LogFormat::do_log(this, CRIT, fmt, ap);
    va_end(ap);
}

void Logger::error(const char* fmt, ...) {
    va_list ap;
    va_start(ap, fmt);
    LogFormat::do_log(this, ERROR, fmt, ap);
    va_end(ap);
}

void Logger::warn(const char* fmt, ...) {
    va_list ap;
    va_start(ap, fmt);
    LogFormat::do_log(this, WARN, fmt, ap);
    va_end(ap);
}

void Logger::info(const char* fmt, ...) {
    va_list ap;
    va_start(ap, fmt);
    LogFormat::do_log(this, INFO, fmt, ap);
    va_end(ap);
}

void Logger::debug(const char* fmt, ...) {
    va_list ap;
    va_start(ap, fmt);
    LogFormat::do_log(this, DEBUG, fmt, ap);
    va_end(ap);
}
