#include "Harness.h"

#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <vector>

namespace bench {
namespace {

std::vector<void (*)()>& suites() {
    static std::vector<void (*)()> list;
    return list;
}

std::string programName;

}  // namespace

bool quick() {
    const char* value = ::getenv("QUELTA_BENCH_QUICK");
    return value != nullptr && *value != '\0' && *value != '0';
}

Suite::Suite(void (*registerAll)()) {
    suites().push_back(registerAll);
}

benchmark::internal::Benchmark* add(const std::string& topic, const std::string& peer,
                                    std::function<void(benchmark::State&)> body) {
    const std::string name = topic + '/' + peer;
    return benchmark::RegisterBenchmark(name.c_str(),
                                        [name, body = std::move(body)](benchmark::State& state) {
                                            if (state.thread_index() == 0) {
                                                progress(name);
                                            }
                                            body(state);
                                        });
}

void progress(const std::string& what) {
    static std::string last;
    static const bool terminal = ::isatty(2) == 1;
    if (what == last) {
        return;
    }
    last = what;
    if (terminal) {
        std::fprintf(stderr, "\r\033[K%s: %s", programName.c_str(), what.c_str());
    } else {
        std::fprintf(stderr, "%s: %s\n", programName.c_str(), what.c_str());
    }
}

void fail(const std::string& message) {
    std::fprintf(stderr, "%s: %s\n", programName.c_str(), message.c_str());
    std::exit(1);
}

}  // namespace bench

// The defaults precede the given flags, because the last value of a flag counts.
int main(int argc, char** argv) {
    bench::programName = argv[0];
    if (const std::size_t slash = bench::programName.rfind('/'); slash != std::string::npos) {
        bench::programName.erase(0, slash + 1);
    }
    std::vector<std::string> flags = {argv[0], "--benchmark_enable_random_interleaving=true",
                                      "--benchmark_display_aggregates_only=true"};
    flags.push_back(bench::quick() ? "--benchmark_repetitions=1" : "--benchmark_repetitions=7");
    flags.push_back(bench::quick() ? "--benchmark_min_time=0.01" : "--benchmark_min_time=0.1");
    flags.insert(flags.end(), argv + 1, argv + argc);
    std::vector<char*> pointers;
    for (std::string& flag : flags) {
        pointers.push_back(flag.data());
    }
    int count = static_cast<int>(pointers.size());
    benchmark::Initialize(&count, pointers.data());
    if (benchmark::ReportUnrecognizedArguments(count, pointers.data())) {
        return 2;
    }
    benchmark::AddCustomContext("peers that are not installed", QUELTA_BENCH_MISSING);
    for (void (*registerAll)() : bench::suites()) {
        registerAll();
    }
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
