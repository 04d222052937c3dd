#ifndef QUELTA_SERVICES_PIPELINE_INDEXPROCESSOR_BOOLOPERATOR_H_
#define QUELTA_SERVICES_PIPELINE_INDEXPROCESSOR_BOOLOPERATOR_H_

// The operators of the rule network: an operator counts the matches that it has, fires when they
// suffice, and then holds its implications in the caller's set and counts as a match of each child.
//
// Whoever changes a count calls update afterwards; Rete.h does both for conditions.
//
// Invariant: 0 <= _matchCount <= _needMatch, unless reset or a caller's own class says otherwise.
// Operators point at children without owning them, and must not form a cycle. An update recurses
// along the children: a chain of some 200,000 operators needs more than the usual 8 MiB of stack.
//
// Not thread-safe; one thread at a time per object.

#include <cstdint>
#include <set>
#include <string>

class BoolOperator;

using StringSet = std::set<std::string>;
using OpSet = std::set<BoolOperator*>;

inline constexpr char AND_OPERATOR_TEXT[] = "AND";
// The type tag of AndOperator.
inline constexpr const char* AND_OPERATOR = AND_OPERATOR_TEXT;

// A node of the network. Derive from it to give shouldFire another meaning.
class BoolOperator {
public:
    // Makes an operator without needs or matches that implies `implication`. A parent, null
    // allowed, gets the operator as a child, and the operator needs the parent's firing then.
    BoolOperator(BoolOperator* parent, std::string& implication)
        : _needMatch(0), _matchCount(0), _fired(false), _type(nullptr) {
        addImplication(implication);
        if (parent != nullptr) {
            parent->addChild(*this);
            incNeedMatch();
        }
    }

    // Copies counts, state, implications and children; nobody's child or condition's operator.
    BoolOperator(const BoolOperator&) = default;

    virtual ~BoolOperator() = default;

    // Returns: whether the implications are in the caller's set.
    bool hasFired() { return _fired; }

    // Counts one match more, never beyond the need.
    void incCount() {
        if (_matchCount < _needMatch) {
            ++_matchCount;
        }
    }

    // Counts one match less, never below none.
    void decCount() {
        if (_matchCount > 0) {
            --_matchCount;
        }
    }

    // Counts one match more and updates.
    // Returns: whether the operator began or ceased to fire.
    bool addMatch(StringSet& implications) {
        incCount();
        return update(implications);
    }

    // Counts one match less and updates.
    // Returns: whether the operator began or ceased to fire.
    bool retractMatch(StringSet& implications) {
        decCount();
        return update(implications);
    }

    // Fires or ceases to fire as the count demands, then updates all children, depth first and in
    // pointer order; a child that is reached along several paths is updated once for each.
    // Deliberate: implications are not counted by owner; the first of two operators with the same
    // implication that ceases to fire takes it out.
    // Returns: whether this operator began or ceased to fire.
    bool update(StringSet& returnImplications);

    // Forgets all matches and updates.
    // Returns: whether the operator ceased to fire.
    bool reset(StringSet& implications) {
        _matchCount = 0;
        return update(implications);
    }

    // Adds a string to what firing implies.
    void addImplication(const std::string& implication) { _implications.insert(implication); }

    // Raises the number of matches that the operator needs.
    void incNeedMatch() { ++_needMatch; }

    // Makes `child` count this operator's firing; its need is the caller's to raise.
    // Owns: nothing; the child must live as long as this operator is updated.
    void addChild(BoolOperator& child) { _children.insert(&child); }

    // Returns: type, count, need, state and implications, like "AND 1/2 idle [a, b]".
    std::string toString() const;

protected:
    // Tells whether the operator's matches suffice.
    virtual bool shouldFire() = 0;

    std::int32_t _needMatch;   // matches needed: one per registration, one per parent
    std::int32_t _matchCount;  // matches present, 0.._needMatch
    bool _fired;               // whether _implications are in the caller's set
    StringSet _implications;
    OpSet _children;    // not owned
    const char* _type;  // null, or the type tag
};

// Fires while all the matches that it needs are present; without needs, from its first update.
class AndOperator : public BoolOperator {
public:
    // As BoolOperator's constructor.
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
