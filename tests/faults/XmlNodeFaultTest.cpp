// The allocations of libxml2 fail, one at a time.

#include <gtest/gtest.h>
#include <libxml/xmlerror.h>
#include <libxml/xmlmemory.h>

#include <cstdlib>
#include <cstring>
#include <new>

#include "support/InChild.h"
#include "xmlwrapp/node.h"

namespace {

int untilFailure = 0;  // the allocation that fails, counted from 1; 0: none
bool refused() {
    return untilFailure > 0 && --untilFailure == 0;
}

void* allocate(std::size_t size) {
    return refused() ? nullptr : std::malloc(size);
}

void* reallocate(void* memory, std::size_t size) {
    return refused() ? nullptr : std::realloc(memory, size);
}

char* duplicate(const char* text) {
    return refused() ? nullptr : ::strdup(text);
}

void ignoreError(void*, xmlErrorPtr) {}

// In a child, because libxml2 keeps its allocation functions for the rest of the process.
TEST(XmlNodeTest, EachFailedAllocationIsAnExceptionAndLeavesTheTargetAsItWas) {
    const ChildRun run = inChild([] {
        xmlMemSetup(std::free, allocate, reallocate, duplicate);
        xmlSetStructuredErrorFunc(nullptr, ignoreError);
        xml::node source("source");
        source.set_content("text");
        xml::node target("target");
        int failures = 0;
        for (bool assigned = false; !assigned;) {
            EXPECT_STREQ("target", target.get_name());
            untilFailure = failures + 1;
            try {
                target = source;
                assigned = true;
            } catch (const std::bad_alloc&) {
                ++failures;
            }
        }
        EXPECT_STREQ("source", target.get_name());
        EXPECT_STREQ("text", target.get_content());
        EXPECT_EQ(4, failures) << "an element, its name, a text and its characters";
    });
    EXPECT_EQ(0, run.status) << run.err;
}

}  // namespace
