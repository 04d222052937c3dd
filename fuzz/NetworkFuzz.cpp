// The rule network against a model that keeps flags and counts in plain maps and tries every
// pattern for every term. Each line is a step: "+Dkeyword" adds a condition to operator D, a digit
// (a new operator if that one does not exist), "=term" sets a term, "-term" resets it, '!' calls
// resetAll, '0' calls reset and 'x' clears the rules. Other lines are ignored.

#include <algorithm>
#include <cstdint>
#include <map>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "Check.h"
#include "FuzzInput.h"
#include "FuzzTarget.h"
#include "services/pipeline/indexprocessor/Rete.h"
#include "support/MatcherOracle.h"

namespace {

using fuzz::checkEqual;
using Names = std::vector<std::string>;

bool isPattern(const std::string& keyword) {
    return keyword.find('*') != std::string::npos;
}

Names listed(const StringSet& set) {
    return Names(set.begin(), set.end());
}

struct Model {
    struct Operator {
        std::string implication;
        int need = 0;
        int count = 0;
        bool fired = false;
    };
    struct Condition {
        bool isSet = false;
        std::vector<std::size_t> operators;  // without duplicates
    };

    void add(const std::string& keyword, std::size_t op) {
        std::vector<std::size_t>& fed = conditions[keyword].operators;
        if (std::find(fed.begin(), fed.end(), op) == fed.end()) {
            fed.push_back(op);
        }
        ++operators[op].need;
        if (isPattern(keyword)) {
            patterns.push_back(keyword);
        }
    }

    void change(bool state, Condition& condition) {
        for (const std::size_t index : condition.operators) {
            Operator& op = operators[index];
            if (state != condition.isSet) {
                op.count = std::clamp(op.count + (state ? 1 : -1), 0, op.need);
            }
            const bool fires = op.count >= op.need;
            if (fires && !op.fired) {
                implied.insert(op.implication);
            } else if (op.fired && !fires) {
                implied.erase(op.implication);
            }
            op.fired = fires;
        }
        condition.isSet = state;
    }

    // Returns: whether any condition matched.
    bool change(bool state, const std::string& term) {
        bool met = false;
        for (auto& [keyword, condition] : conditions) {
            if (keyword == term || (isPattern(keyword) && oracle::match(keyword, term).matched)) {
                change(state, condition);
                met = true;
                if (state) {
                    everSet.insert(keyword);
                }
            }
        }
        return met;
    }

    void reset() {
        for (auto& [keyword, condition] : conditions) {
            change(false, condition);
        }
    }

    // The patterns whose literal prefix is a prefix of the term, shorter prefixes first.
    Names candidates(const std::string& term) const {
        Names found;
        for (std::size_t length = 0; length <= term.size(); ++length) {
            for (const std::string& pattern : patterns) {
                if (pattern.substr(0, pattern.find('*')) == term.substr(0, length)) {
                    found.push_back(pattern);
                }
            }
        }
        return found;
    }

    std::vector<Operator> operators;
    std::map<std::string, Condition> conditions;
    Names patterns;  // in the order in which they were added, with duplicates
    StringSet everSet;
    StringSet implied;
};

class Run {
public:
    void step(const std::string& line) {
        const char command = line.empty() ? ' ' : line[0];
        const std::string text = line.substr(std::min<std::size_t>(1, line.size()));
        switch (command) {
            case '+':
                add(text);
                break;
            case '=':
            case '-':
                change(command == '=', text);
                break;
            case '!':
                _network.resetAll(_implied);
                _model.reset();
                _model.change(true, META_ALL);
                break;
            case '0':
                _network.reset(_implied);
                _model.reset();
                break;
            case 'x':
                clear();
                break;
            default:
                return;
        }
        compare();
    }

private:
    void add(const std::string& text) {
        if (text.empty()) {
            return;
        }
        const std::string keyword = text.substr(1);
        const std::size_t wanted = static_cast<unsigned char>(text[0]) - std::size_t{'0'};
        const std::size_t index = std::min(wanted, _operators.size());
        std::unique_ptr<AndOperator> fresh;
        std::string implication = "i" + std::to_string(_created);
        if (index == _operators.size()) {
            fresh = std::make_unique<AndOperator>(nullptr, implication);
        }
        const bool tooMany =
            isPattern(keyword) && oracle::pieces(keyword).size() > WildcardMatcher::MAX_SUBSTRINGS;
        try {
            _network.addCondition(keyword, fresh == nullptr ? *_operators[index] : *fresh);
            fuzz::check("a refusal is expected", !tooMany);
        } catch (const std::length_error&) {
            fuzz::check("no refusal is expected", tooMany);
            return;
        }
        if (fresh != nullptr) {
            _operators.push_back(fresh.release());
            _model.operators.push_back({implication});
            ++_created;
        }
        _model.add(keyword, index);
    }

    void change(bool state, const std::string& term) {
        const bool met = _model.change(state, term);
        if (state) {
            checkEqual("setCondition", met, _network.setCondition(term, _candidates, _implied));
        } else {
            _network.resetCondition(term, _candidates, _implied);
        }
        Names patterns;
        for (const auto* const candidate : _candidates) {
            patterns.push_back(candidate->first.getOrigPattern());
        }
        checkEqual("candidates", _model.candidates(term), patterns);
    }

    // Keeps the caller's implications.
    void clear() {
        _network.clearRules();
        _operators.clear();
        const StringSet implied = _model.implied;
        _model = Model();
        _model.implied = implied;
    }

    void compare() {
        checkEqual("implications", listed(_model.implied), listed(_implied));
        checkEqual("names ever set", listed(_model.everSet), listed(_network._setConditions));
        checkEqual("number of conditions", _model.conditions.size(), _network._conditions.size());
        for (const auto& [keyword, condition] : _model.conditions) {
            const auto found = _network._conditions.find(keyword);
            fuzz::check("condition exists", found != _network._conditions.end());
            checkEqual("state of a condition", condition.isSet, found->second->isSet());
        }
        for (std::size_t i = 0; i < _operators.size(); ++i) {
            checkEqual("count", _model.operators[i].count, _operators[i]->_matchCount);
            checkEqual("need", _model.operators[i].need, _operators[i]->_needMatch);
            checkEqual("fired", _model.operators[i].fired, _operators[i]->hasFired());
        }
    }

    RuleSystem _network;
    RuleSystem::Candidates _candidates;
    StringSet _implied;
    std::vector<AndOperator*> _operators;  // owned by the network
    unsigned _created = 0;                 // operators created so far; each implies its own string
    Model _model;
};

}  // namespace

int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::FuzzInput input(data, size);
    Run run;
    while (!input.atEnd()) {
        run.step(input.lineOfText());
    }
    return 0;
}
