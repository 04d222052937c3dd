// Messages that try to break a line: they come out byte for byte.

#include <gtest/gtest.h>

#include <exception>
#include <string>

#include "support/FileAppender.h"
#include "support/InChild.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"
#include "util/LogAppender.h"
#include "util/Logger.h"

using namespace std::string_literals;

namespace {

// What a logger that waits for initialization writes to standard error.
template <typename Log>
std::string logged(Log log) {
    const StderrCapture err;
    Logger logger("Test");
    log(logger);
    return err.text();
}

struct Failure : std::exception {
    explicit Failure(const char* text) : _text(text) {}
    const char* what() const noexcept override { return _text; }

    const char* const _text;
};

}  // namespace

TEST(HostileMessageTest, EveryByteComesOutAsItIs) {
    std::string all;
    for (int c = 0; c < 256; ++c) {
        all += static_cast<char>(c);
    }
    EXPECT_EQ(all + '\n', logged([&](Logger& logger) { logger.error(all); }));
    // A NUL ends what is given as characters.
    const std::string text = all.substr(1);
    EXPECT_EQ(text + '\n', logged([&](Logger& logger) { logger.error("%s", text.c_str()); }));
    EXPECT_EQ(text + '\n', logged([&](Logger& logger) { logger.error(Failure(text.c_str())); }));
}

TEST(HostileMessageTest, ConversionCharactersHaveNoMeaningInAText) {
    const std::string text = "%s%n%m%%%c %9999999999d %-5p{x}${QUELTA_HOME}\\n%";
    EXPECT_EQ(text + '\n', logged([&](Logger& logger) { logger.warn(text); }));
    EXPECT_EQ(text + '\n', logged([&](Logger& logger) { logger.warn("%s", text.c_str()); }));
    EXPECT_EQ(text + '\n', logged([&](Logger& logger) { logger.warn(Failure(text.c_str())); }));

    const TempDir dir;
    FileAppender log(dir.file("app.log"));
    log.line(text);
    EXPECT_EQ(text + '\n', readFile(dir.file("app.log")));
}

TEST(HostileMessageTest, AnExceptionWithoutATextIsLoggedAsNull) {
    EXPECT_EQ("(null)\n", logged([](Logger& logger) { logger.error(Failure(nullptr)); }));
    EXPECT_EQ("\n", logged([](Logger& logger) { logger.error(Failure("")); }));
}
