#ifndef QUELTA_BENCH_LOGPEER_H_
#define QUELTA_BENCH_LOGPEER_H_

// The interface of every logger in the benchmarks: one logger named "bench" at level INFO. Its one
// file rotates at 25 MB and keeps five backups. Each line is in the file when the call returns.
// Each peer is one file below peers/ that adds itself to the list through a static registrar.
//
// One thread calls open and close. Between them any number of threads may call lines and
// suppressed.

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace bench {

// The two layouts: the bare message, and
// "12-31-2025 23:59:59.999 INFO  bench - message" with local time.
enum class Layout { PLAIN, DATE };

constexpr long ROTATE_BYTES = 25000000;
constexpr int BACKUPS = 5;

// The message of the n-th line is "request n of client 10.0.0.7 served in 42 ms", formatted with
// the logger's own functions.
#define QUELTA_BENCH_CLIENT "10.0.0.7"
constexpr int BENCH_MILLISECONDS = 42;

class LogPeer {
public:
    virtual ~LogPeer() = default;

    // Appends the lines to directory/bench.log.
    virtual void open(const std::string& directory, Layout layout) = 0;

    // Writes the lines first, first + 1, ... (`count` of them) at level INFO.
    virtual void lines(std::size_t first, std::size_t count) = 0;

    // Logs `count` lines at level DEBUG, which is below the logger's level.
    // Returns: false if the peer has no levels.
    virtual bool suppressed(std::size_t count) = 0;

    // Afterwards the file may be deleted.
    virtual void close() = 0;
};

struct LogPeerEntry {
    std::string name;
    std::unique_ptr<LogPeer> (*make)();
};

inline std::vector<LogPeerEntry>& logPeers() {
    static std::vector<LogPeerEntry> list;
    return list;
}

// Adds a peer during static initialization.
template <class Implementation>
class LogRegistrar {
public:
    explicit LogRegistrar(const char* name) {
        logPeers().push_back({name, []() -> std::unique_ptr<LogPeer> {
                                  return std::make_unique<Implementation>();
                              }});
    }
};

}  // namespace bench

#endif  // QUELTA_BENCH_LOGPEER_H_
