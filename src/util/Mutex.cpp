#include "util/Mutex.h"

#include <cerrno>
#include <ctime>

#include "util/Assert.h"

Mutex::Mutex() {
    checkPtRes("pthread_mutex_init", ::pthread_mutex_init(&_pthread_mutex, nullptr));
}

Mutex::~Mutex() {
    checkPtRes("pthread_mutex_destroy", ::pthread_mutex_destroy(&_pthread_mutex));
}

void Mutex::lock() {
    checkPtRes("pthread_mutex_lock", ::pthread_mutex_lock(&_pthread_mutex));
}

void Mutex::unlock() {
    checkPtRes("pthread_mutex_unlock", ::pthread_mutex_unlock(&_pthread_mutex));
}

bool Mutex::tryLock() {
    const int rval = ::pthread_mutex_trylock(&_pthread_mutex);
    if (rval == EBUSY) {
        return false;
    }
    checkPtRes("pthread_mutex_trylock", rval);
    return rval == 0;
}

void RecursiveMutex::claim() {
    _owner_mutex.lock();
    _owner = PthreadToken::self();
    _owner_valid = true;
    _owner_count = 1;
    _owner_mutex.unlock();
}

bool RecursiveMutex::tryLock() {
    if (_mutex.tryLock()) {
        claim();
        return true;
    }
    _owner_mutex.lock();
    const bool mine = _owner_valid && _owner == PthreadToken::self();
    if (mine) {
        QUELTA_ASSERT(_owner_count > 0);
        ++_owner_count;
    }
    _owner_mutex.unlock();
    return mine;
}

void RecursiveMutex::lock() {
    if (!tryLock()) {
        _mutex.lock();
        claim();
    }
}

void RecursiveMutex::unlock() {
    _owner_mutex.lock();
    QUELTA_ASSERT(_owner_count > 0);
    --_owner_count;
    if (_owner_count > 0) {
        _owner_mutex.unlock();
        return;
    }
    _owner_valid = false;
    _owner_mutex.unlock();
    _mutex.unlock();
}

ConditionBaseClass::ConditionBaseClass() {
    checkPtRes("pthread_cond_init", ::pthread_cond_init(&_pthread_cond, nullptr));
}

ConditionBaseClass::~ConditionBaseClass() {
    checkPtRes("pthread_cond_destroy", ::pthread_cond_destroy(&_pthread_cond));
}

void ConditionBaseClass::wait(Mutex& mutex) {
    checkPtRes("pthread_cond_wait", ::pthread_cond_wait(&_pthread_cond, &mutex._pthread_mutex));
}

bool ConditionBaseClass::wait(Mutex& mutex, unsigned int timeoutSecs) {
    timespec deadline{};
    ::clock_gettime(CLOCK_MONOTONIC, &deadline);
    deadline.tv_sec += timeoutSecs;

    const int rval =
        ::pthread_cond_clockwait(&_pthread_cond, &mutex._pthread_mutex, CLOCK_MONOTONIC, &deadline);
    if (rval == ETIMEDOUT) {
        return false;
    }
    // Deliberate: reported under the name of a relative wait, because the timeout is relative.
    checkPtRes("pthread_cond_timedwait_relative_np", rval);
    return rval == 0;
}

void ConditionBaseClass::internal_wake_one() {
    checkPtRes("pthread_cond_signal", ::pthread_cond_signal(&_pthread_cond));
}

void ConditionBaseClass::internal_wake_all() {
    checkPtRes("pthread_cond_broadcast", ::pthread_cond_broadcast(&_pthread_cond));
}

// The key starts out invalid. If its creation fails after mainThreadDying(), which is ignored, the
// object then reads null and uses no other object's key.
TSP_Implementor::TSP_Implementor(void (*cleanup_fn)(void*))
    : _key(static_cast<pthread_key_t>(-1)), _cleanup_fn(cleanup_fn) {
    checkPtRes("pthread_key_create", ::pthread_key_create(&_key, _cleanup_fn));
}

TSP_Implementor::~TSP_Implementor() {
    checkPtRes("pthread_key_delete", ::pthread_key_delete(_key));
}

void TSP_Implementor::internal_set(void* value) {
    checkPtRes("pthread_setspecific", ::pthread_setspecific(_key, value));
}

void TSP_Implementor::set(void* value) {
    void* const current = get();
    if (current == value) {
        return;
    }
    if (current != nullptr && _cleanup_fn != nullptr) {
        _cleanup_fn(current);
    }
    internal_set(value);
}

void* TSP_Implementor::release() {
    void* const current = get();
    internal_set(nullptr);
    return current;
}
