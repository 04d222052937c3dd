// Starts and joins a thread, for which the library locks a Mutex. The program has such a class too:
// the library must use its own.
#include <cstdio>

#include "util/Thread.h"

void useOwnClass();

namespace {

class Worker : public Thread {
public:
    Worker() : Thread("worker") {}
    void main() override { std::puts("worker"); }
};

}  // namespace

int main() {
    useOwnClass();
    Thread mainThread;
    Worker worker;
    worker.go();
    worker.join();
    return 0;
}
