#include "support/ScriptedPthread.h"

#include <unistd.h>

#include <climits>

thread_local SeenByPthread seenByPthread;
std::atomic<void (*)()> onKeyDelete{nullptr};
std::atomic<void (*)()> onDetach{nullptr};
std::atomic<void (*)(const pthread_mutex_t*)> onMutexDestroy{nullptr};

namespace {

// A sanitizer's runtime that is linked in statically has its calls wrapped too. It makes some of
// them before instrumented code can run, and sets thread-specific keys of its own; both go to the
// real function, in code without instrumentation.
#if defined(__clang__)
#define NOT_INSTRUMENTED __attribute__((disable_sanitizer_instrumentation))
#else
#define NOT_INSTRUMENTED
#endif

constinit bool started = false;
constinit bool isRuntimeKey[PTHREAD_KEYS_MAX] = {};

struct Start {
    Start() { started = true; }
};
__attribute__((init_priority(101))) Start atStart;

}  // namespace

// Defines __wrap_FUNCTION: the script's next step, or the real function.
#define SCRIPTED(function, parameters, arguments)                                    \
    int __real_##function parameters;                                                \
    int __wrap_##function parameters;                                                \
    int __wrap_##function parameters {                                               \
        return scriptedCall(#function, [&] { return __real_##function arguments; }); \
    }

// The same for what a runtime calls, on threads that have hardly begun too: only calls on the main
// thread take part.
#define SCRIPTED_ON_MAIN_THREAD(function, parameters, arguments)                     \
    int __real_##function parameters;                                                \
    static int scripted_##function parameters {                                      \
        return scriptedCall(#function, [&] { return __real_##function arguments; }); \
    }                                                                                \
    NOT_INSTRUMENTED int __wrap_##function parameters;                               \
    int __wrap_##function parameters {                                               \
        return started && ::gettid() == ::getpid() ? scripted_##function arguments   \
                                                   : __real_##function arguments;    \
    }

extern "C" {

SCRIPTED_ON_MAIN_THREAD(pthread_attr_init, (pthread_attr_t * attr), (attr))
SCRIPTED_ON_MAIN_THREAD(pthread_attr_setstacksize, (pthread_attr_t * attr, size_t size),
                        (attr, size))

int __real_pthread_key_create(pthread_key_t* key, void (*cleanup)(void*));
static int scripted_pthread_key_create(pthread_key_t* key, void (*cleanup)(void*)) {
    return scriptedCall("pthread_key_create",
                        [&] { return __real_pthread_key_create(key, cleanup); });
}
NOT_INSTRUMENTED int __wrap_pthread_key_create(pthread_key_t* key, void (*cleanup)(void*));
int __wrap_pthread_key_create(pthread_key_t* key, void (*cleanup)(void*)) {
    if (started) {
        return scripted_pthread_key_create(key, cleanup);
    }
    const int result = __real_pthread_key_create(key, cleanup);
    if (result == 0) {
        isRuntimeKey[*key] = true;
    }
    return result;
}

int __real_pthread_setspecific(pthread_key_t key, const void* value);
static int scripted_pthread_setspecific(pthread_key_t key, const void* value) {
    return scriptedCall("pthread_setspecific",
                        [&] { return __real_pthread_setspecific(key, value); });
}
NOT_INSTRUMENTED int __wrap_pthread_setspecific(pthread_key_t key, const void* value);
int __wrap_pthread_setspecific(pthread_key_t key, const void* value) {
    const bool runtime = !started || (key < PTHREAD_KEYS_MAX && isRuntimeKey[key]);
    return runtime ? __real_pthread_setspecific(key, value)
                   : scripted_pthread_setspecific(key, value);
}

SCRIPTED(pthread_mutex_trylock, (pthread_mutex_t * mutex), (mutex))
SCRIPTED(pthread_mutex_unlock, (pthread_mutex_t * mutex), (mutex))
SCRIPTED(pthread_cond_destroy, (pthread_cond_t * cond), (cond))
SCRIPTED(pthread_cond_wait, (pthread_cond_t * cond, pthread_mutex_t* mutex), (cond, mutex))
SCRIPTED(pthread_cond_signal, (pthread_cond_t * cond), (cond))
SCRIPTED(pthread_cond_broadcast, (pthread_cond_t * cond), (cond))
SCRIPTED(pthread_join, (pthread_t thread, void** result), (thread, result))

int __real_pthread_mutex_init(pthread_mutex_t* mutex, const pthread_mutexattr_t* attr);
int __wrap_pthread_mutex_init(pthread_mutex_t* mutex, const pthread_mutexattr_t* attr);
int __wrap_pthread_mutex_init(pthread_mutex_t* mutex, const pthread_mutexattr_t* attr) {
    seenByPthread.mutexAttributes = attr != nullptr;
    return scriptedCall("pthread_mutex_init",
                        [&] { return __real_pthread_mutex_init(mutex, attr); });
}

int __real_pthread_cond_init(pthread_cond_t* cond, const pthread_condattr_t* attr);
int __wrap_pthread_cond_init(pthread_cond_t* cond, const pthread_condattr_t* attr);
int __wrap_pthread_cond_init(pthread_cond_t* cond, const pthread_condattr_t* attr) {
    seenByPthread.condAttributes = attr != nullptr;
    return scriptedCall("pthread_cond_init", [&] { return __real_pthread_cond_init(cond, attr); });
}

int __real_pthread_mutex_lock(pthread_mutex_t* mutex);
int __wrap_pthread_mutex_lock(pthread_mutex_t* mutex);
int __wrap_pthread_mutex_lock(pthread_mutex_t* mutex) {
    seenByPthread.locked = mutex;
    return scriptedCall("pthread_mutex_lock", [&] { return __real_pthread_mutex_lock(mutex); });
}

int __real_pthread_mutex_destroy(pthread_mutex_t* mutex);
int __wrap_pthread_mutex_destroy(pthread_mutex_t* mutex);
int __wrap_pthread_mutex_destroy(pthread_mutex_t* mutex) {
    if (const auto hook = onMutexDestroy.load()) {
        hook(mutex);
    }
    return scriptedCall("pthread_mutex_destroy",
                        [&] { return __real_pthread_mutex_destroy(mutex); });
}

int __real_pthread_cond_clockwait(pthread_cond_t* cond, pthread_mutex_t* mutex, clockid_t clock,
                                  const timespec* deadline);
int __wrap_pthread_cond_clockwait(pthread_cond_t* cond, pthread_mutex_t* mutex, clockid_t clock,
                                  const timespec* deadline);
int __wrap_pthread_cond_clockwait(pthread_cond_t* cond, pthread_mutex_t* mutex, clockid_t clock,
                                  const timespec* deadline) {
    seenByPthread.clock = clock;
    seenByPthread.deadline = *deadline;
    return scriptedCall("pthread_cond_clockwait", [&] {
        return __real_pthread_cond_clockwait(cond, mutex, clock, deadline);
    });
}

int __real_pthread_key_delete(pthread_key_t key);
int __wrap_pthread_key_delete(pthread_key_t key);
int __wrap_pthread_key_delete(pthread_key_t key) {
    if (const auto hook = onKeyDelete.load()) {
        hook();
    }
    return scriptedCall("pthread_key_delete", [&] { return __real_pthread_key_delete(key); });
}

int __real_pthread_create(pthread_t* thread, const pthread_attr_t* attr, void* (*start)(void*),
                          void* arg);
int __wrap_pthread_create(pthread_t* thread, const pthread_attr_t* attr, void* (*start)(void*),
                          void* arg);
int __wrap_pthread_create(pthread_t* thread, const pthread_attr_t* attr, void* (*start)(void*),
                          void* arg) {
    seenByPthread.attributes = attr;
    if (attr != nullptr) {
        ::pthread_attr_getstacksize(attr, &seenByPthread.stackSize);
    }
    return scriptedCall("pthread_create",
                        [&] { return __real_pthread_create(thread, attr, start, arg); });
}

int __real_pthread_detach(pthread_t thread);
int __wrap_pthread_detach(pthread_t thread);
int __wrap_pthread_detach(pthread_t thread) {
    ++seenByPthread.detached;
    if (const auto hook = onDetach.load()) {
        hook();
    }
    return __real_pthread_detach(thread);
}

}  // extern "C"
