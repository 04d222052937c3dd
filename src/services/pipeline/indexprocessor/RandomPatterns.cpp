#include "services/pipeline/indexprocessor/RandomPatterns.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string_view>
#include <unordered_set>
#include <vector>

#include "util/Assert.h"

namespace {

constexpr std::string_view ALPHABET = "abcdefghijklmnopqrstuvwxyz";
constexpr int MOST_STARS = 20;
constexpr std::size_t SIZE = 48;  // of a pattern, with zeros after its end
static_assert(ALPHABET.size() + MOST_STARS < SIZE, "a star adds at most one character");

// A pattern, padded with zeros.
struct Pattern {
    bool operator==(const Pattern&) const = default;

    char text[SIZE];
};

struct Hash {
    std::size_t operator()(const Pattern& pattern) const {
        return std::hash<std::string_view>()({pattern.text, SIZE});
    }
};

// Replaces random runs of the alphabet by stars. A later run may contain earlier stars. The
// characters after a run move as a block of fixed size, which is twice as fast as a move of their
// exact number.
Pattern drawPattern() {
    char wild[2 * SIZE] = {};
    ALPHABET.copy(wild, ALPHABET.size());
    int last = static_cast<int>(ALPHABET.size()) - 1;
    for (int stars = randint(1, MOST_STARS); stars > 0; --stars) {
        const int start = randint(0, last);
        const int end = randint(start, last);
        char rest[SIZE];
        std::memcpy(rest, wild + end, SIZE);
        wild[start] = '*';
        std::memcpy(wild + start + 1, rest, SIZE);
        last -= end - start - 1;
    }
    Pattern pattern;
    std::memcpy(pattern.text, wild, SIZE);
    return pattern;
}

}  // namespace

int randint(int min, int max) {
    const long range = static_cast<long>(max) - min + 1;
    QUELTA_ASSERT(range != 0);
    return static_cast<int>(min + random() % range);
}

std::set<std::string> randomPatterns(int count) {
    std::unordered_set<Pattern, Hash> patterns;
    patterns.max_load_factor(0.25F);  // short chains: nearly all draws repeat a pattern
    for (int i = 0; i < count; ++i) {
        patterns.insert(drawPattern());
    }
    std::vector<std::string> sorted;  // a set is built faster from sorted strings
    sorted.reserve(patterns.size());
    for (const Pattern& pattern : patterns) {
        sorted.emplace_back(pattern.text);
    }
    std::sort(sorted.begin(), sorted.end());
    return {sorted.begin(), sorted.end()};
}
