#ifndef QUELTA_TESTS_SUPPORT_SLOWLAYOUT_H_
#define QUELTA_TESTS_SUPPORT_SLOWLAYOUT_H_

// A slow renderer of log layouts, for comparison. It parses the pattern again for each line, one
// character at a time, and shares no code with the compiled layouts.

#include <ctime>
#include <string>

// The parts of one line, already as text.
struct SlowLine {
    std::string message;
    std::string category;
    std::string level;
    std::string thread;
    std::string epochMsec;
    std::string epochSec;
    std::string clock;
    struct tm local = {};
    unsigned usec = 0;  // microseconds of the stamp
};

std::string renderSlowly(const std::string& pattern, const SlowLine& line);

#endif  // QUELTA_TESTS_SUPPORT_SLOWLAYOUT_H_
