// Boost.Log: synchronous text file sink with auto flush. Its dates end in microseconds, three
// digits more than the others write.

#include <benchmark/benchmark.h>

#include <boost/log/attributes/clock.hpp>
#include <boost/log/core.hpp>
#include <boost/log/expressions.hpp>
#include <boost/log/sinks/sync_frontend.hpp>
#include <boost/log/sinks/text_file_backend.hpp>
#include <boost/log/sources/record_ostream.hpp>
#include <boost/log/sources/severity_channel_logger.hpp>
#include <boost/log/support/date_time.hpp>
#include <boost/smart_ptr/make_shared.hpp>

#include "LogPeer.h"

namespace {

namespace log = boost::log;

enum Severity { DEBUG_SEVERITY, INFO_SEVERITY };

std::ostream& operator<<(std::ostream& out, Severity severity) {
    return out << (severity == INFO_SEVERITY ? "INFO " : "DEBUG");
}

BOOST_LOG_ATTRIBUTE_KEYWORD(severityOf, "Severity", Severity)
BOOST_LOG_ATTRIBUTE_KEYWORD(channelOf, "Channel", std::string)

using Sink = log::sinks::synchronous_sink<log::sinks::text_file_backend>;

class BoostLog : public bench::LogPeer {
public:
    void open(const std::string& directory, bench::Layout layout) override {
        namespace keywords = log::keywords;
        const auto backend = boost::make_shared<log::sinks::text_file_backend>(
            keywords::file_name = directory + "/bench.log",
            keywords::target_file_name = directory + "/bench.log.%N",
            keywords::open_mode = std::ios_base::app,
            keywords::rotation_size = static_cast<std::uintmax_t>(bench::ROTATE_BYTES),
            keywords::enable_final_rotation = false, keywords::auto_flush = true);
        backend->set_file_collector(log::sinks::file::make_collector(
            keywords::target = directory + "/backups", keywords::max_files = bench::BACKUPS));
        _sink = boost::make_shared<Sink>(backend);
        namespace expr = log::expressions;
        if (layout == bench::Layout::PLAIN) {
            _sink->set_formatter(expr::stream << expr::smessage);
        } else {
            _sink->set_formatter(expr::stream << expr::format_date_time<boost::posix_time::ptime>(
                                                     "TimeStamp", "%m-%d-%Y %H:%M:%S.%f")
                                              << ' ' << severityOf << ' ' << channelOf << " - "
                                              << expr::smessage);
        }
        log::core::get()->add_global_attribute("TimeStamp", log::attributes::local_clock());
        log::core::get()->set_filter(severityOf >= INFO_SEVERITY);
        log::core::get()->add_sink(_sink);
    }

    void lines(std::size_t first, std::size_t count) override {
        for (const std::size_t end = first + count; first < end; ++first) {
            BOOST_LOG_SEV(_logger, INFO_SEVERITY)
                << "request " << first << " of client " << QUELTA_BENCH_CLIENT << " served in "
                << bench::BENCH_MILLISECONDS << " ms";
        }
    }

    bool suppressed(std::size_t count) override {
        for (; count > 0; --count) {
            benchmark::ClobberMemory();
            BOOST_LOG_SEV(_logger, DEBUG_SEVERITY)
                << "request " << count << " of client " << QUELTA_BENCH_CLIENT << " served in "
                << bench::BENCH_MILLISECONDS << " ms";
        }
        return true;
    }

    void close() override {
        log::core::get()->remove_sink(_sink);
        _sink.reset();
    }

private:
    boost::shared_ptr<Sink> _sink;
    log::sources::severity_channel_logger_mt<Severity> _logger{log::keywords::channel = "bench"};
};

const bench::LogRegistrar<BoostLog> peer("Boost.Log");

}  // namespace
