#include "util/WildcardMatcher.h"

#include <cstdio>
#include <cstring>
#include <list>
#include <memory>
#include <mutex>
#include <stdexcept>

#include "util/Assert.h"
#include "util/DCUtils.h"

namespace {

using CharArray = std::unique_ptr<char[]>;

struct RetiredCopies {
    char* needle;
    char* buffer;
};

// Keeps the pattern copies that an assignment left behind reachable until the process ends.
void retire(std::list<RetiredCopies>& copies) {
    static std::mutex guard;
    static auto& retired = *new std::list<RetiredCopies>;
    const std::lock_guard<std::mutex> lock(guard);
    retired.splice(retired.end(), copies);
}

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

// Returns: the place behind `segment` at the beginning of `text`; null if it does not begin so.
const char* skipPrefix(const char* text, const char* segment) {
    for (; *segment != '\0'; ++segment, ++text) {
        if (*text != *segment) {
            return nullptr;
        }
    }
    return text;
}

// Returns: the place behind the first occurrence of `segment` at or after `cursor`, or null.
const char* skipToSegment(const char* cursor, const char* segment) {
    if (segment[1] == '\0') {
        const char* const found = std::strchr(cursor, segment[0]);
        return found == nullptr ? nullptr : found + 1;
    }
    const char* const found = std::strstr(cursor, segment);
    return found == nullptr ? nullptr : found + std::strlen(segment);
}

// Seeks `segment` from `cursor` on in steps that do not overlap, until one ends at `end`; that one
// stands at the end of the text is known. Only where the segment may overlap itself can the steps
// miss it.
bool stepsReachEnd(const char* cursor, const char* end, const char* segment, std::size_t length) {
    const char* const place = end - length;
    if (cursor >= place || std::strchr(segment + 1, segment[0]) == nullptr) {
        return cursor <= place;
    }
    while (cursor < place) {
        const bool here = std::memcmp(cursor, segment, length) == 0;
        const char* const found = here ? cursor : std::strstr(cursor, segment);
        if (found == place) {
            return true;
        }
        cursor = found + length;
    }
    return cursor == place;
}

const char* printable(const char* segment) {
    return segment == nullptr ? "(null)" : segment;
}

}  // namespace

WildcardMatcher::WildcardMatcher(const char* pattern)
    : _needle(nullptr),
      _buffer(nullptr),
      _hardEnd(false),
      _hardStart(false),
      _subStringCount(0),
      _isWord(0) {
    init(pattern);
}

WildcardMatcher::WildcardMatcher(const WildcardMatcher& other) : WildcardMatcher(other._needle) {}

WildcardMatcher::WildcardMatcher(WildcardMatcher&& other) noexcept
    : _needle(other._needle),
      _buffer(other._buffer),
      _hardEnd(other._hardEnd),
      _hardStart(other._hardStart),
      _subStringCount(other._subStringCount),
      _isWord(other._isWord) {
    const std::size_t used = static_cast<std::size_t>(_subStringCount) * sizeof(char*);
    std::memcpy(_subStrings, other._subStrings, used);
    std::memset(_subStrings + _subStringCount, 0, sizeof(_subStrings) - used);
    other._needle = nullptr;
    other._buffer = nullptr;
    other._hardEnd = false;
    other._hardStart = false;
    std::memset(other._subStrings, 0, used);
    other._subStringCount = 0;
    other._isWord = 0;
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

// Everything that can fail comes first, so that a refusal leaves the object as it was.
void WildcardMatcher::init(const char* pattern) {
    if (pattern != nullptr && _subStringCount + countSegments(pattern) > MAX_SUBSTRINGS) {
        throw std::length_error("WildcardMatcher: too many literal segments in a pattern");
    }
    CharArray needle(copystr(pattern));
    CharArray buffer(copystr(pattern));
    if (_needle != nullptr) {
        std::list<RetiredCopies> copies{{_needle, _buffer}};
        retire(copies);
    }
    _needle = needle.release();
    _buffer = buffer.release();
    std::memset(_subStrings, 0, sizeof(_subStrings));
    if (pattern != nullptr && *pattern != '\0') {
        compile();
    }
}

// Cuts _buffer into segments, behind those that are already counted.
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
    return isMatch(haystack, _hardEnd ? std::strlen(haystack) : 0);
}

// Of the object itself this reads only the front: flags and segments up to the null behind the
// last. An empty first entry means no segments at all, or an object that was assigned to.
bool WildcardMatcher::isMatch(const char* haystack, std::size_t length) const {
    const char* const* segment = _subStrings;
    if (*segment == nullptr) {
        return _subStringCount == 0;
    }
    const char* const* const tableEnd = _subStrings + MAX_SUBSTRINGS;
    const char* const* behind = segment + 1;
    while (behind != tableEnd && *behind != nullptr) {
        ++behind;
    }
    // What the text must end with is looked at first, as it refuses most texts at once.
    std::size_t lastLength = 0;
    if (_hardEnd) {
        lastLength = std::strlen(*--behind);
        if (length < lastLength ||
            std::memcmp(haystack + length - lastLength, *behind, lastLength) != 0) {
            return false;
        }
    }
    const char* cursor = haystack;
    if (_hardStart) {
        if (segment == behind) {
            return length == lastLength;  // a single word
        }
        cursor = skipPrefix(cursor, *segment++);
    }
    for (; cursor != nullptr && segment != behind; ++segment) {
        cursor = skipToSegment(cursor, *segment);
    }
    if (cursor == nullptr || !_hardEnd) {
        return cursor != nullptr;
    }
    return stepsReachEnd(cursor, haystack + length, *behind, lastLength);
}

bool WildcardMatcher::isMatch(const char* haystack, std::vector<std::string>& substrs) {
    QUELTA_ASSERT(haystack != nullptr);
    substrs.clear();
    if (_isWord != 0) {
        return _subStrings[0] != nullptr && std::strcmp(haystack, _subStrings[0]) == 0;
    }
    const char* cursor = haystack;
    int i = 0;
    bool matched = true;
    if (_hardStart) {
        const char* const start = _subStrings[i++];
        const char* const behind = start == nullptr ? nullptr : skipPrefix(cursor, start);
        matched = behind != nullptr;
        cursor = matched ? behind : cursor;
    }
    // Puts the text in front of the next occurrence on record and moves behind it.
    const auto advance = [&](const char* segment) {
        const char* const found = segment == nullptr ? nullptr : std::strstr(cursor, segment);
        if (found == nullptr) {
            return false;
        }
        substrs.emplace_back(cursor, found);
        cursor = found + std::strlen(segment);
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
    do {
        matched = matched && advance(_subStrings[_subStringCount - 1]);
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
