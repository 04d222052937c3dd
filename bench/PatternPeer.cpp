#include "PatternPeer.h"

#include <cctype>

namespace bench {

std::string toRegex(const std::string& pattern, const std::string& star) {
    std::string out;
    bool afterStar = false;
    for (const char c : pattern) {
        if (c == '*') {
            out += afterStar ? "" : star;
        } else {
            if (std::isalnum(static_cast<unsigned char>(c)) == 0) {
                out += '\\';
            }
            out += c;
        }
        afterStar = c == '*';
    }
    return out;
}

}  // namespace bench
