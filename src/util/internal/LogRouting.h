#ifndef QUELTA_UTIL_INTERNAL_LOGROUTING_H_
#define QUELTA_UTIL_INTERNAL_LOGROUTING_H_

// The routing of messages that do not simply go to a channel: the fallback to standard error, and
// the appenders that must not get a report. LogRouting.cpp also defines the routing functions of
// LogFormat: do_log, internal and check_for_unitialized_logger.
// Safe from any thread.

#include <string>

#include "util/LogLevel.h"

class LogAppender;

// Writes "LEVEL - message" and a newline to standard error, with one write whose result is ignored.
// Throws nothing.
void fallback_to_stderr(LogLevel level, const std::string& msg) noexcept;

// Marks an appender, for the current thread and scope, as one whose failed write is being reported.
// It gets no report meanwhile, so appenders that all fail do not recurse.
class ReportMark {
public:
    explicit ReportMark(const LogAppender* appender) : _appender(appender), _outer(s_innermost) {
        s_innermost = this;
    }
    ~ReportMark() { s_innermost = _outer; }
    ReportMark(const ReportMark&) = delete;
    ReportMark& operator=(const ReportMark&) = delete;

    // Returns: whether a mark of the calling thread is on `appender`.
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
    const ReportMark* const _outer;  // the marks of nested reports are linked through the stack
};

#endif  // QUELTA_UTIL_INTERNAL_LOGROUTING_H_
