#ifndef QUELTA_UTIL_LOGMSGMETADATA_H_
#define QUELTA_UTIL_LOGMSGMETADATA_H_

// The time, the logger and the level of a message: everything except its text.
//
//     #include "util/Logger.h"
//     static const Logger logger("Queue");
//     const LogMsgMetadata metadata(&logger, WARN);
//     std::printf("%lld\n", metadata.stamp.sec());
//
// It is built once for each message that passes the level test, and read by every appender and
// layout that the message reaches.
// Immutable after construction; safe to share.

#include "util/LogLevel.h"
#include "util/Timeval.h"

class Logger;

// The time, the logger and the level of a message.
struct LogMsgMetadata {
    // Stamps the current time.
    // Requires: `logger` is not null and outlives the metadata.
    LogMsgMetadata(const Logger* logger, LogLevel lvl) : category(logger), level(lvl) {}

    CurrentTimeval stamp;    // when the message was logged
    const Logger* category;  // the logger that wrote the message, not owned
    LogLevel level;          // its severity
};

#endif  // QUELTA_UTIL_LOGMSGMETADATA_H_
