// Configurations that nobody writes on purpose: what is good in them takes effect, and what is not
// is reported with its line number.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <string>
#include <string_view>

#include "support/InChild.h"
#include "support/TempDir.h"
#include "util/LogAppender.h"
#include "util/LogFormat.h"
#include "util/LogInternal.h"
#include "util/Logger.h"
#include "util/Pathname.h"

using namespace std::string_literals;

namespace {

class HostileConfigTest : public testing::Test {
protected:
    // Starts logging from what is at _cfg, in a child, and then runs `body` with the result.
    template <typename Body>
    ChildRun start(Body body) {
        return inChild([&] { body(Logger::initialize(Pathname(_cfg), Pathname(_dir.path()))); });
    }
    template <typename Body>
    ChildRun configured(const std::string& config, Body body) {
        writeFile(_cfg, config);
        return start(body);
    }

    std::string parseError(unsigned lineno, const std::string& text) const {
        return _cfg + ":" + std::to_string(lineno) + ": Parse error at \"" + text + "\"\n";
    }
    std::string unterminated(unsigned lineno) const {
        return _cfg + ":" + std::to_string(lineno) + ": Unterminated XML comment started\n";
    }

    TempDir _dir;
    const std::string _cfg = _dir.file("log.cfg");
};

const LogAppender& appender(const char* name) {
    return *LogAppender::find(name, false);
}

}  // namespace

TEST_F(HostileConfigTest, NulBytesAreCharactersOfTheirLine) {
    const ChildRun run = configured(
        "\0bad\nworse\0 rest\nrootCategory\0=ERROR\nrootCategory=DEBUG\0ERROR\n"
        "appender.A\0B.layout=SimpleLayout\nappender.A.layout.ConversionPattern=%m\0%n\n\0"s,
        [](bool complete) {
            EXPECT_TRUE(complete);
            EXPECT_EQ(DEBUG, rootChannel().minlevel);
            EXPECT_EQ(2U, appenders().size());
            EXPECT_EQ("%-8p: %m%n", LogAppender::find("A\0B"s, false)->_fmt->_fmt);
            EXPECT_EQ("%m", appender("A")._fmt->_fmt);
        });
    EXPECT_EQ(0, run.status);
    EXPECT_TRUE(run.err.ends_with(parseError(1, "") + parseError(2, "worse") +
                                  parseError(3, "rootCategory") + parseError(7, "")))
        << run.err;
}

TEST_F(HostileConfigTest, InvalidUtf8IsReportedByteForByte) {
    const std::string bytes =
        "\xff\xfe \xc3\x28 \xed\xa0\x80 \xf8\x88\x80\x80\x80 \x1b[31m\x7f\a\b";
    const ChildRun run = configured(
        bytes + "\ncategory.\xff\xfe=DEBUG\nappender.\x80.layout.ConversionPattern=" + bytes,
        [&](bool complete) {
            EXPECT_TRUE(complete);
            EXPECT_EQ(DEBUG, LogChannel::find("\xff\xfe", false)->minlevel);
            EXPECT_EQ(bytes, appender("\x80")._fmt->_fmt);
        });
    EXPECT_EQ(0, run.status);
    EXPECT_TRUE(run.err.ends_with(parseError(1, bytes))) << run.err;
}

TEST_F(HostileConfigTest, CommentOpenersWithoutAnEndHideTheRestOnly) {
    const std::string openers = "<!--<!-- <!--\n<!--\n<!-- -- > ->-\n";
    const ChildRun run =
        configured("rootCategory=ERROR\nbad\ncategory.A=DEBUG " + openers + "rootCategory=DEBUG\n",
                   [](bool complete) {
                       EXPECT_FALSE(complete);
                       EXPECT_EQ(ERROR, rootChannel().minlevel);
                       EXPECT_EQ(&rootChannel(), LogChannel::find("A", false));
                   });
    EXPECT_EQ(0, run.status);
    // The root channel lets errors through, not warnings.
    EXPECT_EQ(unterminated(3), run.err);
}

TEST_F(HostileConfigTest, OpenersInsideACommentAreItsText) {
    const ChildRun run = configured("a <!-- <!-- --> b\n<!-- -->c<!-->\n-->--> <!--\n\n-->d\ne\n",
                                    [](bool complete) { EXPECT_TRUE(complete); });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ(parseError(1, "a  b") + parseError(5, "c--> d") + parseError(6, "e"), run.err);
}

TEST_F(HostileConfigTest, RepeatedAttributesJoinNamesAndReplaceTheRest) {
    std::string config;
    for (unsigned i = 0; i <= 100; ++i) {
        config += "appender.A.maxFileSize=" + std::to_string(1000 - i) + '\n';
        config += "appender.A.maxBackupIndex=" + std::to_string(i) + '\n';
        config += "appender.A.layout.ConversionPattern=" + std::to_string(i) + " %m%n\n";
        config += "appender.A.fileName=" + (i == 0 ? _dir.file("a") : ".a"s) + '\n';
        config += "rootCategory=INFO,A\ncategory.X=DEBUG\n";
    }
    const ChildRun run = configured(config, [&](bool complete) {
        EXPECT_TRUE(complete);
        EXPECT_EQ(900, appender("A")._maxSize);
        EXPECT_EQ(100U, appender("A")._maxBackupIndex);
        EXPECT_EQ("100 %m%n", appender("A")._fmt->_fmt);
        EXPECT_EQ(_dir.file("a").size() + 200, appender("A")._filename.size());
        EXPECT_TRUE(std::filesystem::exists(std::string(appender("A")._filename)));
        EXPECT_EQ(1U, rootChannel()._appenders.size());
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST_F(HostileConfigTest, NumbersBeyondTheirFieldAreRefusedAndChangeNothing) {
    const ChildRun run = configured(
        "appender.A.maxFileSize=9223372036854775807\n"
        "appender.A.maxFileSize=9223372036854775808\n"
        "appender.A.maxFileSize=18446744073709551616\n"
        "appender.A.maxFileSize=99999999999999999999999999999999999999999999\n"
        "appender.A.maxBackupIndex=4294967295\n"
        "appender.A.maxBackupIndex=4294967296\n"
        "appender.A.maxBackupIndex=18446744073709551617\n"
        "appender.A.maxBackupIndex=-1\n"
        "appender.A.fileName=${QUELTA_HOME}/a\n",
        [](bool complete) {
            EXPECT_TRUE(complete);
            EXPECT_EQ(9223372036854775807, appender("A")._maxSize);
            EXPECT_EQ(4294967295U, appender("A")._maxBackupIndex);
        });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ(parseError(2, "appender.A.maxFileSize=9223372036854775808") +
                  parseError(3, "appender.A.maxFileSize=18446744073709551616") +
                  parseError(4,
                             "appender.A.maxFileSize="
                             "99999999999999999999999999999999999999999999") +
                  parseError(6, "appender.A.maxBackupIndex=4294967296") +
                  parseError(7, "appender.A.maxBackupIndex=18446744073709551617") +
                  parseError(8, "appender.A.maxBackupIndex=-1"),
              run.err);
}

TEST_F(HostileConfigTest, AFifoIsReadAsItComes) {
    ASSERT_EQ(0, ::mkfifo(_cfg.c_str(), 0600));
    const pid_t writer = ::fork();
    if (writer == 0) {
        const int fifo = ::open(_cfg.c_str(), O_WRONLY);
        bool written = true;
        // Lines in pieces, the last one without its line feed.
        for (const std::string_view piece :
             {"ba", "d\nrootCate", "gory=DEBUG\n", "<!--\n-->worse"}) {
            written = written && ::write(fifo, piece.data(), piece.size()) ==
                                     static_cast<ssize_t>(piece.size());
            ::usleep(1000);
        }
        ::_exit(written ? 0 : 1);
    }
    const ChildRun run = start([](bool complete) {
        EXPECT_TRUE(complete);
        EXPECT_EQ(DEBUG, rootChannel().minlevel);
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ(parseError(1, "bad") + parseError(4, "worse"), run.err);
    int status = -1;
    EXPECT_EQ(writer, ::waitpid(writer, &status, 0));
    EXPECT_EQ(0, status);
}

TEST_F(HostileConfigTest, ADirectoryReadsLikeAnEmptyFile) {
    ASSERT_EQ(0, ::mkdir(_cfg.c_str(), 0700));
    const ChildRun run = start([](bool complete) {
        EXPECT_TRUE(complete);
        EXPECT_EQ(INFO, rootChannel().minlevel);
        Logger("Test").info("logging works");
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("logging works\n", run.err);
}
