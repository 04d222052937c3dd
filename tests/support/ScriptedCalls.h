#ifndef QUELTA_TESTS_SUPPORT_SCRIPTEDCALLS_H_
#define QUELTA_TESTS_SUPPORT_SCRIPTEDCALLS_H_

// System calls that fail when a test says so: by the function's name, at its n-th call.
//
// The test program names the functions (WRAP write ... in its quelta_test) and defines, for each,
//     extern "C" ssize_t __real_write(int, const void*, size_t);
//     extern "C" ssize_t __wrap_write(int fd, const void* buf, size_t size) {
//         return scriptedCall("write", size,
//                             [&](size_t limit) { return __real_write(fd, buf, limit); });
//     }
// A case then writes the script; while the object lives, each call takes the next step, and calls
// behind the last step are real ones:
//     ScriptedCalls writes("write");
//     writes.pass().fail(EINTR).limit(3).fail(ENOSPC);
// Only calls from the program's own objects are seen, not those within the C library.
// Safe from any thread; serialised by one spin lock, because a script may stand in for a mutex.

#include <atomic>
#include <cerrno>
#include <cstddef>
#include <cstring>
#include <type_traits>
#include <vector>

class ScriptedCalls {
public:
    enum Kind { PASS, FAIL, LIMIT, GIVE };
    struct Step {
        Kind kind = PASS;
        long long value = 0;  // errno, the most bytes, or the result
    };

    // Starts counting the calls of a function, which is real until there is a script.
    explicit ScriptedCalls(const char* function) : _function(function) {
        const Guard guard;
        _next = first();
        first() = this;
    }
    ~ScriptedCalls() {
        const Guard guard;
        ScriptedCalls** link = &first();
        while (*link != this) {
            link = &(*link)->_next;
        }
        *link = _next;
    }
    ScriptedCalls(const ScriptedCalls&) = delete;
    ScriptedCalls& operator=(const ScriptedCalls&) = delete;

    // Steps of the script, in the order of the calls. All but `pass` and `limit` leave the real
    // function alone. `fail` returns -1 (or null) with errno; `give` returns a result as it is,
    // which suits functions that return their error.
    ScriptedCalls& pass(unsigned calls = 1) { return add({PASS, 0}, calls); }
    ScriptedCalls& fail(int error, unsigned calls = 1) { return add({FAIL, error}, calls); }
    ScriptedCalls& limit(std::size_t bytes, unsigned calls = 1) {
        return add({LIMIT, static_cast<long long>(bytes)}, calls);
    }
    ScriptedCalls& give(long long result, unsigned calls = 1) { return add({GIVE, result}, calls); }

    // The calls so far.
    unsigned calls() const {
        const Guard guard;
        return _calls;
    }

    // The next step of the latest script for a function; a real call when there is none.
    static Step next(const char* function) {
        const Guard guard;
        for (ScriptedCalls* script = first(); script != nullptr; script = script->_next) {
            if (std::strcmp(script->_function, function) == 0) {
                const unsigned call = script->_calls++;
                return call < script->_steps.size() ? script->_steps[call] : Step();
            }
        }
        return Step();
    }

private:
    struct Guard {
        Guard() {
            while (lock().test_and_set(std::memory_order_acquire)) {}
        }
        ~Guard() { lock().clear(std::memory_order_release); }
        static std::atomic_flag& lock() {
            static constinit std::atomic_flag flag;
            return flag;
        }
    };

    // The scripts that live, latest first.
    static ScriptedCalls*& first() {
        static constinit ScriptedCalls* script = nullptr;
        return script;
    }

    ScriptedCalls& add(Step step, unsigned calls) {
        // Built outside the lock: an allocation may itself be scripted.
        std::vector<Step> steps = _steps;
        steps.insert(steps.end(), calls, step);
        const Guard guard;
        _steps.swap(steps);
        return *this;
    }

    const char* const _function;
    ScriptedCalls* _next = nullptr;
    std::vector<Step> _steps;
    unsigned _calls = 0;
};

// What a wrapped function does: its script's next step. `real` makes the call with at most as many
// bytes as it is told.
template <typename Real>
auto scriptedCall(const char* function, std::size_t size, Real real) {
    using Result = decltype(real(size));
    const ScriptedCalls::Step step = ScriptedCalls::next(function);
    switch (step.kind) {
        case ScriptedCalls::FAIL:
            errno = static_cast<int>(step.value);
            if constexpr (std::is_pointer_v<Result>) {
                return Result(nullptr);
            } else {
                return Result(-1);
            }
        case ScriptedCalls::LIMIT:
            return real(size < static_cast<std::size_t>(step.value)
                            ? size
                            : static_cast<std::size_t>(step.value));
        case ScriptedCalls::GIVE:
            if constexpr (!std::is_pointer_v<Result>) {
                return static_cast<Result>(step.value);
            }
            break;
        case ScriptedCalls::PASS:
            break;
    }
    return real(size);
}

// The same for a function without a size.
template <typename Real>
auto scriptedCall(const char* function, Real real) {
    return scriptedCall(function, 0, [&real](std::size_t) { return real(); });
}

#endif  // QUELTA_TESTS_SUPPORT_SCRIPTEDCALLS_H_
