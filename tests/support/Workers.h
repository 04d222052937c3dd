#ifndef QUELTA_TESTS_SUPPORT_WORKERS_H_
#define QUELTA_TESTS_SUPPORT_WORKERS_H_

// Threads that run a function, for tests.

#include <atomic>
#include <functional>
#include <mutex>
#include <thread>
#include <utility>

#include "util/Thread.h"

// The one object of the main thread, constructed on first use.
inline Thread& mainThread() {
    static Thread thread;
    return thread;
}

class Worker : public Thread {
public:
    Worker(const char* name, std::function<void()> body)
        : Thread((mainThread(), name)), _body(std::move(body)) {}
    void main() override { _body(); }

private:
    std::function<void()> _body;
};

// Runs `body` on a worker and waits for the worker to end.
inline void runWorker(const char* name, std::function<void()> body) {
    Worker worker(name, std::move(body));
    worker.go();
    worker.join();
}

// Waits in a busy loop until the condition holds.
template <typename Condition>
void waitUntil(Condition condition) {
    while (!condition()) {
        std::this_thread::yield();
    }
}

// Returns: the number of workers that are registered. Waiting until there are none keeps a child
// from exiting, and destroying the locks of threads, while a detached worker still runs.
inline unsigned registeredWorkers() {
    const std::lock_guard<Mutex> lock(ActiveThreads::_mutex);
    return ActiveThreads::_nthreads;
}

// A worker that stays in main() until leave().
class Resident {
public:
    explicit Resident(const char* name)
        : _worker(name, [this] {
              _running = true;
              waitUntil([this] { return _leave.load(); });
          }) {
        _worker.go();
        waitUntil([this] { return _running.load(); });
    }
    void leave() {
        _leave = true;
        _worker.join();
    }

private:
    std::atomic<bool> _running{false};
    std::atomic<bool> _leave{false};
    Worker _worker;
};

// Runs `body` on a thread not created by Thread, waits for its end and returns its result.
template <typename Body>
auto onForeignThread(Body body) {
    decltype(body()) result{};
    std::thread([&] { result = body(); }).join();
    return result;
}

// Returns: whether a thread other than the caller could take the lock.
template <typename Lock>
bool isFree(Lock& lock) {
    return onForeignThread([&] {
        const bool taken = lock.tryLock();
        if (taken) {
            lock.unlock();
        }
        return taken;
    });
}

#endif  // QUELTA_TESTS_SUPPORT_WORKERS_H_
