// Handwritten code for one pattern of a known form: strstr for "*middle*", a comparison of the end
// for "*end". It cannot express other patterns.

#include <benchmark/benchmark.h>

#include <cstring>

#include "PatternPeer.h"

namespace {

class StrstrSingle : public bench::SinglePeer {
public:
    bool compile(const std::string& pattern) override {
        if (pattern.size() < 3 || pattern.front() != '*' || pattern.back() != '*') {
            return false;
        }
        _middle = pattern.substr(1, pattern.size() - 2);
        return _middle.find('*') == std::string::npos;
    }

    std::size_t match(const std::string& text, std::size_t times) override {
        std::size_t matches = 0;
        const char* start = text.c_str();
        for (; times > 0; --times) {
            benchmark::DoNotOptimize(start);
            matches += std::strstr(start, _middle.c_str()) != nullptr ? 1 : 0;
        }
        return matches;
    }

private:
    std::string _middle;
};

// Takes a NUL-terminated text, as the matcher does.
class SuffixSingle : public bench::SinglePeer {
public:
    bool compile(const std::string& pattern) override {
        if (pattern.size() < 2 || pattern.front() != '*') {
            return false;
        }
        _end = pattern.substr(1);
        return _end.find('*') == std::string::npos;
    }

    std::size_t match(const std::string& text, std::size_t times) override {
        std::size_t matches = 0;
        const char* start = text.c_str();
        for (; times > 0; --times) {
            benchmark::DoNotOptimize(start);
            const std::size_t length = std::strlen(start);
            matches += length >= _end.size() && std::memcmp(start + length - _end.size(),
                                                            _end.data(), _end.size()) == 0
                           ? 1
                           : 0;
        }
        return matches;
    }

private:
    std::string _end;
};

using bench::Meaning;
const bench::Registrar<bench::SinglePeer, StrstrSingle> middle("strstr", Meaning::USUAL);
const bench::Registrar<bench::SinglePeer, SuffixSingle> suffix("suffix test", Meaning::USUAL);

}  // namespace
