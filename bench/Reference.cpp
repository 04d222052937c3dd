#include "Reference.h"

#include "support/MatcherOracle.h"

namespace bench {
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
    if (meaning == Meaning::SUFFIX_SEARCH) {
        return oracle::match(pattern, text).matched;
    }
    // By the rules of this system the empty pattern matches every text; usually it matches only the
    // empty text.
    return pattern.empty() ? text.empty()
                           : oracle::match(pattern, text, oracle::LastSegment::AT_THE_END).matched;
}

}  // namespace bench
