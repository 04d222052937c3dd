// Compares the network with two models: one recounts everything from facts after each step, the
// other follows the rules of propagation literally, by recursion.

#include <algorithm>
#include <functional>
#include <map>
#include <memory>
#include <random>
#include <set>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "services/pipeline/indexprocessor/Rete.h"
#include "support/MatcherOracle.h"

namespace {

const char* const KEYWORDS[] = {"a",  "b",   "ab",  "ba",  "abb", "meta::all", "*",    "a*",
                                "*b", "ab*", "a*b", "*a*", "b**", "m*l",       "*a*b", "aa*"};
const char* const TERMS[] = {"a",  "b",   "ab", "ba", "abb",  "aab", "bab", "meta::all",
                             "*b", "a*b", "",   "c",  "aabb", "mtl", "aa"};

bool isPattern(const std::string& keyword) {
    return keyword.find('*') != std::string::npos;
}

// Whether a term matches the condition of a keyword, by its name or as a pattern.
bool matches(const std::string& keyword, const std::string& term) {
    return keyword == term || (isPattern(keyword) && oracle::match(keyword, term).matched);
}

// The network under test, with access to the state that both models compare.
struct Network {
    AndOperator* add(BoolOperator* parent, const std::string& implication) {
        std::string text = implication;
        auto* const op = new AndOperator(parent, text);
        rs.addOperator(*op);
        operators.push_back(op);
        return op;
    }

    RuleSystem rs;
    StringSet implied;
    RuleSystem::Candidates scratch;
    std::vector<AndOperator*> operators;
};

// Facts: which conditions are set and which links to operators exist. Counts, firing and
// implications are recomputed from them.
class RecountModel {
public:
    struct Operator {
        std::string implication;
        std::vector<int> parents;
        int need = 0;
        bool fired = false;
    };

    void addCondition(const std::string& keyword, int op) {
        conditions[keyword];
        links[{keyword, op}];
        ++operators[static_cast<std::size_t>(op)].need;
    }

    void change(bool state, const std::string& term) {
        std::set<int> touched;
        for (auto& [keyword, set] : conditions) {
            if (matches(keyword, term)) {
                changeOne(state, keyword, set, touched);
            }
        }
        settle(touched);
    }

    void resetAll() {
        std::set<int> touched;
        for (auto& [keyword, set] : conditions) {
            changeOne(false, keyword, set, touched);
        }
        settle(touched);
        change(true, "meta::all");
    }

    int count(int op) const {
        int present = 0;
        for (const auto& [link, counted] : links) {
            present += link.second == op && counted;
        }
        for (const int parent : operators[static_cast<std::size_t>(op)].parents) {
            present += operators[static_cast<std::size_t>(parent)].fired;
        }
        return present;
    }

    StringSet implications() const {
        StringSet all;
        for (const Operator& op : operators) {
            if (op.fired) {
                all.insert(op.implication);
            }
        }
        return all;
    }

    std::vector<Operator> operators;  // parents before children
    std::map<std::string, bool> conditions;
    std::set<std::string> everSet;

private:
    void changeOne(bool state, const std::string& keyword, bool& set, std::set<int>& touched) {
        for (auto& [link, counted] : links) {
            if (link.first == keyword) {
                counted = set == state ? counted : state;
                touched.insert(link.second);
            }
        }
        set = state;
        if (state) {
            everSet.insert(keyword);
        }
    }

    // Recomputes whether the touched operators and their descendants fire; the others do not
    // change.
    void settle(std::set<int> touched) {
        for (std::size_t i = 0; i < operators.size(); ++i) {
            Operator& op = operators[i];
            const int self = static_cast<int>(i);
            for (const int parent : op.parents) {
                if (touched.count(parent) != 0) {
                    touched.insert(self);
                }
            }
            if (touched.count(self) != 0) {
                op.fired = count(self) >= op.need;
            }
        }
    }

    std::map<std::pair<std::string, int>, bool> links;
};

class RecountRun {
public:
    explicit RecountRun(unsigned seed) : draw(seed) { makeOperators(); }

    void step() {
        switch (draw() % 10) {
            case 0:
            case 1:
                add();
                break;
            case 2:
                network.rs.resetAll(network.implied);
                model.resetAll();
                break;
            case 3:
                if (draw() % 8 == 0) {
                    network.rs.clearRules();
                    network.operators.clear();
                    network.implied.clear();
                    model = RecountModel();
                    makeOperators();
                }
                break;
            case 4:
            case 5:
            case 6: {
                const std::string term = TERMS[draw() % std::size(TERMS)];
                network.rs.resetCondition(term, network.scratch, network.implied);
                model.change(false, term);
                break;
            }
            default: {
                const std::string term = TERMS[draw() % std::size(TERMS)];
                network.rs.setCondition(term, network.scratch, network.implied);
                model.change(true, term);
            }
        }
    }

    void compare() {
        ASSERT_EQ(model.implications(), network.implied);
        ASSERT_EQ(model.everSet, network.rs._setConditions);
        ASSERT_EQ(model.conditions.size(), network.rs._conditions.size());
        for (const auto& [keyword, set] : model.conditions) {
            ASSERT_EQ(set, network.rs._conditions.at(keyword)->isSet()) << keyword;
        }
        for (std::size_t i = 0; i < model.operators.size(); ++i) {
            ASSERT_EQ(model.count(static_cast<int>(i)), network.operators[i]->_matchCount) << i;
            ASSERT_EQ(model.operators[i].need, network.operators[i]->_needMatch) << i;
            ASSERT_EQ(model.operators[i].fired, network.operators[i]->hasFired()) << i;
        }
    }

    int firings() const { return static_cast<int>(network.implied.size()); }

private:
    // Each operator may have up to two parents among the earlier ones and needs all of them to
    // fire.
    void makeOperators() {
        for (int i = 0; i < 8; ++i) {
            RecountModel::Operator op;
            op.implication = "i" + std::to_string(i);
            AndOperator* parent = nullptr;
            if (i > 0 && draw() % 2 == 0) {
                const int first = static_cast<int>(draw() % static_cast<unsigned>(i));
                parent = network.operators[static_cast<std::size_t>(first)];
                op.parents.push_back(first);
            }
            AndOperator* const added = network.add(parent, op.implication);
            const int second = i == 0 ? 0 : static_cast<int>(draw() % static_cast<unsigned>(i));
            if (i > 0 && draw() % 3 == 0 && (op.parents.empty() || op.parents[0] != second)) {
                network.operators[static_cast<std::size_t>(second)]->addChild(*added);
                added->incNeedMatch();
                op.parents.push_back(second);
            }
            op.need = static_cast<int>(op.parents.size());
            model.operators.push_back(op);
        }
        // An operator without a condition would fire on its parents' first update, or never.
        for (int i = 0; i < 8; ++i) {
            addTo(i);
        }
    }

    void add() { addTo(static_cast<int>(draw() % 8)); }

    // Resetting a condition that was set before the operator was added would remove a match it
    // never gave. The model cannot express that, so reset it first.
    void addTo(int op) {
        const std::string keyword = KEYWORDS[draw() % std::size(KEYWORDS)];
        if (model.conditions[keyword]) {
            network.rs.resetCondition(keyword, network.scratch, network.implied);
            model.change(false, keyword);
        }
        network.rs.addCondition(keyword, *network.operators[static_cast<std::size_t>(op)]);
        model.addCondition(keyword, op);
    }

    std::mt19937 draw;
    Network network;
    RecountModel model;
};

TEST(ReteModelTest, AgreesWithAModelThatRecountsEverything) {
    int firings = 0;
    for (unsigned seed = 1; seed <= 3000; ++seed) {
        SCOPED_TRACE("seed " + std::to_string(seed));
        RecountRun run(seed);
        for (int i = 0; i < 40; ++i) {
            SCOPED_TRACE("step " + std::to_string(i));
            run.step();
            ASSERT_NO_FATAL_FAILURE(run.compare());
            firings += run.firings();
        }
    }
    EXPECT_GT(firings, 10000);
}

// Follows the rules literally. Covers shared implications, children whose need was not raised, and
// counts that reach their bounds.
class LiteralModel {
public:
    struct Operator {
        int need = 0;
        int count = 0;
        bool fired = false;
        std::set<std::string> implications;
        std::vector<int> children;  // in the order in which the network visits them
    };
    struct Condition {
        bool set = false;
        std::vector<int> operators;  // likewise
    };

    void update(int index) {
        Operator& op = at(index);
        const bool should = op.count >= op.need;
        if (should && !op.fired) {
            op.fired = true;
            implied.insert(op.implications.begin(), op.implications.end());
            for (const int child : op.children) {
                at(child).count += at(child).count < at(child).need ? 1 : 0;
            }
        } else if (!should && op.fired) {
            op.fired = false;
            for (const std::string& implication : op.implications) {
                implied.erase(implication);
            }
            for (const int child : op.children) {
                at(child).count -= at(child).count > 0 ? 1 : 0;
            }
        }
        for (const int child : op.children) {
            update(child);
        }
    }

    void changeOne(bool state, const std::string& keyword) {
        Condition& condition = conditions.at(keyword);
        for (const int op : condition.operators) {
            if (state && !condition.set) {
                at(op).count += at(op).count < at(op).need ? 1 : 0;
            } else if (!state && condition.set) {
                at(op).count -= at(op).count > 0 ? 1 : 0;
            }
        }
        condition.set = state;
        for (const int op : condition.operators) {
            update(op);
        }
    }

    // Candidates are ordered by growing prefix, and for one prefix in the order in which they were
    // added.
    void change(bool state, const std::string& term) {
        if (conditions.count(term) != 0) {
            changeOne(state, term);
        }
        for (std::size_t length = 0; length <= term.size(); ++length) {
            for (const std::string& pattern : patterns) {
                if (pattern.substr(0, pattern.find('*')) == term.substr(0, length) &&
                    oracle::match(pattern, term).matched) {
                    changeOne(state, pattern);
                }
            }
        }
    }

    void resetAll() {
        for (auto& [keyword, condition] : conditions) {
            changeOne(false, keyword);
        }
        change(true, "meta::all");
    }

    Operator& at(int index) { return operators[static_cast<std::size_t>(index)]; }

    std::vector<Operator> operators;
    std::map<std::string, Condition> conditions;
    std::vector<std::string> patterns;
    std::set<std::string> implied;
};

class LiteralRun {
public:
    explicit LiteralRun(unsigned seed) : draw(seed) {
        for (int i = 0; i < 7; ++i) {
            makeOperator(i);
        }
    }

    void step() {
        const std::string term = TERMS[draw() % std::size(TERMS)];
        switch (draw() % 8) {
            case 0:
            case 1:
                add();
                break;
            case 2:
                network.rs.resetAll(network.implied);
                model.resetAll();
                break;
            case 3:
            case 4:
                network.rs.resetCondition(term, network.scratch, network.implied);
                model.change(false, term);
                break;
            default:
                network.rs.setCondition(term, network.scratch, network.implied);
                model.change(true, term);
        }
    }

    void compare() {
        ASSERT_EQ(model.implied, network.implied);
        for (std::size_t i = 0; i < model.operators.size(); ++i) {
            ASSERT_EQ(model.operators[i].count, network.operators[i]->_matchCount) << i;
            ASSERT_EQ(model.operators[i].need, network.operators[i]->_needMatch) << i;
            ASSERT_EQ(model.operators[i].fired, network.operators[i]->hasFired()) << i;
        }
    }

private:
    void makeOperator(int i) {
        LiteralModel::Operator op;
        const std::string implication = "i" + std::to_string(draw() % 4);
        op.implications = {implication, "own" + std::to_string(i)};
        AndOperator* const added = network.add(nullptr, implication);
        added->addImplication("own" + std::to_string(i));
        for (int parent = 0; parent < i; ++parent) {
            if (draw() % 3 == 0) {
                network.operators[static_cast<std::size_t>(parent)]->addChild(*added);
                model.at(parent).children.push_back(i);
                inPointerOrder(model.at(parent).children);
                if (draw() % 3 != 0) {
                    added->incNeedMatch();
                    ++op.need;
                }
            }
        }
        model.operators.push_back(op);
    }

    void add() {
        const std::string keyword = KEYWORDS[draw() % std::size(KEYWORDS)];
        const int op = static_cast<int>(draw() % network.operators.size());
        network.rs.addCondition(keyword, *network.operators[static_cast<std::size_t>(op)]);
        ++model.at(op).need;
        std::vector<int>& fed = model.conditions[keyword].operators;
        if (std::find(fed.begin(), fed.end(), op) == fed.end()) {
            fed.push_back(op);
            inPointerOrder(fed);
        }
        if (isPattern(keyword)) {
            model.patterns.push_back(keyword);
        }
    }

    void inPointerOrder(std::vector<int>& indices) {
        std::sort(indices.begin(), indices.end(), [this](int a, int b) {
            const auto& all = network.operators;
            return std::less<>()(all[static_cast<std::size_t>(a)],
                                 all[static_cast<std::size_t>(b)]);
        });
    }

    std::mt19937 draw;
    Network network;
    LiteralModel model;
};

TEST(ReteModelTest, AgreesWithALiteralModelOfTheRules) {
    for (unsigned seed = 1; seed <= 3000; ++seed) {
        SCOPED_TRACE("seed " + std::to_string(seed));
        LiteralRun run(seed);
        for (int i = 0; i < 40; ++i) {
            SCOPED_TRACE("step " + std::to_string(i));
            run.step();
            ASSERT_NO_FATAL_FAILURE(run.compare());
        }
    }
}

}  // namespace
