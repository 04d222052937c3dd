#ifndef QUELTA_UTIL_INTERNAL_ERRORTEXT_H_
#define QUELTA_UTIL_INTERNAL_ERRORTEXT_H_

// The text of a system error, from the POSIX strerror_r, which reports unknown numbers.
// Safe from any thread.

#include <stddef.h>

// Puts the NUL-terminated text of `errnum` into `buf`, which has room for `size` bytes.
// Returns: false, with the contents of `buf` undefined, if there is no text or no room for it.
bool errorText(int errnum, char* buf, size_t size) noexcept;

#endif  // QUELTA_UTIL_INTERNAL_ERRORTEXT_H_
