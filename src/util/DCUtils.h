#ifndef QUELTA_UTIL_DCUTILS_H_
#define QUELTA_UTIL_DCUTILS_H_

// Free functions for NUL-terminated strings, strings, numbers and whole small text files.
//
//     std::string line = strip(std::string(" Port = 8080 \n"));
//     if (startsCaseWith(line.c_str(), "port")) {
//         bool successful = false;
//         const long port = getLong(line.substr(line.find('=') + 1), successful);
//         std::printf("%ld %s\n", port, bool2str(successful));  // "8080 True"
//     }
//
// A function that returns `char*` returns a new array that the caller releases with delete[],
// except my_strcasestr and ltoa, which return a pointer into their argument. Pointers must not be
// null unless the comment of the function describes null. Characters are bytes: case and white
// space are those of the C library's current locale. Safe from any thread once getPunct has been
// called for the first time.

#include <cstdio>
#include <string>

#include "util/Requirements.h"

class Pathname;

// --- Copies and comparisons ------------------------------------------------------------------

// Copies a NUL-terminated string; null for null.
// Errors: std::bad_alloc if memory is exhausted, after an error message on the logger "DCUtils".
[[nodiscard]] char* copystr(const char* input);

// Returns: whether `str` starts with `prefix`; every text starts with the empty one. False if
// either is null.
[[nodiscard]] bool startsWith(const char* str, const char* prefix);
[[nodiscard]] bool startsWith(const std::string& keyword, const std::string& prefix);
// Returns: whether `str` starts with `prefix`, ignoring case; neither may be null.
[[nodiscard]] bool startsCaseWith(const char* str, const char* prefix);
// Returns: whether `text` ends with `suffix`; every text ends with the empty one.
[[nodiscard]] bool endsWith(const std::string& text, const std::string& suffix);

// Finds `substr` in `str` ignoring the case of `str` alone: a `substr` with capital letters is
// never found.
// Returns: a pointer into `str`, or null.
[[nodiscard]] char* my_strcasestr(const char* str, const char* substr);

// --- Editing ---------------------------------------------------------------------------------

// Copies a text without the white space around it; null for null. The second form stops at an
// embedded NUL.
[[nodiscard]] char* strip(const char* inString);
[[nodiscard]] std::string strip(const std::string& str);

// Copies a text in lower case; null for null.
[[nodiscard]] char* lowercase(const char* inString);
// Changes a string to lower case in place, embedded NULs included.
void lowercase(std::string& str);

// Replaces every `findStr`, from left to right; replaced text is not searched again. An empty
// `findStr` is never found.
void replaceAllString(std::string& str, const std::string& findStr, const std::string& replaceStr);
// Copies `text` with every `find` replaced, ignoring the case of `text` alone: a `find` with
// capital letters, or an empty one, is never found. The rest of the text keeps its case.
[[nodiscard]] char* replaceString(const char* text, const char* find, const char* replace);

// Returns: `depth` times four spaces.
[[nodiscard]] std::string pad(unsigned depth);

// Copies a text with every "$NAME" replaced by the environment variable NAME, or removed if that is
// not set; null for null. A name is the longest run of letters, digits and '_'.
// Deliberate: there is no brace form and no escape; a '$' without a name is removed.
[[nodiscard]] char* substituteEnvs(const char* inStr);

// Fills a 256-entry map from bytes to escapes: 0 for a byte that is not in `initString`, 1 for one
// that is, and for tab, carriage return, backslash and double quote the letter of their escape
// sequence.
void initMap(char* map, const char* initString);

// Appends to `out` the punctuation of the first line of `text`, up to `max_len` items: a space as
// '_'; carriage return, backslash and double quote escaped by a backslash. Everything else is
// dropped.
// Deliberate: a tab is appended as a plain 't', without the backslash of the other escapes.
// Errors: std::bad_alloc if there is no room for `max_len` items, however short the text.
// Requires: `text` and `out` are different objects.
// Threads: the first call of the process builds a table, without a lock.
void getPunct(const std::string& text, std::string& out, unsigned max_len);

// --- Numbers and truth -----------------------------------------------------------------------

// Returns: "True" or "False".
[[nodiscard]] const char* bool2str(bool val);
// Returns: false for null, "", "false", "no" and "0", ignoring case; true for every other text.
// Deliberate: "off" and "n" are therefore true.
[[nodiscard]] bool toBool(const char* str);

// Writes `val` in decimal and a NUL. `buf` must hold 12 bytes for values of up to 10 digits, and
// 21 bytes for any long. `*len` (null allowed) is replaced.
// Requires: `val` is not LONG_MIN, for which only the digits are guaranteed.
// Returns: `buf`.
// Deliberate: `*len` is the index of the last character, the length minus one.
char* ltoa(char* buf, long val, int* len);
// Appends `val` in decimal.
// Returns: `out`.
std::string& ltoa(long val, std::string& out);

// Reads a decimal number, optionally preceded by white space and a sign. `successful` is replaced:
// false if there is no number, if it does not fit or if anything follows it. errno is 0 afterwards.
// Returns: the number read so far, even on failure.
long getLong(const std::string& str, bool& successful);

// Reads the same numbers as strtod, if the text starts with '-' or a digit and ends with the
// number. errno is 0 after each conversion, whatever it was before.
// Returns: the number; -9.99e99 for any other text, and for a number that is too large or too
// small.
// Deliberate: "+1", ".5" and " 1" fail, while "0x10" is 16 and "-inf" is minus infinity.
[[nodiscard]] double getDouble(const std::string& str);

// --- Text files ------------------------------------------------------------------------------

// Reads one line into `linebuf`, an array of `bufSize` bytes, which are all set to 0 first. A line
// that fits keeps its newline; a longer one is cut to `bufSize - 2` bytes and its rest is
// discarded. Nothing is read if `bufSize` is below 3.
// Returns: false at the end of the file and on an error.
[[nodiscard]] bool readLine(FILE* f, char* linebuf, int bufSize);

// Writes a text (nothing for null) to a file that is created or replaced.
// Returns: false if the file cannot be opened; the write itself is not checked.
bool writeText(const Pathname& filename, const char* text);

// Reads a whole file, to its end even if it is longer than its size.
// Returns: its bytes and a NUL; null if it cannot be opened or sized, or if its size does not fit
// into memory; the last is reported on standard output.
// Errors: std::bad_alloc if memory is exhausted by bytes beyond the file's size.
[[nodiscard]] char* readText(const Pathname& filename);

#endif  // QUELTA_UTIL_DCUTILS_H_
