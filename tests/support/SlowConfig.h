#ifndef QUELTA_TESTS_SUPPORT_SLOWCONFIG_H_
#define QUELTA_TESTS_SUPPORT_SLOWCONFIG_H_

// A slow reader of logging configurations, for comparison. It reads the whole text, joins lines by
// the rules, and shares no code with the real reader.

#include <map>
#include <string>
#include <vector>

struct SlowConfig {
    struct Line {
        unsigned number = 0;  // counted from 1; 0: no such line
        std::string text;
    };
    struct Appender {
        std::string fileName;
        long long maxSize = 0;
        unsigned maxBackups = 0;
        std::string pattern;  // of the layout; empty: none was set
    };

    unsigned openComment = 0;                   // line of the unterminated comment; 0: none
    Line root;                                  // the value of the last rootCategory line
    std::vector<Line> categories;               // without "category."
    std::vector<Line> errors;                   // found while reading
    std::map<std::string, Appender> appenders;  // "rootAppender" too, when a line names it
};

// The result of reading `contents` for an installation in `home`.
SlowConfig readConfigSlowly(const std::string& contents, const std::string& home);

// The result of a channel's value, whose words are levels, appenders of `config` or unknown.
struct SlowChannel {
    int level;                           // the new level; `level` if the value has none
    std::vector<std::string> appenders;  // empty: unchanged
    bool accepted;                       // whether every word was known
};
SlowChannel readChannelSlowly(const SlowConfig& config, const std::string& value, int level);

#endif  // QUELTA_TESTS_SUPPORT_SLOWCONFIG_H_
