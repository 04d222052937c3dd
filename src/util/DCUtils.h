#ifndef QUELTA_UTIL_DCUTILS_H_
#define QUELTA_UTIL_DCUTILS_H_

// Free functions for NUL-terminated strings, strings, numbers and whole small text files.
//
// A function that returns `char*` returns a new array that the caller releases with delete[];
// my_strcasestr and ltoa, which point into their argument, are the exceptions. Pointers must not
// be null unless the function says what null does. Characters are bytes: case and blanks are those
// of the C library's current locale, and bytes above 127 are handled like all others.
// Safe from any thread once getPunct has been called for the first time.

#include <cstdio>
#include <string>

class Pathname;

// --- Copies and comparisons ------------------------------------------------------------------

// Copies a NUL-terminated string; null for null.
// Errors: std::bad_alloc when memory is exhausted, after an error message on the logger "DCUtils".
[[nodiscard]] char* copystr(const char* input);

// Returns: whether `str` begins with `prefix`; the empty prefix begins every text. False when
// either is null.
[[nodiscard]] bool startsWith(const char* str, const char* prefix);
[[nodiscard]] bool startsWith(const std::string& keyword, const std::string& prefix);
// The same ignoring case; neither may be null.
[[nodiscard]] bool startsCaseWith(const char* str, const char* prefix);
// Returns: whether `text` ends with `suffix`; the empty suffix ends every text.
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

// Copies a text in lower case (null for null), or lowers a string in place, embedded NULs included.
[[nodiscard]] char* lowercase(const char* inString);
void lowercase(std::string& str);

// Replaces every `findStr`, from left to right; what was put in is not searched again. An empty
// `findStr` is found nowhere.
void replaceAllString(std::string& str, const std::string& findStr, const std::string& replaceStr);
// Copies `text` with every `find` replaced, ignoring the case of `text` alone: a `find` with
// capital letters, or an empty one, is found nowhere. What is not replaced keeps its case.
[[nodiscard]] char* replaceString(const char* text, const char* find, const char* replace);

// Returns: `depth` times four spaces.
[[nodiscard]] std::string pad(unsigned depth);

// Copies a text with every "$NAME" replaced by the environment variable NAME, or by nothing when
// it is not set; null for null. A name is the longest run of letters, digits and '_'.
// Deliberate: there is no brace form and no escape; a '$' without a name vanishes.
[[nodiscard]] char* substituteEnvs(const char* inStr);

// Fills a 256-entry map from bytes to escapes: 0 for a byte that is not in `initString`, 1 for one
// that is, and for tab, carriage return, backslash and double quote the character that stands
// behind the backslash of their escape.
void initMap(char* map, const char* initString);

// Appends to `out` the punctuation of the first line of `text`, up to `max_len` items: a space as
// '_', carriage return, backslash and double quote escaped by a backslash. Letters, digits and
// whatever else is no punctuation are dropped.
// Deliberate: a tab is appended as a plain 't', without the backslash of the other escapes.
// Requires: `text` and `out` are different objects.
// Threads: the first call of the process builds a table, without a lock.
void getPunct(const std::string& text, std::string& out, unsigned max_len);

// --- Numbers and truth -----------------------------------------------------------------------

// Returns: "True" or "False".
[[nodiscard]] const char* bool2str(bool val);
// Returns: false for null, "", "false", "no" and "0", ignoring case; true for every other text.
// Deliberate: so "off" and "n" are true.
[[nodiscard]] bool toBool(const char* str);

// Writes `val` in decimal and a NUL. `buf` has room for 12 bytes, which suffice for 10 digits; the
// longest values need 21. `*len` (null allowed) is replaced.
// Requires: `val` is not the most negative long, of which nothing is promised but its digits.
// Returns: `buf`.
// Deliberate: `*len` is the index of the last character, the length minus one.
char* ltoa(char* buf, long val, int* len);
// Appends `val` in decimal.
// Returns: `out`.
std::string& ltoa(long val, std::string& out);

// Reads a decimal number, behind white space and a sign. `successful` is replaced: false when
// there is none, when it does not fit or when anything follows it. errno is 0 afterwards.
// Returns: what could be read, in any case.
long getLong(const std::string& str, bool& successful);

// Reads what strtod reads, provided that it begins with '-' or a digit and is the whole text.
// Returns: -9.99e99 for any other text, and for a number that is too large or too small. errno is 0
// after each conversion.
// Deliberate: so "+1", ".5" and " 1" fail, while "0x10" is 16 and "-inf" minus infinity.
[[nodiscard]] double getDouble(const std::string& str);

// --- Text files ------------------------------------------------------------------------------

// Reads one line into `linebuf`, an array of `bufSize` bytes, which are all set to 0 first. A line
// that fits keeps its newline; a longer one is cut to `bufSize - 2` bytes and the rest of it is
// discarded. Nothing is read into a buffer below 3 bytes.
// Returns: false at the end of the file and on an error.
[[nodiscard]] bool readLine(FILE* f, char* linebuf, int bufSize);

// Writes a text (nothing for null) to a file that is made or replaced.
// Returns: false when the file cannot be opened; whether the text went out is not checked.
bool writeText(const Pathname& filename, const char* text);

// Reads a whole file, up to its end whatever size it had before.
// Returns: its bytes and a NUL; null when it cannot be opened, has no size or does not fit into
// memory, which is told on standard output.
[[nodiscard]] char* readText(const Pathname& filename);

#endif  // QUELTA_UTIL_DCUTILS_H_
