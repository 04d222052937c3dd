#ifndef QUELTA_TESTS_SUPPORT_EXAMPLES_H_
#define QUELTA_TESTS_SUPPORT_EXAMPLES_H_

// Tables of texts and results, several on a line.
//
//     expectEach(lowerCase, {"Ab > ab", "x > x"});

#include <gtest/gtest.h>

#include <initializer_list>
#include <string>

using Examples = std::initializer_list<std::string>;

// Each example is "ARGUMENT > RESULT" of `function`.
template <typename Function>
void expectEach(Function function, Examples examples) {
    for (const std::string& example : examples) {
        const std::size_t arrow = example.find(" > ");
        EXPECT_EQ(example.substr(arrow + 3), function(example.substr(0, arrow))) << example;
    }
}

#endif  // QUELTA_TESTS_SUPPORT_EXAMPLES_H_
