#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <climits>
#include <cstdlib>
#include <string>
#include <vector>

#include "support/Arguments.h"
#include "support/ParsedLoaderInfo.h"
#include "util/LoaderInfo.h"

// popt drops the first of two values for one option; the block is its own and out of reach.
extern "C" const char* __lsan_default_suppressions() {
    return "leak:poptGetNextOpt\n";
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

const Arguments none{};

// --- The option table ------------------------------------------------------------------------

TEST(LoaderInfoTest, MasterTableHoldsTheElevenEntriesInOrder) {
    const struct {
        const char* longName;
        char shortName;
        unsigned kind;
        const char* description;
    } rows[] = {
        {"noseg", '\0', POPT_ARG_NONE | POPT_ARGFLAG_DOC_HIDDEN,
         "causes the system not to dump core on failure"},
        {"nodaemon", '\0', POPT_ARG_NONE, "causes the system not to daemonize"},
        {nullptr, 'c', POPT_ARG_STRING, "override the config path"},
        {nullptr, 'h', POPT_ARG_STRING, "override the host name"},
        {nullptr, 'i', POPT_ARG_STRING, "the name of the configuration subdir"},
        {nullptr, 'n', POPT_ARG_STRING, "the component name to start with"},
        {nullptr, 'p', POPT_ARG_INT, "the management port for soap calls"},
        {"debug", '\0', POPT_ARG_NONE, "start with debug log config"},
        {"mode", '\0', POPT_ARG_STRING, "the startup mode"},
        {nullptr, '\0', POPT_ARG_INCLUDE_TABLE, "Help options:"},
        {nullptr, '\0', 0, nullptr},
    };
    ASSERT_EQ(11, LoaderInfo::_poptOptionsCount);
    ASSERT_EQ(11U, std::size(LoaderInfo::_poptOptionsMaster));
    for (std::size_t i = 0; i < std::size(rows); ++i) {
        const struct poptOption& entry = LoaderInfo::_poptOptionsMaster[i];
        EXPECT_STREQ(rows[i].longName, entry.longName) << i;
        EXPECT_EQ(rows[i].shortName, entry.shortName) << i;
        EXPECT_EQ(rows[i].kind, entry.argInfo) << i;
        EXPECT_STREQ(rows[i].description, entry.descrip) << i;
        EXPECT_EQ(0, entry.val) << i;
        EXPECT_EQ(nullptr, entry.argDescrip) << i;
        EXPECT_EQ(i == 9 ? static_cast<void*>(poptHelpOptions) : nullptr, entry.arg) << i;
    }
}

TEST(LoaderInfoTest, InitPointsEachEntryOfItsCopyAtItsField) {
    LoaderInfo info;
    info.init(none.argc(), none.argv());
    void* const fields[] = {&info._poptIsDebug,
                            &info._poptIsNodaemon,
                            &info._poptCommonConfigPath,
                            &info._poptHost,
                            &info._poptInstallName,
                            &info._poptComponentName,
                            &info._poptRpcPort,
                            &info._poptUseDebugLog,
                            &info._poptStartupMode,
                            poptHelpOptions,
                            nullptr};
    for (int i = 0; i < LoaderInfo::_poptOptionsCount; ++i) {
        const struct poptOption& master = LoaderInfo::_poptOptionsMaster[i];
        const struct poptOption& entry = info._poptOptionsTable[i];
        EXPECT_EQ(fields[i], entry.arg) << i;
        EXPECT_EQ(master.longName, entry.longName) << i;
        EXPECT_EQ(master.shortName, entry.shortName) << i;
        EXPECT_EQ(master.argInfo, entry.argInfo) << i;
        EXPECT_EQ(master.descrip, entry.descrip) << i;
    }
    EXPECT_NE(nullptr, info._poptContext);
}

// The context keeps its name whatever the component is called.
TEST(LoaderInfoTest, InitMakesAContextOverTheArgumentsAndItsOwnTable) {
    const Arguments arguments{"-n", "comp", "word"};
    LoaderInfo info;
    for (int round = 0; round < 2; ++round) {
        info._componentName = "other";
        info.init(arguments.argc(), arguments.argv());
        EXPECT_EQ("queltad", latestRequest.name);
        EXPECT_EQ(4, latestRequest.argc);
        EXPECT_EQ(arguments.argv(), latestRequest.argv);
        EXPECT_EQ(info._poptOptionsTable, latestRequest.options);
        EXPECT_EQ(0U, latestRequest.flags);
        info.populateFromCommandLine();
        EXPECT_EQ("comp", info.getComponentName());
    }
}

// --- Command line ----------------------------------------------------------------------------

TEST(LoaderInfoTest, NoArgumentsLeaveTheDefaultsButTheDebugFlag) {
    const Parsed parsed({});
    EXPECT_EQ("queltad", parsed.info.getComponentName());
    EXPECT_EQ("etc", parsed.info._commonConfigPath);
    EXPECT_EQ("myinstall", parsed.info.getInstallName());
    EXPECT_EQ(8089, parsed.info.getPort());
    EXPECT_FALSE(parsed.info.getDebug());
    EXPECT_TRUE(parsed.info.getDaemon());
    EXPECT_FALSE(parsed.info.getUseDebugLog());
    EXPECT_EQ("", parsed.info.getHost());
    EXPECT_EQ("", parsed.info.getStartupMode());
    EXPECT_FALSE(parsed.info.isError());
    EXPECT_EQ("", parsed.err);
}

TEST(LoaderInfoTest, EachFlagSetsItsField) {
    EXPECT_TRUE(Parsed({"--noseg"}).info.getDebug());
    EXPECT_TRUE(Parsed({"--noseg"}).info.getDaemon());
    EXPECT_FALSE(Parsed({"--noseg"}).info.getUseDebugLog());
    EXPECT_FALSE(Parsed({"--nodaemon"}).info.getDaemon());
    EXPECT_FALSE(Parsed({"--nodaemon"}).info.getDebug());
    EXPECT_TRUE(Parsed({"--debug"}).info.getUseDebugLog());
    EXPECT_FALSE(Parsed({"--debug"}).info.getDebug());
    EXPECT_TRUE(Parsed({"--debug"}).info.getDaemon());
}

TEST(LoaderInfoTest, EachValueReplacesItsField) {
    const Parsed parsed({"-c", "conf", "-h", "host", "-i", "inst", "-n", "comp", "-p", "4711",
                         "--mode", "standby"});
    EXPECT_EQ("conf", parsed.info._commonConfigPath);
    EXPECT_EQ("host", parsed.info.getHost());
    EXPECT_EQ("inst", parsed.info.getInstallName());
    EXPECT_EQ("comp", parsed.info.getComponentName());
    EXPECT_EQ(4711, parsed.info.getPort());
    EXPECT_EQ("standby", parsed.info.getStartupMode());
    EXPECT_STREQ("conf", parsed.info._poptCommonConfigPath);
    EXPECT_STREQ("host", parsed.info._poptHost);
    EXPECT_STREQ("inst", parsed.info._poptInstallName);
    EXPECT_STREQ("comp", parsed.info._poptComponentName);
    EXPECT_EQ(4711, parsed.info._poptRpcPort);
    EXPECT_STREQ("standby", parsed.info._poptStartupMode);
    EXPECT_FALSE(parsed.info.isError());
}

TEST(LoaderInfoTest, TakesValuesJoinedToTheirOption) {
    const Parsed parsed({"-cconf", "-h=host", "-p5", "--mode=standby"});
    EXPECT_EQ("conf", parsed.info._commonConfigPath);
    EXPECT_EQ("host", parsed.info.getHost());
    EXPECT_EQ(5, parsed.info.getPort());
    EXPECT_EQ("standby", parsed.info.getStartupMode());
}

TEST(LoaderInfoTest, EmptyValuesReplaceTheirFields) {
    LoaderInfo info;
    info._host = "host";
    info._startupMode = "mode";
    const Arguments empty{"-c", "", "-h", "", "-i", "", "-n", "", "--mode", ""};
    info.init(empty.argc(), empty.argv());
    info.populateFromCommandLine();
    EXPECT_EQ("", info._commonConfigPath);
    EXPECT_EQ("", info.getHost());
    EXPECT_EQ("", info.getInstallName());
    EXPECT_EQ("", info.getComponentName());
    EXPECT_EQ("", info.getStartupMode());
}

TEST(LoaderInfoTest, PortZeroKeepsThePortAndANegativeOneReplacesIt) {
    EXPECT_EQ(8089, Parsed({"-p", "0"}).info.getPort());
    EXPECT_EQ(-1, Parsed({"-p", "-1"}).info.getPort());
    EXPECT_EQ(INT_MAX, Parsed({"-p", "2147483647"}).info.getPort());
}

TEST(LoaderInfoTest, LastOfSeveralValuesCounts) {
    EXPECT_EQ("b", Parsed({"-n", "a", "-n", "b"}).info.getComponentName());
    EXPECT_EQ(2, Parsed({"-p", "1", "-p", "2"}).info.getPort());
}

TEST(LoaderInfoTest, BadOptionsAreNamedAndTheRestIsApplied) {
    const Parsed parsed({"--unknown", "-n", "comp", "-z", "--nodaemon", "--unknown=value"});
    EXPECT_EQ("Bad Option --unknown\nBad Option -z\nBad Option --unknown=value\n", parsed.err);
    EXPECT_TRUE(parsed.info.isError());
    EXPECT_EQ("comp", parsed.info.getComponentName());
    EXPECT_FALSE(parsed.info.getDaemon());
}

TEST(LoaderInfoTest, OtherErrorsOfParsingPassInSilence) {
    for (const auto& words : std::vector<std::vector<std::string>>{
             {"-p", "many", "-h", "host"},         // a bad number
             {"-p", "99999999999", "-h", "host"},  // too large a number
             {"--nodaemon=1", "-h", "host"},       // a value where none is wanted
             {"-h", "host", "-c"},                 // a value is missing
         }) {
        std::vector<const char*> argv{"program"};
        for (const std::string& word : words) {
            argv.push_back(word.c_str());
        }
        argv.push_back(nullptr);
        LoaderInfo info;
        info.init(static_cast<int>(argv.size()) - 1, argv.data());
        testing::internal::CaptureStderr();
        info.populateFromCommandLine();
        EXPECT_EQ("", testing::internal::GetCapturedStderr()) << words[0];
        EXPECT_FALSE(info.isError()) << words[0];
        EXPECT_EQ("host", info.getHost()) << words[0];
        EXPECT_EQ(8089, info.getPort()) << words[0];
        EXPECT_EQ("etc", info._commonConfigPath) << words[0];
    }
}

TEST(LoaderInfoTest, WordsThatAreNoOptionsAreLeftAlone) {
    const Parsed parsed({"word", "-h", "host", "--", "-n", "comp"});
    EXPECT_EQ("host", parsed.info.getHost());
    EXPECT_EQ("queltad", parsed.info.getComponentName());
    EXPECT_FALSE(parsed.info.isError());
}

TEST(LoaderInfoTest, ParsingIsOnlyDoneWhenAskedFor) {
    LoaderInfo info;
    const Arguments arguments{"-n", "comp", "--unknown"};
    info.init(arguments.argc(), arguments.argv());
    EXPECT_EQ("queltad", info.getComponentName());
    EXPECT_FALSE(info.isError());
}

const char helpText[] =
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
    info.init(none.argc(), none.argv());
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    info.printHelp();
    EXPECT_EQ(helpText, testing::internal::GetCapturedStderr());
    EXPECT_EQ("", testing::internal::GetCapturedStdout());
}

TEST(LoaderInfoTest, HelpOptionPrintsTheSameOnStandardOutputAndEndsTheProcess) {
    EXPECT_EXIT(
        {
            ::dup2(STDERR_FILENO, STDOUT_FILENO);
            const Arguments help{"--help"};
            LoaderInfo info;
            info.init(help.argc(), help.argv());
            info.populateFromCommandLine();
        },
        testing::ExitedWithCode(0), testing::Eq(helpText));
}

TEST(LoaderInfoTest, ParsingOrHelpingBeforeInitIsAnAssertion) {
    LoaderInfo source;
    source.init(none.argc(), none.argv());
    LoaderInfo copy(source);
    LoaderInfo assigned;
    assigned = source;
    for (LoaderInfo* info : {&copy, &assigned}) {
        EXPECT_EQ(nullptr, info->_poptContext);
        EXPECT_DEATH(
            info->populateFromCommandLine(),
            "src/util/LoaderInfo.cpp:[0-9]+: failed assertion `_poptContext != nullptr'\n");
        EXPECT_DEATH(
            info->printHelp(),
            "src/util/LoaderInfo.cpp:[0-9]+: failed assertion `_poptContext != nullptr'\n");
    }
}

TEST(LoaderInfoTest, ArgumentsWithoutEvenTheProgramsNameHoldNoOptions) {
    const char* const argv[] = {nullptr};
    for (const char* const* words : std::initializer_list<const char* const*>{argv, nullptr}) {
        LoaderInfo info;
        info.init(0, words);
        info.populateFromCommandLine();
        EXPECT_EQ("queltad", info.getComponentName());
        EXPECT_FALSE(info.isError());
    }
}

}  // namespace
