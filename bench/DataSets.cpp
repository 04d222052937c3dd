#include "DataSets.h"

#include <algorithm>
#include <cstdlib>
#include <random>
#include <set>
#include <unordered_set>

namespace bench {
namespace {

// The initial state of random() in a process that never seeds it.
void rewindRandom() {
    ::srandom(1);
}

int drawBetween(int min, int max) {
    return min + static_cast<int>(::random() % (max - min + 1));
}

// One pattern: stretches of the alphabet are replaced by stars, 1 to 20 times.
std::string drawPattern() {
    std::string wild = "abcdefghijklmnopqrstuvwxyz";
    for (int cuts = drawBetween(1, 20); cuts > 0; --cuts) {
        const int last = static_cast<int>(wild.size()) - 1;
        const int start = drawBetween(0, last);
        const int end = drawBetween(start, last);
        wild.replace(static_cast<std::size_t>(start), static_cast<std::size_t>(end - start), "*");
    }
    return wild;
}

// std::mt19937 gives the same numbers everywhere; the standard distributions do not.
std::size_t pick(std::mt19937& generator, std::size_t count) {
    return generator() % count;
}

const char* const SYLLABLES[] = {"al", "be", "con", "de",  "er",  "for", "ga", "in",
                                 "li", "mo", "ne",  "or",  "pre", "re",  "se", "ta",
                                 "un", "ve", "wi",  "ing", "ed",  "ion", "al", "ment"};

std::string word(std::mt19937& generator, std::size_t syllables) {
    std::string out;
    for (; syllables > 0; --syllables) {
        out += SYLLABLES[pick(generator, std::size(SYLLABLES))];
    }
    return out;
}

std::string shortPattern(std::mt19937& generator) {
    const std::size_t kind = pick(generator, 50);
    if (kind == 0) {
        return '*' + word(generator, 2);
    }
    const std::string start = word(generator, 2);
    return kind < 25 ? start + '*' : start + '*' + word(generator, 1);
}

}  // namespace

const char* const PROGRAM_TERM = "abcdefghijklmxopqrstuvwxyz";

unsigned long programDraws(std::size_t draws) {
    rewindRandom();
    unsigned long sum = 0;
    for (; draws > 0; --draws) {
        for (int cuts = drawBetween(1, 20); cuts > 0; --cuts) {
            sum += static_cast<unsigned long>(::random());
            sum += static_cast<unsigned long>(::random());
        }
    }
    return sum;
}

std::vector<std::string> programPatterns(std::size_t draws) {
    rewindRandom();
    std::unordered_set<std::string> distinct;
    for (; draws > 0; --draws) {
        distinct.insert(drawPattern());
    }
    std::vector<std::string> out(distinct.begin(), distinct.end());
    std::sort(out.begin(), out.end());
    return out;
}

PatternSet programSet(std::size_t draws, std::size_t count) {
    rewindRandom();
    std::unordered_set<std::string> distinct;
    for (; draws > 0 && distinct.size() < count; --draws) {
        distinct.insert(drawPattern());
    }
    PatternSet set{"program", {distinct.begin(), distinct.end()}, {PROGRAM_TERM}, ""};
    // Every pattern ends with the last letter, which this term lacks.
    set.miss = "abcdefghijklmnopqrstuvwxy";
    std::sort(set.patterns.begin(), set.patterns.end());
    return set;
}

PatternSet urlSet(std::size_t count) {
    std::mt19937 generator(20);
    std::vector<std::string> stems;
    for (std::size_t host = 0; stems.size() * 25 < count; ++host) {
        const std::string name = "http://www." + word(generator, 3) + ".example/";
        for (int section = 0; section < 8; ++section) {
            stems.push_back(name + word(generator, 2) + '/');
        }
    }
    std::set<std::string> distinct;
    while (distinct.size() < count) {
        const std::string& stem = stems[pick(generator, stems.size())];
        distinct.insert(stem + std::to_string(pick(generator, 900) + 100) + "/*");
    }
    PatternSet set{"urls", {distinct.begin(), distinct.end()}, {}, ""};
    for (int term = 0; term < 64; ++term) {
        std::string base = set.patterns[pick(generator, set.patterns.size())];
        base.pop_back();
        // Every fourth term differs from the known prefixes in its last character.
        base.back() = term % 4 == 0 ? '-' : '/';
        set.terms.push_back(base + word(generator, 4) +
                            ".html?session=" + std::to_string(pick(generator, 1000000)));
    }
    return set;
}

PatternSet shortTermSet(std::size_t count, std::size_t terms) {
    std::mt19937 generator(21);
    std::set<std::string> distinct;
    while (distinct.size() < count) {
        std::string pattern = shortPattern(generator);
        // Two syllables do not give enough combinations, so some words have a third.
        if (!distinct.insert(pattern).second) {
            distinct.insert(word(generator, 1) + pattern);
        }
    }
    PatternSet set{"short terms", {distinct.begin(), distinct.end()}, {}, ""};
    for (; terms > 0; --terms) {
        set.terms.push_back(word(generator, 1 + pick(generator, 3)));
    }
    return set;
}

}  // namespace bench
