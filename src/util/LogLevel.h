#ifndef QUELTA_UTIL_LOGLEVEL_H_
#define QUELTA_UTIL_LOGLEVEL_H_

// The severities of log messages, in ascending order, and their names.
//
//     std::size_t length = 0;
//     std::puts(loglevel2str(&length, WARN));  // "WARN"; length is 4
//
// The enumerators are global names. No build of this project defines a macro DEBUG, which would
// replace the first of them.
// Safe from any thread.

#include <cstddef>
#include <cstdint>
#include <string_view>

// The severity of a message. Logger has no entry points for NOTICE, ALERT and EMERG; these are
// useful as minimum levels.
enum LogLevel : std::int32_t {
    DEBUG = 0,
    INFO = 1,
    NOTICE = 2,
    WARN = 3,
    ERROR = 4,
    CRIT = 5,
    ALERT = 6,
    FATAL = 7,
    EMERG = 8
};

// Returns: the name of a level, not padded; "???" for any other value. The text is a constant. Its
// length in bytes replaces *slenp.
// Requires: `slenp` is not null.
inline const char* loglevel2str(std::size_t* slenp, LogLevel level) {
    static constexpr std::string_view NAMES[] = {"DEBUG", "INFO",  "NOTICE", "WARN", "ERROR",
                                                 "CRIT",  "ALERT", "FATAL",  "EMERG"};
    const std::string_view name = level >= DEBUG && level <= EMERG ? NAMES[level] : "???";
    *slenp = name.size();
    return name.data();
}

#endif  // QUELTA_UTIL_LOGLEVEL_H_
