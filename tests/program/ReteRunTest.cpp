// The built program from start-up to its exit status. A random() that always returns 0 makes all
// patterns equal, so that a run is short and its report is always the same.

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <string>

#include "support/RunProgram.h"
#include "support/TempDir.h"

namespace {

const std::string stopLine = "QUELTA_HOME must be set.  Stopping.\n";
const std::string report = "1 conditions\n[]\n0 implications\nTIME = 0\n";

std::string announcement(const std::string& home) {
    return "Using logging configuration at " + home + "/etc/log-cmdline.cfg.\n";
}

// The clock may tick over during the timed span.
std::string withoutTime(std::string output) {
    const std::size_t time = output.rfind("TIME = 1\n");
    return time == std::string::npos ? output : output.replace(time, 9, "TIME = 0\n");
}

class ReteRunTest : public testing::Test {
protected:
    ReteRunTest() : _home(_dir.file("home")) {
        std::filesystem::create_directories(_home + "/etc");
        std::filesystem::permissions(_dir.path(), std::filesystem::perms{0755});
        // In the test's directory, where an unprivileged user can load it.
        std::filesystem::copy(UNIFORM_RANDOM, _dir.file("random.so"));
    }

    Program reteWithoutHome() const {
        const char* const options = std::getenv("ASAN_OPTIONS");
        Program rete(RETE);
        rete.set("LD_PRELOAD", _dir.file("random.so"));
        rete.set("ASAN_OPTIONS",
                 std::string(options == nullptr ? "" : options) + ":verify_asan_link_order=0");
        return rete;
    }
    Program rete() const { return reteWithoutHome().set("QUELTA_HOME", _home); }

    std::string config() const { return _home + "/etc/log-cmdline.cfg"; }
    std::string log() const { return _home + "/log"; }

    // Compares the exit status and both outputs of a run with the expected ones.
    static void expectRun(const Program& program, int status, const std::string& out,
                          const std::string& err) {
        const ProgramRun run = program.run();
        EXPECT_EQ(status, run.status);
        EXPECT_EQ(out, withoutTime(run.out));
        EXPECT_EQ(err, run.err);
    }

    TempDir _dir;
    const std::string _home;
};

TEST_F(ReteRunTest, StopsWithoutAnInstallation) {
    expectRun(reteWithoutHome(), 255, stopLine, "");
    expectRun(reteWithoutHome().set("QUELTA_HOME", ""), 255, stopLine, "");
    expectRun(reteWithoutHome().set("QUELTA_DB", _home), 255, stopLine, "");
}

TEST_F(ReteRunTest, AnnouncesItsConfigurationAndReports) {
    writeFile(config(), "rootCategory=DEBUG,A\nappender.A.fileName=${QUELTA_HOME}/log\n");
    expectRun(rete(), 0, announcement(_home) + report, "");
    EXPECT_EQ("", readFile(log()));
}

// With a sanitizer a run takes half a minute, so only the cases above run then.
#ifndef QUELTA_SANITIZED

TEST_F(ReteRunTest, ARelativeInstallationIsBelowTheWorkingDirectory) {
    writeFile(config(), "rootCategory=A\nappender.A.fileName=${QUELTA_HOME}/log\nbad\n");
    expectRun(reteWithoutHome().set("QUELTA_HOME", "home").in(_dir.path()), 0,
              announcement("home") + report, "");
    EXPECT_EQ("home/etc/log-cmdline.cfg:3: Parse error at \"bad\"\n", readFile(log()));
}

TEST_F(ReteRunTest, RemovesDoubledAndTrailingSeparators) {
    writeFile(config(), "");
    const std::string untidy = '/' + _dir.path() + "//home///";
    expectRun(reteWithoutHome().set("QUELTA_HOME", untidy), 0, announcement(_home) + report, "");
}

TEST_F(ReteRunTest, IgnoresItsArguments) {
    writeFile(config(), "");
    expectRun(rete().arg("--help").arg("--unknown").arg("-c").arg("other").arg("-p").arg("x"), 0,
              announcement(_home) + report, "");
}

TEST_F(ReteRunTest, ContinuesWithoutConfiguration) {
    expectRun(
        rete(), 0, announcement(_home) + report,
        "Couldn't open log file configuration \"" + config() + "\": No such file or directory\n");
}

TEST_F(ReteRunTest, ContinuesWhenTheInstallationDoesNotExist) {
    std::filesystem::remove_all(_home);
    expectRun(
        rete(), 0, announcement(_home) + report,
        "Couldn't open log file configuration \"" + config() + "\": No such file or directory\n");
}

TEST_F(ReteRunTest, ContinuesWhenTheConfigurationIsUnreadable) {
    writeFile(config(), "rootCategory=DEBUG\n");
    ::chmod(config().c_str(), 0000);
    // In a coverage build, an unprivileged user cannot write the usual counter files.
    std::filesystem::create_directory(_dir.file("counters"));
    ::chmod(_dir.file("counters").c_str(), 0777);
    expectRun(rete().set("GCOV_PREFIX", _dir.file("counters")).withoutRights(), 0,
              announcement(_home) + report,
              "Couldn't open log file configuration \"" + config() + "\": Permission denied\n");
}

TEST_F(ReteRunTest, ReadsADirectoryInPlaceOfTheConfigurationAsEmpty) {
    std::filesystem::create_directory(config());
    expectRun(rete(), 0, announcement(_home) + report, "");
}

TEST_F(ReteRunTest, ReportsEachBadLineOfTheConfiguration) {
    writeFile(config(),
              "rootCategory=INFO,nowhere\n"
              "category.X=loud\n"
              "\n"
              "no key\n"
              "appender.A.maxFileSize=10MB\n"
              "<!-- open\n");
    const std::string at = config() + ':';
    expectRun(rete(), 0, announcement(_home) + report,
              "Appender \"A\" has no filename, assuming stderr\n" +             //
                  at + "6: Unterminated XML comment started\n" +                //
                  at + "4: Parse error at \"no key\"\n" +                       //
                  at + "5: Parse error at \"appender.A.maxFileSize=10MB\"\n" +  //
                  at + "1: Parse error at \"INFO,nowhere\"\n" +                 //
                  at + "2: Parse error at \"X=loud\"\n");
}

TEST_F(ReteRunTest, ReportsALogFileThatCannotBeOpened) {
    writeFile(config(), "rootCategory=WARN,A\nappender.A.fileName=${QUELTA_HOME}/missing/log\n");
    expectRun(rete(), 0, announcement(_home) + report,
              "ERROR - Error opening \"" + _home + "/missing/log\": No such file or directory\n");
}

TEST_F(ReteRunTest, RunsWithStandardOutputClosed) {
    writeFile(config(), "rootCategory=WARN,A\nappender.A.fileName=${QUELTA_HOME}/log\n");
    expectRun(rete().closeOutput(), 0, "", "");
    EXPECT_EQ("", readFile(log()));
}

TEST_F(ReteRunTest, RunsWithStandardOutputFull) {
    writeFile(config(), "");
    expectRun(rete().outputTo("/dev/full"), 0, "", "");
}

// With the library's own random numbers. The patterns need more than four times this memory.
TEST_F(ReteRunTest, AbortsWithBadAllocWhenMemoryRunsOut) {
    writeFile(config(), "");
    Program real(RETE);
    ProgramRun run = real.set("QUELTA_HOME", _home).memoryLimit(256UL << 20).run();
    EXPECT_EQ(128 + SIGABRT, run.status);
    // abort() does not flush the buffered output.
    EXPECT_EQ("", run.out);
    // There may be too little memory left to demangle the name of the exception.
    const std::size_t mangled = run.err.find("St9bad_alloc");
    if (mangled != std::string::npos) {
        run.err.replace(mangled, 12, "std::bad_alloc");
    }
    EXPECT_EQ(
        "terminate called after throwing an instance of 'std::bad_alloc'\n"
        "  what():  std::bad_alloc\n",
        run.err);
}

#endif

}  // namespace
