#ifndef QUELTA_SERVICES_PIPELINE_INDEXPROCESSOR_BOOLOPERATOR_H_
#define QUELTA_SERVICES_PIPELINE_INDEXPROCESSOR_BOOLOPERATOR_H_

// The operators of the rule network. An operator counts its matches and fires when they suffice.
// While it fires, its implications are in the caller's set and it is a match of each child. AND
// operators come with the network; derive a class to give shouldFire another meaning:
//
//     class OrOperator : public BoolOperator {
//     public:
//         using BoolOperator::BoolOperator;
//         bool shouldFire() override { return _matchCount > 0; }
//     };
//     StringSet implications;
//     std::string implication = "compressed";
//     OrOperator op(nullptr, implication);
//     op.incNeedMatch();
//     op.incNeedMatch();
//     op.addMatch(implications);  // the set now contains "compressed"
//
// Code that changes a count must call update() afterwards; Conditional in Rete.h does both.
//
// Invariant: 0 <= _matchCount <= _needMatch, unless a derived class breaks it.
//
// Operators point at children without owning them, and must not form a cycle. An update recurses
// along the children: a chain of some 200,000 operators needs more than the usual 8 MiB of stack.
//
// Not thread-safe; one thread at a time per object.

#include <cstdint>
#include <set>
#include <string>

#include "util/Requirements.h"

class BoolOperator;

// A set of implications or names.
using StringSet = std::set<std::string>;
// Operators in the order of their addresses; not owned.
using OpSet = std::set<BoolOperator*>;

// The text of AND_OPERATOR.
inline constexpr char AND_OPERATOR_TEXT[] = "AND";
// The type tag of AndOperator.
inline constexpr const char* AND_OPERATOR = AND_OPERATOR_TEXT;

// A node of the network. Derive from it to give shouldFire another meaning.
class BoolOperator {
public:
    // An operator without needs or matches that implies `implication`. If `parent` is not null, the
    // operator becomes its child and needs it to fire.
    BoolOperator(BoolOperator* parent, std::string& implication)
        : _needMatch(0), _matchCount(0), _fired(false), _type(nullptr) {
        addImplication(implication);
        if (parent != nullptr) {
            parent->addChild(*this);
            incNeedMatch();
        }
    }

    // Copies counts, state, implications and children. The copy is not registered with any parent
    // or condition.
    BoolOperator(const BoolOperator&) = default;

    // Does not touch the children. No parent or condition may update the operator any more.
    virtual ~BoolOperator() = default;

    // Returns: whether the implications are in the caller's set.
    bool hasFired() { return _fired; }

    // Adds a match, up to the need.
    void incCount() {
        if (_matchCount < _needMatch) {
            ++_matchCount;
        }
    }

    // Removes a match, down to 0.
    void decCount() {
        if (_matchCount > 0) {
            --_matchCount;
        }
    }

    // Adds a match and updates.
    // Returns: whether the operator started or stopped firing.
    bool addMatch(StringSet& implications) {
        incCount();
        return update(implications);
    }

    // Removes a match and updates.
    // Returns: whether the operator started or stopped firing.
    bool retractMatch(StringSet& implications) {
        decCount();
        return update(implications);
    }

    // Starts or stops firing if shouldFire says so, then updates all children, depth first and in
    // pointer order. A child that is reached along several paths is updated once for each.
    // Returns: whether this operator started or stopped firing.
    // Deliberate: if two operators share an implication, the first to stop firing removes it.
    bool update(StringSet& returnImplications);

    // Sets the count to 0 and updates.
    // Returns: whether the operator started or stopped firing.
    bool reset(StringSet& implications) {
        _matchCount = 0;
        return update(implications);
    }

    // Adds a string to what firing implies.
    void addImplication(const std::string& implication) { _implications.insert(implication); }

    // Raises the number of matches that the operator needs.
    void incNeedMatch() { ++_needMatch; }

    // Makes this operator a match of `child` while it fires.
    // Deliberate: the need of the child stays; the caller must raise it with incNeedMatch.
    // Owns: nothing; the child must live as long as this operator is updated.
    void addChild(BoolOperator& child) { _children.insert(&child); }

    // Returns: type, count, need, state and implications, like "AND 1/2 idle [a, b]".
    std::string toString() const;

protected:
    // Returns: whether the operator's matches suffice.
    virtual bool shouldFire() = 0;

    std::int32_t _needMatch;   // matches needed: one per registration, one per parent
    std::int32_t _matchCount;  // matches present, 0.._needMatch
    bool _fired;               // whether _implications are in the caller's set
    StringSet _implications;   // what firing implies
    OpSet _children;           // not owned
    const char* _type;         // null, or the type tag
};

// Fires while all the matches that it needs are present; without needs, from its first update.
class AndOperator : public BoolOperator {
public:
    // See BoolOperator's constructor.
    AndOperator(BoolOperator* parent, std::string& implication)
        : BoolOperator(parent, implication) {
        _type = AND_OPERATOR;
    }

    // Returns: whether the count has reached the need.
    bool shouldFire() override { return _matchCount >= _needMatch; }
};

inline bool BoolOperator::update(StringSet& returnImplications) {
    const bool fires = shouldFire();
    const bool changed = fires != _fired;
    _fired = fires;
    if (changed && fires) {
        returnImplications.insert(_implications.begin(), _implications.end());
        for (BoolOperator* const child : _children) {
            child->incCount();
        }
    } else if (changed) {
        for (const std::string& implication : _implications) {
            returnImplications.erase(implication);
        }
        for (BoolOperator* const child : _children) {
            child->decCount();
        }
    }
    for (BoolOperator* const child : _children) {
        child->update(returnImplications);
    }
    return changed;
}

inline std::string BoolOperator::toString() const {
    std::string text = _type == nullptr ? "operator" : _type;
    text += ' ' + std::to_string(_matchCount) + '/' + std::to_string(_needMatch);
    text += _fired ? " fired [" : " idle [";
    const char* separator = "";
    for (const std::string& implication : _implications) {
        text += separator + implication;
        separator = ", ";
    }
    return text + ']';
}

#endif  // QUELTA_SERVICES_PIPELINE_INDEXPROCESSOR_BOOLOPERATOR_H_
