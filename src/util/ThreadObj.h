#ifndef QUELTA_UTIL_THREADOBJ_H_
#define QUELTA_UTIL_THREADOBJ_H_

// Threads of the operating system. A worker is a subclass of Thread with its own main().
//
//     class Worker : public Thread {
//     public:
//         Worker() : Thread("Worker") {}
//         void main() override { std::puts(Thread::currentName()); }
//     };
//     Thread mainThread;  // first, and on the main thread
//     Worker worker;
//     worker.go();
//     worker.join();
//
// A program that uses workers first constructs one Thread() for its main thread. The constructor of
// a worker creates the thread, which waits for go() and then runs main(). It must be joined before
// the object is destroyed. go() and join() are allowed once each; the main thread counts as running
// and joined.
//
// The two locks of the library are static objects, destroyed at exit. So create threads only after
// main has begun, and join all of them, or call mainThreadDying(), before exit.
//
// Invariant: `_ready_to_run` and `_start` are guarded by one lock, which all threads share. Until a
// worker has passed its wait for go(), it reads no field that its creator still writes.
//
// Not thread-safe; one thread at a time per object. The static members are safe from any thread.

#include <cstddef>

#include "util/EventLoop.h"
#include "util/Mutex.h"

// One thread, the main thread or a worker.
class Thread : private PthreadObject {
public:
    // Joins and deletes its thread. Runs on the thread of an event loop.
    class JoinHelper : public InThreadActor {
    public:
        // The helper of `thr`, not null.
        explicit JoinHelper(Thread* thr) : _thr(thr) {}

        // Joins and deletes the thread.
        // Requires: the Thread was allocated by new. This deletes the helper too, as it is part of
        // the Thread.
        void callback() override;

    private:
        Thread* _thr;
    };

    // Represents the calling thread, under the name "Main Thread". A stack size that cannot be set
    // is only a warning.
    // Errors: PthreadException "Main Thread created twice!", or that of pthread_attr_init.
    // Deliberate: there can be only one per process, even after it was destroyed or its
    // construction failed.
    Thread();

    // Creates a thread that waits for go(). `thrname` is not null; the pointer is kept, so the text
    // must outlive the object.
    // Errors: PthreadException "Thread created before main thread!", or that of pthread_create. No
    // thread is created then.
    explicit Thread(const char* thrname);

    // Destroys the object of a thread that has ended.
    // Requires: joined (asserted), unless mainThreadDying() was called.
    // Deliberate: after mainThreadDying() a worker that has not started never runs. The destructor
    // returns after its thread has stopped waiting for go().
    virtual ~Thread();
    Thread(const Thread&) = delete;
    Thread& operator=(const Thread&) = delete;

    // The body of a worker; does nothing unless it is overridden. Not called for the main thread.
    // An exception that leaves it terminates the program.
    virtual void main() {}

    // Returns: whether the calling thread is this one.
    bool isCurrent() const { return _token == PthreadToken::self(); }
    // Returns: whether both objects represent the same thread.
    bool operator==(const Thread& other) const { return _token == other._token; }
    // Returns: whether the objects represent different threads.
    bool operator!=(const Thread& other) const { return _token != other._token; }
    // Returns: the name given to the constructor, or "Main Thread".
    const char* name() const { return _name; }

    // Lets main() start, even if the thread is not waiting yet.
    // Requires: not called before (asserted).
    void go();

    // Waits until the thread has ended.
    // Requires: not called before (asserted).
    // Deliberate: a failed join counts as a join. It cannot be retried, and the object may be
    // destroyed.
    void join();

    // Returns: the actor that joins and deletes this thread.
    // Owns: the helper is a part of this object.
    JoinHelper* joinHelper() { return &_jhelp; }

    // Returns: the calling thread's object; null on the main thread and on threads not created by
    // Thread.
    // Threads: as currentName().
    static Thread* current();

    // Returns: the calling thread's name.
    // Deliberate: "Main Thread" on every thread whose current() is null.
    // Threads: takes no lock. Reads nothing shared on a thread not created by Thread.
    static const char* currentName();

    // Turns error checks off: from now on failed pthread calls are ignored and unjoined objects may
    // be destroyed. Meant for the end of the process, when other threads may be left running.
    // Threads: safe from any thread.
    static void mainThreadDying();

    // The start routine of pthread_create; `arg` is the Thread.
    static void* callMain(void* arg);

    static constexpr std::size_t s_stackSize = 1048576;  // bytes, of every worker

private:
    enum Start { STARTING, ABANDONED, STARTED };

    void abandon();

    PthreadToken _token;  // matches no thread if the thread could not be created
    const char* _name;
    bool _did_join;
    bool _ready_to_run;
    ConditionWakeAll _ready_to_run_cond;  // signalled by go()
    JoinHelper _jhelp;
    Start _start = STARTING;  // of a worker; STARTED: it has passed its wait for go()
};

#endif  // QUELTA_UTIL_THREADOBJ_H_
