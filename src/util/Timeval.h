#ifndef QUELTA_UTIL_TIMEVAL_H_
#define QUELTA_UTIL_TIMEVAL_H_

// An instant of wall-clock time: seconds and microseconds since the epoch.
//
//     const Timeval start = Timeval::now();
//     Timeval deadline = start;
//     deadline.addMsec(1500);
//     std::printf("%lld ms left\n", Timeval::msecDifference(deadline, Timeval::now()));
//     std::printf("%s elapsed\n", start.describeSince().c_str());
//
// Additions saturate at one largest instant, 2147483647 s and 999999 us, so that it does not depend
// on the width of time_t. After every operation 0 <= _tv.tv_usec <= 999999.
// Not thread-safe; one thread at a time per object.

#include <sys/time.h>

#include <ctime>
#include <string>
#include <tuple>

#include "util/Requirements.h"

// An instant of wall-clock time.
class Timeval {
public:
    // The epoch.
    Timeval() noexcept = default;

    // Returns: the current time.
    [[nodiscard]] static Timeval now();

    // Returns: seconds since the epoch, rounded down.
    [[nodiscard]] long long sec() const noexcept { return _tv.tv_sec; }
    // Returns: milliseconds since the epoch (the whole instant, not its sub-second part), rounded
    // down.
    [[nodiscard]] long long msec() const noexcept;

    // Sets the instant; `microseconds` outside 0..999999 carry into (or borrow from) the seconds.
    void set(long long seconds, long long microseconds) noexcept;
    // Sets the current time.
    // Errors: aborts the process if the clock cannot be read.
    void setToNow();
    // Sets the largest instant.
    void setToMax() noexcept;

    // Adds seconds; the result is the largest instant if the sum exceeds 2147483647 s.
    void addSec(unsigned int secs) noexcept;
    // Adds milliseconds; the result is the largest instant if `msecs` is 2147483647000 or more, or
    // if the sum exceeds 2147483647 s.
    void addMsec(unsigned long long msecs);

    // Replaces `result` by this instant, to the second, in the local time zone.
    // Errors: aborts the process if the year does not fit.
    // Threads: safe from any thread.
    void localtime(struct tm& result) const;

    // Returns: whether this instant is before the other.
    [[nodiscard]] bool operator<(const Timeval& other) const noexcept {
        return std::tie(_tv.tv_sec, _tv.tv_usec) < std::tie(other._tv.tv_sec, other._tv.tv_usec);
    }
    // Returns: whether this instant is not after the other.
    [[nodiscard]] bool operator<=(const Timeval& other) const noexcept { return !(other < *this); }
    // Returns: whether this instant is after the other.
    [[nodiscard]] bool operator>(const Timeval& other) const noexcept { return other < *this; }
    // Returns: whether this instant is not before the other.
    [[nodiscard]] bool operator>=(const Timeval& other) const noexcept { return !(*this < other); }

    // Returns: a minus b in milliseconds, the sub-second part rounded up: 1 us later counts as 1.
    // Deliberate: whole seconds are rounded down first, so 1 us earlier counts as 0.
    [[nodiscard]] static long long msecDifference(const Timeval& a, const Timeval& b) noexcept;
    // Returns: a minus b, with 1000000 for each whole second.
    // Deliberate: the sub-second part is added in milliseconds, rounded down, and not in
    // microseconds: 1.5 s count as 1000500. describeDifference is based on it.
    [[nodiscard]] static long long usecDifference(const Timeval& a, const Timeval& b) noexcept;
    // Returns: usecDifference as text: a whole number, or one with one to three decimals, and a
    // unit ("5.000 seconds"), preceded by "-" if a is before b.
    [[nodiscard]] static std::string describeDifference(const Timeval& a, const Timeval& b);

    // Returns: msecDifference from this instant to now, positive for an instant in the past.
    [[nodiscard]] long long msecSince() const { return msecDifference(now(), *this); }
    // Returns: usecDifference from this instant to now, positive for an instant in the past.
    [[nodiscard]] long long usecSince() const { return usecDifference(now(), *this); }
    // Returns: describeDifference from this instant to now.
    [[nodiscard]] std::string describeSince() const { return describeDifference(now(), *this); }

private:
    struct timeval _tv = {0, 0};  // seconds since the epoch; microseconds, 0..999999
};

// A Timeval that starts at the current time.
class CurrentTimeval : public Timeval {
public:
    // The current time.
    CurrentTimeval() { setToNow(); }
    // Copies the instant; does not read the clock.
    CurrentTimeval(const CurrentTimeval&) noexcept = default;
    // Copies the instant of either class.
    CurrentTimeval& operator=(const CurrentTimeval&) noexcept = default;
    CurrentTimeval& operator=(const Timeval& other) noexcept {
        Timeval::operator=(other);
        return *this;
    }
};

// Reads a decimal number of seconds, with an optional fraction, after optional spaces and tabs.
//
// `res` is replaced by the milliseconds, rounded half up, but never to 0 for a time that is not
// zero; all ones if they do not fit. `charCount` (null allowed) is replaced by the number of
// characters read from `oldp` on, blanks included. A unit after the number is left to the caller.
// Returns: true if there was a number; a lone "." is the number 0. Otherwise *res and *charCount
// are 0.
bool convert_string_to_milliseconds(const char* oldp, unsigned long long* res,
                                    unsigned long* charCount);

#endif  // QUELTA_UTIL_TIMEVAL_H_
