#include "support/SlowConfig.h"

#include <algorithm>
#include <cstddef>
#include <limits>

namespace {

using Words = std::vector<std::string>;

constexpr std::size_t NPOS = std::string::npos;

Words splitLines(std::string text) {
    Words lines;
    if (!text.empty() && text.back() != '\n') {
        text += '\n';
    }
    for (std::size_t end; (end = text.find('\n')) != NPOS;) {
        lines.push_back(text.substr(0, end));
        text.erase(0, end + 1);
    }
    return lines;
}

std::string withoutLeading(std::string text) {
    while (!text.empty() && (text[0] == ' ' || text[0] == '\t')) {
        text.erase(0, 1);
    }
    return text;
}

std::string trimmed(std::string text) {
    while (!text.empty() && (text.back() == ' ' || text.back() == '\t')) {
        text.pop_back();
    }
    return withoutLeading(text);
}

// Removes and returns the text before the first of `ends`.
std::string take(std::string& text, const std::string& ends) {
    const std::size_t end = std::min(text.find_first_of(ends), text.size());
    const std::string taken = text.substr(0, end);
    text.erase(0, end);
    return taken;
}

bool takeEquals(std::string& text) {
    text = withoutLeading(text);
    if (text.substr(0, 1) != "=") {
        return false;
    }
    text = withoutLeading(text.substr(1));
    return true;
}

// A decimal number of at most `most`.
bool number(const std::string& text, unsigned long long most, unsigned long long& result) {
    const std::string largest = std::to_string(most);
    if (text.empty() || text.find_first_not_of("0123456789") != NPOS ||
        (text[0] == '0' && text != "0") || text.size() > largest.size() ||
        (text.size() == largest.size() && text > largest)) {
        return false;
    }
    result = std::stoull(text);
    return true;
}

bool setAttribute(SlowConfig::Appender& appender, const std::string& name, const std::string& value,
                  const std::string& home) {
    unsigned long long result = 0;
    if (name == "fileName") {
        const std::string variable = "${QUELTA_HOME}";
        const bool replaces = !home.empty() && value.substr(0, variable.size()) == variable;
        appender.fileName =
            replaces ? home + value.substr(variable.size()) : appender.fileName + value;
        return true;
    }
    if (name == "maxFileSize" && number(value, std::numeric_limits<long long>::max(), result)) {
        appender.maxSize = static_cast<long long>(result);
        return true;
    }
    if (name == "maxBackupIndex" && number(value, std::numeric_limits<unsigned>::max(), result)) {
        appender.maxBackups = static_cast<unsigned>(result);
        return true;
    }
    if (name == "layout" && value == "BasicLayout") {
        appender.pattern = "%R %p %c %m%n";
    } else if (name == "layout" && value == "SimpleLayout") {
        appender.pattern = "%-8p: %m%n";
    } else if (name == "layout.ConversionPattern") {
        appender.pattern = value;
    } else {
        return name == "layout" && value == "PatternLayout";
    }
    return true;
}

bool readAppender(SlowConfig& config, std::string rest, const std::string& home) {
    const std::string name = take(rest, ".= \t");
    if (name.empty()) {
        return false;
    }
    SlowConfig::Appender& appender = config.appenders[name];
    if (rest.substr(0, 1) != ".") {
        return takeEquals(rest);
    }
    rest.erase(0, 1);
    const std::string attribute = take(rest, "= \t");
    return takeEquals(rest) &&
           setAttribute(appender, attribute, rest.substr(0, rest.find('\0')), home);
}

bool readLine(SlowConfig& config, const SlowConfig::Line& line, const std::string& home) {
    std::string rest = line.text;
    const std::string key = take(rest, ".= \t");
    if (key == "rootCategory") {
        if (!takeEquals(rest)) {
            return false;
        }
        config.root = {line.number, rest};
        return true;
    }
    if (rest.substr(0, 1) != ".") {
        return false;
    }
    rest.erase(0, 1);
    if (key == "category") {
        config.categories.push_back({line.number, withoutLeading(rest)});
        return true;
    }
    return key == "appender" && readAppender(config, rest, home);
}

// Removes "#" and XML comments from a line. `next` is the number of lines read so far.
// Returns: false if a comment has no end; `config` then has its line.
bool dropComments(SlowConfig& config, const Words& lines, std::size_t& next, std::string& line) {
    for (;;) {
        line = line.substr(0, line.find('#'));
        const std::size_t start = line.find("<!--");
        if (start == NPOS) {
            return true;
        }
        const auto startedAt = static_cast<unsigned>(next);
        std::string rest = line.substr(start + 4);
        while (rest.find("-->") == NPOS) {
            if (next == lines.size()) {
                config.openComment = startedAt;
                return false;
            }
            rest = lines[next++];
        }
        line = line.substr(0, start) + rest.substr(rest.find("-->") + 3);
    }
}

}  // namespace

SlowConfig readConfigSlowly(const std::string& contents, const std::string& home) {
    SlowConfig config;
    const Words lines = splitLines(contents);
    for (std::size_t next = 0; next < lines.size();) {
        std::string text = lines[next++];
        if (!dropComments(config, lines, next, text)) {
            break;
        }
        text = trimmed(text);
        if (text.substr(0, 8) == "log4cpp.") {
            text.erase(0, 8);
        } else if (text.empty()) {
            continue;
        }
        const SlowConfig::Line line{static_cast<unsigned>(next), text};
        if (!readLine(config, line, home)) {
            config.errors.push_back(line);
        }
    }
    return config;
}

SlowChannel readChannelSlowly(const SlowConfig& config, const std::string& value, int level) {
    const Words levels = {"DEBUG", "INFO",  "NOTICE", "WARN", "ERROR",
                          "CRIT",  "ALERT", "FATAL",  "EMERG"};
    SlowChannel channel{level, {}, true};
    std::string rest = value.substr(0, value.find('\0'));
    for (rest += ','; !rest.empty(); rest.erase(0, 1)) {
        const std::string word = take(rest, " \t,");
        const auto found = std::find(levels.begin(), levels.end(), word);
        if (found != levels.end()) {
            channel.level = static_cast<int>(found - levels.begin());
        } else if (word == "rootAppender" || config.appenders.count(word) != 0) {
            channel.appenders.push_back(word);
        } else if (!word.empty()) {
            channel.accepted = false;
        }
    }
    return channel;
}
