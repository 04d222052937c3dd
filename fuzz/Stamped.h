#ifndef QUELTA_FUZZ_STAMPED_H_
#define QUELTA_FUZZ_STAMPED_H_

// A message's level and stamp, read from an input, and the line that the slow renderer produces.
// Immutable after construction; safe to share.

#include <optional>
#include <string>

#include "FuzzInput.h"
#include "util/LogMsgMetadata.h"

namespace fuzz {

class Stamped {
public:
    // Reads three lines: the level, which may be one past the last; seconds of a signed 32-bit
    // clock; microseconds. The first object sets the time zone, logging epoch and processor time.
    explicit Stamped(FuzzInput& input);

    LogMsgMetadata metadata() const;

    // Returns: nullopt if a date is too long for the slow renderer.
    std::optional<std::string> rendered(const std::string& pattern,
                                        const std::string& message) const;

private:
    const LogLevel _level;
    const long long _sec;
    const long long _usec;
};

}  // namespace fuzz

#endif  // QUELTA_FUZZ_STAMPED_H_
