#ifndef QUELTA_TESTS_SUPPORT_SCRIPTEDLIBC_H_
#define QUELTA_TESTS_SUPPORT_SCRIPTEDLIBC_H_

// A C library that a test controls. The test program lists the functions that it wraps:
//     quelta_test(XTest SOURCES XTest.cpp WRAP open write)
// Each call of one of them from the program's own objects (not from within the C library)
//   1. is recorded by the RecordedCalls of its thread, if there is one;
//   2. takes the next step of its ScriptedCalls, if there is one, which may end the call;
//   3. calls the Replacement of the function, if there is one, and the real function otherwise.
//
//     ScriptedCalls opens("open");
//     opens.pass().fail(EMFILE);                       // the second open fails
//     const RecordedCalls seen;                        // seen.calls(): {"open a 0 0", ...}
//     const Replacement clock(replacement::gettimeofday,
//                             [](struct timeval* now, void*) { *now = {7, 0}; return 0; });
//
// To add a function, add a row to the table below. __real_NAME is the function itself. All stubs
// are weak, so a test may define its own __wrap_NAME.

#include <pthread.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <sys/types.h>
#include <sys/uio.h>

#include <cstdarg>
#include <cstddef>
#include <cstdio>
#include <ctime>
#include <functional>
#include <string>
#include <type_traits>
#include <vector>

#include "support/ScriptedCalls.h"

struct poptContext_s;
struct poptOption;

// Each row: result, name, parameters, arguments, and the arguments that RecordedCalls records. A
// TRANSFER obeys ScriptedCalls::limit by its argument `size`. __xpg_strerror_r is the strerror_r
// that returns an error number.
// clang-format off
#define SCRIPTED_LIBC(FUNCTION, TRANSFER, VARIADIC) \
    FUNCTION(int, access, (const char* path, int mode), (path, mode), (path, mode)) \
    FUNCTION(clock_t, clock, (), (), ()) \
    FUNCTION(int, close, (int fd), (fd), ()) \
    VARIADIC(int, fcntl, (int fd, int command, int value), (fd, command, value), (command)) \
    FUNCTION(FILE*, fopen, (const char* path, const char* mode), (path, mode), (path, mode)) \
    FUNCTION(int, fstat, (int fd, struct stat* result), (fd, result), ()) \
    FUNCTION(int, fsync, (int fd), (fd), ()) \
    FUNCTION(int, gettimeofday, (struct timeval* now, void* zone), (now, zone), ()) \
    FUNCTION(struct tm*, localtime_r, (const time_t* t, struct tm* result), (t, result), ()) \
    FUNCTION(int, mkdir, (const char* path, mode_t mode), (path, mode), (path, Octal{mode})) \
    VARIADIC(int, open, (const char* path, int flags, mode_t mode), \
        (path, flags, mode), (path, flags, Octal{mode})) \
    FUNCTION(poptContext_s*, poptGetContext, \
        (const char* name, int argc, const char** argv, const struct poptOption* o, unsigned f), \
        (name, argc, argv, o, f), ()) \
    FUNCTION(int, pthread_cond_broadcast, (pthread_cond_t* c), (c), ()) \
    FUNCTION(int, pthread_cond_clockwait, \
        (pthread_cond_t* c, pthread_mutex_t* m, clockid_t id, const struct timespec* end), \
        (c, m, id, end), ()) \
    FUNCTION(int, pthread_cond_destroy, (pthread_cond_t* c), (c), ()) \
    FUNCTION(int, pthread_cond_init, (pthread_cond_t* c, const pthread_condattr_t* a), \
        (c, a), ()) \
    FUNCTION(int, pthread_cond_signal, (pthread_cond_t* c), (c), ()) \
    FUNCTION(int, pthread_cond_wait, (pthread_cond_t* c, pthread_mutex_t* m), (c, m), ()) \
    FUNCTION(int, pthread_create, \
        (pthread_t* t, const pthread_attr_t* a, void* (*f)(void*), void* arg), \
        (t, a, f, arg), ()) \
    FUNCTION(int, pthread_detach, (pthread_t t), (t), ()) \
    FUNCTION(int, pthread_join, (pthread_t t, void** result), (t, result), ()) \
    FUNCTION(int, pthread_key_delete, (pthread_key_t key), (key), ()) \
    FUNCTION(int, pthread_mutex_destroy, (pthread_mutex_t* m), (m), ()) \
    FUNCTION(int, pthread_mutex_init, (pthread_mutex_t* m, const pthread_mutexattr_t* a), \
        (m, a), ()) \
    FUNCTION(int, pthread_mutex_lock, (pthread_mutex_t* m), (m), ()) \
    FUNCTION(int, pthread_mutex_trylock, (pthread_mutex_t* m), (m), ()) \
    FUNCTION(int, pthread_mutex_unlock, (pthread_mutex_t* m), (m), ()) \
    FUNCTION(long, random, (), (), ()) \
    TRANSFER(ssize_t, read, (int fd, void* buf, size_t size), (fd, buf, size), (size)) \
    FUNCTION(ssize_t, readlink, (const char* path, char* buf, size_t size), \
        (path, buf, size), (path, size)) \
    FUNCTION(int, remove, (const char* path), (path), (path)) \
    FUNCTION(int, rename, (const char* from, const char* to), (from, to), (from, to)) \
    FUNCTION(int, rmdir, (const char* path), (path), (path)) \
    FUNCTION(int, stat, (const char* path, struct stat* result), (path, result), (path)) \
    FUNCTION(size_t, strftime, (char* buf, size_t size, const char* fmt, const struct tm* t), \
        (buf, size, fmt, t), (size, fmt)) \
    FUNCTION(int, symlink, (const char* to, const char* link), (to, link), (to, link)) \
    FUNCTION(time_t, time, (time_t* result), (result), ()) \
    FUNCTION(int, truncate, (const char* path, off_t length), (path, length), (path, length)) \
    FUNCTION(int, unlink, (const char* path), (path), (path)) \
    FUNCTION(int, vsnprintf, (char* buf, size_t size, const char* fmt, va_list ap), \
        (buf, size, fmt, ap), (size)) \
    TRANSFER(ssize_t, write, (int fd, const void* buf, size_t size), (fd, buf, size), (size)) \
    FUNCTION(ssize_t, writev, (int fd, const struct iovec* v, int count), \
        (fd, v, count), (count)) \
    FUNCTION(int, __xpg_strerror_r, (int number, char* buf, size_t size), \
        (number, buf, size), (size))
// clang-format on

// The calls of wrapped functions by this thread while the object exists, each as the name and the
// recorded arguments, separated by blanks. A mode is octal, every other number decimal.
// Not thread-safe; one object at a time per thread.
class RecordedCalls {
public:
    RecordedCalls();
    ~RecordedCalls();
    RecordedCalls(const RecordedCalls&) = delete;
    RecordedCalls& operator=(const RecordedCalls&) = delete;

    const std::vector<std::string>& calls() const { return _calls; }
    void clear() { _calls.clear(); }

private:
    template <typename... Arguments>
    friend void record(const char* function, Arguments... arguments);

    std::vector<std::string> _calls;
};

#define DECLARE_SLOT(result, name, parameters, arguments, recorded) \
    extern std::function<result parameters>* name;
#define DECLARE_REAL(result, name, parameters, arguments, recorded) \
    __attribute__((weak)) result __real_##name parameters;
#define DECLARE_NOTHING(result, name, parameters, arguments, recorded)

// The functions that Replacement sets; null: the real function.
namespace replacement {
SCRIPTED_LIBC(DECLARE_SLOT, DECLARE_SLOT, DECLARE_SLOT)
}
extern "C" {
SCRIPTED_LIBC(DECLARE_REAL, DECLARE_REAL, DECLARE_NOTHING)
__attribute__((weak)) int __real_open(const char* path, int flags, ...);
__attribute__((weak)) int __real_fcntl(int fd, int command, ...);
}

// Calls `body` instead of a function while the object exists. Not thread-safe to construct and
// destroy.
template <typename Body>
class Replacement {
public:
    Replacement(Body*& slot, std::type_identity_t<Body> body)
        : _body(std::move(body)), _slot(slot), _previous(slot) {
        _slot = &_body;
    }
    ~Replacement() { _slot = _previous; }
    Replacement(const Replacement&) = delete;
    Replacement& operator=(const Replacement&) = delete;

private:
    Body _body;
    Body*& _slot;
    Body* const _previous;
};

#endif  // QUELTA_TESTS_SUPPORT_SCRIPTEDLIBC_H_
