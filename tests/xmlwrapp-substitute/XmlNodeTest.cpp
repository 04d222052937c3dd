#include "xmlwrapp/node.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

namespace {

xml::node makeNode(const char* name, const char* content) {
    xml::node made(name);
    made.set_content(content);
    return made;
}

void expectNode(const char* name, const char* content, const xml::node& node) {
    EXPECT_STREQ(name, node.get_name());
    EXPECT_STREQ(content, node.get_content());
}

TEST(XmlNodeTest, StartsWithoutContent) {
    expectNode("", "", xml::node());
    expectNode("config", "", xml::node("config"));
}

TEST(XmlNodeTest, KeepsContentAsGivenIncludingMarkup) {
    const std::string large(1 << 20, 'x');
    xml::node node("n");
    for (const char* content : {"plain", "a < b && c > d", "&amp;", "<element/>", "]]>", " \t\n",
                                "gr\xc3\xbc\xc3\x9f", large.c_str(), ""}) {
        node.set_content(content);
        expectNode("n", content, node);
    }
    node.set_content("text");
    node.set_content(node.get_content());
    expectNode("n", "text", node);
    node.set_content(nullptr);
    expectNode("n", "", node);
}

TEST(XmlNodeTest, RefusesWhatIsNotANameOrNotUtf8) {
    for (const char* bad : {static_cast<const char*>(nullptr), "", " ", " a", "1st", "two words",
                            "a<b", "\xff\xfe"}) {
        EXPECT_THROW(xml::node{bad}, std::invalid_argument);
    }
    xml::node node = makeNode("n", "old");
    EXPECT_THROW(node.set_content("caf\xe9"), std::invalid_argument);
    expectNode("n", "old", node);
}

TEST(XmlNodeTest, CopiesAndAssignsDeeply) {
    xml::node source = makeNode("source", "text");
    xml::node copy(source);
    xml::node target = makeNode("target", "lost");
    EXPECT_EQ(&target, &(target = source));
    source.set_content("changed");
    expectNode("source", "text", copy);
    expectNode("source", "text", target);
    target.set_content("own");
    expectNode("source", "changed", source);
    const xml::node& alias = target;
    target = alias;
    expectNode("source", "own", target);
    target = xml::node();
    expectNode("", "", target);
    expectNode("", "", xml::node(target));
}

}  // namespace
