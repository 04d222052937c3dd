// The example programs do what README.md shows.

#include <gtest/gtest.h>

#include <filesystem>
#include <regex>
#include <set>
#include <string>

#include "examples/Page.h"
#include "support/RunProgram.h"
#include "support/TempDir.h"

namespace {

const std::string project = PROJECT;
const std::string sampleRules = project + "/examples/rules.txt";
const std::string sampleConfig = project + "/examples/own_log.cfg";

// All matches of a regular expression, in this format.
std::set<std::string> allMatches(const std::string& text, const char* regex, const char* format) {
    const std::regex expression(regex);
    std::set<std::string> found;
    for (std::sregex_iterator match(text.begin(), text.end(), expression), end; match != end;
         ++match) {
        found.insert(match->format(format));
    }
    return found;
}

TEST(RuleConsoleTest, PrintsWhatFiresAndWhatStopsFiring) {
    const ProgramRun run = Program(RULE_CONSOLE)
                               .arg(sampleRules)
                               .input(
                                   "access-0103.log.gz\n"
                                   "disk full\n"
                                   "\n"
                                   "kernel error 5\n"
                                   "-disk full\n"
                                   "nothing known\n"
                                   "!\n")
                               .run();
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
    EXPECT_EQ(
        "+ watching\n"
        "+ archive the web log\n"
        "+ old log\n"
        "+ web log\n"
        "+ call support\n"
        "- call support\n"
        "- archive the web log\n"
        "- old log\n"
        "- web log\n",
        run.out);
}

TEST(RuleConsoleTest, DoesWhatTheReadmeShows) {
    const ProgramRun run =
        Program(RULE_CONSOLE)
            .arg("examples/rules.txt")
            .in(project)
            .input("access-0103.log.gz\ndisk full\nkernel error 5\n-disk full\n!\n")
            .run();
    EXPECT_TRUE(pageShows("README.md", "$ cat examples/rules.txt\n" + readFile(sampleRules)));
    EXPECT_TRUE(
        pageShows("README.md",
                  "$ printf '%s\\n' access-0103.log.gz 'disk full' 'kernel error 5' '-disk full' "
                  "'!' |\n"
                  "      build/dev/examples/rule_console examples/rules.txt\n" +
                      run.out));
}

TEST(RuleConsoleTest, NamesTheLineOfARuleThatItCannotRead) {
    const TempDir dir;
    const std::string rules = dir.file("rules");
    for (const char* bad : {"no colon", ": a", "  : a", "a:", "a: b,,c", "a: ,"}) {
        writeFile(rules, std::string("# first\n\nfine: a\n") + bad + '\n');
        const ProgramRun run = Program(RULE_CONSOLE).arg(rules).run();
        EXPECT_EQ(1, run.status) << bad;
        EXPECT_EQ("", run.out) << bad;
        EXPECT_EQ(0U, run.err.find("rule_console: " + rules + ":4: ")) << bad << run.err;
    }
}

TEST(RuleConsoleTest, RefusesAPatternOfTooManySegments) {
    const TempDir dir;
    const std::string rules = dir.file("rules");
    std::string pattern;
    for (int i = 0; i < 257; ++i) {
        pattern += "a*";
    }
    writeFile(rules, "many: " + pattern + '\n');
    const ProgramRun run = Program(RULE_CONSOLE).arg(rules).run();
    EXPECT_EQ(1, run.status);
    EXPECT_EQ(0U, run.err.find("rule_console: " + rules + ":1: "));
}

TEST(RuleConsoleTest, PrintsTheRulesAsAGraph) {
    const ProgramRun run = Program(RULE_CONSOLE).arg("--graph").arg(sampleRules).run();
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
    EXPECT_EQ(
        "digraph rules {\n"
        "    rankdir=LR;\n"
        "    node [fontname=\"sans-serif\"];\n"
        "    \"rule,1\" [shape=box, label=\"web log\"];\n"
        "    \"*access*log*\" -> \"rule,1\";\n"
        "    \"rule,2\" [shape=box, label=\"old log\"];\n"
        "    \"*.gz\" -> \"rule,2\";\n"
        "    \"rule,3\" [shape=box, label=\"archive the web log\"];\n"
        "    \"*.gz\" -> \"rule,3\";\n"
        "    \"*access*log*\" -> \"rule,3\";\n"
        "    \"rule,4\" [shape=box, label=\"watching\"];\n"
        "    \"meta::all\" -> \"rule,4\";\n"
        "    \"rule,5\" [shape=box, label=\"call support\"];\n"
        "    \"*error*\" -> \"rule,5\";\n"
        "    \"disk full\" -> \"rule,5\";\n"
        "}\n",
        run.out);
}

TEST(RuleConsoleTest, QuotesTheNamesInAGraph) {
    const TempDir dir;
    writeFile(dir.file("rules"), "a \"b\": c\\d\n");
    const std::string graph = Program(RULE_CONSOLE).arg("--graph").arg(dir.file("rules")).run().out;
    EXPECT_NE(std::string::npos, graph.find("label=\"a \\\"b\\\"\"];\n")) << graph;
    EXPECT_NE(std::string::npos, graph.find("    \"c\\\\d\" -> ")) << graph;
}

// docs/network.svg is made by `rule_console --graph examples/rules.txt | dot -Tsvg`.
TEST(RuleConsoleTest, ThePictureInTheDocumentsShowsTheSampleRules) {
    const std::string picture = readFile(project + "/docs/network.svg");
    const std::string graph = Program(RULE_CONSOLE).arg("--graph").arg(sampleRules).run().out;
    EXPECT_EQ(allMatches(graph, "\"(.*)\" -> \"(.*)\"", "$1&#45;&gt;$2"),
              allMatches(picture, "<title>(.*&gt;.*)</title>", "$1"));
    EXPECT_EQ(allMatches(graph, "label=\"(.*)\"|\"(.*)\" ->", "$1$2"),
              allMatches(picture, ">(.*)</text>", "$1"));
}

TEST(RuleConsoleTest, NeedsARulesFile) {
    const ProgramRun help = Program(RULE_CONSOLE).arg("--help").run();
    EXPECT_EQ(0, help.status);
    EXPECT_EQ(0U, help.out.find("Usage: rule_console RULES"));
    EXPECT_EQ(2, Program(RULE_CONSOLE).run().status);
    const ProgramRun run = Program(RULE_CONSOLE).arg("/nowhere/rules").run();
    EXPECT_EQ(1, run.status);
    EXPECT_EQ("rule_console: /nowhere/rules: cannot be read\n", run.err);
}

TEST(OwnLogTest, LogsThroughItsOwnConfiguration) {
    const TempDir dir;
    const ProgramRun run = Program(OWN_LOG).arg(sampleConfig).arg(dir.path()).run();
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.out);
    EXPECT_EQ("INFO    : the logging configuration is " + sampleConfig +
                  "\n"
                  "ERROR   : cannot find " +
                  dir.path() +
                  "/missing: No such file or directory\n"
                  "INFO    : items are logged\n",
              run.err);

    const std::string all = readFile(dir.file("own.log.2")) + readFile(dir.file("own.log.1")) +
                            readFile(dir.file("own.log"));
    EXPECT_FALSE(std::filesystem::exists(dir.file("own.log.3")));
    EXPECT_NE(std::string::npos, all.find("\nWARN  OwnLog.Work - item 20 is round\n"
                                          "DEBUG OwnLog.Work - item 21\n"));
    EXPECT_NE(std::string::npos, all.find("ERROR OwnLog - cannot find " + dir.path()));
    const std::string last = "INFO  OwnLog - items are logged\n";
    EXPECT_EQ(last, all.substr(all.size() - last.size()));
}

TEST(OwnLogTest, DoesWhatTheReadmeShows) {
    const TempDir dir;
    std::string err =
        Program(OWN_LOG).arg("examples/own_log.cfg").arg(dir.path()).in(project).run().err;
    err.replace(err.find(dir.path()), dir.path().size(), "/tmp");
    EXPECT_TRUE(
        pageShows("README.md", "$ build/dev/examples/own_log examples/own_log.cfg /tmp\n" + err));
    EXPECT_TRUE(pageShows("README.md", "/tmp/own.log  /tmp/own.log.1  /tmp/own.log.2\n"));
}

TEST(OwnLogTest, ContinuesWithoutAConfigurationAndReportsIt) {
    const ProgramRun run = Program(OWN_LOG).arg("/nowhere/own_log.cfg").arg("/nowhere").run();
    EXPECT_EQ(1, run.status);
    EXPECT_EQ(
        "Couldn't open log file configuration \"/nowhere/own_log.cfg\": No such file or "
        "directory\n"
        "item 10 is round\n"
        "item 20 is round\n"
        "item 30 is round\n"
        "cannot find /nowhere/missing: No such file or directory\n",
        run.err);
    EXPECT_EQ(2, Program(OWN_LOG).run().status);
}

}  // namespace
