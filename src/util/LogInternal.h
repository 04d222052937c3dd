#ifndef QUELTA_UTIL_LOGINTERNAL_H_
#define QUELTA_UTIL_LOGINTERNAL_H_

// What the sources of the logging subsystem share among themselves and with their tests; nothing
// else includes it.
// Configured before other threads start; safe from any thread afterwards.

#include <cerrno>
#include <string>

#include "util/LogLevel.h"

class LogAppender;
class LogChannel;
class Logger;
class Timeval;

// A value that is never destroyed, so that a message from the last destructor of the process still
// finds what it needs.
template <class Value>
union Everlasting {
    Value value;

    template <class... Args>
    constexpr explicit Everlasting(Args... args) : value(args...) {}
    ~Everlasting() {}
    Everlasting(const Everlasting&) = delete;
    Everlasting& operator=(const Everlasting&) = delete;
};

// Makes a call again for as long as a signal interrupts it; `call` tells whether it succeeded, and
// leaves errno when it did not.
// Returns: whether it succeeded in the end.
template <typename Call>
bool uninterrupted(Call call) {
    bool done = call();
    while (!done && errno == EINTR) {
        done = call();
    }
    return done;
}

// False until Logger::initialize().
extern bool logger_initialized;

// The loggers that wait to be bound, newest first, linked through Logger::_next.
extern Logger* uninitialized_loggers;

// The channel of every logger that has none of its own: INFO and no appenders until configured.
// It is usable at any time, before main and after every destructor at exit.
LogChannel& rootChannel();

// Applies one channel setting, "name=value", making the channel when it does not exist. Blanks
// behind the name are dropped; an empty name is a name.
// Returns: false without "=", and when LogChannel::setConfig does not accept the whole value.
bool setup_log_channel(const std::string& line);

// The instant from which the layouts count: that of the first call, never changed afterwards.
Timeval& epoch_timeval();

// Writes "LEVEL - message" and a line feed to standard error, with one write whose result is
// ignored.
void fallback_to_stderr(LogLevel level, const std::string& msg) noexcept;

// Returns: whether LogAppender::write reports a failure of `appender` on the calling thread.
bool report_in_progress(const LogAppender* appender);

#endif  // QUELTA_UTIL_LOGINTERNAL_H_
