#include <gtest/gtest.h>

#include <cerrno>
#include <memory>
#include <string>

#include "support/AllocationProbe.h"
#include "support/RootLayout.h"
#include "support/ScriptedLibc.h"
#include "support/StderrCapture.h"
#include "support/TempDir.h"
#include "util/DCUtils.h"
#include "util/Pathname.h"

namespace {

TEST(DCUtilsFaultTest, ACopyWithoutMemoryIsReportedAndThrown) {
    REQUIRE_ALLOCATION_PROBE();
    const struct {
        std::size_t n;  // the allocation of copystr itself
        char* (*call)();
    } rows[] = {
        {1, [] { return copystr("four"); }},
        {1, [] { return strip(" four "); }},
        {1, [] { return lowercase("FOUR"); }},
        {2, [] { return replaceString("fur", "u", "ou"); }},
        {1, [] { return substituteEnvs("four$"); }},
    };
    for (const auto& row : rows) {
        const StderrCapture capture;
        const RootLayout layout("%p %c %m%n");
        const FailedAllocation result = failAllocation(row.n, [&] { delete[] row.call(); });
        EXPECT_TRUE(result.thrown);
        EXPECT_EQ(
            "ERROR DCUtils Could not allocate space for string of size 5 in DCUtils::copystr\n",
            capture.text());
    }
}

TEST(DCUtilsFaultTest, NullIsCopiedWithoutAllocating) {
    REQUIRE_ALLOCATION_PROBE();
    const AllocationProbe allocations;
    EXPECT_EQ(nullptr, copystr(nullptr));
    EXPECT_EQ(0u, allocations.count());
}

TEST(DCUtilsFaultTest, AFileThatDoesNotFitIntoMemoryIsReportedOnStandardOutput) {
    REQUIRE_ALLOCATION_PROBE();
    const TempDir dir;
    const Pathname path(dir.file("text"));
    writeFile(path, std::string(20000, 'x'));
    testing::internal::CaptureStdout();
    {
        AllocationProbe allocations;
        allocations.refuseBeyond(20000);
        EXPECT_EQ(nullptr, readText(path));
    }
    EXPECT_EQ("Unable to alloc 20000 for reading file " + path + "\n",
              testing::internal::GetCapturedStdout());
}

TEST(DCUtilsFaultTest, AFileWithoutASizeIsNotRead) {
    const TempDir dir;
    writeFile(dir.file("text"), "x");
    ScriptedCalls stats("stat");
    stats.fail(EIO);
    EXPECT_EQ(nullptr, readText(Pathname(dir.file("text"))));
    EXPECT_EQ(1u, stats.calls());
}

}  // namespace
