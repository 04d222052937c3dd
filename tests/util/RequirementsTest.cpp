#include "util/Requirements.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "support/RunProgram.h"
#include "support/TempDir.h"

namespace {

using testing::HasSubstr;

// Public headers, except Assert.h, which includes nothing and compiles with any options.
bool isChecked(const std::filesystem::path& file) {
    return file.extension() == ".h" && file.parent_path().filename() != "internal" &&
           file.filename() != "Assert.h";
}

// Preprocesses a source that only includes `header`.
ProgramRun preprocess(const std::string& header, const std::vector<std::string>& options) {
    Program compiler(COMPILER);
    compiler.arg("-E").arg("-I" SRC).arg("-I" SRC "/xmlwrapp-substitute");
    for (const std::string& option : options) {
        compiler.arg(option);
    }
    return compiler.arg("-include").arg(header).arg("-xc++").arg("/dev/null").run();
}

TEST(RequirementsTest, PublicHeadersRefuseAnOlderLanguageAndMissingExceptions) {
    std::size_t headers = 0;
    for (const char* const directory : {SRC "/util", SRC "/services"}) {
        for (const auto& entry : std::filesystem::recursive_directory_iterator(directory)) {
            if (!isChecked(entry.path())) {
                continue;
            }
            ++headers;
            SCOPED_TRACE(entry.path());
            const ProgramRun run = preprocess(entry.path(), {"-std=c++17", "-fno-exceptions"});
            EXPECT_NE(0, run.status);
            EXPECT_THAT(run.err, HasSubstr("needs C++20: compile with -std=c++20 or later"));
            EXPECT_THAT(run.err, HasSubstr("needs exceptions: compile without -fno-exceptions"));
        }
    }
    EXPECT_LT(10u, headers);
}

TEST(RequirementsTest, RefusesAnOlderLibrary) {
    const TempDir older;  // its <version> defines no feature
    writeFile(older.file("version"), "");
    const ProgramRun run = preprocess("util/Requirements.h", {"-std=c++20", "-I" + older.path()});
    EXPECT_NE(0, run.status);
    EXPECT_THAT(run.err, HasSubstr("needs a newer C++ library"));
}

TEST(RequirementsTest, TheLevelsRefuseAMacroOfTheSameName) {
    const ProgramRun run = preprocess("util/LogLevel.h", {"-std=c++20", "-DDEBUG"});
    EXPECT_NE(0, run.status);
    EXPECT_THAT(run.err, HasSubstr("compile without -DDEBUG"));
}

}  // namespace
