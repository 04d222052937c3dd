#ifndef QUELTA_UTIL_WILDCARDMATCHER_H_
#define QUELTA_UTIL_WILDCARDMATCHER_H_

// A compiled text pattern in which `*` represents any run of characters, the empty run included.
// `*` is the only special character; matching is byte-wise and case-sensitive.
//
//     const WildcardMatcher matcher("app.*.log");
//     if (matcher.isMatch("app.2.log")) {
//         std::puts(matcher.getPatternPrefix());  // "app."
//     }
//
// A pattern is cut at its stars into literal segments. A segment before the first star must begin
// the text (hard start), one after the last star must end it (hard end). The others must follow
// each other in the text, each at its leftmost occurrence. There is no backtracking.
//
// Construct a matcher for each pattern. Assignment does not replace a pattern: see operator=.
//
// Invariants of an object that was never assigned to: the segments fill _subStrings from the front
// without a gap and none is empty; _isWord is 1 exactly when there is one segment and both hard
// flags are set. An object that had segments when it was assigned to starts with null entries.
// Both pattern copies belong to the object.
//
// Immutable after construction; safe to share. The exception is assignment.

#include <cstddef>
#include <string>
#include <vector>

#include "util/Requirements.h"

// A compiled pattern.
class WildcardMatcher {
public:
    // The kind of a compiled form. Do not use it to classify a pattern.
    // Deliberate: no pattern compiles to POSTFIX_MATCHER, PREFIX_MATCHER or MIDFIX_MATCHER.
    enum MatchType {
        ERROR_MATCHER = -1,      // no segments: the empty pattern, or stars only
        POSTFIX_MATCHER = 0,     // no segments, but a hard end
        PREFIX_MATCHER = 1,      // no segments, but a hard start
        MIDFIX_MATCHER = 2,      // no segments, but both
        MULTIFIX_MATCHER = 3,    // segments and a star
        SINGLE_WORD_MATCHER = 4  // no star
    };

    // The most literal segments that a pattern may have.
    static constexpr int MAX_SUBSTRINGS = 256;

    // Compiles `pattern`, NUL-terminated; null compiles like the empty pattern. Implicit, so that a
    // pattern can be passed where a matcher is expected.
    // Errors: std::length_error for more than MAX_SUBSTRINGS segments; std::bad_alloc.
    WildcardMatcher(const char* pattern);

    // Compiles the other's pattern text again; nothing is shared.
    // Errors: std::bad_alloc.
    WildcardMatcher(const WildcardMatcher& other);

    // Takes the other's compiled form; the other becomes a matcher without pattern or segments.
    WildcardMatcher(WildcardMatcher&& other) noexcept;

    // Compiles the other's pattern text on top of what this object holds.
    // Deliberate: this is not a reset. The segment table is emptied, but count and flags stay. The
    // new segments are placed after the old count, and the earlier pattern copies stay allocated
    // for the life of the process. An object that had segments therefore no longer matches any
    // text, since a null entry never matches. Self-assignment is a no-op.
    // Errors: std::length_error if the segments together exceed MAX_SUBSTRINGS; the object is
    // unchanged then. std::bad_alloc; it matches as before then.
    WildcardMatcher& operator=(const WildcardMatcher& other);

    // Frees the pattern.
    ~WildcardMatcher();

    // Returns: whether the whole of `haystack` matches.
    // Requires: `haystack` is not null; asserted.
    // Deliberate: a hard end is searched for from left to right, in non-overlapping steps, until an
    // occurrence ends the text, so "*aa" does not match "aaa".
    // Cost: no allocation.
    bool isMatch(const char* haystack) const;

    // Tests in the same way, for callers that already have the length of `haystack` in bytes.
    bool isMatch(const char* haystack, std::size_t length) const;

    // Prefetches what isMatch reads of the object, for callers that try many matchers in a row.
    void prefetch() const {
        __builtin_prefetch(this);
        __builtin_prefetch(&_subStrings[4]);
        __builtin_prefetch(&_subStringCount);
    }
    // Prefetches the first segment; call it a few matchers after prefetch().
    void prefetchSegment() const { __builtin_prefetch(_subStrings[0]); }

    // Tests in the same way, and replaces `substrs` by the texts that the stars covered, in pattern
    // order. After a failure it holds what was covered until then.
    // Returns: whether the whole of `haystack`, not null, matches.
    // Deliberate: what the last star covers is split at each earlier occurrence of a hard end.
    // Errors: std::bad_alloc.
    bool isMatch(const char* haystack, std::vector<std::string>& substrs);

    // Returns: the literal text before the first star, the whole pattern if it has no star, "" if
    // it begins with one; never null.
    // Owns: the text belongs to the matcher.
    const char* getPatternPrefix() const;

    // Prints the compiled form on standard output.
    void debugOpaqueMatcher() const;

    // Returns: the pattern as given, which may be null.
    // Owns: the text belongs to the matcher.
    const char* getOrigPattern() const { return _needle; }

private:
    WildcardMatcher() = default;

    void init(const char* pattern);
    void compile();
    bool matches(const char* text, const char* end) const;
    MatchType getMatcherType() const;
    char* getHardStart() const;
    char* getHardEnd() const;
    char* getWord() const;

    char* _needle = nullptr;            // the pattern as given, an array of its own
    char* _buffer = nullptr;            // a second copy, every star overwritten by NUL
    bool _hardEnd = false;              // the last segment must end the text
    bool _hardStart = false;            // the first segment must begin the text
    char* _subStrings[MAX_SUBSTRINGS];  // the segments, inside _buffer; null after the last
    int _subStringCount = 0;            // entries in use, empty ones at the front included
    int _isWord = 0;                    // 1 when the pattern has no star, else 0
};

#endif  // QUELTA_UTIL_WILDCARDMATCHER_H_
