#ifndef QUELTA_TESTS_SUPPORT_PATHORACLES_H_
#define QUELTA_TESTS_SUPPORT_PATHORACLES_H_

// Slow versions of the path operations for comparison, written step by step from their rules
// without the library.

#include <cstddef>
#include <string>
#include <vector>

namespace path_oracle {

// The pieces between separators, empty ones included: "a//b" is "a", "", "b".
inline std::vector<std::string> pieces(const std::string& path) {
    std::vector<std::string> result(1);
    for (const char c : path) {
        if (c == '/') {
            result.emplace_back();
        } else {
            result.back() += c;
        }
    }
    return result;
}

inline std::string joinPieces(const std::vector<std::string>& parts) {
    std::string result = parts.at(0);
    for (std::size_t i = 1; i < parts.size(); ++i) {
        result += '/' + parts[i];
    }
    return result;
}

inline std::string withoutTrailingSeps(const std::string& path) {
    if (path.size() > 1 && path[path.size() - 1] == '/') {
        return withoutTrailingSeps(path.substr(0, path.size() - 1));
    }
    return path;
}

inline bool onlySeps(const std::string& path) {
    return !path.empty() && path == std::string(path.size(), '/');
}

inline std::string join(const std::string& path, const std::string& elem) {
    if (elem.empty()) {
        return path;
    }
    std::string rest = elem;
    while (rest.substr(0, 1) == "/") {
        rest = rest.substr(1);
    }
    const bool hasSep = !path.empty() && path.substr(path.size() - 1) == "/";
    return path + (hasSep ? "" : "/") + rest;
}

inline std::string stripElement(const std::string& path) {
    if (path.empty()) {
        return "";
    }
    if (onlySeps(path)) {
        return "/";
    }
    std::vector<std::string> parts = pieces(withoutTrailingSeps(path));
    parts.pop_back();
    if (parts.empty()) {
        return "";
    }
    const std::string before = joinPieces(parts);
    return before.empty() || onlySeps(before) ? "/" : withoutTrailingSeps(before);
}

inline std::string toLeaf(const std::string& path) {
    std::string leaf;
    for (const std::string& piece : pieces(path)) {
        if (!piece.empty()) {
            leaf = piece;
        }
    }
    return leaf.empty() ? "/" : leaf;
}

inline std::string ext(const std::string& path) {
    const std::string last = pieces(path).back();
    std::string result;
    bool sawDot = false;
    for (const char c : last) {
        if (c == '.') {
            sawDot = true;
            result.clear();
        } else {
            result += c;
        }
    }
    return sawDot ? result : "";
}

inline std::string basenameWithoutExt(const std::string& path) {
    const std::string last = pieces(path).back();
    for (std::size_t i = last.size(); i-- > 0;) {
        if (last[i] == '.') {
            return i == 0 ? last : last.substr(0, i);
        }
    }
    return last;
}

// The state machine as a table, restarted after every deletion.
inline std::string removeDotDotSlash(std::string path) {
    enum { GROUND, START, GOT_ONE_DOT, GOT_TWO_DOTS };
    const int onDot[] = {GROUND, GOT_ONE_DOT, GOT_TWO_DOTS, GROUND};
    for (bool found = true; found;) {
        found = false;
        int state = START;
        const std::size_t n = path.size();
        for (std::size_t i = 0; i < n && !found; ++i) {
            if (path[i] == '/' && state == GOT_TWO_DOTS) {
                path = path.substr(0, i - 2) + path.substr(i + 1);
                found = true;
            } else {
                state = path[i] == '.' ? onDot[state] : path[i] == '/' ? START : GROUND;
            }
        }
        if (!found && state == GOT_TWO_DOTS) {
            path = path.substr(0, n == 2 || n == 3 ? n - 2 : n - 3);
            found = true;
        }
    }
    return path;
}

inline std::string removeDoubleSeps(std::string path) {
    for (std::size_t pair = path.find("//"); pair != std::string::npos; pair = path.find("//")) {
        path.erase(pair, 1);
    }
    return path;
}

// Removes the first shell word, one character at a time, with a branch for each state.
inline bool splitArg(const std::string& input, std::string& word, std::string& rest) {
    word.clear();
    std::string line = input;
    while (!line.empty() && (line[0] == ' ' || line[0] == '\t' || line[0] == '\n')) {
        line.erase(0, 1);
    }
    char quote = 0;
    bool saw_backslash = false;
    while (!line.empty()) {
        const char c = line[0];
        if (saw_backslash) {
            word += c;
            saw_backslash = false;
        } else if (quote == 0) {
            if (c == ' ' || c == '\t' || c == '\n') {
                break;
            }
            if (c == '\'' || c == '"') {
                quote = c;
            } else if (c == '\\') {
                saw_backslash = true;
            } else {
                word += c;
            }
        } else if (c == quote) {
            quote = 0;
        } else if (c == '\\' && quote == '"') {
            saw_backslash = true;
        } else {
            word += c;
        }
        line.erase(0, 1);
    }
    if (quote != 0 || saw_backslash || word.empty()) {
        return false;
    }
    rest = line;
    return true;
}

// Quotes by trying each way in turn on the whole path.
inline std::string shellQuoted(const std::string& path) {
    const auto has = [&path](const std::string& characters) {
        return path.find_first_of(characters) != std::string::npos;
    };
    const std::string always = "\"$\\";
    const std::string special = "#&*;=?[]|";
    if (path.empty() || !(has("\t\n '") || has(always) || has(special))) {
        return path.empty() ? "\"\"" : path;
    }
    if (!has("'") && has(always)) {
        return '\'' + path + '\'';
    }
    const std::string escaped = has("\t\n ") ? always : always + special + '\'';
    std::string result;
    for (const char c : path) {
        result += escaped.find(c) == std::string::npos ? "" : "\\";
        result += c;
    }
    return has("\t\n ") ? '"' + result + '"' : result;
}

}  // namespace path_oracle

#endif  // QUELTA_TESTS_SUPPORT_PATHORACLES_H_
