#ifndef QUELTA_FUZZ_CHECK_H_
#define QUELTA_FUZZ_CHECK_H_

// The assertions of a fuzz target. A failed check prints both values with their bytes escaped and
// aborts, which the fuzzer and the replay program report as a finding.
// Safe from any thread.

#include <cstdio>
#include <cstdlib>
#include <sstream>
#include <string>
#include <string_view>
#include <vector>

namespace fuzz {

// Returns the text with everything except printable characters as \xHH.
inline std::string described(std::string_view text) {
    std::string result = "\"";
    for (const char c : text) {
        if (c >= ' ' && c <= '~' && c != '\\') {
            result += c;
        } else {
            char escape[8];
            std::snprintf(escape, sizeof(escape), "\\x%02x", static_cast<unsigned char>(c));
            result += escape;
        }
    }
    return result + '"';
}
inline std::string described(const std::string& text) {
    return described(std::string_view(text));
}
inline std::string described(const char* text) {
    return text == nullptr ? "null" : described(std::string_view(text));
}

template <typename Number>
std::string described(const Number& number) {
    std::ostringstream out;
    out.precision(17);
    out << number;
    return out.str();
}

template <typename Element>
std::string described(const std::vector<Element>& list) {
    std::string result = "{";
    for (const Element& element : list) {
        result += ' ' + described(element);
    }
    return result + " }";
}

[[noreturn]] inline void fail(const char* what, const std::string& expected,
                              const std::string& actual) {
    std::fprintf(stderr, "check failed: %s\n  expected %s\n  actual   %s\n", what, expected.c_str(),
                 actual.c_str());
    std::fflush(stderr);
    std::abort();
}

template <typename Expected, typename Actual>
void checkEqual(const char* what, const Expected& expected, const Actual& actual) {
    if (!(expected == actual)) {
        fail(what, described(expected), described(actual));
    }
}

inline void check(const char* what, bool holds) {
    checkEqual(what, true, holds);
}

}  // namespace fuzz

#endif  // QUELTA_FUZZ_CHECK_H_
