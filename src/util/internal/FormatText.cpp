#include "util/internal/FormatText.h"

#include "util/internal/ErrorText.h"

std::string withErrorText(const char* fmt, int errnum) {
    constexpr std::size_t ERROR_TEXT_SIZE = 1000;
    char text[ERROR_TEXT_SIZE];
    const char* const inserted = errorText(errnum, text, sizeof text) ? text : "UNKNOWN ERROR";

    std::string result;
    for (const char* p = fmt; *p != '\0'; ++p) {
        if (*p != '%' || (p[1] != 'm' && p[1] != '%')) {
            result += *p;
        } else if (*++p == 'm') {
            result += inserted;
        } else {
            result += "%%";  // a pair, whose second half does not begin a "%m"
        }
    }
    return result;
}
