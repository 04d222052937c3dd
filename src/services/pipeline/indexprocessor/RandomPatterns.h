#ifndef QUELTA_SERVICES_PIPELINE_INDEXPROCESSOR_RANDOMPATTERNS_H_
#define QUELTA_SERVICES_PIPELINE_INDEXPROCESSOR_RANDOMPATTERNS_H_

// The test data of the stress program: patterns made of the alphabet, in which a `*` replaces each
// of one to twenty random runs of letters.
//
//     for (const std::string& pattern : randomPatterns(1000)) {
//         std::puts(pattern.c_str());
//     }
//
// All numbers come from random(), which the program never seeds, so every run draws the same
// patterns.
// Not thread-safe; one thread at a time.

#include <set>
#include <string>

#include "util/Requirements.h"

// Draws one number.
// Requires: min <= max; only an empty range, max = min - 1, is asserted.
// Returns: a number from min to max, both included.
int randint(int min, int max);

// Draws `count` patterns; none for a count below 1.
// Returns: the distinct ones.
std::set<std::string> randomPatterns(int count);

#endif  // QUELTA_SERVICES_PIPELINE_INDEXPROCESSOR_RANDOMPATTERNS_H_
