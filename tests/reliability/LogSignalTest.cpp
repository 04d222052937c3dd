// Logging while signals keep interrupting system calls.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <fstream>
#include <string>
#include <thread>

#include "support/FileAppender.h"
#include "support/InChild.h"
#include "support/NumberedLines.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"

namespace {

std::atomic<unsigned> signals{0};

void countSignal(int) {
    ++signals;
}

// Sends SIGALRM every fifty microseconds while the object exists. Interrupted calls fail with
// EINTR.
class SignalStorm {
public:
    SignalStorm() {
        struct sigaction action {};
        action.sa_handler = countSignal;
        EXPECT_EQ(0, ::sigaction(SIGALRM, &action, nullptr));
        setInterval(50);
    }
    ~SignalStorm() {
        setInterval(0);
        ::signal(SIGALRM, SIG_IGN);
    }
    SignalStorm(const SignalStorm&) = delete;
    SignalStorm& operator=(const SignalStorm&) = delete;

private:
    static void setInterval(int microseconds) {
        itimerval timer{};
        timer.it_interval.tv_usec = timer.it_value.tv_usec = microseconds;
        EXPECT_EQ(0, ::setitimer(ITIMER_REAL, &timer, nullptr));
    }
};

// Blocks signals in this thread, so that the other thread receives them.
void blockSignals() {
    sigset_t all;
    sigfillset(&all);
    ::pthread_sigmask(SIG_BLOCK, &all, nullptr);
}

}  // namespace

TEST(LogSignalTest, NoLineIsLostThroughRotation) {
    const unsigned LINES = 20000;
    const TempDir dir;
    const StderrCapture err;
    FileAppender log(dir.file("app.log"), 50000, 1000);
    {
        const SignalStorm storm;
        for (unsigned number = 0; number < LINES; ++number) {
            log.line(numberedLine(0, number));
        }
    }
    EXPECT_GT(signals, 10U);
    expectEveryLine(textOfGenerations(dir.file("app.log")), 1, LINES);
    EXPECT_EQ("", err.text());
}

TEST(LogSignalTest, LongLinesPassWholeThroughAPipeThatIsAlmostAlwaysFull) {
    const unsigned LINES = 40;
    const TempDir dir;
    const StderrCapture err;
    ASSERT_EQ(0, ::mkfifo(dir.file("pipe").c_str(), 0600));
    std::string got;
    std::thread reader([&] {
        blockSignals();
        std::ifstream in(dir.file("pipe"), std::ios::binary);
        char buf[3000];
        while (in.read(buf, sizeof buf) || in.gcount() > 0) {
            got.append(buf, static_cast<std::size_t>(in.gcount()));
            std::this_thread::sleep_for(std::chrono::microseconds(200));
        }
    });
    std::string expected;
    {
        LogAppender log;
        ASSERT_TRUE(log.setAttribute("fileName", dir.file("pipe").c_str(), Pathname()));
        log._fmt = &defaultFormat();
        log.write(stampedAt(1000), "opened before the storm");
        expected = "opened before the storm\n";
        const SignalStorm storm;
        for (unsigned number = 0; number < LINES; ++number) {
            const std::string line(100000, static_cast<char>('a' + number % 26));
            log.write(stampedAt(1000), line);
            expected += line + "\n";
        }
        log.closeFd();
    }
    reader.join();
    EXPECT_GT(signals, 10U);
    EXPECT_TRUE(expected == got) << expected.size() << " bytes expected, " << got.size() << " came";
    EXPECT_EQ("", err.text());
}

// There is no reader yet, so open() waits while signals arrive.
TEST(LogSignalTest, AnOpenThatWaitsForAReaderIsRetried) {
    const TempDir dir;
    const StderrCapture err;
    ASSERT_EQ(0, ::mkfifo(dir.file("pipe").c_str(), 0600));
    std::string got;
    std::thread reader([&] {
        blockSignals();
        while (signals < 100) {
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        got = readFile(dir.file("pipe"));
    });
    {
        LogAppender log;
        ASSERT_TRUE(log.setAttribute("fileName", dir.file("pipe").c_str(), Pathname()));
        log._fmt = &defaultFormat();
        const SignalStorm storm;
        log.write(stampedAt(1000), "first");
        log.write(stampedAt(1010), "second");
        log.closeFd();
    }
    // Releases the reader if no writer ever opened the pipe.
    ::close(::open(dir.file("pipe").c_str(), O_RDWR | O_NONBLOCK));
    reader.join();
    EXPECT_EQ("first\nsecond\n", got);
    EXPECT_EQ("", err.text());
}

// The configuration arrives through a pipe, late and in pieces, while signals interrupt the reader.
TEST(LogSignalTest, AConfigurationThatArrivesSlowlyIsReadCompletely) {
    const unsigned LINES = 200;
    const TempDir dir;
    ASSERT_EQ(0, ::mkfifo(dir.file("pipe").c_str(), 0600));
    // Some names are longer than one read.
    const auto nameOf = [](unsigned i) {
        return std::string(i % 10 * 20, 'n') + std::to_string(i);
    };
    std::string config;
    for (unsigned i = 0; i < LINES; ++i) {
        config += "category." + nameOf(i) + "=ERROR\n";
    }
    const ChildRun run = inChild([&] {
        signals = 0;
        const SignalStorm storm;
        std::thread writer([&] {
            blockSignals();
            while (signals < 100) {
                std::this_thread::sleep_for(std::chrono::milliseconds(1));
            }
            std::ofstream out(dir.file("pipe"), std::ios::binary);
            for (std::size_t at = 0; at < config.size(); at += 97) {
                out << config.substr(at, 97) << std::flush;
                std::this_thread::sleep_for(std::chrono::microseconds(200));
            }
        });
        EXPECT_TRUE(Logger::initialize(Pathname(dir.file("pipe")), Pathname()));
        // Do not let the writer wait if the reader has given up; the pipe holds all that it writes.
        const int reader = ::open(dir.file("pipe").c_str(), O_RDWR | O_NONBLOCK);
        writer.join();
        ::close(reader);
        for (unsigned i = 0; i < LINES; ++i) {
            EXPECT_EQ(ERROR, LogChannel::find(nameOf(i), false)->minlevel) << i;
        }
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}
