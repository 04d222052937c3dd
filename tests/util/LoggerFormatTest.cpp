#include <gtest/gtest.h>

#include <cerrno>
#include <climits>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <vector>

#include "support/ScriptedCalls.h"
#include "util/Logger.h"

namespace {
std::vector<std::size_t> bufferSizes;  // of the calls of vsnprintf
std::string errorTextInstead;          // taken for the text of every error unless empty
std::size_t errorTextSize = 0;         // of the last buffer for one
}  // namespace

extern "C" {
int __real_vsnprintf(char* buf, std::size_t size, const char* fmt, va_list ap)
    __attribute__((format(printf, 3, 0)));
int __wrap_vsnprintf(char* buf, std::size_t size, const char* fmt, va_list ap)
    __attribute__((format(printf, 3, 0)));
int __wrap_vsnprintf(char* buf, std::size_t size, const char* fmt, va_list ap) {
    bufferSizes.push_back(size);
    return scriptedCall("vsnprintf", [&] { return __real_vsnprintf(buf, size, fmt, ap); });
}
// The strerror_r that reports failures.
int __real___xpg_strerror_r(int errnum, char* buf, std::size_t size);
int __wrap___xpg_strerror_r(int errnum, char* buf, std::size_t size) {
    errorTextSize = size;
    if (!errorTextInstead.empty()) {
        std::strcpy(buf, errorTextInstead.c_str());
        return 0;
    }
    return scriptedCall("strerror_r", [&] { return __real___xpg_strerror_r(errnum, buf, size); });
}
}

// The internal functions, which other programs may declare for themselves.
bool setup_log_channel(const std::string& line);
void fallback_to_stderr(LogLevel level, const std::string& msg);
Timeval& epoch_timeval();
bool read_line(std::string& result, std::FILE* ifile);
bool handle_xml_comment(std::string& result, const char* cf, unsigned& lineno, std::FILE* ifile);

namespace {

class LoggerFormatTest : public testing::Test {
protected:
    LoggerFormatTest() {
        bufferSizes.clear();
        errorTextInstead.clear();
    }
    ~LoggerFormatTest() override { errorTextInstead.clear(); }

    // vformat through a variadic function of its own.
    __attribute__((format(printf, 3, 4))) std::string formatted(int errnum, const char* fmt, ...) {
        std::string out = "what was there before";
        va_list ap;
        va_start(ap, fmt);
        Logger::vformat(out, errnum, fmt, ap);
        va_end(ap);
        return out;
    }
};

TEST_F(LoggerFormatTest, ReplacesTheStringByTheFormattedText) {
    EXPECT_EQ("7 x 1.50 %", formatted(0, "%d %s %.2f %%", 7, "x", 1.5));
    EXPECT_EQ("plain", formatted(0, "plain"));
    const char* const empty = "";
    EXPECT_EQ("", formatted(0, "%s", empty));
}

TEST_F(LoggerFormatTest, PutsTheErrorTextForPercentM) {
    const std::string text = std::strerror(ENOENT);
    EXPECT_EQ(text, formatted(ENOENT, "%m"));
    EXPECT_EQ("a: " + text + " (" + text + ")", formatted(ENOENT, "a: %m (%m)"));
    EXPECT_EQ("3 " + text + " x", formatted(ENOENT, "%d %m %s", 3, "x"));
    EXPECT_EQ(std::strerror(0), formatted(0, "%m"));
}

TEST_F(LoggerFormatTest, LeavesPairsOfPercentSignsAlone) {
    const std::string text = std::strerror(EACCES);
    EXPECT_EQ("%m", formatted(EACCES, "%%m"));
    EXPECT_EQ("%" + text, formatted(EACCES, "%%%m"));
    EXPECT_EQ("%%m", formatted(EACCES, "%%%%m"));
    EXPECT_EQ(text + "%", formatted(EACCES, "%m%%"));
    EXPECT_EQ(text + " 5%m%", formatted(EACCES, "%m %d%%m%%", 5));
}

TEST_F(LoggerFormatTest, NamesNumbersThatAreNoErrors) {
    EXPECT_EQ("a UNKNOWN ERROR b", formatted(99999, "a %m b"));
    EXPECT_EQ("UNKNOWN ERROR", formatted(-1, "%m"));
    EXPECT_EQ("UNKNOWN ERROR", formatted(INT_MAX, "%m"));
    ScriptedCalls texts("strerror_r");
    texts.give(ERANGE);
    EXPECT_EQ("UNKNOWN ERROR", formatted(ENOENT, "%m"));
    EXPECT_EQ(1u, texts.calls());
}

TEST_F(LoggerFormatTest, AsksForNoErrorTextWithoutPercentM) {
    const ScriptedCalls texts("strerror_r");
    EXPECT_EQ("100%", formatted(ENOENT, "%d%%", 100));
    EXPECT_EQ(0u, texts.calls());
}

TEST_F(LoggerFormatTest, TakesAnErrorTextOf999CharactersWhole) {
    errorTextInstead = std::string(999, 'e');
    EXPECT_EQ("<" + errorTextInstead + ">", formatted(ENOSPC, "<%m>"));
    EXPECT_EQ(1000u, errorTextSize);
}

TEST_F(LoggerFormatTest, ReadsConversionsInAnErrorText) {
    errorTextInstead = "disk 100%% full";
    EXPECT_EQ("disk 100% full", formatted(ENOSPC, "%m"));
}

TEST_F(LoggerFormatTest, TakesTheCurrentErrorUnlessToldAnother) {
    std::string out;
    errno = EPERM;
    Logger::format(out, "%s: %m", "now");
    EXPECT_EQ(std::string("now: ") + std::strerror(EPERM), out);
    errno = EPERM;
    Logger::format(out, ENOSPC, "%s: %m", "told");
    EXPECT_EQ(std::string("told: ") + std::strerror(ENOSPC), out);
    Logger::format(out, 0, "%m");
    EXPECT_EQ(std::strerror(0), out);
    Logger::format(out, "%d", 3);
    EXPECT_EQ("3", out);
}

TEST_F(LoggerFormatTest, FormatsTextsOfAnyLength) {
    for (std::size_t length = 0; length < 1100; ++length) {
        const std::string text(length, 'x');
        EXPECT_EQ(text, formatted(0, "%s", text.c_str())) << length;
    }
    const std::string huge(1000000, 'y');
    EXPECT_EQ(huge + huge, formatted(0, "%s%s", huge.c_str(), huge.c_str()));
}

TEST_F(LoggerFormatTest, TriesABufferOf256BytesAndThenOneOfTheExactSize) {
    formatted(0, "%s", std::string(255, 'x').c_str());
    EXPECT_EQ(std::vector<std::size_t>{256}, bufferSizes);
    bufferSizes.clear();
    formatted(0, "%s", std::string(256, 'x').c_str());
    EXPECT_EQ((std::vector<std::size_t>{256, 257}), bufferSizes);
    bufferSizes.clear();
    formatted(0, "%s", std::string(5000, 'x').c_str());
    EXPECT_EQ((std::vector<std::size_t>{256, 5001}), bufferSizes);
}

TEST_F(LoggerFormatTest, DoublesTheBufferWhenNoSizeIsTold) {
    ScriptedCalls calls("vsnprintf");
    calls.give(-1, 3);
    EXPECT_EQ("12 x", formatted(0, "%d %s", 12, "x"));
    EXPECT_EQ((std::vector<std::size_t>{256, 512, 1024, 2048}), bufferSizes);
}

TEST_F(LoggerFormatTest, MixesDoublingAndExactSizes) {
    ScriptedCalls calls("vsnprintf");
    calls.give(-1).pass();
    const std::string text(600, 'x');
    EXPECT_EQ(text, formatted(0, "%s", text.c_str()));
    EXPECT_EQ((std::vector<std::size_t>{256, 512, 601}), bufferSizes);
}

TEST_F(LoggerFormatTest, GivesUpOnAFormatThatNoBufferHelps) {
    ScriptedCalls calls("vsnprintf");
    calls.give(-1, 100);
    std::string out = "before";
    EXPECT_THROW(Logger::format(out, "%d", 1), std::runtime_error);
    EXPECT_EQ("before", out);
    EXPECT_EQ(256u, bufferSizes.front());
    EXPECT_EQ(1024u * 1024, bufferSizes.back());
    EXPECT_EQ(13u, bufferSizes.size());
}

TEST_F(LoggerFormatTest, GivesUpOnAWideCharacterWithoutAForm) {
    const wchar_t surrogate[] = {0xd800, 0};
    std::string out;
    EXPECT_THROW(Logger::format(out, "%ls", surrogate), std::runtime_error);
}

TEST_F(LoggerFormatTest, ReadsItsArgumentsBeforeItReplacesTheString) {
    std::string out = "text";
    Logger::format(out, "<%s> %m", out.c_str());
    EXPECT_EQ(0u, out.find("<text> "));
    std::string longer(300, 'x');
    Logger::format(longer, "<%s>", longer.c_str());
    EXPECT_EQ("<" + std::string(300, 'x') + ">", longer);
}

// Nothing but Logger.h is included here.
TEST(LoggerHeader, BringsTheWholeOfLoggingAlong) {
    const Logger logger("net.Http");
    std::string line;
    LogFormat("%p %c %m").apply(line, LogMsgMetadata(&logger, WARN), "hello");
    EXPECT_EQ("WARN net.Http hello", line);
    EXPECT_EQ(nullptr, LogAppender::find("absent", false));
    EXPECT_TRUE((std::is_same_v<bool, decltype(Logger::initialize("log.cfg", "/home"))>));
}

TEST(LoggerHeader, InternalFunctionsNeedNoHeader) {
    EXPECT_TRUE(setup_log_channel("declared here=ALERT"));
    EXPECT_EQ(ALERT, LogChannel::find("declared here", false)->minlevel);
    EXPECT_EQ(&epoch_timeval(), &epoch_timeval());
    testing::internal::CaptureStderr();
    fallback_to_stderr(INFO, "text");
    EXPECT_EQ("INFO - text\n", testing::internal::GetCapturedStderr());

    char contents[] = "one\ntwo --> three\n";
    std::FILE* const file = ::fmemopen(contents, sizeof contents - 1, "r");
    std::string line;
    EXPECT_TRUE(read_line(line, file));
    EXPECT_EQ("one", line);
    unsigned lineno = 1;
    EXPECT_TRUE(handle_xml_comment(line, "", lineno, file));
    EXPECT_EQ("one three", line);
    EXPECT_EQ(2u, lineno);
    std::fclose(file);
}

TEST_F(LoggerFormatTest, KeepsCharactersBehindANul) {
    EXPECT_EQ(std::string("a\0b", 3), formatted(0, "a%cb", 0));
}

}  // namespace
