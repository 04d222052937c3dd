#ifndef QUELTA_TESTS_SUPPORT_NUMBEREDLINES_H_
#define QUELTA_TESTS_SUPPORT_NUMBEREDLINES_H_

// Numbered lines, to detect torn, lost and duplicated ones, and the generations of the log file
// that should contain them. `scaled` sets their number for longer runs.

#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "support/TempDir.h"

// The number in an environment variable, or the default.
inline unsigned scaled(const char* variable, unsigned usual) {
    const char* const value = std::getenv(variable);
    return value != nullptr ? static_cast<unsigned>(std::strtoul(value, nullptr, 10)) : usual;
}

// Text computed from its numbers, without a newline; at most about 110 characters.
inline std::string numberedLine(unsigned series, unsigned number) {
    return std::to_string(series) + " " + std::to_string(number) + " " +
           std::string(number * 7 % 90, static_cast<char>('a' + series % 26)) + ".";
}

// The generations of a log file, oldest first; their numbers may have gaps.
inline std::vector<std::string> generationsOf(const std::string& file) {
    const std::filesystem::path base(file);
    std::map<unsigned long, std::string, std::greater<>> found;
    for (const auto& entry : std::filesystem::directory_iterator(base.parent_path())) {
        const std::string name = entry.path().filename();
        const std::string stem = base.filename();
        if (name == stem) {
            found[0] = entry.path();
        } else if (name.starts_with(stem + ".")) {
            found[std::stoul(name.substr(stem.size() + 1))] = entry.path();
        }
    }
    std::vector<std::string> paths;
    for (const auto& [number, path] : found) {
        paths.push_back(path);
    }
    return paths;
}

// All generations in one text, oldest first.
inline std::string textOfGenerations(const std::string& file) {
    std::string all;
    for (const std::string& path : generationsOf(file)) {
        all += readFile(path);
    }
    return all;
}

// Expects `count` whole lines of each series in order, without gaps and duplicates.
inline void expectEveryLine(const std::string& text, unsigned series, unsigned count) {
    std::vector<unsigned> next(series, 0);
    std::istringstream in(text);
    std::string line;
    while (std::getline(in, line)) {
        unsigned which = series;
        ASSERT_EQ(1, std::sscanf(line.c_str(), "%u", &which)) << line;
        ASSERT_LT(which, series) << line;
        ASSERT_EQ(numberedLine(which, next[which]), line);
        ++next[which];
    }
    EXPECT_EQ(std::vector<unsigned>(series, count), next);
}

#endif  // QUELTA_TESTS_SUPPORT_NUMBEREDLINES_H_
