#ifndef QUELTA_TESTS_SUPPORT_SLOWMILLISECONDS_H_
#define QUELTA_TESTS_SUPPORT_SLOWMILLISECONDS_H_

// A slow convert_string_to_milliseconds, for comparison. It collects the digits of the tenths of
// milliseconds as text and lets strtoull convert, and limit, all but the last.

#include <algorithm>
#include <climits>
#include <cstdlib>
#include <string>

// Returns: the milliseconds and the number of characters, separated by a blank; "none" if there is
// no number.
inline std::string convertSlowly(const std::string& text) {
    const auto endOfDigits = [&text](std::size_t from) {
        return std::min(text.find_first_not_of("0123456789", from), text.size());
    };
    const std::size_t start = std::min(text.find_first_not_of(" \t"), text.size());
    std::size_t end = endOfDigits(start);
    const std::string whole = text.substr(start, end - start);
    std::string fraction;
    const std::size_t first = end + 1;  // after a point
    if (text.substr(end, 1) == "." && (first == text.size() || endOfDigits(first) != first)) {
        end = endOfDigits(first);
        fraction = text.substr(first, end - first);
    }
    if (end == start) {
        return "none";
    }
    const std::string tenths = whole + (fraction + "0000").substr(0, 4);
    const std::string digits = tenths.substr(0, tenths.size() - 1);
    unsigned long long msecs = std::strtoull(digits.c_str(), nullptr, 10);
    if (tenths.back() >= '5' && msecs != ULLONG_MAX) {
        ++msecs;
    }
    if (msecs == 0 && fraction.find_first_not_of('0') != std::string::npos) {
        msecs = 1;
    }
    return std::to_string(msecs) + ' ' + std::to_string(end);
}

#endif  // QUELTA_TESTS_SUPPORT_SLOWMILLISECONDS_H_
