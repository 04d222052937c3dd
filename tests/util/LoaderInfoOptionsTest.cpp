#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <climits>
#include <cstdlib>
#include <iterator>
#include <string>
#include <vector>

#include "support/Arguments.h"
#include "support/StderrCapture.h"
#include "util/LoaderInfo.h"

// A record never frees what popt allocates. These records are destroyed, unlike the one of a
// process, so the leak checker must not report popt's memory.
extern "C" const char* __lsan_default_suppressions() {
    return "leak:poptGetContext\nleak:poptGetNextOpt\n";
}

namespace {

// What popt was last given for a context.
struct ContextRequest {
    std::string name;
    int argc = -1;
    const char** argv = nullptr;
    const struct poptOption* options = nullptr;
    unsigned flags = ~0U;
};
ContextRequest latestRequest;

}  // namespace

extern "C" poptContext __real_poptGetContext(const char* name, int argc, const char** argv,
                                             const struct poptOption* options, unsigned flags);
extern "C" poptContext __wrap_poptGetContext(const char* name, int argc, const char** argv,
                                             const struct poptOption* options, unsigned flags);

extern "C" poptContext __wrap_poptGetContext(const char* name, int argc, const char** argv,
                                             const struct poptOption* options, unsigned flags) {
    latestRequest = {name, argc, argv, options, flags};
    return __real_poptGetContext(name, argc, argv, options, flags);
}

namespace {

TEST(LoaderInfoTest, InitPointsEachOptionOfItsTableAtItsField) {
    LoaderInfo info;
    const Arguments none;
    info.init(none.argc(), none.argv());
    const struct {
        const char* longName;
        char shortName;
        unsigned kind;
        void* field;
        const char* description;
    } rows[] = {
        {"noseg", '\0', POPT_ARG_NONE | POPT_ARGFLAG_DOC_HIDDEN, &info._poptIsDebug,
         "causes the system not to dump core on failure"},
        {"nodaemon", '\0', POPT_ARG_NONE, &info._poptIsNodaemon,
         "causes the system not to daemonize"},
        {nullptr, 'c', POPT_ARG_STRING, &info._poptCommonConfigPath, "override the config path"},
        {nullptr, 'h', POPT_ARG_STRING, &info._poptHost, "override the host name"},
        {nullptr, 'i', POPT_ARG_STRING, &info._poptInstallName,
         "the name of the configuration subdir"},
        {nullptr, 'n', POPT_ARG_STRING, &info._poptComponentName,
         "the component name to start with"},
        {nullptr, 'p', POPT_ARG_INT, &info._poptRpcPort, "the management port for soap calls"},
        {"debug", '\0', POPT_ARG_NONE, &info._poptUseDebugLog, "start with debug log config"},
        {"mode", '\0', POPT_ARG_STRING, &info._poptStartupMode, "the startup mode"},
        {nullptr, '\0', POPT_ARG_INCLUDE_TABLE, poptHelpOptions, "Help options:"},
        {nullptr, '\0', 0, nullptr, nullptr},
    };
    ASSERT_EQ(11, LoaderInfo::_poptOptionsCount);
    ASSERT_EQ(11U, std::size(rows));
    for (std::size_t i = 0; i < std::size(rows); ++i) {
        const struct poptOption& entry = info._poptOptionsTable[i];
        EXPECT_STREQ(rows[i].longName, entry.longName) << i;
        EXPECT_EQ(rows[i].shortName, entry.shortName) << i;
        EXPECT_EQ(rows[i].kind, entry.argInfo) << i;
        EXPECT_EQ(rows[i].field, entry.arg) << i;
        EXPECT_EQ(0, entry.val) << i;
        EXPECT_STREQ(rows[i].description, entry.descrip) << i;
        EXPECT_EQ(nullptr, entry.argDescrip) << i;
        EXPECT_EQ(i == 9 ? rows[i].field : nullptr, LoaderInfo::_poptOptionsMaster[i].arg) << i;
    }
}

// The context has the same name whatever the component is called. Parsing is left to the caller.
TEST(LoaderInfoTest, InitMakesAContextOverTheArguments) {
    const StderrCapture err;
    const Arguments arguments({"-n", "comp", "--unknown"});
    LoaderInfo info;
    for (int round = 0; round < 2; ++round) {
        info._componentName = "other";
        info.init(arguments.argc(), arguments.argv());
        EXPECT_EQ("queltad", latestRequest.name);
        EXPECT_EQ(4, latestRequest.argc);
        EXPECT_EQ(arguments.argv(), latestRequest.argv);
        EXPECT_EQ(info._poptOptionsTable, latestRequest.options);
        EXPECT_EQ(0U, latestRequest.flags);
        EXPECT_EQ("queltad", info.getComponentName());
        EXPECT_FALSE(info.isError());
        info.populateFromCommandLine();
        EXPECT_EQ("comp", info.getComponentName());
        EXPECT_TRUE(info.isError());
    }
}

// What the options make of a record whose host and mode are "?".
struct Taken {
    bool debug = false;
    bool daemon = true;
    bool debugLog = false;
    std::string config = "etc";
    std::string host = "?";
    std::string install = "myinstall";
    std::string component = "queltad";
    std::string mode = "?";
    int port = 8089;
    std::string messages = "";
};

TEST(LoaderInfoTest, TakesEachOptionIntoItsField) {
    const struct {
        std::vector<std::string> words;
        Taken expected;
    } rows[] = {
        {{}, {}},
        {{"--noseg"}, {.debug = true}},
        {{"--nodaemon"}, {.daemon = false}},
        {{"--debug"}, {.debugLog = true}},
        {{"-c", "conf", "-h", "host", "-i", "inst", "-n", "comp", "-p", "4711", "--mode", "idle"},
         {.config = "conf",
          .host = "host",
          .install = "inst",
          .component = "comp",
          .mode = "idle",
          .port = 4711}},
        {{"-cconf", "-h=host", "-p5", "--mode=idle"},
         {.config = "conf", .host = "host", .mode = "idle", .port = 5}},
        {{"-c", "", "-h", "", "-i", "", "-n", "", "--mode", ""},
         {.config = "", .host = "", .install = "", .component = "", .mode = ""}},
        {{"-p", "0"}, {}},
        {{"-p", "-1"}, {.port = -1}},
        {{"-p", "2147483647"}, {.port = INT_MAX}},
        {{"-n", "a", "-n", "b", "-p", "1", "-p", "2"}, {.component = "b", .port = 2}},
        // Words that are not options.
        {{"word", "-h", "host", "--", "-n", "comp"}, {.host = "host"}},
        // Unknown options are reported, and the rest is taken.
        {{"--unknown", "-n", "comp", "-z", "--nodaemon", "--unknown=value"},
         {.daemon = false,
          .component = "comp",
          .messages = "Bad Option --unknown\nBad Option -z\nBad Option --unknown=value\n"}},
        // Other errors are ignored: a bad number, one too large, a value too much, one missing.
        {{"-p", "many", "-h", "host"}, {.host = "host"}},
        {{"-p", "99999999999", "-h", "host"}, {.host = "host"}},
        {{"--nodaemon=1", "-h", "host"}, {.host = "host"}},
        {{"-h", "host", "-c"}, {.host = "host"}},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(testing::PrintToString(row.words));
        const Arguments arguments(row.words);
        const StderrCapture err;
        LoaderInfo info;
        info._host = "?";
        info._startupMode = "?";
        info.init(arguments.argc(), arguments.argv());
        info.populateFromCommandLine();
        EXPECT_EQ(row.expected.debug, info.getDebug());
        EXPECT_EQ(row.expected.daemon, info.getDaemon());
        EXPECT_EQ(row.expected.debugLog, info.getUseDebugLog());
        EXPECT_EQ(row.expected.config, info._commonConfigPath);
        EXPECT_EQ(row.expected.host, info.getHost());
        EXPECT_EQ(row.expected.install, info.getInstallName());
        EXPECT_EQ(row.expected.component, info.getComponentName());
        EXPECT_EQ(row.expected.mode, info.getStartupMode());
        EXPECT_EQ(row.expected.port, info.getPort());
        EXPECT_EQ(!row.expected.messages.empty(), info.isError());
        EXPECT_EQ(row.expected.messages, err.text());
    }
}

const char HELP_TEXT[] =
    "Usage: program [OPTION...]\n"
    "      --nodaemon        causes the system not to daemonize\n"
    "  -c STRING             override the config path\n"
    "  -h STRING             override the host name\n"
    "  -i STRING             the name of the configuration subdir\n"
    "  -n STRING             the component name to start with\n"
    "  -p INT                the management port for soap calls\n"
    "      --debug           start with debug log config\n"
    "      --mode=STRING     the startup mode\n"
    "\n"
    "Help options:\n"
    "  -?, --help            Show this help message\n"
    "      --usage           Display brief usage message\n";

TEST(LoaderInfoTest, PrintsTheHelpOfTheTableOnStandardError) {
    LoaderInfo info;
    const Arguments none;
    info.init(none.argc(), none.argv());
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    info.printHelp();
    EXPECT_EQ(HELP_TEXT, testing::internal::GetCapturedStderr());
    EXPECT_EQ("", testing::internal::GetCapturedStdout());
}

TEST(LoaderInfoTest, HelpOptionPrintsTheSameOnStandardOutputAndEndsTheProcess) {
    EXPECT_EXIT(
        {
            ::dup2(STDERR_FILENO, STDOUT_FILENO);
            const Arguments help({"--help"});
            LoaderInfo info;
            info.init(help.argc(), help.argv());
            info.populateFromCommandLine();
        },
        testing::ExitedWithCode(0), testing::Eq(HELP_TEXT));
}

TEST(LoaderInfoTest, WithoutAContextParsesAndPrintsNothing) {
    LoaderInfo info;
    info._isDebug = true;
    const StderrCapture err;
    info.populateFromCommandLine();
    info.printHelp();
    EXPECT_EQ("", err.text());
    EXPECT_FALSE(info.getDebug());
    EXPECT_FALSE(info.getUseDebugLog());
    EXPECT_TRUE(info.getDaemon());
    EXPECT_FALSE(info.isError());
}

}  // namespace
