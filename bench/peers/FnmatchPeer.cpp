// fnmatch(3) of the C library: nothing is compiled; each lookup tries all patterns.

#include <benchmark/benchmark.h>
#include <fnmatch.h>

#include "PatternPeer.h"

namespace {

class FnmatchSet : public bench::PatternSetPeer {
public:
    std::string build(const std::vector<std::string>& patterns) override {
        _patterns = patterns;
        return "";
    }

    long count(const std::string& term) override {
        long matches = 0;
        for (const std::string& pattern : _patterns) {
            matches += ::fnmatch(pattern.c_str(), term.c_str(), 0) == 0 ? 1 : 0;
        }
        return matches;
    }

private:
    std::vector<std::string> _patterns;
};

class FnmatchSingle : public bench::SinglePeer {
public:
    bool compile(const std::string& pattern) override {
        _pattern = pattern;
        return true;
    }

    std::size_t match(const std::string& text, std::size_t times) override {
        std::size_t matches = 0;
        const char* start = text.c_str();
        for (; times > 0; --times) {
            benchmark::DoNotOptimize(start);
            matches += ::fnmatch(_pattern.c_str(), start, 0) == 0 ? 1 : 0;
        }
        return matches;
    }

private:
    std::string _pattern;
};

const bench::Registrar<bench::PatternSetPeer, FnmatchSet> setPeer("fnmatch loop",
                                                                  bench::Meaning::USUAL);
const bench::Registrar<bench::SinglePeer, FnmatchSingle> singlePeer("fnmatch",
                                                                    bench::Meaning::USUAL);

}  // namespace
