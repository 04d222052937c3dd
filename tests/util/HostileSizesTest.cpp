// Lines, files and messages of a size that nobody expects. Each case runs in a child whose peak of
// memory it measures, so the test itself never holds what the child reads.

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>

#include "support/FileAppender.h"
#include "support/InChild.h"
#include "support/TempDir.h"
#include "util/LogAppender.h"
#include "util/internal/LogGlobals.h"
#include "util/Logger.h"
#include "util/Pathname.h"

namespace fs = std::filesystem;

namespace {

constexpr std::size_t MIB = std::size_t{1} << 20;
constexpr unsigned TWO_MILLION = 2000000;

#ifdef QUELTA_SANITIZED
constexpr bool sanitized = true;
#else
constexpr bool sanitized = false;
#endif

// The most memory that this process has held, in bytes.
std::size_t peakMemory() {
    struct rusage usage;
    ::getrusage(RUSAGE_SELF, &usage);
    return static_cast<std::size_t>(usage.ru_maxrss) * 1024;
}

// A sanitizer's own memory says nothing.
void expectPeakBelow(std::size_t bytes) {
    if (!sanitized) {
        EXPECT_LT(peakMemory() / MIB, bytes / MIB) << "MiB";
    }
}

// A file that is read a piece at a time.
class Pieces {
public:
    explicit Pieces(const std::string& path) : _in(path, std::ios::binary) {}

    // Whether the next `count` bytes are all `c`.
    bool areAll(char c, std::size_t count) {
        std::string piece(std::min(count, MIB), '\0');
        for (; count > 0; count -= piece.size()) {
            piece.resize(std::min(count, piece.size()));
            _in.read(piece.data(), static_cast<std::streamsize>(piece.size()));
            if (!_in || piece.find_first_not_of(c) != std::string::npos) {
                return false;
            }
        }
        return true;
    }
    std::string line() {
        std::string result;
        std::getline(_in, result);
        return result;
    }
    bool atEnd() { return _in.peek() == std::ifstream::traits_type::eof(); }

private:
    std::ifstream _in;
};

class HostileSizesTest : public testing::Test {
protected:
    // Starts logging from what is at _cfg, in a child, and then runs `body` with the result.
    template <typename Body>
    ChildRun start(Body body) {
        return inChild([&] { body(Logger::initialize(Pathname(_cfg), Pathname(_dir.path()))); });
    }

    void append(const std::string& text, std::size_t times = 1) {
        std::ofstream out(_cfg, std::ios::binary | std::ios::app);
        for (std::size_t i = 0; i < times; ++i) {
            out << text;
        }
        ASSERT_TRUE(out);
    }

    std::string parseError(unsigned lineno, const std::string& text) const {
        return _cfg + ":" + std::to_string(lineno) + ": Parse error at \"" + text + "\"";
    }

    TempDir _dir;
    const std::string _cfg = _dir.file("log.cfg");
    const std::string _log = _dir.file("app.log");
    const std::string _toLog = "rootCategory=DEBUG,A\nappender.A.fileName=" + _log + '\n';
};

}  // namespace

TEST_F(HostileSizesTest, ARemarkOf256MebibytesIsDropped) {
    append("rootCategory=DEBUG #");
    append(std::string(MIB, 'x'), 256);
    append("\nbad\n");
    const ChildRun run = start([](bool complete) {
        EXPECT_TRUE(complete);
        EXPECT_EQ(DEBUG, rootChannel().minlevel);
        expectPeakBelow(3 * 256 * MIB);
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ(parseError(2, "bad") + '\n', run.err);
}

TEST_F(HostileSizesTest, ABadLineOf256MebibytesIsReportedWhole) {
    append(_toLog);
    append(std::string(MIB, 'x'), 256);
    append("\nbad\n");
    const ChildRun run = start([](bool complete) {
        EXPECT_TRUE(complete);
        expectPeakBelow(6 * 256 * MIB);
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
    Pieces log(_log);
    const std::string frame = parseError(3, "");
    std::string begin;
    for (std::size_t i = 0; i + 1 < frame.size(); ++i) {
        begin += log.areAll(frame[i], 1) ? frame[i] : '?';
    }
    EXPECT_EQ(frame.substr(0, frame.size() - 1), begin);
    EXPECT_TRUE(log.areAll('x', 256 * MIB));
    EXPECT_EQ("\"", log.line());
    EXPECT_EQ(parseError(4, "bad"), log.line());
    EXPECT_TRUE(log.atEnd());
}

TEST_F(HostileSizesTest, TwoMillionLinesAreCountedInTheMemoryOfOne) {
    const std::string ten =
        "# remark\n\nappender.A.maxFileSize=5\n<!--\n-->appender.A.maxBackupIndex=1\n"
        "rootCategory=ERROR,A\n \t\nrootCategory=DEBUG\nlog4cpp.appender.A=x\n<!-- a --> # b\n";
    append(ten, TWO_MILLION / 20);
    append("bad\n" + ten.substr(ten.find('\n') + 1));
    append(ten, TWO_MILLION / 20 - 1);
    append("worse\n");
    const ChildRun run = start([](bool complete) {
        EXPECT_TRUE(complete);
        EXPECT_EQ(DEBUG, rootChannel().minlevel);
        EXPECT_EQ(1U, appenders().size());
        expectPeakBelow(64 * MIB);
    });
    EXPECT_EQ(0, run.status);
    const std::string expected =
        parseError(TWO_MILLION / 2 + 1, "bad") + '\n' + parseError(TWO_MILLION + 1, "worse") + '\n';
    EXPECT_TRUE(run.err.ends_with(expected)) << run.err;
}

TEST_F(HostileSizesTest, TwoMillionBadLinesAreTwoMillionReports) {
    append(_toLog);
    append("bad\n", TWO_MILLION);
    const ChildRun run = start([](bool complete) {
        EXPECT_TRUE(complete);
        expectPeakBelow(512 * MIB);
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
    Pieces log(_log);
    for (unsigned lineno = 3; lineno < TWO_MILLION + 3; ++lineno) {
        ASSERT_EQ(parseError(lineno, "bad"), log.line());
    }
    EXPECT_TRUE(log.atEnd());
}

TEST_F(HostileSizesTest, ACommentOverTwoMillionLinesIsCounted) {
    append("a <!--\n");
    append("# - -- >\n", TWO_MILLION);
    append("--> b\nc\n");
    const ChildRun run = start([](bool complete) {
        EXPECT_TRUE(complete);
        expectPeakBelow(64 * MIB);
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ(parseError(TWO_MILLION + 2, "a  b") + '\n' + parseError(TWO_MILLION + 3, "c") + '\n',
              run.err);
}

TEST_F(HostileSizesTest, AMessageOf100MegabytesIsOneLine) {
    constexpr std::size_t SIZE = 100000000;
    append(_toLog);
    const ChildRun run = start([](bool) {
        Logger logger("Test");
        std::string text(SIZE, 'a');
        logger.info(text);
        text.assign(SIZE, 'b');
        logger.info("%s", text.c_str());
        text.assign(SIZE, 'c');
        logger.info(std::runtime_error(text));
        logger.info("small");
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
    Pieces log(_log);
    for (const char c : {'a', 'b', 'c'}) {
        EXPECT_TRUE(log.areAll(c, SIZE) && log.areAll('\n', 1)) << c;
    }
    EXPECT_EQ("small", log.line());
    EXPECT_TRUE(log.atEnd());
}

TEST_F(HostileSizesTest, AMessageOf100MegabytesRotatesOnce) {
    constexpr std::size_t SIZE = 100000000;
    FileAppender log(_log, 1000, 3);
    log.line(std::string(SIZE, 'x'));
    log.line("next");
    EXPECT_EQ(SIZE + 1, fs::file_size(_log + ".1"));
    EXPECT_EQ("next\n", readFile(_log));
    EXPECT_FALSE(fs::exists(_log + ".2"));
}

TEST_F(HostileSizesTest, AResultThatNoMemoryHoldsFallsBackToTheFormat) {
    if (sanitized) {
        GTEST_SKIP() << "a sanitizer needs more address space than the limit";
    }
    append(_toLog);
    const ChildRun run = start([](bool) {
        const struct rlimit limit = {1024 * MIB, 1024 * MIB};
        ASSERT_EQ(0, ::setrlimit(RLIMIT_AS, &limit));
        Logger logger("Test");
        volatile int most = INT_MAX;  // the compiler refuses what it can foresee
        const int width = most;
        errno = EINTR;
        logger.info("%*d beyond the limit", width / 5 * 3, 1);
        logger.warn("%*d%s beyond an int: %m", width, 1, "x");
        logger.error("%.*f beyond the C library", width - 20, 1.0);
        EXPECT_EQ(EINTR, errno);
        logger.info("goes on");
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ(
        "INFO - %*d beyond the limit\nWARN - %*d%s beyond an int: %m\n"
        "ERROR - %.*f beyond the C library\n",
        run.err);
    EXPECT_EQ("goes on\n", readFile(_log));
}
