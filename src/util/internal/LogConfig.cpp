#include "util/internal/LogConfig.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <string_view>

#include "util/Assert.h"
#include "util/LogAppender.h"
#include "util/LogChannel.h"
#include "util/LogFormat.h"
#include "util/Pathname.h"
#include "util/internal/LogGlobals.h"

namespace {

const char* const BLANKS = " \t";
const std::string_view KEY_PREFIX = "log4cpp.";
const std::string_view COMMENT_START = "<!--";
const std::string_view COMMENT_END = "-->";

// Removes everything from the first "#" on.
void cutComment(std::string& line) {
    line.erase(std::min(line.find('#'), line.size()));
}

// Removes the leading characters that are in `set`.
void skipAny(std::string_view& text, std::string_view set) {
    text.remove_prefix(std::min(text.find_first_not_of(set), text.size()));
}

void trimBlanks(std::string& line) {
    line.erase(line.find_last_not_of(BLANKS) + 1);
    line.erase(0, line.find_first_not_of(BLANKS));
}

// Removes and returns the text before the first character that is in `ends`.
std::string_view takeUntil(std::string_view& text, const char* ends) {
    const std::string_view word = text.substr(0, text.find_first_of(ends));
    text.remove_prefix(word.size());
    return word;
}

// Removes an equals sign and the blanks around it.
// Returns: false, with only blanks removed, if there is no equals sign.
bool takeEquals(std::string_view& text) {
    skipAny(text, BLANKS);
    if (!text.starts_with('=')) {
        return false;
    }
    text.remove_prefix(1);
    skipAny(text, BLANKS);
    return true;
}

// Returns: whether a signal interrupted the last read; the error is then cleared.
bool wasInterrupted(std::FILE* file) {
    if (std::ferror(file) == 0 || errno != EINTR) {
        return false;
    }
    std::clearerr(file);
    return true;
}

// handle_xml_comment for a text that may hold NUL bytes.
bool skipComment(std::string& result, std::string text, unsigned& lineno, std::FILE* ifile) {
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

// Removes "#" comments and XML comments, which may span lines. The text before and after an XML
// comment is joined and read again as one line.
// Returns: false, with `line` unspecified, if the file ends inside an XML comment.
bool ConfigReader::dropComments(std::string& line) {
    for (;;) {
        cutComment(line);
        const std::size_t start = line.find(COMMENT_START);
        if (start == std::string::npos) {
            return true;
        }
        const std::string after = line.substr(start + COMMENT_START.size());
        line.resize(start);
        const unsigned startedAt = _lineno;
        if (!skipComment(line, after, _lineno, _file)) {
            _openComment = startedAt;
            return false;
        }
    }
}

// Returns: false for a parse error.
bool ConfigReader::parse(const std::string& line) {
    std::string_view rest = line;
    const std::string_view key = takeUntil(rest, ".= \t");
    if (key == "rootCategory") {
        if (!takeEquals(rest)) {
            return false;
        }
        _root = {_lineno, std::string(rest)};
        return true;
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

// "NAME = anything" or "NAME.ATTRIBUTE = value". The appender is created as soon as
// its name is known.
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
    if (_root.lineno != 0 && !rootChannel().setConfig(_root.text.c_str())) {
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

bool setup_log_channel(const std::string& line) {
    const std::size_t equals = line.find('=');
    if (equals == std::string::npos) {
        return false;
    }
    std::string name = line.substr(0, equals);
    name.erase(name.find_last_not_of(BLANKS) + 1);  // npos + 1 is 0: only blanks
    return LogChannel::find(name, true)->setConfig(line.c_str() + equals + 1);
}

bool read_line(std::string& result, std::FILE* ifile) {
    char buf[128];
    const std::string_view filled(buf, sizeof(buf));
    result.clear();
    while (!result.ends_with('\n')) {
        // fgets does not return the length, and the text may contain NUL bytes. The buffer is
        // therefore filled with newlines first. The last NUL in it is then the one that fgets
        // appended.
        std::memset(buf, '\n', sizeof(buf));
        const char* const p = std::fgets(buf, sizeof(buf), ifile);
        if (p != nullptr) {
            QUELTA_ASSERT(p == buf);
            result += filled.substr(0, filled.rfind('\0'));
        } else if (wasInterrupted(ifile)) {
            // fgets has appended no NUL. What it read before the signal ends where the fill begins.
            result += filled.substr(0, filled.find('\n'));
        } else {
            return !result.empty();
        }
    }
    result.pop_back();
    return true;
}

bool handle_xml_comment(std::string& result, const char* cf, unsigned& lineno, std::FILE* ifile) {
    return skipComment(result, cf, lineno, ifile);
}
