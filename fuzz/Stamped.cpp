#include "Stamped.h"

#include <cstdint>
#include <cstdlib>
#include <ctime>
#include <limits>
#include <stdexcept>

#include "support/SlowLayout.h"
#include "util/Logger.h"
#include "util/internal/LogGlobals.h"

// Processor time is constant, so that "%u" can be compared.
extern "C" std::clock_t __wrap_clock();
extern "C" std::clock_t __wrap_clock() {
    return 123456;
}

namespace {

constexpr long long EPOCH = 981000000;
constexpr const char* LEVELS[] = {"DEBUG", "INFO",  "NOTICE", "WARN",  "ERROR",
                                  "CRIT",  "ALERT", "FATAL",  "EMERG", "???"};

Logger& logger() {
    static Logger instance = [] {
        ::setenv("TZ", "CET-1CEST,M3.5.0,M10.5.0/3", 1);
        ::tzset();
        epoch_timeval().set(EPOCH, 0);
        return Logger("services.Rete");
    }();
    return instance;
}

}  // namespace

namespace fuzz {

Stamped::Stamped(FuzzInput& input)
    : _level(static_cast<LogLevel>(input.lineAsNumber(0, 9))),
      _sec(input.lineAsNumber(std::numeric_limits<std::int32_t>::min(),
                              std::numeric_limits<std::int32_t>::max())),
      _usec(input.lineAsNumber(0, 999999)) {}

LogMsgMetadata Stamped::metadata() const {
    LogMsgMetadata mdata(&logger(), _level);
    mdata.stamp.set(_sec, _usec);
    return mdata;
}

std::optional<std::string> Stamped::rendered(const std::string& pattern,
                                             const std::string& message) const {
    SlowLine line;
    line.message = message;
    line.category = "services.Rete";
    line.level = LEVELS[_level];
    line.thread = "Main Thread";
    const long long msec = (_sec - EPOCH) * 1000 + (_usec + 999) / 1000;
    line.epochMsec = std::to_string(static_cast<unsigned long long>(msec));
    line.epochSec = std::to_string(static_cast<unsigned long long>(msec / 1000));
    line.clock = "123456";
    const auto seconds = static_cast<std::time_t>(_sec);
    ::localtime_r(&seconds, &line.local);
    line.usec = static_cast<unsigned>(_usec);
    try {
        return renderSlowly(pattern, line);
    } catch (const std::length_error&) {
        return std::nullopt;
    }
}

}  // namespace fuzz
