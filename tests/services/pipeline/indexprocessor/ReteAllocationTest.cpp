// Fails the n-th allocation of each operation, for every n. The replaced operator new serves this
// program alone.

#include <cstdlib>
#include <memory>
#include <new>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "services/pipeline/indexprocessor/Rete.h"
#include "util/WildcardMatcher.h"

namespace {

// Allocations that succeed before one fails; negative: all succeed.
long allocationsLeft = -1;

// Larger ones fail.
std::size_t largestAllocation = std::size_t(-1);

bool takeAllocation(std::size_t size) {
    if (size > largestAllocation) {
        return false;
    }
    if (allocationsLeft < 0) {
        return true;
    }
    return allocationsLeft-- > 0;
}

void* allocateOrNull(std::size_t size) noexcept {
    return takeAllocation(size) ? std::malloc(size == 0 ? 1 : size) : nullptr;
}

void* allocate(std::size_t size) {
    void* const memory = allocateOrNull(size);
    if (memory == nullptr) {
        throw std::bad_alloc();
    }
    return memory;
}

}  // namespace

void* operator new(std::size_t size) {
    return allocate(size);
}
void* operator new[](std::size_t size) {
    return allocate(size);
}
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
    return allocateOrNull(size);
}
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept {
    return allocateOrNull(size);
}
void operator delete(void* memory) noexcept {
    std::free(memory);
}
void operator delete[](void* memory) noexcept {
    std::free(memory);
}
void operator delete(void* memory, std::size_t) noexcept {
    std::free(memory);
}
void operator delete[](void* memory, std::size_t) noexcept {
    std::free(memory);
}
void operator delete(void* memory, const std::nothrow_t&) noexcept {
    std::free(memory);
}
void operator delete[](void* memory, const std::nothrow_t&) noexcept {
    std::free(memory);
}

namespace {

// Runs `operation` with its first, then its second... allocation failing, each time on what
// `prepare` made, until it succeeds. `check` looks at what a failure left behind.
template <typename Prepare, typename Operation, typename Check>
long failEachAllocation(Prepare prepare, Operation operation, Check check) {
    for (long n = 0; n < 10000; ++n) {
        auto subject = prepare();
        bool failed = false;
        allocationsLeft = n;
        try {
            operation(*subject);
        } catch (const std::bad_alloc&) {
            failed = true;
        }
        allocationsLeft = -1;
        check(*subject, failed);
        if (!failed) {
            return n;
        }
    }
    ADD_FAILURE() << "never succeeded";
    return -1;
}

struct Network {
    AndOperator* operate(const char* implication) {
        std::string text = implication;
        auto* const made = new AndOperator(nullptr, text);
        rs.addOperator(*made);
        return made;
    }

    RuleSystem rs;
    StringSet implied;
    RuleSystem::Candidates scratch;
    AndOperator* op = nullptr;
};

// A name that does not fit into a string object without an allocation.
const char* const LONG_TERM = "a term that is too long for a short string";
const char* const LONG_PATTERN = "a term that is * long for a short string*";

void expectUsable(Network& network) {
    network.rs.resetAll(network.implied);
    network.rs.addCondition("fresh", *network.operate("fresh implication"));
    network.rs.setCondition("fresh", network.scratch, network.implied);
    EXPECT_EQ(1u, network.implied.count("fresh implication"));
    network.rs.setCondition(LONG_TERM, network.scratch, network.implied);
    network.rs.clearRules();
    EXPECT_FALSE(network.rs.setCondition("fresh", network.scratch, network.implied));
}

TEST(ReteAllocationTest, AddingAConditionNeverLeaksOrDangles) {
    for (const char* const keyword : {"a", LONG_TERM, "*", "a*b", LONG_PATTERN}) {
        SCOPED_TRACE(keyword);
        const long allocations = failEachAllocation(
            [] {
                auto network = std::make_unique<Network>();
                network->op = network->operate("i");
                return network;
            },
            [keyword](Network& network) { network.rs.addCondition(keyword, *network.op); },
            [](Network& network, bool) {
                EXPECT_EQ(1u, network.rs._allOperators.count(network.op));
                EXPECT_LE(network.op->_needMatch, 1);
                expectUsable(network);
            });
        EXPECT_GE(allocations, 3);
    }
}

TEST(ReteAllocationTest, AnOperatorThatWasNotRecordedIsTheCallers) {
    long failures = 0;
    failEachAllocation([] { return std::make_unique<Network>(); },
                       [](Network& network) {
                           const long left = allocationsLeft;
                           allocationsLeft = -1;
                           std::string text = "i";
                           network.op = new AndOperator(nullptr, text);
                           allocationsLeft = left;
                           network.rs.addCondition("a*b", *network.op);
                       },
                       [&](Network& network, bool failed) {
                           failures += failed;
                           if (network.rs._allOperators.count(network.op) == 0) {
                               EXPECT_TRUE(network.rs._conditions.empty());
                               delete network.op;
                           }
                           expectUsable(network);
                       });
    EXPECT_GE(failures, 4);
}

TEST(ReteAllocationTest, AddingToAnExistingConditionNeverLeaksOrDangles) {
    failEachAllocation(
        [] {
            auto network = std::make_unique<Network>();
            network->rs.addCondition(LONG_PATTERN, *network->operate("i"));
            network->op = network->operate("j");
            return network;
        },
        [](Network& network) { network.rs.addCondition(LONG_PATTERN, *network.op); },
        [](Network& network, bool) {
            EXPECT_EQ(1u, network.rs._conditions.size());
            expectUsable(network);
        });
}

std::unique_ptr<Network> filledNetwork() {
    auto network = std::make_unique<Network>();
    AndOperator* const parent = network->operate("a long implication for the parent's set");
    AndOperator* const child = network->operate("another long implication for the child's set");
    AndOperator* const grandchild = network->operate("a third long implication, further down");
    parent->addChild(*child);
    child->addChild(*grandchild);
    child->incNeedMatch();
    grandchild->incNeedMatch();
    network->rs.addCondition(LONG_PATTERN, *parent);
    network->rs.addCondition("a*", *parent);
    network->rs.addCondition("*", *network->operate("star"));
    network->rs.addCondition(LONG_TERM, *network->operate("literal"));
    return network;
}

TEST(ReteAllocationTest, SettingATermNeverLeaksOrDangles) {
    const long allocations = failEachAllocation(
        filledNetwork,
        [](Network& network) {
            network.rs.setCondition(LONG_TERM, network.scratch, network.implied);
        },
        [](Network& network, bool) { expectUsable(network); });
    EXPECT_GE(allocations, 5);
}

TEST(ReteAllocationTest, ResettingNeverLeaksOrDangles) {
    failEachAllocation(
        [] {
            auto network = filledNetwork();
            network->rs.setCondition(LONG_TERM, network->scratch, network->implied);
            return network;
        },
        [](Network& network) { network.rs.resetAll(network.implied); },
        [](Network& network, bool) { expectUsable(network); });
    failEachAllocation(
        [] {
            auto network = filledNetwork();
            network->rs.setCondition(LONG_TERM, network->scratch, network->implied);
            return network;
        },
        [](Network& network) {
            network.rs.resetCondition(LONG_TERM, network.scratch, network.implied);
        },
        [](Network& network, bool) { expectUsable(network); });
}

TEST(ReteAllocationTest, MakingAnOperatorWithAParentNeverLeavesItBehind) {
    std::string implication = "an implication that needs memory of its own";
    failEachAllocation(
        [] {
            auto network = std::make_unique<Network>();
            network->op = network->operate("parent");
            return network;
        },
        [&](Network& network) {
            auto* const child = new AndOperator(network.op, implication);
            const long left = allocationsLeft;
            allocationsLeft = -1;
            network.rs.addOperator(*child);
            allocationsLeft = left;
        },
        [](Network& network, bool failed) {
            EXPECT_EQ(failed ? 0u : 1u, network.op->_children.size());
            expectUsable(network);
        });
}

TEST(ReteAllocationTest, CompilingAndCopyingAMatcherNeverLeaks) {
    const WildcardMatcher source("a*b");
    std::unique_ptr<WildcardMatcher> made;
    const long allocations = failEachAllocation(
        [] { return std::make_unique<int>(0); },
        [&](int&) { made = std::make_unique<WildcardMatcher>(source); }, [](int&, bool) {});
    EXPECT_EQ(3, allocations);
    EXPECT_TRUE(made->isMatch("axb"));
}

TEST(ReteAllocationTest, AFailedAssignmentLeavesTheMatcherUnchanged) {
    const WildcardMatcher source("c*d*e");
    long failures = 0;
    failEachAllocation([] { return std::make_unique<WildcardMatcher>("a*b"); },
                       [&](WildcardMatcher& matcher) { matcher = source; },
                       [&](WildcardMatcher& matcher, bool failed) {
                           EXPECT_EQ(!failed, matcher.isMatch("axb") == false);
                           EXPECT_STREQ(failed ? "a*b" : "c*d*e", matcher.getOrigPattern());
                           EXPECT_EQ(failed ? 2 : 5, matcher._subStringCount);
                           failures += failed;
                       });
    EXPECT_GE(failures, 3);
}

TEST(ReteAllocationTest, CopyingATrieNeverLeaks) {
    using Trie = TrieNode<std::string>;
    Trie source;
    for (const char* const key : {"", "a", "ab", "b", "abcdef"}) {
        source.addData(key, "a value that needs memory of its own");
    }
    std::unique_ptr<Trie> copy;
    failEachAllocation([] { return std::make_unique<int>(0); },
                       [&](int&) { copy = std::make_unique<Trie>(source); }, [](int&, bool) {});
    std::vector<std::string*> results;
    copy->findData("abcdef", results);
    EXPECT_EQ(4u, results.size());
}

// A list that cannot have room for many values more takes less.
TEST(ReteAllocationTest, ALongListGrowsInSmallStepsIfNeedBe) {
    struct Large {
        int number;
        char rest[2000];
    };
    TrieNode<Large> trie;
    constexpr int COUNT = 1000;
    largestAllocation = std::size_t{4} << 20;
    for (int i = 0; i < COUNT; ++i) {
        trie.addData("a", Large{i, {}});
    }
    largestAllocation = std::size_t(-1);
    std::vector<Large*> results;
    trie.findData("a", results);
    ASSERT_EQ(static_cast<std::size_t>(COUNT), results.size());
    for (int i = 0; i < COUNT; ++i) {
        ASSERT_EQ(i, results[static_cast<std::size_t>(i)]->number);
    }
}

TEST(ReteAllocationTest, MatchingAllocatesNothing) {
    const WildcardMatcher matcher("a*bc*d*aba");
    allocationsLeft = 0;
    const bool matched = matcher.isMatch("axbcxdxabaaba");
    const bool refused = matcher.isMatch("axbcxdxababa");
    allocationsLeft = -1;
    EXPECT_TRUE(matched);
    EXPECT_FALSE(refused);
}

TEST(ReteAllocationTest, ClearingAllocatesNothing) {
    auto network = filledNetwork();
    allocationsLeft = 0;
    network->rs.clearRules();
    network.reset();
    allocationsLeft = -1;
}

}  // namespace
