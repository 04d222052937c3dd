// Times written as text against an oracle that counts in 128 bits.

#include <algorithm>
#include <string>

#include "Check.h"
#include "FuzzInput.h"
#include "FuzzTarget.h"
#include "util/Timeval.h"

namespace {

using fuzz::checkEqual;

__extension__ using Wide = unsigned __int128;

constexpr Wide ALL_ONES = ~0ULL;

struct Milliseconds {
    bool found;
    unsigned long long value;
    unsigned long charCount;
};

bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

// Returns: the digits starting at `at`; leaves `at` after them.
std::string takeDigits(const std::string& text, std::size_t& at) {
    std::string digits;
    while (at < text.size() && isDigit(text[at])) {
        digits += text[at++];
    }
    return digits;
}

// A number that stops growing where 64 bits end.
Wide valueOf(const std::string& digits) {
    Wide value = 0;
    for (const char digit : digits) {
        value = std::min<Wide>(value * 10 + static_cast<unsigned>(digit - '0'), ALL_ONES);
    }
    return value;
}

Milliseconds slowly(const std::string& text) {
    std::size_t at = 0;
    while (at < text.size() && (text[at] == ' ' || text[at] == '\t')) {
        ++at;
    }
    const std::size_t start = at;
    const std::string whole = takeDigits(text, at);
    std::string fraction;
    if (at < text.size() && text[at] == '.' && (at + 1 == text.size() || isDigit(text[at + 1]))) {
        ++at;
        fraction = takeDigits(text, at);
    }
    if (at == start) {
        return {false, 0, 0};
    }
    Wide total = valueOf(whole) * 1000;
    total += (valueOf((fraction + "0000").substr(0, 4)) + 5) / 10;
    if (total == 0 && fraction.find_first_not_of('0') != std::string::npos) {
        total = 1;
    }
    return {true, static_cast<unsigned long long>(std::min(total, ALL_ONES)), at};
}

}  // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text = fuzz::FuzzInput(data, size).restOfText();
    const Milliseconds expected = slowly(text);
    unsigned long long msecs = 77;
    unsigned long charCount = 77;
    const bool found = convert_string_to_milliseconds(text.c_str(), &msecs, &charCount);
    checkEqual("found", expected.found, found);
    checkEqual("milliseconds", expected.value, msecs);
    checkEqual("charCount", expected.charCount, charCount);

    msecs = 77;
    checkEqual("found without a count", expected.found,
               convert_string_to_milliseconds(text.c_str(), &msecs, nullptr));
    checkEqual("milliseconds without a count", expected.value, msecs);
    return 0;
}
