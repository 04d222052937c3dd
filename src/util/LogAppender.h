#ifndef QUELTA_UTIL_LOGAPPENDER_H_
#define QUELTA_UTIL_LOGAPPENDER_H_

// One output of the logging subsystem: a file, or standard error, with a layout, an optional size
// limit with numbered backups, and a lock that keeps lines whole.
//
//     LogAppender* const appender = LogAppender::find("queueFile", true);
//     const Pathname home("/opt/quelta");
//     if (appender->setAttribute("fileName", "${QUELTA_HOME}/var/log/queue.log", home) &&
//         appender->setAttribute("maxFileSize", "1000000", home)) {
//         appender->finalSetup("queueFile");
//     }
//
// Order of calls: `find` creates an appender under its name, `setAttribute` sets its attributes,
// `finalSetup` ends the configuration. After that only `write` is used. The first write opens the
// file. A rotation closes it and opens a new one. After a failed write, or if another process has
// moved or deleted the file, it is closed and the next write opens it again.
//
// Rotation: when the file is larger than `_maxSize`, app.log becomes app.log.1, app.log.1 becomes
// app.log.2 and so on, up to the first number that is free. If no number is free, app.log.N is
// deleted, where N is `_maxBackupIndex`.
//
// Failures never reach the caller. LogFormat::internal reports them to the other appenders of the
// channel named "Logger". Under the lock a failure is only stored; it is reported after the unlock.
// Appenders that report to each other and all fail therefore neither deadlock nor recurse.
//
// Invariants: `_fd` is negative while the file is closed; `_curSize`, `_inodeNum` and `_lastCheck`
// describe the file that `_fd` refers to and mean nothing while it is closed. An appender without a
// file name writes to the descriptor that it has and is never rotated.
//
// A fork waits until no appender is writing a line. The child finds all of them unlocked and may
// log, too.
//
// Configured before other threads start; safe from any thread afterwards (serialised by `_mutex`).

#include <sys/types.h>

#include <cstdint>
#include <ctime>
#include <map>
#include <string>
#include <string_view>

#include "util/FileDescriptor.h"
#include "util/LogLevel.h"
#include "util/Mutex.h"
#include "util/Pathname.h"

class LogAppender;
class LogFormat;
struct LogMsgMetadata;

// A size of a file, in bytes.
using file_offset_t = std::int64_t;

// Appender by name, in name order; not owning.
using LogAppenderMap = std::map<std::string, LogAppender*>;

// An output of messages.
class LogAppender {
public:
    // Creates a closed appender without file name, size limit, backups and layout.
    LogAppender();
    LogAppender(const LogAppender&) = delete;
    LogAppender& operator=(const LogAppender&) = delete;

    // Finds an appender by name; with `create`, creates it if it does not exist. "rootAppender"
    // always names the root appender, which is not in appenders().
    // Returns: the appender; null if it does not exist and `create` is false.
    // Owns: the appenders live until the process ends.
    static LogAppender* find(const std::string& name, bool create);

    // Sets one attribute: "fileName", "maxFileSize" (bytes), "maxBackupIndex", "layout"
    // ("BasicLayout", "SimpleLayout" or "PatternLayout") or "layout.ConversionPattern". A leading
    // "${QUELTA_HOME}" of a file name is replaced by `queltaHome`, unless that is empty.
    // Deliberate: "fileName" appends, so the key given twice joins both values into one name.
    // Requires: `val` not null.
    // Returns: false, with nothing changed, for any other key, an unknown layout name and a number
    // that is not plain decimal, has a leading zero or does not fit.
    [[nodiscard]] bool setAttribute(const std::string& aname, const char* val,
                                    const Pathname& queltaHome);

    // Ends the configuration. An appender without a layout takes the root appender's, and one
    // without a file writes to standard error. Settings that make no sense are reset with a
    // warning. The file is opened once, so that a bad path shows at start-up and not with the first
    // message. `name` (not null) is used in the warnings. Logger::initialize(file, home) calls this
    // for every named appender after it has read the file.
    void finalSetup(const char* name);

    // Formats one line and writes it, then rotates the file if it is larger than its limit. Message
    // stamps, not the clock, decide when the file's identity is checked.
    // If nothing of a line can be written, that is reported and the line is lost. A line cut short
    // by a full device counts with the bytes that were written. The next line tries again.
    // Errors: std::bad_alloc when the line cannot be formatted. errno is not kept.
    // Cost: one `write`; at most one `stat` in five seconds of message time.
    void write(const LogMsgMetadata& mdata, std::string_view msg);

private:
    friend LogAppender& rootAppender();
    // A failed system call, to be reported after the lock is released.
    struct Failure {
        LogLevel level = ERROR;
        const char* what = nullptr;  // null: nothing failed
        int errnum = 0;
    };

    static void lockAll();
    static void unlockAll();

    void setFileName(std::string_view value, const Pathname& queltaHome);
    bool setLayout(std::string_view name);

    // The operations below run under the lock, except for the check at start-up. They store a
    // failure in _failure, for a report after the unlock.
    void writeLine(const std::string& line, time_t now);
    void checkIdentity(time_t now);
    bool openFile();
    bool openAndInitFile(time_t now);
    void rotateFile(time_t now);
    void filenameWithSuffix(Pathname& result, unsigned suffix) const;
    void closeFd();

    void failed(LogLevel level, const char* what);
    void report(const Failure& failure) const;

    FileDescriptor _fd;          // negative: closed
    Pathname _filename;          // empty: standard error
    file_offset_t _maxSize = 0;  // bytes; 0: no limit, no rotation
    file_offset_t _curSize = 0;  // bytes, as counted from what was written
    std::uint32_t _maxBackupIndex = 0;
    const LogFormat* _fmt = nullptr;  // not owned
    Mutex _mutex;                     // held around everything `write` does after formatting
    ino_t _inodeNum = 0;              // of the file when it was opened
    time_t _lastCheck = 0;            // seconds of message stamps: identity last confirmed
    Failure _failure;                 // of the write under way; reported after the unlock
};

// The appender that takes every message of a channel without appenders: standard error, with the
// default layout. Its descriptor is closed at exit. Created on first use.
LogAppender& rootAppender();

// The layout "%m%n". Created on first use.
const LogFormat& defaultFormat();

// Every named appender. Created on first use. Neither the map nor an appender is ever destroyed, so
// loggers may write through them until the process ends.
LogAppenderMap& appenders();

#endif  // QUELTA_UTIL_LOGAPPENDER_H_
