// log4cplus: RollingFileAppender with immediate flush.

#include <benchmark/benchmark.h>
#include <log4cplus/fileappender.h>
#include <log4cplus/initializer.h>
#include <log4cplus/layout.h>
#include <log4cplus/logger.h>
#include <log4cplus/loggingmacros.h>

#include "LogPeer.h"

namespace {

class Log4cplus : public bench::LogPeer {
public:
    void open(const std::string& directory, bench::Layout layout) override {
        static const log4cplus::Initializer initializer;
        const log4cplus::SharedAppenderPtr appender(new log4cplus::RollingFileAppender(
            directory + "/bench.log", bench::ROTATE_BYTES, bench::BACKUPS, true));
        // %D is local time, %q the milliseconds.
        appender->setLayout(std::make_unique<log4cplus::PatternLayout>(
            layout == bench::Layout::PLAIN ? "%m%n" : "%D{%m-%d-%Y %H:%M:%S.%q} %-5p %c - %m%n"));
        _logger = log4cplus::Logger::getInstance("bench");
        _logger.setAdditivity(false);
        _logger.setLogLevel(log4cplus::INFO_LOG_LEVEL);
        _logger.addAppender(appender);
    }

    void lines(std::size_t first, std::size_t count) override {
        for (const std::size_t end = first + count; first < end; ++first) {
            LOG4CPLUS_INFO_FMT(_logger, "request %zu of client %s served in %d ms", first,
                               QUELTA_BENCH_CLIENT, bench::BENCH_MILLISECONDS);
        }
    }

    bool suppressed(std::size_t count) override {
        for (; count > 0; --count) {
            benchmark::ClobberMemory();
            LOG4CPLUS_DEBUG_FMT(_logger, "request %zu of client %s served in %d ms", count,
                                QUELTA_BENCH_CLIENT, bench::BENCH_MILLISECONDS);
        }
        return true;
    }

    void close() override { _logger.removeAllAppenders(); }

private:
    log4cplus::Logger _logger;
};

const bench::LogRegistrar<Log4cplus> peer("log4cplus");

}  // namespace
