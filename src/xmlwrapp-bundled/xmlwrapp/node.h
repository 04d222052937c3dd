#ifndef QUELTA_XMLWRAPP_BUNDLED_XMLWRAPP_NODE_H_
#define QUELTA_XMLWRAPP_BUNDLED_XMLWRAPP_NODE_H_

#include <memory>

// The stand-in for the xmlwrapp library where none is installed: one XML element with a name and
// text, kept as a libxml2 tree. It has what the project needs of that library and nothing more;
// which of the two is built in is settled when the project is configured (QUELTA_XMLWRAPP).
//
// A node owns its tree whole: a copy shares nothing with its source, and destruction frees
// everything. The element is never null. Texts are UTF-8, without markup: "&" and "<" stand for
// themselves, and what was set is what is read back.
//
// Not thread-safe; one thread at a time per object.

namespace xml {

class node {
public:
    // An empty element: its name and its content are "".
    // Errors: std::bad_alloc when memory is exhausted, here and wherever a tree is made or grown.
    node();

    // An element called `name`, without content.
    // Errors: std::invalid_argument when `name` is null or no XML name.
    explicit node(const char* name);

    // A deep copy.
    node(const node& other);

    // Replaces this tree by a deep copy of the other; unchanged when that throws.
    node& operator=(const node& other);

    ~node();

    // Exchanges the trees without copying; cannot fail.
    void swap(node& other) noexcept;
    friend void swap(node& left, node& right) noexcept { left.swap(right); }

    // Renames the element; unchanged when it throws.
    // Errors: std::invalid_argument when `name` is null or no XML name.
    void set_name(const char* name);

    // Returns: the element's name, never null, valid until the element is renamed or destroyed.
    const char* get_name() const;

    // Replaces everything below the element by this text; null or "" leaves it without content.
    // Unchanged when it throws.
    // Errors: std::invalid_argument when `content` is not UTF-8; std::length_error from 2 GiB on.
    void set_content(const char* content);

    // Returns: the text below the element, never null, valid until it is replaced or the node is
    // destroyed.
    const char* get_content() const;

private:
    struct tree;

    std::unique_ptr<tree> _tree;  // never null; the element and all below it, owned
};

}  // namespace xml

#endif  // QUELTA_XMLWRAPP_BUNDLED_XMLWRAPP_NODE_H_
