// Kills a logging process at random moments. QUELTA_KILLS sets the number of kills.
//
// The child acknowledges each line on a pipe after the call has returned. Each acknowledged line
// must be in the file exactly once. The next line may be there too, whole or in part.

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <random>
#include <string>

#include "support/FileAppender.h"
#include "support/NumberedLines.h"
#include "support/TempDir.h"

namespace {

constexpr long long MAX_SIZE = 20000;
constexpr unsigned KILLS_PER_DIRECTORY = 20;

[[noreturn]] void logUntilKilled(const std::string& file, unsigned round, int acknowledgements) {
    FileAppender log(file, MAX_SIZE, 100000);
    for (unsigned number = 0;; ++number) {
        log.line(numberedLine(round, number));
        if (::write(acknowledgements, "", 1) != 1) {
            ::_exit(1);
        }
    }
}

// Adds the number of acknowledgements to `count`; waits for at least one.
// Returns: false at end of file.
bool readAcknowledgements(int pipe, unsigned& count) {
    char buf[4096];
    const ssize_t got = ::read(pipe, buf, sizeof buf);
    count += got > 0 ? static_cast<unsigned>(got) : 0;
    return got > 0;
}

// Runs one child and kills it `delay` microseconds after its first line.
// Returns: the number of lines that it acknowledged.
unsigned linesBeforeTheKill(const std::string& file, unsigned round, unsigned delay) {
    int ends[2];
    EXPECT_EQ(0, ::pipe(ends));
    const pid_t child = ::fork();
    if (child == 0) {
        ::close(ends[0]);
        logUntilKilled(file, round, ends[1]);
    }
    ::close(ends[1]);
    unsigned count = 0;
    readAcknowledgements(ends[0], count);
    ::usleep(delay);
    ::kill(child, SIGKILL);
    while (readAcknowledgements(ends[0], count)) {}
    ::close(ends[0]);
    int status = 0;
    EXPECT_EQ(child, ::waitpid(child, &status, 0));
    EXPECT_TRUE(WIFSIGNALED(status));
    return count;
}

// Removes the acknowledged lines of a round from the text, then the next line as far as it was
// written.
void removeRound(std::string& text, unsigned round, unsigned acknowledged) {
    std::string expected;
    for (unsigned number = 0; number < acknowledged; ++number) {
        expected += numberedLine(round, number) + "\n";
    }
    ASSERT_EQ(expected, text.substr(0, expected.size())) << "round " << round;
    text.erase(0, expected.size());
    const std::string interrupted = numberedLine(round, acknowledged) + "\n";
    const std::string following = numberedLine(round + 1, 0) + "\n";
    std::size_t part = std::min(interrupted.size(), text.size());
    while (part > 0 && !(text.starts_with(interrupted.substr(0, part)) &&
                         (text.size() == part || text.substr(part).starts_with(following)))) {
        --part;
    }
    text.erase(0, part);
}

void killRepeatedly(unsigned kills, std::mt19937& random) {
    const TempDir dir;
    const std::string file = dir.file("app.log");
    std::vector<unsigned> acknowledged;
    for (unsigned round = 0; round < kills; ++round) {
        const unsigned delay = static_cast<unsigned>(random() % 4000);
        acknowledged.push_back(linesBeforeTheKill(file, round, delay));
    }
    std::string text = textOfGenerations(file);
    for (unsigned round = 0; round < kills; ++round) {
        ASSERT_GT(acknowledged[round], 0U);
        removeRound(text, round, acknowledged[round]);
    }
    EXPECT_EQ("", text);
    // Each process starts with the current size of the file, so no file exceeds the limit by more
    // than the last line of each of two processes.
    for (const std::string& path : generationsOf(file)) {
        EXPECT_LE(std::filesystem::file_size(path), MAX_SIZE + 2 * 120U) << path;
    }
}

}  // namespace

TEST(LogCrashTest, AcknowledgedLinesAreOnDiskOnce) {
    std::mt19937 random(20240229);
    const unsigned kills = scaled("QUELTA_KILLS", 20);
    for (unsigned done = 0; done < kills; done += KILLS_PER_DIRECTORY) {
        killRepeatedly(std::min(KILLS_PER_DIRECTORY, kills - done), random);
        ASSERT_FALSE(HasFailure()) << "after " << done << " kills";
    }
}
