#ifndef QUELTA_TESTS_SUPPORT_WORKERS_H_
#define QUELTA_TESTS_SUPPORT_WORKERS_H_

// Threads that run a function, for tests.

#include <functional>
#include <thread>
#include <utility>

#include "util/Thread.h"

// The process's one object for its main thread, made on first use.
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

// Runs `body` on a worker and waits for its end.
inline void runWorker(const char* name, std::function<void()> body) {
    Worker worker(name, std::move(body));
    worker.go();
    worker.join();
}

// Runs `body` on a thread that no Thread stands for, waits for its end and gives its result.
template <typename Body>
auto onForeignThread(Body body) {
    decltype(body()) result{};
    std::thread([&] { result = body(); }).join();
    return result;
}

#endif  // QUELTA_TESTS_SUPPORT_WORKERS_H_
