#include "Harness.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <sstream>
#include <vector>

namespace bench {
namespace {

std::vector<void (*)()>& suites() {
    static std::vector<void (*)()> list;
    return list;
}

std::string programName;

// The CSV fields are names and numbers; only notes may need the quotes.
std::string quoted(const std::string& text) {
    std::string out = "\"";
    for (const char c : text) {
        out += c == '"' ? '\'' : c == '\n' ? ' ' : c;
    }
    return out + '"';
}

// One row per number that was measured; the medians are taken by the report.
class Rows {
public:
    Rows() {
        const char* path = ::getenv("QUELTA_BENCH_CSV");
        if (path == nullptr || *path == '\0') {
            return;
        }
        _file = std::fopen(path, "a");
        if (_file == nullptr) {
            fail(std::string("cannot write ") + path);
        }
        if (std::ftell(_file) == 0) {
            std::fputs("program,topic,peer,size,threads,repetition,metric,value,note\n", _file);
        }
    }
    Rows(const Rows&) = delete;
    Rows& operator=(const Rows&) = delete;
    ~Rows() {
        if (_file != nullptr) {
            std::fclose(_file);
        }
    }

    // `where` is "topic,peer,size,threads,repetition".
    void write(const std::string& where, const std::string& metric, double value,
               const std::string& note) {
        if (_file != nullptr) {
            std::fprintf(_file, "%s,%s,%s,%.10g,%s\n", programName.c_str(), where.c_str(),
                         metric.c_str(), value, note.empty() ? "" : quoted(note).c_str());
            std::fflush(_file);
        }
    }

private:
    std::FILE* _file = nullptr;
};

Rows& rows() {
    static Rows instance;
    return instance;
}

double median(std::vector<double> values) {
    std::sort(values.begin(), values.end());
    const std::size_t half = values.size() / 2;
    return values.size() % 2 == 1 ? values[half] : (values[half - 1] + values[half]) / 2;
}

// Writes every repetition to the CSV and the median of each benchmark to standard output.
class Reporter : public benchmark::BenchmarkReporter {
public:
    bool ReportContext(const Context&) override { return true; }

    void ReportRuns(const std::vector<Run>& runs) override {
        std::map<std::string, std::vector<double>> values;
        for (const Run& run : runs) {
            if (run.run_type != Run::RT_Iteration) {
                continue;
            }
            const std::string where = place(run);
            if (run.error_occurred) {
                rows().write(where, "left out", 0, run.error_message);
                std::printf("%-58s left out: %s\n", run.benchmark_name().c_str(),
                            run.error_message.c_str());
                break;
            }
            const double unit = 1e9 / benchmark::GetTimeUnitMultiplier(run.time_unit);
            record(values, where, "time_ns", run.GetAdjustedRealTime() * unit);
            if (run.threads == 1 && run.run_name.time_type != "manual_time") {
                record(values, where, "cpu_ns", run.GetAdjustedCPUTime() * unit);
            }
            for (const auto& [name, counter] : run.counters) {
                record(values, where, name, counter.value);
            }
        }
        if (!values.empty()) {
            print(runs.front().benchmark_name(), values);
        }
    }

private:
    static std::string place(const Run& run) {
        std::string topic = run.run_name.function_name;
        std::string peer = "quelta";
        if (const std::size_t slash = topic.find('/'); slash != std::string::npos) {
            peer = topic.substr(slash + 1);
            topic.resize(slash);
        }
        return topic + ',' + peer + ',' + run.run_name.args + ',' + std::to_string(run.threads) +
               ',' + std::to_string(run.repetition_index);
    }

    static void record(std::map<std::string, std::vector<double>>& values, const std::string& where,
                       const std::string& metric, double value) {
        rows().write(where, metric, value, "");
        values[metric].push_back(value);
    }

    static void print(const std::string& name,
                      const std::map<std::string, std::vector<double>>& values) {
        std::printf("%-58s", name.c_str());
        for (const auto& [metric, list] : values) {
            std::printf("  %s %.6g", metric.c_str(), median(list));
        }
        std::printf("\n");
        std::fflush(stdout);
    }
};

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

void leaveOut(const std::string& topic, const std::string& peer, const std::string& reason) {
    rows().write(topic + ',' + peer + ",,1,0", "left out", 0, reason);
    std::fprintf(stderr, "%s: %s: left out: %s\n", programName.c_str(), peer.c_str(),
                 reason.c_str());
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

// The defaults of a run stand before the given flags, so that those win.
int main(int argc, char** argv) {
    bench::programName = argv[0];
    if (const std::size_t slash = bench::programName.rfind('/'); slash != std::string::npos) {
        bench::programName.erase(0, slash + 1);
    }
    std::vector<std::string> flags = {argv[0], "--benchmark_enable_random_interleaving=true"};
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
    // The peers that were not there to build with, from the build.
    std::istringstream missing(QUELTA_BENCH_MISSING);
    for (std::string peer; missing >> peer;) {
        bench::leaveOut("all", peer, "not installed");
    }
    for (void (*registerAll)() : bench::suites()) {
        registerAll();
    }
    bench::Reporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    benchmark::Shutdown();
    return 0;
}
