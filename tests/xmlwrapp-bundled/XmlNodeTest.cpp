#include "xmlwrapp/node.h"

#include <gtest/gtest.h>
#include <libxml/xmlerror.h>
#include <libxml/xmlmemory.h>

#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>
#include <stdexcept>
#include <string>

namespace {

// libxml2's allocations counted, and the n-th of them refused.
class CountedMemory {
public:
    CountedMemory() {
        blocks = 0;
        untilFailure = 0;
        xmlMemGet(&_free, &_malloc, &_realloc, &_strdup);
        xmlMemSetup(release, allocate, reallocate, duplicate);
        xmlSetGenericErrorFunc(nullptr, ignore);
        xmlSetStructuredErrorFunc(nullptr, [](void*, xmlErrorPtr) {});
    }
    ~CountedMemory() {
        xmlResetLastError();
        xmlSetStructuredErrorFunc(nullptr, nullptr);
        xmlSetGenericErrorFunc(nullptr, nullptr);
        xmlMemSetup(_free, _malloc, _realloc, _strdup);
    }
    CountedMemory(const CountedMemory&) = delete;
    CountedMemory& operator=(const CountedMemory&) = delete;

    // The n-th allocation from here on fails, and those after it do not; 0: none does.
    static void failNth(int n) { untilFailure = n; }
    static bool failed() { return untilFailure < 0; }

    // Blocks in use, the text of libxml2's last error apart.
    static int live() {
        xmlResetLastError();
        return blocks;
    }

private:
    static void ignore(void*, const char*, ...) {}
    static bool refused() {
        if (untilFailure > 0 && --untilFailure == 0) {
            untilFailure = -1;
            return true;
        }
        return false;
    }
    static void* allocate(std::size_t size) {
        if (refused()) {
            return nullptr;
        }
        ++blocks;
        return std::malloc(size);
    }
    static void release(void* memory) {
        blocks -= memory != nullptr;
        std::free(memory);
    }
    static void* reallocate(void* memory, std::size_t size) {
        if (refused()) {
            return nullptr;
        }
        blocks += memory == nullptr;
        return std::realloc(memory, size);
    }
    static char* duplicate(const char* text) {
        void* const copy = allocate(std::strlen(text) + 1);
        return copy == nullptr ? nullptr
                               : static_cast<char*>(std::memcpy(copy, text, std::strlen(text) + 1));
    }

    static inline int blocks = 0;
    static inline int untilFailure = 0;
    xmlFreeFunc _free = nullptr;
    xmlMallocFunc _malloc = nullptr;
    xmlReallocFunc _realloc = nullptr;
    xmlStrdupFunc _strdup = nullptr;
};

xml::node makeNode(const char* name, const char* content) {
    xml::node made(name);
    made.set_content(content);
    return made;
}

TEST(XmlNodeTest, DefaultConstructionGivesAnEmptyElement) {
    const xml::node empty;
    EXPECT_STREQ("", empty.get_name());
    EXPECT_STREQ("", empty.get_content());
}

TEST(XmlNodeTest, NamedConstructionGivesAnElementWithoutContent) {
    const xml::node named("config");
    EXPECT_STREQ("config", named.get_name());
    EXPECT_STREQ("", named.get_content());
}

TEST(XmlNodeTest, KeepsContentAsItWasGivenMarkupIncluded) {
    for (const char* content :
         {"plain", "a < b && c > d", "&amp;", "<element/>", "]]>", " \t\n", "gr\xc3\xbc\xc3\x9f"}) {
        EXPECT_STREQ(content, makeNode("n", content).get_content());
    }
    const std::string large(1 << 20, 'x');
    EXPECT_EQ(large, makeNode("n", large.c_str()).get_content());
}

TEST(XmlNodeTest, ReplacesAndDropsContent) {
    xml::node node = makeNode("n", "first");
    node.set_content("second");
    EXPECT_STREQ("second", node.get_content());
    node.set_content("");
    EXPECT_STREQ("", node.get_content());
    node.set_content("third");
    node.set_content(nullptr);
    EXPECT_STREQ("", node.get_content());
    EXPECT_STREQ("n", node.get_name());
}

TEST(XmlNodeTest, TakesItsOwnNameAndContentBack) {
    xml::node node = makeNode("own", "its own");
    node.set_content(node.get_content());
    node.set_name(node.get_name());
    EXPECT_STREQ("own", node.get_name());
    EXPECT_STREQ("its own", node.get_content());
}

TEST(XmlNodeTest, RenamesTheElementAndKeepsItsContent) {
    xml::node node = makeNode("before", "kept");
    node.set_name("after");
    EXPECT_STREQ("after", node.get_name());
    EXPECT_STREQ("kept", node.get_content());
}

TEST(XmlNodeTest, RefusesWhatIsNoNameAndStaysAsItWas) {
    xml::node node = makeNode("kept", "text");
    for (const char* bad : {static_cast<const char*>(nullptr), "", " ", " a", "1st", "two words",
                            "a<b", "\xff\xfe"}) {
        EXPECT_THROW(xml::node{bad}, std::invalid_argument);
        EXPECT_THROW(node.set_name(bad), std::invalid_argument);
    }
    EXPECT_STREQ("kept", node.get_name());
    EXPECT_STREQ("text", node.get_content());
}

TEST(XmlNodeTest, RefusesContentThatIsNotUtf8AndKeepsTheOld) {
    xml::node node = makeNode("n", "old");
    EXPECT_THROW(node.set_content("caf\xe9"), std::invalid_argument);
    EXPECT_STREQ("old", node.get_content());
}

TEST(XmlNodeTest, CopyIsDeepInBothDirections) {
    xml::node source = makeNode("source", "original");
    xml::node copy(source);
    source.set_name("renamed");
    source.set_content("changed");
    EXPECT_STREQ("source", copy.get_name());
    EXPECT_STREQ("original", copy.get_content());
    copy.set_content("of its own");
    EXPECT_STREQ("changed", source.get_content());
}

TEST(XmlNodeTest, CopyOutlivesItsSource) {
    auto source = std::make_unique<xml::node>(makeNode("gone", "still here"));
    const xml::node copy(*source);
    source.reset();
    EXPECT_STREQ("gone", copy.get_name());
    EXPECT_STREQ("still here", copy.get_content());
}

TEST(XmlNodeTest, CopiesTheEmptyElement) {
    const xml::node empty;
    const xml::node copy(empty);
    EXPECT_STREQ("", copy.get_name());
    EXPECT_STREQ("", copy.get_content());
}

TEST(XmlNodeTest, AssignmentReplacesEverythingByADeepCopy) {
    xml::node source = makeNode("source", "text");
    xml::node target = makeNode("target", "lost");
    EXPECT_EQ(&target, &(target = source));
    source.set_content("changed");
    EXPECT_STREQ("source", target.get_name());
    EXPECT_STREQ("text", target.get_content());
    target = xml::node();
    EXPECT_STREQ("", target.get_name());
    EXPECT_STREQ("", target.get_content());
}

TEST(XmlNodeTest, AssignmentToItselfChangesNothing) {
    xml::node node = makeNode("self", "same");
    const xml::node& alias = node;
    node = alias;
    EXPECT_STREQ("self", node.get_name());
    EXPECT_STREQ("same", node.get_content());
}

TEST(XmlNodeTest, SwapExchangesTheTreesWithoutCopying) {
    xml::node left = makeNode("left", "l");
    xml::node right = makeNode("right", "r");
    const char* const leftText = left.get_content();
    left.swap(right);
    EXPECT_STREQ("right", left.get_name());
    EXPECT_STREQ("l", right.get_content());
    EXPECT_EQ(leftText, right.get_content());
    swap(left, right);
    EXPECT_STREQ("left", left.get_name());
    left.swap(left);
    EXPECT_STREQ("l", left.get_content());
}

TEST(XmlNodeTest, FreesAllThatItAllocates) {
    const CountedMemory memory;
    {
        xml::node node = makeNode("first", "content");
        xml::node copy(node);
        copy.set_name("second");
        copy.set_content("other");
        copy.set_content("");
        node = copy;
        node.swap(copy);
        EXPECT_LT(0, CountedMemory::live());
    }
    EXPECT_EQ(0, CountedMemory::live());
}

TEST(XmlNodeTest, EachAllocationThatFailsIsAnExceptionAndLeaksNothing) {
    const CountedMemory memory;
    int failures = 0;
    for (int nth = 1;; ++nth) {
        const xml::node source = makeNode("source", "text");
        xml::node target = makeNode("target", "kept");
        CountedMemory::failNth(nth);
        try {
            target = source;
        } catch (const std::bad_alloc&) {
            ++failures;
            EXPECT_STREQ("target", target.get_name());
            EXPECT_STREQ("kept", target.get_content());
        }
        if (!CountedMemory::failed()) {
            EXPECT_STREQ("source", target.get_name());
            EXPECT_STREQ("text", target.get_content());
            CountedMemory::failNth(0);
            EXPECT_EQ(nth - 1, failures);
            break;
        }
    }
    EXPECT_EQ(4, failures) << "an element, its name, a text and its characters";
    EXPECT_EQ(0, CountedMemory::live());
}

}  // namespace
