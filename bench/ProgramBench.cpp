// The program Rete from start to exit: wall time and peak memory, compared with the cost of its
// random draws alone. The printed counts are checked against a slow count first.

#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <filesystem>
#include <fstream>

#include "DataSets.h"
#include "Harness.h"
#include "Reference.h"
#include "services/pipeline/indexprocessor/Rete.h"

namespace {

namespace fs = std::filesystem;

// An installation directory with a logging configuration, for as long as the benchmark runs.
class Home {
public:
    Home() : _path(fs::temp_directory_path() / ("quelta-bench-" + std::to_string(::getpid()))) {
        fs::create_directories(_path / "etc");
        std::ofstream(_path / "etc/log-cmdline.cfg") << "rootCategory=WARN\n";
        ::setenv("QUELTA_HOME", _path.c_str(), 1);
    }
    Home(const Home&) = delete;
    Home& operator=(const Home&) = delete;
    ~Home() {
        std::error_code ignored;
        fs::remove_all(_path, ignored);
    }

private:
    fs::path _path;
};

struct Run {
    std::string output;
    double seconds = 0;
    double cpuSeconds = 0;  // in user and system mode
    double peakBytes = 0;
};

// Starts the program with its output in a pipe and waits for its end.
Run runProgram() {
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0) {
        bench::fail("no pipe");
    }
    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_adddup2(&actions, ends[1], 1);
    const char* const arguments[] = {QUELTA_PROGRAM, nullptr};
    const auto start = std::chrono::steady_clock::now();
    pid_t pid = 0;
    if (::posix_spawn(&pid, QUELTA_PROGRAM, &actions, nullptr, const_cast<char* const*>(arguments),
                      environ) != 0) {
        bench::fail("cannot start " QUELTA_PROGRAM);
    }
    ::close(ends[1]);
    Run run;
    char buffer[4096];
    for (ssize_t got = 0; (got = ::read(ends[0], buffer, sizeof(buffer))) > 0;) {
        run.output.append(buffer, static_cast<std::size_t>(got));
    }
    ::close(ends[0]);
    int status = 0;
    rusage usage{};
    ::wait4(pid, &status, 0, &usage);
    run.seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    ::posix_spawn_file_actions_destroy(&actions);
    if (status != 0) {
        bench::fail("the program failed: " + run.output);
    }
    for (const timeval& time : {usage.ru_utime, usage.ru_stime}) {
        run.cpuSeconds +=
            static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
    }
    run.peakBytes = static_cast<double>(usage.ru_maxrss) * 1024;
    return run;
}

// The expected report lines, up to the seconds.
std::string expectedReport() {
    const std::vector<std::string> patterns = bench::programPatterns(bench::PROGRAM_DRAWS);
    std::size_t matches = 0;
    for (const std::string& pattern : patterns) {
        matches += referenceMatch(bench::Meaning::SUFFIX_SEARCH, pattern, bench::PROGRAM_TERM);
    }
    return std::to_string(patterns.size()) + " conditions\n[]\n" + std::to_string(matches) +
           " implications\nTIME = ";
}

void runProcess(benchmark::State& state, double patterns) {
    for (auto _ : state) {
        const Run run = runProgram();
        state.SetIterationTime(run.seconds);
        state.counters["cpu_ns"] = run.cpuSeconds * 1e9;
        state.counters["peak_bytes"] = run.peakBytes;
        state.counters["pair_bytes"] =
            patterns * static_cast<double>(sizeof(std::pair<WildcardMatcher, Conditional*>));
    }
}

const bench::Suite suite([] {
    static const Home home;
    bench::progress("checking the program's output");
    const std::string expected = expectedReport();
    const std::string output = runProgram().output;
    if (output.find(expected) == std::string::npos) {
        bench::fail("the program printed\n" + output + "instead of\n" + expected);
    }
    const double patterns = std::stod(expected);
    const int repetitions = bench::quick() ? 1 : 7;
    bench::add("whole process", "Rete",
               [patterns](benchmark::State& state) { runProcess(state, patterns); })
        ->Iterations(1)
        ->Repetitions(repetitions)
        ->UseManualTime();
    bench::add("whole process", "random() draws alone",
               [](benchmark::State& state) {
                   for (auto _ : state) {
                       benchmark::DoNotOptimize(bench::programDraws(bench::PROGRAM_DRAWS));
                   }
               })
        ->Iterations(1)
        ->Repetitions(repetitions)
        ->UseRealTime();
});

}  // namespace
