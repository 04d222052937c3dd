// Rotation by size into numbered backups.

#include <gtest/gtest.h>

#include <climits>
#include <filesystem>
#include <map>
#include <string>

#include "support/FileAppender.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"

namespace fs = std::filesystem;

namespace {

using Files = std::map<std::string, std::string>;  // contents by name

Files filesIn(const TempDir& dir) {
    Files files;
    for (const auto& entry : fs::directory_iterator(dir.path())) {
        files[entry.path().filename()] = readFile(entry.path());
    }
    return files;
}

std::string nameOf(unsigned suffix) {
    return suffix == 0 ? "app.log" : "app.log." + std::to_string(suffix);
}

// A slow model of the rule: the files of a directory after a rotation.
Files rotated(Files files, unsigned backups) {
    unsigned slot = 0;
    while (slot < backups && files.count(nameOf(slot)) != 0) {
        ++slot;
    }
    files.erase(nameOf(slot));
    for (; slot > 0; --slot) {
        files[nameOf(slot)] = files[nameOf(slot - 1)];
        files.erase(nameOf(slot - 1));
    }
    files[nameOf(0)] = "";
    return files;
}

const std::string LINE_OF_30(29, 'x');

}  // namespace

TEST(LogRotationTest, RotatesAfterTheLineThatPassesTheLimit) {
    const TempDir dir;
    FileAppender log(dir.file("app.log"), 100, 2);
    const std::string line = LINE_OF_30 + "\n";
    for (int i = 0; i < 3; ++i) {
        log.line(LINE_OF_30);
    }
    EXPECT_EQ((Files{{"app.log", line + line + line}}), filesIn(dir));
    log.line(LINE_OF_30);
    const std::string full = line + line + line + line;
    EXPECT_EQ((Files{{"app.log", ""}, {"app.log.1", full}}), filesIn(dir));
    for (int i = 0; i < 37; ++i) {
        log.line(LINE_OF_30);
    }
    EXPECT_EQ((Files{{"app.log", line}, {"app.log.1", full}, {"app.log.2", full}}), filesIn(dir));
}

TEST(LogRotationTest, MovesOnlyTheBackupsBelowTheFirstGap) {
    const TempDir dir;
    FileAppender log(dir.file("app.log"), 1, 3);
    writeFile(dir.file("app.log.1"), "one");
    writeFile(dir.file("app.log.3"), "three");
    log.line("base");
    EXPECT_EQ((Files{{"app.log", ""},
                     {"app.log.1", "base\n"},
                     {"app.log.2", "one"},
                     {"app.log.3", "three"}}),
              filesIn(dir));
}

TEST(LogRotationTest, EveryPatternOfBackupsFollowsTheRule) {
    for (unsigned backups = 0; backups <= 5; ++backups) {
        for (unsigned present = 0; present < 32; ++present) {
            const TempDir dir;
            FileAppender log(dir.file("app.log"), 4, backups);
            for (unsigned suffix = 1; suffix <= 5; ++suffix) {
                if ((present >> (suffix - 1) & 1U) != 0) {
                    writeFile(dir.file(nameOf(suffix)), "generation " + std::to_string(suffix));
                }
            }
            Files model = filesIn(dir);
            for (const char* const line : {"first", "second", "third"}) {
                log.line(line);
                model[nameOf(0)] = std::string(line) + "\n";
                model = rotated(model, backups);
                ASSERT_EQ(model, filesIn(dir)) << backups << " backups, present " << present;
            }
        }
    }
}

TEST(LogRotationTest, WithoutBackupsTheFileIsDeletedAndANewOneStarted) {
    const TempDir dir;
    FileAppender log(dir.file("app.log"), 5, 0);
    log.line("12345");
    EXPECT_EQ((Files{{"app.log", ""}}), filesIn(dir));
    log.line("67");
    EXPECT_EQ((Files{{"app.log", "67\n"}}), filesIn(dir));
}

TEST(LogRotationTest, ALimitOfZeroIsNone) {
    const TempDir dir;
    FileAppender log(dir.file("app.log"), 0, 0);
    for (int i = 0; i < 100; ++i) {
        log.line("text");
    }
    EXPECT_EQ(500U, readFile(dir.file("app.log")).size());
    EXPECT_EQ(1U, filesIn(dir).size());
}

TEST(LogRotationTest, AFileAtItsLimitExactlyIsNotRotated) {
    const TempDir dir;
    for (const long long lines : {1LL, 2LL, 7LL}) {
        const std::string file = dir.file("exact" + std::to_string(lines));
        FileAppender log(file, 30 * lines, 1);
        for (long long i = 0; i < lines; ++i) {
            log.line(LINE_OF_30);
        }
        EXPECT_FALSE(fs::exists(file + ".1")) << lines;
        log.line("");
        EXPECT_EQ(static_cast<std::size_t>(30 * lines + 1), readFile(file + ".1").size());
        EXPECT_EQ("", readFile(file));
    }
}

TEST(LogRotationTest, TheSizeOfAnExistingFileCounts) {
    const TempDir dir;
    writeFile(dir.file("app.log"), std::string(95, 'o'));
    FileAppender log(dir.file("app.log"), 100, 1);
    log.line("1234");
    EXPECT_EQ(100, log._curSize);
    EXPECT_FALSE(fs::exists(dir.file("app.log.1")));
    log.line("");
    EXPECT_EQ(101U, readFile(dir.file("app.log.1")).size());
    EXPECT_EQ(0, log._curSize);
}

TEST(LogRotationTest, TheNewFileIsTheOneThatIsWatched) {
    const TempDir dir;
    FileAppender log(dir.file("app.log"), 5, 2);
    log.line("12345", 1000);
    log.line("67", 1003);
    fs::rename(dir.file("app.log"), dir.file("moved"));
    log.line("8", 1005);
    log.line("9", 1006);
    EXPECT_EQ("67\n8\n", readFile(dir.file("moved")));
    EXPECT_EQ("9\n", readFile(dir.file("app.log")));
}

TEST(LogRotationTest, ABaseFileThatWasMovedAwayLeavesTheBackupsAlone) {
    const TempDir dir;
    FileAppender log(dir.file("app.log"), 5, 2);
    writeFile(dir.file("app.log.1"), "one");
    log.line("12", 1000);
    fs::rename(dir.file("app.log"), dir.file("moved"));
    log.line("345", 1001);
    EXPECT_EQ((Files{{"app.log", ""}, {"app.log.1", "one"}, {"moved", "12\n345\n"}}), filesIn(dir));
}

TEST(LogRotationTest, TheLargestNumberOfBackupsIsNoTrouble) {
    const TempDir dir;
    FileAppender log(dir.file("app.log"), 1, UINT_MAX);
    log.line("1");
    log.line("2");
    EXPECT_EQ((Files{{"app.log", ""}, {"app.log.1", "2\n"}, {"app.log.2", "1\n"}}), filesIn(dir));
}

TEST(LogRotationTest, BackupNamesAreTheFileNameAPointAndTheNumber) {
    LogAppender appender;
    ASSERT_TRUE(appender.setAttribute("fileName", "a/app.log", Pathname()));
    const struct {
        unsigned suffix;
        const char* expected;
    } table[] = {{0, "a/app.log"},
                 {1, "a/app.log.1"},
                 {10, "a/app.log.10"},
                 {UINT_MAX, "a/app.log.4294967295"}};
    Pathname result("left over");
    for (const auto& row : table) {
        appender.filenameWithSuffix(result, row.suffix);
        EXPECT_EQ(row.expected, result);
    }
}

TEST(LogRotationTest, ADirectoryInTheWayOfABackupLeavesTheFilesAsTheyAre) {
    const TempDir dir;
    FileAppender log(dir.file("app.log"), 1, 1);
    fs::create_directories(dir.file("app.log.1/occupied"));
    const StderrCapture err;
    log.line("1");
    log.line("2");
    EXPECT_EQ("1\n2\n", readFile(dir.file("app.log")));
    EXPECT_EQ("", err.text());
}
