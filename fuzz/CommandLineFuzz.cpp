// Command lines, one word per line, against a model of how popt reads the option table. Words that
// request help are left out, because popt then prints it and ends the process.

#include <climits>
#include <cstdio>
#include <cstdlib>
#include <optional>
#include <string>
#include <vector>

#include "Check.h"
#include "FuzzInput.h"
#include "FuzzTarget.h"
#include "util/LoaderInfo.h"

// popt leaks the first value if an option is given twice.
extern "C" const char* __lsan_default_suppressions();
extern "C" const char* __lsan_default_suppressions() {
    return "leak:poptGetNextOpt\n";
}

namespace {

using fuzz::checkEqual;
using Words = std::vector<std::string>;

bool requestsHelp(const std::string& word) {
    return word.starts_with("-?") || word.starts_with("--help") || word.starts_with("--usage");
}

// The record that results from the words.
class Model {
public:
    explicit Model(const Words& words) {
        for (_next = 0; _next < words.size();) {
            read(words, words[_next++]);
        }
    }

    void check(const LoaderInfo& info) const {
        checkEqual("getDebug", _noseg, info.getDebug());
        checkEqual("getDaemon", !_nodaemon, info.getDaemon());
        checkEqual("getUseDebugLog", _debug, info.getUseDebugLog());
        checkEqual("getCommonConfigPath", "/home/" + _c.value_or("etc"),
                   std::string(info.getQueltaHome() + '/' + info._commonConfigPath));
        checkEqual("getHost", _h.value_or(""), info.getHost());
        checkEqual("getInstallName", _i.value_or("myinstall"), info.getInstallName());
        checkEqual("getComponentName", _n.value_or("queltad"), info.getComponentName());
        checkEqual("getStartupMode", _mode.value_or(""), info.getStartupMode());
        checkEqual("getPort", _port == 0 ? 8089 : _port, info.getPort());
    }
    const std::string& messages() const { return _messages; }

private:
    void read(const Words& words, const std::string& word) {
        if (_allArguments || word.empty() || word[0] != '-' || word == "-") {
            return;
        }
        if (word == "--") {
            _allArguments = true;
        } else if (word[1] == '-') {
            readLong(words, word);
        } else {
            readShort(words, word);
        }
    }

    void readLong(const Words& words, const std::string& word) {
        const std::size_t equals = word.find('=');
        const std::string name = word.substr(2, equals == std::string::npos ? equals : equals - 2);
        if (name == "mode") {
            std::optional<std::string> joined;
            if (equals != std::string::npos) {
                joined = word.substr(equals + 1);
            }
            take(words, joined, _mode);
            return;
        }
        bool* const flag = name == "noseg"      ? &_noseg
                           : name == "nodaemon" ? &_nodaemon
                           : name == "debug"    ? &_debug
                                                : nullptr;
        if (flag == nullptr) {
            _messages += "Bad Option " + word + '\n';
        } else if (equals == std::string::npos) {
            *flag = true;  // with a value it is an error, which is ignored
        }
    }

    void readShort(const Words& words, const std::string& word) {
        std::optional<std::string> joined;
        if (word.size() > 2) {
            joined = word.substr(word[2] == '=' ? 3 : 2);
        }
        switch (word[1]) {
            case 'c':
                return take(words, joined, _c);
            case 'h':
                return take(words, joined, _h);
            case 'i':
                return take(words, joined, _i);
            case 'n':
                return take(words, joined, _n);
            case 'p':
                return takePort(words, joined);
            default:
                _messages += "Bad Option " + word + '\n';
        }
    }

    // The value of an option follows in the same word or is the next word, even if it is an option.
    void take(const Words& words, const std::optional<std::string>& joined,
              std::optional<std::string>& value) {
        if (joined) {
            value = joined;
        } else if (_next < words.size()) {
            value = words[_next++];
        }
    }

    void takePort(const Words& words, const std::optional<std::string>& joined) {
        std::optional<std::string> text;
        take(words, joined, text);
        if (!text) {
            return;
        }
        char* end = nullptr;
        const long long number = std::strtoll(text->c_str(), &end, 0);
        if (*end == '\0' && number >= INT_MIN && number <= INT_MAX) {
            _port = static_cast<int>(number);
        }
    }

    std::size_t _next = 0;
    bool _allArguments = false;
    bool _noseg = false, _nodaemon = false, _debug = false;
    std::optional<std::string> _c, _h, _i, _n, _mode;
    int _port = 0;
    std::string _messages;
};

// Parses the words. Returns: what was written to standard error.
std::string parsed(LoaderInfo& info, const Words& words) {
    std::vector<const char*> argv = {"program"};
    for (const std::string& word : words) {
        argv.push_back(word.c_str());
    }
    argv.push_back(nullptr);

    std::FILE* const usual = stderr;
    char* text = nullptr;
    std::size_t length = 0;
    stderr = ::open_memstream(&text, &length);
    info.init(static_cast<int>(argv.size()) - 1, argv.data());
    info.populateFromCommandLine();
    std::fclose(stderr);
    stderr = usual;
    const std::string messages(text, length);
    std::free(text);
    return messages;
}

// Frees the memory that a record never frees.
void release(LoaderInfo& info) {
    ::poptFreeContext(info._poptContext);
    for (char* const value : {info._poptCommonConfigPath, info._poptHost, info._poptInstallName,
                              info._poptComponentName, info._poptStartupMode}) {
        std::free(value);
    }
}

}  // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::FuzzInput input(data, size);
    Words words;
    while (!input.atEnd()) {
        const std::string word = input.lineOfText();
        // popt reads this value as "the next argument that is not an option".
        if (!requestsHelp(word) && word.find("!#:+") == std::string::npos) {
            words.push_back(word);
        }
    }
    ::unsetenv("POSIXLY_CORRECT");
    const Model expected(words);
    LoaderInfo info;
    info._queltaHome = "/home";
    const std::string messages = parsed(info, words);
    expected.check(info);
    checkEqual("messages", expected.messages(), messages);
    checkEqual("isError", !expected.messages().empty(), info.isError());
    release(info);
    return 0;
}
