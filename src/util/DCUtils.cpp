#include "util/DCUtils.h"

#include <strings.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>

#include "util/Logger.h"

namespace {

constexpr char ELLIPSE_BREAKERS[] = " ,;-#$%&+./:=?@'|*(){}<>[]^!";
static_assert(sizeof ELLIPSE_BREAKERS - 1 == 28);
char BREAKER_MAP[256];  // built by the first getPunct
bool initd = false;     // whether BREAKER_MAP is built

Logger logger("DCUtils");

// The functions of <cctype> take a byte's unsigned value.
bool isSpace(char c) {
    return std::isspace(static_cast<unsigned char>(c)) != 0;
}
char lowered(char c) {
    return static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
}
bool isNameCharacter(char c) {
    return c == '_' || std::isalnum(static_cast<unsigned char>(c)) != 0;
}

constexpr double NO_DOUBLE = -9.99e99;

}  // namespace

char* copystr(const char* input) {
    if (input == nullptr) {
        return nullptr;
    }
    const std::size_t size = std::strlen(input) + 1;
    char* const copy = new (std::nothrow) char[size];
    if (copy == nullptr) {
        logger.error("Could not allocate space for string of size %lu in DCUtils::copystr",
                     static_cast<unsigned long>(size));
        throw std::bad_alloc();
    }
    std::memcpy(copy, input, size);
    return copy;
}

bool startsWith(const char* str, const char* prefix) {
    return str != nullptr && prefix != nullptr &&
           std::strncmp(str, prefix, std::strlen(prefix)) == 0;
}

bool startsWith(const std::string& keyword, const std::string& prefix) {
    return keyword.starts_with(prefix);
}

bool startsCaseWith(const char* str, const char* prefix) {
    return ::strncasecmp(str, prefix, std::strlen(prefix)) == 0;
}

bool endsWith(const std::string& text, const std::string& suffix) {
    return text.ends_with(suffix);
}

char* my_strcasestr(const char* str, const char* substr) {
    const std::unique_ptr<char[]> lower(lowercase(str));
    const char* const found = std::strstr(lower.get(), substr);
    return found == nullptr ? nullptr : const_cast<char*>(str + (found - lower.get()));
}

char* strip(const char* inString) {
    if (inString == nullptr) {
        return nullptr;
    }
    const char* begin = inString;
    while (isSpace(*begin)) {
        ++begin;
    }
    const char* end = begin + std::strlen(begin);
    while (end > begin && isSpace(end[-1])) {
        --end;
    }
    return copystr(std::string(begin, end).c_str());
}

std::string strip(const std::string& str) {
    const std::unique_ptr<char[]> stripped(strip(str.c_str()));
    return stripped == nullptr ? std::string() : std::string(stripped.get());
}

char* lowercase(const char* inString) {
    char* const copy = copystr(inString);
    if (copy != nullptr) {
        std::transform(copy, copy + std::strlen(copy), copy, lowered);
    }
    return copy;
}

void lowercase(std::string& str) {
    std::transform(str.begin(), str.end(), str.begin(), lowered);
}

void replaceAllString(std::string& str, const std::string& findStr, const std::string& replaceStr) {
    if (findStr.empty()) {
        return;
    }
    for (std::size_t pos = str.find(findStr); pos != std::string::npos;
         pos = str.find(findStr, pos + replaceStr.size())) {
        str.replace(pos, findStr.size(), replaceStr);
    }
}

char* replaceString(const char* text, const char* find, const char* replace) {
    const std::size_t findLength = std::strlen(find);
    if (findLength == 0) {
        return copystr(text);
    }
    const std::unique_ptr<char[]> lower(lowercase(text));
    std::string result;
    const char* searched = lower.get();  // at the same offset as `rest`
    const char* rest = text;
    while (const char* const found = std::strstr(searched, find)) {
        result.append(rest, static_cast<std::size_t>(found - searched));
        result += replace;
        rest += (found - searched) + static_cast<std::ptrdiff_t>(findLength);
        searched = found + findLength;
    }
    result += rest;
    return copystr(result.c_str());
}

std::string pad(unsigned depth) {
    return std::string(std::size_t{4} * depth, ' ');
}

char* substituteEnvs(const char* inStr) {
    if (inStr == nullptr) {
        return nullptr;
    }
    std::string result;
    const char* p = inStr;
    while (const char* const dollar = std::strchr(p, '$')) {
        result.append(p, dollar);
        const char* const name = dollar + 1;
        p = name;
        while (isNameCharacter(*p)) {
            ++p;
        }
        // An empty or unset name is replaced by nothing.
        // NOLINTNEXTLINE(concurrency-mt-unsafe): no other thread changes the environment
        if (const char* const value = std::getenv(std::string(name, p).c_str())) {
            result += value;
        }
    }
    result += p;
    return copystr(result.c_str());
}

void initMap(char* map, const char* initString) {
    std::memset(map, 0, 256);
    for (const char* p = initString; *p != '\0'; ++p) {
        map[static_cast<unsigned char>(*p)] = 1;
    }
    map[static_cast<unsigned char>('\t')] = 't';
    map[static_cast<unsigned char>('\r')] = 'r';
    map[static_cast<unsigned char>('\\')] = '\\';
    map[static_cast<unsigned char>('"')] = '"';
}

void getPunct(const std::string& text, std::string& out, unsigned max_len) {
    if (!initd) {
        initMap(BREAKER_MAP, ELLIPSE_BREAKERS);
        initd = true;
    }
    out.reserve(out.size() + 2 * std::size_t{max_len} + 1);  // an item is two characters at most
    unsigned items = 0;
    for (const char* p = text.c_str(); *p != '\0' && *p != '\n' && items < max_len; ++p) {
        const char entry = BREAKER_MAP[static_cast<unsigned char>(*p)];
        if (entry == 0) {
            continue;
        }
        ++items;
        if (entry == 1) {
            out += *p == ' ' ? '_' : *p;
        } else if (entry == 't') {
            out += entry;
        } else {
            out += '\\';
            out += entry;
        }
    }
}

const char* bool2str(bool val) {
    return val ? "True" : "False";
}

bool toBool(const char* str) {
    if (str == nullptr || *str == '\0') {
        return false;
    }
    return ::strcasecmp(str, "false") != 0 && ::strcasecmp(str, "no") != 0 &&
           ::strcasecmp(str, "0") != 0;
}

char* ltoa(char* buf, long val, int* len) {
    // Negated as an unsigned number, because LONG_MIN has no positive counterpart.
    unsigned long magnitude = static_cast<unsigned long>(val);
    char* first = buf;
    if (val < 0) {
        magnitude = 0UL - magnitude;
        *first++ = '-';
    }
    char* end = first;
    do {
        *end++ = static_cast<char>('0' + magnitude % 10);
        magnitude /= 10;
    } while (magnitude != 0);
    std::reverse(first, end);
    *end = '\0';
    if (len != nullptr) {
        *len = static_cast<int>(end - buf) - 1;
    }
    return buf;
}

std::string& ltoa(long val, std::string& out) {
    char buf[50];
    return out += ltoa(buf, val, nullptr);
}

long getLong(const std::string& str, bool& successful) {
    char* end = nullptr;
    errno = 0;
    const long value = std::strtol(str.c_str(), &end, 10);
    successful = end != str.c_str() && end == str.c_str() + str.size() && errno == 0;
    errno = 0;
    return value;
}

double getDouble(const std::string& str) {
    if (str.empty() || (str[0] != '-' && (str[0] < '0' || str[0] > '9'))) {
        return NO_DOUBLE;
    }
    char* end = nullptr;
    errno = 0;
    const double value = std::strtod(str.c_str(), &end);
    const bool successful = end == str.c_str() + str.size() && errno == 0;
    errno = 0;
    return successful ? value : NO_DOUBLE;
}
