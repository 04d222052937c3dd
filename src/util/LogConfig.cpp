#include "util/LogConfig.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <memory>
#include <string_view>
#include <utility>

#include "util/Assert.h"
#include "util/LogAppender.h"
#include "util/LogChannel.h"
#include "util/LogFormat.h"
#include "util/LogInternal.h"
#include "util/LogLevel.h"
#include "util/Logger.h"
#include "util/Pathname.h"
#include "util/Timeval.h"

namespace {

const char* const BLANKS = " \t";
const std::string_view KEY_PREFIX = "log4cpp.";
const std::string_view COMMENT_START = "<!--";
const std::string_view COMMENT_END = "-->";
const std::string_view FEED_READ("\n\0", 2);

// Removes everything from the first "#" on.
void cutRemark(std::string& line) {
    const std::size_t remark = line.find('#');
    if (remark != std::string::npos) {
        line.resize(remark);
    }
}

// Takes leading characters out of `set` off the text.
void skipAny(std::string_view& text, std::string_view set) {
    text.remove_prefix(std::min(text.find_first_not_of(set), text.size()));
}

void trimBlanks(std::string& line) {
    line.erase(line.find_last_not_of(BLANKS) + 1);
    line.erase(0, line.find_first_not_of(BLANKS));
}

// Takes the word up to the first character out of `ends` off the text.
std::string_view takeUntil(std::string_view& text, const char* ends) {
    const std::string_view word = text.substr(0, text.find_first_of(ends));
    text.remove_prefix(word.size());
    return word;
}

// Takes an equals sign with the blanks around it off the text; false when there is none.
bool takeEquals(std::string_view& text) {
    skipAny(text, BLANKS);
    if (!text.starts_with('=')) {
        return false;
    }
    text.remove_prefix(1);
    skipAny(text, BLANKS);
    return true;
}

// Tells whether a signal ended the last read, and lets reading go on then.
bool wasInterrupted(std::FILE* file) {
    if (std::ferror(file) == 0 || errno != EINTR) {
        return false;
    }
    std::clearerr(file);
    return true;
}

struct FileCloser {
    void operator()(std::FILE* file) const { std::fclose(file); }
};

}  // namespace

void ConfigReader::readLines() {
    std::string line;
    while (read_line(line, _file)) {
        ++_lineno;
        if (!dropComments(line)) {
            return;
        }
        trimBlanks(line);
        if (line.empty()) {
            continue;
        }
        if (line.starts_with(KEY_PREFIX)) {
            line.erase(0, KEY_PREFIX.size());
        }
        if (!parse(line)) {
            _errors.push_back({_lineno, line});
        }
    }
}

// Removes remarks and XML comments, which may span lines. What stands before and behind a comment
// is one line, in which both may occur again. A "#" hides what follows it on the line where a
// comment may begin, but not on the lines inside of a comment.
// Returns: false, with the line of no use, when the file ends inside a comment.
// Cost: linear, however many comments there are.
bool ConfigReader::dropComments(std::string& line) {
    cutRemark(line);
    if (line.find(COMMENT_START) == std::string::npos) {
        return true;
    }
    std::string rest;
    rest.swap(line);
    for (std::size_t next = 0; next < rest.size();) {
        line.push_back(rest[next++]);
        if (!line.ends_with(COMMENT_START)) {
            continue;
        }
        line.resize(line.size() - COMMENT_START.size());
        const std::size_t end = rest.find(COMMENT_END, next);
        if (end != std::string::npos) {
            next = end + COMMENT_END.size();
            continue;
        }
        const unsigned startedAt = _lineno;
        rest.clear();
        next = 0;
        if (!handle_xml_comment(rest, "", _lineno, _file)) {
            _openComment = startedAt;
            return false;
        }
        cutRemark(rest);
    }
    return true;
}

// Returns: false for a parse error.
bool ConfigReader::parse(const std::string& line) {
    std::string_view rest = line;
    const std::string_view key = takeUntil(rest, ".= \t");
    if (key == "rootCategory") {
        return parseRoot(line, rest);
    }
    if (!rest.starts_with('.')) {
        return false;
    }
    rest.remove_prefix(1);
    if (key == "category") {
        skipAny(rest, BLANKS);
        _categories.push_back({_lineno, std::string(rest)});
        return true;
    }
    return key == "appender" && parseAppender(rest);
}

bool ConfigReader::parseRoot(const std::string& line, std::string_view rest) {
    if (!takeEquals(rest)) {
        return false;
    }
    _rootValue = rest;
    _root = {_lineno, line};
    return true;
}

// "NAME = anything" or "NAME.ATTRIBUTE = value". The appender is made as soon as it has a name.
bool ConfigReader::parseAppender(std::string_view rest) {
    const std::string name(takeUntil(rest, ".= \t"));
    if (name.empty()) {
        return false;
    }
    LogAppender* const appender = LogAppender::find(name, true);
    if (!rest.starts_with('.')) {
        return takeEquals(rest);
    }
    rest.remove_prefix(1);
    const std::string attribute(takeUntil(rest, "= \t"));
    return takeEquals(rest) &&
           appender->setAttribute(attribute, std::string(rest).c_str(), _queltaHome);
}

// The root channel comes first: the others begin as copies of it.
void ConfigReader::setUpChannels() {
    if (_root.lineno != 0 && !rootChannel().setConfig(_rootValue.c_str())) {
        _errors.push_back(_root);
    }
    for (const NumberedText& category : _categories) {
        if (!setup_log_channel(category.text)) {
            _errors.push_back(category);
        }
    }
}

void ConfigReader::report(const Pathname& cfgFile) const {
    if (!complete()) {
        LogFormat::internal(nullptr, ERROR, "%s:%u: Unterminated XML comment started",
                            cfgFile.c_str(), _openComment);
    }
    for (const NumberedText& error : _errors) {
        LogFormat::internal(nullptr, WARN, "%s:%u: Parse error at \"%s\"", cfgFile.c_str(),
                            error.lineno, error.text.c_str());
    }
}

bool read_line(std::string& result, std::FILE* ifile) {
    char buf[128];
    result.clear();
    for (;;) {
        // fgets does not tell how much it has read, and the text may hold NUL bytes. Filled with
        // line feeds beforehand, the buffer shows it: a line feed that was read is followed by the
        // NUL that ends the text; the first one of the filling stands behind that NUL, or behind
        // what came before a signal.
        std::memset(buf, '\n', sizeof(buf));
        const char* const p = std::fgets(buf, sizeof(buf), ifile);
        const std::string_view filled(buf, sizeof(buf));
        const std::size_t feed = filled.find('\n');
        if (p == nullptr) {
            if (!wasInterrupted(ifile)) {
                return !result.empty();
            }
            result.append(filled.substr(0, feed));
            continue;
        }
        QUELTA_ASSERT(p == buf);
        if (feed == std::string_view::npos) {
            result.append(buf, sizeof(buf) - 1);
        } else if (filled.substr(feed).starts_with(FEED_READ)) {
            result.append(buf, feed);
            return true;
        } else {
            result.append(buf, feed - 1);
        }
    }
}

bool handle_xml_comment(std::string& result, const char* cf, unsigned& lineno, std::FILE* ifile) {
    std::string text = cf;
    std::size_t end = text.find(COMMENT_END);
    while (end == std::string::npos) {
        if (!read_line(text, ifile)) {
            return false;
        }
        ++lineno;
        end = text.find(COMMENT_END);
    }
    result.append(text, end + COMMENT_END.size());
    return true;
}

bool Logger::initialize(const Pathname& cfgFile, const Pathname& queltaHome) {
    QUELTA_ASSERT(!logger_initialized);
    epoch_timeval();
    std::unique_ptr<std::FILE, FileCloser> file;
    const bool opened = uninterrupted([&] {
        file.reset(cfgFile.fopen("r"));
        return file != nullptr;
    });
    if (!opened) {
        const int errnum = errno;
        initialize();
        errno = errnum;
        LogFormat::internal(nullptr, ERROR, "Couldn't open log file configuration \"%s\": %m",
                            cfgFile.c_str());
        return false;
    }
    ConfigReader reader(file.get(), queltaHome);
    reader.readLines();
    file.reset();
    reader.setUpChannels();
    initialize();
    for (const auto& [name, appender] : appenders()) {
        appender->finalSetup(name.c_str());
    }
    reader.report(cfgFile);
    return reader.complete();
}
