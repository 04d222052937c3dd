// The way of a message from the entry points of Logger to a channel, and the two ways around it:
// standard error for what no channel can take, and the reports of the logging subsystem itself.

#include <unistd.h>

#include <cstring>
#include <string>
#include <string_view>

#include "util/ErrnoKeeper.h"
#include "util/LogFormat.h"
#include "util/LogInternal.h"
#include "util/Logger.h"

namespace {

// Marks an appender, for the current thread and scope, as the one whose failure is being reported.
// The marks of nested reports are linked through the stack.
class ReportMark {
public:
    explicit ReportMark(const LogAppender* appender) : _appender(appender), _outer(s_innermost) {
        s_innermost = this;
    }
    ~ReportMark() { s_innermost = _outer; }
    ReportMark(const ReportMark&) = delete;
    ReportMark& operator=(const ReportMark&) = delete;

    static bool covers(const LogAppender* appender) {
        const ReportMark* mark = s_innermost;
        while (mark != nullptr && mark->_appender != appender) {
            mark = mark->_outer;
        }
        return mark != nullptr;
    }

private:
    static constinit thread_local const ReportMark* s_innermost;

    const LogAppender* const _appender;
    const ReportMark* const _outer;
};
constinit thread_local const ReportMark* ReportMark::s_innermost = nullptr;

// One write, so that lines of several threads or processes do not mix. Usual messages need no
// memory, whose exhaustion may be what they tell.
void writeToStderr(LogLevel level, std::string_view msg) {
    constexpr std::string_view SEPARATOR = " - ";
    std::size_t nameLength = 0;
    const char* const name = loglevel2str(&nameLength, level);
    const std::size_t size = nameLength + SEPARATOR.size() + msg.size() + 1;

    char usual[1024];
    std::string longer;
    char* line = usual;
    if (size > sizeof usual) {
        longer.resize(size);
        line = longer.data();
    }
    char* end = line;
    for (const std::string_view part : {std::string_view(name, nameLength), SEPARATOR, msg}) {
        end += part.copy(end, part.size());
    }
    *end = '\n';
    [[maybe_unused]] const ssize_t ignored = ::write(STDERR_FILENO, line, size);
}

void fallbackSilently(LogLevel level, std::string_view msg) noexcept {
    try {
        writeToStderr(level, msg);
    } catch (...) {
        // Nobody is left to be told.
    }
}

// Formats a message, or keeps the raw format when that fails: the format still tells most.
__attribute__((format(printf, 3, 0))) bool formatted(std::string& msg, int errnum, const char* fmt,
                                                     va_list ap) noexcept {
    try {
        Logger::vformat(msg, errnum, fmt, ap);
        return true;
    } catch (...) {
        return false;
    }
}

void writeOrFallBack(LogChannel& channel, const Logger* logger, LogLevel level,
                     const std::string& msg) noexcept {
    try {
        channel.write(LogMsgMetadata(logger, level), msg);
    } catch (...) {
        fallbackSilently(level, msg);
    }
}

}  // namespace

bool report_in_progress(const LogAppender* appender) {
    return ReportMark::covers(appender);
}

void fallback_to_stderr(LogLevel level, const std::string& msg) {
    writeToStderr(level, msg);
}

bool LogFormat::check_for_unitialized_logger(const Logger* logger) {
    if (logger_initialized) {
        return false;
    }
    const Logger* waiting = uninitialized_loggers;
    while (waiting != nullptr && waiting != logger) {
        waiting = waiting->_next;
    }
    return waiting == nullptr;
}

void LogFormat::do_log(Logger* logger, LogLevel level, const std::string& msg) {
    const ErrnoKeeper errnoKeeper;
    if (check_for_unitialized_logger(logger)) {
        fallbackSilently(level, msg);
        return;
    }
    LogChannel& channel = logger->_channel != nullptr ? *logger->_channel : rootChannel();
    if (level >= channel.minlevel) {
        writeOrFallBack(channel, logger, level, msg);
    }
}

void LogFormat::do_log(Logger* logger, LogLevel level, const char* fmt, va_list ap) {
    const ErrnoKeeper errnoKeeper;
    const bool uninitialized = check_for_unitialized_logger(logger);
    LogChannel& channel = logger->_channel != nullptr ? *logger->_channel : rootChannel();
    if (!uninitialized && level < channel.minlevel) {
        return;
    }
    std::string msg;
    if (!formatted(msg, errnoKeeper.saved(), fmt, ap)) {
        fallbackSilently(level, fmt);
    } else if (uninitialized) {
        fallbackSilently(level, msg);
    } else {
        writeOrFallBack(channel, logger, level, msg);
    }
}

void LogFormat::internal(const LogAppender* failing, LogLevel level, const char* fmt, ...) {
    static Everlasting<Logger> logger("Logger");
    static constinit Everlasting<LogChannel> empty_channel;

    const ErrnoKeeper errnoKeeper;
    LogChannel& channel =
        logger.value._channel != nullptr ? *logger.value._channel : empty_channel.value;
    if (level < channel.minlevel) {
        return;
    }
    std::string msg;
    va_list ap;
    va_start(ap, fmt);
    const bool readable = formatted(msg, errnoKeeper.saved(), fmt, ap);
    va_end(ap);
    if (!readable) {
        fallbackSilently(level, fmt);
        return;
    }
    bool written = false;
    try {
        const ReportMark mark(failing);
        written = channel.write(LogMsgMetadata(&logger.value, level), msg, failing);
    } catch (...) {
        written = false;
    }
    if (!written) {
        fallbackSilently(level, msg);
    }
}
