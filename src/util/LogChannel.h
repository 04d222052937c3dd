#ifndef QUELTA_UTIL_LOGCHANNEL_H_
#define QUELTA_UTIL_LOGCHANNEL_H_

// Log channels: named categories, each with a minimum level and a list of appenders.
//
//     #include "util/LogAppender.h"
//     LogChannel* const channel = LogChannel::find("Queue", true);
//     LogAppender::find("queueFile", true);
//     if (!channel->setConfig("WARN, queueFile")) {
//         std::puts("neither a level nor an appender");
//     }
//
// Loggers are bound to channels by name; a name without a channel of its own is bound to the root
// channel. A new channel starts as a copy of the root channel as it is at that moment,
// and later changes of the root channel do not reach it, so the root channel is set up first.
//
// An empty list of appenders means that the root appender (standard error) writes the messages.
// Channels are owned by the logging subsystem and live until the process ends.
// Configured before other threads start; safe from any thread afterwards.

#include <string>
#include <string_view>
#include <vector>

#include "util/LogLevel.h"
#include "util/LogMsgMetadata.h"

class LogAppender;

// A channel.
class LogChannel {
public:
    // Finds a channel by its name. For an unknown name, either creates a copy of the root channel
    // under that name (`create`) or returns the root channel itself, recording nothing.
    // Requires: `name` is not null.
    // Returns: never null.
    static LogChannel* find(const std::string& name, bool create);
    static LogChannel* find(const char* name, bool create);

    // Sets the minimum level by its name; upper case only, so "debug" is not a level.
    // Returns: false, with the level as it was, if `word` does not name a level.
    bool changeLevel(const std::string& word);

    // Applies one word of a configuration value: a level, or the name of an existing appender. If
    // *got_appender_p (not null) is false, the appender replaces the list and *got_appender_p
    // becomes true; otherwise it is appended. An appender that is named twice receives each message
    // twice.
    // Returns: false, with nothing changed, for any other word.
    bool applyConfWord(const std::string& word, bool* got_appender_p);

    // Applies a configuration value: words separated by spaces, tabs and commas. All are applied,
    // even if one is rejected. The last level wins.
    // Requires: `value` is not null.
    // Returns: true if every word was accepted; true for an empty value.
    bool setConfig(const char* value);

    // Writes a message to the appenders, in the order of the list; does not test the level.
    // Errors: std::bad_alloc if the line cannot be formatted.
    void write(const LogMsgMetadata& mdata, std::string_view msg);

    // Writes a message about the appender `dont_touch` (null allowed), which does not get it; nor
    // do appenders whose own failed write is being reported on this thread.
    // Returns: true if at least one appender got the message.
    bool write(const LogMsgMetadata& mdata, std::string_view msg, const LogAppender* dont_touch);

    LogLevel minlevel = INFO;  // messages below it are discarded

private:
    std::vector<LogAppender*> _appenders;  // not owned; empty: the root appender
};

#endif  // QUELTA_UTIL_LOGCHANNEL_H_
