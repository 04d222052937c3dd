// One run of the built program with all of its patterns, in the sample installation.

#include <gtest/gtest.h>

#include <filesystem>
#include <regex>
#include <string>

#include "support/RunProgram.h"
#include "support/TempDir.h"

namespace {

TEST(ReteFullRunTest, ReportsOnFiveMillionPatternsInTheSampleInstallation) {
    const TempDir home;
    std::filesystem::create_directories(home.file("etc"));
    std::filesystem::create_directories(home.file("var/log"));
    std::filesystem::copy(SAMPLE_CONFIG, home.file("etc/log-cmdline.cfg"));

    const ProgramRun run = Program(RETE).set("QUELTA_HOME", home.path()).run();
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
    // The counts are those of the GNU C library's random().
    const std::string report = "Using logging configuration at " + home.path() +
                               "/etc/log-cmdline.cfg.\n"
                               "431697 conditions\n"
                               "[]\n"
                               "292721 implications\n"
                               "TIME = ";
    ASSERT_EQ(report, run.out.substr(0, report.size()));
    EXPECT_TRUE(std::regex_match(run.out.substr(report.size()), std::regex("[0-9]+\n"))) << run.out;
    EXPECT_EQ("", readFile(home.file("var/log/cmdline.log")));
}

}  // namespace
