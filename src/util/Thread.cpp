#include "util/Thread.h"

#include <atomic>
#include <cerrno>
#include <exception>
#include <string>
#include <utility>

#include "util/Assert.h"
#include "util/LogLevel.h"
#include "util/Logger.h"
#include "util/internal/LogGlobals.h"
#include "util/internal/LogRouting.h"

namespace {

constexpr const char* MAIN_THREAD_NAME = "Main Thread";

// Written once each, atomic because a worker may fail while the main thread ends.
constinit std::atomic<bool> main_thread_created{false};
constinit std::atomic<bool> checkThreadErrors{true};

// What every thread is created with; set up by the main thread's object.
pthread_attr_t s_threadAttr;
constinit bool threadAttrUsable = false;  // otherwise threads get the default attributes

// Workers whose threads may still run and take the locks below.
constinit std::atomic<unsigned int> unjoinedWorkers{0};

// A lock that is ready before any constructor runs; ProcessState says when it ends.
union StaticMutex {
    constexpr StaticMutex() : mutex() {}
    ~StaticMutex() {}
    StaticMutex(const StaticMutex&) = delete;
    StaticMutex& operator=(const StaticMutex&) = delete;

    Mutex mutex;
};

constinit StaticMutex registryMutex;
constinit StaticMutex startMutex;

// Guards `_ready_to_run` of every thread.
constinit Mutex& ready_to_run_lock = startMutex.mutex;

constinit std::atomic<bool> threadLoggerGone{false};

// The unit's logger, and the end of its locks at exit. Every worker makes it before itself, so that
// the locks outlive static workers of any unit. Workers that were never joined keep them.
struct ProcessState {
    ProcessState() : logger("Thread") {}
    ~ProcessState() {
        if (unjoinedWorkers == 0) {
            startMutex.mutex.~Mutex();
            registryMutex.mutex.~Mutex();
        }
        threadLoggerGone = true;
    }
    ProcessState(const ProcessState&) = delete;
    ProcessState& operator=(const ProcessState&) = delete;

    Logger logger;
};

ProcessState& processState() {
    static ProcessState state;
    return state;
}

[[maybe_unused]] const ProcessState& madeAtStartUp = processState();

void report(LogLevel level, const std::string& text) {
    if (threadLoggerGone) {
        fallback_to_stderr(level, text);
    } else if (level == WARN) {
        processState().logger.warn(text);
    } else {
        processState().logger.error(text);
    }
}

// Whether the calling thread is registered: keeps every other thread away from the registry. The
// name is kept beside it, because a thread left running at the end may outlive its object.
constinit thread_local bool registeredHere = false;
constinit thread_local const char* nameHere = nullptr;

}  // namespace

void PthreadObject::checkPtRes(const char* funcname, int rval) {
    if (rval == 0 || !checkThreadErrors) {
        return;
    }
    std::string text;
    Logger::format(text, rval, "%s: about to throw a PthreadException: %s: %m",
                   Thread::currentName(), funcname);
    report(WARN, text);
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
    int rval = ::pthread_attr_init(&s_threadAttr);
    checkPtRes("pthread_attr_init", rval);
    if (rval != 0) {
        return;
    }
    threadAttrUsable = true;
    rval = ::pthread_attr_setstacksize(&s_threadAttr, s_stackSize);
    if (rval != 0) {
        std::string text;
        Logger::format(text, rval,
                       "cannot override thread stack size: pthread_attr_setstacksize(): %m");
        report(WARN, text);
    }
}

Thread::Thread(const char* thrname)
    : _name(thrname), _did_join(false), _ready_to_run(false), _jhelp(this) {
    processState();
    if (!main_thread_created) {
        throw PthreadException("Thread created before main thread!");
    }
    pthread_t token{};
    const pthread_attr_t* const attributes = threadAttrUsable ? &s_threadAttr : nullptr;
    ++unjoinedWorkers;
    const int rval = ::pthread_create(&token, attributes, &Thread::callMain, this);
    if (rval == 0) {
        _token = PthreadToken(token);
    } else {
        --unjoinedWorkers;
        checkPtRes("pthread_create", rval);
    }
}

Thread::~Thread() noexcept(false) {
    QUELTA_ASSERT(_did_join || !checkThreadErrors);
    if (!_did_join && _token != PthreadToken()) {
        abandon();
    }
}

// Sees to it that the thread, which nobody will join, does not use this object any more on our
// behalf: when it is still in its start handshake, it leaves that and ends.
void Thread::abandon() {
    ready_to_run_lock.lock();
    if (_start == STARTING) {
        _start = ABANDONED;
        _ready_to_run_cond.wake_all();
        while (_start == ABANDONED) {
            _ready_to_run_cond.wait(ready_to_run_lock);
        }
    }
    ready_to_run_lock.unlock();
    ::pthread_detach(_token._token);
}

void Thread::go() {
    ready_to_run_lock.lock();
    QUELTA_ASSERT(!_ready_to_run);
    _ready_to_run = true;
    try {
        _ready_to_run_cond.wake_all();
    } catch (...) {
        _ready_to_run = false;
        ready_to_run_lock.NOLOG_unlock();
        throw;
    }
    ready_to_run_lock.unlock();
}

void Thread::join() {
    QUELTA_ASSERT(!_did_join);
    _did_join = true;
    if (_token == PthreadToken()) {
        return;  // there is no thread: its creation failed, and that was to be ignored
    }
    const int rval = ::pthread_join(_token._token, nullptr);
    checkPtRes("pthread_join", rval);
    if (rval == 0) {
        --unjoinedWorkers;
    }
}

Thread* Thread::current() {
    return ActiveThreads::current();
}

const char* Thread::currentName() {
    return registeredHere ? nameHere : MAIN_THREAD_NAME;
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
        thr->_ready_to_run_cond.wake_all();
    }
    ready_to_run_lock.unlock();

    if (!abandoned) {
        thr->main();
    }
    return nullptr;
}

constinit Mutex& ActiveThreads::_mutex = registryMutex.mutex;
constinit unsigned int ActiveThreads::_nthreads = 0;
constinit ThreadSpecificPointer<Thread>* ActiveThreads::_ptrs = nullptr;

// Requires: `_mutex` is held.
// Returns: what the caller deletes once it has released `_mutex`; null while others are registered.
ThreadSpecificPointer<Thread>* ActiveThreads::takeBack() {
    --_nthreads;
    return _nthreads == 0 ? std::exchange(_ptrs, nullptr) : nullptr;
}

// Counts the calling thread in, and makes the registry for the first one; all or nothing.
void ActiveThreads::enter() {
    _mutex.lock();
    ++_nthreads;
    try {
        if (_nthreads == 1) {
            QUELTA_ASSERT(_ptrs == NULL);  // NOLINT(modernize-use-nullptr)
            _ptrs = new ThreadSpecificPointer<Thread>(&ActiveThreads::remove);
        }
        _mutex.unlock();
    } catch (...) {
        const ThreadSpecificPointer<Thread>* const unused = takeBack();
        _mutex.NOLOG_unlock();
        delete unused;
        throw;
    }
}

void ActiveThreads::leave() {
    registeredHere = false;
    _mutex.lock();
    const ThreadSpecificPointer<Thread>* const unused = takeBack();
    _mutex.unlock();
    delete unused;
}

// Fills the calling thread's slot, or takes back what enter() did.
void ActiveThreads::store(Thread* thrptr) {
    try {
        _ptrs->set(thrptr);
    } catch (...) {
        leave();
        throw;
    }
    nameHere = thrptr->name();
    registeredHere = _ptrs->get() == thrptr;
    if (!registeredHere) {
        leave();  // set() failed, and that was to be ignored
    }
}

void ActiveThreads::add(Thread* thrptr) {
    try {
        enter();
        QUELTA_ASSERT(_ptrs->get() == NULL);  // NOLINT(modernize-use-nullptr)
        store(thrptr);
    } catch (const std::exception&) {
        report(ERROR, "Could not construct ThreadSpecificPointer<Thread> in ActiveThreads::add");
    }
}

void ActiveThreads::remove(void*) {
    QUELTA_ASSERT(_ptrs != NULL);  // NOLINT(modernize-use-nullptr)
    leave();
}

Thread* ActiveThreads::current() {
    return registeredHere && _ptrs != nullptr ? _ptrs->get() : nullptr;
}
