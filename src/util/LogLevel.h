#ifndef QUELTA_UTIL_LOGLEVEL_H_
#define QUELTA_UTIL_LOGLEVEL_H_

// The severities of log messages, in ascending order, and their names.
//
//     std::size_t length = 0;
//     std::puts(loglevel2str(&length, WARN));  // "WARN"; length is 4
//
// The enumerators are global names.
// Safe from any thread.

#include <cstddef>
#include <cstdint>
#include <string_view>

#include "util/Requirements.h"

#ifdef DEBUG
#error "DEBUG is a log level, which a macro would replace: compile without -DDEBUG"
#endif

// The severity of a message.
enum LogLevel : std::int32_t {
    DEBUG = 0,   // details for developers
    INFO = 1,    // normal operation; the default minimum of a channel
    NOTICE = 2,  // useful as a minimum; Logger has no entry point for it
    WARN = 3,    // a problem that the program works around
    ERROR = 4,   // an operation failed
    CRIT = 5,    // a part of the program failed
    ALERT = 6,   // useful as a minimum; Logger has no entry point for it
    FATAL = 7,   // the program cannot continue
    EMERG = 8    // useful as a minimum, to discard everything; Logger has no entry point for it
};

// Returns: the name of a level, not padded; "???" for any other value. The text is a constant.
inline std::string_view levelName(LogLevel level) {
    static constexpr std::string_view NAMES[] = {"DEBUG", "INFO",  "NOTICE", "WARN", "ERROR",
                                                 "CRIT",  "ALERT", "FATAL",  "EMERG"};
    return level >= DEBUG && level <= EMERG ? NAMES[level] : "???";
}

// Returns: the name of a level as a NUL-terminated constant. Its length in bytes replaces *slenp.
// Requires: `slenp` is not null.
inline const char* loglevel2str(std::size_t* slenp, LogLevel level) {
    const std::string_view name = levelName(level);
    *slenp = name.size();
    return name.data();
}

#endif  // QUELTA_UTIL_LOGLEVEL_H_
