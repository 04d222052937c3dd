#include "util/Assert.h"

#include <cstdio>
#include <cstdlib>

void quelta_assertion_failed(const char* file, unsigned line, const char* expr) noexcept {
    std::fprintf(stderr, "%s:%u: failed assertion `%s'\n", file, line, expr);
    std::abort();
}
