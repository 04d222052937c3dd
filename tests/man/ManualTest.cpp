// The examples in the manual page of the configuration file. Each part of a file is read without a
// report. Each pattern and the file with mistakes print what the page shows.

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <regex>
#include <set>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "support/InChild.h"
#include "support/TempDir.h"
#include "util/LogFormat.h"
#include "util/LogMsgMetadata.h"
#include "util/Logger.h"
#include "util/Pathname.h"
#include "util/internal/LogGlobals.h"

namespace {

std::string replaced(std::string text, const std::string& what, const std::string& by) {
    for (std::size_t at = 0; (at = text.find(what, at)) != std::string::npos; at += by.size()) {
        text.replace(at, what.size(), by);
    }
    return text;
}

// The text between each `begin` line and the next `end` line, without the escapes of the page's
// source.
std::vector<std::string> blocks(const std::string& begin, const std::string& end) {
    std::istringstream page(readFile(MANUAL));
    std::vector<std::string> found;
    bool inside = false;
    for (std::string line; std::getline(page, line);) {
        if (line == begin) {
            found.emplace_back();
            inside = true;
        } else if (line == end) {
            inside = false;
        } else if (inside) {
            found.back() += replaced(line, "\\-", "-") + '\n';
        }
    }
    return found;
}

// An example is either lines of the file or "PATTERN OUTPUT".
bool showsPattern(const std::string& line) {
    return line.find('%') < line.find('=');
}

std::vector<std::string> configurations() {
    std::vector<std::string> found = blocks(".EX", ".EE");
    std::erase_if(found, showsPattern);
    return found;
}

std::vector<std::pair<std::string, std::string>> patterns() {
    const std::regex columns("(.*?\\S) {2,}(.*)");
    std::vector<std::pair<std::string, std::string>> found;
    for (const std::string& block : blocks(".EX", ".EE")) {
        std::istringstream lines(block);
        for (std::string line; std::getline(lines, line);) {
            std::smatch parts;
            if (showsPattern(line) && std::regex_match(line, parts, columns)) {
                found.emplace_back(parts[1], parts[2]);
            }
        }
    }
    return found;
}

// The message that the page describes.
std::string rendered(const std::string& pattern) {
    static const Logger rete("Rete");
    LogMsgMetadata mdata(&rete, WARN);
    struct tm local = {};
    local.tm_year = 101;
    local.tm_mon = 1;
    local.tm_mday = 3;
    local.tm_hour = 4;
    local.tm_min = 5;
    local.tm_sec = 6;
    local.tm_isdst = -1;
    const time_t seconds = std::mktime(&local);
    mdata.stamp.set(seconds, 7500);
    epoch_timeval().set(seconds - 4, 551500);
    std::string line;
    LogFormat(pattern.c_str()).apply(line, mdata, "disk full");
    return line;
}

TEST(ManualTest, ExamplesOfPatternsRenderAsShown) {
    const auto examples = patterns();
    std::set<char> shown;
    for (const auto& [pattern, output] : examples) {
        std::string line = rendered(pattern);
        if (pattern.find("%u") != std::string::npos) {
            // Processor time is different each time.
            line = std::regex_replace(line, std::regex("^[0-9]+"), "61234");
        }
        EXPECT_EQ(output, replaced(line, "\n", "")) << pattern;
        for (std::size_t at = pattern.find('%'); at != std::string::npos && at + 1 < pattern.size();
             at = pattern.find('%', at + 2)) {
            shown.insert(pattern[at + 1]);
        }
    }
    for (const char conversion : std::string("mn%cptrRud")) {
        EXPECT_TRUE(shown.contains(conversion)) << "no example of %" << conversion;
    }
    EXPECT_LE(20U, examples.size());
}

TEST(ManualTest, ExamplesOfTheFileAreReadWithoutAReport) {
    std::string all;
    for (const std::string& block : configurations()) {
        all += block;
        const TempDir dir;
        std::filesystem::create_directories(dir.file("var/log"));
        std::string lines = replaced(block, "/tmp/", dir.path() + '/');
        lines = replaced(lines, "=/var/log/", '=' + dir.path() + "/var/log/");
        // Examples name appenders that other examples create.
        writeFile(dir.file("cfg"), "appender.A1=\nappender.A2=\n" + lines);
        const ChildRun run = inChild([&] {
            EXPECT_TRUE(Logger::initialize(Pathname(dir.file("cfg")), Pathname(dir.path())));
        });
        EXPECT_EQ(0, run.status) << block;
        EXPECT_EQ(std::string::npos, run.err.find(dir.file("cfg"))) << run.err << block;
    }
    for (const char* key :
         {"\nrootCategory=", "\ncategory.", "\nappender.A1=", ".fileName=", ".maxFileSize=",
          ".maxBackupIndex=", ".layout=", ".layout.ConversionPattern=", "\nlog4cpp."}) {
        EXPECT_NE(std::string::npos, ('\n' + all).find(key)) << "no example of " << key;
    }
}

TEST(ManualTest, NamesEveryReport) {
    const std::string page = replaced(readFile(MANUAL), "\\-", "-");
    for (const char* report :
         {"Couldn't open log file configuration \"", ": Parse error at \"",
          ": Unterminated XML comment started", "\" has no filename, assuming stderr",
          "\" has maxBackupIndex set without specifying a filename, ignoring",
          "\" has maxSize set without specifying a filename, ignoring",
          "\" has maxBackupIndex set without specifying maxSize, ignoring", "Error opening \"",
          "Error calling fstat on \"", "Error writing to \""}) {
        EXPECT_NE(std::string::npos, page.find(report)) << report;
    }
}

TEST(ManualTest, BadFileIsReportedAsShown) {
    const std::vector<std::string> shown = blocks(".nf", ".fi");
    ASSERT_EQ(2U, shown.size());
    const TempDir dir;
    writeFile(dir.file("log-cmdline.cfg"), shown[0]);
    const ChildRun run = inChild([&] {
        EXPECT_EQ(0, ::chdir(dir.path().c_str()));
        EXPECT_TRUE(Logger::initialize(Pathname("log-cmdline.cfg"), Pathname()));
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ(shown[1], run.err);
}

TEST(ManualTest, SampleConfigurationIsReadWithoutAReport) {
    const TempDir home;
    std::filesystem::create_directories(home.file("var/log"));
    const ChildRun run = inChild([&] {
        EXPECT_TRUE(Logger::initialize(Pathname(SAMPLE_CONFIG), Pathname(home.path())));
        Logger("Thread").debug("the first line");
        Logger("other").info("not written");
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
    const std::string log = readFile(home.file("var/log/cmdline.log"));
    EXPECT_TRUE(std::regex_match(
        log,
        std::regex(
            "[0-9]{2}-[0-9]{2}-[0-9]{4} [0-9:]{8}\\.[0-9]{3} DEBUG Thread - the first line\n")))
        << log;
}

}  // namespace
