#include "util/Timeval.h"

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <limits>

#include "util/Assert.h"

namespace {

constexpr long long MAX_SEC = std::numeric_limits<std::int32_t>::max();
constexpr long USECS_PER_SEC = 1000000;
constexpr unsigned long long MAX_MSECS = MAX_SEC * 1000ULL;

// a - b in whole seconds, rounded down, and the microseconds above them.
struct Difference {
    Difference(const struct timeval& a, const struct timeval& b)
        : seconds(a.tv_sec - b.tv_sec), micros(a.tv_usec - b.tv_usec) {
        if (micros < 0) {
            --seconds;
            micros += USECS_PER_SEC;
        }
    }

    long long seconds;
    long long micros;  // 0..999999
};

// Returns: the value with one to three decimals, at least 5 characters wide, and the unit.
std::string describe(double value, const char* unit) {
    const int precision = value >= 99.5 ? 1 : value >= 9.95 ? 2 : 3;
    char number[40];
    std::snprintf(number, sizeof number, "%5.*f", precision, value);
    return std::string(number) + unit;
}

std::string describe(long long value, const char* singularUnit) {
    char number[40];
    std::snprintf(number, sizeof number, "%lld", value);
    return std::string(number) + singularUnit + (value == 1 ? "" : "s");
}

bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

// Reads the digits before the point as milliseconds.
// Returns: the first character after them; `hitMax` is set if they do not fit.
const char* readWholeSeconds(const char* p, unsigned long long& msecs, bool& hitMax) {
    constexpr unsigned long long FIRST_TOO_LARGE = 18446744073709552ULL;
    unsigned long long value = 0;
    for (; isDigit(*p); ++p) {
        if (!hitMax) {
            value = value * 10 + static_cast<unsigned>(*p - '0');
            hitMax = value >= FIRST_TOO_LARGE;
        }
    }
    msecs = value * 1000;
    return p;
}

// Reads the digits after the point and adds them to `msecs`.
// Returns: the first character after them.
const char* readFraction(const char* p, unsigned long long& msecs, bool& hitMax) {
    unsigned tenths = 0;  // of a millisecond
    unsigned unit = 1000;
    bool isZero = true;
    for (; isDigit(*p); ++p) {
        tenths += static_cast<unsigned>(*p - '0') * unit;
        unit /= 10;
        isZero = isZero && *p == '0';
    }
    const unsigned rounded = (tenths + 5) / 10;
    msecs += rounded;
    if (msecs < rounded) {
        hitMax = true;
    }
    if (!isZero && msecs == 0) {
        msecs = 1;
    }
    return p;
}

}  // namespace

Timeval Timeval::now() {
    return CurrentTimeval();
}

long long Timeval::msec() const noexcept {
    return sec() * 1000 + _tv.tv_usec / 1000;
}

void Timeval::set(long long seconds, long long microseconds) noexcept {
    long long carry = microseconds / USECS_PER_SEC;
    long long rest = microseconds % USECS_PER_SEC;
    if (rest < 0) {
        --carry;
        rest += USECS_PER_SEC;
    }
    _tv.tv_sec = seconds + carry;
    _tv.tv_usec = static_cast<suseconds_t>(rest);
}

void Timeval::setToNow() {
    if (::gettimeofday(&_tv, nullptr) != 0) {
        std::abort();
    }
}

void Timeval::setToMax() noexcept {
    _tv.tv_sec = MAX_SEC;
    _tv.tv_usec = USECS_PER_SEC - 1;
}

void Timeval::addSec(unsigned int secs) noexcept {
    if (_tv.tv_sec > MAX_SEC - static_cast<long long>(secs)) {
        setToMax();
        return;
    }
    _tv.tv_sec += secs;
}

void Timeval::addMsec(unsigned long long msecs) {
    if (msecs >= MAX_MSECS) {
        setToMax();
        return;
    }
    auto secs = static_cast<unsigned int>(msecs / 1000);
    _tv.tv_usec += static_cast<suseconds_t>(msecs % 1000 * 1000);
    if (_tv.tv_usec >= USECS_PER_SEC) {
        QUELTA_ASSERT(_tv.tv_usec < 2000000);
        ++secs;
        _tv.tv_usec -= USECS_PER_SEC;
    }
    addSec(secs);
}

void Timeval::localtime(struct tm& result) const {
    if (::localtime_r(&_tv.tv_sec, &result) != &result) {
        std::abort();
    }
}

long long Timeval::msecDifference(const Timeval& a, const Timeval& b) noexcept {
    const Difference d(a._tv, b._tv);
    return d.seconds * 1000 + (d.micros + 999) / 1000;
}

long long Timeval::usecDifference(const Timeval& a, const Timeval& b) noexcept {
    const Difference d(a._tv, b._tv);
    return d.seconds * 1000000 + d.micros / 1000;
}

std::string Timeval::describeDifference(const Timeval& a, const Timeval& b) {
    const bool negative = a < b;
    const long long d = negative ? usecDifference(b, a) : usecDifference(a, b);
    const double v = static_cast<double>(d);
    const std::string sign = negative ? "-" : "";
    if (v > 8000000000.0) {
        return sign + describe(v / 3600000000.0, " hours");
    }
    if (v > 3000000.0) {
        return sign + describe(v / 1000000.0, " seconds");
    }
    if (v > 3000.0) {
        const bool wholeMsecs = a._tv.tv_usec % 1000 == 0 && b._tv.tv_usec % 1000 == 0;
        return sign + (wholeMsecs ? describe(d / 1000, " millisecond")
                                  : describe(v / 1000.0, " milliseconds"));
    }
    return sign + describe(d, " microsecond");
}

bool convert_string_to_milliseconds(const char* oldp, unsigned long long* res,
                                    unsigned long* charCount) {
    const char* p = oldp;
    while (*p == ' ' || *p == '\t') {
        ++p;
    }
    const char* const number = p;
    bool hitMax = false;
    p = readWholeSeconds(p, *res, hitMax);
    // A '.' followed by neither a digit nor the end is not part of the number.
    if (*p == '.' && (isDigit(p[1]) || p[1] == '\0')) {
        p = readFraction(p + 1, *res, hitMax);
    }
    if (hitMax) {
        *res = std::numeric_limits<unsigned long long>::max();
    }
    const bool found = p != number;
    if (charCount != nullptr) {
        *charCount = found ? static_cast<unsigned long>(p - oldp) : 0;
    }
    return found;
}
