#ifndef QUELTA_TESTS_SUPPORT_MATCHERORACLE_H_
#define QUELTA_TESTS_SUPPORT_MATCHERORACLE_H_

// A slow matcher, written from the rules of matching, for comparison in tests, fuzz targets and
// benchmarks. It shares neither code nor algorithm with the real one.

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace oracle {

struct Match {
    bool matched;
    std::vector<std::string> parts;
};

// How to place a last segment that no star follows. By the rule of this system it is searched from
// left to right without overlap, so "*aa" does not match "aaa". By the usual meaning of a star it
// must be at the end of the text, so "*aa" matches "aaa".
enum class LastSegment { SEARCHED, AT_THE_END };

// The literal segments between the stars of a pattern, without the empty ones.
inline std::vector<std::string_view> pieces(std::string_view pattern) {
    std::vector<std::string_view> found;
    std::size_t start = 0;
    for (std::size_t at = 0; at <= pattern.size(); ++at) {
        if (at == pattern.size() || pattern[at] == '*') {
            if (at != start) {
                found.push_back(pattern.substr(start, at - start));
            }
            start = at + 1;
        }
    }
    return found;
}

// The first place at or after `from` where `piece` occurs in `text`, compared byte by byte.
inline std::size_t locate(std::string_view text, std::string_view piece, std::size_t from) {
    for (std::size_t at = from; at + piece.size() <= text.size(); ++at) {
        std::size_t same = 0;
        while (same < piece.size() && text[at + same] == piece[same]) {
            ++same;
        }
        if (same == piece.size()) {
            return at;
        }
    }
    return std::string_view::npos;
}

inline Match match(std::string_view pattern, std::string_view text,
                   LastSegment last = LastSegment::SEARCHED) {
    if (!pattern.empty() && pattern.find('*') == std::string_view::npos) {
        return {pattern == text, {}};
    }
    std::vector<std::string_view> middle = pieces(pattern);
    const bool anchoredFront = !pattern.empty() && pattern.front() != '*';
    const bool anchoredBack = !pattern.empty() && pattern.back() != '*';
    Match result{false, {}};
    std::size_t at = 0;
    const auto capture = [&](std::size_t end) {
        result.parts.emplace_back(text.substr(at, end - at));
    };
    const auto captureRest = [&](bool matched) {
        if (!anchoredBack) {
            capture(text.size());
        }
        result.matched = matched;
        return result;
    };
    if (anchoredFront) {
        const std::string_view front = middle.front();
        middle.erase(middle.begin());
        if (text.substr(0, front.size()) != front) {
            return captureRest(false);
        }
        at = front.size();
    }
    std::string_view back;
    if (anchoredBack) {
        back = middle.back();
        middle.pop_back();
    }
    for (const std::string_view piece : middle) {
        const std::size_t found = locate(text, piece, at);
        if (found == std::string_view::npos) {
            return captureRest(false);
        }
        capture(found);
        at = found + piece.size();
    }
    if (!anchoredBack) {
        return captureRest(true);
    }
    if (last == LastSegment::AT_THE_END) {
        result.matched = text.substr(at).ends_with(back);
        return result;
    }
    do {
        const std::size_t found = locate(text, back, at);
        if (found == std::string_view::npos) {
            return result;
        }
        capture(found);
        at = found + back.size();
    } while (at != text.size());
    result.matched = true;
    return result;
}

}  // namespace oracle

#endif  // QUELTA_TESTS_SUPPORT_MATCHERORACLE_H_
