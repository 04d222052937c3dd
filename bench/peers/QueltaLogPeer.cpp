// This system's logger, configured from a file as in the program. Logging is configured once in a
// process, so the first open() sets up both layouts. Their directories are those of
// LoggerBench.cpp, whose names differ only in the "plain" or "date" at their end.

#include <unistd.h>

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <mutex>

#include "Harness.h"
#include "LogPeer.h"
#include "util/Logger.h"
#include "util/Pathname.h"

namespace {

Logger plainLogger("bench.plain");
Logger dateLogger("bench");

// Configures logging with one appender and one logger for each layout.
void configure(const std::string& plain, const std::string& date) {
    std::filesystem::create_directories(plain);
    std::filesystem::create_directories(date);
    const std::string file = plain + "/logging.cfg";
    const auto appender = [](const std::string& name, const std::string& directory,
                             const std::string& pattern) {
        const std::string start = "appender." + name;
        return start + "=RollingFileAppender\n" + start + ".fileName=" + directory +
               "/bench.log\n" + start + ".maxFileSize=" + std::to_string(bench::ROTATE_BYTES) +
               '\n' + start + ".maxBackupIndex=" + std::to_string(bench::BACKUPS) + '\n' + start +
               ".layout=PatternLayout\n" + start + ".layout.ConversionPattern=" + pattern + '\n';
    };
    std::ofstream(file) << "rootCategory=WARN\n"
                        << appender("plain", plain, "%m%n")
                        << appender("date", date, "%d{%m-%d-%Y %H:%M:%S.%l} %-5p %c - %m%n")
                        << "category.bench.plain=INFO, plain\ncategory.bench=INFO, date\n";
    if (!Logger::initialize(Pathname(file), Pathname())) {
        bench::fail("logging is not configured");
    }
}

class QueltaLog : public bench::LogPeer {
public:
    void open(const std::string& directory, bench::Layout layout) override {
        const std::string stem = directory.substr(0, directory.rfind('-') + 1);
        static std::once_flag once;
        std::call_once(once, [&] { configure(stem + "plain", stem + "date"); });
        _logger = layout == bench::Layout::PLAIN ? &plainLogger : &dateLogger;
    }

    void lines(std::size_t first, std::size_t count) override {
        for (const std::size_t end = first + count; first < end; ++first) {
            _logger->info("request %zu of client %s served in %d ms", first, QUELTA_BENCH_CLIENT,
                          bench::BENCH_MILLISECONDS);
        }
    }

    bool suppressed(std::size_t count) override {
        for (; count > 0; --count) {
            benchmark::DoNotOptimize(_logger);
            _logger->debug("request %zu of client %s served in %d ms", count, QUELTA_BENCH_CLIENT,
                           bench::BENCH_MILLISECONDS);
        }
        return true;
    }

    void close() override {}

private:
    Logger* _logger = nullptr;
};

const bench::LogRegistrar<QueltaLog> peer("Logger");

}  // namespace
