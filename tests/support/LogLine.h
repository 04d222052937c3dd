#ifndef QUELTA_TESTS_SUPPORT_LOGLINE_H_
#define QUELTA_TESTS_SUPPORT_LOGLINE_H_

// One line of a layout for a message with a chosen stamp.

#include <string>

#include "util/LogFormat.h"
#include "util/LogMsgMetadata.h"

// Metadata stamped with a chosen time instead of the current one.
inline LogMsgMetadata stampedAt(const Logger& logger, LogLevel level, long long sec,
                                long long usec = 0) {
    LogMsgMetadata mdata(&logger, level);
    mdata.stamp.set(sec, usec);
    return mdata;
}

inline std::string lineOf(const LogFormat& layout, const LogMsgMetadata& mdata,
                          const std::string& msg) {
    std::string line;
    layout.apply(line, mdata, msg);
    return line;
}

inline std::string lineOf(const char* pattern, const LogMsgMetadata& mdata,
                          const std::string& msg) {
    return lineOf(LogFormat(pattern), mdata, msg);
}

#endif  // QUELTA_TESTS_SUPPORT_LOGLINE_H_
