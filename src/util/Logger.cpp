#include "util/Logger.h"

#include <cerrno>
#include <cstring>
#include <string_view>

#include "util/Assert.h"
#include "util/LogAppender.h"
#include "util/LogFormat.h"
#include "util/Timeval.h"
#include "util/internal/ErrnoKeeper.h"
#include "util/internal/FileCloser.h"
#include "util/internal/FormatText.h"
#include "util/internal/LogConfig.h"
#include "util/internal/LogGlobals.h"
#include "util/internal/RetryOnEintr.h"

Logger::Logger(const char* name)
    : _channel_name(name), _channel_name_len(std::strlen(name)), _channel(nullptr), _next(nullptr) {
    // Static objects are destroyed in the reverse order of their construction. This call constructs
    // the root appender before the logger, at the latest. So the root appender closes its
    // descriptor after the logger's last message.
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
    if (this != &other) {
        _channel_name = other._channel_name;
        _channel_name_len = other._channel_name_len;
        _channel = other._channel;
    }
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

bool Logger::initialize(const Pathname& cfgFile, const Pathname& queltaHome) {
    QUELTA_ASSERT(!logger_initialized);
    epoch_timeval();
    OpenFile file;
    const bool opened = retryOnEintr([&] {
        file.reset(cfgFile.fopen("r"));
        return file != nullptr;
    });
    if (!opened) {
        {
            const ErrnoKeeper errnoKeeper;
            initialize();
        }
        LogFormat::internal(nullptr, ERROR, "Couldn't open log file configuration \"%s\": %m",
                            cfgFile.c_str());
        return false;
    }
    ConfigReader reader(file.get(), queltaHome);
    reader.readLines();
    file.reset();
    reader.setUpChannels();
    initialize();
    for (const auto& [name, appender] : appenders()) {
        appender->finalSetup(name.c_str());
    }
    reader.report(cfgFile);
    return reader.complete();
}

bool Logger::setChannelLevel(const char* name, const std::string& level) {
    LogChannel& channel = name == nullptr ? rootChannel() : *LogChannel::find(name, true);
    return channel.changeLevel(level);
}

void Logger::vformat(std::string& out, int errnum, const char* fmt, va_list ap) {
    formatMessage(errnum, fmt, ap, [&](std::string_view text) { out = text; });
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
    if (suppresses(FATAL)) {
        return;
    }
    va_list ap;
    va_start(ap, fmt);
    LogFormat::do_log(this, FATAL, fmt, ap);
    va_end(ap);
}

void Logger::crit(const char* fmt, ...) {
    if (suppresses(CRIT)) {
        return;
    }
    va_list ap;
    va_start(ap, fmt);
    LogFormat::do_log(this, CRIT, fmt, ap);
    va_end(ap);
}

void Logger::error(const char* fmt, ...) {
    if (suppresses(ERROR)) {
        return;
    }
    va_list ap;
    va_start(ap, fmt);
    LogFormat::do_log(this, ERROR, fmt, ap);
    va_end(ap);
}

void Logger::warn(const char* fmt, ...) {
    if (suppresses(WARN)) {
        return;
    }
    va_list ap;
    va_start(ap, fmt);
    LogFormat::do_log(this, WARN, fmt, ap);
    va_end(ap);
}

void Logger::info(const char* fmt, ...) {
    if (suppresses(INFO)) {
        return;
    }
    va_list ap;
    va_start(ap, fmt);
    LogFormat::do_log(this, INFO, fmt, ap);
    va_end(ap);
}

void Logger::debug(const char* fmt, ...) {
    if (suppresses(DEBUG)) {
        return;
    }
    va_list ap;
    va_start(ap, fmt);
    LogFormat::do_log(this, DEBUG, fmt, ap);
    va_end(ap);
}
