#ifndef QUELTA_TESTS_SUPPORT_SCRIPTEDCALLS_H_
#define QUELTA_TESTS_SUPPORT_SCRIPTEDCALLS_H_

// Scripts for wrapped functions. A script has the name of a function and a step for each of its
// calls.
//
//     ScriptedCalls writes("write");
//     writes.pass().fail(EINTR).limit(3).fail(ENOSPC);
// While the object exists, each call takes the next step; later calls are real. If a function has
// several scripts, the latest one is used. support/ScriptedLibc.h has the stubs that take the
// steps.
// Safe from any thread; serialised by one spin lock, because a script may replace a mutex.

#include <cerrno>
#include <cstddef>
#include <type_traits>

class ScriptedCalls {
public:
    enum Kind { PASS, FAIL, LIMIT, GIVE };
    struct Step {
        Kind kind = PASS;
        long long value = 0;  // FAIL: errno; LIMIT: bytes; GIVE: the result
        unsigned calls = 0;   // the number of calls that take this step
    };

    // Counts the calls of `function`, which are real unless there are steps.
    explicit ScriptedCalls(const char* function);
    ~ScriptedCalls();
    ScriptedCalls(const ScriptedCalls&) = delete;
    ScriptedCalls& operator=(const ScriptedCalls&) = delete;

    // Each appends a step for the next `calls` calls; at most MAX_STEPS in all. `pass` makes the
    // real call, `limit` makes it with at most `bytes` bytes. `fail` returns -1 (or null) and sets
    // errno; `give` returns `result`, for functions that return an error number.
    ScriptedCalls& pass(unsigned calls = 1) { return add({PASS, 0, calls}); }
    ScriptedCalls& fail(int error, unsigned calls = 1) { return add({FAIL, error, calls}); }
    ScriptedCalls& limit(std::size_t bytes, unsigned calls = 1) {
        return add({LIMIT, static_cast<long long>(bytes), calls});
    }
    ScriptedCalls& give(long long result, unsigned calls = 1) { return add({GIVE, result, calls}); }

    // Returns: the number of calls so far.
    unsigned calls() const;

    // Takes the next step of the latest script for `function`; PASS without one.
    static Step next(const char* function);

private:
    static constexpr std::size_t MAX_STEPS = 16;

    ScriptedCalls& add(Step step);

    const char* const _function;
    ScriptedCalls* _next = nullptr;  // the script created before this one
    Step _steps[MAX_STEPS];
    std::size_t _stepCount = 0;
    unsigned _calls = 0;
};

// The body of a wrapped function: takes the next step. `real` makes the call with at most the
// number of bytes in its argument.
template <typename Real>
auto scriptedCall(const char* function, std::size_t size, Real real) {
    using Result = decltype(real(size));
    const ScriptedCalls::Step step = ScriptedCalls::next(function);
    if (step.kind == ScriptedCalls::FAIL) {
        errno = static_cast<int>(step.value);
        if constexpr (std::is_pointer_v<Result>) {
            return Result(nullptr);
        } else {
            return Result(-1);
        }
    }
    if constexpr (!std::is_pointer_v<Result>) {
        if (step.kind == ScriptedCalls::GIVE) {
            return static_cast<Result>(step.value);
        }
    }
    const auto most = static_cast<std::size_t>(step.value);
    return real(step.kind == ScriptedCalls::LIMIT && most < size ? most : size);
}

// The same for a function without a size argument.
template <typename Real>
auto scriptedCall(const char* function, Real real) {
    return scriptedCall(function, 0, [&real](std::size_t) { return real(); });
}

#endif  // QUELTA_TESTS_SUPPORT_SCRIPTEDCALLS_H_
