#ifndef QUELTA_UTIL_THREAD_H_
#define QUELTA_UTIL_THREAD_H_

// All of the thread library, and ActiveThreads, the registry of workers.
//
//     const Thread mainThread;
//     std::puts(Thread::currentName());  // "Main Thread"
//     if (Thread::current() == nullptr) {
//         std::puts("the main thread is not registered");
//     }
//
// The registry maps each running worker to its Thread object, through a thread-specific pointer
// that exists while any worker is registered. A worker adds itself when its thread starts. When the
// thread ends, the C library calls remove(), and the last worker deletes the pointer.
// Invariant: `_ptrs` is not null exactly while `_nthreads` is above 0. It is written only under
// `_mutex`, and read without it only by registered threads, for which it cannot change.
//
// Safe from any thread; serialised by `_mutex`.

#include "util/EventLoop.h"
#include "util/Mutex.h"
#include "util/ThreadObj.h"

// The registry of workers. Only Thread uses it.
class ActiveThreads {
public:
    // Deleted: there is one registry, of static members.
    ActiveThreads() = delete;

    // Registers the calling thread as `thrptr`.
    // Requires: the calling thread is not registered (asserted).
    // Errors: a key that cannot be created is logged, and the thread runs unregistered, as "Main
    // Thread". PthreadException for any other failure; thrown by a worker that is starting, it
    // terminates the program.
    static void add(Thread* thrptr);

    // Unregisters the calling thread. The argument, which the C library passes, is not used.
    // Called by the C library when a registered thread ends.
    // Requires: some thread is registered (asserted).
    // Errors: PthreadException; thrown while a thread ends, it terminates the program.
    static void remove(void*);

private:
    friend class Thread;  // current() reads the calling thread's entry

    static Mutex _mutex;
    static unsigned int _nthreads;                // registered threads
    static ThreadSpecificPointer<Thread>* _ptrs;  // owned
};

#endif  // QUELTA_UTIL_THREAD_H_
