#include "util/LogChannel.h"

#include <functional>
#include <map>
#include <string_view>

#include "util/LogAppender.h"
#include "util/LogInternal.h"

namespace {

constexpr std::string_view SEPARATORS = " \t,";

struct LevelWord {
    std::string_view text;
    LogLevel level;
};

constexpr LevelWord LEVEL_WORDS[] = {{"DEBUG", DEBUG}, {"INFO", INFO},   {"NOTICE", NOTICE},
                                     {"WARN", WARN},   {"ERROR", ERROR}, {"CRIT", CRIT},
                                     {"ALERT", ALERT}, {"FATAL", FATAL}, {"EMERG", EMERG}};

constinit Everlasting<LogChannel> root;

// Every channel that was ever made. The map that finds them is emptied at exit, while loggers still
// write through them; from here they remain reachable.
struct KeptChannel {
    LogChannel channel;
    KeptChannel* next;
};
constinit KeptChannel* keptChannels = nullptr;

LogChannel* newChannel() {
    keptChannels = new KeptChannel{root.value, keptChannels};
    return &keptChannels->channel;
}

// Channels by name. The transparent comparison spares a lookup the copy of the name.
using ChannelMap = std::map<std::string, LogChannel*, std::less<>>;

// Made on the first call and never destroyed, only emptied at exit: a logger that is made later
// still looks its name up, and finds the root channel. Looking up takes no memory.
ChannelMap& channels() {
    static Everlasting<ChannelMap> map;
    static const struct Emptier {
        ~Emptier() { map.value.clear(); }
    } emptier;
    return map.value;
}

LogChannel* findChannel(std::string_view name, bool create) {
    ChannelMap& map = channels();
    if (const auto found = map.find(name); found != map.end()) {
        return found->second;
    }
    if (!create) {
        return &root.value;
    }
    // The entry comes first: when there is no memory for the channel, nothing must stay behind.
    const auto entry = map.emplace(name, nullptr).first;
    try {
        entry->second = newChannel();
    } catch (...) {
        map.erase(entry);
        throw;
    }
    return entry->second;
}

}  // namespace

LogChannel& rootChannel() {
    return root.value;
}

bool setup_log_channel(const std::string& line) {
    const std::size_t equals = line.find('=');
    if (equals == std::string::npos) {
        return false;
    }
    std::string name = line.substr(0, equals);
    name.erase(name.find_last_not_of(" \t") + 1);  // npos + 1: nothing but blanks
    return LogChannel::find(name, true)->setConfig(line.c_str() + equals + 1);
}

LogChannel* LogChannel::find(const std::string& name, bool create) {
    return findChannel(name, create);
}

LogChannel* LogChannel::find(const char* name, bool create) {
    return findChannel(name, create);
}

bool LogChannel::changeLevel(const std::string& word) {
    for (const LevelWord& known : LEVEL_WORDS) {
        if (word == known.text) {
            minlevel = known.level;
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
        // Every word takes effect, whatever became of those before it.
        if (!applyConfWord(std::string(text.substr(begin, end - begin)), &gotAppender)) {
            allAccepted = false;
        }
        begin = text.find_first_not_of(SEPARATORS, end);
    }
    return allAccepted;
}

void LogChannel::write(const LogMsgMetadata& mdata, const std::string& msg) {
    if (_appenders.empty()) {
        rootAppender().write(mdata, msg);
        return;
    }
    for (LogAppender* const appender : _appenders) {
        appender->write(mdata, msg);
    }
}

bool LogChannel::write(const LogMsgMetadata& mdata, const std::string& msg,
                       const LogAppender* dont_touch) {
    bool written = false;
    const auto writeTo = [&](LogAppender& appender) {
        if (&appender != dont_touch && !report_in_progress(&appender)) {
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
