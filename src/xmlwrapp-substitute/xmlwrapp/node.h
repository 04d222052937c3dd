#ifndef QUELTA_XMLWRAPP_SUBSTITUTE_XMLWRAPP_NODE_H_
#define QUELTA_XMLWRAPP_SUBSTITUTE_XMLWRAPP_NODE_H_

// A substitute for the xmlwrapp library on systems without it: one XML element with a name and
// text, held as a libxml2 tree.
//
//     xml::node element("component");
//     element.set_content("index processor");
//     std::puts(element.get_content());
//
// It has only what this project needs. QUELTA_XMLWRAPP chooses between the two when the project is
// configured.
//
// A node owns its tree: a copy shares nothing with its source, and the destructor frees everything.
// Texts are UTF-8 without markup: "&" and "<" have no meaning.
//
// Not thread-safe; one thread at a time per object.

#include <memory>

// The namespace of xmlwrapp.
namespace xml {

// An XML element.
class node {
public:
    // An empty element: its name and its content are "".
    // Errors: std::bad_alloc if memory is exhausted, as in every operation that copies or grows.
    node();

    // An element called `name`, without content.
    // Errors: std::invalid_argument if `name` is null or not an XML name.
    explicit node(const char* name);

    // A deep copy.
    node(const node& other);

    // Replaces this tree by a deep copy of the other; unchanged if that throws.
    node& operator=(const node& other);

    // Frees the tree.
    ~node();

    // Returns: the element's name, never null.
    // Owns: the text is the node's, and valid until the node is assigned to or destroyed.
    const char* get_name() const;

    // Replaces the content by this text; null or "" leaves none. Unchanged if it throws.
    // Errors: std::invalid_argument if `content` is not UTF-8; std::length_error from 2 GiB on.
    void set_content(const char* content);

    // Returns: the content, never null.
    // Owns: the text is the node's, and valid until it is replaced or the node is assigned to or
    // destroyed.
    const char* get_content() const;

private:
    struct tree;

    std::unique_ptr<tree> _tree;  // never null
};

}  // namespace xml

#endif  // QUELTA_XMLWRAPP_SUBSTITUTE_XMLWRAPP_NODE_H_
