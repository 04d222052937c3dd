#ifndef QUELTA_UTIL_LOGGER_H_
#define QUELTA_UTIL_LOGGER_H_

// The handle through which a module writes log messages.
//
//     static Logger logger("Queue");  // one for each source, usually outside functions
//     const Pathname path("/var/queue");
//     std::FILE* const file = path.fopen("r");
//     if (file == nullptr) {
//         logger.error("cannot open %s: %m", path.c_str());
//     } else {
//         std::fclose(file);
//     }
//
// A logger is bound to the channel of its name. Loggers constructed before logging is initialized
// wait in a list for Logger::initialize(), which binds them, newest first. Later ones are bound
// when they are constructed. Binding happens once: a channel that is created afterwards is not seen
// by the loggers of its name.
//
// Before initialization a waiting logger writes through the root channel: INFO and above go to
// standard error as the bare message, DEBUG is dropped. A logger that is not on the list then (a
// copy, or a static one whose constructor has not run yet) cannot be filtered by level: its
// messages go to standard error as "LEVEL - message", whatever the level.
//
// This header includes all of logging: channels, appenders, layouts and Pathname.
//
// No entry point reports an error to its caller, throws, or changes errno.
//
// Loggers may be used before main and in destructors at exit. What a logger needs is either
// constant-initialized or created by the first logger's constructor. Static objects are destroyed
// in reverse order, so it outlives every logger.
// Configured before other threads start; safe from any thread afterwards.

#include <cstdarg>
#include <cstddef>
#include <exception>
#include <string>

#include "util/LogAppender.h"
#include "util/LogChannel.h"
#include "util/LogFormat.h"
#include "util/LogLevel.h"
#include "util/Pathname.h"

// The logger of one module.
class Logger {
public:
    // Binds the logger to the channel `name`, or has it wait for Logger::initialize().
    // Requires: `name` is not null and outlives the logger; the pointer is kept, not the text.
    explicit Logger(const char* name);
    // A copy logs to the same channel under the same name, but never waits to be bound.
    Logger(const Logger& other) = default;
    // Takes the other's channel and name. A logger that waits to be bound keeps waiting, under the
    // new name.
    Logger& operator=(const Logger& other);
    // Removes the logger from the list if it still waits to be bound.
    ~Logger();

    // Returns: whether the channel's level is DEBUG, so that callers can skip building expensive
    // text.
    bool isDebugEnabled() const;

    // Logs at level FATAL. The first form takes a printf format, in which "%m" is replaced by the
    // text of errno. The second takes the message unchanged, the third logs e.what(). The entry
    // points below do the same at their levels.
    // Cost: one comparison if the message is below the channel's level.
    void fatal(const char* fmt, ...) __attribute__((format(printf, 2, 3)));
    void fatal(const std::string& msg) { LogFormat::do_log(this, FATAL, msg); }
    void fatal(const std::exception& e) { fatal("%s", e.what()); }
    // Logs at level CRIT.
    void crit(const char* fmt, ...) __attribute__((format(printf, 2, 3)));
    void crit(const std::string& msg) { LogFormat::do_log(this, CRIT, msg); }
    void crit(const std::exception& e) { crit("%s", e.what()); }
    // Logs at level ERROR.
    void error(const char* fmt, ...) __attribute__((format(printf, 2, 3)));
    void error(const std::string& msg) { LogFormat::do_log(this, ERROR, msg); }
    void error(const std::exception& e) { error("%s", e.what()); }
    // Logs at level WARN.
    void warn(const char* fmt, ...) __attribute__((format(printf, 2, 3)));
    void warn(const std::string& msg) { LogFormat::do_log(this, WARN, msg); }
    void warn(const std::exception& e) { warn("%s", e.what()); }
    // Logs at level INFO.
    void info(const char* fmt, ...) __attribute__((format(printf, 2, 3)));
    void info(const std::string& msg) { LogFormat::do_log(this, INFO, msg); }
    void info(const std::exception& e) { info("%s", e.what()); }
    // Logs at level DEBUG.
    void debug(const char* fmt, ...) __attribute__((format(printf, 2, 3)));
    void debug(const std::string& msg) { LogFormat::do_log(this, DEBUG, msg); }
    void debug(const std::exception& e) { debug("%s", e.what()); }

    // Fixes the logging epoch and binds the waiting loggers.
    // Requires: logging is not initialized yet; asserted.
    static void initialize();

    // Sets up appenders and channels from a configuration file, then fixes the logging epoch and
    // binds the waiting loggers. `queltaHome` replaces "${QUELTA_HOME}" in file names.
    // Requires: logging is not initialized yet; asserted.
    // Returns: false if the file could not be opened, or ends inside a comment. True does not mean
    // that every line is valid: an invalid line is reported and skipped.
    static bool initialize(const Pathname& cfgFile, const Pathname& queltaHome);

    // Sets the minimum level of a channel; null names the root channel. The channel is created if
    // it does not exist, even if `level` is not a level.
    // Returns: false if `level` is not a level.
    static bool setChannelLevel(const char* name, const std::string& level);

    // Replaces `out` by a text formatted like vprintf. "%m" is replaced by the error text of
    // `errnum`; by "UNKNOWN ERROR" for a number that is not an error.
    // Deliberate: the error text becomes a part of the format, so that a "%" in it would be read
    // as a conversion.
    // Requires: the arguments fit the format; they may point into `out`.
    // Errors: std::bad_alloc, also if the C library cannot format the arguments.
    // Cost: allocates only for `out`, and for texts of 256 characters and more.
    static void vformat(std::string& out, int errnum, const char* fmt, va_list ap)
        __attribute__((format(printf, 3, 0)));
    // The same as vformat, with the arguments of printf and, in the first form, with errno.
    static void format(std::string& out, const char* fmt, ...)
        __attribute__((format(printf, 2, 3)));
    static void format(std::string& out, int errnum, const char* fmt, ...)
        __attribute__((format(printf, 3, 4)));

private:
    friend class LogFormat;  // the layouts print the name; the routing reads the channel

    // Whether the bound channel discards messages of a level; false while no channel is bound.
    bool suppresses(LogLevel level) const {
        return _channel != nullptr && level < _channel->minlevel;
    }

    const char* _channel_name;      // not owned
    std::size_t _channel_name_len;  // its length, for the layouts
    LogChannel* _channel;           // not owned; null, read as the root channel, until bound
    Logger* _next;                  // the next older logger that waits to be bound
};

#endif  // QUELTA_UTIL_LOGGER_H_
