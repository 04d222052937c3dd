#include <gtest/gtest.h>

#include <cerrno>
#include <climits>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <new>
#include <string>
#include <type_traits>
#include <vector>

#include "support/ScriptedLibc.h"
#include "util/Logger.h"

// The internal functions, which other programs may declare for themselves.
bool setup_log_channel(const std::string& line);
void fallback_to_stderr(LogLevel level, const std::string& msg);
Timeval& epoch_timeval();
bool read_line(std::string& result, std::FILE* ifile);
bool handle_xml_comment(std::string& result, const char* cf, unsigned& lineno, std::FILE* ifile);

namespace {

using Calls = std::vector<std::string>;

class LoggerFormatTest : public testing::Test {
protected:
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

TEST_F(LoggerFormatTest, NamesNumbersThatAreNotErrors) {
    EXPECT_EQ("a UNKNOWN ERROR b", formatted(99999, "a %m b"));
    EXPECT_EQ("UNKNOWN ERROR", formatted(-1, "%m"));
    EXPECT_EQ("UNKNOWN ERROR", formatted(INT_MAX, "%m"));
    ScriptedCalls texts("__xpg_strerror_r");
    texts.give(ERANGE);
    EXPECT_EQ("UNKNOWN ERROR", formatted(ENOENT, "%m"));
    EXPECT_EQ(1u, texts.calls());
}

TEST_F(LoggerFormatTest, AsksForNoErrorTextWithoutPercentM) {
    const ScriptedCalls texts("__xpg_strerror_r");
    EXPECT_EQ("100%", formatted(ENOENT, "%d%%", 100));
    EXPECT_EQ(0u, texts.calls());
}

TEST_F(LoggerFormatTest, ReadsConversionsInAnErrorTextOfUpTo999Characters) {
    const Replacement texts(replacement::__xpg_strerror_r, [](int, char* buf, std::size_t size) {
        std::strcpy(buf, ("100%%" + std::string(size - 6, 'e')).c_str());
        return 0;
    });
    const RecordedCalls seen;
    EXPECT_EQ("<100%" + std::string(994, 'e') + ">", formatted(ENOSPC, "<%m>"));
    EXPECT_EQ("__xpg_strerror_r 1000", seen.calls().front());
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

TEST_F(LoggerFormatTest, TriesABufferOf256BytesAndThenOneOfTheSizeThatVsnprintfReturns) {
    const struct {
        unsigned failures;  // of vsnprintf, which returns no size then
        std::size_t length;
        Calls calls;
    } rows[] = {{0, 255, {"vsnprintf 256"}},
                {0, 256, {"vsnprintf 256", "vsnprintf 257"}},
                {0, 5000, {"vsnprintf 256", "vsnprintf 5001"}},
                {3, 4, {"vsnprintf 256", "vsnprintf 512", "vsnprintf 1024", "vsnprintf 2048"}},
                {1, 600, {"vsnprintf 256", "vsnprintf 512", "vsnprintf 601"}}};
    for (const auto& row : rows) {
        const std::string text(row.length, 'x');
        ScriptedCalls formats("vsnprintf");
        formats.give(-1, row.failures);
        const RecordedCalls seen;
        EXPECT_EQ(text, formatted(0, "%s", text.c_str()));
        EXPECT_EQ(row.calls, seen.calls());
    }
}

TEST_F(LoggerFormatTest, GivesUpOnAFormatThatNoBufferHelps) {
    ScriptedCalls calls("vsnprintf");
    calls.give(-1, 100);
    std::string out = "before";
    EXPECT_THROW(Logger::format(out, "%d", 1), std::bad_alloc);
    EXPECT_EQ("before", out);
    EXPECT_EQ(13u, calls.calls());
}

TEST_F(LoggerFormatTest, GivesUpOnAWideCharacterWithoutAForm) {
    const wchar_t surrogate[] = {0xd800, 0};
    std::string out;
    EXPECT_THROW(Logger::format(out, "%ls", surrogate), std::bad_alloc);
}

TEST_F(LoggerFormatTest, ReadsItsArgumentsBeforeItReplacesTheString) {
    std::string out = "text";
    Logger::format(out, "<%s> %m", out.c_str());
    EXPECT_EQ(0u, out.find("<text> "));
    std::string longer(300, 'x');
    Logger::format(longer, "<%s>", longer.c_str());
    EXPECT_EQ("<" + std::string(300, 'x') + ">", longer);
}

// This source includes no other header of logging.
TEST(LoggerHeaderTest, BringsTheWholeOfLoggingAlong) {
    const Logger logger("net.Http");
    std::string line;
    LogFormat("%p %c %m").apply(line, LogMsgMetadata(&logger, WARN), "hello");
    EXPECT_EQ("WARN net.Http hello", line);
    EXPECT_EQ(nullptr, LogAppender::find("absent", false));
    EXPECT_TRUE((std::is_same_v<bool, decltype(Logger::initialize("log.cfg", "/home"))>));
}

TEST(LoggerHeaderTest, InternalFunctionsNeedNoHeader) {
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

TEST_F(LoggerFormatTest, KeepsCharactersAfterANul) {
    EXPECT_EQ(std::string("a\0b", 3), formatted(0, "a%cb", 0));
}

}  // namespace
