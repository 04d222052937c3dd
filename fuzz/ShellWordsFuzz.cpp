// Shell words: splits the input as a line; quotes it as a path and splits the result again.

#include <string>

#include "Check.h"
#include "FuzzInput.h"
#include "FuzzTarget.h"
#include "support/PathOracles.h"
#include "util/Pathname.h"

namespace {

using fuzz::checkEqual;

// Splits the line word by word, and compares each step with the slow version.
void checkSplit(std::string line) {
    for (bool found = true; found;) {
        std::string slowWord;
        std::string slowRest = line;
        Pathname word("before");
        std::string rest = line;
        const bool slowFound = path_oracle::splitArg(line, slowWord, slowRest);
        found = Pathname::splitArgShellQuoted(line, word, rest);
        checkEqual("whether there is a word", slowFound, found);
        checkEqual("word", slowWord, word);
        checkEqual("rest", slowRest, rest);
        line = rest;
    }
}

void checkRoundTrip(const std::string& text) {
    const std::string quoted = Pathname(text).shellQuoted();
    checkEqual("shellQuoted", path_oracle::shellQuoted(text), quoted);
    Pathname word;
    std::string rest = "before";
    const bool found = Pathname::splitArgShellQuoted(quoted + " next", word, rest);
    checkEqual("whether the quoted path is a word", !text.empty(), found);
    checkEqual("path after quoting and splitting", text, word);
    checkEqual("rest after the quoted path", text.empty() ? "before" : " next", rest);
}

}  // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text = fuzz::FuzzInput(data, size).rest();
    checkSplit(text);
    checkRoundTrip(text);
    return 0;
}
