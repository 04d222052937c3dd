// A program's own class Mutex, whose functions have the names of the library's.
#include <cstdio>

class Mutex {
public:
    void lock();
    void unlock();
};

void Mutex::lock() {
    std::puts("lock of the program");
}

void Mutex::unlock() {
    std::puts("unlock of the program");
}

void useOwnClass();
void useOwnClass() {
    Mutex mutex;
    mutex.lock();
    mutex.unlock();
}
