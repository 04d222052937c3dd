// The program log_watch: what it prints and logs, which lines it reads from files that change, and
// how it ends.

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <future>
#include <iterator>
#include <regex>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "examples/Page.h"
#include "support/NumberedLines.h"
#include "support/RunProgram.h"
#include "support/TempDir.h"

namespace {

// The last kilobytes of a file; nothing if there is no such file.
std::string endOf(const std::string& file) {
    std::ifstream in(file, std::ios::ate);
    if (!in) {
        return "";
    }
    in.seekg(std::max<std::streamoff>(in.tellg() - std::streamoff(4096), 0));
    return std::string(std::istreambuf_iterator<char>(in), {});
}

// Waits at most 20 seconds until the end of the file contains the text.
testing::AssertionResult waitFor(const std::string& file, const std::string& text) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    while (std::chrono::steady_clock::now() < deadline) {
        if (endOf(file).find(text) != std::string::npos) {
            return testing::AssertionSuccess();
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
    return testing::AssertionFailure() << file << " does not contain " << text;
}

void append(const std::string& file, const std::string& text) {
    std::ofstream(file, std::ios::app) << text;
}

class LogWatchTest : public testing::Test {
protected:
    LogWatchTest() {
        std::filesystem::create_directories(_dir.file("etc/myinstall"));
        std::filesystem::create_directories(_dir.file("var/log"));
        writeFile(_dir.file("etc/log-cmdline.cfg"), "rootCategory=WARN\n");
        rules("match: *match*\n");
    }

    void rules(const std::string& text) const { writeFile(_dir.file("rules"), text); }

    // Runs with these arguments after "--".
    Program watch(const std::vector<std::string>& arguments) const {
        // The shell lets the test know the process.
        Program program("/bin/sh");
        program.arg("-c").arg("echo $$ >pid; exec \"$0\" \"$@\"").arg(LOG_WATCH).arg("--");
        for (const std::string& argument : arguments) {
            program.arg(argument);
        }
        return program.in(_dir.path())
            .set("QUELTA_HOME", _dir.path())
            .set("QUELTA_DB", _dir.path());
    }

    // What the program prints after the line about the configuration.
    static std::string printed(const ProgramRun& run) {
        EXPECT_EQ(0, run.status) << run.err;
        EXPECT_EQ("", run.err);
        return run.out.substr(run.out.find('\n') + 1);
    }

    // Follows the file "log" in the background, with its standard output in the file "out".
    void start(std::vector<std::string> arguments) {
        arguments.insert(arguments.end(), {"rules", "log"});
        Program program = watch(arguments);
        writeFile(out(), "");
        program.outputTo(out());
        _running = std::async(std::launch::async, [program] { return program.run(); });
    }

    // Ends it by a signal.
    ProgramRun stop(int signal) {
        EXPECT_TRUE(waitFor(_dir.file("pid"), "\n"));
        EXPECT_EQ(0, ::kill(std::stoi(readFile(_dir.file("pid"))), signal));
        return _running.get();
    }

    void TearDown() override {
        if (_running.valid()) {
            stop(SIGKILL);
        }
    }

    std::string out() const { return _dir.file("out"); }
    std::string log() const { return _dir.file("log"); }
    std::string ownLog() const { return textOfGenerations(_dir.file("var/log/log_watch.log")); }

    TempDir _dir;
    std::future<ProgramRun> _running;
};

TEST_F(LogWatchTest, EachRuleFiresOnceWithoutAWindow) {
    rules("both: *left*, *right*\nwatching: meta::all\nleft: *left*\n");
    EXPECT_EQ(
        "+ watching: meta::all\n"
        "+ left: left 1\n"
        "+ both: right 1\n",
        printed(watch({"rules"}).input("left 1\nleft 2\nright 1\nright 2\nnone\nleft 3").run()));
    EXPECT_TRUE(std::regex_match(
        ownLog(), std::regex("[-0-9]{10} [:,0-9]{12} WARN  \\+ watching: meta::all\n"
                             "[-0-9]{10} [:,0-9]{12} WARN  \\+ left: left 1\n"
                             "[-0-9]{10} [:,0-9]{12} WARN  \\+ both: right 1\n"
                             "[-0-9]{10} [:,0-9]{12} INFO  in total 6 lines, 5 matches, "
                             "[0-9]+ ns a line\n")))
        << ownLog();
}

TEST_F(LogWatchTest, ARuleStopsFiringWhenNoLineOfTheWindowMeetsIt) {
    rules("both: a*, *b\nb: *b\n");
    const struct {
        const char* window;
        const char* lines;
        const char* changes;
    } table[] = {
        {"1", "a a ab ab c", "+b:ab +both:ab -b -both +b:ab +both:ab -b -both"},
        {"2", "a b c c", "+b:b +both:b -both -b"},
        // The second b keeps the condition *b set when the first one leaves.
        {"2", "b b a c c", "+b:b +both:a -b -both"},
        {"3", "a b a c c b", "+b:b +both:b -b -both +b:b"},
        {"0", "b c c c", "+b:b"},
    };
    for (const auto& row : table) {
        std::string lines(row.lines);
        std::string changes;
        std::replace(lines.begin(), lines.end(), ' ', '\n');
        for (const char c : printed(watch({"-w", row.window, "rules"}).input(lines).run())) {
            changes += c == '\n' ? " " : c == ' ' ? "" : std::string(1, c);
        }
        EXPECT_EQ(row.changes + std::string(" "), changes) << row.window << ": " << row.lines;
        std::filesystem::remove(_dir.file("var/log/log_watch.log"));
    }
}

TEST_F(LogWatchTest, LeavesOutFields) {
    rules("server: sshd*\n");
    EXPECT_EQ(
        "+ server: Nov  2 10:00:00 web sshd[1]: x\n"
        "- server\n",
        printed(watch({"-f", "4", "-w", "1", "rules"})
                    .input("Nov  2 10:00:00 web sshd[1]: x\nsshd 2 3 4\nshort\n\n")
                    .run()));
}

// A line of a system log; one in ten is a failed login.
std::string logLine(unsigned number) {
    static const char* const messages[] = {
        "CRON[811]: (root) CMD (test -x /usr/sbin/anacron)",
        "systemd[1]: Started Daily apt download activities.",
        "sshd[4711]: Accepted publickey for deploy from 10.0.0.7 port 50522 ssh2",
        "sshd[4711]: Failed password for root from 10.0.0.9 port 50524 ssh2",
        "kernel: eth0: Link is Up - 1Gbps/Full - flow control rx/tx",
        "postfix/smtpd[902]: connect from unknown[10.0.0.12]",
        "dhclient[500]: DHCPACK of 10.0.0.5 from 10.0.0.1",
        "systemd[1]: Finished Rotate log files.",
        "named[77]: client 10.0.0.3#5353: query: example.test IN A",
        "sudo: deploy : TTY=pts/0 ; PWD=/srv ; USER=root ; COMMAND=/bin/ls",
    };
    return "Nov 22 03:14:15 web1 " + std::string(messages[number % 10]) + " [" +
           std::to_string(number) + "]\n";
}

// The numbers of the failed logins in an output or a log, in order.
std::vector<unsigned> alerts(const std::string& text) {
    std::vector<unsigned> numbers;
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        if (line.find("+ failed login: ") != std::string::npos) {
            numbers.push_back(static_cast<unsigned>(std::stoul(line.substr(line.rfind('[') + 1))));
        }
    }
    return numbers;
}

TEST_F(LogWatchTest, NothingIsLostOrDoubledWhileTheFileIsRotated) {
    constexpr unsigned LINES = 100000;
    constexpr unsigned FILE_LINES = 5000;
    writeFile(_dir.file("etc/log-cmdline.cfg"),
              "category.LogWatch=INFO,log_watch\n"
              "appender.log_watch.fileName=${QUELTA_HOME}/var/log/log_watch.log\n"
              "appender.log_watch.maxFileSize=200000\n"
              "appender.log_watch.maxBackupIndex=20\n");
    rules("failed login: *sshd*Failed password for *\n");
    writeFile(log(), "");
    start({"-w", "1"});
    std::vector<unsigned> expected;
    std::ofstream file(log(), std::ios::app);
    for (unsigned number = 0; number < LINES; ++number) {
        if (number % FILE_LINES == 0 && number != 0) {
            file.flush();
            // The program has opened the file when it reports the last line but six of it.
            ASSERT_TRUE(waitFor(out(), '[' + std::to_string(number - 7) + "]\n"));
            std::filesystem::rename(log(), log() + '.' + std::to_string(number));
            // Until something is in the new file, lines may be added to the old one.
            writeFile(log(), "");
            if (number == FILE_LINES) {
                std::this_thread::sleep_for(std::chrono::milliseconds(300));
            }
            file << "sshd: Failed password for late [" << number << "]\n";
            expected.push_back(number);
            file.close();
            file.open(log(), std::ios::app);
        }
        const std::string line = logLine(number);
        // Many writes end within a line.
        file << line.substr(0, number % line.size());
        if (number % 7 == 0) {
            file.flush();
        }
        file << line.substr(number % line.size());
        if (number % 10 == 3) {
            expected.push_back(number);
        }
    }
    file.close();
    EXPECT_TRUE(waitFor(out(), '[' + std::to_string(LINES - 7) + "]\n"));
    const ProgramRun run = stop(SIGTERM);
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
    EXPECT_EQ(expected, alerts(readFile(out())));
    EXPECT_EQ(expected, alerts(ownLog()));
    EXPECT_LT(5U, generationsOf(_dir.file("var/log/log_watch.log")).size());
    EXPECT_NE(std::string::npos, ownLog().find("in total 100019 lines, 10019 matches, "));
}

TEST_F(LogWatchTest, FollowsAFileThatIsCreatedLaterAndTruncated) {
    start({"-w", "1"});
    const std::string missing = "cannot read log: No such file or directory";
    EXPECT_TRUE(waitFor(_dir.file("var/log/log_watch.log"), missing));
    append(log(), "match 1\nmat");
    EXPECT_TRUE(waitFor(out(), "+ match: match 1\n"));
    append(log(), "ch 2\nmatch 3");
    EXPECT_TRUE(waitFor(out(), "+ match: match 2\n"));
    writeFile(log(), "match 4\n");
    EXPECT_TRUE(waitFor(out(), "+ match: match 4\n"));
    const ProgramRun run = stop(SIGINT);
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("log_watch: " + missing + '\n', run.err);
    // The line that was cut short counts.
    EXPECT_EQ(
        "+ match: match 1\n- match\n+ match: match 2\n- match\n"
        "+ match: match 3\n- match\n+ match: match 4\n",
        readFile(out()).substr(readFile(out()).find('\n') + 1));
}

TEST_F(LogWatchTest, LogsFiguresWhileLinesArrive) {
    writeFile(log(), "match 1\nnone\n");
    start({"-s", "1"});
    EXPECT_TRUE(waitFor(_dir.file("var/log/log_watch.log"), "INFO  2 lines, 1 matches, "));
    EXPECT_EQ(0, stop(SIGTERM).status);
    EXPECT_NE(std::string::npos, ownLog().find("in total 2 lines, 1 matches, "));
}

TEST_F(LogWatchTest, ReportsBadArguments) {
    const std::vector<std::vector<std::string>> bad = {{},
                                                       {"-w", "rules"},
                                                       {"-w", "-1", "rules"},
                                                       {"-s", "0", "rules"},
                                                       {"-x", "rules"},
                                                       {"-f", "1x", "rules"},
                                                       {"-w", "1"}};
    for (const auto& arguments : bad) {
        const ProgramRun run = watch(arguments).run();
        EXPECT_EQ(2, run.status) << testing::PrintToString(arguments);
        EXPECT_NE(std::string::npos, run.err.find("Usage: log_watch [OPTION...] -- [-w LINES] "));
    }
    const ProgramRun run = watch({"rules"}).set("QUELTA_DB", "").run();
    EXPECT_EQ(2, run.status);
    EXPECT_EQ("log_watch: The environment variable QUELTA_DB must not be empty.\n", run.err);
}

TEST_F(LogWatchTest, ReportsRulesThatItCannotRead) {
    rules("fine: a\nbad\n");
    const ProgramRun run = watch({"rules"}).run();
    EXPECT_EQ(1, run.status);
    EXPECT_EQ("log_watch: rules:2: expected \"implication: condition, ...\"\n", run.err);
    EXPECT_EQ("log_watch: nowhere: cannot be read\n", watch({"nowhere"}).run().err);
}

TEST_F(LogWatchTest, EndsWhenItsOutputCannotBeWritten) {
    const ProgramRun run = watch({"rules"}).input("match\n").outputTo("/dev/full").run();
    EXPECT_EQ(1, run.status);
    EXPECT_EQ("log_watch: cannot write standard output\n", run.err);
}

TEST_F(LogWatchTest, DoesWhatTheTutorialShows) {
    const std::string page = "docs/log-watch.md";
    rules(shownAfter(page, "cat rules"));
    const ProgramRun run =
        watch({"-f", "4", "-w", "3", "rules"}).input(shownAfter(page, "cat sample.log")).run();
    EXPECT_EQ("", run.err);
    std::string out = run.out;
    out.replace(out.find(_dir.path()), _dir.path().size(), "/home/me/quelta-home");
    EXPECT_EQ(shownAfter(page, "log_watch -- -f 4 -w 3 rules <sample.log"), out);
}

}  // namespace
