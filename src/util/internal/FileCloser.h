#ifndef QUELTA_UTIL_INTERNAL_FILECLOSER_H_
#define QUELTA_UTIL_INTERNAL_FILECLOSER_H_

// A stream that is closed at the end of a scope. Closing keeps errno.
// Not thread-safe; one thread at a time per object.

#include <cstdio>
#include <memory>

#include "util/internal/ErrnoKeeper.h"

struct FileCloser {
    void operator()(std::FILE* file) const {
        const ErrnoKeeper errnoKeeper;
        std::fclose(file);
    }
};

using OpenFile = std::unique_ptr<std::FILE, FileCloser>;

#endif  // QUELTA_UTIL_INTERNAL_FILECLOSER_H_
