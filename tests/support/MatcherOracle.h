#ifndef QUELTA_TESTS_SUPPORT_MATCHERORACLE_H_
#define QUELTA_TESTS_SUPPORT_MATCHERORACLE_H_

// A slow matcher on strings and positions, written from the rules of matching, to compare with.
// It shares no code and no technique with the real one.

#include <cstddef>
#include <string>
#include <vector>

namespace oracle {

struct Match {
    bool matched;
    std::vector<std::string> parts;
};

// The literal pieces between the stars of a pattern, empty ones left out.
inline std::vector<std::string> pieces(const std::string& pattern) {
    std::vector<std::string> found;
    std::string piece;
    for (const char c : pattern + '*') {
        if (c != '*') {
            piece += c;
        } else if (!piece.empty()) {
            found.push_back(piece);
            piece.clear();
        }
    }
    return found;
}

// The first place at or behind `from` where `piece` stands in `text`, compared byte by byte.
inline std::size_t locate(const std::string& text, const std::string& piece, std::size_t from) {
    for (std::size_t at = from; at + piece.size() <= text.size(); ++at) {
        std::size_t same = 0;
        while (same < piece.size() && text[at + same] == piece[same]) {
            ++same;
        }
        if (same == piece.size()) {
            return at;
        }
    }
    return std::string::npos;
}

inline Match match(const std::string& pattern, const std::string& text) {
    if (!pattern.empty() && pattern.find('*') == std::string::npos) {
        return {pattern == text, {}};
    }
    std::vector<std::string> middle = pieces(pattern);
    const bool anchoredFront = !pattern.empty() && pattern.front() != '*';
    const bool anchoredBack = !pattern.empty() && pattern.back() != '*';
    Match result{false, {}};
    std::size_t at = 0;
    if (anchoredFront) {
        const std::string front = middle.front();
        middle.erase(middle.begin());
        if (text.substr(0, front.size()) != front) {
            if (!anchoredBack) {
                result.parts.push_back(text);
            }
            return result;
        }
        at = front.size();
    }
    std::string back;
    if (anchoredBack) {
        back = middle.back();
        middle.pop_back();
    }
    for (const std::string& piece : middle) {
        const std::size_t found = locate(text, piece, at);
        if (found == std::string::npos) {
            if (!anchoredBack) {
                result.parts.push_back(text.substr(at));
            }
            return result;
        }
        result.parts.push_back(text.substr(at, found - at));
        at = found + piece.size();
    }
    if (!anchoredBack) {
        result.parts.push_back(text.substr(at));
        result.matched = true;
        return result;
    }
    for (;;) {
        const std::size_t found = locate(text, back, at);
        if (found == std::string::npos) {
            return result;
        }
        result.parts.push_back(text.substr(at, found - at));
        at = found + back.size();
        if (at == text.size()) {
            result.matched = true;
            return result;
        }
    }
}

}  // namespace oracle

#endif  // QUELTA_TESTS_SUPPORT_MATCHERORACLE_H_
