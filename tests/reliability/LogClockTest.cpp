// Clock and time zone changes while a process logs, and extreme times.

#include <gtest/gtest.h>
#include <sys/time.h>

#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <string>

#include "support/FileAppender.h"
#include "support/NumberedLines.h"
#include "support/ScriptedLibc.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"
#include "support/TimeZone.h"
#include "util/LogChannel.h"
#include "util/LogFormat.h"
#include "util/internal/LogGlobals.h"

namespace {

constexpr long long HOUR = 3600;
constexpr long long START = 1700000000;

// The time that the replaced clock returns.
struct timeval clockShows {};

void setClock(long long seconds, long microseconds = 0) {
    clockShows.tv_sec = seconds;
    clockShows.tv_usec = microseconds;
}

// The scripted time in the C library's current time zone.
std::string localTime() {
    struct tm local {};
    EXPECT_NE(nullptr, ::localtime_r(&clockShows.tv_sec, &local));
    char text[100];
    std::snprintf(text, sizeof text, "%04d-%02d-%02d %02d:%02d:%02d,%03d", local.tm_year + 1900,
                  local.tm_mon + 1, local.tm_mday, local.tm_hour, local.tm_min, local.tm_sec,
                  static_cast<int>(clockShows.tv_usec / 1000));
    return text;
}

// A logger that writes lines with the date to a file.
class LogClockTest : public testing::Test {
protected:
    const Replacement<std::function<int(struct timeval*, void*)>> _clock{
        replacement::gettimeofday, [](struct timeval* now, void*) {
            *now = clockShows;
            return 0;
        }};
    LogClockTest() {
        setClock(START);
        if (!logger_initialized) {
            Logger::initialize();
        }
        _log._fmt = &_layout;
        _channel._appenders = {&_log};
        _logger._channel = &_channel;
    }

    // Logs a line at the given time.
    // Returns: the expected line in the file.
    std::string line(const std::string& text, long long seconds, long microseconds = 0) {
        setClock(seconds, microseconds);
        const std::string expected = localTime() + " " + text + "\n";
        _logger.info(text);
        return expected;
    }

    const TempDir _dir;
    const std::string _file = _dir.file("app.log");
    const LogFormat _layout{"%d %m%n"};
    FileAppender _log{_file};
    LogChannel _channel;
    Logger _logger{"Clock"};
    const StderrCapture _err;
};

}  // namespace

TEST_F(LogClockTest, AfterStepsByHoursEveryLineIsWholeAndStampedByTheClock) {
    const TimeZone zone("CET-1CEST,M3.5.0,M10.5.0/3");
    _log._maxSize = 2000;
    _log._maxBackupIndex = 10000;
    const long long steps[] = {HOUR,        -HOUR,       5 * HOUR, -12 * HOUR, 240 * HOUR,  0,
                               -240 * HOUR, 9000 * HOUR, -1,       1,          -9000 * HOUR};
    std::string expected;
    long long now = START;
    for (unsigned number = 0; number < 5000; ++number) {
        now += number % 7 == 0 ? steps[number / 7 % std::size(steps)] : 1;
        expected += line(numberedLine(0, number), now, number % 1000 * 1000L);
    }
    EXPECT_EQ(expected, textOfGenerations(_file));
    EXPECT_LT(50U, generationsOf(_file).size());
    EXPECT_EQ("", _err.text());
}

// After a clock step the time since the last check is unknown, so a step in either direction causes
// a check.
TEST_F(LogClockTest, AStepByHoursCausesACheckOfTheFile) {
    for (const long long step : {HOUR, -HOUR, 12 * HOUR, -12 * HOUR, 9000 * HOUR, -9000 * HOUR}) {
        line("before", START);
        const std::string moved = _file + ".moved";
        std::filesystem::rename(_file, moved);
        const std::string expected = line("after", START + step);
        EXPECT_EQ(expected, readFile(_file)) << step;
        line("and back", START);
        std::filesystem::remove(_file);
        line("once more", START - 1);
        EXPECT_TRUE(std::filesystem::exists(_file)) << step;
        std::filesystem::remove(moved);
    }
    EXPECT_EQ("", _err.text());
}

// The C library decides when it reads TZ; a line is stamped in the zone that the library uses then.
TEST_F(LogClockTest, ATimeZoneChangeTakesEffectAsInTheCLibrary) {
    const TimeZone utc("UTC0");
    std::string expected = line("in Greenwich", START);
    EXPECT_EQ("2023-11-14 22:13:20,000 in Greenwich\n", expected);
    ::setenv("TZ", "NPT-5:45", 1);
    for (int i = 0; i < 3; ++i) {
        expected += line("not announced", START + i);
    }
    ::tzset();
    const std::string announced = line("announced", START);
    EXPECT_EQ("2023-11-15 03:58:20,000 announced\n", announced);
    expected += announced;
    ::unsetenv("TZ");
    expected += line("without a zone", START);
    ::setenv("TZ", "no zone at all", 1);
    ::tzset();
    expected += line("in no zone", START);
    EXPECT_EQ(expected, readFile(_file));
    EXPECT_EQ("", _err.text());
}

TEST_F(LogClockTest, LinesAreWholeUpToTheLastInstants) {
    const struct {
        const char* zone;
        long long seconds;
        const char* text;
    } rows[] = {
        {"UTC0", 0, "1970-01-01 00:00:00"},
        {"UTC0", -1, "1969-12-31 23:59:59"},
        {"UTC0", -2147483648LL, "1901-12-13 20:45:52"},
        {"UTC0", 2147483647, "2038-01-19 03:14:07"},
        {"<+14>-14", 2147483647, "2038-01-19 17:14:07"},
        {"<-12>12", 2147483647, "2038-01-18 15:14:07"},
        {"UTC0", 2147483648LL, "2038-01-19 03:14:08"},
        {"UTC0", 4294967296LL, "2106-02-07 06:28:16"},
        {"UTC0", 253402300799LL, "9999-12-31 23:59:59"},
        {"<+14>-14", 253402300799LL, "10000-01-01 13:59:59"},
    };
    std::string expected;
    for (const auto& row : rows) {
        const TimeZone zone(row.zone);
        line("x", row.seconds, 999999);
        expected += std::string(row.text) + ",999 x\n";
    }
    Timeval largest;
    largest.setToMax();
    LogMsgMetadata mdata(&_logger, INFO);
    mdata.stamp = largest;
    const TimeZone zone("UTC0");
    _log.write(mdata, "largest");
    EXPECT_EQ(expected + "2038-01-19 03:14:07,999 largest\n", readFile(_file));
    EXPECT_EQ("", _err.text());
}
