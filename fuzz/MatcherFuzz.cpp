// The wildcard matcher against its oracle: the first line is the pattern, the rest the text.

#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "Check.h"
#include "FuzzInput.h"
#include "FuzzTarget.h"
#include "support/MatcherOracle.h"
#include "util/WildcardMatcher.h"

namespace {

using fuzz::checkEqual;

bool refused(const std::string& pattern) {
    try {
        const WildcardMatcher matcher(pattern.c_str());
        return false;
    } catch (const std::length_error&) {
        return true;
    }
}

void checkMatch(WildcardMatcher& matcher, const oracle::Match& expected, const std::string& text) {
    std::vector<std::string> parts = {"left over"};
    checkEqual("isMatch", expected.matched, std::as_const(matcher).isMatch(text.c_str()));
    checkEqual("isMatch with a length", expected.matched,
               matcher.isMatch(text.c_str(), text.size()));
    checkEqual("isMatch with capture", expected.matched, matcher.isMatch(text.c_str(), parts));
    checkEqual("captured parts", expected.parts, parts);
}

void checkCompiledForm(const WildcardMatcher& matcher, const std::string& pattern) {
    checkEqual("getOrigPattern", pattern, std::string(matcher.getOrigPattern()));
    const std::size_t star = pattern.find('*');
    checkEqual("getPatternPrefix", pattern.substr(0, star), matcher.getPatternPrefix());
    WildcardMatcher::MatchType kind = WildcardMatcher::MULTIFIX_MATCHER;
    if (oracle::pieces(pattern).empty()) {
        kind = WildcardMatcher::ERROR_MATCHER;
    } else if (star == std::string::npos) {
        kind = WildcardMatcher::SINGLE_WORD_MATCHER;
    }
    checkEqual("getMatcherType", static_cast<int>(kind),
               static_cast<int>(matcher.getMatcherType()));
}

}  // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::FuzzInput input(data, size);
    const std::string pattern = input.lineOfText();
    const std::string text = input.restOfText();

    const bool tooMany = oracle::pieces(pattern).size() > WildcardMatcher::MAX_SUBSTRINGS;
    checkEqual("refusal of the pattern", tooMany, refused(pattern));
    if (tooMany) {
        return 0;
    }
    const oracle::Match expected = oracle::match(pattern, text);
    WildcardMatcher matcher(pattern.c_str());
    checkMatch(matcher, expected, text);
    checkCompiledForm(matcher, pattern);

    WildcardMatcher copy(matcher);
    checkMatch(copy, expected, text);
    WildcardMatcher moved(std::move(copy));
    checkMatch(moved, expected, text);
    copy = matcher;  // assigns to a moved-from matcher
    checkMatch(copy, expected, text);
    checkCompiledForm(copy, pattern);
    return 0;
}
