#ifndef QUELTA_TESTS_SUPPORT_SLOWCONFIG_H_
#define QUELTA_TESTS_SUPPORT_SLOWCONFIG_H_

// A reader of logging configurations kept only to compare with: it holds the whole text, joins and
// rereads lines as the rules say, and shares no code with the real one.

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

// What reading `contents` means, for an installation in `home`.
SlowConfig readConfigSlowly(const std::string& contents, const std::string& home);

// What a channel's value means: the words are levels, names out of `config` and others.
struct SlowChannel {
    int level;                           // the level, or `level` as it was
    std::vector<std::string> appenders;  // empty: as they were
    bool accepted;                       // whether every word was known
};
SlowChannel readChannelSlowly(const SlowConfig& config, const std::string& value, int level);

#endif  // QUELTA_TESTS_SUPPORT_SLOWCONFIG_H_
