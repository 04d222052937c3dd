#ifndef QUELTA_SERVICES_PIPELINE_INDEXPROCESSOR_RETE_H_
#define QUELTA_SERVICES_PIPELINE_INDEXPROCESSOR_RETE_H_

// The rule network: named conditions, terms or `*` patterns, feed boolean operators. An operator
// that has all the matches it needs fires and inserts its implications into the caller's set. When
// it stops firing, it removes them.
//
//     RuleSystem rules;
//     StringSet implications;
//     std::string implication = "archive";
//     AndOperator& rule = *new AndOperator(nullptr, implication);  // the system deletes it
//     rules.addCondition("*.gz", rule);
//     rules.addCondition("large", rule);
//     rules.resetAll(implications);
//     RuleSystem::Candidates candidates;
//     rules.setCondition("a.gz", candidates, implications);
//     rules.setCondition("large", candidates, implications);    // {"archive"}
//     rules.resetCondition("large", candidates, implications);  // {}
//
// Create operators with new, pass them to addCondition, call resetAll, then setCondition and
// resetCondition for each term. A term affects the condition of that name and all pattern
// conditions that match; the patterns are found through a trie under their literal prefix.
//
// A RuleSystem owns its operators and conditions. Operators and conditions only point at each
// other; operators must not form a cycle. A change updates only the operators reachable from the
// conditions it affects.
//
// Not thread-safe; one thread at a time per object.

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "services/pipeline/indexprocessor/BoolOperator.h"
#include "util/Assert.h"
#include "util/TrieNode.h"
#include "util/WildcardMatcher.h"

class Conditional;

// Conditions by name.
using ConditionMap = std::map<std::string, Conditional*>;
// The compiled pattern and the condition of each pattern, under its literal prefix.
using PrefixTrie = TrieNode<std::pair<WildcardMatcher, Conditional*>>;

// The term that is always set after RuleSystem::resetAll.
inline const std::string META_ALL = "meta::all";

// A named condition, set or not, and the operators that it feeds.
class Conditional {
public:
    // A condition that is not set and feeds nothing.
    explicit Conditional(const std::string& name) : _name(name), _setValue(false) {}

    // Replaces `out` by the name.
    void getName(std::string& out) { out = _name; }

    // Returns: whether the condition is set.
    bool isSet() { return _setValue; }

    // Makes the condition feed `op`, which is not owned.
    void addOperator(BoolOperator& op) { _operators.insert(&op); }

    // Sets the condition. If it was not set, each of its operators gets a match. All of them are
    // updated, whether there was a change or not.
    void set(StringSet& implications) { changeState(true, implications); }
    // Resets the condition. If it was set, each of its operators loses a match. All of them are
    // updated, whether there was a change or not.
    void reset(StringSet& implications) { changeState(false, implications); }

    // Returns: name, state and number of operators, like "name = set (2 operators)".
    std::string toString() const;

private:
    void changeState(bool newState, StringSet& implications);

    std::string _name;  // the term, or the whole pattern
    bool _setValue;
    OpSet _operators;  // not owned
};

// The network as a whole.
class RuleSystem {
public:
    // The candidates of a lookup: pointers into the trie, valid until a condition is added.
    using Candidates = std::vector<std::pair<WildcardMatcher, Conditional*>*>;

    // A system without conditions and operators.
    RuleSystem() = default;

    // An empty system, like `other`.
    // Requires: `other` has no operators, as these cannot be copied; asserted.
    RuleSystem(const RuleSystem& other);
    RuleSystem& operator=(const RuleSystem&) = delete;

    // Deletes all conditions and operators.
    ~RuleSystem() { clearRules(); }

    // Takes ownership of `op`, created with new. Adding it again has no effect.
    void addOperator(BoolOperator& op) { _allOperators.insert(_allOperators.end(), &op); }

    // Makes the condition `keyword` feed `op`, and takes ownership of `op`. A keyword with a `*`
    // is a pattern, and a candidate once for each time it is added.
    // Deliberate: each call raises the need, even if the condition already feeds `op` or is already
    // set; the match is not counted until the condition is next set.
    // Errors: std::length_error for a pattern with more than WildcardMatcher::MAX_SUBSTRINGS
    // segments, before anything has changed. std::bad_alloc: completed steps are kept and nothing
    // dangles. `op` may or may not be owned then; call addOperator first if you need to know.
    void addCondition(const std::string& keyword, BoolOperator& op);

    // Sets the condition named `term` and all pattern conditions that match it. `wildcardMatches`
    // is replaced by the candidates, matching or not.
    // Returns: whether there was such a condition.
    // Deliberate: a condition is either set or not. A pattern condition that two terms set is reset
    // by the first of them that is reset.
    bool setCondition(const std::string& term, Candidates& wildcardMatches,
                      StringSet& implications) {
        return changeCondition(true, term, wildcardMatches, implications);
    }

    // Resets the conditions that setCondition would set, whether or not this term has set them.
    void resetCondition(const std::string& term, Candidates& wildcardMatches,
                        StringSet& implications) {
        changeCondition(false, term, wildcardMatches, implications);
    }

    // Resets all conditions in the order of their names, then sets META_ALL.
    void resetAll(StringSet& implications);

    // Resets all conditions in the order of their names, and sets nothing.
    void reset(StringSet& implications);

    // Deletes all conditions and operators; the system is as new. The caller's implications stay.
    void clearRules();

    // Returns: a line for each condition, then one for each operator.
    std::string toString();

private:
    // How many candidates ahead a lookup prefetches. The matchers of a large network lie far apart
    // in memory.
    static constexpr std::size_t MATCHER_AHEAD = 16;
    static constexpr std::size_t SEGMENT_AHEAD = 8;

    bool changeCondition(bool newState, const std::string& term, Candidates& wildcardMatches,
                         StringSet& implications);
    void changeOneCondition(bool newState, Conditional& cond, StringSet& implications);

    OpSet _allOperators;       // owned
    ConditionMap _conditions;  // by name; owned
    PrefixTrie _wildcardTrie;  // pattern conditions, under their literal prefix
    // Deliberate: names that have ever been set; only clearRules removes any.
    StringSet _setConditions;
};

inline void Conditional::changeState(bool newState, StringSet& implications) {
    if (_setValue != newState) {
        _setValue = newState;
        for (BoolOperator* const op : _operators) {
            if (newState) {
                op->incCount();
            } else {
                op->decCount();
            }
        }
    }
    for (BoolOperator* const op : _operators) {
        op->update(implications);
    }
}

inline std::string Conditional::toString() const {
    return _name + (_setValue ? " = set (" : " = unset (") + std::to_string(_operators.size()) +
           " operators)";
}

inline RuleSystem::RuleSystem(const RuleSystem& other) : _allOperators(other._allOperators) {
    // The set is copied only to be tested, so that the assertion's text names the field.
    QUELTA_ASSERT(_allOperators.empty());
}

inline void RuleSystem::addCondition(const std::string& keyword, BoolOperator& op) {
    // A pattern that is refused must change nothing, so it is compiled first.
    std::optional<WildcardMatcher> matcher;
    if (keyword.find('*') != std::string::npos) {
        matcher.emplace(keyword.c_str());
    }
    addOperator(op);
    auto place = _conditions.find(keyword);
    if (place == _conditions.end()) {
        // Names often arrive in order; the hint then saves a second search.
        place = _conditions.emplace_hint(place, keyword, new Conditional(keyword));
    }
    Conditional* const condition = place->second;
    condition->addOperator(op);
    op.incNeedMatch();
    if (matcher) {
        const std::string prefix = matcher->getPatternPrefix();
        _wildcardTrie.addData(prefix, std::make_pair(std::move(*matcher), condition));
    }
}

inline bool RuleSystem::changeCondition(bool newState, const std::string& term,
                                        Candidates& wildcardMatches, StringSet& implications) {
    // The term may be an implication that is about to be erased.
    const std::string text = term;  // NOLINT(performance-unnecessary-copy-initialization)
    bool met = false;
    const auto literal = _conditions.find(text);
    if (literal != _conditions.end()) {
        changeOneCondition(newState, *literal->second, implications);
        met = true;
    }
    _wildcardTrie.findData(text, wildcardMatches);
    const std::size_t length = std::strlen(text.c_str());
    const std::size_t last = wildcardMatches.size() - 1;
    for (std::size_t i = 0; i < wildcardMatches.size(); ++i) {
        wildcardMatches[std::min(i + MATCHER_AHEAD, last)]->first.prefetch();
        wildcardMatches[std::min(i + SEGMENT_AHEAD, last)]->first.prefetchSegment();
        const auto& [matcher, condition] = *wildcardMatches[i];
        if (matcher.isMatch(text.c_str(), length)) {
            changeOneCondition(newState, *condition, implications);
            met = true;
        }
    }
    return met;
}

inline void RuleSystem::changeOneCondition(bool newState, Conditional& cond,
                                           StringSet& implications) {
    if (!newState) {
        cond.reset(implications);
        return;
    }
    cond.set(implications);
    std::string name;
    cond.getName(name);
    _setConditions.insert(_setConditions.end(), std::move(name));
}

inline void RuleSystem::reset(StringSet& implications) {
    for (const auto& [name, cond] : _conditions) {
        changeOneCondition(false, *cond, implications);
    }
}

inline void RuleSystem::resetAll(StringSet& implications) {
    reset(implications);
    Candidates wildcardMatches;
    setCondition(META_ALL, wildcardMatches, implications);
}

inline void RuleSystem::clearRules() {
    for (const auto& [name, cond] : _conditions) {
        delete cond;
    }
    for (BoolOperator* const op : _allOperators) {
        delete op;
    }
    _allOperators.clear();
    _setConditions.clear();
    _conditions.clear();
    _wildcardTrie.clear();
}

inline std::string RuleSystem::toString() {
    std::string text;
    for (const auto& [name, cond] : _conditions) {
        text += cond->toString() + '\n';
    }
    for (const BoolOperator* const op : _allOperators) {
        text += op->toString() + '\n';
    }
    return text;
}

#endif  // QUELTA_SERVICES_PIPELINE_INDEXPROCESSOR_RETE_H_
