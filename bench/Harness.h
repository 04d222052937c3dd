#ifndef QUELTA_BENCH_HARNESS_H_
#define QUELTA_BENCH_HARNESS_H_

// What every benchmark program shares: main, the default flags and the progress line on standard
// error.
//
// A program passes its registration function to a static Suite; main parses the flags and calls it.
// The function calls add() once for each topic (what is measured) and peer (the implementation that
// is measured), so that bench/report.py can compare the peers of one topic:
//
//     const bench::Suite suite([] {
//         bench::add("single match", "fnmatch", [](benchmark::State& state) { ... })->Arg(100);
//     });
//
// Repetitions of all peers of a program are interleaved at random, so that a short slowdown of the
// machine does not affect only one of them.
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
// with Threads(). A peer that cannot run calls State::SkipWithError with the reason.
benchmark::internal::Benchmark* add(const std::string& topic, const std::string& peer,
                                    std::function<void(benchmark::State&)> body);

// Prints the name of the running benchmark on standard error.
void progress(const std::string& what);

// Ends the program with a message, because timing a wrong result is useless.
[[noreturn]] void fail(const std::string& message);

}  // namespace bench

#endif  // QUELTA_BENCH_HARNESS_H_
