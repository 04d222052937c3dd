#ifndef QUELTA_BENCH_DATASETS_H_
#define QUELTA_BENCH_DATASETS_H_

// The pattern sets and terms for the benchmarks of the rule network. They are the same in every
// run: the program's set draws from an unseeded random(), the others from a fixed seed.

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

// The number of patterns that the program Rete draws.
constexpr std::size_t PROGRAM_DRAWS = 5000000;

// The term that the program sets; it matches some of its patterns.
extern const char* const PROGRAM_TERM;

// Makes only the random() calls for `draws` patterns, to measure what drawing costs.
// Returns: their sum, so that the compiler cannot remove a call.
unsigned long programDraws(std::size_t draws);

// The distinct patterns among the first `draws` patterns of the program, in ascending order.
std::vector<std::string> programPatterns(std::size_t draws);

// As programPatterns, but at most `count` distinct patterns.
PatternSet programSet(std::size_t draws, std::size_t count);

// `count` patterns of a literal URL prefix and a star: hosts with sections and numbered pages. The
// terms are full URLs; some begin with such a prefix, some match no pattern.
PatternSet urlSet(std::size_t count);

// `count` patterns over short words ("read*", "re*ed"; one in fifty "*ing") and many terms of 3
// to 12 characters.
PatternSet shortTermSet(std::size_t count, std::size_t terms);

}  // namespace bench

#endif  // QUELTA_BENCH_DATASETS_H_
