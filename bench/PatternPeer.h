#ifndef QUELTA_BENCH_PATTERNPEER_H_
#define QUELTA_BENCH_PATTERNPEER_H_

// The interface of every matcher in the benchmarks: a set of `*` patterns that counts how many of
// them match a term, and a single pattern for one text. Each peer is one file below peers/ that
// adds itself to the lists through a static registrar. The file of a library that is not installed
// is not compiled.
//
// Not thread-safe.

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "Reference.h"

namespace bench {

// Compiled patterns, searched for one term at a time. build is called first.
class PatternSetPeer {
public:
    virtual ~PatternSetPeer() = default;

    // Compiles the set, which outlives the peer.
    // Returns: an empty string, or why the peer cannot hold the set.
    virtual std::string build(const std::vector<std::string>& patterns) = 0;

    // The number of patterns that match `term`.
    // Errors: a negative number if the peer failed.
    virtual long count(const std::string& term) = 0;

    // True if a lookup keeps its matches in the peer. forget() removes them; count() without it
    // finds them already there.
    virtual bool keepsMatches() const { return false; }
    virtual void forget(const std::string&) {}

    // What the program times: clears the result, then collects the matches of `term` in an ordered
    // set.
    // Returns: the size of that set; negative if the peer cannot do this.
    virtual long collect(const std::string&) { return -1; }
};

// One compiled pattern for one text.
class SinglePeer {
public:
    virtual ~SinglePeer() = default;

    // Returns: false if the peer cannot express the pattern.
    virtual bool compile(const std::string& pattern) = 0;

    // Matches `text` `times` times.
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

// Adds a peer of the type `Peer` during static initialization.
template <class Peer, class Implementation>
class Registrar {
public:
    Registrar(const char* name, Meaning meaning) {
        peerList<Peer>().push_back({name, meaning, []() -> std::unique_ptr<Peer> {
                                        return std::make_unique<Implementation>();
                                    }});
    }
};

// The pattern as a regular expression: `star` for each run of stars, everything else literal.
std::string toRegex(const std::string& pattern, const std::string& star);

}  // namespace bench

#endif  // QUELTA_BENCH_PATTERNPEER_H_
