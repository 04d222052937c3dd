#ifndef QUELTA_UTIL_ASSERT_H_
#define QUELTA_UTIL_ASSERT_H_

// The assertion of the whole program. It is on in every build, and for errors in the program only:
// bad input is reported, never asserted.
//
//     const int count = 1;
//     QUELTA_ASSERT(count > 0);
//
// The macro turns its own argument into text, so it must not be wrapped in another macro: wrapped,
// `p == NULL` would print as what NULL expands to.
// Safe from any thread.

// Does nothing if `expr` is true. Otherwise prints its path, its line and its text on standard
// error, as in "src/util/Mutex.cpp:47: failed assertion `_owner_count > 0'", and aborts.
#define QUELTA_ASSERT(expr) \
    ((expr) ? static_cast<void>(0) : quelta_assertion_failed(__FILE__, __LINE__, #expr))

// Prints what a failed QUELTA_ASSERT prints and aborts; never returns.
// Threads: safe from any thread.
[[noreturn]] void quelta_assertion_failed(const char* file, unsigned line,
                                          const char* expr) noexcept;

#endif  // QUELTA_UTIL_ASSERT_H_
