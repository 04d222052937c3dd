#ifndef QUELTA_TESTS_EXAMPLES_PAGE_H_
#define QUELTA_TESTS_EXAMPLES_PAGE_H_

// Compares what a program does with what a document shows.
//
//     EXPECT_TRUE(pageShows("README.md", "$ ls /tmp/own.log*\n"));
//     EXPECT_EQ("/tmp/own.log\n", shownAfter("README.md", "ls /tmp/own.log*"));
// Safe from any thread.

#include <gtest/gtest.h>

#include <sstream>
#include <string>

#include "support/TempDir.h"

// Whether the page contains this text, indented by four spaces.
inline testing::AssertionResult pageShows(const std::string& page, const std::string& text) {
    std::string indented;
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line);) {
        indented += (line.empty() ? "" : "    ") + line + '\n';
    }
    if (readFile(std::string(PROJECT) + '/' + page).find(indented) == std::string::npos) {
        return testing::AssertionFailure() << page << " does not show\n" << indented;
    }
    return testing::AssertionSuccess();
}

// The lines that a page shows after a command.
inline std::string shownAfter(const std::string& page, const std::string& command) {
    const std::string prefix = "    ";
    std::istringstream lines(readFile(std::string(PROJECT) + '/' + page));
    std::string line;
    while (std::getline(lines, line) && line != prefix + "$ " + command) {}
    std::string shown;
    while (std::getline(lines, line) && line.starts_with(prefix) && !line.starts_with("    $ ")) {
        shown += line.substr(prefix.size()) + '\n';
    }
    return shown;
}

#endif  // QUELTA_TESTS_EXAMPLES_PAGE_H_
