#ifndef QUELTA_UTIL_ASSERT_H_
#define QUELTA_UTIL_ASSERT_H_

// The assertion of the whole program: a programming error prints
//     path:line: failed assertion `expression'
// on standard error and aborts. It is on in every build, and for errors in the program only: bad
// input is reported, never asserted.
//
// The macro turns its own argument into text, so it must not be wrapped in another macro: wrapped,
// `p == NULL` would print as what NULL expands to.

#define QUELTA_ASSERT(expr) \
    ((expr) ? static_cast<void>(0) : quelta_assertion_failed(__FILE__, __LINE__, #expr))

// Prints "%s:%u: failed assertion `%s'\n" on standard error and aborts; never returns.
// Threads: safe from any thread.
[[noreturn]] void quelta_assertion_failed(const char* file, unsigned line,
                                          const char* expr) noexcept;

#endif  // QUELTA_UTIL_ASSERT_H_
