#include "util/LoaderInfo.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <climits>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <string>
#include <type_traits>

#include "support/Arguments.h"
#include "support/FieldOrder.h"
#include "support/ParsedLoaderInfo.h"
#include "support/TempDir.h"
#include "util/Logger.h"

namespace {

// How callers see the record: results are copies, and queries work on a record that is const.
template <typename Result>
using Getter = Result (LoaderInfo::*)() const;
using Words = const char* const*;
static_assert(std::is_same_v<decltype(&LoaderInfo::getQueltaHome), Getter<Pathname>>);
static_assert(std::is_same_v<decltype(&LoaderInfo::getQueltaDb), Getter<Pathname>>);
static_assert(std::is_same_v<decltype(&LoaderInfo::getCommonConfigPath), Getter<Pathname>>);
static_assert(std::is_same_v<decltype(&LoaderInfo::getInstallConfigPath), Getter<Pathname>>);
static_assert(std::is_same_v<decltype(&LoaderInfo::getComponentName), Getter<std::string>>);
static_assert(std::is_same_v<decltype(&LoaderInfo::getInstallName), Getter<std::string>>);
static_assert(std::is_same_v<decltype(&LoaderInfo::getHost), Getter<std::string>>);
static_assert(std::is_same_v<decltype(&LoaderInfo::getStartupMode), Getter<std::string>>);
static_assert(std::is_same_v<decltype(&LoaderInfo::getPort), Getter<int>>);
static_assert(std::is_same_v<decltype(&LoaderInfo::getPid), Getter<pid_t>>);
static_assert(std::is_same_v<decltype(&LoaderInfo::getStartupTime), Getter<time_t>>);
static_assert(
    std::is_same_v<decltype(&LoaderInfo::getCommonComponentNode), Getter<const xml::node&>>);
static_assert(std::is_same_v<decltype(&LoaderInfo::validate), Getter<int>>);
static_assert(std::is_same_v<decltype(&LoaderInfo::getErrorMessage), const char* (*)(int)>);
static_assert(std::is_same_v<decltype(&LoaderInfo::getInstance), LoaderInfo* (*)()>);
static_assert(std::is_same_v<decltype(&LoaderInfo::init), void (LoaderInfo::*)(int, Words)>);
static_assert(
    std::is_same_v<decltype(&LoaderInfo::common_main_setup), void (*)(int, Words, Words)>);
static_assert(!std::is_polymorphic_v<LoaderInfo>);

const Arguments none{};

// --- Defaults --------------------------------------------------------------------------------

TEST(LoaderInfoTest, StartsEmptyWithNothingLeftUndefined) {
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

TEST(LoaderInfoTest, KeepsItsFieldsInOrder) {
    const LoaderInfo info;
    EXPECT_TRUE(standInOrder({&info._queltaHome,
                              &info._queltaDb,
                              &info._componentName,
                              &info._commonConfigPath,
                              &info._installName,
                              &info._rpcPort,
                              &info._pid,
                              &info._startupTime,
                              &info._host,
                              &info._commonComponentNode,
                              &info._isDebug,
                              &info._useDebugLog,
                              &info._isDaemon,
                              &info._startupMode,
                              &info._poptOptionsTable,
                              &info._poptContext,
                              &info._poptIsDebug,
                              &info._poptUseDebugLog,
                              &info._poptIsNodaemon,
                              &info._poptCommonConfigPath,
                              &info._poptHost,
                              &info._poptInstallName,
                              &info._poptComponentName,
                              &info._poptRpcPort,
                              &info._optionsError,
                              &info._poptStartupMode}));
}

TEST(LoaderInfoTest, InitSetsTheDefaults) {
    LoaderInfo info;
    const time_t before = std::time(nullptr);
    info.init(none.argc(), none.argv());
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
}

TEST(LoaderInfoTest, InitLeavesDirectoriesHostAndModeAlone) {
    LoaderInfo info;
    info._queltaHome = "/home";
    info._queltaDb = "/db";
    info._host = "host";
    info._startupMode = "mode";
    info.init(none.argc(), none.argv());
    EXPECT_EQ("/home", info.getQueltaHome());
    EXPECT_EQ("/db", info.getQueltaDb());
    EXPECT_EQ("host", info.getHost());
    EXPECT_EQ("mode", info.getStartupMode());
}

TEST(LoaderInfoTest, InitAgainMakesANewContextAndOverwritesEveryDefault) {
    Parsed first({"-c", "c", "-h", "h", "-i", "i", "-n", "n", "-p", "1", "--mode", "m", "--debug",
                  "--nodaemon", "--unknown"});
    LoaderInfo& info = first.info;
    poptContext const used = info._poptContext;
    info._pid = 0;
    info._startupTime = 0;

    info.init(none.argc(), none.argv());
    EXPECT_NE(used, info._poptContext);
    EXPECT_EQ("queltad", info.getComponentName());
    EXPECT_EQ("etc", info._commonConfigPath);
    EXPECT_EQ("myinstall", info.getInstallName());
    EXPECT_EQ(8089, info.getPort());
    EXPECT_EQ(::getpid(), info.getPid());
    EXPECT_NE(0, info.getStartupTime());
    EXPECT_TRUE(info.getDebug());
    EXPECT_TRUE(info.getDaemon());
    EXPECT_FALSE(info.getUseDebugLog());
    EXPECT_FALSE(info.isError());
    EXPECT_EQ(0, info._poptIsDebug);
    EXPECT_EQ(0, info._poptUseDebugLog);
    EXPECT_EQ(0, info._poptIsNodaemon);
    EXPECT_EQ(0, info._poptRpcPort);
    for (const char* value : {info._poptCommonConfigPath, info._poptHost, info._poptInstallName,
                              info._poptComponentName, info._poptStartupMode}) {
        EXPECT_EQ(nullptr, value);
    }
    EXPECT_EQ("h", info.getHost());
    EXPECT_EQ("m", info.getStartupMode());
}

TEST(LoaderInfoTest, InstanceIsMadeOnceEmpty) {
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

TEST(LoaderInfoTest, CleansTheDirectoriesAndWritesThemBackWhereThatMadeADifference) {
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
            // The very text that the environment points at, to tell it from an equal one.
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
                EXPECT_EQ(before, std::getenv(name)) << "left alone: " << row.value;
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

TEST(LoaderInfoTest, ConfigurationPathsStandBelowTheInstallation) {
    Parsed parsed({});
    parsed.info._queltaHome = "/q";
    EXPECT_EQ("/q/etc", parsed.info.getCommonConfigPath());
    EXPECT_EQ("/q/etc/myinstall", parsed.info.getInstallConfigPath());

    Parsed other({"-c", "/conf", "-i", "inst"});
    other.info._queltaHome = "/q";
    EXPECT_EQ("/q/conf", other.info.getCommonConfigPath());
    EXPECT_EQ("/q/conf/inst", other.info.getInstallConfigPath());
}

// A whole installation in a folder of its own, and the record that was started from it.
class LoaderInfoValidateTest : public testing::Test {
protected:
    LoaderInfoValidateTest() {
        ::mkdir(_dir.file("home").c_str(), 0755);
        ::mkdir(_dir.file("home/etc").c_str(), 0755);
        ::mkdir(_dir.file("home/etc/myinstall").c_str(), 0755);
        ::mkdir(_dir.file("db").c_str(), 0755);
        writeFile(_dir.file("file"), "");
        writeFile(_dir.file("home/file"), "");
        writeFile(_dir.file("home/etc/file"), "");
        _info.init(none.argc(), none.argv());
        _info._queltaHome = _dir.file("home");
        _info._queltaDb = _dir.file("db");
    }

    TempDir _dir;
    LoaderInfo _info;
};

TEST_F(LoaderInfoValidateTest, AcceptsAWholeInstallation) {
    EXPECT_EQ(0, _info.validate());
}

TEST_F(LoaderInfoValidateTest, ReturnsTheCodeOfEachCheckThatCanFail) {
    const Pathname home = _info._queltaHome;
    const Pathname db = _info._queltaDb;
    const Pathname file = _dir.file("file");
    const struct {
        int code;
        Pathname home, db, config;
        std::string install, component;
    } rows[] = {
        {-1, "", db, "etc", "myinstall", "c"},
        {-2, home, "", "etc", "myinstall", "c"},
        {-4, "relative", db, "etc", "myinstall", "c"},
        {-5, home, "relative", "etc", "myinstall", "c"},
        {-7, _dir.file("gone"), db, "etc", "myinstall", "c"},
        {-8, home, _dir.file("gone"), "etc", "myinstall", "c"},
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
        {0, home, db, "", "etc", "c"},
        {0, home, db, "/etc/", "//myinstall", "c"},
    };
    for (const auto& row : rows) {
        _info._queltaHome = row.home;
        _info._queltaDb = row.db;
        _info._commonConfigPath = row.config;
        _info._installName = row.install;
        _info._componentName = row.component;
        EXPECT_EQ(row.code, _info.validate())
            << row.home << ' ' << row.db << ' ' << row.config << ' ' << row.install;
    }
}

TEST_F(LoaderInfoValidateTest, ReturnsTheFirstOfSeveralFailures) {
    // Everything wrong at once, then mended one by one in the order of the checks.
    _info._queltaHome = "";
    _info._queltaDb = "";
    _info._componentName = "";
    _info._installName = "gone";
    EXPECT_EQ(-1, _info.validate());
    _info._queltaHome = "relative";
    EXPECT_EQ(-2, _info.validate());
    _info._queltaDb = "relative";
    EXPECT_EQ(-4, _info.validate());
    _info._queltaHome = _dir.file("gone");
    EXPECT_EQ(-5, _info.validate());
    _info._queltaDb = _dir.file("gone");
    EXPECT_EQ(-7, _info.validate());
    _info._queltaHome = _dir.file("file");
    EXPECT_EQ(-8, _info.validate());
    _info._queltaDb = _dir.file("file");
    EXPECT_EQ(-9, _info.validate());
    _info._commonConfigPath = "";
    _info._installName = "";
    EXPECT_EQ(-10, _info.validate());
    _info._queltaHome = _dir.file("home");
    _info._commonConfigPath = "file";
    EXPECT_EQ(-11, _info.validate());
    _info._queltaDb = _dir.file("db");
    EXPECT_EQ(-12, _info.validate());
    _info._commonConfigPath = "etc";
    EXPECT_EQ(-15, _info.validate());
    _info._componentName = "c";
    EXPECT_EQ(-16, _info.validate());
    _info._installName = "myinstall";
    EXPECT_EQ(0, _info.validate());
}

TEST_F(LoaderInfoValidateTest, ChecksNeitherWritabilityNorTheLengthOfNames) {
    _info._componentName = std::string(1 << 16, 'c');
    EXPECT_EQ(0, _info.validate());
    ::chmod(_info._queltaHome.c_str(), 0555);
    ::chmod(_info._queltaDb.c_str(), 0555);
    EXPECT_EQ(0, _info.validate());
    ::chmod(_info._queltaHome.c_str(), 0755);
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

// Sets every field that is not about options to something unlike a default.
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

// What a copy of a filled record has in common with it.
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
    Parsed parsed({"-c", "c", "-h", "h", "-i", "i", "-n", "n", "-p", "7", "--mode", "m", "--noseg",
                   "--nodaemon", "--debug", "--unknown"});
    fill(parsed.info);
    const LoaderInfo copy(parsed.info);
    expectCopied(copy);
    EXPECT_EQ("", copy.getQueltaDb());
    EXPECT_EQ("", copy.getStartupMode());
    EXPECT_FALSE(copy.isError());
    EXPECT_EQ(nullptr, copy._poptContext);
    EXPECT_EQ(0, copy._poptIsDebug);
    EXPECT_EQ(0, copy._poptUseDebugLog);
    EXPECT_EQ(0, copy._poptIsNodaemon);
    EXPECT_EQ(0, copy._poptRpcPort);
    for (const char* value : {copy._poptCommonConfigPath, copy._poptHost, copy._poptInstallName,
                              copy._poptComponentName, copy._poptStartupMode}) {
        EXPECT_EQ(nullptr, value);
    }
    for (const struct poptOption& entry : copy._poptOptionsTable) {
        EXPECT_EQ(nullptr, entry.longName);
        EXPECT_EQ(nullptr, entry.arg);
    }
    EXPECT_FALSE(parsed.info == copy);
}

TEST(LoaderInfoTest, AssignmentLeavesDatabaseModeAndOptionsOfTheTarget) {
    LoaderInfo source;
    fill(source);
    Parsed target({"-h", "given", "--mode", "m", "--unknown"});
    target.info._queltaDb = "/target";
    poptContext const context = target.info._poptContext;

    EXPECT_EQ(&target.info, &(target.info = source));
    expectCopied(target.info);
    EXPECT_EQ("/target", target.info.getQueltaDb());
    EXPECT_EQ("m", target.info.getStartupMode());
    EXPECT_TRUE(target.info.isError());
    EXPECT_EQ(context, target.info._poptContext);
    EXPECT_STREQ("given", target.info._poptHost);
    EXPECT_EQ(&target.info._poptHost, target.info._poptOptionsTable[3].arg);
}

TEST(LoaderInfoTest, AssignmentToItselfChangesNothing) {
    LoaderInfo info;
    fill(info);
    const LoaderInfo& alias = info;
    info = alias;
    expectCopied(info);
    EXPECT_EQ("/db", info.getQueltaDb());
}

TEST(LoaderInfoTest, CopyParsesOptionsOfItsOwnAfterInit) {
    Parsed source({"-n", "source"});
    LoaderInfo copy(source.info);
    const Arguments arguments{"-n", "copy", "--noseg"};
    copy.init(arguments.argc(), arguments.argv());
    copy.populateFromCommandLine();
    EXPECT_EQ("copy", copy.getComponentName());
    EXPECT_TRUE(copy.getDebug());
    EXPECT_EQ("source", source.info.getComponentName());
    EXPECT_FALSE(source.info.getDebug());
}

TEST(LoaderInfoTest, CopyWithoutDatabaseAndModeComparesEqual) {
    LoaderInfo source;
    fill(source);
    EXPECT_FALSE(LoaderInfo(source) == source);
    source._queltaDb = "";
    EXPECT_FALSE(LoaderInfo(source) == source);
    source._startupMode = "";
    EXPECT_TRUE(LoaderInfo(source) == source);
}

TEST(LoaderInfoTest, ComparisonLooksAtEachFieldButNodeAndOptions) {
    using Change = void (*)(LoaderInfo&);
    const Change seen[] = {
        [](LoaderInfo& info) { info._queltaHome = "/other"; },
        [](LoaderInfo& info) { info._queltaDb = "/other"; },
        [](LoaderInfo& info) { info._componentName = "other"; },
        [](LoaderInfo& info) { info._commonConfigPath = "other"; },
        [](LoaderInfo& info) { info._installName = "other"; },
        [](LoaderInfo& info) { info._rpcPort = 9; },
        [](LoaderInfo& info) { info._pid = 9; },
        [](LoaderInfo& info) { info._startupTime = 9; },
        [](LoaderInfo& info) { info._host = "other"; },
        [](LoaderInfo& info) { info._isDebug = false; },
        [](LoaderInfo& info) { info._isDaemon = false; },
        [](LoaderInfo& info) { info._startupMode = "other"; },
        [](LoaderInfo& info) { info._useDebugLog = false; },
    };
    const Change unseen[] = {
        [](LoaderInfo& info) {
            xml::node other("other");
            info.setCommonComponentNode(other);
        },
        [](LoaderInfo& info) { info._optionsError = true; },
        [](LoaderInfo& info) { info._poptRpcPort = 9; },
        [](LoaderInfo& info) { info._poptIsDebug = 1; },
    };
    int index = 0;
    for (const Change change : seen) {
        LoaderInfo left, right;
        fill(left);
        fill(right);
        EXPECT_TRUE(left == right);
        change(right);
        EXPECT_FALSE(left == right) << index;
        EXPECT_FALSE(right == left) << index;
        ++index;
    }
    for (const Change change : unseen) {
        LoaderInfo left, right;
        fill(left);
        fill(right);
        change(right);
        EXPECT_TRUE(left == right);
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

// Runs in a child process: standard output goes where the test can see it.
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
    const Arguments arguments{"-c", "elsewhere", "-n", "ignored", "--unknown"};
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

// Unbuffered, so that the order in which things are said shows.
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
