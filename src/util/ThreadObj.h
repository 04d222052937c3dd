#ifndef QUELTA_UTIL_THREADOBJ_H_
#define QUELTA_UTIL_THREADOBJ_H_

// Thread: one operating-system thread. A program that starts workers first makes one Thread() for
// its main thread. A worker is a subclass with a main() of its own; its thread exists from the
// construction on, waits for go(), runs main() and must be joined before the object is destroyed:
//     Thread mainThread;
//     Worker worker("Worker");
//     worker.go();
//     worker.join();
// go() and join() are allowed once each; the main thread counts as running and joined.
//
// Invariant: `_ready_to_run` and `_start` are guarded by the one lock of all start handshakes. A
// worker reads nothing that its creator writes after starting it until that handshake is over.
// Not thread-safe; one thread at a time per object. The static members are safe from any thread.

#include <cstddef>

#include "util/EventLoop.h"
#include "util/Mutex.h"

class Thread : private PthreadObject {
public:
    // Joins and deletes its thread, on the thread of the event loop that it is handed to.
    class JoinHelper : public InThreadActor {
    public:
        explicit JoinHelper(Thread* thr) : _thr(thr) {}

        // Requires: the thread was made with new. Deletes it, and this helper, which is part of it.
        void callback() override;

    private:
        Thread* _thr;
    };

    // Stands for the calling thread, under the name "Main Thread".
    // Errors: PthreadException "Main Thread created twice!".
    // Deliberate: there is one in the life of a process, also when it was destroyed or its
    // construction failed half way.
    // A stack size that cannot be set is only a warning.
    Thread();

    // Creates a thread that waits for go().
    // `thrname`: the pointer is kept; its text must outlive the object.
    // Errors: PthreadException "Thread created before main thread!", or that of pthread_create; in
    // either case no thread is started.
    explicit Thread(const char* thrname);

    // Requires: joined (asserted), unless mainThreadDying() was called.
    virtual ~Thread();
    Thread(const Thread&) = delete;
    Thread& operator=(const Thread&) = delete;

    // The body of a worker. The main thread's object has none: its thread runs already.
    virtual void main() {}

    bool isCurrent() const { return _token == PthreadToken::self(); }
    bool operator==(const Thread& other) const { return _token == other._token; }
    bool operator!=(const Thread& other) const { return _token != other._token; }
    const char* name() const { return _name; }

    // Lets main() start; not lost when the thread has not reached its wait yet.
    // Requires: not called before (asserted).
    void go();

    // Waits until the thread has ended.
    // Requires: not called before (asserted).
    // Deliberate: a join that fails counts too; it is not tried again, and the object may go.
    void join();

    // Owns: the helper is a part of this object.
    JoinHelper* joinHelper() { return &_jhelp; }

    // Returns: the calling thread's object; null on the main thread and on every thread that no
    // Thread stands for.
    static Thread* current();

    // Returns: the calling thread's name.
    // Deliberate: "Main Thread" where current() is null, on whichever thread that is.
    // Threads: takes no lock; touches nothing shared on a thread that no Thread stands for.
    static const char* currentName();

    // From now on failed pthread calls are ignored and unjoined objects may be destroyed: for the
    // end of the process, when other threads may be left running. A worker that is destroyed
    // before its thread has begun never runs main().
    static void mainThreadDying();

    // The start routine of pthread_create; `arg` is the Thread.
    static void* callMain(void* arg);

    static constexpr std::size_t s_stackSize = 1048576;  // bytes, of every new thread

private:
    enum Start { STARTING, ABANDONED, STARTED };

    void abandon();

    PthreadToken _token;  // nobody's when the thread could not be created
    const char* _name;
    bool _did_join;
    bool _ready_to_run;
    ConditionWakeAll _ready_to_run_cond;  // signalled by go()
    JoinHelper _jhelp;
    Start _start = STARTING;  // of a worker; STARTED: past its handshake
};

#endif  // QUELTA_UTIL_THREADOBJ_H_
