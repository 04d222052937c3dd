// Sets of patterns: build time, memory and lookup time by size, for the rule network and other
// matchers.
//
// Each measurement builds its peer in a child process. So the memory is the peer's alone, no peer
// inherits another's heap, and a set that is too large ends only that child. The child compares
// each answer with a slow matcher before it times a lookup. A peer that could not hold a set does
// not get a larger one.

#include <malloc.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <fstream>
#include <map>
#include <memory>

#include "DataSets.h"
#include "Harness.h"
#include "PatternPeer.h"

namespace {

using bench::Meaning;
using bench::PatternSet;
using bench::PatternSetPeer;
using Entry = bench::PeerEntry<PatternSetPeer>;

// A child that takes longer than this is killed: the peer cannot hold the set.
constexpr unsigned CHILD_SECONDS = 60;

// The results that a child sends to its parent.
struct Outcome {
    double buildNs;
    double bytes;     // resident memory that the build added
    double spanNs;    // negative: not measured
    double firstNs;   // the first lookup, with all work that the peer defers until then
    double lookupNs;  // per term, median
    double missNs;    // of the term that has candidates but no match; negative: no such term
    double setResetNs;
    double matches;      // over all terms
    double differences;  // pairs of pattern and term where the usual meaning differs
    char error[160];     // empty on success
};

// Processor time of this process in nanoseconds. Every peer runs in one thread and never waits, so
// this is less affected by other load than wall time.
double now() {
    timespec time{};
    ::clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) * 1e9 + static_cast<double>(time.tv_nsec);
}

double residentBytes() {
    long total = 0;
    long resident = 0;
    std::ifstream("/proc/self/statm") >> total >> resident;
    return static_cast<double>(resident) * static_cast<double>(::sysconf(_SC_PAGESIZE));
}

// The matches of each term under both meanings, counted once per set and shared by all children.
struct Expected {
    std::vector<long> suffixSearch;
    std::vector<long> usual;
    long differences = 0;

    explicit Expected(const PatternSet& set) {
        for (const std::string& term : set.terms) {
            long counts[2] = {0, 0};
            for (const std::string& pattern : set.patterns) {
                const bool here = referenceMatch(Meaning::SUFFIX_SEARCH, pattern, term);
                const bool there = referenceMatch(Meaning::USUAL, pattern, term);
                counts[0] += here ? 1 : 0;
                counts[1] += there ? 1 : 0;
                differences += here != there ? 1 : 0;
            }
            suffixSearch.push_back(counts[0]);
            usual.push_back(counts[1]);
        }
    }

    const std::vector<long>& by(Meaning meaning) const {
        return meaning == Meaning::SUFFIX_SEARCH ? suffixSearch : usual;
    }
};

struct Case {
    PatternSet set;
    std::shared_ptr<const Expected> expected;
};

// Runs `body` over all terms `times` times; returns nanoseconds per term.
template <class Body>
double perTerm(const std::vector<std::string>& terms, std::size_t times, const Body& body) {
    const double start = now();
    for (std::size_t i = 0; i < times; ++i) {
        for (const std::string& term : terms) {
            benchmark::DoNotOptimize(body(term));
        }
    }
    return (now() - start) / static_cast<double>(times * terms.size());
}

// The median of several rounds, each long enough for the resolution of the clock.
template <class Body>
double medianPerTerm(const std::vector<std::string>& terms, const Body& body) {
    constexpr double ROUND_NS = 1e5;
    const std::size_t least = bench::quick() ? 2 : 7;
    const double budget = bench::quick() ? 1e7 : 3e8;
    const double once = perTerm(terms, 1, body) * static_cast<double>(terms.size());
    const std::size_t times = once >= ROUND_NS ? 1 : static_cast<std::size_t>(ROUND_NS / once) + 1;
    std::vector<double> rounds;
    for (const double begin = now(); rounds.size() < least || now() - begin < budget;) {
        rounds.push_back(perTerm(terms, times, body));
    }
    const auto middle = rounds.begin() + static_cast<std::ptrdiff_t>(rounds.size() / 2);
    std::nth_element(rounds.begin(), middle, rounds.end());
    return *middle;
}

std::string check(PatternSetPeer& peer, const Case& what, Meaning meaning, Outcome& out) {
    const std::vector<long>& expected = what.expected->by(meaning);
    for (std::size_t i = 0; i < what.set.terms.size(); ++i) {
        const double start = now();
        const long found = peer.count(what.set.terms[i]);
        out.firstNs = i == 0 ? now() - start : out.firstNs;
        peer.forget(what.set.terms[i]);
        if (found < 0) {
            return "gave up during a lookup";
        }
        if (found != expected[i]) {
            return "WRONG: " + std::to_string(found) + " matches instead of " +
                   std::to_string(expected[i]);
        }
    }
    return "";
}

std::string measure(const Entry& entry, const Case& what, Outcome& out) {
    const std::unique_ptr<PatternSetPeer> peer = entry.make();
    ::malloc_trim(0);  // or the peer would use freed memory that is not counted
    const double before = residentBytes();
    double start = now();
    std::string error = peer->build(what.set.patterns);
    out.buildNs = now() - start;
    out.bytes = std::max(0.0, residentBytes() - before);
    if (!error.empty()) {
        return error;
    }
    const std::string& first = what.set.terms.front();
    start = now();
    const long collected = peer->collect(first);
    out.spanNs = collected < 0 ? -1 : now() - start;
    if (collected >= 0 && collected != what.expected->by(entry.meaning).front()) {
        return "WRONG: collected " + std::to_string(collected);
    }
    peer->forget(first);
    if (error = check(*peer, what, entry.meaning, out); !error.empty()) {
        return error;
    }
    out.lookupNs =
        medianPerTerm(what.set.terms, [&](const std::string& term) { return peer->count(term); });
    out.missNs = -1;
    if (const std::string& miss = what.set.miss; !miss.empty()) {
        const long set = peer->keepsMatches() ? peer->count(first) : 0;
        if (peer->count(miss) != set) {
            return "WRONG: a match where there is none";
        }
        out.missNs =
            medianPerTerm({miss}, [&](const std::string& term) { return peer->count(term); });
    }
    out.setResetNs = -1;
    if (peer->keepsMatches()) {
        out.setResetNs = medianPerTerm(what.set.terms, [&](const std::string& term) {
            const long matches = peer->count(term);
            peer->forget(term);
            return matches;
        });
    }
    for (const long matches : what.expected->by(entry.meaning)) {
        out.matches += static_cast<double>(matches);
    }
    out.differences = static_cast<double>(what.expected->differences);
    return "";
}

// Four fifths of the free memory, so that a huge set fails instead of swapping.
rlim_t memoryLimit() {
    std::ifstream info("/proc/meminfo");
    std::string key;
    rlim_t kilobytes = 0;
    while (info >> key) {
        if (key == "MemAvailable:" && info >> kilobytes) {
            break;
        }
    }
    return kilobytes * 1024 / 5 * 4;
}

[[noreturn]] void child(const Entry& entry, const Case& what, int output) {
    ::alarm(CHILD_SECONDS);
    if (const rlim_t bytes = memoryLimit(); bytes > 0) {
        const rlimit limit{bytes, bytes};
        ::setrlimit(RLIMIT_AS, &limit);
    }
    Outcome outcome{};
    std::string error;
    try {
        error = measure(entry, what, outcome);
    } catch (const std::bad_alloc&) {
        error = "out of memory";
    }
    std::snprintf(outcome.error, sizeof(outcome.error), "%s", error.c_str());
    const bool sent = ::write(output, &outcome, sizeof(outcome)) == sizeof(outcome);
    ::_exit(sent ? 0 : 1);
}

Outcome runChild(const Entry& entry, const Case& what) {
    int ends[2];
    if (::pipe(ends) != 0) {
        bench::fail("no pipe");
    }
    const pid_t pid = ::fork();
    if (pid < 0) {
        bench::fail("no child process");
    }
    if (pid == 0) {
        ::close(ends[0]);
        child(entry, what, ends[1]);
    }
    ::close(ends[1]);
    Outcome outcome{};
    const bool received = ::read(ends[0], &outcome, sizeof(outcome)) == sizeof(outcome);
    ::close(ends[0]);
    int status = 0;
    ::waitpid(pid, &status, 0);
    if (!received) {
        const bool late = WIFSIGNALED(status) && WTERMSIG(status) == SIGALRM;
        const std::string reason = late ? "not done after " + std::to_string(CHILD_SECONDS) + " s"
                                        : "ended without an answer";
        std::snprintf(outcome.error, sizeof(outcome.error), "%s", reason.c_str());
    }
    return outcome;
}

// The smallest set that a peer could not hold, and why.
struct Refusal {
    std::size_t size;
    std::string reason;
};

// By set and peer.
std::map<std::string, Refusal>& refusals() {
    static std::map<std::string, Refusal> list;
    return list;
}

void run(benchmark::State& state, const Entry& entry, const Case& what) {
    const std::string key = what.set.name + '/' + entry.name;
    const std::size_t size = what.set.patterns.size();
    const auto known = refusals().find(key);
    if (known != refusals().end() && known->second.size <= size) {
        state.SkipWithError(known->second.reason.c_str());
        return;
    }
    for (auto _ : state) {
        const Outcome outcome = runChild(entry, what);
        if (std::strncmp(outcome.error, "WRONG", 5) == 0) {
            bench::fail(key + ": " + outcome.error);
        }
        if (outcome.error[0] != '\0') {
            const std::string reason = outcome.error;
            refusals()[key] = {size, reason + " with " + std::to_string(size) + " patterns"};
            state.SkipWithError(refusals()[key].reason.c_str());
            return;
        }
        state.SetIterationTime(outcome.buildNs / 1e9);
        state.counters["bytes"] = outcome.bytes;
        state.counters["first_ns"] = outcome.firstNs;
        state.counters["lookup_ns"] = outcome.lookupNs;
        state.counters["matches"] = outcome.matches;
        state.counters["differences"] = outcome.differences;
        if (outcome.spanNs >= 0) {
            state.counters["span_ns"] = outcome.spanNs;
        }
        if (outcome.missNs >= 0) {
            state.counters["miss_ns"] = outcome.missNs;
        }
        if (outcome.setResetNs >= 0) {
            state.counters["set_reset_ns"] = outcome.setResetNs;
        }
    }
}

void add(PatternSet&& set) {
    bench::progress("checking answers for " + set.name);
    const auto what = std::make_shared<Case>(Case{std::move(set), nullptr});
    what->expected = std::make_shared<Expected>(what->set);
    const bool large = what->set.patterns.size() >= 10000;
    for (const Entry& entry : bench::peerList<PatternSetPeer>()) {
        bench::add("set of " + what->set.name, entry.name,
                   [&entry, what](benchmark::State& state) { run(state, entry, *what); })
            ->Arg(static_cast<std::int64_t>(what->set.patterns.size()))
            ->Iterations(1)
            ->Repetitions(bench::quick() ? 1
                          : large        ? 3
                                         : 5)
            ->UseManualTime();
    }
}

const bench::Suite suite([] {
    const std::vector<std::size_t> sizes = bench::quick()
                                               ? std::vector<std::size_t>{1000, 3000}
                                               : std::vector<std::size_t>{1000, 10000, 100000};
    for (const std::size_t size : sizes) {
        add(bench::programSet(bench::PROGRAM_DRAWS, size));
    }
    if (!bench::quick()) {
        add(bench::programSet(bench::PROGRAM_DRAWS, bench::PROGRAM_DRAWS));
    }
    for (const std::size_t size : {1000U, 3000U, 10000U, 30000U}) {
        if (!bench::quick() || size <= 1000) {
            add(bench::urlSet(size));
        }
    }
    add(bench::shortTermSet(bench::quick() ? 500 : 5000, 1000));
});

}  // namespace
