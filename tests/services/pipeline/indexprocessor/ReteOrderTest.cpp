// The order in which a change reaches operators, and the count that each has when shouldFire is
// called.

#include "services/pipeline/indexprocessor/Rete.h"

#include <algorithm>
#include <functional>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using testing::ElementsAre;

// The operator's name and its count for each call of shouldFire.
using Calls = std::vector<std::string>;

class RecordingOperator : public BoolOperator {
public:
    RecordingOperator(std::string& implication, Calls& calls)
        : BoolOperator(nullptr, implication), _calls(calls) {}

    std::string name;

protected:
    bool shouldFire() override {
        _calls.push_back(name + std::to_string(_matchCount));
        return _matchCount >= _needMatch;
    }

private:
    Calls& _calls;
};

class ReteOrderTest : public testing::Test {
protected:
    // Operators named "a", "b", "c" and so on in the order of their addresses.
    std::vector<RecordingOperator*> makeOperators(std::size_t count) {
        std::string implication = "i";
        std::vector<RecordingOperator*> operators;
        for (std::size_t i = 0; i < count; ++i) {
            operators.push_back(new RecordingOperator(implication, calls));
            rs.addOperator(*operators.back());
        }
        std::sort(operators.begin(), operators.end(), std::less<>());
        for (std::size_t i = 0; i < count; ++i) {
            operators[i]->name = static_cast<char>('a' + i);
        }
        return operators;
    }

    Calls calls;
    RuleSystem rs;
    StringSet implied;
    RuleSystem::Candidates scratch;
};

TEST_F(ReteOrderTest, AConditionUpdatesItsOperatorsInTheOrderOfTheirAddresses) {
    const auto operators = makeOperators(4);
    for (const std::size_t i : {2U, 0U, 3U, 1U}) {
        rs.addCondition("x", *operators[i]);
    }
    rs.setCondition("x", scratch, implied);
    EXPECT_THAT(calls, ElementsAre("a1", "b1", "c1", "d1"));
    calls.clear();
    rs.resetCondition("x", scratch, implied);
    EXPECT_THAT(calls, ElementsAre("a0", "b0", "c0", "d0"));
}

TEST_F(ReteOrderTest, ChildrenFollowTheirParentDepthFirstInTheOrderOfTheirAddresses) {
    const auto operators = makeOperators(5);
    rs.addCondition("x", *operators[2]);
    for (const std::size_t i : {4U, 1U, 0U}) {
        operators[2]->addChild(*operators[i]);
        operators[i]->incNeedMatch();
    }
    operators[0]->addChild(*operators[3]);
    operators[3]->incNeedMatch();
    rs.setCondition("x", scratch, implied);
    EXPECT_THAT(calls, ElementsAre("c1", "a1", "d1", "b1", "e1"));
}

// The second operator is a child of the first and belongs to the same condition.
TEST_F(ReteOrderTest, AllCountsChangeBeforeTheFirstUpdate) {
    const auto operators = makeOperators(2);
    operators[0]->addChild(*operators[1]);
    operators[1]->incNeedMatch();
    rs.addCondition("x", *operators[0]);
    rs.addCondition("x", *operators[1]);
    rs.setCondition("x", scratch, implied);
    EXPECT_THAT(calls, ElementsAre("a1", "b2", "b2"));
    calls.clear();
    rs.resetCondition("x", scratch, implied);
    EXPECT_THAT(calls, ElementsAre("a0", "b0", "b0"));
}

TEST_F(ReteOrderTest, OperatorsOfOtherConditionsAreNotUpdated) {
    const auto operators = makeOperators(4);
    const char* const keywords[] = {"x", "y", "x*", "*y"};
    for (std::size_t i = 0; i < operators.size(); ++i) {
        rs.addCondition(keywords[i], *operators[i]);
    }
    rs.setCondition("x", scratch, implied);
    EXPECT_THAT(calls, ElementsAre("a1", "c1"));
    calls.clear();
    rs.resetCondition("xy", scratch, implied);
    EXPECT_THAT(calls, ElementsAre("d0", "c0"));
    calls.clear();
    rs.setCondition("z", scratch, implied);
    EXPECT_THAT(calls, ElementsAre());
}

TEST_F(ReteOrderTest, ATermUpdatesItsNameThenPatternsByGrowingPrefix) {
    const auto operators = makeOperators(6);
    const char* const keywords[] = {"xy*", "x*y*", "xyz", "*", "x*", "**"};
    for (std::size_t i = 0; i < operators.size(); ++i) {
        rs.addCondition(keywords[i], *operators[i]);
    }
    rs.setCondition("xyz", scratch, implied);
    EXPECT_THAT(calls, ElementsAre("c1", "d1", "f1", "b1", "e1", "a1"));
}

TEST_F(ReteOrderTest, ResettingAllGoesByTheNamesOfTheConditionsAndSetsTheMetaTermLast) {
    const auto operators = makeOperators(4);
    const char* const keywords[] = {"z", "meta::all", "b*", "B"};
    for (std::size_t i = 0; i < operators.size(); ++i) {
        rs.addCondition(keywords[i], *operators[i]);
    }
    rs.setCondition("z", scratch, implied);
    calls.clear();
    rs.resetAll(implied);
    EXPECT_THAT(calls, ElementsAre("d0", "c0", "b0", "a0", "b1"));
}

}  // namespace
