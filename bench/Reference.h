#ifndef QUELTA_BENCH_REFERENCE_H_
#define QUELTA_BENCH_REFERENCE_H_

// Two slow matchers, each written from its rules, against which every peer's answers are checked
// before it is timed.
//
// They differ in the last segment of a pattern such as "*aa". The rules of this system search for
// it from left to right without overlap, so "*aa" does not match "aaa"; the usual meaning of a
// star, which the libraries share, only asks that the text end with it.

#include <string>
#include <string_view>
#include <vector>

namespace bench {

// Which of the two meanings a peer has.
enum class Meaning { SUFFIX_SEARCH, USUAL };

// The literal pieces between the stars, empty ones included: "a**b" gives "a", "", "b".
std::vector<std::string_view> splitAtStars(std::string_view pattern);

// Whether `pattern` matches the whole of `text`.
bool referenceMatch(Meaning meaning, std::string_view pattern, std::string_view text);

}  // namespace bench

#endif  // QUELTA_BENCH_REFERENCE_H_
