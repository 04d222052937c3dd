#ifndef QUELTA_UTIL_INTERNAL_RETRYONEINTR_H_
#define QUELTA_UTIL_INTERNAL_RETRYONEINTR_H_

// Repeats a system call that a signal has interrupted.
// Safe from any thread.

#include <cerrno>

// Repeats `call` while it returns false with errno set to EINTR.
// Returns: what the last call returned.
template <typename Call>
bool retryOnEintr(Call call) {
    bool succeeded = call();
    while (!succeeded && errno == EINTR) {
        succeeded = call();
    }
    return succeeded;
}

#endif  // QUELTA_UTIL_INTERNAL_RETRYONEINTR_H_
