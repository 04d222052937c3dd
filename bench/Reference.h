#ifndef QUELTA_BENCH_REFERENCE_H_
#define QUELTA_BENCH_REFERENCE_H_

// The results of the tests' slow matcher. Every peer is checked against them before it is timed.
// The libraries give a star its usual meaning, which differs in the last segment; see
// support/MatcherOracle.h.

#include <string>
#include <string_view>
#include <vector>

namespace bench {

// The two meanings of a star.
enum class Meaning { SUFFIX_SEARCH, USUAL };

// The literal pieces between the stars, empty ones included: "a**b" gives "a", "", "b".
std::vector<std::string_view> splitAtStars(std::string_view pattern);

// Whether `pattern` matches the whole of `text`.
bool referenceMatch(Meaning meaning, std::string_view pattern, std::string_view text);

}  // namespace bench

#endif  // QUELTA_BENCH_REFERENCE_H_
