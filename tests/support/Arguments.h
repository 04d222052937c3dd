#ifndef QUELTA_TESTS_SUPPORT_ARGUMENTS_H_
#define QUELTA_TESTS_SUPPORT_ARGUMENTS_H_

#include <string>
#include <utility>
#include <vector>

// The command line of a program called "program". Not copyable, because popt keeps a pointer to it.
class Arguments {
public:
    explicit Arguments(std::vector<std::string> words = {}) : _words(std::move(words)) {
        _argv.push_back("program");
        for (const std::string& word : _words) {
            _argv.push_back(word.c_str());
        }
        _argv.push_back(nullptr);
    }
    Arguments(const Arguments&) = delete;
    Arguments& operator=(const Arguments&) = delete;

    int argc() const { return static_cast<int>(_argv.size()) - 1; }
    const char* const* argv() const { return _argv.data(); }

private:
    std::vector<std::string> _words;
    std::vector<const char*> _argv;
};

#endif  // QUELTA_TESTS_SUPPORT_ARGUMENTS_H_
