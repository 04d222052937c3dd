#include "util/Thread.h"

#include <atomic>
#include <cerrno>
#include <exception>
#include <string>
#include <utility>

#include "util/Assert.h"
#include "util/Logger.h"

namespace {

constexpr const char* MAIN_THREAD_NAME = "Main Thread";

// Written once each. Atomic, because a call may fail on a worker while the main thread ends.
constinit std::atomic<bool> main_thread_created{false};
constinit std::atomic<bool> checkThreadErrors{true};

// The attributes of every worker; set up by the main thread's object.
pthread_attr_t s_threadAttr;

// The calling thread's name while it is registered, otherwise null. Threads that are not registered
// must not read the registry, which another thread may be deleting. The name is stored apart from
// the Thread object, because a thread left running at shutdown can outlive that object.
constinit thread_local const char* registeredName = nullptr;

// The logger and the two locks are constructed in this order and destroyed in the reverse order.
// The logger comes first, so that the destructors of the locks can still report a failure.
Logger logger("Thread");

}  // namespace

Mutex ActiveThreads::_mutex;

namespace {
Mutex ready_to_run_lock;  // guards `_ready_to_run` and `_start` of every thread
}  // namespace

unsigned int ActiveThreads::_nthreads = 0;
ThreadSpecificPointer<Thread>* ActiveThreads::_ptrs = nullptr;

void PthreadObject::checkPtRes(const char* funcname, int rval) {
    if (rval == 0 || !checkThreadErrors) {
        return;
    }
    std::string text;
    Logger::format(text, rval, "%s: about to throw a PthreadException: %s: %m",
                   Thread::currentName(), funcname);
    logger.warn(text);
    throw PthreadException(text.c_str());
}

void Thread::JoinHelper::callback() {
    _thr->join();
    delete _thr;
}

Thread::Thread()
    : _token(PthreadToken::self()),
      _name(MAIN_THREAD_NAME),
      _did_join(true),
      _ready_to_run(true),
      _jhelp(this) {
    if (main_thread_created.exchange(true)) {
        throw PthreadException("Main Thread created twice!");
    }
    checkPtRes("pthread_attr_init", ::pthread_attr_init(&s_threadAttr));
    const int rval = ::pthread_attr_setstacksize(&s_threadAttr, s_stackSize);
    if (rval != 0) {
        std::string text;
        Logger::format(text, rval,
                       "cannot override thread stack size: pthread_attr_setstacksize(): %m");
        logger.warn(text);
    }
}

Thread::Thread(const char* thrname)
    : _name(thrname), _did_join(false), _ready_to_run(false), _jhelp(this) {
    if (!main_thread_created) {
        throw PthreadException("Thread created before main thread!");
    }
    pthread_t token{};
    const int rval = ::pthread_create(&token, &s_threadAttr, &Thread::callMain, this);
    checkPtRes("pthread_create", rval);
    if (rval == 0) {
        _token = PthreadToken(token);
    }
}

Thread::~Thread() {
    QUELTA_ASSERT(_did_join || !checkThreadErrors);
    if (!_did_join && _token != PthreadToken()) {
        abandon();
    }
}

// Makes the thread, which will never be joined, stop using this object.
void Thread::abandon() {
    ready_to_run_lock.lock();
    if (_start == STARTING) {
        // The thread has not passed its wait for go(). It ends without calling main(). Wait for
        // that, because the destructor of a condition blocks while a thread waits on it.
        _start = ABANDONED;
        _ready_to_run_cond.wake_all();
        while (_start == ABANDONED) {
            _ready_to_run_cond.wait(ready_to_run_lock);
        }
    }
    ready_to_run_lock.unlock();
    // The system frees a thread's stack only after a join or a detach.
    ::pthread_detach(_token._token);
}

void Thread::go() {
    ready_to_run_lock.lock();
    QUELTA_ASSERT(!_ready_to_run);
    _ready_to_run = true;
    _ready_to_run_cond.wake_all();
    ready_to_run_lock.unlock();
}

void Thread::join() {
    QUELTA_ASSERT(!_did_join);
    _did_join = true;
    if (_token == PthreadToken()) {
        return;  // pthread_create failed and errors are ignored: nothing to join
    }
    checkPtRes("pthread_join", ::pthread_join(_token._token, nullptr));
}

Thread* Thread::current() {
    return registeredName != nullptr ? ActiveThreads::_ptrs->get() : nullptr;
}

const char* Thread::currentName() {
    return registeredName != nullptr ? registeredName : MAIN_THREAD_NAME;
}

void Thread::mainThreadDying() {
    checkThreadErrors = false;
}

void* Thread::callMain(void* arg) {
    Thread* const thr = static_cast<Thread*>(arg);
    ActiveThreads::add(thr);

    ready_to_run_lock.lock();
    while (!thr->_ready_to_run && thr->_start == STARTING) {
        thr->_ready_to_run_cond.wait(ready_to_run_lock);
    }
    const bool abandoned = thr->_start == ABANDONED;
    thr->_start = STARTED;
    if (abandoned) {
        // Wakes abandon(). The object may be destroyed as soon as the lock is free.
        thr->_ready_to_run_cond.wake_all();
    }
    ready_to_run_lock.unlock();

    if (!abandoned) {
        thr->main();
    }
    return nullptr;
}

void ActiveThreads::add(Thread* thrptr) {
    _mutex.lock();
    ++_nthreads;
    if (_nthreads == 1) {
        QUELTA_ASSERT(_ptrs == NULL);  // NOLINT(modernize-use-nullptr)
        try {
            _ptrs = new ThreadSpecificPointer<Thread>(&ActiveThreads::remove);
        } catch (const std::exception&) {
            --_nthreads;
            logger.error("Could not construct ThreadSpecificPointer<Thread> in ActiveThreads::add");
        }
    }
    const bool registered = _ptrs != nullptr;
    _mutex.unlock();
    if (!registered) {
        return;
    }
    QUELTA_ASSERT(_ptrs->get() == NULL);  // NOLINT(modernize-use-nullptr)
    _ptrs->set(thrptr);
    registeredName = thrptr->name();
}

// Deliberate: the pointer is deleted after the lock is released. It is set to null under the lock,
// because a worker that starts in between creates a new one.
void ActiveThreads::remove(void*) {
    QUELTA_ASSERT(_ptrs != NULL);  // NOLINT(modernize-use-nullptr)
    registeredName = nullptr;
    _mutex.lock();
    --_nthreads;
    const ThreadSpecificPointer<Thread>* unused = nullptr;
    if (_nthreads == 0) {
        unused = std::exchange(_ptrs, nullptr);
    }
    _mutex.unlock();
    delete unused;
}
