// This file is not instrumented by a sanitizer. The calls of a statically linked sanitizer runtime
// are wrapped too, and it makes some of them before instrumented code can run.

#include "support/ScriptedLibc.h"

#include <fcntl.h>

#include <atomic>
#include <cstring>

namespace {

constinit std::atomic_flag locked{};
constinit ScriptedCalls* latestScript = nullptr;
constinit thread_local RecordedCalls* recorder = nullptr;

struct Guard {
    Guard() {
        while (locked.test_and_set(std::memory_order_acquire)) {}
    }
    ~Guard() { locked.clear(std::memory_order_release); }
};

std::string textOf(const char* argument) {
    return argument;
}
struct Octal {
    mode_t mode;
};
std::string textOf(Octal octal) {
    char text[16];
    std::snprintf(text, sizeof text, "0%o", octal.mode);
    return text;
}
template <typename Number>
std::string textOf(Number number) {
    return std::to_string(number);
}

}  // namespace

ScriptedCalls::ScriptedCalls(const char* function) : _function(function) {
    const Guard guard;
    _next = latestScript;
    latestScript = this;
}

ScriptedCalls::~ScriptedCalls() {
    const Guard guard;
    ScriptedCalls** link = &latestScript;
    while (*link != this) {
        link = &(*link)->_next;
    }
    *link = _next;
}

ScriptedCalls& ScriptedCalls::add(Step step) {
    const Guard guard;
    if (_stepCount == MAX_STEPS) {
        __builtin_trap();
    }
    _steps[_stepCount++] = step;
    return *this;
}

unsigned ScriptedCalls::calls() const {
    const Guard guard;
    return _calls;
}

ScriptedCalls::Step ScriptedCalls::next(const char* function) {
    const Guard guard;
    ScriptedCalls* script = latestScript;
    while (script != nullptr && std::strcmp(script->_function, function) != 0) {
        script = script->_next;
    }
    if (script == nullptr) {
        return {};
    }
    unsigned call = script->_calls++;
    for (std::size_t i = 0; i < script->_stepCount; ++i) {
        if (call < script->_steps[i].calls) {
            return script->_steps[i];
        }
        call -= script->_steps[i].calls;
    }
    return {};
}

RecordedCalls::RecordedCalls() {
    recorder = this;
}

RecordedCalls::~RecordedCalls() {
    recorder = nullptr;
}

// Recording is off inside, because it may itself call wrapped functions.
template <typename... Arguments>
void record(const char* function, Arguments... arguments) {
    RecordedCalls* const current = recorder;
    if (current == nullptr) {
        return;
    }
    recorder = nullptr;
    std::string call = function;
    ((call += ' ' + textOf(arguments)), ...);
    current->_calls.push_back(call);
    recorder = current;
}

#define DEFINE_SLOT(result, name, parameters, arguments, recorded) \
    constinit std::function<result parameters>* name = nullptr;

namespace replacement {
SCRIPTED_LIBC(DEFINE_SLOT, DEFINE_SLOT, DEFINE_SLOT)
}

// The first argument of record, then the others, if any.
#define NAMED(name, ...) (#name __VA_OPT__(, ) __VA_ARGS__)
#define RECORDED(...) __VA_ARGS__

#define STUB_BODY(name, arguments, recorded, declaredSize, ...)                        \
    record NAMED(name, RECORDED recorded);                                             \
    return scriptedCall(#name, declaredSize, [&]([[maybe_unused]] std::size_t limit) { \
        __VA_ARGS__                                                                    \
        return replacement::name != nullptr ? (*replacement::name)arguments            \
                                            : __real_##name arguments;                 \
    });

#define DEFINE_STUB(result, name, parameters, arguments, recorded) \
    __attribute__((weak)) result __wrap_##name parameters;         \
    result __wrap_##name parameters {                              \
        STUB_BODY(name, arguments, recorded, 0)                    \
    }
#define DEFINE_TRANSFER(result, name, parameters, arguments, recorded) \
    __attribute__((weak)) result __wrap_##name parameters;             \
    result __wrap_##name parameters {                                  \
        STUB_BODY(name, arguments, recorded, size, size = limit;)      \
    }
#define DEFINE_NOTHING(result, name, parameters, arguments, recorded)

extern "C" {
SCRIPTED_LIBC(DEFINE_STUB, DEFINE_TRANSFER, DEFINE_NOTHING)

__attribute__((weak)) int __wrap_open(const char* path, int flags, ...);
int __wrap_open(const char* path, int flags, ...) {
    std::va_list args;
    va_start(args, flags);
    const mode_t mode = (flags & O_CREAT) != 0 ? va_arg(args, mode_t) : 0;
    va_end(args);
    STUB_BODY(open, (path, flags, mode), (path, flags, Octal{mode}), 0)
}

// For the commands that this project uses, which take an int or nothing.
__attribute__((weak)) int __wrap_fcntl(int fd, int command, ...);
int __wrap_fcntl(int fd, int command, ...) {
    std::va_list args;
    va_start(args, command);
    const int value = command == F_GETFD || command == F_GETFL ? 0 : va_arg(args, int);
    va_end(args);
    STUB_BODY(fcntl, (fd, command, value), (command), 0)
}
}
