#ifndef QUELTA_BENCH_DATASETS_H_
#define QUELTA_BENCH_DATASETS_H_

// The pattern sets and terms that the benchmarks of the rule network run on. All of them are the
// same in every run: the program's set draws from an unseeded random(), the others from a fixed
// seed.

#include <cstddef>
#include <string>
#include <vector>

namespace bench {

struct PatternSet {
    std::string name;
    std::vector<std::string> patterns;  // distinct
    std::vector<std::string> terms;     // looked up one after another
    std::string miss;  // if not empty: begins with every prefix of the set, matches no pattern
};

// The number of draws of the program Rete.
constexpr std::size_t PROGRAM_DRAWS = 5000000;

// The term of the program, which hits part of its patterns.
extern const char* const PROGRAM_TERM;

// What the program's drawing alone costs: as many random() calls as `draws` patterns take.
// Returns: their sum, so that no call can be left out.
unsigned long programDraws(std::size_t draws);

// The distinct patterns among the first `draws` patterns of the program, in ascending order.
std::vector<std::string> programPatterns(std::size_t draws);

// As programPatterns, stopped at `count` distinct patterns; fewer when `draws` yields fewer.
PatternSet programSet(std::size_t draws, std::size_t count);

// `count` patterns of a literal URL prefix and a star: hosts with sections and numbered pages.
// The terms are full URLs below some of them and some that no pattern covers.
PatternSet urlSet(std::size_t count);

// `count` patterns over short words ("read*", "re*ed"; one in fifty "*ing") and many terms of 3
// to 12 characters.
PatternSet shortTermSet(std::size_t count, std::size_t terms);

}  // namespace bench

#endif  // QUELTA_BENCH_DATASETS_H_
