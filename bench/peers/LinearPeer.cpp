// A linear walk with the matching rules of this system over compact storage: all patterns are
// stored in order in one array of bytes, and each lookup reads the whole array. This is the fastest
// that a walk over all patterns can be.

#include <algorithm>
#include <cstring>
#include <set>

#include "PatternPeer.h"

namespace {

enum Flag : unsigned { HARD_START = 1, HARD_END = 2, WORD = 4 };

// A pattern in the array: flags, number of segments, then each segment as length and bytes.
class LinearSet : public bench::PatternSetPeer {
public:
    std::string build(const std::vector<std::string>& patterns) override {
        _patterns = &patterns;
        for (const std::string& pattern : patterns) {
            if (!append(pattern)) {
                return "a segment or a pattern is too long for one byte of length";
            }
        }
        _bytes.shrink_to_fit();
        return "";
    }

    long count(const std::string& term) override {
        long matches = 0;
        walk(term, [&](std::size_t) { ++matches; });
        return matches;
    }

    long collect(const std::string& term) override {
        // Two ordered sets, like those of the network for the set conditions and the implications.
        std::set<std::string> names;
        std::set<std::string> implications;
        walk(term, [&](std::size_t index) {
            const std::string& name = (*_patterns)[index];
            names.insert(name);
            implications.insert(name + '\n');
        });
        return static_cast<long>(implications.size());
    }

private:
    bool append(const std::string& pattern) {
        std::vector<std::string_view> pieces = bench::splitAtStars(pattern);
        unsigned flags = 0;
        if (!pattern.empty()) {
            flags |= pieces.front().empty() ? 0U : HARD_START;
            flags |= pieces.back().empty() ? 0U : HARD_END;
            flags |= pieces.size() == 1 ? WORD : 0U;
        }
        std::erase_if(pieces, [](std::string_view piece) { return piece.empty(); });
        if (pieces.size() > 255 || pattern.size() > 255) {
            return false;
        }
        _bytes.push_back(static_cast<unsigned char>(flags));
        _bytes.push_back(static_cast<unsigned char>(pieces.size()));
        for (const std::string_view piece : pieces) {
            _bytes.push_back(static_cast<unsigned char>(piece.size()));
            _bytes.insert(_bytes.end(), piece.begin(), piece.end());
        }
        return true;
    }

    template <class Visit>
    void walk(const std::string& term, const Visit& visit) const {
        const char* const begin = term.data();
        const char* const end = begin + term.size();
        const unsigned char* at = _bytes.data();
        const unsigned char* const stop = at + _bytes.size();
        for (std::size_t index = 0; at < stop; ++index) {
            if (matches(at, begin, end)) {
                visit(index);
            }
        }
    }

    // Matches the pattern at `at` and moves `at` past it.
    static bool matches(const unsigned char*& at, const char* text, const char* end) {
        const unsigned flags = at[0];
        unsigned segments = at[1];
        at += 2;
        if ((flags & WORD) != 0) {
            const bool same = *at == end - text && std::memcmp(at + 1, text, *at) == 0;
            at += 1 + *at;
            return same;
        }
        if ((flags & HARD_START) != 0) {
            if (!startsWith(text, end, at)) {
                skip(at, segments);
                return false;
            }
            text += *at;
            skip(at, 1);
            --segments;
        }
        for (; segments > ((flags & HARD_END) != 0 ? 1U : 0U); --segments) {
            text = find(text, end, at);
            if (text == nullptr) {
                skip(at, segments);
                return false;
            }
            skip(at, 1);
        }
        if (segments == 0) {
            return true;
        }
        const unsigned char* const last = at;
        skip(at, 1);
        return endsWith(text, end, last);
    }

    static void skip(const unsigned char*& at, unsigned segments) {
        for (; segments > 0; --segments) {
            at += 1 + *at;
        }
    }

    static bool startsWith(const char* text, const char* end, const unsigned char* segment) {
        return end - text >= *segment && *text == static_cast<char>(segment[1]) &&
               std::memcmp(text, segment + 1, *segment) == 0;
    }

    // Returns: just past the first occurrence, or null.
    static const char* find(const char* text, const char* end, const unsigned char* segment) {
        const std::size_t length = *segment;
        for (;;) {
            if (static_cast<std::size_t>(end - text) < length) {
                return nullptr;
            }
            const std::size_t room = static_cast<std::size_t>(end - text) - length + 1;
            const void* hit = std::memchr(text, segment[1], room);
            if (hit == nullptr) {
                return nullptr;
            }
            text = static_cast<const char*>(hit);
            if (std::memcmp(text, segment + 1, length) == 0) {
                return text + length;
            }
            ++text;
        }
    }

    static bool endsWith(const char* text, const char* end, const unsigned char* segment) {
        const long length = *segment;
        if (end - text < length || std::memcmp(end - length, segment + 1, *segment) != 0) {
            return false;
        }
        do {
            text = find(text, end, segment);
        } while (text != nullptr && text != end);
        return text == end;
    }

    std::vector<unsigned char> _bytes;
    const std::vector<std::string>* _patterns = nullptr;
};

const bench::Registrar<bench::PatternSetPeer, LinearSet> setPeer("linear compact walk",
                                                                 bench::Meaning::SUFFIX_SEARCH);

}  // namespace
