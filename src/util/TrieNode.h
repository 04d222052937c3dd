#ifndef QUELTA_UTIL_TRIENODE_H_
#define QUELTA_UTIL_TRIENODE_H_

// A trie over bytes: each node keeps one child per byte value and a list of the values that were
// stored under the key that leads to it. The empty key leads to the node itself.
//
//     TrieNode<int> root;
//     root.addData("ab", 1);
//     root.addData("", 2);
//     std::vector<int*> found;
//     root.findData("abc", found);  // *found[0] is 2, *found[1] is 1
//
// A node owns its children and its values. Copying, clearing and destruction recurse once for each
// byte of the longest key, so keys of some ten thousand bytes need a larger stack than usual.
//
// Not thread-safe; one thread at a time per object.

#include <string>
#include <utility>
#include <vector>

#include "util/Requirements.h"

// A node, and the trie below it.
template <typename T>
class TrieNode {
public:
    // One child for each value of a byte.
    static constexpr int ALPHABET_SIZE = 256;

    // A trie without values.
    TrieNode() : _children() {}

    // Copies the whole subtree, values included.
    TrieNode(const TrieNode& other) : TrieNode() {
        _dataList = other._dataList;
        for (int i = 0; i < ALPHABET_SIZE; ++i) {
            if (other._children[i] != nullptr) {
                _children[i] = new TrieNode(*other._children[i]);
            }
        }
    }

    TrieNode& operator=(const TrieNode&) = delete;

    // Destroys all values and all children.
    ~TrieNode() { clear(); }

    // Stores a copy of `data` under `key`, after the values already stored there.
    // Errors: std::bad_alloc, and what copying `data` throws; no value is stored then.
    void addData(const std::string& key, const T& data) { reach(key)._dataList.push_back(data); }

    // Moves `data` to the values under `key`.
    void addData(const std::string& key, T&& data) {
        reach(key)._dataList.push_back(std::move(data));
    }

    // Replaces `results` by pointers to all values that are stored under a prefix of `key`, the
    // shortest prefix first, each node's values in the order of insertion.
    // Owns: the pointers point into the trie and are valid until it changes.
    // Cost: one step per byte of `key` at most, and one pointer per result.
    void findData(const std::string& key, std::vector<T*>& results) {
        results.clear();
        appendData(results);
        TrieNode* node = this;
        for (const char c : key) {
            node = node->_children[index(c)];
            if (node == nullptr) {
                return;
            }
            node->appendData(results);
        }
    }

    // Destroys all values and all children; the node can be filled again. Each child's destructor
    // clears that child, so this recurses once for each byte of the longest key.
    void clear() {
        _dataList.clear();
        for (TrieNode*& child : _children) {
            delete child;
            child = nullptr;
        }
    }

private:
    static int index(char c) { return static_cast<unsigned char>(c); }

    // Returns: the node that `key` leads to. Nodes that are missing on the way are created; they
    // stay if a later step fails.
    TrieNode& reach(const std::string& key) {
        TrieNode* node = this;
        for (const char c : key) {
            TrieNode*& child = node->_children[index(c)];
            if (child == nullptr) {
                child = new TrieNode;
            }
            node = child;
        }
        return *node;
    }

    void appendData(std::vector<T*>& results) {
        for (T& data : _dataList) {
            results.push_back(&data);
        }
    }

    TrieNode* _children[ALPHABET_SIZE];  // by the unsigned value of the byte; null: no child
    std::vector<T> _dataList;            // in the order of insertion
};

#endif  // QUELTA_UTIL_TRIENODE_H_
