#include "mine.h"

bool matchesAll(const char* text) {
    return WildcardMatcher("*").isMatch(text);
}
