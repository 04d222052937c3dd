#include "services/pipeline/indexprocessor/Rete.h"

#include <sys/mman.h>
#include <unistd.h>

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <new>
#include <set>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/FieldOrder.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

// The public types and signatures.
template <typename Class, typename Result, typename... Arguments>
using Method = Result (Class::*)(Arguments...);
using Scratch = std::vector<std::pair<WildcardMatcher, Conditional*>*>;
using Text = const std::string&;
static_assert(std::is_same_v<StringSet, std::set<std::string>>);
static_assert(std::is_same_v<OpSet, std::set<BoolOperator*>>);
static_assert(std::is_same_v<ConditionMap, std::map<std::string, Conditional*>>);
static_assert(std::is_same_v<PrefixTrie, TrieNode<std::pair<WildcardMatcher, Conditional*>>>);
static_assert(std::is_same_v<decltype(AND_OPERATOR), const char* const>);
static_assert(std::is_same_v<decltype(META_ALL), const std::string>);

static_assert(std::is_abstract_v<BoolOperator> && std::has_virtual_destructor_v<BoolOperator>);
static_assert(std::is_constructible_v<AndOperator, BoolOperator*, std::string&>);
static_assert(std::is_same_v<decltype(&BoolOperator::hasFired), Method<BoolOperator, bool>>);
static_assert(std::is_same_v<decltype(&BoolOperator::incCount), Method<BoolOperator, void>>);
static_assert(std::is_same_v<decltype(&BoolOperator::decCount), Method<BoolOperator, void>>);
using Updating = Method<BoolOperator, bool, StringSet&>;
static_assert(std::is_same_v<decltype(&BoolOperator::addMatch), Updating>);
static_assert(std::is_same_v<decltype(&BoolOperator::retractMatch), Updating>);
static_assert(std::is_same_v<decltype(&BoolOperator::update), Updating>);
static_assert(std::is_same_v<decltype(&BoolOperator::reset), Updating>);
static_assert(
    std::is_same_v<decltype(&BoolOperator::addImplication), Method<BoolOperator, void, Text>>);
static_assert(std::is_same_v<decltype(&BoolOperator::incNeedMatch), Method<BoolOperator, void>>);
static_assert(
    std::is_same_v<decltype(&BoolOperator::addChild), Method<BoolOperator, void, BoolOperator&>>);
static_assert(
    std::is_same_v<decltype(&BoolOperator::toString), std::string (BoolOperator::*)() const>);
static_assert(std::is_same_v<decltype(&AndOperator::shouldFire), Method<AndOperator, bool>>);

static_assert(!std::is_polymorphic_v<Conditional> && std::is_copy_constructible_v<Conditional>);
static_assert(std::is_constructible_v<Conditional, Text>);
static_assert(
    std::is_same_v<decltype(&Conditional::getName), Method<Conditional, void, std::string&>>);
static_assert(std::is_same_v<decltype(&Conditional::isSet), Method<Conditional, bool>>);
static_assert(
    std::is_same_v<decltype(&Conditional::addOperator), Method<Conditional, void, BoolOperator&>>);
static_assert(
    std::is_same_v<decltype(&Conditional::toString), std::string (Conditional::*)() const>);

static_assert(!std::is_polymorphic_v<RuleSystem> && std::is_copy_constructible_v<RuleSystem>);
static_assert(
    std::is_same_v<decltype(&RuleSystem::addOperator), Method<RuleSystem, void, BoolOperator&>>);
static_assert(std::is_same_v<decltype(&RuleSystem::addCondition),
                             Method<RuleSystem, void, Text, BoolOperator&>>);
static_assert(std::is_same_v<decltype(&RuleSystem::setCondition),
                             Method<RuleSystem, bool, Text, Scratch&, StringSet&>>);
static_assert(std::is_same_v<decltype(&RuleSystem::resetCondition),
                             Method<RuleSystem, void, Text, Scratch&, StringSet&>>);
static_assert(
    std::is_same_v<decltype(&RuleSystem::resetAll), Method<RuleSystem, void, StringSet&>>);
static_assert(std::is_same_v<decltype(&RuleSystem::reset), Method<RuleSystem, void, StringSet&>>);
static_assert(std::is_same_v<decltype(&RuleSystem::clearRules), Method<RuleSystem, void>>);
static_assert(std::is_same_v<decltype(&RuleSystem::toString), Method<RuleSystem, std::string>>);

// A network with the caller's implications and scratch space.
class ReteTest : public testing::Test {
protected:
    AndOperator& makeOperator(std::string implication, BoolOperator* parent = nullptr) {
        auto* const op = new AndOperator(parent, implication);
        rs.addOperator(*op);
        return *op;
    }

    AndOperator& rule(const std::string& keyword, const std::string& implication) {
        AndOperator& op = makeOperator(implication);
        rs.addCondition(keyword, op);
        return op;
    }

    bool set(const std::string& term) { return rs.setCondition(term, scratch, implied); }
    void reset(const std::string& term) { rs.resetCondition(term, scratch, implied); }

    RuleSystem rs;
    StringSet implied;
    RuleSystem::Candidates scratch;
};

// Fires while it has any match. Counts the calls of shouldFire and of the destructor.
class OrOperator : public BoolOperator {
public:
    OrOperator(BoolOperator* parent, std::string& implication, int* destroyed = nullptr)
        : BoolOperator(parent, implication), _destroyed(destroyed) {}
    OrOperator(const OrOperator&) = default;
    ~OrOperator() override {
        if (_destroyed != nullptr) {
            ++*_destroyed;
        }
    }

    int calls = 0;

protected:
    bool shouldFire() override {
        ++calls;
        return _matchCount > 0;
    }

private:
    int* _destroyed;
};

TEST_F(ReteTest, ConstantsHaveTheirValues) {
    EXPECT_STREQ("AND", AND_OPERATOR);
    EXPECT_EQ("meta::all", META_ALL);
}

TEST_F(ReteTest, ANewOperatorNeedsNothingAndHasNotFired) {
    std::string implication = "i";
    AndOperator op(nullptr, implication);
    EXPECT_EQ(0, op._needMatch);
    EXPECT_EQ(0, op._matchCount);
    EXPECT_FALSE(op._fired);
    EXPECT_FALSE(op.hasFired());
    EXPECT_THAT(op._implications, ElementsAre("i"));
    EXPECT_THAT(op._children, IsEmpty());
    EXPECT_EQ(AND_OPERATOR, op._type);
    OrOperator plain(nullptr, implication);
    EXPECT_EQ(nullptr, plain._type);
}

TEST_F(ReteTest, EachClassKeepsItsFieldsInOrder) {
    std::string implication = "i";
    const AndOperator op(nullptr, implication);
    static_assert(std::is_same_v<decltype(op._needMatch), std::int32_t>);
    static_assert(std::is_same_v<decltype(op._matchCount), std::int32_t>);
    EXPECT_TRUE(standInOrder({&op._needMatch, &op._matchCount, &op._fired, &op._implications,
                              &op._children, &op._type}));
    static_assert(sizeof(AndOperator) == sizeof(BoolOperator));
    const Conditional condition("a");
    EXPECT_TRUE(standInOrder({&condition._name, &condition._setValue, &condition._operators}));
    EXPECT_TRUE(
        standInOrder({&rs._allOperators, &rs._conditions, &rs._wildcardTrie, &rs._setConditions}));
}

TEST_F(ReteTest, ANewConditionIsNotSetAndFeedsNothing) {
    const std::string name = "a*";
    Conditional condition(name);
    std::string out = "stale";
    condition.getName(out);
    EXPECT_EQ("a*", out);
    EXPECT_FALSE(condition._setValue);
    EXPECT_FALSE(condition.isSet());
    EXPECT_THAT(condition._operators, IsEmpty());
}

TEST_F(ReteTest, ANewSystemIsEmpty) {
    EXPECT_THAT(rs._allOperators, IsEmpty());
    EXPECT_THAT(rs._conditions, IsEmpty());
    EXPECT_THAT(rs._setConditions, IsEmpty());
    EXPECT_TRUE(rs._wildcardTrie._dataList.empty());
    for (const PrefixTrie* const child : rs._wildcardTrie._children) {
        EXPECT_EQ(nullptr, child);
    }
}

TEST_F(ReteTest, AnAndOperatorComparesCountsWithTheirSign) {
    std::string implication = "i";
    AndOperator op(nullptr, implication);
    op._matchCount = -1;
    EXPECT_FALSE(op.shouldFire());
    op._needMatch = -1;
    EXPECT_TRUE(op.shouldFire());
    op.decCount();
    op.incCount();
    EXPECT_EQ(-1, op._matchCount);
}

TEST_F(ReteTest, CountsStayBetweenZeroAndTheNeed) {
    std::string implication = "i";
    AndOperator op(nullptr, implication);
    op.incCount();
    EXPECT_EQ(0, op._matchCount);
    op.incNeedMatch();
    op.incNeedMatch();
    for (const int expected : {1, 2, 2}) {
        op.incCount();
        EXPECT_EQ(expected, op._matchCount);
    }
    for (const int expected : {1, 0, 0}) {
        op.decCount();
        EXPECT_EQ(expected, op._matchCount);
    }
}

TEST_F(ReteTest, AnAndOperatorWithoutNeedsFiresOnItsFirstUpdate) {
    std::string implication = "i";
    AndOperator op(nullptr, implication);
    EXPECT_TRUE(op.shouldFire());
    EXPECT_TRUE(op.update(implied));
    EXPECT_TRUE(op.hasFired());
    EXPECT_THAT(implied, ElementsAre("i"));
    EXPECT_FALSE(op.update(implied));
}

TEST_F(ReteTest, AddMatchRetractMatchAndResetCountAndUpdate) {
    std::string implication = "i";
    AndOperator op(nullptr, implication);
    op.incNeedMatch();
    op.incNeedMatch();
    EXPECT_FALSE(op.addMatch(implied));
    EXPECT_TRUE(op.addMatch(implied));
    EXPECT_THAT(implied, ElementsAre("i"));
    EXPECT_TRUE(op.retractMatch(implied));
    EXPECT_THAT(implied, IsEmpty());
    EXPECT_TRUE(op.addMatch(implied));
    EXPECT_TRUE(op.reset(implied));
    EXPECT_EQ(0, op._matchCount);
    EXPECT_THAT(implied, IsEmpty());
    EXPECT_FALSE(op.reset(implied));
}

TEST_F(ReteTest, FiringImpliesAllStringsOnce) {
    AndOperator& op = rule("a", "i");
    op.addImplication("j");
    op.addImplication("i");
    EXPECT_TRUE(set("a"));
    EXPECT_THAT(implied, ElementsAre("i", "j"));
    reset("a");
    EXPECT_THAT(implied, IsEmpty());
}

TEST_F(ReteTest, AnOperatorFiresAndStopsFiringWithItsCondition) {
    AndOperator& op = rule("a", "i");
    EXPECT_EQ(1, op._needMatch);
    EXPECT_TRUE(set("a"));
    EXPECT_TRUE(op.hasFired());
    EXPECT_THAT(implied, ElementsAre("i"));
    reset("a");
    EXPECT_FALSE(op.hasFired());
    EXPECT_THAT(implied, IsEmpty());
}

TEST_F(ReteTest, AndNeedsAllItsConditions) {
    AndOperator& op = rule("a", "i");
    rs.addCondition("b", op);
    set("a");
    EXPECT_THAT(implied, IsEmpty());
    set("b");
    EXPECT_THAT(implied, ElementsAre("i"));
    reset("a");
    EXPECT_THAT(implied, IsEmpty());
    set("a");
    EXPECT_THAT(implied, ElementsAre("i"));
    reset("b");
    EXPECT_THAT(implied, IsEmpty());
}

TEST_F(ReteTest, SettingTwiceAndResettingUnsetConditionsCountOnce) {
    AndOperator& op = rule("a", "i");
    rs.addCondition("b", op);
    set("a");
    set("a");
    EXPECT_EQ(1, op._matchCount);
    reset("b");
    EXPECT_EQ(1, op._matchCount);
    reset("a");
    reset("a");
    EXPECT_EQ(0, op._matchCount);
}

TEST_F(ReteTest, UpdatesOperatorsEvenWhenNothingChanged) {
    std::string implication = "i";
    auto* const op = new OrOperator(nullptr, implication);
    rs.addCondition("a", *op);
    reset("a");
    EXPECT_EQ(1, op->calls);
    set("a");
    set("a");
    EXPECT_EQ(3, op->calls);
    EXPECT_THAT(implied, ElementsAre("i"));
}

// If the operator already fires, setting again does not restore what the caller removed.
TEST_F(ReteTest, SettingAgainDoesNotFireAgain) {
    rule("a", "i");
    set("a");
    implied.clear();
    set("a");
    EXPECT_THAT(implied, IsEmpty());
    reset("a");
    EXPECT_THAT(implied, IsEmpty());
}

TEST_F(ReteTest, AConditionThatIsSetAlreadyCountsOnlyAfterResetAndSet) {
    AndOperator& first = rule("a", "i");
    set("a");
    AndOperator& op = makeOperator("j");
    rs.addCondition("a", op);
    EXPECT_EQ(0, op._matchCount);
    set("a");
    EXPECT_EQ(0, op._matchCount);
    EXPECT_THAT(implied, ElementsAre("i"));
    reset("a");
    set("a");
    EXPECT_EQ(1, op._matchCount);
    EXPECT_THAT(implied, ElementsAre("i", "j"));
    EXPECT_TRUE(first.hasFired());
}

// Deliberate: a reset counts for all operators of the condition, but an earlier set did not count
// for operators that were added later. Such an operator loses a match that another condition gave.
TEST_F(ReteTest, ResettingAConditionSetBeforeRegistrationRemovesAMatch) {
    rule("a", "i");
    AndOperator& op = rule("b", "j");
    set("a");
    set("b");
    rs.addCondition("a", op);
    EXPECT_EQ(1, op._matchCount);
    reset("a");
    EXPECT_EQ(0, op._matchCount);
    EXPECT_THAT(implied, IsEmpty());
}

// Deliberate: the need counts registrations, the match count counts conditions.
TEST_F(ReteTest, RegisteringTwiceOnOneConditionNeedsTwoMatches) {
    AndOperator& op = rule("a", "i");
    rs.addCondition("a", op);
    EXPECT_EQ(2, op._needMatch);
    EXPECT_EQ(1u, rs._conditions.at("a")->_operators.size());
    set("a");
    EXPECT_EQ(1, op._matchCount);
    EXPECT_THAT(implied, IsEmpty());
}

TEST_F(ReteTest, LiteralsAreOnlyInTheMapPatternsAlsoInTheTrie) {
    AndOperator& op = rule("abc", "i");
    rs.addCondition("ab*c", op);
    rs.addCondition("*x", op);
    EXPECT_EQ(3u, rs._conditions.size());
    ASSERT_EQ(1u, rs._wildcardTrie._dataList.size());
    EXPECT_STREQ("*x", rs._wildcardTrie._dataList[0].first.getOrigPattern());
    EXPECT_EQ(rs._conditions.at("*x"), rs._wildcardTrie._dataList[0].second);
    const auto* const a = rs._wildcardTrie._children[int{'a'}];
    ASSERT_NE(nullptr, a);
    EXPECT_TRUE(a->_dataList.empty());
    const auto* const b = a->_children[int{'b'}];
    ASSERT_NE(nullptr, b);
    ASSERT_EQ(1u, b->_dataList.size());
    EXPECT_STREQ("ab*c", b->_dataList[0].first.getOrigPattern());
    EXPECT_EQ(nullptr, b->_children[int{'c'}]);
    EXPECT_THAT(rs._allOperators, ElementsAre(&op));
    EXPECT_EQ(3, op._needMatch);
}

TEST_F(ReteTest, CandidatesAreThePatternsWhosePrefixTheTermBeginsWith) {
    for (const char* const pattern : {"*z", "a*", "ab*", "abc*", "b*", "ab*z", "*"}) {
        rule(pattern, pattern);
    }
    EXPECT_TRUE(set("abx"));
    std::vector<std::string> candidates;
    for (const auto* const candidate : scratch) {
        candidates.push_back(candidate->first.getOrigPattern());
    }
    EXPECT_THAT(candidates, ElementsAre("*z", "*", "a*", "ab*", "ab*z"));
    EXPECT_THAT(implied, ElementsAre("*", "a*", "ab*"));
}

TEST_F(ReteTest, AResetReturnsItsCandidatesLikeASet) {
    rule("a*", "i");
    rule("*b", "j");
    rule("b*", "k");
    reset("ac");
    ASSERT_EQ(2u, scratch.size());
    EXPECT_STREQ("*b", scratch[0]->first.getOrigPattern());
    EXPECT_EQ(rs._conditions.at("*b"), scratch[0]->second);
    EXPECT_STREQ("a*", scratch[1]->first.getOrigPattern());
    EXPECT_EQ(rs._conditions.at("a*"), scratch[1]->second);
    const RuleSystem::Candidates before = scratch;
    rs.resetAll(implied);
    EXPECT_EQ(before, scratch) << "resetAll uses its own scratch space";
}

TEST_F(ReteTest, TheCandidatesOfAnEmptyTermAreThePatternsAtTheRoot) {
    rule("*", "all");
    rule("*a", "a");
    rule("", "empty");
    EXPECT_TRUE(set(""));
    EXPECT_THAT(implied, ElementsAre("all", "empty"));
    EXPECT_EQ(2u, scratch.size());
}

TEST_F(ReteTest, SetConditionReturnsWhetherAnyConditionMatched) {
    rule("a", "i");
    rule("b*", "j");
    EXPECT_TRUE(set("a"));
    EXPECT_TRUE(set("a"));
    EXPECT_TRUE(set("bx"));
    EXPECT_FALSE(set("c"));
    EXPECT_FALSE(set("ab"));
}

TEST_F(ReteTest, AddingAPatternAgainMakesItACandidateAgain) {
    AndOperator& op = rule("a*", "i");
    AndOperator& other = rule("a*", "j");
    EXPECT_EQ(1u, rs._conditions.size());
    set("ab");
    EXPECT_EQ(2u, scratch.size());
    EXPECT_EQ(scratch[0]->second, scratch[1]->second);
    EXPECT_EQ(1, op._matchCount);
    EXPECT_EQ(1, other._matchCount);
    EXPECT_THAT(implied, ElementsAre("i", "j"));
}

TEST_F(ReteTest, APatternsOwnTextSetsItThroughItsNameAndAsACandidate) {
    std::string implication = "i";
    auto* const op = new OrOperator(nullptr, implication);
    rs.addCondition("*a", *op);
    EXPECT_TRUE(set("*a"));
    EXPECT_EQ(2, op->calls);
    EXPECT_THAT(implied, ElementsAre("i"));
}

TEST_F(ReteTest, APatternsOwnTextSetsItEvenIfTheMatcherDoesNotMatch) {
    rule("*a", "i");
    // A matcher that was assigned to matches nothing. Its earlier copies stay allocated, and
    // reachable for leak checkers.
    WildcardMatcher& matcher = rs._wildcardTrie._dataList.at(0).first;
    static auto& leaked = *new std::vector<const char*>;
    leaked.insert(leaked.end(), {matcher._needle, matcher._buffer});
    matcher = WildcardMatcher("b");
    EXPECT_FALSE(set("xa"));
    EXPECT_TRUE(set("*a"));
    EXPECT_THAT(implied, ElementsAre("i"));
}

TEST_F(ReteTest, TermsMayHaveBytesFrom128) {
    rule("\xe4*\xff", "i");
    EXPECT_TRUE(set("\xe4\x80\xff"));
    EXPECT_THAT(implied, ElementsAre("i"));
    EXPECT_FALSE(set("\xe5\x80\xff"));
}

TEST_F(ReteTest, SettingAgainRecordsTheNameAgain) {
    rule("a", "i");
    set("a");
    rs._setConditions.clear();
    reset("a");
    EXPECT_THAT(rs._setConditions, IsEmpty());
    set("a");
    rs._setConditions.clear();
    set("a");
    EXPECT_THAT(rs._setConditions, ElementsAre("a"));
}

// Only conditions that the rule system sets are recorded.
TEST_F(ReteTest, AConditionThatIsSetDirectlyIsNotRecorded) {
    rule("a", "i");
    rs._conditions.at("a")->set(implied);
    EXPECT_THAT(implied, ElementsAre("i"));
    EXPECT_THAT(rs._setConditions, IsEmpty());
}

// Deliberate: the record of set conditions only grows.
TEST_F(ReteTest, RemembersEveryNameThatWasEverSet) {
    rule("a", "i");
    rule("b*", "j");
    EXPECT_THAT(rs._setConditions, IsEmpty());
    set("a");
    set("bx");
    EXPECT_THAT(rs._setConditions, ElementsAre("a", "b*"));
    reset("a");
    rs.resetAll(implied);
    EXPECT_THAT(rs._setConditions, ElementsAre("a", "b*"));
    rs.clearRules();
    EXPECT_THAT(rs._setConditions, IsEmpty());
}

TEST_F(ReteTest, ResetAllLeavesNothingImpliedWithoutAMetaRule) {
    rule("a", "i");
    rule("b*", "j");
    set("a");
    set("bx");
    rs.resetAll(implied);
    EXPECT_THAT(implied, IsEmpty());
    implied.insert("the caller's own");
    rs.resetAll(implied);
    EXPECT_THAT(implied, ElementsAre("the caller's own"));
}

TEST_F(ReteTest, ResetAllSetsTheMetaTerm) {
    rule("meta::all", "literal");
    rule("*", "star");
    rule("meta*", "meta");
    rule("a", "a");
    rs.resetAll(implied);
    EXPECT_THAT(implied, ElementsAre("literal", "meta", "star"));
    EXPECT_TRUE(rs._conditions.at("meta::all")->isSet());
    EXPECT_THAT(rs._setConditions, ElementsAre("*", "meta*", "meta::all"));
}

TEST_F(ReteTest, ResetAllUpdatesOperatorsOfUnsetConditions) {
    AndOperator& op = makeOperator("always");
    auto* const condition = new Conditional("a");
    condition->addOperator(op);
    rs._conditions["a"] = condition;
    rs.resetAll(implied);
    EXPECT_THAT(implied, ElementsAre("always"));
}

TEST_F(ReteTest, ResetLeavesTheMetaTermUnset) {
    rule("meta::all", "literal");
    rule("a", "a");
    rs.resetAll(implied);
    set("a");
    EXPECT_THAT(implied, ElementsAre("a", "literal"));
    rs.reset(implied);
    EXPECT_THAT(implied, IsEmpty());
}

TEST_F(ReteTest, ChildrenCountTheirParentsFiring) {
    AndOperator& parent = rule("a", "parent");
    AndOperator& child = makeOperator("child", &parent);
    EXPECT_EQ(1, child._needMatch);
    EXPECT_THAT(parent._children, ElementsAre(&child));
    rs.addCondition("b", child);
    set("b");
    EXPECT_THAT(implied, IsEmpty());
    set("a");
    EXPECT_THAT(implied, ElementsAre("child", "parent"));
    EXPECT_EQ(2, child._matchCount);
    reset("a");
    EXPECT_THAT(implied, IsEmpty());
    EXPECT_EQ(1, child._matchCount);
}

TEST_F(ReteTest, AddChildDoesNotChangeTheChildsNeed) {
    AndOperator& parent = rule("a", "parent");
    AndOperator& child = makeOperator("child");
    parent.addChild(child);
    EXPECT_EQ(0, child._needMatch);
    set("a");
    EXPECT_EQ(0, child._matchCount);
    EXPECT_THAT(implied, ElementsAre("child", "parent"));
    reset("a");
    EXPECT_THAT(implied, ElementsAre("child")) << "without a need it keeps firing";
}

TEST_F(ReteTest, ASharedChildIsUpdatedOncePerPath) {
    AndOperator& top = rule("a", "top");
    AndOperator& left = makeOperator("left", &top);
    AndOperator& right = makeOperator("right", &top);
    std::string implication = "shared";
    auto* const shared = new OrOperator(&left, implication);
    rs.addOperator(*shared);
    right.addChild(*shared);
    shared->incNeedMatch();
    set("a");
    EXPECT_EQ(2, shared->calls);
    EXPECT_THAT(implied, ElementsAre("left", "right", "shared", "top"));
    reset("a");
    EXPECT_EQ(4, shared->calls);
    EXPECT_THAT(implied, IsEmpty());
}

// Deliberate: implications have no owner.
TEST_F(ReteTest, ASharedImplicationIsRemovedWhenTheFirstOperatorStopsFiring) {
    rule("a", "same");
    AndOperator& second = rule("b", "same");
    set("a");
    set("b");
    EXPECT_THAT(implied, ElementsAre("same"));
    reset("a");
    EXPECT_THAT(implied, IsEmpty());
    EXPECT_TRUE(second.hasFired());
}

// The set is at the end of accessible memory, so that reading its nonexistent first element traps.
TEST_F(ReteTest, ASharedImplicationMayAlreadyBeRemoved) {
    const auto page = static_cast<std::size_t>(::sysconf(_SC_PAGESIZE));
    void* const memory =
        ::mmap(nullptr, 2 * page, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    ASSERT_NE(MAP_FAILED, memory);
    char* const end = static_cast<char*>(memory) + page;
    ASSERT_EQ(0, ::mprotect(end, page, PROT_NONE));
    auto* const implications = new (end - sizeof(StringSet)) StringSet;

    std::string shared = "shared";
    AndOperator first(nullptr, shared);
    AndOperator second(nullptr, shared);
    for (AndOperator* const op : {&first, &second}) {
        EXPECT_TRUE(op->update(*implications));
    }
    for (AndOperator* const op : {&first, &second}) {
        op->incNeedMatch();
        EXPECT_TRUE(op->update(*implications));
        EXPECT_THAT(*implications, IsEmpty());
    }
    implications->~set();
    ::munmap(memory, 2 * page);
}

TEST_F(ReteTest, ATermMayBeAnElementOfTheImplicationsThatItRemoves) {
    rule("a", "a");
    rule("a*", "a pattern on the same term");
    set("a");
    ASSERT_EQ(1u, implied.count("a"));
    reset(*implied.find("a"));
    EXPECT_THAT(implied, IsEmpty());
}

TEST_F(ReteTest, ClearRulesDeletesEverythingAndNewRulesWork) {
    int destroyed = 0;
    std::string implication = "i";
    auto* const op = new OrOperator(nullptr, implication, &destroyed);
    rs.addCondition("a", *op);
    rs.addCondition("a*", *op);
    rs.addOperator(*op);
    set("a");
    rs.clearRules();
    EXPECT_EQ(1, destroyed);
    EXPECT_THAT(rs._allOperators, IsEmpty());
    EXPECT_TRUE(rs._conditions.empty());
    EXPECT_TRUE(rs._wildcardTrie._dataList.empty());
    EXPECT_EQ(nullptr, rs._wildcardTrie._children[int{'a'}]);
    EXPECT_THAT(implied, ElementsAre("i")) << "clearRules does not change the caller's set";
    implied.clear();
    EXPECT_FALSE(set("a"));
    EXPECT_THAT(scratch, IsEmpty());
    AndOperator& fresh = rule("a*", "j");
    EXPECT_EQ(1, fresh._needMatch);
    EXPECT_TRUE(set("a"));
    EXPECT_THAT(implied, ElementsAre("j"));
}

TEST_F(ReteTest, DestructionDeletesOperatorsThroughTheirDestructor) {
    int destroyed = 0;
    std::string implication = "i";
    {
        RuleSystem system;
        system.addCondition("a", *new OrOperator(nullptr, implication, &destroyed));
        system.addOperator(*new OrOperator(nullptr, implication, &destroyed));
    }
    EXPECT_EQ(2, destroyed);
}

TEST_F(ReteTest, CopiesOfOperatorsAndConditionsAreIndependent) {
    std::string implication = "i";
    AndOperator child(nullptr, implication);
    auto original = std::make_unique<AndOperator>(nullptr, implication);
    original->addChild(child);
    original->incNeedMatch();
    AndOperator copy(*original);
    original.reset();
    EXPECT_EQ(1, copy._needMatch);
    EXPECT_EQ(AND_OPERATOR, copy._type);
    EXPECT_THAT(copy._children, ElementsAre(&child));
    EXPECT_THAT(copy._implications, ElementsAre("i"));
    auto condition = std::make_unique<Conditional>("a");
    condition->addOperator(copy);
    Conditional second(*condition);
    condition.reset();
    second.set(implied);
    EXPECT_TRUE(second.isSet());
    EXPECT_THAT(implied, ElementsAre("i"));
    std::string name = "stale";
    second.getName(name);
    EXPECT_EQ("a", name);
    second.reset(implied);
    EXPECT_THAT(implied, IsEmpty());
}

TEST_F(ReteTest, AnEmptySystemMayBeCopied) {
    RuleSystem copy(rs);
    rule("a*", "i");
    std::string implication = "j";
    copy.addCondition("a", *new AndOperator(nullptr, implication));
    EXPECT_TRUE(copy.setCondition("a", scratch, implied));
    EXPECT_THAT(implied, ElementsAre("j"));
    rs.clearRules();
    RuleSystem second(rs);
    EXPECT_FALSE(second.setCondition("a", scratch, implied));
}

using ReteDeathTest = ReteTest;

TEST_F(ReteDeathTest, CopyingASystemWithOperatorsIsAsserted) {
    rule("a", "i");
    EXPECT_DEATH(RuleSystem copy(rs), "failed assertion `_allOperators.empty\\(\\)'");
}

TEST_F(ReteTest, ARejectedPatternChangesNothing) {
    std::string pattern = "a";
    for (int i = 0; i < 256; ++i) {
        pattern += "*a";
    }
    std::string implication = "i";
    AndOperator op(nullptr, implication);
    EXPECT_THROW(rs.addCondition(pattern, op), std::length_error);
    EXPECT_EQ(0, op._needMatch);
    EXPECT_THAT(rs._allOperators, IsEmpty());
    EXPECT_TRUE(rs._conditions.empty());
    EXPECT_EQ(nullptr, rs._wildcardTrie._children[int{'a'}]);
    EXPECT_TRUE(rs._wildcardTrie._dataList.empty());
    pattern.erase(0, 1);
    EXPECT_NO_THROW(rs.addCondition(pattern, *new AndOperator(nullptr, implication)));
    EXPECT_TRUE(set(std::string(256, 'a')));
}

TEST_F(ReteTest, PatternsOfStarsAreStoredAndMatchEveryTerm) {
    rule("***", "i");
    EXPECT_EQ(WildcardMatcher::ERROR_MATCHER,
              rs._wildcardTrie._dataList.at(0).first.getMatcherType());
    EXPECT_TRUE(set("anything"));
    EXPECT_THAT(implied, ElementsAre("i"));
}

TEST_F(ReteTest, ToStringDescribesTheObject) {
    AndOperator& op = rule("a", "i");
    op.addImplication("j");
    EXPECT_EQ("AND 0/1 idle [i, j]", op.toString());
    set("a");
    EXPECT_EQ("AND 1/1 fired [i, j]", op.toString());
    EXPECT_EQ("a = set (1 operators)", rs._conditions.at("a")->toString());
    EXPECT_EQ("a = set (1 operators)\nAND 1/1 fired [i, j]\n", rs.toString());
    reset("a");
    EXPECT_EQ("a = unset (1 operators)", rs._conditions.at("a")->toString());
    EXPECT_EQ("", RuleSystem().toString());
    std::string implication = "k";
    EXPECT_EQ("operator 0/0 idle [k]", OrOperator(nullptr, implication).toString());
}

}  // namespace
