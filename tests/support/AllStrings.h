#ifndef QUELTA_TESTS_SUPPORT_ALLSTRINGS_H_
#define QUELTA_TESTS_SUPPORT_ALLSTRINGS_H_

// Every string over a small alphabet, for exhaustive comparisons.

#include <cstddef>
#include <string>

// Calls `visit(text)` once for each string of at most `maxLength` characters of the alphabet, the
// empty one first.
// Returns: the number of strings.
template <typename Visit>
std::size_t forEachString(const std::string& alphabet, std::size_t maxLength, Visit visit,
                          const std::string& prefix = std::string()) {
    visit(prefix);
    std::size_t count = 1;
    if (prefix.size() < maxLength) {
        for (const char c : alphabet) {
            count += forEachString(alphabet, maxLength, visit, prefix + c);
        }
    }
    return count;
}

#endif  // QUELTA_TESTS_SUPPORT_ALLSTRINGS_H_
