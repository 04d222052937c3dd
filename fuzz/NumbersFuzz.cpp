// Numbers and truth values as text: ltoa, getLong, getDouble, toBool and bool2str, against versions
// that use 128 bits or another method.

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <charconv>
#include <cmath>
#include <limits>
#include <string>

#include "Check.h"
#include "FuzzInput.h"
#include "FuzzTarget.h"
#include "util/DCUtils.h"

namespace {

using fuzz::checkEqual;

__extension__ using Wide = __int128;

constexpr long LEAST = std::numeric_limits<long>::min();
constexpr long MOST = std::numeric_limits<long>::max();

bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

struct Number {
    long value;
    bool successful;
};

Number longSlowly(const std::string& text) {
    std::size_t at = std::min(text.find_first_not_of(" \t\n\v\f\r"), text.size());
    const bool negative = text.substr(at, 1) == "-";
    if (negative || text.substr(at, 1) == "+") {
        ++at;
    }
    const std::size_t start = at;
    Wide value = 0;
    for (; at < text.size() && isDigit(text[at]); ++at) {
        // One digit more than fits in 64 bits is enough.
        value = std::min<Wide>(value * 10 + (text[at] - '0'), Wide(MOST) * 10);
    }
    if (at == start) {
        return {0, false};
    }
    value = negative ? -value : value;
    const Wide fitted = std::clamp<Wide>(value, LEAST, MOST);
    return {static_cast<long>(fitted), fitted == value && at == text.size()};
}

void checkLong(const std::string& text) {
    const Number expected = longSlowly(text);
    bool successful = !expected.successful;
    errno = EINTR;
    checkEqual("getLong", expected.value, getLong(text, successful));
    checkEqual("getLong's success", expected.successful, successful);
    checkEqual("errno after getLong", 0, errno);
}

void checkLtoa(long value) {
    const std::string expected = std::to_string(value);
    char buf[24];
    int last = -7;
    checkEqual("ltoa", expected, std::string(ltoa(buf, value, &last)));
    checkEqual("ltoa's last index", expected.size() - 1, static_cast<std::size_t>(last));
    std::string out = "kept";
    checkEqual("ltoa to a string", "kept" + expected, ltoa(value, out));
    checkLong(expected);
}

// Whether the text is an optional '-', digits, a fraction and an exponent. strtod and from_chars
// read such a text in the same way.
bool isPlainNumber(const std::string& text) {
    std::size_t at = text.substr(0, 1) == "-" ? 1 : 0;
    const auto digits = [&] {
        const std::size_t start = at;
        while (at < text.size() && isDigit(text[at])) {
            ++at;
        }
        return at > start;
    };
    if (!digits()) {
        return false;
    }
    if (at < text.size() && text[at] == '.') {
        ++at;
        digits();
    }
    if (at < text.size() && (text[at] == 'e' || text[at] == 'E')) {
        ++at;
        at += at < text.size() && (text[at] == '-' || text[at] == '+') ? 1 : 0;
        if (!digits()) {
            return false;
        }
    }
    return at == text.size();
}

void checkDouble(const std::string& text) {
    constexpr double FAILURE = -9.99e99;
    const double actual = getDouble(text);
    if (text.empty() || (text[0] != '-' && !isDigit(text[0])) ||
        std::isspace(static_cast<unsigned char>(text.back())) != 0 ||
        text.find('\0') != std::string::npos) {
        checkEqual("getDouble of no number", FAILURE, actual);
    } else if (isPlainNumber(text)) {
        double expected = 0;
        const auto read = std::from_chars(text.data(), text.data() + text.size(), expected);
        if (read.ec != std::errc()) {
            checkEqual("getDouble of what does not fit", FAILURE, actual);
        } else if (expected == 0 || std::fabs(expected) >= std::numeric_limits<double>::min()) {
            checkEqual("getDouble", expected, actual);
        }
    }
}

void checkTruth(const std::string& text) {
    std::string lower;
    for (const char c : text) {
        lower += c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
    }
    const bool expected = !lower.empty() && lower != "false" && lower != "no" && lower != "0";
    checkEqual("toBool", expected, toBool(text.c_str()));
    checkEqual("toBool of bool2str", expected, toBool(bool2str(expected)));
}

}  // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text = fuzz::FuzzInput(data, size).rest();
    checkLong(text);
    checkDouble(text);
    checkTruth(fuzz::FuzzInput::text(text));
    long fromBytes = 0;
    for (std::size_t i = 0; i < std::min<std::size_t>(size, sizeof(fromBytes)); ++i) {
        fromBytes = static_cast<long>(static_cast<unsigned long>(fromBytes) << 8 | data[i]);
    }
    checkLtoa(fromBytes);
    checkLtoa(longSlowly(text).value);
    return 0;
}
