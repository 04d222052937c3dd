// The compiled layouts against a slow renderer, over every short pattern of a small alphabet and
// over seeded random ones.

#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <ctime>
#include <random>
#include <string>
#include <string_view>
#include <vector>

#include "support/AllStrings.h"
#include "support/LogLine.h"
#include "support/ScriptedLibc.h"
#include "support/SlowLayout.h"
#include "support/TimeZone.h"
#include "util/Logger.h"
#include "util/internal/LogGlobals.h"

namespace {

// The processor time is fixed, so that "%u" can be compared.
const Replacement clockStandsStill(replacement::clock, [] { return std::clock_t{123456}; });

constexpr long long EPOCH = 981000000;

struct Message {
    const Logger& logger;
    const char* category;
    LogLevel level;
    const char* levelName;
    long long sec;
    long long usec;
    std::string text;

    LogMsgMetadata metadata() const { return stampedAt(logger, level, sec, usec); }

    SlowLine slowLine() const {
        SlowLine line;
        line.message = text;
        line.category = category;
        line.level = levelName;
        line.thread = "Main Thread";
        const long long msec = (sec - EPOCH) * 1000 + (usec + 999) / 1000;
        line.epochMsec = std::to_string(static_cast<unsigned long long>(msec));
        line.epochSec = std::to_string(static_cast<unsigned long long>(msec / 1000));
        line.clock = "123456";
        const auto seconds = static_cast<std::time_t>(sec);
        ::localtime_r(&seconds, &line.local);
        line.usec = static_cast<unsigned>(usec);
        return line;
    }
};

const Logger shortName("a");
const Logger longName("services.pipeline.indexprocessor.Rete");

const std::vector<Message>& messages() {
    static const std::vector<Message> all = {
        {shortName, "a", INFO, "INFO", 981173106, 7500, "hello"},
        {longName, "services.pipeline.indexprocessor.Rete", NOTICE, "NOTICE", 980999999, 999999,
         ""},
        {shortName, "a", EMERG, "EMERG", -1, 0, std::string("\0% %m %% {x}\n", 13)},
        {longName, "services.pipeline.indexprocessor.Rete", DEBUG, "DEBUG", 2147483647, 1,
         std::string(300, 'x')}};
    return all;
}

// Returns: whether the two agree on the pattern.
bool agree(const std::string& pattern, const Message& message, const SlowLine& slow) {
    const std::string expected = renderSlowly(pattern, slow);
    const std::string actual = lineOf(pattern.c_str(), message.metadata(), message.text);
    EXPECT_EQ(expected, actual) << "pattern \"" << pattern << '"';
    return expected == actual;
}

class Random {
public:
    explicit Random(unsigned seed) : _engine(seed) {}

    std::size_t below(std::size_t limit) { return _engine() % limit; }
    bool oneIn(std::size_t n) { return below(n) == 0; }
    char of(std::string_view letters) { return letters[below(letters.size())]; }

private:
    std::mt19937 _engine;
};

// Up to three digits, so that no line grows to gigabytes.
std::string randomWidth(Random& random) {
    std::string digits;
    for (std::size_t n = random.below(3); n > 0; --n) {
        digits += random.of("00123459");
    }
    return digits;
}

std::string randomDate(Random& random) {
    if (random.oneIn(4)) {
        const char* const names[] = {"DATE", "ISO8601", "ABSOLUTE", "", "date", "%l", "%%l"};
        return names[random.below(std::size(names))];
    }
    std::string date;
    for (std::size_t n = random.below(8); n > 0; --n) {
        if (random.oneIn(3)) {
            date += random.of(" ,.:-%lx");
        } else {
            date += std::string("%") + random.of("aAbBcCdDeFgGHIjklmMnpPrRsStTuUVwWxXyYzZ%lEO");
        }
    }
    return date;
}

std::string randomConversion(Random& random) {
    std::string conversion = "%";
    if (random.oneIn(2)) {
        conversion += random.of("-0");
    }
    conversion += randomWidth(random);
    if (random.oneIn(3)) {
        conversion += "." + (random.oneIn(5) ? "99999999999" : randomWidth(random));
    }
    conversion += random.oneIn(8) ? random.of("qDMNCP%{} .\n") : random.of("mncptrRudd");
    if (conversion.back() == 'd' ? random.oneIn(2) : random.oneIn(10)) {
        conversion += "{" + randomDate(random) + (random.oneIn(20) ? "" : "}");
    }
    return conversion;
}

std::string randomPattern(Random& random) {
    std::string pattern;
    for (std::size_t n = random.below(10); n > 0; --n) {
        if (random.oneIn(2)) {
            pattern += randomConversion(random);
        } else if (random.oneIn(3)) {
            pattern += "%%";
        } else {
            pattern += random.of("ab {}[]|.-");
        }
    }
    if (random.oneIn(10)) {
        pattern += random.oneIn(2) ? "%" : "%-7.";
    }
    return pattern;
}

// Random characters, but never four digits in a row.
std::string randomNoise(Random& random) {
    std::string noise;
    for (std::size_t n = random.below(24); n > 0; --n) {
        const char next = random.of("%%%%%%-0.159mncptrRudq{}{}lHM x");
        const bool digits =
            noise.size() >= 3 && std::all_of(noise.end() - 3, noise.end(),
                                             [](unsigned char c) { return std::isdigit(c) != 0; });
        noise += digits && std::isdigit(static_cast<unsigned char>(next)) != 0 ? 'x' : next;
    }
    return noise;
}

// Dates of noise may hold digits, which strftime reads as widths of its own; the compiled layout
// and strftime must agree there too, except for a piece of "%p" with a width beyond 64.
void compareRandom(unsigned seed, int patterns, std::string (*draw)(Random&)) {
    const TimeZone berlin("CET-1CEST,M3.5.0,M10.5.0/3");
    epoch_timeval().set(EPOCH, 0);
    Random random(seed);
    for (int i = 0; i < patterns; ++i) {
        const std::string pattern = draw(random);
        const Message& message = messages()[random.below(messages().size())];
        ASSERT_TRUE(agree(pattern, message, message.slowLine())) << "seed " << seed << " #" << i;
    }
}

}  // namespace

TEST(LogFormatOracleTest, EveryShortPatternOfASmallAlphabet) {
    const TimeZone utc("UTC0");
    epoch_timeval().set(EPOCH, 0);
    const Message& message = messages()[0];
    const SlowLine slow = message.slowLine();
    bool same = true;
    const std::size_t patterns = forEachString("%-05.m{}d", 5, [&](const std::string& pattern) {
        same = same && agree(pattern, message, slow);
    });
    EXPECT_TRUE(same);
    EXPECT_EQ(66430u, patterns);
}

TEST(LogFormatOracleTest, RandomPatterns) {
    compareRandom(20010203, 20000, randomPattern);
}

TEST(LogFormatOracleTest, RandomNoise) {
    compareRandom(20010204, 20000, randomNoise);
}

TEST(LogFormatOracleTest, ThePatternsReachEveryConversion) {
    Random random(20010203);
    std::string kinds;
    for (int i = 0; i < 1000; ++i) {
        const LogFormat layout(randomPattern(random).c_str());
        for (const LogFormat::Atom* a = layout._atoms; a != layout._atom_end; ++a) {
            kinds += static_cast<char>('0' + a->what);
        }
    }
    for (const char kind : {'0', '1', '2', '3', '4', '5', '6', '7', '8'}) {
        EXPECT_LT(50, std::count(kinds.begin(), kinds.end(), kind)) << "kind " << kind;
    }
}
