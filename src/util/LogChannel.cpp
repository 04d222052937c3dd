#include "util/LogChannel.h"

#include <functional>
#include <list>
#include <map>
#include <string_view>

#include "util/LogAppender.h"
#include "util/internal/LogGlobals.h"
#include "util/internal/LogRouting.h"
#include "util/internal/NeverDestroyed.h"

namespace {

constexpr std::string_view SEPARATORS = " \t,";

// Creates a channel. Channels are never destroyed: loggers still write through them after the map
// below is emptied.
LogChannel* newChannel() {
    static NeverDestroyed<std::list<LogChannel>> created;
    return &created.value.emplace_back(rootChannel());
}

// Channels by name, found without a copy of the name.
using ChannelMap = std::map<std::string, LogChannel*, std::less<>>;

// Emptied at exit. The map itself is never destroyed: a logger that is created even later looks its
// name up and finds the root channel.
ChannelMap& channels() {
    static NeverDestroyed<ChannelMap> map;
    static const struct Emptier {
        ~Emptier() { map.value.clear(); }
    } emptier;
    return map.value;
}

LogChannel* findChannel(std::string_view name, bool create) {
    const auto found = channels().find(name);
    if (found != channels().end()) {
        return found->second;
    }
    return create ? channels()[std::string(name)] = newChannel() : &rootChannel();
}

}  // namespace

LogChannel* LogChannel::find(const std::string& name, bool create) {
    return findChannel(name, create);
}

LogChannel* LogChannel::find(const char* name, bool create) {
    return findChannel(name, create);
}

bool LogChannel::changeLevel(const std::string& word) {
    for (int level = DEBUG; level <= EMERG; ++level) {
        if (word == levelName(static_cast<LogLevel>(level))) {
            minlevel = static_cast<LogLevel>(level);
            return true;
        }
    }
    return false;
}

bool LogChannel::applyConfWord(const std::string& word, bool* got_appender_p) {
    if (changeLevel(word)) {
        return true;
    }
    LogAppender* const appender = LogAppender::find(word, false);
    if (appender == nullptr) {
        return false;
    }
    if (!*got_appender_p) {
        _appenders.clear();
        *got_appender_p = true;
    }
    _appenders.push_back(appender);
    return true;
}

bool LogChannel::setConfig(const char* value) {
    const std::string_view text = value;
    bool gotAppender = false;
    bool allAccepted = true;
    std::size_t begin = text.find_first_not_of(SEPARATORS);
    while (begin != std::string_view::npos) {
        const std::size_t end = text.find_first_of(SEPARATORS, begin);
        // Apply every word, even after a rejected one.
        if (!applyConfWord(std::string(text.substr(begin, end - begin)), &gotAppender)) {
            allAccepted = false;
        }
        begin = text.find_first_not_of(SEPARATORS, end);
    }
    return allAccepted;
}

void LogChannel::write(const LogMsgMetadata& mdata, std::string_view msg) {
    if (_appenders.empty()) {
        rootAppender().write(mdata, msg);
        return;
    }
    for (LogAppender* const appender : _appenders) {
        appender->write(mdata, msg);
    }
}

bool LogChannel::write(const LogMsgMetadata& mdata, std::string_view msg,
                       const LogAppender* dont_touch) {
    bool written = false;
    const auto writeTo = [&](LogAppender& appender) {
        if (&appender != dont_touch && !ReportMark::covers(&appender)) {
            appender.write(mdata, msg);
            written = true;
        }
    };
    if (_appenders.empty()) {
        writeTo(rootAppender());
    }
    for (LogAppender* const appender : _appenders) {
        writeTo(*appender);
    }
    return written;
}
