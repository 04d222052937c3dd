#ifndef QUELTA_TESTS_SUPPORT_SLOWMILLISECONDS_H_
#define QUELTA_TESTS_SUPPORT_SLOWMILLISECONDS_H_

// A slow convert_string_to_milliseconds, for comparison. It collects the digits as text and counts
// tenths of milliseconds in 128 bits.

#include <algorithm>
#include <limits>
#include <string>

// Returns: the milliseconds and the number of characters, separated by a blank; "none" if there is
// no number.
inline std::string convertSlowly(const std::string& text) {
    __extension__ using Wide = unsigned __int128;
    constexpr Wide ALL_ONES = std::numeric_limits<unsigned long long>::max();
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
    Wide tenths = 0;
    for (const char digit : whole + (fraction + "0000").substr(0, 4)) {
        tenths = std::min(tenths * 10 + static_cast<unsigned>(digit - '0'), ALL_ONES * 100);
    }
    Wide msecs = std::min((tenths + 5) / 10, ALL_ONES);
    if (msecs == 0 && fraction.find_first_not_of('0') != std::string::npos) {
        msecs = 1;
    }
    return std::to_string(static_cast<unsigned long long>(msecs)) + ' ' + std::to_string(end);
}

#endif  // QUELTA_TESTS_SUPPORT_SLOWMILLISECONDS_H_
