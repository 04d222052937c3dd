#include "util/Pathname.h"

// Words of a shell command line: quotes a path as one, and splits one off a line.

#include <algorithm>
#include <string_view>

#include "util/Assert.h"

namespace {

constexpr std::string_view WHITESPACE = "\t\n ";
constexpr std::string_view ALWAYS_SPECIAL = "\"$\\";
constexpr std::string_view SPECIAL = "#&*;=?[]|";

bool isIn(char c, std::string_view characters) {
    return characters.find(c) != characters.npos;
}

bool containsAny(std::string_view text, std::string_view characters) {
    return text.find_first_of(characters) != text.npos;
}

// Reads one word starting at `pos`, and leaves `pos` at the blank after it or at the end.
// Returns: false if a quote or a backslash is not completed; `word` then holds what came before.
bool readWord(std::string_view input, std::size_t& pos, std::string& word) {
    enum State { BASE, IN_DOUBLE_QUOTE, IN_SINGLE_QUOTE };
    State state = BASE;
    bool saw_backslash = false;
    for (; pos < input.size(); ++pos) {
        const char c = input[pos];
        if (saw_backslash) {
            word += c;
            saw_backslash = false;
        } else if (state == BASE && isIn(c, WHITESPACE)) {
            break;
        } else if (c == '\\' && state != IN_SINGLE_QUOTE) {
            saw_backslash = true;
        } else if (c == '"' && state != IN_SINGLE_QUOTE) {
            state = state == BASE ? IN_DOUBLE_QUOTE : BASE;
        } else if (c == '\'' && state != IN_DOUBLE_QUOTE) {
            state = state == BASE ? IN_SINGLE_QUOTE : BASE;
        } else {
            word += c;
        }
    }
    if (state != BASE || saw_backslash) {
        return false;
    }
    QUELTA_ASSERT(state == BASE);
    return true;
}

}  // namespace

std::string Pathname::shellQuoted() const {
    if (empty()) {
        return "\"\"";
    }
    const bool has_whitespace = containsAny(*this, WHITESPACE);
    const bool has_alwaysspecial = containsAny(*this, ALWAYS_SPECIAL);
    const bool has_special = containsAny(*this, SPECIAL);
    const bool has_singlequote = find('\'') != npos;
    if (!has_whitespace && !has_alwaysspecial && !has_special && !has_singlequote) {
        return *this;
    }
    if (!has_singlequote && has_alwaysspecial) {
        return '\'' + *this + '\'';
    }
    std::string result;
    if (has_whitespace) {
        result += '"';
    }
    for (const char c : *this) {
        // Within double quotes only some characters need the backslash.
        if (isIn(c, ALWAYS_SPECIAL) || (!has_whitespace && (c == '\'' || isIn(c, SPECIAL)))) {
            result += '\\';
        }
        result += c;
    }
    if (has_whitespace) {
        result += '"';
    }
    return result;
}

bool Pathname::splitArgShellQuoted(const std::string& input, Pathname& firstArg,
                                   std::string& rest) {
    Pathname word;
    std::size_t pos = std::min(input.find_first_not_of(WHITESPACE), input.size());
    const bool complete = readWord(input, pos, word);
    std::string remainder = input.substr(pos);
    const bool found = complete && !word.empty();
    // At the end, because either may be the same object as the input.
    firstArg = std::move(word);
    if (found) {
        rest = std::move(remainder);
    }
    return found;
}
