#ifndef QUELTA_UTIL_TRIENODE_H_
#define QUELTA_UTIL_TRIENODE_H_

// A trie over bytes: each node keeps one child per byte value and a list of the values that were
// stored under the key that leads to it. The empty key leads to the node itself.
//
// A node owns its children and its values. Keys of any length are fine: nothing recurses, and
// clearing needs no memory besides the nodes.
//
// Not thread-safe; one thread at a time per object.

#include <algorithm>
#include <cstddef>
#include <exception>
#include <iterator>
#include <string>
#include <utility>
#include <vector>

#include "util/HugePages.h"

template <typename T>
class TrieNode {
public:
    // One child for each value of a byte.
    static constexpr int ALPHABET_SIZE = 256;

    TrieNode() : _children() {}

    // Copies the whole subtree, values included.
    TrieNode(const TrieNode& other) : TrieNode() { copyFrom(other); }

    TrieNode& operator=(const TrieNode&) = delete;

    ~TrieNode() { clear(); }

    // Stores a copy of `data` behind the values already stored under `key`.
    // Errors: what copying `data` throws, std::bad_alloc; no value is stored then.
    void addData(const std::string& key, const T& data) { reach(key).append(data); }

    // The same, moving `data`.
    void addData(const std::string& key, T&& data) { reach(key).append(std::move(data)); }

    // Replaces `results` by pointers to all values that are stored under a beginning of `key`: the
    // empty one first, then ever longer ones, each node's values in the order of their storing.
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

    // Destroys all values and all children.
    //
    // While the walk is below a node, that node's slot of the child being cleared holds the way
    // back up; all lower slots are null by then, so it is the node's first slot that is not.
    void clear() {
        _dataList.clear();
        TrieNode* node = this;
        TrieNode* parent = this;  // the top is its own parent
        for (;;) {
            const int i = node->firstUsedSlot();
            if (i < ALPHABET_SIZE) {
                TrieNode* const child = node->_children[i];
                node->_children[i] = parent;
                parent = node;
                node = child;
                node->_dataList.clear();
            } else if (node == this) {
                return;
            } else {
                delete node;
                node = parent;
                parent = std::exchange(node->_children[node->firstUsedSlot()], nullptr);
            }
        }
    }

private:
    static constexpr std::size_t LARGE = 128;  // values in a list
    static constexpr std::size_t GROWTH = 32;

    static int index(char c) { return static_cast<unsigned char>(c); }

    int firstUsedSlot() const {
        const auto used = std::find_if(std::begin(_children), std::end(_children),
                                       [](const TrieNode* child) { return child != nullptr; });
        return static_cast<int>(used - std::begin(_children));
    }

    // Returns: the node that `key` leads to; nodes that are missing on the way are made.
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

    template <typename Data>
    void append(Data&& data) {
        if (_dataList.size() < _dataList.capacity() || _dataList.size() < LARGE) {
            _dataList.push_back(std::forward<Data>(data));
            return;
        }
        T value(std::forward<Data>(data));  // may be one of the values that are about to move
        makeRoom();
        _dataList.push_back(std::move(value));
    }

    // Values may be large, and moving them would touch their memory once more at each doubling.
    // Room that is never used is address space alone, so a large list takes much of it at once,
    // unless the system refuses.
    void makeRoom() {
        const std::size_t capacity = GROWTH * _dataList.capacity();
        try {
            _dataList.reserve(capacity);
        } catch (const std::exception&) {
            return;
        }
        adviseHugePages(static_cast<void*>(_dataList.data()), capacity * sizeof(T));
    }

    void appendData(std::vector<T*>& results) {
        for (T& data : _dataList) {
            results.push_back(&data);
        }
    }

    void copyFrom(const TrieNode& other) {
        std::vector<std::pair<const TrieNode*, TrieNode*>> pending{{&other, this}};
        while (!pending.empty()) {
            const auto [from, to] = pending.back();
            pending.pop_back();
            to->_dataList = std::vector<T>(from->_dataList);
            for (int i = 0; i < ALPHABET_SIZE; ++i) {
                if (from->_children[i] != nullptr) {
                    to->_children[i] = new TrieNode;
                    pending.emplace_back(from->_children[i], to->_children[i]);
                }
            }
        }
    }

    TrieNode* _children[ALPHABET_SIZE];  // by the unsigned value of the byte; null: no child
    std::vector<T> _dataList;            // in the order of storing
};

#endif  // QUELTA_UTIL_TRIENODE_H_
