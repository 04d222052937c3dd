#ifndef QUELTA_TESTS_SUPPORT_TIMEZONE_H_
#define QUELTA_TESTS_SUPPORT_TIMEZONE_H_

// Sets the time zone of the process while the object exists.
// Not thread-safe; one thread at a time per process.

#include <cstdlib>
#include <ctime>
#include <optional>
#include <string>

class TimeZone {
public:
    // `name` is a value of TZ; a rule such as "CET-1CEST,M3.5.0,M10.5.0/3" needs no zone files.
    explicit TimeZone(const char* name) {
        if (const char* const old = std::getenv("TZ")) {
            _old = old;
        }
        set(name);
    }
    ~TimeZone() { set(_old ? _old->c_str() : nullptr); }
    TimeZone(const TimeZone&) = delete;
    TimeZone& operator=(const TimeZone&) = delete;

private:
    static void set(const char* name) {
        if (name == nullptr) {
            ::unsetenv("TZ");
        } else {
            ::setenv("TZ", name, 1);
        }
        ::tzset();
    }

    std::optional<std::string> _old;
};

#endif  // QUELTA_TESTS_SUPPORT_TIMEZONE_H_
