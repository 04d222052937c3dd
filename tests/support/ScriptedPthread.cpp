#include "support/ScriptedPthread.h"

#include <pthread.h>
#include <unistd.h>

thread_local SeenByPthread seenByPthread;
std::atomic<void (*)(const char*)> onPthreadCall{nullptr};

namespace {

template <typename Real>
int scripted(const char* function, Real real) {
    if (const auto hook = onPthreadCall.load()) {
        hook(function);
    }
    return scriptedCall(function, real);
}

// Calls from a statically linked sanitizer runtime are wrapped too. It makes some of them before
// instrumented code can run.
#if defined(__clang__)
#define NOT_INSTRUMENTED __attribute__((disable_sanitizer_instrumentation))
#else
#define NOT_INSTRUMENTED
#endif

constinit bool started = false;
struct Start {
    Start() { started = true; }
};
__attribute__((init_priority(101))) Start atStart;

}  // namespace

// Defines __wrap_FUNCTION, which records the arguments, then takes the next step of the script or
// calls the real function.
#define SCRIPTED(function, parameters, arguments, note)                          \
    int __real_##function parameters;                                            \
    int __wrap_##function parameters;                                            \
    int __wrap_##function parameters {                                           \
        note;                                                                    \
        return scripted(#function, [&] { return __real_##function arguments; }); \
    }

// The same for functions that a runtime calls while it starts a thread: only calls on the main
// thread are scripted.
#define SCRIPTED_ON_MAIN_THREAD(function, parameters, arguments)                   \
    int __real_##function parameters;                                              \
    static int scripted_##function parameters {                                    \
        return scripted(#function, [&] { return __real_##function arguments; });   \
    }                                                                              \
    NOT_INSTRUMENTED int __wrap_##function parameters;                             \
    int __wrap_##function parameters {                                             \
        return started && ::gettid() == ::getpid() ? scripted_##function arguments \
                                                   : __real_##function arguments;  \
    }

extern "C" {

SCRIPTED_ON_MAIN_THREAD(pthread_attr_init, (pthread_attr_t * attr), (attr))
SCRIPTED_ON_MAIN_THREAD(pthread_attr_setstacksize, (pthread_attr_t * attr, size_t size),
                        (attr, size))

SCRIPTED(pthread_mutex_init, (pthread_mutex_t * mutex, const pthread_mutexattr_t* attr),
         (mutex, attr), )
SCRIPTED(pthread_mutex_destroy, (pthread_mutex_t * mutex), (mutex), )
SCRIPTED(pthread_mutex_lock, (pthread_mutex_t * mutex), (mutex), )
SCRIPTED(pthread_mutex_trylock, (pthread_mutex_t * mutex), (mutex), )
SCRIPTED(pthread_mutex_unlock, (pthread_mutex_t * mutex), (mutex), )
SCRIPTED(pthread_cond_init, (pthread_cond_t * cond, const pthread_condattr_t* attr), (cond, attr), )
SCRIPTED(pthread_cond_destroy, (pthread_cond_t * cond), (cond), )
SCRIPTED(pthread_cond_wait, (pthread_cond_t * cond, pthread_mutex_t* mutex), (cond, mutex), )
SCRIPTED(pthread_cond_clockwait,
         (pthread_cond_t * cond, pthread_mutex_t* mutex, clockid_t clock, const timespec* deadline),
         (cond, mutex, clock, deadline),
         (seenByPthread.clock = clock, seenByPthread.deadline = *deadline))
SCRIPTED(pthread_cond_signal, (pthread_cond_t * cond), (cond), )
SCRIPTED(pthread_cond_broadcast, (pthread_cond_t * cond), (cond), )
SCRIPTED(pthread_key_delete, (pthread_key_t key), (key), )
SCRIPTED(pthread_create,
         (pthread_t * thread, const pthread_attr_t* attr, void* (*start)(void*), void* arg),
         (thread, attr, start, arg),
         if (attr != nullptr)::pthread_attr_getstacksize(attr, &seenByPthread.stackSize))
SCRIPTED(pthread_join, (pthread_t thread, void** result), (thread, result), )

}  // extern "C"
