#ifndef QUELTA_TESTS_SUPPORT_RUNPROGRAM_H_
#define QUELTA_TESTS_SUPPORT_RUNPROGRAM_H_

// Runs a built program as its user would, with everything around it chosen by the test, and gives
// back all that it left: how it ended, and both its outputs whole.
//
//     Program program(path);
//     program.set("QUELTA_HOME", dir.path()).input("a term\n");
//     const ProgramRun run = program.run();
//     EXPECT_EQ(0, run.status);
//
// The environment is empty but for PATH, what sanitizers and coverage read, and what the test sets.
// Not thread-safe; one thread at a time per object.

#include <sys/types.h>

#include <map>
#include <string>
#include <vector>

struct ProgramRun {
    int status = -1;  // exit status; 128 and the number of the signal that ended it, as in a shell
    std::string out;
    std::string err;
};

class Program {
public:
    explicit Program(std::string path);

    Program& arg(const std::string& word);
    Program& set(const std::string& name, const std::string& value);
    Program& input(const std::string& text);

    // The folder it runs in; this process's own unless set.
    Program& in(const std::string& folder);
    // Instead of being collected, standard output goes to this file, or is closed from the start.
    Program& outputTo(const std::string& path);
    Program& closeOutput();

    // The most bytes of address space that it may use; 0 for no limit.
    Program& memoryLimit(unsigned long bytes);
    // Gives up root's rights, if there are any. The program is opened before, so it may lie where
    // that user cannot go.
    Program& withoutRights();

    // Returns: what became of it; a failure of the test when it could not be started.
    ProgramRun run() const;

private:
    [[noreturn]] void becomeProgram(int programFd, const std::string& files) const;
    bool redirect(const std::string& files) const;

    std::string _path;
    std::vector<std::string> _args;
    std::map<std::string, std::string> _environment;
    std::string _input;
    std::string _folder;
    std::string _output;
    bool _outputClosed = false;
    bool _withoutRights = false;
    unsigned long _memoryLimit = 0;
};

#endif  // QUELTA_TESTS_SUPPORT_RUNPROGRAM_H_
