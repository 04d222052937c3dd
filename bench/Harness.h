#ifndef QUELTA_BENCH_HARNESS_H_
#define QUELTA_BENCH_HARNESS_H_

// The frame of every benchmark program: its main, the defaults of a run and the progress line on
// standard error.
//
// A program hands its registering function to a static Suite; main parses the flags and calls it.
// The function calls add() once for each topic ("what is measured") and peer ("by whom"), so that
// bench/report.py can compare the peers of one topic:
//
//     const bench::Suite suite([] {
//         bench::add("single match", "fnmatch", [](benchmark::State& state) { ... })->Arg(100);
//     });
//
// Repetitions of all peers of a program are interleaved at random, so that a slow moment of the
// machine does not affect one of them alone.
//
// Not thread-safe; registration and reporting run in the main thread.

#include <benchmark/benchmark.h>

#include <functional>
#include <string>

namespace bench {

// True for the smoke test (QUELTA_BENCH_QUICK=1): smallest sizes, one short repetition.
bool quick();

// Registers `registerAll` to be called by main, after the flags have been read.
class Suite {
public:
    explicit Suite(void (*registerAll)());
};

// Adds the benchmark "topic/peer". Times are in nanoseconds; sizes are given with Arg(), threads
// with Threads(). A peer that takes no part says why with State::SkipWithError.
benchmark::internal::Benchmark* add(const std::string& topic, const std::string& peer,
                                    std::function<void(benchmark::State&)> body);

// Prints on standard error what runs now.
void progress(const std::string& what);

// Ends the program with a message: a wrong result must not be timed.
[[noreturn]] void fail(const std::string& message);

}  // namespace bench

#endif  // QUELTA_BENCH_HARNESS_H_
