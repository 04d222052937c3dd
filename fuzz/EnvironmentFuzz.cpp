// Values of the environment. Lines: QUELTA_HOME, QUELTA_DB (a leading '!' leaves the variable
// unset), the value of "1b". The rest is a text with variables to substitute.

#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <map>
#include <memory>
#include <string>

#include "Check.h"
#include "FuzzInput.h"
#include "FuzzTarget.h"
#include "support/PathOracles.h"
#include "util/DCUtils.h"
#include "util/LoaderInfo.h"

namespace {

using fuzz::checkEqual;

// The variables that this target sets. setenv would leak each previous value.
std::map<std::string, std::string>& entries() {
    static std::map<std::string, std::string> map;
    return map;
}

void setVariable(const std::string& name, const std::string& value) {
    ::unsetenv(name.c_str());
    std::string& entry = entries()[name];
    entry = name + '=' + value;
    ::putenv(entry.data());
}

// The value of a variable, searched one entry at a time; null if it is not set.
const char* lookedUp(const std::string& name) {
    for (char** entry = environ; *entry != nullptr; ++entry) {
        if (std::strncmp(*entry, (name + '=').c_str(), name.size() + 1) == 0) {
            return *entry + name.size() + 1;
        }
    }
    return nullptr;
}

std::string substituteSlowly(const std::string& text) {
    const std::string nameCharacters =
        "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789_";
    std::string result;
    for (std::size_t at = 0; at < text.size();) {
        if (text[at] != '$') {
            result += text[at++];
            continue;
        }
        std::string name;
        for (++at; at < text.size() && nameCharacters.find(text[at]) != std::string::npos; ++at) {
            name += text[at];
        }
        if (const char* const value = lookedUp(name)) {
            result += value;
        }
    }
    return result;
}

unsigned writtenBack = 0;

// Sets or unsets a variable. Returns: the resulting path.
std::string given(const char* name, const std::string& value) {
    if (value.substr(0, 1) == "!") {
        ::unsetenv(name);
        return "as it was";
    }
    setVariable(name, value);
    return path_oracle::withoutTrailingSeps(path_oracle::removeDoubleSeps(value));
}

void checkVariable(const char* name, const std::string& value, const std::string& cleaned) {
    const char* const now = std::getenv(name);
    if (value.substr(0, 1) == "!") {
        checkEqual("an unset variable", true, now == nullptr);
    } else {
        checkEqual(name, cleaned, std::string(now));
    }
}

void checkPaths(const std::string& home, const std::string& db) {
    const std::string cleanHome = given("QUELTA_HOME", home);
    const std::string cleanDb = given("QUELTA_DB", db);
    const unsigned expected = (cleanHome != home && home.substr(0, 1) != "!" ? 1U : 0U) +
                              (cleanDb != db && db.substr(0, 1) != "!" ? 1U : 0U);
    LoaderInfo info;
    info._queltaHome = "as it was";
    info._queltaDb = "as it was";
    writtenBack = 0;
    info.populateFromEnvironment();
    checkEqual("variables written back", expected, writtenBack);
    checkEqual("getQueltaHome", cleanHome, info.getQueltaHome());
    checkEqual("getQueltaDb", cleanDb, info.getQueltaDb());
    checkVariable("QUELTA_HOME", home, cleanHome);
    checkVariable("QUELTA_DB", db, cleanDb);
}

}  // namespace

extern "C" int __wrap_setenv(const char* name, const char* value, int overwrite);
extern "C" int __wrap_setenv(const char* name, const char* value, int overwrite) {
    fuzz::check("overwrite", overwrite != 0);
    ++writtenBack;
    setVariable(name, value);
    return 0;
}

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::FuzzInput input(data, size);
    const std::string home = input.lineOfText();
    const std::string db = input.lineOfText();
    setVariable("1b", input.lineOfText());
    const std::string text = input.restOfText();

    checkPaths(home, db);
    const std::unique_ptr<char[]> substituted(substituteEnvs(text.c_str()));
    checkEqual("substituteEnvs", substituteSlowly(text), std::string(substituted.get()));
    return 0;
}
