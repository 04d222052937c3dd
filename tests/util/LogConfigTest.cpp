// Logger::initialize with a configuration file. Logging is initialized once per process, so each
// configuration is read in a child process.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "support/InChild.h"
#include "support/RootLayout.h"
#include "support/TempDir.h"
#include "util/LogAppender.h"
#include "util/LogFormat.h"
#include "util/Logger.h"
#include "util/Pathname.h"
#include "util/Timeval.h"
#include "util/internal/LogGlobals.h"

namespace fs = std::filesystem;
using namespace std::string_literals;

namespace {

class LogConfigTest : public testing::Test {
protected:
    // Reads a configuration in a child and then runs `body` there, with initialize's result.
    template <typename Body>
    ChildRun configured(const std::string& config, Body body) {
        writeFile(_cfg, config);
        return inChild([&] { body(Logger::initialize(Pathname(_cfg), Pathname(_dir.path()))); });
    }

    // The same; standard error must then hold exactly `err`.
    template <typename Body>
    void expectRun(const std::string& err, const std::string& config, Body body) {
        const ChildRun run = configured(config, body);
        EXPECT_EQ(0, run.status) << config;
        EXPECT_EQ(err, run.err) << config;
    }

    // Reads a configuration that is complete, and returns what was reported to standard error.
    std::string reportsOf(const std::string& config) {
        const ChildRun run = configured(config, [](bool complete) { EXPECT_TRUE(complete); });
        EXPECT_EQ(0, run.status) << config;
        return run.err;
    }

    std::string parseError(unsigned lineno, const std::string& text) const {
        return _cfg + ":" + std::to_string(lineno) + ": Parse error at \"" + text + "\"\n";
    }

    // The reports of lines that are no good, given as pairs of number and text.
    std::string parseErrors(const std::vector<std::pair<unsigned, std::string>>& errors) const {
        std::string all;
        for (const auto& [lineno, text] : errors) {
            all += parseError(lineno, text);
        }
        return all;
    }

    // A log file of this case: name and attribute line of an appender.
    std::string logFile(const std::string& name) const { return _dir.file(name + ".log"); }
    std::string fileLine(const std::string& name) const {
        return "appender." + name + ".fileName=" + logFile(name) + "\n";
    }

    TempDir _dir;
    const std::string _cfg = _dir.file("log.cfg");
};

LogChannel& channel(const char* name) {
    return *LogChannel::find(name, false);
}

std::vector<LogAppender*> appendersNamed(const std::vector<std::string>& names) {
    std::vector<LogAppender*> found;
    for (const std::string& name : names) {
        found.push_back(LogAppender::find(name, false));
        EXPECT_NE(nullptr, found.back()) << name;
    }
    return found;
}

}  // namespace

TEST_F(LogConfigTest, ExampleRunsEndToEnd) {
    fs::create_directories(_dir.file("var/log"));
    const char* const config =
        "# logging for the command-line tools\n"
        "log4cpp.rootCategory=WARN,A1\n"
        "appender.A1=RollingFileAppender\n"
        "appender.A1.fileName=${QUELTA_HOME}/var/log/cmdline.log\n"
        "appender.A1.maxFileSize=25000000\n"
        "appender.A1.maxBackupIndex=5\n"
        "appender.A1.layout=PatternLayout\n"
        "appender.A1.layout.ConversionPattern=%d{%m-%d-%Y %H:%M:%S.%l} %-5p %c - %m%n\n"
        "category.Rete=DEBUG\n";
    expectRun("", config, [&](bool complete) {
        EXPECT_TRUE(complete);
        const LogAppender& a1 = *LogAppender::find("A1", false);
        EXPECT_EQ(_dir.file("var/log/cmdline.log"), a1._filename);
        EXPECT_EQ(25000000, a1._maxSize);
        EXPECT_EQ(5U, a1._maxBackupIndex);
        EXPECT_EQ(1U, appenders().size());
        Logger rete("Rete");
        Logger other("Other");
        rete.debug("a pattern of %d", 5);
        other.debug("dropped");
        other.info("dropped");
        other.warn("a warning");
        rete.fatal("the end");
    });
    const std::string time = "[0-9]{2}-[0-9]{2}-[0-9]{4} [0-9]{2}:[0-9]{2}:[0-9]{2}[.][0-9]{3} ";
    EXPECT_THAT(readFile(_dir.file("var/log/cmdline.log")),
                testing::MatchesRegex(time + "DEBUG Rete - a pattern of 5\n" +  //
                                      time + "WARN  Other - a warning\n" +      //
                                      time + "FATAL Rete - the end\n"));
}

TEST_F(LogConfigTest, AnEmptyFileLeavesTheDefaults) {
    for (const char* const config : {"", "\n\n", "# nothing\n \t \n", "<!-- a -->\n"}) {
        const ChildRun run = configured(config, [](bool complete) {
            EXPECT_TRUE(complete);
            EXPECT_EQ(INFO, rootChannel().minlevel);
            EXPECT_TRUE(rootChannel()._appenders.empty());
            EXPECT_TRUE(appenders().empty());
            Logger("any").info("bare");
            Logger("any").debug("dropped");
        });
        EXPECT_EQ(0, run.status) << config;
        EXPECT_EQ("bare\n", run.err) << config;
    }
}

TEST_F(LogConfigTest, AMissingFileIsReportedAndLeavesLoggingUsable) {
    const struct {
        std::string file;
        const char* error;
    } table[] = {{_dir.file("missing.cfg"), "No such file or directory"},
                 {_cfg + "/below", "Not a directory"},
                 {_dir.file("loop"), "Too many levels of symbolic links"},
                 {"", "No such file or directory"}};
    writeFile(_cfg, "rootCategory=DEBUG\n");
    fs::create_symlink(_dir.file("loop"), _dir.file("loop"));
    for (const auto& row : table) {
        const ChildRun run = inChild([&] {
            Logger waiting("waiting");
            EXPECT_FALSE(Logger::initialize(Pathname(row.file), Pathname()));
            EXPECT_TRUE(logger_initialized);
            EXPECT_EQ(&rootChannel(), waiting._channel);
            waiting.debug("dropped");
            waiting.info("info");
            waiting.error("error");
        });
        EXPECT_EQ(0, run.status);
        EXPECT_EQ("Couldn't open log file configuration \"" + row.file + "\": " + row.error +
                      "\ninfo\nerror\n",
                  run.err);
    }
}

TEST_F(LogConfigTest, AMissingFileIsReportedByTheChannelNamedLogger) {
    const ChildRun run = inChild([&] {
        LogChannel::find("Logger", true)->minlevel = CRIT;
        EXPECT_FALSE(Logger::initialize(Pathname(_cfg), Pathname()));
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST_F(LogConfigTest, AMissingFileAndAnOpenCommentAreErrorsAndABadLineIsAWarning) {
    const ChildRun missing = inChild([&] {
        const RootLayout layout("%p %c %m%n");
        EXPECT_FALSE(Logger::initialize(Pathname(_cfg), Pathname()));
    });
    EXPECT_EQ("ERROR Logger Couldn't open log file configuration \"" + _cfg +
                  "\": No such file or directory\n",
              missing.err);
    writeFile(_cfg, "bad\n<!-- open\n");
    const ChildRun open = inChild([&] {
        const RootLayout layout("%p %c %m%n");
        EXPECT_FALSE(Logger::initialize(Pathname(_cfg), Pathname()));
    });
    EXPECT_EQ("ERROR Logger " + _cfg + ":2: Unterminated XML comment started\nWARN Logger " +
                  parseError(1, "bad"),
              open.err);
    EXPECT_EQ(0, missing.status | open.status);
}

TEST_F(LogConfigTest, TheEpochIsFixedBeforeTheFileIsRead) {
    ASSERT_EQ(0, ::mkfifo(_cfg.c_str(), 0600));
    const ChildRun run = inChild([&] {
        Timeval opened;
        std::thread writer([&] {
            std::FILE* const pipe = std::fopen(_cfg.c_str(), "w");  // waits for the reader
            opened = Timeval::now();
            while (Timeval::now() <= opened) {}
            std::fclose(pipe);
        });
        EXPECT_TRUE(Logger::initialize(Pathname(_cfg), Pathname()));
        writer.join();
        EXPECT_LE(epoch_timeval(), opened);
    });
    EXPECT_EQ(0, run.status);
}

TEST_F(LogConfigTest, InitializingTwiceIsAnError) {
    writeFile(_cfg, "");
    EXPECT_DEATH(
        {
            Logger::initialize();
            (void)Logger::initialize(Pathname(_cfg), Pathname());
        },
        "src/util/Logger.cpp:[0-9]+: failed assertion `!logger_initialized'");
}

TEST_F(LogConfigTest, KeysMayCarryThePrefixOnce) {
    expectRun(parseErrors({{5, "log4cpp.category.Y=WARN"},
                           {6, " rootCategory=ERROR"},
                           {7, ""},
                           {8, "Log4cpp.rootCategory=ERROR"}}),
              "  log4cpp.rootCategory = DEBUG\n"
              "log4cpp.category.X=ERROR\n"
              "log4cpp.appender.A=any\n"
              "log4cpp." +
                  fileLine("A") +
                  "log4cpp.log4cpp.category.Y=WARN\n"
                  "log4cpp. rootCategory=ERROR\n"
                  "log4cpp.\n"
                  "Log4cpp.rootCategory=ERROR\n",
              [&](bool complete) {
                  EXPECT_TRUE(complete);
                  EXPECT_EQ(DEBUG, rootChannel().minlevel);
                  EXPECT_EQ(ERROR, channel("X").minlevel);
                  EXPECT_EQ(&rootChannel(), &channel("Y"));
                  EXPECT_EQ(logFile("A"), LogAppender::find("A", false)->_filename);
              });
}

TEST_F(LogConfigTest, EveryBadLineIsReportedWithItsNumberAndTheRestTakesEffect) {
    const std::vector<std::string> bad = {
        "rootCategory",
        "rootCategory WARN",
        "rootCategory.x=WARN",
        "rootcategory=WARN",
        "category",
        "category=WARN",
        "category WARN",
        "Category.X=WARN",
        "appender",
        "appender=A",
        "appender A",
        "appender.",
        "appender.=A",
        "appender. A=x",
        "appender..fileName=x",
        "appender.A",
        "appender.A x",
        "appender.A x = y",
        "appender.A .fileName=x",
        "appender.A.",
        "appender.A.=x",
        "appender.A.fileName",
        "appender.A.fileName /tmp/x",
        "appender.A.file Name=/tmp/x",
        "appender.A.maxFileSize=10MB",
        "appender.A.maxFileSize=0100",
        "appender.A.maxFileSize=",
        "appender.A.maxFileSize=9223372036854775808",
        "appender.A.maxBackupIndex=4294967296",
        "appender.A.maxBackupIndex=-1",
        "appender.A.layout=XMLLayout",
        "appender.A.unknown=x",
        "appender.A.filename=x",
        "appender.A.layout.conversionPattern=%m",
        "<config>",
        "</config>",
        "<!- no comment -->",
        "=",
        ".",
        "= WARN",
        "word",
        "unknown.key=value",
        "rootCategory: WARN",
    };
    std::string config = fileLine("A");
    std::string expected;
    for (const std::string& line : bad) {
        config += line + "\n";
        expected +=
            parseError(static_cast<unsigned>(std::count(config.begin(), config.end(), '\n')), line);
    }
    config += "rootCategory=NOTICE\n";
    expectRun(expected, config, [&](bool complete) {
        EXPECT_TRUE(complete);
        EXPECT_EQ(NOTICE, rootChannel().minlevel);
        const LogAppender& a = *LogAppender::find("A", false);
        EXPECT_EQ(logFile("A"), a._filename);
        EXPECT_EQ(0, a._maxSize);
        EXPECT_EQ(0U, a._maxBackupIndex);
        EXPECT_EQ(&defaultFormat(), a._fmt);
        EXPECT_EQ(1U, appenders().size());
    });
}

TEST_F(LogConfigTest, AnAppenderIsMadeByEachLineThatNamesOne) {
    const ChildRun run = configured(
        "appender.A=FileAppender\n"
        "appender.B = \n"
        "appender.C\t=\tx\n"
        "appender.D.maxFileSize=bad\n"
        "appender.E\n"
        "rootCategory=WARN,A,B,C,D,E\n",
        [&](bool) {
            EXPECT_EQ(appendersNamed({"A", "B", "C", "D", "E"}), rootChannel()._appenders);
            rootChannel().setConfig("rootAppender");
        });
    EXPECT_EQ(0, run.status);
    EXPECT_THAT(run.err, testing::HasSubstr("Appender \"E\" has no filename, assuming stderr\n"));
}

TEST_F(LogConfigTest, BlanksAroundNamesAndValuesAreDropped) {
    expectRun("",
              " \trootCategory \t= \tWARN , A \t\n"
              "category. X = DEBUG\n"
              "category.Y Z =ERROR\n"
              "appender.A \t = x\n"
              "appender.A.fileName \t=\t " +
                  logFile("A") + " \t# note\n" +
                  "appender.A.layout.ConversionPattern =   %m |%n  \t\n",
              [&](bool) {
                  EXPECT_EQ(WARN, rootChannel().minlevel);
                  EXPECT_EQ(appendersNamed({"A"}), rootChannel()._appenders);
                  EXPECT_EQ(DEBUG, channel("X").minlevel);
                  EXPECT_EQ(ERROR, channel("Y Z").minlevel);
                  EXPECT_EQ(logFile("A"), LogAppender::find("A", false)->_filename);
                  EXPECT_EQ("%m |%n", LogAppender::find("A", false)->_fmt->_fmt);
              });
}

TEST_F(LogConfigTest, TheLastRootCategoryCountsAndOnlyItsWordsAreChecked) {
    expectRun(parseErrors({{3, "rootCategory"}, {2, "ERROR,nobody"}}),
              "rootCategory=BOGUS\n"
              "rootCategory=ERROR,nobody\n"
              "rootCategory\n"
              "category.Logger=WARN\n",
              [&](bool complete) {
                  EXPECT_TRUE(complete);
                  EXPECT_EQ(ERROR, rootChannel().minlevel);
                  EXPECT_TRUE(rootChannel()._appenders.empty());
              });
}

TEST_F(LogConfigTest, ErrorsAreReportedLinesFirstThenRootThenCategories) {
    EXPECT_EQ(parseErrors({{2, "first"},
                           {5, "second"},
                           {3, "WARN nobody"},
                           {1, "X=BOGUS"},
                           {4, "Y"},
                           {6, "Z =DEBUG, nobody"},
                           {7, ""}}),
              reportsOf("category.X=BOGUS\n"
                        "first\n"
                        " log4cpp.rootCategory = WARN nobody # note\n"
                        "category.Y\n"
                        "second\n"
                        "log4cpp.category.Z =DEBUG, nobody\n"
                        "category.\n"));
}

TEST_F(LogConfigTest, SettingsWithoutWordsAndEmptyValuesAreNoErrors) {
    expectRun("Appender \"A\" has no filename, assuming stderr\n",
              "rootCategory=\n"
              "category.X = \n"
              "category.Y= , \t,\n"
              "appender.A.fileName =\n"
              "appender.A.layout.ConversionPattern=\n",
              [&](bool complete) {
                  EXPECT_TRUE(complete);
                  EXPECT_EQ(INFO, rootChannel().minlevel);
                  EXPECT_NE(&rootChannel(), &channel("X"));
                  EXPECT_EQ(INFO, channel("Y").minlevel);
                  EXPECT_EQ("", LogAppender::find("A", false)->_fmt->_fmt);
              });
}

TEST_F(LogConfigTest, AnUndeclaredAppenderInACategoryLeavesTheLevelAndTheRootsAppenders) {
    expectRun("", "rootCategory=WARN,A\n" + fileLine("A") + "category.X=INFO,B\n",
              [&](bool complete) {
                  EXPECT_TRUE(complete);
                  EXPECT_EQ(INFO, channel("X").minlevel);
                  EXPECT_EQ(appendersNamed({"A"}), channel("X")._appenders);
                  EXPECT_EQ(nullptr, LogAppender::find("B", false));
              });
    EXPECT_EQ(parseError(3, "X=INFO,B"), readFile(logFile("A")));
}

TEST_F(LogConfigTest, TheOrderOfTheLinesDoesNotMatter) {
    std::vector<std::string> lines = {"rootCategory=WARN,A,B\n",
                                      "category.X=DEBUG\n",
                                      "category.Y=ERROR,B\n",
                                      "category.Z=C,A\n",
                                      "category.=rootAppender\n",
                                      "appender.C=x\n",
                                      fileLine("A"),
                                      fileLine("B"),
                                      fileLine("C"),
                                      "appender.A.maxFileSize=500\n",
                                      "appender.A.maxBackupIndex=2\n",
                                      "appender.B.layout=SimpleLayout\n"};
    std::mt19937 random(20240607);
    for (int round = 0; round < 40; ++round) {
        std::string config;
        for (const std::string& line : lines) {
            config += line;
        }
        const ChildRun run = configured(config, [](bool complete) {
            EXPECT_TRUE(complete);
            EXPECT_EQ(WARN, rootChannel().minlevel);
            EXPECT_EQ(appendersNamed({"A", "B"}), rootChannel()._appenders);
            EXPECT_EQ(DEBUG, channel("X").minlevel);
            EXPECT_EQ(appendersNamed({"A", "B"}), channel("X")._appenders);
            EXPECT_EQ(ERROR, channel("Y").minlevel);
            EXPECT_EQ(appendersNamed({"B"}), channel("Y")._appenders);
            EXPECT_EQ(WARN, channel("Z").minlevel);
            EXPECT_EQ(appendersNamed({"C", "A"}), channel("Z")._appenders);
            EXPECT_EQ(WARN, channel("").minlevel);
            EXPECT_EQ(appendersNamed({"rootAppender"}), channel("")._appenders);
            EXPECT_EQ(500, LogAppender::find("A", false)->_maxSize);
            EXPECT_EQ(2U, LogAppender::find("A", false)->_maxBackupIndex);
            EXPECT_EQ("%-8p: %m%n", LogAppender::find("B", false)->_fmt->_fmt);
        });
        EXPECT_EQ(0, run.status) << config;
        EXPECT_EQ("", run.err) << config;
        std::shuffle(lines.begin(), lines.end(), random);
    }
}

TEST_F(LogConfigTest, AttributesTakeEffectInTheOrderOfTheFile) {
    const ChildRun run = configured("appender.A.fileName=" + _dir.file("one") + "\n" +
                                        "appender.A.fileName=.two\n"
                                        "appender.A.layout=BasicLayout\n"
                                        "appender.A.layout=SimpleLayout\n"
                                        "appender.A.maxFileSize=5\n"
                                        "appender.A.maxFileSize=6\n",
                                    [&](bool) {
                                        const LogAppender& a = *LogAppender::find("A", false);
                                        EXPECT_EQ(_dir.file("one.two"), a._filename);
                                        EXPECT_EQ("%-8p: %m%n", a._fmt->_fmt);
                                        EXPECT_EQ(6, a._maxSize);
                                    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", readFile(_dir.file("one.two")));
}

TEST_F(LogConfigTest, SetupsAreReportedInNameOrderBeforeBadLines) {
    EXPECT_EQ(
        "Appender \"A\" has no filename, assuming stderr\n"
        "Error opening \"" +
            _dir.file("missing/b.log") +
            "\": No such file or directory\n"
            "Appender \"C\" has maxBackupIndex set without specifying maxSize, ignoring\n" +
            parseError(1, "bad"),
        reportsOf("bad\n"
                  "appender.C.maxBackupIndex=1\n" +
                  fileLine("C") + "appender.B.fileName=" + _dir.file("missing/b.log") + "\n" +
                  "appender.A=x\n"));
}

TEST_F(LogConfigTest, TheRootAppenderTakesAttributesButNoSetup) {
    expectRun("WARN    : " + parseError(5, "bad") + "DEBUG   : text\n",
              "appender.rootAppender=x\n"
              "appender.rootAppender.layout=SimpleLayout\n"
              "appender.rootAppender.maxBackupIndex=3\n"
              "rootCategory=DEBUG,rootAppender\n"
              "bad\n",
              [&](bool) {
                  EXPECT_TRUE(appenders().empty());
                  EXPECT_EQ(3U, rootAppender()._maxBackupIndex);
                  Logger("any").debug("text");
              });
}

TEST_F(LogConfigTest, AppendersWithoutALayoutTakeTheRootAppenders) {
    const ChildRun run = configured(
        "rootCategory=DEBUG,A\n" + fileLine("A") + "appender.rootAppender.layout=SimpleLayout\n",
        [&](bool) { Logger("any").info("text"); });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("INFO    : text\n", readFile(logFile("A")));
}

TEST_F(LogConfigTest, ReportsReachTheChannelOfThatName) {
    expectRun("",
              "rootCategory=WARN,A\n" + fileLine("A") + fileLine("L") +
                  "category.Logger=WARN,L\n"
                  "appender.L.layout.ConversionPattern=%p %c %m%n\n"
                  "bad\n",
              [](bool complete) { EXPECT_TRUE(complete); });
    EXPECT_EQ("", readFile(logFile("A")));
    EXPECT_EQ("WARN Logger " + parseError(6, "bad"), readFile(logFile("L")));
}

TEST_F(LogConfigTest, ReportsBelowTheLevelOfTheirChannelAreDropped) {
    expectRun(_cfg + ":3: Unterminated XML comment started\n",
              "category.Logger=ERROR\n"
              "bad\n"
              "<!-- open\n",
              [](bool complete) { EXPECT_FALSE(complete); });
}

TEST_F(LogConfigTest, ABadPathIsReportedThroughAppendersThatAreNotSetUpYet) {
    expectRun("",
              "rootCategory=WARN,A,B\n"
              "appender.A.fileName=" +
                  _dir.file("missing/a.log") + "\n" + fileLine("B"),
              [](bool complete) {
                  EXPECT_TRUE(complete);
                  EXPECT_FALSE(LogAppender::find("B", false)->_fd.valid());
              });
    EXPECT_EQ("Error opening \"" + _dir.file("missing/a.log") + "\": No such file or directory\n",
              readFile(logFile("B")));
}

TEST_F(LogConfigTest, ABadPathIsReportedThroughAnAppenderThatIsYetToBecomeStandardError) {
    const std::string report =
        "Error opening \"" + _dir.file("missing/a.log") + "\": No such file or directory\n";
    const ChildRun run = configured(
        "rootCategory=WARN,A,B\n"
        "appender.A.fileName=" +
            _dir.file("missing/a.log") + "\n" + "appender.B.layout=SimpleLayout\n",
        [](bool complete) { EXPECT_TRUE(complete); });
    EXPECT_EQ(0, run.status);
    // The second report is A's own: asked to report that B has no file, A cannot open its file. B's
    // warning is lost.
    EXPECT_EQ("ERROR   : " + report + "ERROR   : " + report, run.err);
}

TEST_F(LogConfigTest, AnAppenderWhoseSettingIsReportedTakesTheReportsOfOthers) {
    const std::string missing = _dir.file("missing/b.log");
    expectRun("",
              "rootCategory=WARN,A,B\n" + fileLine("A") +
                  "appender.A.maxBackupIndex=3\nappender.B.fileName=" + missing + "\n",
              [](bool complete) { EXPECT_TRUE(complete); });
    // B fails first when it is to take the report of A's setting, then in its own setup.
    const std::string report = "Error opening \"" + missing + "\": No such file or directory\n";
    EXPECT_EQ(report + report, readFile(logFile("A")));
}

TEST_F(LogConfigTest, CommentsAreRemovedAndLinesKeepTheirNumbers) {
    const struct {
        const char* config;
        std::vector<std::pair<unsigned, std::string>> errors;
    } table[] = {
        {"bad # note\n", {{1, "bad"}}},
        {"#bad\nbad#\n", {{2, "bad"}}},
        {"a<!-- note -->b\n", {{1, "ab"}}},
        {"<!-- note -->bad\n", {{1, "bad"}}},
        {"bad<!-- note -->\n", {{1, "bad"}}},
        {" \t<!-- note --> \n", {}},
        {"<!---->bad<!---->\n", {{1, "bad"}}},
        {"<!-->bad-->x\n", {{1, "x"}}},
        {"a<!--1-->b<!--2-->c<!--3-->\n", {{1, "abc"}}},
        {"a<!-- <!-- -->b-->c\n", {{1, "ab-->c"}}},
        {"<!-- one\ntwo\nthree -->bad\nnext\n", {{3, "bad"}, {4, "next"}}},
        {"a<!-- one\ntwo\nthree -->b\nnext\n", {{3, "ab"}, {4, "next"}}},
        {"a<!--\n-->b<!--\n\n-->c\nnext\n", {{4, "abc"}, {5, "next"}}},
        // A "#" is handled before "<!--" on the same line, and so can hide it.
        {"bad # <!-- \nnext\n", {{1, "bad"}, {2, "next"}}},
        {"a<!-- # -->hidden\n-->b\n", {{2, "ab"}}},
        {"a<!--\n # -->b\n", {{2, "ab"}}},
        {"a<!--\n-->b # note\nnext\n", {{2, "ab"}, {3, "next"}}},
        {"a<!--\n-->b # <!-- note\nnext\n", {{2, "ab"}, {3, "next"}}},
        // What is joined is read again.
        {"<<!-- x -->!-- y -->bad\n", {{1, "bad"}}},
        {"<!<!-- x -->-- y -->bad\n", {{1, "bad"}}},
        {"<!-<!-- x\n-->- y\n-->bad\n", {{3, "bad"}}},
        {"log4<!-- x -->cpp.bad\n", {{1, "bad"}}},
        {" <!-- x --> log4cpp.bad <!-- x --> \n", {{1, "bad"}}},
        // No comments.
        {"<config>\n", {{1, "<config>"}}},
        {"< !-- x -->\n<! -- x -->\n<!- x -->\n",
         {{1, "< !-- x -->"}, {2, "<! -- x -->"}, {3, "<!- x -->"}}},
        {"-->\n", {{1, "-->"}}},
        {"a--><!-- x -->b\n", {{1, "a-->b"}}},
    };
    for (const auto& row : table) {
        EXPECT_EQ(parseErrors(row.errors), reportsOf(row.config)) << row.config;
    }
}

TEST_F(LogConfigTest, AnOpenCommentIsReportedWithTheLineWhereItBegan) {
    const struct {
        const char* config;
        unsigned lineno;
    } table[] = {
        {"rootCategory=DEBUG\nbad\n<!-- open\nrootCategory=ERROR\n", 3},
        {"rootCategory=DEBUG\nbad\n<!--", 3},
        {"rootCategory=DEBUG\nbad\n\n<!-- a -->\nrootCategory=ERROR <!-- open -- >\n->", 5},
        {"rootCategory=DEBUG\nbad\n<!-- a\n-->rootCategory=ERROR<!-- open\n\n\n", 4},
        {"rootCategory=DEBUG\nbad\nrootCategory=ERROR <!-- # -->\n", 3},
    };
    for (const auto& row : table) {
        const ChildRun run = configured(row.config, [](bool complete) {
            EXPECT_FALSE(complete);
            EXPECT_EQ(DEBUG, rootChannel().minlevel);
        });
        EXPECT_EQ(0, run.status) << row.config;
        EXPECT_EQ(_cfg + ":" + std::to_string(row.lineno) + ": Unterminated XML comment started\n" +
                      parseError(2, "bad"),
                  run.err);
    }
}

TEST_F(LogConfigTest, TheLastLineNeedsNoNewline) {
    EXPECT_EQ(parseError(2, "bad"), reportsOf("\nbad"));
    const ChildRun run = configured("rootCategory=ALERT", [](bool complete) {
        EXPECT_TRUE(complete);
        EXPECT_EQ(ALERT, rootChannel().minlevel);
    });
    EXPECT_EQ(0, run.status);
}

TEST_F(LogConfigTest, LinesMayBeLong) {
    const std::string longText(10000, 'x');
    const std::string blanks(10000, ' ');
    EXPECT_EQ(parseErrors({{1, longText}, {3, longText}, {4, "last"}}),
              reportsOf(longText + "\n" + blanks + "\n" + blanks + longText + blanks + "# " +
                        longText + "\nlast"));
    expectRun("", "category." + longText + blanks + "=" + blanks + "DEBUG\n",
              [&](bool) { EXPECT_EQ(DEBUG, LogChannel::find(longText, false)->minlevel); });
}

TEST_F(LogConfigTest, ACarriageReturnIsAnOrdinaryCharacter) {
    expectRun(parseErrors({{2, "\r"},
                           {4, "appender.A.maxFileSize=5\r"},
                           {5, "appender.A.layout=SimpleLayout\r"},
                           {1, "WARN\r"}}),
              "rootCategory=WARN\r\n"
              "\r\n"
              "appender.A.fileName=" +
                  _dir.file("a") + "\r\n" +
                  "appender.A.maxFileSize=5\r\n"
                  "appender.A.layout=SimpleLayout\r\n",
              [&](bool) {
                  EXPECT_EQ(INFO, rootChannel().minlevel);
                  EXPECT_EQ(_dir.file("a\r"), LogAppender::find("A", false)->_filename);
              });
}

TEST_F(LogConfigTest, NulBytesAreOrdinaryAndDoNotHideTheRestOfTheFile) {
    expectRun("",
              "category.X\0Y=DEBUG\n"
              "# \0 -->\n"
              "<!-- \0 --> \0 \n"
              "rootCategory=ERROR\0\n"
              "category.Z=DEBUG\n"s,
              [&](bool) {
                  EXPECT_EQ(DEBUG, LogChannel::find("X\0Y"s, false)->minlevel);
                  EXPECT_EQ(DEBUG, channel("Z").minlevel);
                  EXPECT_EQ(ERROR, rootChannel().minlevel);
              });
}

TEST_F(LogConfigTest, BytesBeyondAsciiAreOrdinary) {
    expectRun(parseError(2, "\xc3"),
              "category.\xff\xfe\x80=DEBUG\n"
              "\xc3\n",
              [&](bool) { EXPECT_EQ(DEBUG, channel("\xff\xfe\x80").minlevel); });
}

TEST_F(LogConfigTest, ValuesMayHoldEqualsSignsAndPoints) {
    expectRun(parseError(4, "a=b=DEBUG"),
              fileLine("A") +
                  "appender.A.layout.ConversionPattern=a=b.c = %m\n"
                  "category.a.b.c=DEBUG\n"
                  "category.a=b=DEBUG\n",
              [&](bool) {
                  const LogAppender& a = *LogAppender::find("A", false);
                  EXPECT_EQ("a=b.c = %m", a._fmt->_fmt);
                  EXPECT_EQ(DEBUG, channel("a.b.c").minlevel);
              });
}
