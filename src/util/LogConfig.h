#ifndef QUELTA_UTIL_LOGCONFIG_H_
#define QUELTA_UTIL_LOGCONFIG_H_

// Internal header: how the lines of a logging configuration file are read. The reader itself is
// Logger::initialize(cfgFile, home); it is the only caller.
// Not thread-safe; one thread at a time per file.

#include <cstdio>
#include <string>

// Reads one line of any length; `result` is replaced by it, without its line feed. A NUL byte is
// a character like any other.
// Requires: `ifile` open for reading.
// Returns: true for a line, also for a last one without a line feed; false at the end of the file
// and after a read error, with `result` empty.
// Cost: no more memory than the line takes.
bool read_line(std::string& result, std::FILE* ifile);

// Skips the rest of an XML comment, over as many lines as it spans. `cf` (not null) is the text
// behind the opening "<!--"; when the comment does not end in it, lines are read from `ifile` and
// `lineno` counts them. The text behind the closing "-->" is appended to `result`.
// Returns: false, with `result` as it was, when the file ends inside the comment.
bool handle_xml_comment(std::string& result, const char* cf, unsigned& lineno, std::FILE* ifile);

#endif  // QUELTA_UTIL_LOGCONFIG_H_
