#include "StartLogging.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <vector>

#include "Check.h"
#include "support/SlowConfig.h"
#include "support/TempDir.h"
#include "util/LogAppender.h"
#include "util/LogChannel.h"
#include "util/Logger.h"
#include "util/Pathname.h"
#include "util/internal/LogGlobals.h"

namespace {

using fuzz::checkEqual;

bool staysInside(const SlowConfig& slow, const std::string& directory) {
    return std::all_of(slow.appenders.begin(), slow.appenders.end(), [&](const auto& entry) {
        const std::string& name = entry.second.fileName;
        return name.empty() ||
               (name.starts_with(directory + '/') && name.find("..") == std::string::npos);
    });
}

std::string channelName(const std::string& setting) {
    std::string name = setting.substr(0, setting.find('='));
    name.erase(name.find_last_not_of(" \t") + 1);
    return name;
}

void checkChannel(const SlowChannel& expected, const SlowChannel& inherited,
                  const LogChannel& channel) {
    std::vector<const void*> pointers;
    for (const std::string& name :
         expected.appenders.empty() ? inherited.appenders : expected.appenders) {
        pointers.push_back(LogAppender::find(name, false));
    }
    checkEqual("level of a channel", expected.level, static_cast<int>(channel.minlevel));
    checkEqual("appenders of a channel", pointers,
               std::vector<const void*>(channel._appenders.begin(), channel._appenders.end()));
}

// The expected reports on standard error after the file has been read.
std::string reports(const SlowConfig& slow, const std::string& cfg) {
    std::string all;
    const auto parseError = [&](const SlowConfig::Line& line) {
        all += cfg + ':' + std::to_string(line.number) + ": Parse error at \"" +
               line.text.substr(0, line.text.find('\0')) + "\"\n";
    };
    if (slow.openComment != 0) {
        all +=
            cfg + ':' + std::to_string(slow.openComment) + ": Unterminated XML comment started\n";
    }
    for (const SlowConfig::Line& line : slow.errors) {
        parseError(line);
    }
    if (slow.root.number != 0 && !readChannelSlowly(slow, slow.root.text, INFO).accepted) {
        parseError(slow.root);
    }
    for (const SlowConfig::Line& line : slow.categories) {
        const std::size_t equals = line.text.find('=');
        if (equals == std::string::npos ||
            !readChannelSlowly(slow, line.text.substr(equals + 1), INFO).accepted) {
            parseError(line);
        }
    }
    return all;
}

// Whether standard error receives the reports as bare lines.
bool reportsArePlain(const SlowConfig& slow, const SlowChannel& root) {
    return root.level <= WARN && root.appenders.empty() &&
           slow.appenders.count("rootAppender") == 0 &&
           std::none_of(slow.categories.begin(), slow.categories.end(),
                        [](const auto& line) { return channelName(line.text) == "Logger"; });
}

[[noreturn]] void child(const SlowConfig& slow, const std::string& directory,
                        const std::string& cfg) {
    const int usual = ::dup(STDERR_FILENO);
    const int err = ::open((directory + "/stderr").c_str(), O_RDWR | O_CREAT | O_APPEND, 0600);
    ::dup2(err, STDERR_FILENO);
    const bool complete = Logger::initialize(Pathname(cfg), Pathname(directory));
    ::dup2(usual, STDERR_FILENO);

    checkEqual("initialize", slow.openComment == 0, complete);
    const SlowChannel root = readChannelSlowly(slow, slow.root.text, INFO);
    checkChannel(root, root, rootChannel());
    for (const SlowConfig::Line& line : slow.categories) {
        const std::string name = channelName(line.text);
        const auto sameName = [&](const SlowConfig::Line& other) {
            return channelName(other.text) == name;
        };
        const std::size_t equals = line.text.find('=');
        const bool once =
            std::count_if(slow.categories.begin(), slow.categories.end(), sameName) == 1;
        if (equals != std::string::npos && once) {
            checkChannel(readChannelSlowly(slow, line.text.substr(equals + 1), root.level), root,
                         *LogChannel::find(name, false));
        }
    }
    if (reportsArePlain(slow, root)) {
        const std::string expected = reports(slow, cfg);
        const std::string actual = readFile(directory + "/stderr");
        const std::size_t tail = actual.size() - std::min(actual.size(), expected.size());
        checkEqual("reports", expected, actual.substr(tail));
    }
    std::fflush(nullptr);
    std::_Exit(0);
}

}  // namespace

namespace fuzz {

void startLogging(const std::string& contents) {
    const TempDir directory;
    const SlowConfig slow = readConfigSlowly(contents, directory.path());
    if (!staysInside(slow, directory.path())) {
        return;
    }
    const std::string cfg = directory.file("log.cfg");
    writeFile(cfg, contents);
    std::fflush(nullptr);
    const pid_t pid = ::fork();
    if (pid == 0) {
        child(slow, directory.path(), cfg);
    }
    int status = -1;
    checkEqual("waitpid", pid, ::waitpid(pid, &status, 0));
    checkEqual("status of starting to log", 0, status);
}

}  // namespace fuzz
