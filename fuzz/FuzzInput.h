#ifndef QUELTA_FUZZ_FUZZINPUT_H_
#define QUELTA_FUZZ_FUZZINPUT_H_

// The bytes of one input, split into fields. Fields are lines, so that a corpus can be read and
// written by hand. The last field is the rest of the input, newlines included.
// Not thread-safe; one thread at a time per object.

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <string>

namespace fuzz {

class FuzzInput {
public:
    FuzzInput(const std::uint8_t* data, std::size_t size)
        : _bytes(reinterpret_cast<const char*>(data), size) {}

    bool atEnd() const { return _next >= _bytes.size(); }

    // The next line, without its newline; empty at the end.
    std::string line() {
        const std::size_t end = std::min(_bytes.find('\n', _next), _bytes.size());
        std::string result = _bytes.substr(std::min(_next, end), end - std::min(_next, end));
        _next = end + 1;
        return result;
    }

    // The same up to its first NUL, for functions that take NUL-terminated strings.
    std::string lineOfText() { return text(line()); }

    // The rest of the input.
    std::string rest() {
        std::string result = _bytes.substr(std::min(_next, _bytes.size()));
        _next = _bytes.size();
        return result;
    }
    std::string restOfText() { return text(rest()); }

    // The next line as an integer, clamped to [least, most]; `least` if it is not a number.
    long long lineAsNumber(long long least, long long most) {
        long long number = least;
        try {
            number = std::stoll(line());
        } catch (...) {
            return least;
        }
        return std::clamp(number, least, most);
    }

    static std::string text(const std::string& bytes) { return bytes.substr(0, bytes.find('\0')); }

private:
    const std::string _bytes;
    std::size_t _next = 0;
};

// Truncates every run of digits to four, so that a width cannot require gigabytes.
inline std::string withSmallNumbers(const std::string& pattern) {
    std::string result;
    std::size_t run = 0;
    for (const char c : pattern) {
        run = c >= '0' && c <= '9' ? run + 1 : 0;
        if (run <= 4) {
            result += c;
        }
    }
    return result;
}

}  // namespace fuzz

#endif  // QUELTA_FUZZ_FUZZINPUT_H_
