#include "support/RunProgram.h"

#include <fcntl.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <utility>

#include "support/TempDir.h"

namespace {

constexpr uid_t NOBODY = 65534;

// The exit status of a child that could not execute the program.
constexpr int NOT_STARTED = 126;

bool limit(int resource, rlim_t value) {
    const struct rlimit both = {value, value};
    return ::setrlimit(static_cast<__rlimit_resource>(resource), &both) == 0;
}

bool giveUpRights() {
    return ::geteuid() != 0 ||
           (::setgroups(0, nullptr) == 0 && ::setgid(NOBODY) == 0 && ::setuid(NOBODY) == 0);
}

bool becomeFile(int fd, const std::string& path, int flags) {
    const int opened = ::open(path.c_str(), flags, 0666);
    return opened >= 0 && ::dup2(opened, fd) == fd && (opened == fd || ::close(opened) == 0);
}

}  // namespace

Program::Program(std::string path) : _path(std::move(path)) {
    for (const char* name : {"PATH", "ASAN_OPTIONS", "UBSAN_OPTIONS", "TSAN_OPTIONS",
                             "LSAN_OPTIONS", "LLVM_PROFILE_FILE", "GCOV_PREFIX"}) {
        if (const char* value = std::getenv(name)) {
            set(name, value);
        }
    }
}

Program& Program::arg(const std::string& word) {
    _args.push_back(word);
    return *this;
}

Program& Program::set(const std::string& name, const std::string& value) {
    _environment[name] = value;
    return *this;
}

Program& Program::input(const std::string& text) {
    _input = text;
    return *this;
}

Program& Program::in(const std::string& directory) {
    _directory = directory;
    return *this;
}

Program& Program::outputTo(const std::string& path) {
    _output = path;
    return *this;
}

Program& Program::closeOutput() {
    _outputClosed = true;
    return *this;
}

Program& Program::memoryLimit(unsigned long bytes) {
    _memoryLimit = bytes;
    return *this;
}

Program& Program::withoutRights() {
    _withoutRights = true;
    return *this;
}

ProgramRun Program::run() const {
    const TempDir files;
    writeFile(files.file("in"), _input);
    writeFile(files.file("out"), "");
    writeFile(files.file("err"), "");
    const int programFd = ::open(_path.c_str(), O_RDONLY | O_CLOEXEC);
    EXPECT_LE(0, programFd) << _path;

    const pid_t child = ::fork();
    if (child == 0) {
        becomeProgram(programFd, files.path());
    }
    int status = -1;
    EXPECT_EQ(child, ::waitpid(child, &status, 0));
    ::close(programFd);

    ProgramRun result;
    result.status = WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    result.out = readFile(files.file("out"));
    result.err = readFile(files.file("err"));
    EXPECT_FALSE(result.status == NOT_STARTED && result.err.empty()) << "not started: " << _path;
    return result;
}

bool Program::redirect(const std::string& files) const {
    const std::string out = _output.empty() ? files + "/out" : _output;
    const bool redirected = becomeFile(STDIN_FILENO, files + "/in", O_RDONLY) &&
                            becomeFile(STDOUT_FILENO, out, O_WRONLY | O_APPEND) &&
                            becomeFile(STDERR_FILENO, files + "/err", O_WRONLY | O_APPEND);
    return redirected && (!_outputClosed || ::close(STDOUT_FILENO) == 0);
}

void Program::becomeProgram(int programFd, const std::string& files) const {
    std::vector<std::string> settings;
    for (const auto& [name, value] : _environment) {
        settings.push_back(name + '=' + value);
    }
    std::vector<char*> argv{const_cast<char*>(_path.c_str())};
    for (const std::string& word : _args) {
        argv.push_back(const_cast<char*>(word.c_str()));
    }
    argv.push_back(nullptr);
    std::vector<char*> envp;
    for (const std::string& setting : settings) {
        envp.push_back(const_cast<char*>(setting.c_str()));
    }
    envp.push_back(nullptr);

    const bool ready = (_directory.empty() || ::chdir(_directory.c_str()) == 0) &&
                       redirect(files) && limit(RLIMIT_CORE, 0) &&
                       (_memoryLimit == 0 || limit(RLIMIT_AS, _memoryLimit)) &&
                       (!_withoutRights || giveUpRights());
    if (ready) {
        ::fexecve(programFd, argv.data(), envp.data());
    }
    ::_exit(NOT_STARTED);
}
