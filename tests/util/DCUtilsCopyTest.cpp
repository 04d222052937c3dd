#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <memory>
#include <new>
#include <string>

#include "support/InChild.h"
#include "support/RootLayout.h"
#include "support/ScriptedCalls.h"
#include "support/StderrCapture.h"
#include "util/DCUtils.h"

// operator new[](std::size_t, const std::nothrow_t&)
extern "C" {
void* __real__ZnamRKSt9nothrow_t(std::size_t size, const std::nothrow_t& tag);
void* __wrap__ZnamRKSt9nothrow_t(std::size_t size, const std::nothrow_t& tag) {
    return scriptedCall("new[]", [&] { return __real__ZnamRKSt9nothrow_t(size, tag); });
}
int __real_vsnprintf(char* buf, std::size_t size, const char* fmt, va_list ap)
    __attribute__((format(printf, 3, 0)));
int __wrap_vsnprintf(char* buf, std::size_t size, const char* fmt, va_list ap)
    __attribute__((format(printf, 3, 0)));
int __wrap_vsnprintf(char* buf, std::size_t size, const char* fmt, va_list ap) {
    return scriptedCall("vsnprintf", [&] { return __real_vsnprintf(buf, size, fmt, ap); });
}
}

namespace {

bool copyThrows(const char* text) {
    try {
        delete[] copystr(text);
        return false;
    } catch (const std::bad_alloc&) {
        return true;
    }
}

bool failingCopyThrows() {
    ScriptedCalls allocations("new[]");
    allocations.fail(ENOMEM);
    return copyThrows("text");
}

// Stands in front of the library in the link, so that it is made before and destroyed after the
// static objects there.
struct FirstAndLast {
    FirstAndLast() {
        const StderrCapture capture;
        threwEarly = failingCopyThrows();
        saidEarly = capture.text();
    }
    ~FirstAndLast() {
        if (exitLate) {
            const ScriptedCalls formats("vsnprintf");
            ::_exit(failingCopyThrows() && formats.calls() == 0 ? 7 : 8);
        }
    }
    bool threwEarly = false;
    std::string saidEarly;
    bool exitLate = false;
};
FirstAndLast firstAndLast;

TEST(DCUtilsCopyTest, CopiesIntoANewArray) {
    const std::string longText(100000, 'x');
    for (const std::string& text : {std::string(), std::string("a"), longText}) {
        const std::unique_ptr<char[]> copy(copystr(text.c_str()));
        EXPECT_STREQ(text.c_str(), copy.get());
        EXPECT_NE(text.c_str(), copy.get());
    }
}

TEST(DCUtilsCopyTest, GivesNullForNullWithoutAllocating) {
    const ScriptedCalls allocations("new[]");
    EXPECT_EQ(nullptr, copystr(nullptr));
    EXPECT_EQ(0u, allocations.calls());
}

TEST(DCUtilsCopyTest, ReportsAFailedAllocationAndThrows) {
    ScriptedCalls allocations("new[]");
    allocations.fail(ENOMEM);
    const StderrCapture capture;
    const RootLayout layout("%p %c %m%n");
    EXPECT_TRUE(copyThrows("four"));
    EXPECT_EQ("ERROR DCUtils Could not allocate space for string of size 5 in DCUtils::copystr\n",
              capture.text());
}

TEST(DCUtilsCopyTest, OnlyThrowsBeforeItsLoggerExists) {
    EXPECT_TRUE(firstAndLast.threwEarly);
    EXPECT_EQ("", firstAndLast.saidEarly);
}

TEST(DCUtilsCopyTest, OnlyThrowsAfterItsLoggerIsGone) {
    const ChildRun run = inChild([] { firstAndLast.exitLate = true; });
    EXPECT_EQ(7, run.status);
    EXPECT_EQ("", run.err);
}

TEST(DCUtilsCopyTest, IsWhatTheOtherFunctionsAllocateWith) {
    const struct {
        const char* name;
        char* (*call)();
    } rows[] = {
        {"strip", [] { return strip(" a "); }},
        {"lowercase", [] { return lowercase("A"); }},
        {"replaceString", [] { return replaceString("a", "a", "b"); }},
        {"substituteEnvs", [] { return substituteEnvs("$A"); }},
    };
    for (const auto& row : rows) {
        ScriptedCalls allocations("new[]");
        allocations.fail(ENOMEM);
        const StderrCapture capture;
        EXPECT_THROW(delete[] row.call(), std::bad_alloc) << row.name;
        EXPECT_NE(std::string::npos, capture.text().find("in DCUtils::copystr\n")) << row.name;
    }
}

}  // namespace
