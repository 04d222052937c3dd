#include "util/LogAppender.h"

#include <pthread.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <limits>
#include <memory>
#include <new>
#include <string_view>
#include <vector>

#include "util/Assert.h"
#include "util/ErrnoKeeper.h"
#include "util/LogFormat.h"
#include "util/LogInternal.h"
#include "util/LogLevel.h"
#include "util/LogMsgMetadata.h"

// What could not be done, and why.
struct LogAppender::Failure {
    Problem what = Problem::NONE;
    int errnum = 0;
};

namespace {

// Holds an appender's lock for a scope. A lock that cannot be had is no reason to lose the line,
// and must not be reported from within: the scope then goes without.
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

// Every layout ever made for an appender. A layout that an attribute line has replaced may still be
// in use by an appender that took it over, so none is freed; the list keeps them reachable.
const LogFormat* newLayout(const char* pattern) {
    static auto* const layouts = new std::vector<std::unique_ptr<const LogFormat>>;
    layouts->push_back(std::make_unique<const LogFormat>(pattern));
    return layouts->back().get();
}

// The shared layouts are never destroyed: appenders write through them until the process ends.
const LogFormat* basicLayout() {
    static const LogFormat* const layout = new LogFormat("%R %p %c %m%n");
    return layout;
}

const LogFormat* simpleLayout() {
    static const LogFormat* const layout = new LogFormat("%-8p: %m%n");
    return layout;
}

// Reads a plain decimal number: digits only, no leading zero but in "0" itself.
// Returns: false, with `result` as it was, for anything else and for a number that does not fit.
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
    static const LogFormat* const format = new LogFormat("%m%n");
    return *format;
}

LogAppender& rootAppender() {
    // The appender itself outlives everything; only its descriptor is closed at exit. What is
    // logged even later finds a closed appender and not a destroyed one.
    struct Root {
        LogAppender* const appender = new LogAppender;
        Root() {
            appender->_fd = FileDescriptor(STDERR_FILENO);
            appender->_fmt = &defaultFormat();
            ::pthread_atfork(&LogAppender::lockAll, &LogAppender::unlockAll,
                             &LogAppender::unlockAll);
        }
        ~Root() { appender->closeFd(); }
    };
    static const Root root;
    return *root.appender;
}

LogAppenderMap& appenders() {
    static Everlasting<LogAppenderMap> map;
    return map.value;
}

LogAppender::LogAppender() : _fd(-1) {}

LogAppender::~LogAppender() {
    if (!_filename.empty()) {
        closeFd();
    }
}

// Around a fork: the child has only the forking thread, so no other may hold a lock then.
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
    auto made = std::make_unique<LogAppender>();
    appenders().emplace(name, made.get());
    return made.release();
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
        _fmt = basicLayout();
    } else if (name == "SimpleLayout") {
        _fmt = simpleLayout();
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
        closeFd();  // open already when another appender's setup was reported through this one
        openFile();
        closeFd();
    }
}

void LogAppender::write(const LogMsgMetadata& mdata, const std::string& msg) {
    const ErrnoKeeper keeper;
    // An appender may be asked to report another one's trouble before its own setup is finished.
    const LogFormat* const layout = _fmt != nullptr ? _fmt : rootAppender()._fmt;
    std::string line;
    layout->apply(line, mdata, msg);
    Failure failure;
    {
        const ScopedLogLock lock(_mutex);
        writeLine(line, mdata.stamp.sec(), failure);
    }
    report(failure);
}

// Everything that `write` does under the lock.
void LogAppender::writeLine(const std::string& line, time_t now, Failure& failure) {
    if (_fd.valid() && !_filename.empty()) {
        checkIdentity(now);
    }
    if (!_fd.valid() && !_filename.empty() && !openAndInitFile(now, &failure)) {
        return;
    }
    // Without a file and before its setup, an appender is asked to report another one's trouble.
    const FileDescriptor out = _fd.valid() ? _fd : FileDescriptor(STDERR_FILENO);
    const ssize_t count = out.write(line);
    if (count < 0 || (count == 0 && !line.empty())) {
        if (count == 0) {
            errno = ENOSPC;  // neither taken nor refused: the device is full
        }
        failed(Problem::WRITE, &failure);
        if (!_filename.empty()) {
            closeFd();
        }
        return;
    }
    const file_offset_t room = std::numeric_limits<file_offset_t>::max() - _curSize;
    _curSize += std::min<file_offset_t>(count, room);
    if (_maxSize > 0 && _curSize > _maxSize && !_filename.empty()) {
        rotateFile(now, &failure);
    }
}

// Closes the file when it is not the one of that name any more: moved or deleted by someone else.
void LogAppender::checkIdentity(time_t now) {
    // Unsigned, so that a clock that went back counts as a long time.
    const std::uint64_t elapsed =
        static_cast<std::uint64_t>(now) - static_cast<std::uint64_t>(_lastCheck);
    if (elapsed <= IDENTITY_CHECK_SECONDS) {
        return;
    }
    struct stat status;
    if (uninterrupted([&] { return _filename.stat(&status); }) && status.st_ino == _inodeNum) {
        _lastCheck = now;
    } else {
        closeFd();
    }
}

bool LogAppender::openFile(Failure* later) {
    const bool opened = uninterrupted([this] {
        _fd = _filename.openCreateOrAppend(Pathname::CREATE_NORMAL);
        return _fd.valid();
    });
    if (!opened) {
        failed(Problem::OPEN, later);
        return false;
    }
    return true;
}

bool LogAppender::openAndInitFile(time_t now, Failure* later) {
    if (!openFile(later)) {
        return false;
    }
    struct stat status;
    if (!uninterrupted([&] { return _fd.stat(&status); })) {
        failed(Problem::FSTAT, later);
        closeFd();
        return false;
    }
    _curSize = status.st_size;
    _inodeNum = status.st_ino;
    _lastCheck = now;
    return true;
}

void LogAppender::rotateFile(time_t now, Failure* later) {
    closeFd();
    try {
        shiftBackups();
    } catch (const std::bad_alloc&) {
        // The line that led here is written; the next one leads here again.
    }
    openAndInitFile(now, later);
}

// Makes the base file's name free: moves each file up to the first free number one further, or
// deletes the last one when there is no free number.
// Deliberate: a file that cannot be moved is not waited for; the next one may take its name.
void LogAppender::shiftBackups() {
    Pathname from;
    Pathname to;
    unsigned suffix = 0;
    for (;; ++suffix) {
        filenameWithSuffix(to, suffix);
        if (suffix >= _maxBackupIndex) {
            QUELTA_ASSERT(suffix == _maxBackupIndex);
            uninterrupted([&] { return to.unlink(); });
            break;
        }
        if (!uninterrupted([&] { return to.exists(); })) {
            break;
        }
    }
    for (; suffix > 0; --suffix) {
        filenameWithSuffix(from, suffix - 1);
        uninterrupted([&] { return from.renameTo(to); });
        to.swap(from);
    }
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

// Notes a failure with the present errno, or reports it at once.
void LogAppender::failed(Problem what, Failure* later) const {
    const Failure failure{what, errno};
    if (later != nullptr) {
        *later = failure;
    } else {
        report(failure);
    }
}

void LogAppender::report(const Failure& failure) const {
    const char* const name = _filename.c_str();
    errno = failure.errnum;
    switch (failure.what) {
        case Problem::NONE:
            break;
        case Problem::OPEN:
            LogFormat::internal(this, ERROR, "Error opening \"%s\": %m", name);
            break;
        case Problem::FSTAT:
            LogFormat::internal(this, CRIT, "Error calling fstat on \"%s\": %m", name);
            break;
        case Problem::WRITE:
            LogFormat::internal(this, CRIT, "Error writing to \"%s\": %m", name);
            break;
    }
}
