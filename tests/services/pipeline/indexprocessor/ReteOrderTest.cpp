// The order in which a change reaches operators, and what each of them sees when it is asked.

#include "services/pipeline/indexprocessor/Rete.h"

#include <algorithm>
#include <functional>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using testing::ElementsAre;

// An operator's name and the count that it had, for each time that one was asked.
using Asked = std::vector<std::string>;

class RecordingOperator : public BoolOperator {
public:
    RecordingOperator(std::string& implication, Asked& asked)
        : BoolOperator(nullptr, implication), _asked(asked) {}

    std::string name;

protected:
    bool shouldFire() override {
        _asked.push_back(name + std::to_string(_matchCount));
        return _matchCount >= _needMatch;
    }

private:
    Asked& _asked;
};

class ReteOrderTest : public testing::Test {
protected:
    // Operators that are called "a", "b", "c" and so on in the order of their addresses.
    std::vector<RecordingOperator*> makeOperators(std::size_t count) {
        std::string implication = "i";
        std::vector<RecordingOperator*> made;
        for (std::size_t i = 0; i < count; ++i) {
            made.push_back(new RecordingOperator(implication, asked));
            rs.addOperator(*made.back());
        }
        std::sort(made.begin(), made.end(), std::less<>());
        for (std::size_t i = 0; i < count; ++i) {
            made[i]->name = static_cast<char>('a' + i);
        }
        return made;
    }

    Asked asked;
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
    EXPECT_THAT(asked, ElementsAre("a1", "b1", "c1", "d1"));
    asked.clear();
    rs.resetCondition("x", scratch, implied);
    EXPECT_THAT(asked, ElementsAre("a0", "b0", "c0", "d0"));
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
    EXPECT_THAT(asked, ElementsAre("c1", "a1", "d1", "b1", "e1"));
}

// The second operator is a child of the first and fed by the same condition.
TEST_F(ReteOrderTest, AllCountsChangeBeforeTheFirstUpdate) {
    const auto operators = makeOperators(2);
    operators[0]->addChild(*operators[1]);
    operators[1]->incNeedMatch();
    rs.addCondition("x", *operators[0]);
    rs.addCondition("x", *operators[1]);
    rs.setCondition("x", scratch, implied);
    EXPECT_THAT(asked, ElementsAre("a1", "b2", "b2"));
    asked.clear();
    rs.resetCondition("x", scratch, implied);
    EXPECT_THAT(asked, ElementsAre("a0", "b0", "b0"));
}

TEST_F(ReteOrderTest, OperatorsOfOtherConditionsAreLeftAlone) {
    const auto operators = makeOperators(4);
    const char* const keywords[] = {"x", "y", "x*", "*y"};
    for (std::size_t i = 0; i < operators.size(); ++i) {
        rs.addCondition(keywords[i], *operators[i]);
    }
    rs.setCondition("x", scratch, implied);
    EXPECT_THAT(asked, ElementsAre("a1", "c1"));
    asked.clear();
    rs.resetCondition("xy", scratch, implied);
    EXPECT_THAT(asked, ElementsAre("d0", "c0"));
    asked.clear();
    rs.setCondition("z", scratch, implied);
    EXPECT_THAT(asked, ElementsAre());
}

TEST_F(ReteOrderTest, ATermMeetsItsNameThenPatternsByGrowingPrefix) {
    const auto operators = makeOperators(6);
    const char* const keywords[] = {"xy*", "x*y*", "xyz", "*", "x*", "**"};
    for (std::size_t i = 0; i < operators.size(); ++i) {
        rs.addCondition(keywords[i], *operators[i]);
    }
    rs.setCondition("xyz", scratch, implied);
    EXPECT_THAT(asked, ElementsAre("c1", "d1", "f1", "b1", "e1", "a1"));
}

TEST_F(ReteOrderTest, ResettingAllGoesByTheNamesOfTheConditionsAndSetsTheMetaTermLast) {
    const auto operators = makeOperators(4);
    const char* const keywords[] = {"z", "meta::all", "b*", "B"};
    for (std::size_t i = 0; i < operators.size(); ++i) {
        rs.addCondition(keywords[i], *operators[i]);
    }
    rs.setCondition("z", scratch, implied);
    asked.clear();
    rs.resetAll(implied);
    EXPECT_THAT(asked, ElementsAre("d0", "c0", "b0", "a0", "b1"));
}

}  // namespace
