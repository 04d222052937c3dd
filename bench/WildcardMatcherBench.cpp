// One pattern against one text: the matcher compared with the libraries and with handwritten code
// for the form of the pattern. Each answer is checked against a slow matcher before it is timed.

#include "DataSets.h"
#include "Harness.h"
#include "PatternPeer.h"

namespace {

using bench::SinglePeer;
using Entry = bench::PeerEntry<SinglePeer>;

struct Single {
    std::string topic;
    std::string pattern;
    std::string text;
};

// Matches in batches, so that the virtual call to the peer does not affect the result.
constexpr std::size_t BATCH = 1000;

// `length` bytes of log-like words without '#', the same each time.
std::string line(std::size_t length) {
    const bench::PatternSet words = bench::shortTermSet(10, length);
    std::string text = "GET ";
    for (std::size_t i = 0; text.size() < length; ++i) {
        text += words.terms[i] + ' ';
    }
    text.resize(length);
    return text;
}

// The text with its bytes at `at` overwritten by `piece`.
std::string with(std::string text, std::size_t at, const std::string& piece) {
    return text.replace(at, piece.size(), piece);
}

void run(benchmark::State& state, const Entry& entry, const Single& what) {
    const auto peer = entry.make();
    if (!peer->compile(what.pattern)) {
        bench::fail(entry.name + " does not compile " + what.pattern);
    }
    const bool expected = referenceMatch(entry.meaning, what.pattern, what.text);
    if (peer->match(what.text, 3) != (expected ? 3U : 0U)) {
        bench::fail(what.topic + ": " + entry.name + " gives a wrong answer");
    }
    const std::size_t batch = what.text.size() > 1000 ? 10 : BATCH;
    while (state.KeepRunningBatch(static_cast<benchmark::IterationCount>(batch))) {
        benchmark::DoNotOptimize(peer->match(what.text, batch));
    }
}

void add(const Single& what) {
    for (const Entry& entry : bench::peerList<SinglePeer>()) {
        if (entry.make()->compile(what.pattern)) {
            bench::add(what.topic, entry.name, [&entry, what](benchmark::State& state) {
                run(state, entry, what);
            })->Arg(static_cast<std::int64_t>(what.text.size()));
        }
    }
}

const bench::Suite suite([] {
    for (const std::size_t length : {100U, 10000U}) {
        const std::string text = line(length);
        const std::string hit = with(text, length - 20, "connection refused");
        add({"middle found", "*connection refused*", hit});
        add({"middle missing", "*connection refused*", text});
        add({"start and end", "GET *refused", with(text, length - 7, "refused")});
        add({"start and middle and end", "GET *connection*" + hit.substr(length - 2), hit});
    }
    add({"run of one letter", "*a", std::string(10000, 'a')});
    add({"short word", "read*ing", "rereading"});
    add({"short hit", "re*ing", "rereading"});
});

}  // namespace
