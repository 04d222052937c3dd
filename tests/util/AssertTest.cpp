#include "util/Assert.h"

#include <gtest/gtest.h>

namespace {

TEST(AssertTest, HoldsSilentlyForATrueExpression) {
    int evaluations = 0;
    QUELTA_ASSERT(++evaluations == 1);
    EXPECT_EQ(1, evaluations);
}

TEST(AssertTest, PrintsPathLineAndOwnExpressionAndAborts) {
    const void* pointer = &pointer;
    EXPECT_EXIT(QUELTA_ASSERT(pointer == NULL), testing::KilledBySignal(SIGABRT),
                "^tests/util/AssertTest.cpp:[0-9]+: failed assertion `pointer == NULL'\n$");
}

}  // namespace
