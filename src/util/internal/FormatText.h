#ifndef QUELTA_UTIL_INTERNAL_FORMATTEXT_H_
#define QUELTA_UTIL_INTERNAL_FORMATTEXT_H_

// printf into a buffer that grows until the text fits, and "%m" in formats of messages.
// Safe from any thread.

#include <cstdarg>
#include <cstddef>
#include <cstdio>
#include <cstring>
#include <memory>
#include <new>
#include <string>
#include <string_view>

// Formats the arguments and calls `use(text)` with the text, a std::string_view that is valid
// during the call. Errors: std::bad_alloc, also if the C library cannot format the arguments, for
// example a wide character without a multibyte form. Cost: allocates only for texts of 256
// characters and more.
template <typename Use>
__attribute__((format(printf, 1, 0))) void formatText(const char* fmt, std::va_list ap, Use use) {
    constexpr std::size_t MAX_GUESSED_SIZE = std::size_t{1} << 20;  // bytes
    char first[256];
    std::unique_ptr<char[]> larger;
    char* buf = first;
    std::size_t size = sizeof first;
    for (;;) {
        std::va_list pass;
        va_copy(pass, ap);
        const int length = std::vsnprintf(buf, size, fmt, pass);
        va_end(pass);
        const bool failed = length < 0;
        if (!failed && static_cast<std::size_t>(length) < size) {
            use(std::string_view(buf, static_cast<std::size_t>(length)));
            return;
        }
        // A failure may mean that the buffer is too small. Doubling it until memory is exhausted
        // would end in the same exception.
        if (failed && size >= MAX_GUESSED_SIZE) {
            throw std::bad_alloc();
        }
        size = failed ? 2 * size : static_cast<std::size_t>(length) + 1;
        larger.reset(new char[size]);
        buf = larger.get();
    }
}

// Returns: the format with every "%m" replaced by the text of `errnum`.
std::string withErrorText(const char* fmt, int errnum);

// formatText for a message, in whose format "%m" is replaced by the text of `errnum`.
template <typename Use>
__attribute__((format(printf, 2, 0))) void formatMessage(int errnum, const char* fmt,
                                                         std::va_list ap, Use use) {
    std::string expanded;
    if (std::strstr(fmt, "%m") != nullptr) {
        expanded = withErrorText(fmt, errnum);
        fmt = expanded.c_str();
    }
    formatText(fmt, ap, use);
}

#endif  // QUELTA_UTIL_INTERNAL_FORMATTEXT_H_
