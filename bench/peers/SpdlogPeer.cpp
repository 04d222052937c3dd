// spdlog: rotating file sink with a lock, flushed after each line.

#include <benchmark/benchmark.h>
#include <spdlog/sinks/rotating_file_sink.h>
#include <spdlog/spdlog.h>

#include "LogPeer.h"

namespace {

class Spdlog : public bench::LogPeer {
public:
    void open(const std::string& directory, bench::Layout layout) override {
        const auto sink = std::make_shared<spdlog::sinks::rotating_file_sink_mt>(
            directory + "/bench.log", static_cast<std::size_t>(bench::ROTATE_BYTES),
            static_cast<std::size_t>(bench::BACKUPS));
        _logger = std::make_shared<spdlog::logger>("bench", sink);
        _logger->set_level(spdlog::level::info);
        _logger->flush_on(spdlog::level::trace);
        _logger->set_pattern(layout == bench::Layout::PLAIN ? "%v"
                                                            : "%m-%d-%Y %H:%M:%S.%e %-5l %n - %v");
    }

    void lines(std::size_t first, std::size_t count) override {
        for (const std::size_t end = first + count; first < end; ++first) {
            _logger->info("request {} of client {} served in {} ms", first, QUELTA_BENCH_CLIENT,
                          bench::BENCH_MILLISECONDS);
        }
    }

    bool suppressed(std::size_t count) override {
        spdlog::logger* logger = _logger.get();
        for (; count > 0; --count) {
            benchmark::DoNotOptimize(logger);
            logger->debug("request {} of client {} served in {} ms", count, QUELTA_BENCH_CLIENT,
                          bench::BENCH_MILLISECONDS);
        }
        return true;
    }

    void close() override { _logger.reset(); }

private:
    std::shared_ptr<spdlog::logger> _logger;
};

const bench::LogRegistrar<Spdlog> peer("spdlog");

}  // namespace
