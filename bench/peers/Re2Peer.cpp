// RE2: one object per pattern in a loop, and RE2::Set with all patterns in one automaton.

#include <benchmark/benchmark.h>
#include <re2/re2.h>
#include <re2/set.h>

#include "PatternPeer.h"

namespace {

// Memory limit in bytes for the automaton of one set; the default of 8 MB is far too small.
constexpr std::int64_t SET_MEMORY = std::int64_t{1} << 30;

RE2::Options options() {
    RE2::Options out(RE2::Latin1);
    out.set_dot_nl(true);
    out.set_log_errors(false);
    out.set_never_capture(true);
    return out;
}

class Re2Loop : public bench::PatternSetPeer {
public:
    std::string build(const std::vector<std::string>& patterns) override {
        _patterns.reserve(patterns.size());
        for (const std::string& pattern : patterns) {
            _patterns.push_back(std::make_unique<RE2>(bench::toRegex(pattern, ".*"), options()));
            if (!_patterns.back()->ok()) {
                return _patterns.back()->error();
            }
        }
        return "";
    }

    long count(const std::string& term) override {
        long matches = 0;
        for (const auto& pattern : _patterns) {
            matches += RE2::FullMatch(term, *pattern) ? 1 : 0;
        }
        return matches;
    }

private:
    std::vector<std::unique_ptr<RE2>> _patterns;
};

class Re2Set : public bench::PatternSetPeer {
public:
    std::string build(const std::vector<std::string>& patterns) override {
        RE2::Options own = options();
        own.set_max_mem(SET_MEMORY);
        _set = std::make_unique<RE2::Set>(own, RE2::ANCHOR_BOTH);
        for (const std::string& pattern : patterns) {
            std::string error;
            if (_set->Add(bench::toRegex(pattern, ".*"), &error) < 0) {
                return error;
            }
        }
        return _set->Compile() ? "" : "the set does not compile within 1 GB";
    }

    long count(const std::string& term) override {
        RE2::Set::ErrorInfo error{};
        if (!_set->Match(term, &_hits, &error)) {
            return error.kind == RE2::Set::kNoError ? 0 : -1;
        }
        return static_cast<long>(_hits.size());
    }

private:
    std::unique_ptr<RE2::Set> _set;
    std::vector<int> _hits;
};

class Re2Single : public bench::SinglePeer {
public:
    bool compile(const std::string& pattern) override {
        _pattern = std::make_unique<RE2>(bench::toRegex(pattern, ".*"), options());
        return _pattern->ok();
    }

    std::size_t match(const std::string& text, std::size_t times) override {
        std::size_t matches = 0;
        const char* start = text.data();
        for (; times > 0; --times) {
            benchmark::DoNotOptimize(start);
            const re2::StringPiece piece(start, text.size());
            matches += RE2::FullMatch(piece, *_pattern) ? 1 : 0;
        }
        return matches;
    }

private:
    std::unique_ptr<RE2> _pattern;
};

const bench::Registrar<bench::PatternSetPeer, Re2Loop> loopPeer("RE2 loop", bench::Meaning::USUAL);
const bench::Registrar<bench::PatternSetPeer, Re2Set> setPeer("RE2::Set", bench::Meaning::USUAL);
const bench::Registrar<bench::SinglePeer, Re2Single> singlePeer("RE2", bench::Meaning::USUAL);

}  // namespace
