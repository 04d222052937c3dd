#ifndef QUELTA_UTIL_EVENTLOOP_H_
#define QUELTA_UTIL_EVENTLOOP_H_

// A unit of work that another thread's event loop runs on this thread's behalf.
//
//     class Reload : public InThreadActor {
//     public:
//         void callback() override { std::puts("reloading"); }
//     };
//
// The event loop is not part of this library. The fields of an actor belong to it: the list of
// pending actors, and what wakes a thread that waits until an actor has run.
// Not thread-safe; one thread at a time per object.

#include "util/Mutex.h"

// Base of the units of work.
class InThreadActor {
public:
    // An actor that is not pending.
    InThreadActor() = default;
    // Does not take the actor out of the list.
    // Requires: the actor is not pending.
    virtual ~InThreadActor() = default;
    InThreadActor(const InThreadActor&) = delete;
    InThreadActor& operator=(const InThreadActor&) = delete;

    // Does the work, on the event loop's thread.
    virtual void callback() = 0;

private:
    friend class EventLoop;

    bool _wantWake = false;  // whether a thread waits on _cond for the callback
    ConditionWakeAll _cond;
    bool _ran = false;
    InThreadActor* _next = nullptr;  // the next pending actor
};

#endif  // QUELTA_UTIL_EVENTLOOP_H_
