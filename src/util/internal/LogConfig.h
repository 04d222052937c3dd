#ifndef QUELTA_UTIL_INTERNAL_LOGCONFIG_H_
#define QUELTA_UTIL_INTERNAL_LOGCONFIG_H_

// How a logging configuration file is read. Logger::initialize(cfgFile, home) is the only caller;
// the tests call the parts declared here, because that function runs once per process.
// Not thread-safe; one thread at a time per file.

#include <cstdio>
#include <string>
#include <string_view>
#include <vector>

class Pathname;

// Reads one line of any length, in pieces of 127 characters. `result` is replaced by the line,
// without its newline. A NUL byte is an ordinary character. A read that a signal interrupts is
// continued.
// Requires: `ifile` open for reading.
// Returns: true for a line, also for a last one without a newline; false, with `result` empty, at
// the end of the file and after a read error.
// Cost: no more memory than the line takes.
bool read_line(std::string& result, std::FILE* ifile);

// Skips the rest of an XML comment, which may span lines. `cf` (not null) is the text after the
// opening "<!--". If the comment does not end there, lines are read from `ifile` and added to
// `lineno`. The text after the closing "-->" is appended to `result`.
// Returns: false, with `result` unchanged, if the file ends inside the comment.
bool handle_xml_comment(std::string& result, const char* cf, unsigned& lineno, std::FILE* ifile);

// Applies one channel setting, "name=value", and creates the channel if it does not exist. Blanks
// after the name are dropped; the name may be empty.
// Returns: false without "=", and if LogChannel::setConfig does not accept the whole value.
bool setup_log_channel(const std::string& line);

// Reads one configuration file. Appenders are created and get their attributes while the lines are
// read. Channels are set up afterwards, because they name appenders and inherit from the root
// channel. Problems are collected until there are appenders to report them to.
//
// Order of calls: `readLines`, `setUpChannels`, `report`.
class ConfigReader {
public:
    // `file` (not null, not owned) is open for reading; `queltaHome` must outlive the reader.
    ConfigReader(std::FILE* file, const Pathname& queltaHome)
        : _file(file), _queltaHome(queltaHome) {}

    // Reads to the end of the file, or to an unterminated comment.
    void readLines();
    // Applies the root channel's setting, then those of the others.
    void setUpChannels();
    // Reports the problems with the file's name and their line numbers.
    void report(const Pathname& cfgFile) const;

    // Returns: false when the file ended inside a comment.
    bool complete() const { return _openComment == 0; }

private:
    struct NumberedText {
        unsigned lineno;
        std::string text;
    };

    bool dropComments(std::string& line);
    bool parse(const std::string& line);
    bool parseAppender(std::string_view rest);

    std::FILE* const _file;
    const Pathname& _queltaHome;
    unsigned _lineno = 0;                   // of the last line read
    unsigned _openComment = 0;              // line of the unterminated comment; 0: none
    NumberedText _root = {0, {}};           // value of the last rootCategory line; lineno 0: none
    std::vector<NumberedText> _categories;  // category lines, without "category."
    std::vector<NumberedText> _errors;      // in the order in which they are reported
};

#endif  // QUELTA_UTIL_INTERNAL_LOGCONFIG_H_
