#ifndef QUELTA_TESTS_SUPPORT_RUNPROGRAM_H_
#define QUELTA_TESTS_SUPPORT_RUNPROGRAM_H_

// Runs a built program in an environment that the test chooses, and returns its exit status and
// both outputs.
//
//     Program program(path);
//     program.set("QUELTA_HOME", dir.path()).input("a term\n");
//     const ProgramRun run = program.run();
//     EXPECT_EQ(0, run.status);
//
// The environment is empty except for PATH, the variables of sanitizers and coverage, and what the
// test sets.
// Not thread-safe; one thread at a time per object.

#include <sys/types.h>

#include <map>
#include <string>
#include <vector>

struct ProgramRun {
    int status = -1;  // exit status; 128 plus the number of the signal that ended it, as in a shell
    std::string out;
    std::string err;
};

class Program {
public:
    explicit Program(std::string path);

    Program& arg(const std::string& word);
    Program& set(const std::string& name, const std::string& value);
    Program& input(const std::string& text);

    // Sets its working directory; the default is that of this process.
    Program& in(const std::string& directory);
    // Writes standard output to this file, or closes it, instead of collecting it.
    Program& outputTo(const std::string& path);
    Program& closeOutput();

    // Limits its address space to a number of bytes; 0: no limit.
    Program& memoryLimit(unsigned long bytes);
    // Drops root privileges, if it has them. The program file is opened first, so the unprivileged
    // user needs no access to it.
    Program& withoutRights();

    // Returns: the result of the run. The test fails if the program could not be started.
    ProgramRun run() const;

private:
    [[noreturn]] void becomeProgram(int programFd, const std::string& files) const;
    bool redirect(const std::string& files) const;

    std::string _path;
    std::vector<std::string> _args;
    std::map<std::string, std::string> _environment;
    std::string _input;
    std::string _directory;
    std::string _output;
    bool _outputClosed = false;
    bool _withoutRights = false;
    unsigned long _memoryLimit = 0;
};

#endif  // QUELTA_TESTS_SUPPORT_RUNPROGRAM_H_
