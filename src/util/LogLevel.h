#ifndef QUELTA_UTIL_LOGLEVEL_H_
#define QUELTA_UTIL_LOGLEVEL_H_

// The severities of log messages, in ascending order, and their names.
//
// The enumerators are global names. No build of this project defines a macro DEBUG, which would
// replace the first of them.
// Safe from any thread.

#include <cstddef>
#include <cstdint>

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

// The name of a level, not padded; "???" for a value that is none of them.
// Requires: `slenp` is not null; the length of the name is stored there.
// Returns: a constant text.
inline const char* loglevel2str(std::size_t* slenp, LogLevel level) {
    struct Name {
        const char* text;
        std::size_t length;
    };
    static constexpr Name NAMES[] = {{"DEBUG", 5}, {"INFO", 4},  {"NOTICE", 6},
                                     {"WARN", 4},  {"ERROR", 5}, {"CRIT", 4},
                                     {"ALERT", 5}, {"FATAL", 5}, {"EMERG", 5}};
    static constexpr Name UNKNOWN = {"???", 3};

    const auto index = static_cast<std::uint32_t>(level);
    const Name& name = index <= static_cast<std::uint32_t>(EMERG) ? NAMES[index] : UNKNOWN;
    *slenp = name.length;
    return name.text;
}

#endif  // QUELTA_UTIL_LOGLEVEL_H_
