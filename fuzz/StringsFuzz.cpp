// The string helpers against slow versions. Lines: the text to find, its replacement; the rest is
// the text to search.

#include <algorithm>
#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include "Check.h"
#include "FuzzInput.h"
#include "FuzzTarget.h"
#include "util/DCUtils.h"

namespace {

using fuzz::checkEqual;

std::string taken(char* text) {
    const std::unique_ptr<char[]> owned(text);
    return std::string(owned.get());
}

std::string lowerSlowly(const std::string& text) {
    std::string lower;
    for (const char c : text) {
        lower += c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
    }
    return lower;
}

// Replaces by walking over `searched`, which has the same offsets as `text`.
std::string replaceSlowly(const std::string& text, const std::string& searched,
                          const std::string& find, const std::string& replace) {
    std::string result;
    for (std::size_t at = 0; at < text.size();) {
        if (!find.empty() && searched.substr(at, find.size()) == find) {
            result += replace;
            at += find.size();
        } else {
            result += text[at++];
        }
    }
    return result;
}

std::string stripSlowly(std::string text) {
    const std::string white = " \t\n\v\f\r";
    while (!text.empty() && white.find(text.front()) != std::string::npos) {
        text.erase(0, 1);
    }
    while (!text.empty() && white.find(text.back()) != std::string::npos) {
        text.pop_back();
    }
    return text;
}

std::string punctSlowly(const std::string& text, unsigned maxLen) {
    std::vector<std::string> items;
    for (const char c : text.substr(0, text.find_first_of(std::string("\0\n", 2)))) {
        if (c == '\t') {
            items.push_back("t");
        } else if (c == '\r') {
            items.push_back("\\r");
        } else if (c == '\\' || c == '"') {
            items.push_back(std::string("\\") + c);
        } else if (std::string(" ,;-#$%&+./:=?@'|*(){}<>[]^!").find(c) != std::string::npos) {
            items.push_back(c == ' ' ? "_" : std::string(1, c));
        }
    }
    std::string result;
    for (std::size_t i = 0; i < std::min<std::size_t>(items.size(), maxLen); ++i) {
        result += items[i];
    }
    return result;
}

void checkEnds(const std::string& text, const std::string& part) {
    const bool starts = text.substr(0, part.size()) == part;
    const bool startsLower = lowerSlowly(text).substr(0, part.size()) == lowerSlowly(part);
    const bool ends = text.size() >= part.size() && text.substr(text.size() - part.size()) == part;
    checkEqual("startsWith", starts, startsWith(text, part));
    checkEqual("startsWith of characters", starts, startsWith(text.c_str(), part.c_str()));
    checkEqual("startsCaseWith", startsLower, startsCaseWith(text.c_str(), part.c_str()));
    checkEqual("endsWith", ends, endsWith(text, part));
}

void checkSearch(const std::string& text, const std::string& find, const std::string& replace) {
    const std::string lower = lowerSlowly(text);
    const std::size_t place = lower.find(find);
    const char* const found = my_strcasestr(text.c_str(), find.c_str());
    checkEqual(
        "my_strcasestr", place,
        found == nullptr ? std::string::npos : static_cast<std::size_t>(found - text.c_str()));
    checkEqual("replaceString", replaceSlowly(text, lower, find, replace),
               taken(replaceString(text.c_str(), find.c_str(), replace.c_str())));
    std::string inPlace = text;
    replaceAllString(inPlace, find, replace);
    checkEqual("replaceAllString", replaceSlowly(text, text, find, replace), inPlace);
}

void checkCopies(const std::string& text) {
    checkEqual("copystr", text, taken(copystr(text.c_str())));
    checkEqual("strip", stripSlowly(text), strip(text));
    checkEqual("strip of characters", stripSlowly(text), taken(strip(text.c_str())));
    checkEqual("lowercase", lowerSlowly(text), taken(lowercase(text.c_str())));
    std::string inPlace = text + '\0' + text;
    const std::string expected = lowerSlowly(inPlace);
    lowercase(inPlace);
    checkEqual("lowercase in place", expected, inPlace);
}

// Lines of at most `bufSize - 2` bytes; the buffer has exactly `bufSize` bytes.
void checkLines(std::string bytes, std::size_t bufSize) {
    if (bytes.empty()) {
        return;
    }
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(
        ::fmemopen(bytes.data(), bytes.size(), "r"), &std::fclose);
    std::vector<char> buf(bufSize);
    for (std::size_t at = 0; at < bytes.size();) {
        const std::size_t newline = bytes.find('\n', at);
        const std::size_t end = newline == std::string::npos ? bytes.size() : newline + 1;
        const std::string expected = bytes.substr(at, std::min(end - at, bufSize - 2));
        fuzz::check("readLine", readLine(file.get(), buf.data(), static_cast<int>(bufSize)));
        checkEqual("line", expected + std::string(bufSize - expected.size(), '\0'),
                   std::string(buf.begin(), buf.end()));
        at = end;
    }
    fuzz::check("end of the file", !readLine(file.get(), buf.data(), static_cast<int>(bufSize)));
}

}  // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::FuzzInput input(data, size);
    const std::string find = input.lineOfText();
    const std::string replace = input.lineOfText();
    const std::string bytes = input.rest();
    const std::string text = fuzz::FuzzInput::text(bytes);

    checkEnds(text, find);
    checkEnds(find, text);
    checkSearch(text, find, replace);
    checkCopies(text);
    const auto limit = static_cast<unsigned>(replace.size());
    std::string out = "kept";
    getPunct(bytes, out, limit);
    checkEqual("getPunct", "kept" + punctSlowly(bytes, limit), out);
    // A NUL at the end of the buffer looks like a line that fits, so lines with a NUL are skipped.
    checkLines(text, 3 + find.size());
    checkEqual("pad", std::string(4 * find.size(), ' '), pad(static_cast<unsigned>(find.size())));
    return 0;
}
