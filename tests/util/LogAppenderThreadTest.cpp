// Appenders under several threads.

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "support/FileAppender.h"
#include "support/NumberedLines.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"
#include "util/LogChannel.h"
#include "util/internal/LogGlobals.h"

namespace fs = std::filesystem;

namespace {

// In a child forked from several threads, the leak checker cannot search their stacks.
bool childOfThreads = false;

constexpr unsigned THREADS = 8;

// Runs body(0) ... body(THREADS - 1), each on a thread of its own, concurrently.
template <typename Body>
void onAllThreads(Body body) {
    std::atomic<bool> go = false;
    std::vector<std::thread> threads;
    for (unsigned t = 0; t < THREADS; ++t) {
        threads.emplace_back([&, t] {
            while (!go) {
                std::this_thread::yield();
            }
            body(t);
        });
    }
    go = true;
    for (std::thread& thread : threads) {
        thread.join();
    }
}

// The lines of a text except those that are `unwanted`.
std::string without(const std::string& unwanted, const std::string& text) {
    std::string rest;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) {
        if (line != unwanted) {
            rest += line + "\n";
        }
    }
    return rest;
}

// Binds loggers to channels, once per process.
LogChannel& channelOfReports() {
    LogChannel& channel = *LogChannel::find("Logger", true);
    if (!logger_initialized) {
        Logger::initialize();
    }
    return channel;
}

}  // namespace

TEST(LogAppenderThreadTest, NoLineIsLostWhileTheFileIsMovedAway) {
    const unsigned LINES = 2000;
    const TempDir dir;
    const std::string file = dir.file("app.log");
    const StderrCapture err;
    FileAppender log(file);
    std::atomic<bool> done = false;
    unsigned moves = 0;
    std::thread mover([&] {
        while (!done) {
            std::error_code error;  // there may be no such file at the moment
            fs::rename(file, file + ".moved" + std::to_string(moves), error);
            moves += error ? 0 : 1;
            std::this_thread::sleep_for(std::chrono::milliseconds(2));
        }
    });
    std::atomic<long long> clock = 1000;
    onAllThreads([&](unsigned thread) {
        for (unsigned number = 0; number < LINES; ++number) {
            log.line(numberedLine(thread, number), clock += 2);
        }
    });
    done = true;
    mover.join();
    std::string all;
    for (unsigned move = 0; move < moves; ++move) {
        all += readFile(file + ".moved" + std::to_string(move));
    }
    expectEveryLine(all + (fs::exists(file) ? readFile(file) : ""), THREADS, LINES);
    EXPECT_GT(moves, 0U);
    EXPECT_EQ("", err.text());
}

TEST(LogAppenderThreadTest, AppendersThatAllFailNeitherDeadlockNorRecurse) {
    const unsigned LINES = 50;
    const TempDir dir;
    StderrCapture err;
    FileAppender a("/dev/full");
    FileAppender b(dir.file("missing/b.log"));
    LogChannel& channel = channelOfReports();
    channel._appenders = {&a, &b};
    const std::size_t setupReports = err.text().size();
    onAllThreads([&](unsigned) {
        for (unsigned number = 0; number < LINES; ++number) {
            channel.write(stampedAt(1000), "lost");
        }
    });
    channel._appenders.clear();

    // Each appender hands its report to the other, which fails in turn and is the last.
    const std::string fromA = "CRIT - Error writing to \"/dev/full\": No space left on device";
    const std::string fromB =
        "ERROR - Error opening \"" + dir.file("missing/b.log") + "\": No such file or directory";
    std::map<std::string, unsigned> counts;
    std::istringstream in(err.text().substr(setupReports));
    std::string line;
    while (std::getline(in, line)) {
        ++counts[line];
    }
    EXPECT_EQ((std::map<std::string, unsigned>{{fromA, THREADS * LINES}, {fromB, THREADS * LINES}}),
              counts);
    EXPECT_TRUE(a._mutex.tryLock());
    a._mutex.NOLOG_unlock();
    EXPECT_TRUE(b._mutex.tryLock());
    b._mutex.NOLOG_unlock();
}

TEST(LogAppenderThreadTest, AFailingAppenderReportsThroughOneThatOthersAreWritingTo) {
    const unsigned LINES = 500;
    const TempDir dir;
    const StderrCapture err;
    FileAppender failing("/dev/full");
    FileAppender working(dir.file("working.log"), 5000, 1000);
    LogChannel& channel = channelOfReports();
    channel._appenders = {&failing, &working};
    onAllThreads([&](unsigned) {
        for (unsigned number = 0; number < LINES; ++number) {
            channel.write(stampedAt(1000), "line");
        }
    });
    channel._appenders.clear();

    const std::string report = "Error writing to \"/dev/full\": No space left on device";
    std::map<std::string, unsigned> counts;
    std::istringstream in(textOfGenerations(dir.file("working.log")));
    std::string line;
    while (std::getline(in, line)) {
        ++counts[line];
    }
    EXPECT_EQ(
        (std::map<std::string, unsigned>{{"line", THREADS * LINES}, {report, THREADS * LINES}}),
        counts);
    EXPECT_EQ("", err.text());
}

TEST(LogAppenderThreadTest, TheReportTakesNoLockOfTheFailingAppender) {
    // Two threads whose failing appenders are each other's only listeners.
    const TempDir dir;
    const StderrCapture err;
    FileAppender a("/dev/full");
    FileAppender b("/dev/full");
    LogChannel& channel = channelOfReports();
    channel._appenders = {&a, &b};
    onAllThreads([&](unsigned thread) {
        for (unsigned number = 0; number < 200; ++number) {
            (thread % 2 == 0 ? a : b).line("lost");
        }
    });
    channel._appenders.clear();
    const std::string text = err.text();
    EXPECT_EQ(THREADS * 200, std::count(text.begin(), text.end(), '\n'));
}

// Asked by the leak checker at exit.
extern "C" int __lsan_is_turned_off();
extern "C" int __lsan_is_turned_off() {
    return childOfThreads ? 1 : 0;
}

TEST(LogAppenderThreadTest, AChildOfAForkLogsWhileOtherThreadsDo) {
    const unsigned FORKS = 60;
    const TempDir dir;
    const StderrCapture err;
    LogAppender& log = *LogAppender::find("fork", true);
    ASSERT_TRUE(log.setAttribute("fileName", dir.file("app.log").c_str(), Pathname()));
    log.finalSetup("fork");
    const auto writeToBoth = [&](const std::string& text) {
        log.write(stampedAt(1000), text);
        rootAppender().write(stampedAt(1000), text);
    };
    std::atomic<bool> done = false;
    std::vector<std::thread> threads;
    for (unsigned t = 0; t < 4; ++t) {
        threads.emplace_back([&] {
            while (!done) {
                writeToBoth("parent");
            }
        });
    }
    std::string expected;
    for (unsigned number = 0; number < FORKS; ++number) {
        std::fflush(nullptr);
        const pid_t child = ::fork();
        if (child == 0) {
            ::alarm(10);  // ends a child that waits for a lock held by no thread of its own
            writeToBoth("child " + std::to_string(number));
            childOfThreads = true;
            if (number % 10 == 0) {
                std::exit(0);  // static objects are destroyed
            }
            ::_exit(0);
        }
        expected += "child " + std::to_string(number) + "\n";
        int status = -1;
        EXPECT_EQ(child, ::waitpid(child, &status, 0));
        EXPECT_EQ(0, status);
        if (status != 0) {
            break;
        }
    }
    done = true;
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(expected, without("parent", readFile(dir.file("app.log"))));
    EXPECT_EQ(expected, without("parent", err.text()));
}
