#include "support/SlowLayout.h"

#include <algorithm>
#include <cstddef>
#include <cstdio>
#include <optional>
#include <stdexcept>
#include <vector>

namespace {

// Removes and returns the leading characters that are in `letters`, at most `limit` of them.
std::string take(std::string& rest, const char* letters, std::size_t limit = std::string::npos) {
    const std::size_t run = std::min(rest.find_first_not_of(letters), rest.size());
    const std::string taken = rest.substr(0, std::min(run, limit));
    rest.erase(0, taken.size());
    return taken;
}

// Whether a piece consists of "%p" only, with any flags.
bool isAmPm(std::string piece) {
    while (!piece.empty()) {
        const bool conversion = !take(piece, "%", 1).empty();
        take(piece, "-_^#", 1);
        take(piece, "0123456789");
        take(piece, "EO", 1);
        if (!conversion || take(piece, "p", 1).empty()) {
            return false;
        }
    }
    return true;
}

// The formats are built at run time, so the compiler cannot check them.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
// strftime with enough room. The sentinel before the text distinguishes an empty text from one that
// does not fit.
std::string strftimeOf(const std::string& piece, const struct tm& local) {
    std::vector<char> buf(65536);
    const std::size_t len = std::strftime(buf.data(), buf.size(), ("x" + piece).c_str(), &local);
    if (len == 0) {
        throw std::length_error("date too long for the slow renderer");
    }
    const std::string text(buf.data() + 1, len - 1);
    // The real renderer does not repeat a "%p" that does not fit its first buffer.
    return text.size() >= 64 && isAmPm(piece) ? "" : text;
}
#pragma GCC diagnostic pop

std::string dateOf(const std::optional<std::string>& arg, const SlowLine& line) {
    std::string pattern = arg.value_or("");
    if (pattern == "DATE") {
        pattern = "%d %b %Y %H:%M:%S,%l";
    } else if (pattern == "ABSOLUTE") {
        pattern = "%H:%M:%S,%l";
    } else if (pattern == "ISO8601" || pattern.empty()) {
        pattern = "%Y-%m-%d %H:%M:%S,%l";
    }
    char msec[8];
    std::snprintf(msec, sizeof(msec), "%03u", line.usec / 1000 % 1000);
    std::string date;
    for (std::size_t cut; (cut = pattern.find("%l")) != std::string::npos;) {
        date += strftimeOf(pattern.substr(0, cut), line.local) + msec;
        pattern.erase(0, cut + 2);
    }
    return date + strftimeOf(pattern, line.local);
}

std::optional<std::string> textOf(char conversion, const std::optional<std::string>& arg,
                                  const SlowLine& line) {
    switch (conversion) {
        case 'm':
            return line.message;
        case 'n':
            return "\n";
        case 'c':
            return line.category;
        case 'p':
            return line.level;
        case 't':
            return line.thread;
        case 'r':
            return line.epochMsec;
        case 'R':
            return line.epochSec;
        case 'u':
            return line.clock;
        case 'd':
            return dateOf(arg, line);
        default:
            return std::nullopt;
    }
}

struct Widths {
    std::string flag;
    std::string least;
    std::string most;
};

Widths takeWidths(std::string& rest) {
    Widths widths;
    widths.flag = take(rest, "-0", 1);
    widths.least = take(rest, "0123456789");
    if (!take(rest, ".", 1).empty()) {
        widths.most = take(rest, "0123456789");
    }
    return widths;
}

// The inputs have only small widths and widths that do not fit in 32 bits. So a number of more than
// nine digits does not fit and is ignored.
std::size_t widthOf(const std::string& digits, std::size_t none) {
    return digits.empty() || digits.size() > 9 ? none : std::stoul(digits);
}

std::string fitted(const std::string& text, const Widths& widths) {
    const std::size_t minw = widthOf(widths.least, 0);
    const std::size_t maxw = widthOf(widths.most, std::string::npos);
    if (text.size() > maxw) {
        return text.substr(0, maxw);
    }
    if (text.size() >= minw) {
        return text;
    }
    const std::string padding(minw - text.size(), widths.flag == "0" ? '0' : ' ');
    return widths.flag == "-" ? text + padding : padding + text;
}

}  // namespace

std::string renderSlowly(const std::string& pattern, const SlowLine& line) {
    std::string out;
    std::string rest = pattern;
    while (!rest.empty()) {
        if (rest[0] != '%' || rest.compare(0, 2, "%%") == 0) {
            out += rest[0];
            rest.erase(0, rest[0] == '%' ? 2 : 1);
            continue;
        }
        rest.erase(0, 1);
        const Widths widths = takeWidths(rest);
        if (rest.empty()) {
            break;
        }
        const char letter = rest[0];
        rest.erase(0, 1);
        std::optional<std::string> arg;
        if (!rest.empty() && rest[0] == '{') {
            const std::size_t close = rest.find('}');
            if (close == std::string::npos) {
                break;
            }
            arg = rest.substr(1, close - 1);
            rest.erase(0, close + 1);
        }
        if (const auto text = textOf(letter, arg, line)) {
            out += fitted(*text, widths);
        }
    }
    return out;
}
