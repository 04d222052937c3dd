#ifndef QUELTA_UTIL_MUTEX_H_
#define QUELTA_UTIL_MUTEX_H_

// Checked wrappers of the POSIX locks, conditions and thread-specific keys.
//
//     Mutex mutex;
//     ConditionWakeAll changed;
//     bool ready = false;  // guarded by mutex
//     mutex.lock();
//     while (!ready && changed.wait(mutex, 5)) {  // at most 5 seconds for each wake
//     }
//     mutex.unlock();
//
// std::lock_guard<Mutex> and std::lock_guard<RecursiveMutex> work, too.
//
// One error policy covers every call except the NOLOG_ pair: a pthread function that fails is
// logged as a warning on the logger "Thread" and then thrown as a PthreadException with the same
// text. The logging code itself locks with NOLOG_lock, which neither logs nor throws, because a
// checked failure would log through the logger that is being locked.
//
// Deliberate: the destructors are checked too. They are noexcept, so a failure is logged and then
// ends the process through std::terminate.
//
// A Mutex is initialized at run time, even one of static storage duration. So a static object of
// another unit must not use it before its constructor has run.
//
// Safe from any thread, once the object is constructed and until its destruction begins.

#include <pthread.h>

#include <stdexcept>

#include "util/Requirements.h"

// Base of the wrappers; holds their error check.
class PthreadObject {
public:
    // Checks `rval`, the result of the pthread function `funcname`. Does nothing if it is 0, or
    // after Thread::mainThreadDying(). Defined in Thread.cpp, which has the logger.
    // Errors: logs and throws PthreadException with the text
    // "THREADNAME: about to throw a PthreadException: FUNCNAME: ERROR-TEXT-OF-RVAL".
    static void checkPtRes(const char* funcname, int rval);
};

// The identity of a thread; a default-constructed token matches no thread.
class PthreadToken {
public:
    // Matches no thread.
    PthreadToken() = default;
    // The identity of a thread by its POSIX handle.
    explicit PthreadToken(pthread_t token) : _token(token) {}

    // Returns: the calling thread's token.
    static PthreadToken self() { return PthreadToken(::pthread_self()); }

    // Returns: whether both represent the same thread.
    bool operator==(const PthreadToken& other) const {
        return ::pthread_equal(_token, other._token) != 0;
    }
    // Returns: whether they represent different threads.
    bool operator!=(const PthreadToken& other) const { return !(*this == other); }

private:
    friend class Thread;  // reads the token to join the thread

    pthread_t _token{};
};

// A pthread function failed, or a Thread was constructed out of order.
class PthreadException : public std::runtime_error {
public:
    // Copies the text, which what() returns.
    explicit PthreadException(const char* msg) : std::runtime_error(msg) {}
};

// A non-recursive lock; unlock() does not check the caller.
class Mutex : private PthreadObject {
public:
    // An unlocked mutex.
    Mutex();
    // Requires: no thread holds the mutex. A failure ends the process.
    ~Mutex();
    Mutex(const Mutex&) = delete;
    Mutex& operator=(const Mutex&) = delete;

    // Waits until the mutex is free and locks it.
    // Errors: PthreadException, as in the operations below.
    void lock();
    // Unlocks the mutex.
    // Requires: the calling thread holds it; not checked.
    void unlock();

    // Locks the mutex if it is free.
    // Returns: true if acquired, false if a thread holds it. After mainThreadDying() every other
    // failure also returns false.
    [[nodiscard]] bool tryLock();

    // Locks for the logging code: no check, no message, no exception.
    // Returns: whether the mutex is locked now.
    bool NOLOG_lock() noexcept { return ::pthread_mutex_lock(&_pthread_mutex) == 0; }
    // Unlocks for the logging code: no check, no message, no exception.
    // Returns: the result of the system call, 0 if the mutex is unlocked now.
    int NOLOG_unlock() noexcept { return ::pthread_mutex_unlock(&_pthread_mutex); }

    // Does nothing; a debugging aid.
    void assertIsLocked() const {}
    // Does nothing; a debugging aid.
    void verify_mem() const {}
    // Does nothing; a debugging aid.
    void debrec_set() const {}
    // Does nothing; a debugging aid.
    void debrec_clear() const {}

private:
    friend class ConditionBaseClass;

    // Valid even if pthread_mutex_init fails and errors are ignored.
    pthread_mutex_t _pthread_mutex = PTHREAD_MUTEX_INITIALIZER;
};

// A lock that its owner can take again. It is released by as many calls of unlock() as of lock().
//
// Invariant: `_owner_valid` exactly while `_owner_count` is above 0. `_owner_mutex` is never held
// while waiting for `_mutex`.
class RecursiveMutex {
public:
    // An unlocked mutex.
    RecursiveMutex() = default;

    // Waits until no other thread holds the mutex and locks it once more.
    void lock();

    // Locks the mutex once more unless another thread holds it.
    // Returns: true if the calling thread holds it now, false if another thread does.
    [[nodiscard]] bool tryLock();

    // Releases the mutex once.
    // Requires: the calling thread holds it. Only that some thread holds it is asserted.
    // Deliberate: the caller is not compared with the owner; callers must pair their calls.
    void unlock();

    // Does nothing; a debugging aid.
    void assertIsLocked() const {}

private:
    // Makes the calling thread the owner, holding the mutex once.
    void claim();

    Mutex _mutex;         // the lock that is actually held
    Mutex _owner_mutex;   // guards the fields below
    PthreadToken _owner;  // meaningful only when _owner_valid
    bool _owner_valid = false;
    unsigned int _owner_count = 0;  // how many times the owner holds it
};

// A condition variable. Derived classes choose which waiters a wake reaches.
class ConditionBaseClass : private PthreadObject {
public:
    // A condition without waiters.
    ConditionBaseClass();
    // Requires: no thread waits. A failure ends the process.
    ~ConditionBaseClass();
    ConditionBaseClass(const ConditionBaseClass&) = delete;
    ConditionBaseClass& operator=(const ConditionBaseClass&) = delete;

    // Unlocks `mutex`, waits to be woken and locks it again. May return without a wake, so call it
    // in a loop that tests what is waited for.
    // Requires: the caller holds `mutex`.
    void wait(Mutex& mutex);

    // Waits in the same way for at most `timeoutSecs` seconds from the call, unaffected by changes
    // of the clock.
    // Returns: true when woken, false on timeout. After mainThreadDying() a failure also returns
    // false.
    bool wait(Mutex& mutex, unsigned int timeoutSecs);

    // Wakes at least one waiter, if there is any.
    void internal_wake_one();
    // Wakes every waiter.
    void internal_wake_all();

    // Does nothing; a debugging aid.
    void verify_mem() const {}

private:
    // Valid even if pthread_cond_init fails and errors are ignored.
    pthread_cond_t _pthread_cond = PTHREAD_COND_INITIALIZER;
};

// A condition that wakes every waiter.
class ConditionWakeAll : public ConditionBaseClass {
public:
    // Wakes every waiter.
    void wake_all() { internal_wake_all(); }
};

// A thread-specific pointer, initially null. When a thread ends, its value, if not null, is passed
// to the cleanup function.
class TSP_Implementor : private PthreadObject {
public:
    // Null in every thread. `cleanup_fn` may be null for no cleanup.
    explicit TSP_Implementor(void (*cleanup_fn)(void*));
    // Removes the pointer from every thread, without cleanup. A failure ends the process.
    ~TSP_Implementor();
    TSP_Implementor(const TSP_Implementor&) = delete;
    TSP_Implementor& operator=(const TSP_Implementor&) = delete;

    // Returns: the calling thread's value, which may be null.
    void* get() const { return ::pthread_getspecific(_key); }

    // Replaces the calling thread's value. The previous value, if different and not null, is
    // cleaned up first.
    void set(void* value);

    // Stores null without cleanup.
    // Returns: the previous value, which the caller owns.
    void* release();

    // Replaces the calling thread's value without cleanup.
    void internal_set(void* value);

private:
    pthread_key_t _key;
    void (*_cleanup_fn)(void*);
};

// The typed form of TSP_Implementor, whose operations are described there.
template <typename T>
class ThreadSpecificPointer {
public:
    // Null in every thread. `cleanup_fn` may be null for no cleanup.
    explicit ThreadSpecificPointer(void (*cleanup_fn)(void*)) : _impl(cleanup_fn) {}

    // Returns: the calling thread's value, which may be null.
    T* get() const { return static_cast<T*>(_impl.get()); }
    // Replaces the calling thread's value, after cleanup of the previous one.
    void set(T* value) { _impl.set(value); }
    // Stores null without cleanup.
    // Returns: the previous value, which the caller owns.
    T* release() { return static_cast<T*>(_impl.release()); }

private:
    TSP_Implementor _impl;
};

// Unlocks a mutex in the constructor and locks it again in the destructor.
class ScopedMutexUnlocker {
public:
    // Unlocks `mutex`.
    // Requires: the caller holds it, and it outlives this object.
    explicit ScopedMutexUnlocker(Mutex* mutex) : _mutex(mutex) { _mutex->unlock(); }
    explicit ScopedMutexUnlocker(Mutex& mutex) : ScopedMutexUnlocker(&mutex) {}
    // Locks the mutex again. A failure ends the process.
    ~ScopedMutexUnlocker() { _mutex->lock(); }
    ScopedMutexUnlocker(const ScopedMutexUnlocker&) = delete;
    ScopedMutexUnlocker& operator=(const ScopedMutexUnlocker&) = delete;

private:
    Mutex* _mutex;
};

#endif  // QUELTA_UTIL_MUTEX_H_
