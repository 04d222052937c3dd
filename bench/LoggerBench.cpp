// Log lines: the logger compared with other logging libraries and with a bare write of the same
// bytes. Each has a rotating file that holds every line when the call returns. Before a peer is
// timed, the lines of one, four and sixteen threads are read back and checked.

#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <regex>
#include <thread>

#include "Harness.h"
#include "LogPeer.h"
#include "util/LogFormat.h"
#include "util/LogMsgMetadata.h"
#include "util/Logger.h"

namespace {

using bench::Layout;
using bench::LogPeer;
namespace fs = std::filesystem;

// Enough lines for at least one rotation with either layout.
constexpr std::size_t LINES = 720000;
constexpr std::size_t QUICK_LINES = 24000;
constexpr std::size_t BATCH = 1000;
constexpr int THREADS[] = {1, 4, 16};

// The log files of a run; deleted at the end. QUELTA_BENCH_DIR chooses another file system.
class WorkDirectory {
public:
    WorkDirectory() {
        const char* chosen = ::getenv("QUELTA_BENCH_DIR");
        const fs::path base = chosen != nullptr ? fs::path(chosen) : fs::temp_directory_path();
        _path = base / ("quelta-logbench-" + std::to_string(::getpid()));
        fs::create_directories(_path);
    }
    WorkDirectory(const WorkDirectory&) = delete;
    WorkDirectory& operator=(const WorkDirectory&) = delete;
    ~WorkDirectory() {
        std::error_code ignored;
        fs::remove_all(_path, ignored);
    }

    std::string of(const std::string& peer, Layout layout) const {
        const fs::path directory = _path / (peer + (layout == Layout::PLAIN ? "-plain" : "-date"));
        fs::create_directories(directory);
        return directory;
    }

private:
    fs::path _path;
};

const WorkDirectory& workDirectory() {
    static const WorkDirectory directory;
    return directory;
}

const char* nameOf(Layout layout) {
    return layout == Layout::PLAIN ? "plain" : "date";
}

void removeBackups(const std::string& directory) {
    for (const auto& entry : fs::recursive_directory_iterator(directory)) {
        const std::string name = entry.path().filename();
        if (entry.is_regular_file() && name.rfind("bench.log.", 0) == 0) {
            fs::remove(entry.path());
        }
    }
}

// The lines of the file after its first `from` bytes.
std::vector<std::string> linesAfter(const std::string& file, std::uintmax_t from) {
    std::ifstream in(file);
    in.seekg(static_cast<std::streamoff>(from));
    std::vector<std::string> out;
    for (std::string line; std::getline(in, line);) {
        out.push_back(line);
    }
    return out;
}

// Checks that every line is whole and has the form of the layout.
void checkLines(const std::string& peer, Layout layout, const std::vector<std::string>& lines,
                std::size_t expected) {
    if (lines.size() != expected) {
        bench::fail(peer + " wrote " + std::to_string(lines.size()) + " lines instead of " +
                    std::to_string(expected));
    }
    const std::string message = "request [0-9]+ of client 10\\.0\\.0\\.7 served in 42 ms";
    // Level names may be in lower case and Boost.Log prints microseconds.
    const std::string date =
        "[0-9]{2}-[0-9]{2}-20[0-9]{2} [0-9]{2}:[0-9]{2}:[0-9]{2}\\.[0-9]{3,6} "
        "(INFO|info)  bench - ";
    // The plain layout does not print the category.
    const std::regex form((layout == Layout::DATE ? date : "") + message);
    for (const std::string& line : lines) {
        if (!std::regex_match(line, form)) {
            bench::fail(peer + " wrote \"" + line + '"');
        }
    }
}

void writeFrom(LogPeer& peer, int threads, std::size_t linesEach) {
    std::vector<std::thread> writers;
    for (int i = 0; i < threads; ++i) {
        writers.emplace_back([&peer, linesEach] { peer.lines(1000000, linesEach); });
    }
    for (std::thread& writer : writers) {
        writer.join();
    }
}

void check(const bench::LogPeerEntry& entry, Layout layout) {
    const std::string directory = workDirectory().of(entry.name, layout);
    const std::string file = directory + "/bench.log";
    const auto peer = entry.make();
    peer->open(directory, layout);
    for (const int threads : THREADS) {
        const std::uintmax_t before = fs::exists(file) ? fs::file_size(file) : 0;
        writeFrom(*peer, threads, 500);
        checkLines(entry.name, layout, linesAfter(file, before),
                   static_cast<std::size_t>(threads) * 500);
    }
    peer->suppressed(3);
    const std::uintmax_t before = fs::file_size(file);
    peer->suppressed(3);
    if (fs::file_size(file) != before) {
        bench::fail(entry.name + " writes suppressed lines");
    }
    peer->close();
}

// One peer object per run, constructed by the first thread while the others wait at the start of
// the loop.
void runLines(benchmark::State& state, const bench::LogPeerEntry& entry, Layout layout) {
    static std::unique_ptr<LogPeer> peer;
    const bool first = state.thread_index() == 0;
    if (first) {
        const std::string directory = workDirectory().of(entry.name, layout);
        removeBackups(directory);
        peer = entry.make();
        peer->open(directory, layout);
    }
    while (state.KeepRunningBatch(BATCH)) {
        peer->lines(1000000, BATCH);
    }
    if (first) {
        peer->close();
        peer.reset();
    }
}

void runSuppressed(benchmark::State& state, const bench::LogPeerEntry& entry) {
    const auto peer = entry.make();
    peer->open(workDirectory().of(entry.name, Layout::DATE), Layout::DATE);
    while (state.KeepRunningBatch(BATCH)) {
        peer->suppressed(BATCH);
    }
    peer->close();
}

// The layout alone, without the file, to show its share of the time for a line.
void runLayout(benchmark::State& state, const char* pattern) {
    const LogFormat layout(pattern);
    const Logger logger("bench");
    const LogMsgMetadata metadata(&logger, INFO);
    const std::string message = "request 1234567 of client 10.0.0.7 served in 42 ms";
    std::string line;
    for (auto _ : state) {
        line.clear();
        layout.apply(line, metadata, message);
        benchmark::DoNotOptimize(line.data());
    }
}

void addPeer(const bench::LogPeerEntry& entry) {
    const std::size_t total = bench::quick() ? QUICK_LINES : LINES;
    for (const Layout layout : {Layout::PLAIN, Layout::DATE}) {
        bench::progress("checking " + entry.name);
        check(entry, layout);
        for (const int threads : THREADS) {
            bench::add(
                std::string("log line ") + nameOf(layout), entry.name,
                [&entry, layout](benchmark::State& state) { runLines(state, entry, layout); })
                ->Iterations(static_cast<std::int64_t>(total) / threads)
                ->Threads(threads)
                ->UseRealTime();
        }
    }
    if (entry.make()->suppressed(0)) {
        bench::add("suppressed message", entry.name,
                   [&entry](benchmark::State& state) { runSuppressed(state, entry); });
    }
}

const bench::Suite suite([] {
    for (const bench::LogPeerEntry& entry : bench::logPeers()) {
        addPeer(entry);
    }
    for (const auto& [name, pattern] : {std::pair{"plain", "%m%n"},
                                        {"date", "%d{%m-%d-%Y %H:%M:%S.%l} %-5p %c - %m%n"},
                                        {"basic", "%R %p %c %m%n"}}) {
        bench::add("layout only", name,
                   [pattern = pattern](benchmark::State& state) { runLayout(state, pattern); });
    }
});

}  // namespace
