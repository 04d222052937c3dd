#ifndef QUELTA_UTIL_THREAD_H_
#define QUELTA_UTIL_THREAD_H_

// Everything about threads, and their registry.
//
// ActiveThreads maps each running worker to its Thread object, through a thread-specific pointer
// that exists while any worker is registered. A worker adds itself before anything else; when it
// ends, the thread library calls remove(), and the last one to leave deletes the pointer.
// Invariant: `_ptrs` is not null exactly while `_nthreads` is above 0. It is written under `_mutex`
// only, and read without it only by threads that are registered, for which it cannot change.
// Safe from any thread; serialised by `_mutex`.

#include "util/EventLoop.h"
#include "util/Mutex.h"
#include "util/ThreadObj.h"

class ActiveThreads {
public:
    ActiveThreads() = delete;

    // Registers the calling thread as `thrptr`.
    // Requires: the calling thread is not registered (asserted).
    // Errors: a key that cannot be created is logged, and the thread runs unregistered, as "Main
    // Thread". PthreadException for any other failure; thrown by a worker that is starting, it
    // terminates the program.
    static void add(Thread* thrptr);

    // Unregisters the calling thread. The argument, which the thread library passes, is not used.
    // Requires: some thread is registered (asserted).
    // Errors: PthreadException; thrown while a thread ends, it terminates the program.
    static void remove(void*);

    // Returns: the calling thread's object, null when it is not registered.
    // Threads: takes no lock; an unregistered thread touches nothing shared.
    static Thread* current();

private:
    static Mutex _mutex;
    static unsigned int _nthreads;  // registered threads
    static ThreadSpecificPointer<Thread>* _ptrs;
};

#endif  // QUELTA_UTIL_THREAD_H_
