#include "util/internal/LogRouting.h"

#include <unistd.h>

#include <string>
#include <string_view>

#include "util/LogFormat.h"
#include "util/Logger.h"
#include "util/internal/ErrnoKeeper.h"
#include "util/internal/FormatText.h"
#include "util/internal/LogGlobals.h"
#include "util/internal/NeverDestroyed.h"

constinit thread_local const ReportMark* ReportMark::s_innermost = nullptr;

namespace {

// fallback_to_stderr without a string for the message.
void writeToStderr(LogLevel level, std::string_view msg) noexcept try {
    std::string line(levelName(level));
    line.append(" - ").append(msg).append("\n");
    // One write, so that lines of several threads or processes do not mix.
    [[maybe_unused]] const ssize_t ignored = ::write(STDERR_FILENO, line.data(), line.size());
} catch (...) {
    // There is nowhere left to report to.
}

}  // namespace

void fallback_to_stderr(LogLevel level, const std::string& msg) noexcept {
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

void LogFormat::do_log(Logger* logger, LogLevel level, std::string_view msg) {
    const ErrnoKeeper errnoKeeper;
    if (check_for_unitialized_logger(logger)) {
        writeToStderr(level, msg);
        return;
    }
    LogChannel& channel = logger->_channel != nullptr ? *logger->_channel : rootChannel();
    if (level < channel.minlevel) {
        return;
    }
    try {
        channel.write(LogMsgMetadata(logger, level), msg);
    } catch (...) {
        writeToStderr(level, msg);
    }
}

void LogFormat::do_log(Logger* logger, LogLevel level, const char* fmt, va_list ap) {
    const ErrnoKeeper errnoKeeper;
    const LogChannel& channel = logger->_channel != nullptr ? *logger->_channel : rootChannel();
    if (level < channel.minlevel && !check_for_unitialized_logger(logger)) {
        return;
    }
    try {
        formatMessage(errnoKeeper.saved(), fmt, ap,
                      [&](std::string_view msg) { do_log(logger, level, msg); });
    } catch (...) {
        writeToStderr(level, fmt);  // unformatted rather than lost
    }
}

void LogFormat::internal(const LogAppender* failing, LogLevel level, const char* fmt, ...) {
    static NeverDestroyed<Logger> logger("Logger");
    static constinit NeverDestroyed<LogChannel> empty_channel;

    const ErrnoKeeper errnoKeeper;
    // Before initialization the logger has no channel. An empty one is used then, which writes to
    // the root appender.
    LogChannel& channel =
        logger.value._channel != nullptr ? *logger.value._channel : empty_channel.value;
    if (level < channel.minlevel) {
        return;
    }
    std::string msg;
    bool written = false;
    va_list ap;
    va_start(ap, fmt);
    try {
        msg = fmt;  // written if it cannot be formatted
        Logger::vformat(msg, errnoKeeper.saved(), fmt, ap);
        written = channel.write(LogMsgMetadata(&logger.value, level), msg, failing);
    } catch (...) {
        // Not written: falls back.
    }
    va_end(ap);
    if (!written) {
        writeToStderr(level, msg);
    }
}
