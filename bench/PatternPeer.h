#ifndef QUELTA_BENCH_PATTERNPEER_H_
#define QUELTA_BENCH_PATTERNPEER_H_

// What every matcher of the benchmarks offers: a set of `*` patterns that counts how many of them
// match a term, and a single pattern for one text. Each peer is one file below peers/ that adds
// itself to the lists with a static registrar, so a library that is not installed is left out by
// not compiling its file.
//
// Not thread-safe.

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "Reference.h"

namespace bench {

// Compiled patterns, asked for one term at a time. The order of calls is build, then the others.
class PatternSetPeer {
public:
    virtual ~PatternSetPeer() = default;

    // Compiles the set, which outlives the peer.
    // Returns: an empty string, or why the peer cannot hold the set.
    virtual std::string build(const std::vector<std::string>& patterns) = 0;

    // The number of patterns that match `term`.
    // Errors: a negative number when the peer gave up.
    virtual long count(const std::string& term) = 0;

    // True when a lookup leaves its matches in the peer; then forget() takes them out again, and
    // count() without it finds them there already.
    virtual bool keepsMatches() const { return false; }
    virtual void forget(const std::string&) {}

    // The timed span of the program: starts from an empty result and collects the matches of
    // `term` in an ordered set.
    // Returns: the size of that set; negative when the peer does no such thing.
    virtual long collect(const std::string&) { return -1; }
};

// One compiled pattern for one text.
class SinglePeer {
public:
    virtual ~SinglePeer() = default;

    // Returns: false when the peer cannot express the pattern.
    virtual bool compile(const std::string& pattern) = 0;

    // Matches `text` `times` times over.
    // Returns: how often it matched.
    virtual std::size_t match(const std::string& text, std::size_t times) = 0;
};

template <class Peer>
struct PeerEntry {
    std::string name;
    Meaning meaning;
    std::unique_ptr<Peer> (*make)();
};

template <class Peer>
std::vector<PeerEntry<Peer>>& peerList() {
    static std::vector<PeerEntry<Peer>> list;
    return list;
}

// Adds a peer of the kind `Peer` at static initialization.
template <class Peer, class Implementation>
class Registrar {
public:
    Registrar(const char* name, Meaning meaning) {
        peerList<Peer>().push_back({name, meaning, []() -> std::unique_ptr<Peer> {
                                        return std::make_unique<Implementation>();
                                    }});
    }
};

// The pattern as a regular expression: `star` for each run of stars, all else literal.
std::string toRegex(const std::string& pattern, const std::string& star);

}  // namespace bench

#endif  // QUELTA_BENCH_PATTERNPEER_H_
