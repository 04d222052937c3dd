#include "util/LoaderInfo.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <climits>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <functional>
#include <string>
#include <type_traits>

#include "support/Arguments.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"
#include "util/Logger.h"

namespace {

static_assert(!std::is_polymorphic_v<LoaderInfo>);

const Arguments none;

// --- Defaults --------------------------------------------------------------------------------

TEST(LoaderInfoTest, StartsEmpty) {
    const LoaderInfo info;
    EXPECT_EQ("", info.getQueltaHome());
    EXPECT_EQ("", info.getQueltaDb());
    EXPECT_EQ("", info.getComponentName());
    EXPECT_EQ("", info._commonConfigPath);
    EXPECT_EQ("", info.getInstallName());
    EXPECT_EQ("", info.getHost());
    EXPECT_EQ("", info.getStartupMode());
    EXPECT_EQ(0, info.getPort());
    EXPECT_EQ(0, info.getPid());
    EXPECT_EQ(0, info.getStartupTime());
    EXPECT_FALSE(info.getDebug());
    EXPECT_FALSE(info.getUseDebugLog());
    EXPECT_FALSE(info.getDaemon());
    EXPECT_FALSE(info.isError());
    EXPECT_EQ(nullptr, info._poptContext);
    EXPECT_STREQ("", info.getCommonComponentNode().get_content());
}

void expectDefaults(const LoaderInfo& info, time_t before) {
    EXPECT_EQ("queltad", info.getComponentName());
    EXPECT_EQ("etc", info._commonConfigPath);
    EXPECT_EQ("myinstall", info.getInstallName());
    EXPECT_EQ(8089, info.getPort());
    EXPECT_EQ(::getpid(), info.getPid());
    EXPECT_LE(before, info.getStartupTime());
    EXPECT_GE(std::time(nullptr), info.getStartupTime());
    EXPECT_TRUE(info.getDebug());
    EXPECT_TRUE(info.getDaemon());
    EXPECT_FALSE(info.getUseDebugLog());
    EXPECT_FALSE(info.isError());
    EXPECT_NE(nullptr, info._poptContext);
    EXPECT_EQ(0, info._poptIsDebug);
    EXPECT_EQ(0, info._poptUseDebugLog);
    EXPECT_EQ(0, info._poptIsNodaemon);
    EXPECT_EQ(0, info._poptRpcPort);
    for (const char* value : {info._poptCommonConfigPath, info._poptHost, info._poptInstallName,
                              info._poptComponentName, info._poptStartupMode}) {
        EXPECT_EQ(nullptr, value);
    }
}

TEST(LoaderInfoTest, InitSetsTheDefaultsEachTimeAndLeavesTheRest) {
    const StderrCapture err;
    const Arguments options({"-c", "c", "-h", "h", "-i", "i", "-n", "n", "-p", "1", "--mode", "m",
                             "--debug", "--nodaemon", "--noseg", "--unknown"});
    LoaderInfo info;
    info._queltaHome = "/home";
    info._queltaDb = "/db";
    const time_t before = std::time(nullptr);
    info.init(options.argc(), options.argv());
    expectDefaults(info, before);
    info.populateFromCommandLine();
    EXPECT_TRUE(info.isError());

    poptContext const used = info._poptContext;
    info._pid = 1;
    info._startupTime = 1;
    info.init(none.argc(), none.argv());
    expectDefaults(info, before);
    EXPECT_NE(used, info._poptContext);
    EXPECT_EQ("/home", info.getQueltaHome());
    EXPECT_EQ("/db", info.getQueltaDb());
    EXPECT_EQ("h", info.getHost());
    EXPECT_EQ("m", info.getStartupMode());
}

TEST(LoaderInfoTest, InstanceIsCreatedOnceAndEmpty) {
    EXPECT_EXIT(
        {
            const bool fresh = LoaderInfo::_instance == nullptr;
            LoaderInfo* const made = LoaderInfo::getInstance();
            const bool same = made == LoaderInfo::getInstance() && made == LoaderInfo::_instance;
            std::exit(fresh && same && *made == LoaderInfo() ? 0 : 1);
        },
        testing::ExitedWithCode(0), "");
}

// --- Environment -----------------------------------------------------------------------------

TEST(LoaderInfoTest, CleansTheDirectoriesAndWritesBackTheOnesThatChanged) {
    const struct {
        const char* value;
        const char* cleaned;
    } rows[] = {
        {"/x//y/", "/x/y"}, {"/x/y", "/x/y"},       {"//x", "/x"},        {"/x///", "/x"},
        {"/", "/"},         {"///", "/"},           {"x//y", "x/y"},      {"x/", "x"},
        {"", ""},           {"/a/../b", "/a/../b"}, {" /x / ", " /x / "}, {"./x/.", "./x/."},
    };
    for (const auto& row : rows) {
        for (const bool home : {true, false}) {
            const char* const name = home ? "QUELTA_HOME" : "QUELTA_DB";
            // putenv keeps the address, so an unchanged variable can be recognised.
            std::string setting = std::string(name) + '=' + row.value;
            ASSERT_EQ(0, ::putenv(setting.data()));
            const char* const before = std::getenv(name);
            LoaderInfo info;
            info._queltaHome = "/old";
            info._queltaDb = "/old";
            info.populateFromEnvironment();
            EXPECT_EQ(row.cleaned, home ? info.getQueltaHome() : info.getQueltaDb()) << row.value;
            EXPECT_STREQ(row.cleaned, std::getenv(name)) << row.value;
            if (std::string(row.value) == row.cleaned) {
                EXPECT_EQ(before, std::getenv(name)) << "not changed: " << row.value;
            }
            ::unsetenv(name);
        }
    }
}

TEST(LoaderInfoTest, UnsetVariablesLeaveTheRecordAndTheEnvironmentAlone) {
    ::unsetenv("QUELTA_HOME");
    ::unsetenv("QUELTA_DB");
    LoaderInfo info;
    info._queltaHome = "/had//this/";
    info._queltaDb = "/and//that/";
    info.populateFromEnvironment();
    EXPECT_EQ("/had//this/", info.getQueltaHome());
    EXPECT_EQ("/and//that/", info.getQueltaDb());
    EXPECT_EQ(nullptr, std::getenv("QUELTA_HOME"));
    EXPECT_EQ(nullptr, std::getenv("QUELTA_DB"));
}

TEST(LoaderInfoTest, TakesEachDirectoryFromItsOwnVariable) {
    ::setenv("QUELTA_HOME", "/h", 1);
    ::setenv("QUELTA_DB", "/d", 1);
    LoaderInfo info;
    info.populateFromEnvironment();
    EXPECT_EQ("/h", info.getQueltaHome());
    EXPECT_EQ("/d", info.getQueltaDb());
}

// --- Paths and checks ------------------------------------------------------------------------

TEST(LoaderInfoTest, ConfigurationPathsAreBelowTheInstallation) {
    LoaderInfo info;
    info._queltaHome = "/q";
    info._commonConfigPath = "conf";
    info._installName = "inst";
    EXPECT_EQ("/q/conf", info.getCommonConfigPath());
    EXPECT_EQ("/q/conf/inst", info.getInstallConfigPath());
}

// A complete installation in a temporary directory, and its record.
struct Installation {
    Installation() {
        for (const char* const name : {"home", "home/etc", "home/etc/myinstall", "db"}) {
            ::mkdir(dir.file(name).c_str(), 0755);
        }
        for (const char* const name : {"file", "home/file", "home/etc/file"}) {
            writeFile(dir.file(name), "");
        }
        info._queltaHome = dir.file("home");
        info._queltaDb = dir.file("db");
        info._commonConfigPath = "etc";
        info._installName = "myinstall";
        info._componentName = "queltad";
    }

    TempDir dir;
    LoaderInfo info;
};

TEST(LoaderInfoTest, ValidateReturnsTheCodeOfEachCheckThatCanFail) {
    Installation installation;
    LoaderInfo& info = installation.info;
    const Pathname home = info._queltaHome;
    const Pathname db = info._queltaDb;
    const Pathname file = installation.dir.file("file");
    const struct {
        int code;
        Pathname home, db, config;
        std::string install, component;
    } rows[] = {
        {-1, "", db, "etc", "myinstall", "c"},
        {-2, home, "", "etc", "myinstall", "c"},
        {-4, "relative", db, "etc", "myinstall", "c"},
        {-5, home, "relative", "etc", "myinstall", "c"},
        {-7, installation.dir.file("gone"), db, "etc", "myinstall", "c"},
        {-8, home, installation.dir.file("gone"), "etc", "myinstall", "c"},
        {-9, home, db, "gone", "myinstall", "c"},
        {-9, home, db, "etc", "gone", "c"},
        {-9, file, db, "etc", "myinstall", "c"},
        {-9, file, db, "", "myinstall", "c"},
        {-9, file, db, "etc", "", "c"},
        {-10, file, db, "", "", "c"},
        {-11, home, file, "etc", "myinstall", "c"},
        {-12, home, db, "file", "", "c"},
        {-12, home, db, "etc", "file", "c"},
        {-15, home, db, "etc", "myinstall", ""},
        {-16, home, db, "etc", "", "c"},
        {0, home, db, "etc", "myinstall", "c"},
        {0, home, db, "", "etc", "c"},
        {0, home, db, "/etc/", "//myinstall", "c"},
    };
    for (const auto& row : rows) {
        info._queltaHome = row.home;
        info._queltaDb = row.db;
        info._commonConfigPath = row.config;
        info._installName = row.install;
        info._componentName = row.component;
        EXPECT_EQ(row.code, info.validate())
            << row.home << ' ' << row.db << ' ' << row.config << ' ' << row.install;
    }
}

TEST(LoaderInfoTest, ValidateReturnsTheFirstOfSeveralFailures) {
    Installation installation;
    LoaderInfo& info = installation.info;
    const Pathname home = info._queltaHome;
    const Pathname db = info._queltaDb;
    info._queltaHome = "";
    info._queltaDb = "";
    info._componentName = "";
    info._installName = "gone";
    // Everything is wrong at first. Each step corrects what the check before it reported.
    const struct {
        int code;
        std::function<void()> correct;
    } steps[] = {
        {-1, [&] { info._queltaHome = "relative"; }},
        {-2, [&] { info._queltaDb = "relative"; }},
        {-4, [&] { info._queltaHome = installation.dir.file("gone"); }},
        {-5, [&] { info._queltaDb = installation.dir.file("gone"); }},
        {-7, [&] { info._queltaHome = installation.dir.file("file"); }},
        {-8, [&] { info._queltaDb = installation.dir.file("file"); }},
        {-9, [&] { info._commonConfigPath = info._installName = ""; }},
        {-10, [&] { (info._queltaHome = home, info._commonConfigPath = "file"); }},
        {-11, [&] { info._queltaDb = db; }},
        {-12, [&] { info._commonConfigPath = "etc"; }},
        {-15, [&] { info._componentName = "c"; }},
        {-16, [&] { info._installName = "myinstall"; }},
        {0, [] {}},
    };
    for (const auto& step : steps) {
        EXPECT_EQ(step.code, info.validate());
        step.correct();
    }
}

TEST(LoaderInfoTest, ValidateChecksNeitherWritabilityNorTheLengthOfNames) {
    Installation installation;
    LoaderInfo& info = installation.info;
    info._componentName = std::string(1 << 16, 'c');
    EXPECT_EQ(0, info.validate());
    ::chmod(info._queltaHome.c_str(), 0555);
    ::chmod(info._queltaDb.c_str(), 0555);
    EXPECT_EQ(0, info.validate());
    ::chmod(info._queltaHome.c_str(), 0755);
}

TEST(LoaderInfoTest, HasAMessageForEveryCode) {
    const char* const expected[] = {
        "",
        "The environment variable QUELTA_HOME must not be empty.",
        "The environment variable QUELTA_DB must not be empty.",
        "The common config path must be defined in the config file.",
        "The environment variable QUELTA_HOME must not be a relative path.",
        "The environment variable QUELTA_DB must not be a relative path.",
        "The common config path must not be a relative path.",
        "The environment variable QUELTA_HOME must point to an existing path.",
        "The environment variable QUELTA_DB must point to an existing path.",
        "The common config path must point at an existing path.",
        "The environment variable QUELTA_HOME must point to a directory.",
        "The environment variable QUELTA_DB must point to a directory.",
        "The common config path must point to a directory.",
        ("The environment variable QUELTA_HOME must point to a directory that's writable the "
         "process."),
        "The environment variable QUELTA_DB must point to a directory that's writable the process.",
        "The component name must not be empty.",
        "The install name must not be empty.",
        "The component name was too large for spread.",
    };
    for (int i = 0; i < static_cast<int>(std::size(expected)); ++i) {
        EXPECT_STREQ(expected[i], LoaderInfo::getErrorMessage(-i)) << -i;
    }
    for (const int other : {0, 1, 17, -18, -19, -1000, INT_MIN, INT_MAX}) {
        EXPECT_STREQ("", LoaderInfo::getErrorMessage(other)) << other;
    }
}

// --- Copies and comparison -------------------------------------------------------------------

// Sets every field except those of the options to a value that is not its default.
void fill(LoaderInfo& info) {
    info._queltaHome = "/home";
    info._queltaDb = "/db";
    info._componentName = "component";
    info._commonConfigPath = "config";
    info._installName = "install";
    info._rpcPort = 1;
    info._pid = 2;
    info._startupTime = 3;
    info._host = "host";
    xml::node node("node");
    info.setCommonComponentNode(node);
    info._isDebug = true;
    info._useDebugLog = true;
    info._isDaemon = true;
    info._startupMode = "mode";
}

// Expects what a copy takes from a filled record.
void expectCopied(const LoaderInfo& copy) {
    EXPECT_EQ("/home", copy.getQueltaHome());
    EXPECT_EQ("component", copy.getComponentName());
    EXPECT_EQ("config", copy._commonConfigPath);
    EXPECT_EQ("install", copy.getInstallName());
    EXPECT_EQ(1, copy.getPort());
    EXPECT_EQ(2, copy.getPid());
    EXPECT_EQ(3, copy.getStartupTime());
    EXPECT_EQ("host", copy.getHost());
    EXPECT_STREQ("node", copy.getCommonComponentNode().get_name());
    EXPECT_TRUE(copy.getDebug());
    EXPECT_TRUE(copy.getUseDebugLog());
    EXPECT_TRUE(copy.getDaemon());
}

TEST(LoaderInfoTest, CopyHasNeitherDatabaseNorModeNorOptions) {
    const StderrCapture err;
    const Arguments options({"-h", "h", "-p", "7", "--noseg", "--unknown"});
    LoaderInfo source;
    source.init(options.argc(), options.argv());
    source.populateFromCommandLine();
    fill(source);
    LoaderInfo copy(source);
    expectCopied(copy);
    EXPECT_EQ("", copy.getQueltaDb());
    EXPECT_EQ("", copy.getStartupMode());
    EXPECT_FALSE(copy.isError());
    EXPECT_EQ(nullptr, copy._poptContext);
    EXPECT_EQ(0, copy._poptIsDebug);
    EXPECT_EQ(0, copy._poptRpcPort);
    EXPECT_EQ(nullptr, copy._poptHost);
    EXPECT_EQ(nullptr, copy._poptOptionsTable[0].longName);
    EXPECT_FALSE(source == copy);

    const Arguments own({"-n", "copy"});
    copy.init(own.argc(), own.argv());
    copy.populateFromCommandLine();
    EXPECT_EQ("copy", copy.getComponentName());
    EXPECT_EQ("component", source.getComponentName());
}

TEST(LoaderInfoTest, AssignmentLeavesDatabaseModeAndOptionsOfTheTarget) {
    const StderrCapture err;
    LoaderInfo source;
    fill(source);
    const Arguments options({"-h", "given", "--mode", "m", "--unknown"});
    LoaderInfo target;
    target.init(options.argc(), options.argv());
    target.populateFromCommandLine();
    target._queltaDb = "/target";
    poptContext const context = target._poptContext;

    EXPECT_EQ(&target, &(target = source));
    expectCopied(target);
    EXPECT_EQ("/target", target.getQueltaDb());
    EXPECT_EQ("m", target.getStartupMode());
    EXPECT_TRUE(target.isError());
    EXPECT_EQ(context, target._poptContext);
    EXPECT_STREQ("given", target._poptHost);
    EXPECT_EQ(&target._poptHost, target._poptOptionsTable[3].arg);
}

TEST(LoaderInfoTest, AssignmentToItselfChangesNothing) {
    LoaderInfo info;
    fill(info);
    const LoaderInfo& alias = info;
    info = alias;
    expectCopied(info);
    EXPECT_EQ("/db", info.getQueltaDb());
}

TEST(LoaderInfoTest, ComparisonIgnoresOnlyTheNodeAndTheOptions) {
    const struct {
        bool equal;
        void (*change)(LoaderInfo&);
    } rows[] = {
        {true, [](LoaderInfo&) {}},
        {false, [](LoaderInfo& info) { info._queltaHome = "/other"; }},
        {false, [](LoaderInfo& info) { info._queltaDb = "/other"; }},
        {false, [](LoaderInfo& info) { info._componentName = "other"; }},
        {false, [](LoaderInfo& info) { info._commonConfigPath = "other"; }},
        {false, [](LoaderInfo& info) { info._installName = "other"; }},
        {false, [](LoaderInfo& info) { info._rpcPort = 9; }},
        {false, [](LoaderInfo& info) { info._pid = 9; }},
        {false, [](LoaderInfo& info) { info._startupTime = 9; }},
        {false, [](LoaderInfo& info) { info._host = "other"; }},
        {false, [](LoaderInfo& info) { info._isDebug = false; }},
        {false, [](LoaderInfo& info) { info._isDaemon = false; }},
        {false, [](LoaderInfo& info) { info._startupMode = "other"; }},
        {false, [](LoaderInfo& info) { info._useDebugLog = false; }},
        {true, [](LoaderInfo& info) { info._commonComponentNode = xml::node("other"); }},
        {true, [](LoaderInfo& info) { info._optionsError = true; }},
        {true, [](LoaderInfo& info) { info._poptRpcPort = 9; }},
        {true, [](LoaderInfo& info) { info._poptIsDebug = 1; }},
    };
    for (const auto& row : rows) {
        LoaderInfo left, right;
        fill(left);
        fill(right);
        row.change(right);
        EXPECT_EQ(row.equal, left == right) << &row - rows;
        EXPECT_EQ(row.equal, right == left) << &row - rows;
    }
}

TEST(LoaderInfoTest, KeepsADeepCopyOfTheComponentNode) {
    LoaderInfo info;
    {
        xml::node node("common");
        node.set_content("settings");
        info.setCommonComponentNode(node);
        node.set_content("changed");
    }
    EXPECT_STREQ("common", info.getCommonComponentNode().get_name());
    EXPECT_STREQ("settings", info.getCommonComponentNode().get_content());
}

// --- The common start-up ---------------------------------------------------------------------

// Runs in a child process. Standard output goes to standard error, which a death test captures.
[[noreturn]] void startUp(const Arguments& arguments, bool (*check)() = nullptr) {
    ::dup2(STDERR_FILENO, STDOUT_FILENO);
    LoaderInfo::common_main_setup(arguments.argc(), arguments.argv(), nullptr);
    std::fflush(stdout);
    std::exit(check == nullptr || check() ? 0 : 1);
}

TEST(LoaderInfoTest, StartUpStopsWithoutAnInstallation) {
    EXPECT_EXIT((::unsetenv("QUELTA_HOME"), startUp(none)), testing::ExitedWithCode(255),
                testing::Eq("QUELTA_HOME must be set.  Stopping.\n"));
    EXPECT_EXIT((::setenv("QUELTA_HOME", "", 1), startUp(none)), testing::ExitedWithCode(255),
                testing::Eq("QUELTA_HOME must be set.  Stopping.\n"));
}

TEST(LoaderInfoTest, StartUpFillsTheRecordAnnouncesTheConfigurationAndStartsLogging) {
    const TempDir dir;
    ::mkdir(dir.file("etc").c_str(), 0755);
    writeFile(dir.file("etc/log-cmdline.cfg"),
              "rootCategory=DEBUG,A\nappender.A.fileName=${QUELTA_HOME}/log\n");
    ::setenv("QUELTA_HOME", (dir.path() + "//").c_str(), 1);
    ::setenv("QUELTA_DB", "/db//", 1);
    const Arguments arguments({"-c", "elsewhere", "-n", "ignored", "--unknown"});
    EXPECT_EXIT(
        startUp(arguments,
                [] {
                    Logger("LoaderInfoTest").debug("logged");
                    const LoaderInfo& info = *LoaderInfo::getInstance();
                    return info.getQueltaHome() == std::getenv("QUELTA_HOME") &&
                           info.getQueltaDb() == "/db" &&
                           info.getCommonConfigPath() == info.getQueltaHome() / "etc" &&
                           info.getComponentName() == "queltad" && info.getDebug() &&
                           !info.isError();
                }),
        testing::ExitedWithCode(0),
        testing::Eq("Using logging configuration at " + dir.path() + "/etc/log-cmdline.cfg.\n"));
    EXPECT_EQ("logged\n", readFile(dir.file("log")));
}

// Unbuffered, so that the order of the two lines shows.
TEST(LoaderInfoTest, StartUpAnnouncesTheConfigurationBeforeItIsReadAndGoesOnWithoutIt) {
    const TempDir dir;
    ::setenv("QUELTA_HOME", dir.path().c_str(), 1);
    const std::string config = dir.path() + "/etc/log-cmdline.cfg";
    EXPECT_EXIT((std::setvbuf(stdout, nullptr, _IONBF, 0), startUp(none)),
                testing::ExitedWithCode(0),
                testing::Eq("Using logging configuration at " + config +
                            ".\nCouldn't open log file configuration \"" + config +
                            "\": No such file or directory\n"));
}

}  // namespace
