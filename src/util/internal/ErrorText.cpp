// There are two functions called strerror_r. The POSIX one returns an error number; the GNU one,
// which g++ and clang++ select by predefining _GNU_SOURCE, returns a text for every number. Only
// without that macro do the headers of the system give the POSIX one, so this source must not
// include C++ headers, which need the macro.
#undef _GNU_SOURCE
#define _POSIX_C_SOURCE 200809L  // NOLINT(bugprone-reserved-identifier): read by the system headers

#include "util/internal/ErrorText.h"

#include <errno.h>
#include <string.h>

bool errorText(int errnum, char* buf, size_t size) noexcept {
    return ::strerror_r(errnum, buf, size) == 0;
}
