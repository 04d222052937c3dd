#include "Reference.h"

namespace bench {
namespace {

// The last piece is found again and again, each time behind the one before, until it ends the
// text. The search runs even when nothing is left of the text.
bool endsBySearch(std::string_view rest, std::string_view last) {
    do {
        const std::size_t at = rest.find(last);
        if (at == std::string_view::npos) {
            return false;
        }
        rest.remove_prefix(at + last.size());
    } while (!rest.empty());
    return true;
}

}  // namespace

std::vector<std::string_view> splitAtStars(std::string_view pattern) {
    std::vector<std::string_view> pieces;
    for (;;) {
        const std::size_t star = pattern.find('*');
        pieces.push_back(pattern.substr(0, star));
        if (star == std::string_view::npos) {
            return pieces;
        }
        pattern.remove_prefix(star + 1);
    }
}

bool referenceMatch(Meaning meaning, std::string_view pattern, std::string_view text) {
    // The empty pattern counts as stars only.
    if (meaning == Meaning::SUFFIX_SEARCH && pattern.empty()) {
        return true;
    }
    const std::vector<std::string_view> pieces = splitAtStars(pattern);
    if (pieces.size() == 1) {
        return text == pattern;
    }
    if (text.substr(0, pieces.front().size()) != pieces.front()) {
        return false;
    }
    text.remove_prefix(pieces.front().size());
    for (std::size_t i = 1; i + 1 < pieces.size(); ++i) {
        const std::size_t at = text.find(pieces[i]);
        if (at == std::string_view::npos) {
            return false;
        }
        text.remove_prefix(at + pieces[i].size());
    }
    const std::string_view last = pieces.back();
    if (last.empty()) {
        return true;
    }
    return meaning == Meaning::SUFFIX_SEARCH ? endsBySearch(text, last) : text.ends_with(last);
}

}  // namespace bench
