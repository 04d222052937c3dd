#include "xmlwrapp/node.h"

#include <libxml/tree.h>

#include <climits>
#include <cstring>
#include <new>
#include <stdexcept>

namespace {

struct NodeFree {
    void operator()(xmlNode* element) const noexcept { xmlFreeNode(element); }
};
using NodePtr = std::unique_ptr<xmlNode, NodeFree>;

// libxml2's characters are unsigned; the bytes are the same.
const xmlChar* toXml(const char* text) {
    return reinterpret_cast<const xmlChar*>(text);
}

const char* fromXml(const xmlChar* text) {
    return reinterpret_cast<const char*>(text);
}

const xmlChar* checkedName(const char* name) {
    if (name == nullptr || xmlValidateName(toXml(name), 0) != 0) {
        throw std::invalid_argument("xml::node: not an XML name");
    }
    return toXml(name);
}

NodePtr newElement(const xmlChar* name) {
    NodePtr element(xmlNewNode(nullptr, name));
    if (!element || element->name == nullptr) {
        throw std::bad_alloc();
    }
    return element;
}

// libxml2 returns a text node without its text if only the second allocation fails.
NodePtr newText(const char* content) {
    const std::size_t length = std::strlen(content);
    if (length >= INT_MAX) {
        throw std::length_error("xml::node: content too long");
    }
    if (xmlCheckUTF8(toXml(content)) == 0) {
        throw std::invalid_argument("xml::node: content is not UTF-8");
    }
    NodePtr text(xmlNewTextLen(toXml(content), static_cast<int>(length)));
    if (!text || text->content == nullptr) {
        throw std::bad_alloc();
    }
    return text;
}

}  // namespace

namespace xml {

struct node::tree {
    NodePtr element;  // with at most one child, a text
};

node::node() : _tree(new tree{newElement(toXml(""))}) {}

node::node(const char* name) : _tree(new tree{newElement(checkedName(name))}) {}

// Copies the name and the text one by one, because libxml2's own copy silently omits parts when
// memory runs out.
node::node(const node& other) : _tree(new tree{newElement(other._tree->element->name)}) {
    set_content(other.get_content());
}

node& node::operator=(const node& other) {
    node copy(other);
    _tree.swap(copy._tree);
    return *this;
}

node::~node() = default;

const char* node::get_name() const {
    return fromXml(_tree->element->name);
}

void node::set_content(const char* content) {
    // Create the new text first; nothing after that can fail.
    const bool empty = content == nullptr || *content == '\0';
    NodePtr text = empty ? NodePtr() : newText(content);
    xmlNode* const element = _tree->element.get();
    xmlNodeSetContent(element, nullptr);
    if (text) {
        xmlAddChild(element, text.release());
    }
}

const char* node::get_content() const {
    const xmlNode* const text = _tree->element->children;
    return text == nullptr ? "" : fromXml(text->content);
}

}  // namespace xml
