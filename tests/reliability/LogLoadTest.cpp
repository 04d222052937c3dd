// Many threads log many lines. QUELTA_LOAD_LINES sets the number of lines for each thread.

#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

#include "support/FileAppender.h"
#include "support/NumberedLines.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"
#include "util/LogChannel.h"
#include "util/internal/LogConfig.h"
#include "util/internal/LogGlobals.h"

namespace {

constexpr unsigned THREADS = 16;
constexpr unsigned BACKUPS = 100000;  // more than any run needs, so that no line is deleted

template <typename Write>
void onSixteenThreads(unsigned lines, Write write) {
    std::vector<std::thread> threads;
    for (unsigned thread = 0; thread < THREADS; ++thread) {
        threads.emplace_back([=] {
            for (unsigned number = 0; number < lines; ++number) {
                write(numberedLine(thread, number));
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
}

}  // namespace

TEST(LogLoadTest, EveryLineIsWholeAndInOrderAcrossAllGenerations) {
    const unsigned lines = scaled("QUELTA_LOAD_LINES", 2000);
    const TempDir dir;
    const StderrCapture err;
    FileAppender log(dir.file("app.log"), 1000000, BACKUPS);
    onSixteenThreads(lines, [&log](const std::string& text) { log.line(text); });
    expectEveryLine(textOfGenerations(dir.file("app.log")), THREADS, lines);
    EXPECT_GE(generationsOf(dir.file("app.log")).size(), 2U);
    EXPECT_EQ("", err.text());
}

TEST(LogLoadTest, TwoAppendersOnOneChannelEachGetEveryLine) {
    const unsigned lines = scaled("QUELTA_LOAD_LINES", 2000);
    const TempDir dir;
    const StderrCapture err;
    for (const std::string name : {"one", "two"}) {
        LogAppender& appender = *LogAppender::find(name, true);
        ASSERT_TRUE(appender.setAttribute("fileName", dir.file(name).c_str(), Pathname()));
        ASSERT_TRUE(appender.setAttribute("maxFileSize", "1000000", Pathname()));
        ASSERT_TRUE(appender.setAttribute("maxBackupIndex", "100000", Pathname()));
        appender.finalSetup(name.c_str());
    }
    ASSERT_TRUE(setup_log_channel("Load=INFO, one, two"));
    static Logger logger("Load");
    Logger::initialize();
    onSixteenThreads(lines, [](const std::string& text) { logger.info(text); });
    expectEveryLine(textOfGenerations(dir.file("one")), THREADS, lines);
    expectEveryLine(textOfGenerations(dir.file("two")), THREADS, lines);
    EXPECT_EQ("", err.text());
}
