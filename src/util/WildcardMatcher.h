#ifndef QUELTA_UTIL_WILDCARDMATCHER_H_
#define QUELTA_UTIL_WILDCARDMATCHER_H_

// A compiled text pattern in which `*` stands for any run of characters, the empty run included.
// `*` is the only special character; matching is byte-wise and case-sensitive.
//
// A pattern is cut at its stars into literal segments. A segment in front of the first star must
// begin the text (hard start), one behind the last star must end it (hard end), the others are
// placed one after the other, each at its leftmost occurrence. Nothing is ever placed again.
//
// Construct, then ask as often as needed. Assignment is not a recompilation: see operator=.
//
// Invariants of an object that was never assigned to: the segments fill _subStrings from the front
// without a gap and none is empty; _isWord is 1 exactly when there is one segment and both hard
// flags are set. An object that had segments when it was assigned to keeps null entries in front.
// Both pattern copies belong to the object.
//
// Immutable after construction; safe to share. The exception is assignment.

#include <cstddef>
#include <string>
#include <vector>

class WildcardMatcher {
public:
    enum MatchType {
        ERROR_MATCHER = -1,
        POSTFIX_MATCHER = 0,
        PREFIX_MATCHER = 1,
        MIDFIX_MATCHER = 2,
        MULTIFIX_MATCHER = 3,
        SINGLE_WORD_MATCHER = 4
    };

    // The most literal segments that a pattern may have.
    static constexpr int MAX_SUBSTRINGS = 256;

    // Compiles `pattern`, NUL-terminated; null compiles like the empty pattern. The conversion is
    // wanted: a pattern stands for its matcher.
    // Errors: std::length_error for more than MAX_SUBSTRINGS segments; std::bad_alloc.
    WildcardMatcher(const char* pattern);

    // Compiles the other's pattern text afresh; nothing is shared.
    // Errors: std::bad_alloc.
    WildcardMatcher(const WildcardMatcher& other);

    // Takes the other's compiled form; the other becomes a matcher without pattern or segments.
    WildcardMatcher(WildcardMatcher&& other) noexcept;

    // Compiles the other's pattern text on top of what this object holds.
    // Deliberate: this is no reset. The segment table is emptied, but count and flags stay; the new
    // segments follow behind the old count, and the earlier pattern copies stay allocated for the
    // life of the process. An object that had segments therefore matches nothing any more, since
    // an empty entry never matches. Assignment to itself does nothing.
    // Errors: std::length_error when the segments together exceed MAX_SUBSTRINGS, std::bad_alloc;
    // the object is unchanged then.
    WildcardMatcher& operator=(const WildcardMatcher& other);

    ~WildcardMatcher();

    // Tells whether the whole of `haystack`, not null, matches.
    // Deliberate: a hard end is sought from left to right in steps that do not overlap, until one
    // ends the text, so "*aa" does not match "aaa".
    // Cost: no allocation.
    bool isMatch(const char* haystack) const;

    // The same for a text whose length in bytes, up to its NUL, is known.
    bool isMatch(const char* haystack, std::size_t length) const;

    // Fetch into the cache what isMatch reads, for callers that try many matchers in a row:
    // prefetch() the object, and some matchers later prefetchSegment() its first segment.
    void prefetch() const {
        __builtin_prefetch(this);
        __builtin_prefetch(&_subStrings[4]);
        __builtin_prefetch(&_subStringCount);
    }
    void prefetchSegment() const { __builtin_prefetch(_subStrings[0]); }

    // The same test. `substrs` is replaced by the texts that the stars covered, in pattern order;
    // after a failure it holds what was covered up to there.
    // Deliberate: what the last star covers is split at each earlier occurrence of a hard end.
    bool isMatch(const char* haystack, std::vector<std::string>& substrs);

    // Returns: the literal text in front of the first star, the whole pattern if it has no star,
    // "" if it begins with one; never null. Belongs to the matcher.
    const char* getPatternPrefix() const;

    // Prints the compiled form on standard output.
    void debugOpaqueMatcher() const;

    // Returns: the pattern as given; belongs to the matcher.
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
