// PCRE2 with its just-in-time compiler: one compiled expression per pattern.

#define PCRE2_CODE_UNIT_WIDTH 8
#include <benchmark/benchmark.h>
#include <pcre2.h>

#include <utility>

#include "PatternPeer.h"

namespace {

// One expression, anchored at both ends.
class Pcre2Pattern {
public:
    Pcre2Pattern() = default;
    Pcre2Pattern(Pcre2Pattern&& other) noexcept : _code(std::exchange(other._code, nullptr)) {}
    Pcre2Pattern& operator=(Pcre2Pattern&&) = delete;
    ~Pcre2Pattern() { pcre2_code_free(_code); }

    bool compile(const std::string& pattern) {
        const std::string regex = bench::toRegex(pattern, ".*");
        int error = 0;
        PCRE2_SIZE offset = 0;
        _code = pcre2_compile(reinterpret_cast<PCRE2_SPTR>(regex.data()), regex.size(),
                              PCRE2_DOTALL | PCRE2_ANCHORED | PCRE2_ENDANCHORED, &error, &offset,
                              nullptr);
        return _code != nullptr && pcre2_jit_compile(_code, PCRE2_JIT_COMPLETE) == 0;
    }

    // The direct entry to the JIT code, which skips the option checks.
    bool matches(const char* text, std::size_t length, pcre2_match_data* data) const {
        return pcre2_jit_match(_code, reinterpret_cast<PCRE2_SPTR>(text), length, 0, 0, data,
                               nullptr) >= 0;
    }

private:
    pcre2_code* _code = nullptr;
};

class MatchData {
public:
    MatchData() = default;
    MatchData(const MatchData&) = delete;
    MatchData& operator=(const MatchData&) = delete;
    ~MatchData() { pcre2_match_data_free(_data); }
    pcre2_match_data* get() { return _data; }

private:
    pcre2_match_data* _data = pcre2_match_data_create(1, nullptr);
};

class Pcre2Set : public bench::PatternSetPeer {
public:
    std::string build(const std::vector<std::string>& patterns) override {
        _patterns.reserve(patterns.size());
        for (const std::string& pattern : patterns) {
            if (!_patterns.emplace_back().compile(pattern)) {
                return "an expression does not compile";
            }
        }
        return "";
    }

    long count(const std::string& term) override {
        long matches = 0;
        for (const Pcre2Pattern& pattern : _patterns) {
            matches += pattern.matches(term.data(), term.size(), _data.get()) ? 1 : 0;
        }
        return matches;
    }

private:
    MatchData _data;
    std::vector<Pcre2Pattern> _patterns;
};

class Pcre2Single : public bench::SinglePeer {
public:
    bool compile(const std::string& pattern) override { return _pattern.compile(pattern); }

    std::size_t match(const std::string& text, std::size_t times) override {
        std::size_t matches = 0;
        const char* start = text.data();
        for (; times > 0; --times) {
            benchmark::DoNotOptimize(start);
            matches += _pattern.matches(start, text.size(), _data.get()) ? 1 : 0;
        }
        return matches;
    }

private:
    MatchData _data;
    Pcre2Pattern _pattern;
};

const bench::Registrar<bench::PatternSetPeer, Pcre2Set> setPeer("PCRE2 JIT loop",
                                                                bench::Meaning::USUAL);
const bench::Registrar<bench::SinglePeer, Pcre2Single> singlePeer("PCRE2 JIT",
                                                                  bench::Meaning::USUAL);

}  // namespace
