#ifndef QUELTA_UTIL_DCUTILS_H_
#define QUELTA_UTIL_DCUTILS_H_

// Free functions for NUL-terminated strings. A function that returns `char*` returns a new array
// that the caller releases with array delete.
// Safe from any thread.

// Copies a NUL-terminated string.
// Returns: a new array of strlen(input) + 1 bytes; null for null.
// Errors: std::bad_alloc when memory is exhausted.
// Owns: the caller releases the array with delete[].
[[nodiscard]] char* copystr(const char* input);

#endif  // QUELTA_UTIL_DCUTILS_H_
