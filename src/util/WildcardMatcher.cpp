#include "util/WildcardMatcher.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <stdexcept>
#include <utility>

#include "util/Assert.h"
#include "util/DCUtils.h"

namespace {

// Returns: the number of literal segments, the runs between stars that are not empty.
int countSegments(const char* pattern) {
    int count = 0;
    bool atStart = true;
    for (; *pattern != '\0'; ++pattern) {
        const bool star = *pattern == '*';
        if (!star && atStart) {
            ++count;
        }
        atStart = star;
    }
    return count;
}

// Returns: `text` past its prefix `segment`, or null if it does not start with it.
const char* skipPrefix(const char* text, const char* segment) {
    const std::size_t length = std::strlen(segment);
    return std::strncmp(text, segment, length) == 0 ? text + length : nullptr;
}

// Returns: the text after the first occurrence of `segment` at or after `cursor`, or null.
const char* skipToSegment(const char* cursor, const char* segment) {
    if (segment[1] == '\0') {  // strchr is several times faster than strstr
        const char* const found = std::strchr(cursor, segment[0]);
        return found == nullptr ? nullptr : found + 1;
    }
    const char* const found = std::strstr(cursor, segment);
    return found == nullptr ? nullptr : found + std::strlen(segment);
}

// Searches for `segment` from `cursor` in non-overlapping steps, until an occurrence ends at `end`.
// The caller knows that the text ends with `segment`. The steps can miss that occurrence only if
// the segment can overlap itself; for any other segment it is enough that `cursor` is before it.
bool stepsReachEnd(const char* cursor, const char* end, const char* segment, std::size_t length) {
    if (std::strchr(segment + 1, segment[0]) == nullptr) {
        return cursor <= end - length;
    }
    do {
        cursor = skipToSegment(cursor, segment);
    } while (cursor != nullptr && cursor != end);
    return cursor != nullptr;
}

const char* printable(const char* segment) {
    return segment == nullptr ? "(null)" : segment;
}

}  // namespace

// Delegates, so that the destructor frees the first copy if the second cannot be allocated.
WildcardMatcher::WildcardMatcher(const char* pattern) : WildcardMatcher() {
    init(pattern);
}

WildcardMatcher::WildcardMatcher(const WildcardMatcher& other) : WildcardMatcher(other._needle) {}

WildcardMatcher::WildcardMatcher(WildcardMatcher&& other) noexcept
    : _needle(std::exchange(other._needle, nullptr)),
      _buffer(std::exchange(other._buffer, nullptr)),
      _hardEnd(std::exchange(other._hardEnd, false)),
      _hardStart(std::exchange(other._hardStart, false)),
      _subStringCount(std::exchange(other._subStringCount, 0)),
      _isWord(std::exchange(other._isWord, 0)) {
    std::copy(std::begin(other._subStrings), std::end(other._subStrings), _subStrings);
}

WildcardMatcher& WildcardMatcher::operator=(const WildcardMatcher& other) {
    if (this != &other) {
        init(other._needle);
    }
    return *this;
}

WildcardMatcher::~WildcardMatcher() {
    delete[] _buffer;
    delete[] _needle;
}

// Compiles `pattern` after the segments that are already counted.
// Deliberate: the copies of an earlier pattern are not freed.
void WildcardMatcher::init(const char* pattern) {
    if (pattern != nullptr && _subStringCount + countSegments(pattern) > MAX_SUBSTRINGS) {
        throw std::length_error("WildcardMatcher: too many literal segments in a pattern");
    }
    _needle = copystr(pattern);
    _buffer = copystr(pattern);
    std::fill(std::begin(_subStrings), std::end(_subStrings), nullptr);
    if (pattern != nullptr && *pattern != '\0') {
        compile();
    }
}

// Cuts _buffer into segments, after those already counted. Each star is overwritten by a NUL, so
// that every segment becomes a string.
void WildcardMatcher::compile() {
    bool atSegmentStart = true;
    for (char* p = _buffer; *p != '\0'; ++p) {
        if (*p == '*') {
            *p = '\0';
            atSegmentStart = true;
        } else if (atSegmentStart) {
            _hardStart = _hardStart || p == _buffer;
            _subStrings[_subStringCount++] = p;
            atSegmentStart = false;
        }
    }
    if (!atSegmentStart) {
        _hardEnd = true;
        if (_subStringCount == 1 && _hardStart) {
            _isWord = 1;
        }
    }
}

bool WildcardMatcher::isMatch(const char* haystack) const {
    QUELTA_ASSERT(haystack != nullptr);
    return matches(haystack, _hardEnd ? haystack + std::strlen(haystack) : nullptr);
}

bool WildcardMatcher::isMatch(const char* haystack, std::size_t length) const {
    return matches(haystack, haystack + length);
}

// `end` is the NUL of `text`; it is used only if there is a hard end.
bool WildcardMatcher::matches(const char* text, const char* end) const {
    // An object that had segments when it was assigned to has null entries, which never match.
    if (_subStringCount > 0 && _subStrings[0] == nullptr) {
        return false;
    }
    // Test the suffix first: it rejects most texts.
    const int last = _hardEnd ? _subStringCount - 1 : _subStringCount;
    std::size_t lastLength = 0;
    if (_hardEnd) {
        lastLength = std::strlen(_subStrings[last]);
        if (static_cast<std::size_t>(end - text) < lastLength ||
            std::memcmp(end - lastLength, _subStrings[last], lastLength) != 0) {
            return false;
        }
    }
    if (_isWord != 0) {
        return text + lastLength == end;
    }
    // A hard start must begin the text. Each other segment, except a hard end, is taken at its
    // first occurrence after the one before.
    const char* cursor = text;
    int i = 0;
    if (_hardStart) {
        cursor = skipPrefix(cursor, _subStrings[i++]);
    }
    for (; cursor != nullptr && i < last; ++i) {
        cursor = skipToSegment(cursor, _subStrings[i]);
    }
    if (cursor == nullptr || !_hardEnd) {
        return cursor != nullptr;
    }
    return stepsReachEnd(cursor, end, _subStrings[last], lastLength);
}

// The same steps as matches(), from left to right only, because the text before each occurrence is
// recorded on the way.
bool WildcardMatcher::isMatch(const char* haystack, std::vector<std::string>& substrs) {
    QUELTA_ASSERT(haystack != nullptr);
    substrs.clear();
    if (_isWord != 0) {
        return isMatch(haystack);
    }
    // `cursor` is the end of what has matched so far, `i` the next segment.
    const char* cursor = haystack;
    int i = 0;
    bool matched = true;
    if (_hardStart) {
        const char* const start = _subStrings[i++];
        const char* const rest = start == nullptr ? nullptr : skipPrefix(cursor, start);
        matched = rest != nullptr;
        cursor = matched ? rest : cursor;
    }
    // Appends the text before the next occurrence of `segment` and moves past the occurrence.
    const auto advance = [&](const char* segment) {
        const char* const rest = segment == nullptr ? nullptr : skipToSegment(cursor, segment);
        if (rest == nullptr) {
            return false;
        }
        substrs.emplace_back(cursor, rest - std::strlen(segment));
        cursor = rest;
        return true;
    };
    const int limit = _subStringCount - (_hardEnd ? 1 : 0);
    while (matched && i < limit) {
        matched = advance(_subStrings[i++]);
    }
    if (!_hardEnd) {
        substrs.emplace_back(cursor);
        return matched;
    }
    // The last segment must end the text. Each earlier occurrence splits what the last star covers.
    do {
        matched = matched && advance(_subStrings[limit]);
    } while (matched && *cursor != '\0');
    return matched;
}

const char* WildcardMatcher::getPatternPrefix() const {
    return _hardStart && _subStrings[0] != nullptr ? _subStrings[0] : "";
}

// Deliberate: the kinds that ask for a count of zero together with a hard flag never arise from a
// compiled pattern; every pattern with a letter and a star is a MULTIFIX_MATCHER.
WildcardMatcher::MatchType WildcardMatcher::getMatcherType() const {
    if (_isWord != 0) {
        return SINGLE_WORD_MATCHER;
    }
    if (!_hardEnd && _hardStart && _subStringCount == 0) {
        return PREFIX_MATCHER;
    }
    if (_hardEnd && _hardStart && _subStringCount == 0) {
        return MIDFIX_MATCHER;
    }
    if (_hardEnd && !_hardStart && _subStringCount == 0) {
        return POSTFIX_MATCHER;
    }
    return _subStringCount > 0 ? MULTIFIX_MATCHER : ERROR_MATCHER;
}

char* WildcardMatcher::getHardStart() const {
    return _hardStart ? _subStrings[0] : nullptr;
}

char* WildcardMatcher::getHardEnd() const {
    return _hardEnd ? _subStrings[_subStringCount - 1] : nullptr;
}

char* WildcardMatcher::getWord() const {
    return _isWord != 0 ? _subStrings[0] : nullptr;
}

void WildcardMatcher::debugOpaqueMatcher() const {
    if (_isWord != 0) {
        std::printf("Single word = %s\n", printable(_subStrings[0]));
        return;
    }
    if (_hardStart) {
        std::printf("hard start = %s\n", printable(_subStrings[0]));
    }
    for (int i = _hardStart ? 1 : 0; i < _subStringCount - (_hardEnd ? 1 : 0); ++i) {
        std::printf("substring %d = %s\n", i, printable(_subStrings[i]));
    }
    if (_hardEnd) {
        std::printf("hard end = %s\n", printable(_subStrings[_subStringCount - 1]));
    }
}
