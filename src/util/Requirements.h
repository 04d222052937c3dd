#ifndef QUELTA_UTIL_REQUIREMENTS_H_
#define QUELTA_UTIL_REQUIREMENTS_H_

// What every public header needs of the compiler, its options and its library. A compilation that
// lacks it stops with the reason. Defines nothing.
//
//     #include "util/Requirements.h"

#include <sys/types.h>

#include <version>

#if __cplusplus < 202002L
#error "Quelta needs C++20: compile with -std=c++20 or later"
// The sources have constinit objects with vectors in them.
#elif !defined(__cpp_lib_constexpr_vector)
#error "Quelta needs a newer C++ library: that of g++ 12 or libc++ 16, or later"
#endif

#ifndef __cpp_exceptions
#error "Quelta needs exceptions: compile without -fno-exceptions"
#endif

// On 32-bit systems both are 32 bits by default.
static_assert(sizeof(off_t) == 8 && sizeof(time_t) == 8,
              "Quelta needs 64-bit sizes and times: compile with -D_FILE_OFFSET_BITS=64 "
              "-D_TIME_BITS=64");

#endif  // QUELTA_UTIL_REQUIREMENTS_H_
