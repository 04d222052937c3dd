#include "util/LogAppender.h"

#include <pthread.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <list>
#include <string_view>
#include <utility>

#include "util/Assert.h"
#include "util/LogFormat.h"
#include "util/LogLevel.h"
#include "util/LogMsgMetadata.h"
#include "util/internal/LogRouting.h"
#include "util/internal/NeverDestroyed.h"
#include "util/internal/RetryOnEintr.h"

namespace {

// Holds an appender's lock for a scope. If locking fails, the scope runs unlocked: losing the line
// would be worse, and a report from here would recurse.
class ScopedLogLock {
public:
    explicit ScopedLogLock(Mutex& mutex) : _mutex(mutex), _locked(mutex.NOLOG_lock()) {}
    ~ScopedLogLock() {
        if (_locked) {
            _mutex.NOLOG_unlock();
        }
    }
    ScopedLogLock(const ScopedLogLock&) = delete;
    ScopedLogLock& operator=(const ScopedLogLock&) = delete;

private:
    Mutex& _mutex;
    const bool _locked;
};

const std::uint64_t IDENTITY_CHECK_SECONDS = 5;
const std::string_view QUELTA_HOME_VARIABLE = "${QUELTA_HOME}";

// Creates a layout. None is freed: an appender may still use one that another appender has
// replaced.
const LogFormat* newLayout(const char* pattern) {
    static NeverDestroyed<std::list<LogFormat>> created;
    return &created.value.emplace_back(pattern);
}

// Reads a plain decimal number: digits only, no leading zero except in "0" itself.
// Returns: false, with `result` unchanged, for anything else and for a number that does not fit.
template <typename Number>
bool readNumber(std::string_view text, Number& result) {
    if (text.empty() || (text.front() == '0' && text.size() > 1) ||
        text.find_first_not_of("0123456789") != std::string_view::npos) {
        return false;
    }
    return std::from_chars(text.data(), text.data() + text.size(), result).ec == std::errc();
}

}  // namespace

const LogFormat& defaultFormat() {
    static const NeverDestroyed<LogFormat> format("%m%n");
    return format.value;
}

LogAppender& rootAppender() {
    static NeverDestroyed<LogAppender> root;
    // At exit only the descriptor is closed. Later messages find a closed appender.
    static const struct Setup {
        Setup() {
            root.value._fd = FileDescriptor(STDERR_FILENO);
            root.value._fmt = &defaultFormat();
            ::pthread_atfork(&LogAppender::lockAll, &LogAppender::unlockAll,
                             &LogAppender::unlockAll);
        }
        ~Setup() { root.value.closeFd(); }
    } setup;
    return root.value;
}

LogAppenderMap& appenders() {
    static NeverDestroyed<LogAppenderMap> map;
    return map.value;
}

LogAppender::LogAppender() : _fd(-1) {}

// Called before a fork. The child has only the forking thread, so no other may hold a lock then.
void LogAppender::lockAll() {
    rootAppender()._mutex.NOLOG_lock();
    for (const auto& [name, appender] : appenders()) {
        appender->_mutex.NOLOG_lock();
    }
}

void LogAppender::unlockAll() {
    for (const auto& [name, appender] : appenders()) {
        appender->_mutex.NOLOG_unlock();
    }
    rootAppender()._mutex.NOLOG_unlock();
}

LogAppender* LogAppender::find(const std::string& name, bool create) {
    if (name == "rootAppender") {
        return &rootAppender();
    }
    const auto found = appenders().find(name);
    if (found != appenders().end()) {
        return found->second;
    }
    if (!create) {
        return nullptr;
    }
    return appenders()[name] = new LogAppender;
}

bool LogAppender::setAttribute(const std::string& aname, const char* val,
                               const Pathname& queltaHome) {
    const std::string_view value = val;
    if (aname == "fileName") {
        setFileName(value, queltaHome);
        return true;
    }
    if (aname == "maxFileSize") {
        return readNumber(value, _maxSize);
    }
    if (aname == "maxBackupIndex") {
        return readNumber(value, _maxBackupIndex);
    }
    if (aname == "layout") {
        return setLayout(value);
    }
    if (aname == "layout.ConversionPattern") {
        _fmt = newLayout(val);
        return true;
    }
    return false;
}

void LogAppender::setFileName(std::string_view value, const Pathname& queltaHome) {
    if (!queltaHome.empty() && value.starts_with(QUELTA_HOME_VARIABLE)) {
        value.remove_prefix(QUELTA_HOME_VARIABLE.size());
        _filename = queltaHome;
    }
    _filename.append(value);
}

bool LogAppender::setLayout(std::string_view name) {
    if (name == "BasicLayout") {
        static const NeverDestroyed<LogFormat> layout("%R %p %c %m%n");
        _fmt = &layout.value;
    } else if (name == "SimpleLayout") {
        static const NeverDestroyed<LogFormat> layout("%-8p: %m%n");
        _fmt = &layout.value;
    } else if (name != "PatternLayout") {  // its pattern comes with the next key
        return false;
    }
    return true;
}

void LogAppender::finalSetup(const char* name) {
    if (_fmt == nullptr) {
        _fmt = rootAppender()._fmt;
    }
    if (_filename.empty()) {
        if (!_fd.valid()) {
            LogFormat::internal(this, WARN, "Appender \"%s\" has no filename, assuming stderr",
                                name);
            _fd = FileDescriptor(STDERR_FILENO);
        }
        if (_maxBackupIndex != 0) {
            LogFormat::internal(this, WARN,
                                "Appender \"%s\" has maxBackupIndex set without specifying a "
                                "filename, ignoring",
                                name);
            _maxBackupIndex = 0;
        }
        if (_maxSize > 0) {
            LogFormat::internal(
                this, WARN,
                "Appender \"%s\" has maxSize set without specifying a filename, ignoring", name);
            _maxSize = 0;
        }
    }
    if (_maxBackupIndex != 0 && _maxSize == 0) {
        LogFormat::internal(
            this, WARN,
            "Appender \"%s\" has maxBackupIndex set without specifying maxSize, ignoring", name);
        _maxBackupIndex = 0;
    }
    if (!_filename.empty()) {
        closeFd();  // open if another appender's setup was reported through this one
        openFile();
        report(std::exchange(_failure, {}));
        closeFd();
    }
}

void LogAppender::write(const LogMsgMetadata& mdata, std::string_view msg) {
    // An appender may have to report another's failure before its own setup is finished.
    const LogFormat* const layout = _fmt != nullptr ? _fmt : rootAppender()._fmt;
    std::string line;
    line.reserve(2 * msg.size());  // most layouts add less than the length of the message
    layout->apply(line, mdata, msg);
    Failure failure;
    {
        const ScopedLogLock lock(_mutex);
        writeLine(line, mdata.stamp.sec());
        failure = std::exchange(_failure, {});
    }
    // The report may fail in another appender. That one's report must not come back to this one.
    const ReportMark mark(this);
    report(failure);
}

// Everything that `write` does under the lock. A closed file is opened first. If that fails, the
// line is lost. If the write fails, the file is closed, so that the next line opens it again;
// standard error stays open. Each failure is stored for the report.
void LogAppender::writeLine(const std::string& line, time_t now) {
    if (_fd.valid() && !_filename.empty()) {
        checkIdentity(now);
    }
    if (!_fd.valid() && !_filename.empty() && !openAndInitFile(now)) {
        return;
    }
    // Before its setup, an appender without a file may have to report another's failure.
    const FileDescriptor out = _fd.valid() ? _fd : FileDescriptor(STDERR_FILENO);
    const ssize_t count = out.write(line);
    if (count < 0) {
        failed(CRIT, "writing to");
        if (!_filename.empty()) {
            closeFd();
        }
        return;
    }
    _curSize += count;
    if (_maxSize > 0 && _curSize > _maxSize && !_filename.empty()) {
        rotateFile(now);
    }
}

// Closes the file if its name now refers to another file or to none.
void LogAppender::checkIdentity(time_t now) {
    // Unsigned, so that a clock that was set back counts as a long time.
    const std::uint64_t elapsed =
        static_cast<std::uint64_t>(now) - static_cast<std::uint64_t>(_lastCheck);
    if (elapsed <= IDENTITY_CHECK_SECONDS) {
        return;
    }
    struct stat status;
    if (_filename.stat(&status) && status.st_ino == _inodeNum) {
        _lastCheck = now;
    } else {
        closeFd();
    }
}

bool LogAppender::openFile() {
    const bool opened = retryOnEintr([this] {
        _fd = _filename.openCreateOrAppend(Pathname::CREATE_NORMAL);
        return _fd.valid();
    });
    if (!opened) {
        failed(ERROR, "opening");
    }
    return opened;
}

bool LogAppender::openAndInitFile(time_t now) {
    if (!openFile()) {
        return false;
    }
    struct stat status;
    if (!_fd.stat(&status)) {
        failed(CRIT, "calling fstat on");
        closeFd();
        return false;
    }
    _curSize = status.st_size;
    _inodeNum = status.st_ino;
    _lastCheck = now;
    return true;
}

// Renames each file below the first free number to the next number, or deletes the last backup if
// no number is free. Then starts a new file.
// Deliberate: a failed rename is ignored; the next file may overwrite the one that stayed.
void LogAppender::rotateFile(time_t now) {
    closeFd();
    Pathname from;
    Pathname to;
    unsigned suffix = 0;
    for (;; ++suffix) {
        filenameWithSuffix(to, suffix);
        if (suffix >= _maxBackupIndex) {
            QUELTA_ASSERT(suffix == _maxBackupIndex);
            to.unlink();
            break;
        }
        if (!to.exists()) {
            break;
        }
    }
    for (; suffix > 0; --suffix) {
        filenameWithSuffix(from, suffix - 1);
        from.renameTo(to);
        to.swap(from);
    }
    openAndInitFile(now);
}

void LogAppender::filenameWithSuffix(Pathname& result, unsigned suffix) const {
    result = _filename;
    if (suffix != 0) {
        result.append(".").append(std::to_string(suffix));
    }
}

void LogAppender::closeFd() {
    _fd.close();
}

// Stores that a call failed with the current errno.
void LogAppender::failed(LogLevel level, const char* what) {
    _failure = {level, what, errno};
}

void LogAppender::report(const Failure& failure) const {
    if (failure.what != nullptr) {
        errno = failure.errnum;
        LogFormat::internal(this, failure.level, "Error %s \"%s\": %m", failure.what,
                            _filename.c_str());
    }
}
