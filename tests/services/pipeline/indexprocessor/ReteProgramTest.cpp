// The functions of the program, linked with its main under another name. random() counts its calls
// and can return values from a list. time() is a clock that only the cases advance. The matcher can
// be made to fail the program's self-check.

#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <deque>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "services/pipeline/indexprocessor/RandomPatterns.h"
#include "services/pipeline/indexprocessor/Rete.h"
#include "support/MatcherOracle.h"
#include "support/TempDir.h"

extern const char* const WORDS[183];
void printImplications(StringSet& implications);
void generateRandomText(std::string& text, bool isQuery);
void testWildCards(RuleSystem* rs, int testcount);
int rete_main(int argc, char** argv, char** envp);

extern "C" long __real_random();
extern "C" std::time_t __wrap_time(std::time_t* out);
extern "C" long __wrap_random();
// WildcardMatcher::isMatch without capture, by its mangled name.
extern "C" bool __real__ZNK15WildcardMatcher7isMatchEPKc(const WildcardMatcher*, const char*);
extern "C" bool __wrap__ZNK15WildcardMatcher7isMatchEPKc(const WildcardMatcher*, const char*);

namespace {

long draws = 0;
std::deque<long> scripted;
std::vector<long>* recorded = nullptr;
std::time_t now = 1000;
std::time_t secondsPerReading = 0;
void (*onReading)() = nullptr;
void (*onDraw)() = nullptr;
bool faultyMatcher = false;

}  // namespace

extern "C" bool __wrap__ZNK15WildcardMatcher7isMatchEPKc(const WildcardMatcher* matcher,
                                                         const char* haystack) {
    return faultyMatcher || __real__ZNK15WildcardMatcher7isMatchEPKc(matcher, haystack);
}

extern "C" std::time_t __wrap_time(std::time_t* out) {
    if (onReading != nullptr) {
        onReading();
    }
    if (out != nullptr) {
        *out = now;
    }
    now += secondsPerReading;
    return now - secondsPerReading;
}

extern "C" long __wrap_random() {
    ++draws;
    if (onDraw != nullptr) {
        onDraw();
    }
    long value;
    if (scripted.empty()) {
        value = __real_random();
    } else {
        value = scripted.front();
        scripted.pop_front();
    }
    if (recorded != nullptr) {
        recorded->push_back(value);
    }
    return value;
}

namespace {

using testing::ElementsAre;

class ReteProgramTest : public testing::Test {
protected:
    void SetUp() override {
        draws = 0;
        scripted.clear();
        recorded = nullptr;
        secondsPerReading = 0;
        onReading = nullptr;
    }
};

template <typename Function>
std::string printed(Function function) {
    testing::internal::CaptureStdout();
    function();
    std::fflush(stdout);
    return testing::internal::GetCapturedStdout();
}

std::string print(StringSet implications) {
    return printed([&] { printImplications(implications); });
}

// The set of patterns for a sequence of draws, built with plain string operations.
std::set<std::string> patternsFrom(const std::vector<long>& values, int testcount) {
    std::size_t at = 0;
    const auto draw = [&](long min, long max) { return min + values.at(at++) % (max - min + 1); };
    std::set<std::string> patterns;
    for (int i = 0; i < testcount; ++i) {
        std::string wild = "abcdefghijklmnopqrstuvwxyz";
        for (long cuts = draw(1, 20); cuts > 0; --cuts) {
            const long start = draw(0, static_cast<long>(wild.size()) - 1);
            const long end = draw(start, static_cast<long>(wild.size()) - 1);
            wild = wild.substr(0, static_cast<std::size_t>(start)) + "*" +
                   wild.substr(static_cast<std::size_t>(end));
        }
        patterns.insert(wild);
    }
    EXPECT_EQ(values.size(), at) << "draws";
    return patterns;
}

std::string expectedOutput(const std::set<std::string>& patterns) {
    std::size_t matches = 0;
    for (const std::string& pattern : patterns) {
        matches += oracle::match(pattern, "abcdefghijklmxopqrstuvwxyz").matched;
    }
    return std::to_string(patterns.size()) + " conditions\n[]\n" + std::to_string(matches) +
           " implications\nTIME = 0\n";
}

TEST_F(ReteProgramTest, RandintIncludesBothBoundsAndDrawsOnce) {
    for (int i = 0; i < 100; ++i) {
        const long before = draws;
        EXPECT_EQ(1, randint(1, 1));
        EXPECT_EQ(before + 1, draws);
    }
    std::set<int> seen;
    for (int i = 0; i < 20000; ++i) {
        seen.insert(randint(0, 182));
    }
    EXPECT_EQ(183u, seen.size());
    EXPECT_EQ(0, *seen.begin());
    EXPECT_EQ(182, *seen.rbegin());
}

TEST_F(ReteProgramTest, RandintTakesTheRemainderOfTheDraw) {
    const struct {
        long drawn;
        int min;
        int max;
        int expected;
    } cases[] = {{0, 1, 20, 1},
                 {19, 1, 20, 20},
                 {20, 1, 20, 1},
                 {2147483647, 0, 182, 2147483647 % 183},
                 {7, -3, 3, -3},
                 {6, -3, 3, 3},
                 {2147483647, 0, 2147483647, 2147483647},
                 {2147483647, -2147483647 - 1, 2147483647, -1},
                 {5, 3, 1, 3}};
    for (const auto& c : cases) {
        scripted = {c.drawn};
        EXPECT_EQ(c.expected, randint(c.min, c.max)) << c.drawn;
    }
}

using ReteProgramDeathTest = ReteProgramTest;

TEST_F(ReteProgramDeathTest, AnEmptyRangeIsAsserted) {
    EXPECT_DEATH(randint(1, 0), "RandomPatterns.cpp:[0-9]+: failed assertion `range != 0'");
}

// Runs the program until its first draw, then exits with status 7.
[[noreturn]] void runToTheFirstDraw(const TempDir& home) {
    ::dup2(STDERR_FILENO, STDOUT_FILENO);
    ::setenv("QUELTA_HOME", home.path().c_str(), 1);
    ::mkdir(home.file("etc").c_str(), 0755);
    writeFile(home.file("etc/log-cmdline.cfg"), "");
    onDraw = [] {
        std::fflush(stdout);
        ::_exit(7);
    };
    std::string name = "Rete";
    char* argv[] = {name.data(), nullptr};
    char* envp[] = {nullptr};
    ::_exit(rete_main(1, argv, envp));
}

TEST_F(ReteProgramDeathTest, ReportsAFaultyMatcherAndContinues) {
    const TempDir home;
    const std::string announcement =
        "Using logging configuration at " + home.path() + "/etc/log-cmdline.cfg.\n";
    EXPECT_EXIT((faultyMatcher = true, runToTheFirstDraw(home)), testing::ExitedWithCode(7),
                testing::Eq(announcement + "BUG IN WILDCARDMATCHER\n"));
    EXPECT_EXIT(runToTheFirstDraw(home), testing::ExitedWithCode(7), testing::Eq(announcement));
}

TEST_F(ReteProgramTest, TheGeneratorIsNotSeeded) {
    srandom(4711);
    std::vector<long> values;
    recorded = &values;
    RuleSystem rs;
    printed([&] { testWildCards(&rs, 10); });
    std::string text;
    generateRandomText(text, true);
    recorded = nullptr;
    EXPECT_GT(values.size(), 30u);
    srandom(4711);
    for (const long value : values) {
        ASSERT_EQ(__real_random(), value);
    }
}

TEST_F(ReteProgramTest, PrintsImplications) {
    EXPECT_EQ("[]\n", print({}));
    EXPECT_EQ("Implications: a, b, \n", print({"b", "a"}));
    EXPECT_EQ("Implications: , \n", print({""}));
    EXPECT_EQ("Implications: %s, 100%\n, \n", print({"%s", "100%\n"}));
    // They are printed as C strings, so an embedded NUL ends them.
    EXPECT_EQ("Implications: a, \n", print({std::string("a\0b", 3)}));
}

TEST_F(ReteProgramTest, HasTheVocabularyInOrder) {
    const std::string expected =
        "100 202 206 abstractconfi accessexecute accessnoremotescript accesssource "
        "accesssslnegotiatecert acl added admininitiali aggregatorminingprocessor algorithm "
        "allowpathinfoforscriptmappings answered appallowdebugging apppackageid appwamclsid "
        "aspcodepage aspenableparentpaths aspkeepsessionidsecure aspqueueconnectiontesttime "
        "aspscripterrormessage aspscripttimeout aspthreadgateloadhigh aspthreadgatetimeslice "
        "auth authenticated authorizationmanager authpersistence auto begin block buffer bytes "
        "cacheisapi cancel caused cgitimeout child client command commonprogramfiles "
        "componentid configuration connection contentindexed couldn cpuappenabled "
        "cpuenableallproclogging cpuenablekerneltime cpuenabletotalprocs cpulimitpriority "
        "cpulogginginterval create creating current db debug defaultdocfooter deferring denied "
        "deploying dhcpinform dial dirbrowseshowdate dirbrowseshowtime disablesocketpooling "
        "discovereventpoller discoverworker division dontlog enabled enablereversedns entry "
        "errors exceptions ext fail favicon file flushed getting halt head host httpexpires "
        "https iis informational inner inst internationalization issuer jdbc jni jvm keyusage "
        "least licensemanager loaded locknflags logextfileclientip logextfileflags "
        "logextfilereferer logextfiletime logextfileuseragent logfilelocaltimerollover logger "
        "logodbcdatasource logon logs mainmenu maxconnections mbrstatexchg metadata min module "
        "monitorenginestarter name non null observer operating oracle orderdetailma "
        "passwordcachettl peer pid pool ppid process processing pstn pwd queuelogresponse "
        "reads recoverydirec register removing reply results roleviewleade schedulerserv "
        "securitydm sendmail serverbindings servername services setting sighup sip soap "
        "sourceid sql ssl stage starting stock storing suexec syslogd systemout tcp text "
        "threadname timedservletpoolelement top total trackingadapt trying unitofwork uri "
        "userexception validity verbose virtual vsync warning webgroup windowsservices write "
        "wsserverimpl";
    ASSERT_EQ(183u, std::size(WORDS));
    std::string words;
    for (const char* const word : WORDS) {
        words += words.empty() ? "" : " ";
        words += word;
    }
    EXPECT_EQ(expected, words);
    EXPECT_STREQ("100", WORDS[0]);
    EXPECT_STREQ("wsserverimpl", WORDS[182]);
}

TEST_F(ReteProgramTest, GeneratesTextsFromScriptedDraws) {
    const struct {
        std::deque<long> drawn;
        bool isQuery;
        const char* expected;
    } cases[] = {
        {{0, 0}, false, "100 "},
        {{0, 182}, true, "wsserverimpl "},
        // Larger draws wrap around: there are four lengths, 183 words and twenty gaps.
        {{4, 184}, false, "202 "},
        {{2, 0, 1, 2}, false, "100 202 206 "},
        // A query draws an operator for each gap: the word, then the gap after it.
        {{1, 0, 3, 1}, true, "100 AND 202 "},
        {{1, 0, 20, 1}, true, "100 AND 202 "},
        {{1, 0, 4, 1}, true, "100 OR 202 "},
        {{1, 0, 7, 1}, true, "100 OR 202 "},
        {{1, 0, 8, 1}, true, "100 AND NOT 202 "},
        {{1, 0, 10, 1}, true, "100 AND NOT 202 "},
        {{1, 0, 11, 1}, true, "100 202 "},
        {{1, 0, 19, 1}, true, "100 202 "},
        {{2, 0, 8, 1, 8, 2}, true, "100 202 AND NOT 206 "},
        {{3, 0, 0, 1, 4, 2, 10, 0}, true, "100 AND 202 OR 206 AND NOT 100 "},
    };
    for (const auto& c : cases) {
        scripted = c.drawn;
        const long before = draws;
        std::string text = "stale";
        generateRandomText(text, c.isQuery);
        EXPECT_EQ(c.expected, text);
        EXPECT_EQ(static_cast<long>(c.drawn.size()), draws - before);
        EXPECT_TRUE(scripted.empty());
    }
}

TEST_F(ReteProgramTest, WithoutPatternsItPrintsZeroCounts) {
    for (const int testcount : {0, -1}) {
        RuleSystem rs;
        EXPECT_EQ("0 conditions\n[]\n0 implications\nTIME = 0\n",
                  printed([&] { testWildCards(&rs, testcount); }));
    }
    EXPECT_EQ(0, draws);
}

TEST_F(ReteProgramTest, PrintsTheSecondsBetweenTwoReadings) {
    secondsPerReading = 7;
    const std::time_t before = now;
    RuleSystem rs;
    EXPECT_EQ("0 conditions\n[]\n0 implications\nTIME = 7\n",
              printed([&] { testWildCards(&rs, 0); }));
    EXPECT_EQ(before + 14, now) << "not read once before and once after";
    secondsPerReading = 5000000000;
    EXPECT_EQ("0 conditions\n[]\n0 implications\nTIME = 5000000000\n",
              printed([&] { testWildCards(&rs, 0); }));
    secondsPerReading = -3;
    EXPECT_EQ("0 conditions\n[]\n0 implications\nTIME = -3\n",
              printed([&] { testWildCards(&rs, 0); }));
}

// The measured time begins after the line of conditions and ends after the line of implications.
TEST_F(ReteProgramTest, ReadsTheClockAroundResetAndMatch) {
    static std::vector<off_t> printedSoFar;
    printedSoFar.clear();
    onReading = [] {
        std::fflush(stdout);
        printedSoFar.push_back(::lseek(STDOUT_FILENO, 0, SEEK_CUR));
    };
    RuleSystem rs;
    const std::string output = printed([&] { testWildCards(&rs, 10); });
    EXPECT_THAT(printedSoFar, ElementsAre(output.find("conditions\n") + 11, output.find("TIME")));
}

// The order of the draws is fixed: counts and output depend only on the sequence.
TEST_F(ReteProgramTest, CutsPatternsAccordingToTheDraws) {
    RuleSystem rs;
    // First pattern: two cuts, [3, 5) of 26 letters, then [1, 1) of the remaining 25. Second
    // pattern: one cut of everything before the last letter.
    scripted = {1, 3, 2, 1, 0, 0, 0, 25};
    EXPECT_EQ("2 conditions\n[]\n1 implications\nTIME = 0\n",
              printed([&] { testWildCards(&rs, 2); }));
    EXPECT_TRUE(scripted.empty());
    std::vector<std::string> names;
    for (const auto& [name, condition] : rs._conditions) {
        names.push_back(name);
    }
    EXPECT_THAT(names, ElementsAre("*z", "a*bc*fghijklmnopqrstuvwxyz"));
}

TEST_F(ReteProgramTest, DrawsAndPrintsExactlyAsAPlainGenerator) {
    for (const int testcount : {1, 2, 10, 100, 1000, 20000}) {
        std::vector<long> values;
        recorded = &values;
        RuleSystem rs;
        const std::string output = printed([&] { testWildCards(&rs, testcount); });
        recorded = nullptr;
        const std::set<std::string> patterns = patternsFrom(values, testcount);
        EXPECT_EQ(expectedOutput(patterns), output);
        ASSERT_EQ(patterns.size(), rs._conditions.size());
        auto name = patterns.begin();
        for (const auto& [keyword, condition] : rs._conditions) {
            ASSERT_EQ(*name, keyword);
            ASSERT_EQ('z', keyword.back());
            ASSERT_NE(std::string::npos, keyword.find('*'));
            ++name;
        }
    }
}

TEST_F(ReteProgramTest, EachPatternFeedsItsOwnOperatorThatImpliesIt) {
    RuleSystem rs;
    printed([&] { testWildCards(&rs, 500); });
    EXPECT_EQ(rs._conditions.size(), rs._allOperators.size());
    for (const auto& [keyword, condition] : rs._conditions) {
        ASSERT_EQ(1u, condition->_operators.size());
        const BoolOperator* const op = *condition->_operators.begin();
        EXPECT_THAT(op->_implications, ElementsAre(keyword + '\n'));
        EXPECT_EQ(1, op->_needMatch);
        EXPECT_EQ(AND_OPERATOR, op->_type);
    }
}

TEST_F(ReteProgramTest, KeepsTheRulesAndResetsTheConditions) {
    RuleSystem rs;
    printed([&] { testWildCards(&rs, 500); });
    EXPECT_GT(rs._conditions.size(), 100u);
    EXPECT_GT(rs._setConditions.size(), 100u);
    for (const auto& [keyword, condition] : rs._conditions) {
        EXPECT_FALSE(condition->isSet());
        EXPECT_FALSE((*condition->_operators.begin())->hasFired());
    }
}

TEST_F(ReteProgramTest, TheTestTermMissesPatternsThatNameItsFourteenthLetter) {
    const char* const term = "abcdefghijklmxopqrstuvwxyz";
    EXPECT_TRUE(WildcardMatcher("abcdefghijklm*z").isMatch(term));
    EXPECT_FALSE(WildcardMatcher("abcdefghijklmn*z").isMatch(term));
}

TEST_F(ReteProgramTest, TheSameSeedGivesTheSameOutput) {
    std::vector<std::string> outputs;
    for (int run = 0; run < 2; ++run) {
        srandom(1);
        RuleSystem rs;
        outputs.push_back(printed([&] { testWildCards(&rs, 3000); }));
    }
    EXPECT_EQ(outputs[0], outputs[1]);
}

TEST_F(ReteProgramTest, AHundredThousandPatternsAgreeWithThePlainGenerator) {
    std::vector<long> values;
    recorded = &values;
    RuleSystem rs;
    const std::string output = printed([&] { testWildCards(&rs, 100000); });
    recorded = nullptr;
    const std::string expected = expectedOutput(patternsFrom(values, 100000));
    EXPECT_EQ(expected, output);
}

}  // namespace
