#ifndef QUELTA_UTIL_INTERNAL_ERRNOKEEPER_H_
#define QUELTA_UTIL_INTERNAL_ERRNOKEEPER_H_

// Restores errno at the end of a scope.
// Not thread-safe; one thread at a time per object.

#include <cerrno>

class ErrnoKeeper {
public:
    ErrnoKeeper() = default;
    ~ErrnoKeeper() { errno = _saved; }
    ErrnoKeeper(const ErrnoKeeper&) = delete;
    ErrnoKeeper& operator=(const ErrnoKeeper&) = delete;

    // The value that will be restored.
    int saved() const { return _saved; }

private:
    const int _saved = errno;
};

#endif  // QUELTA_UTIL_INTERNAL_ERRNOKEEPER_H_
