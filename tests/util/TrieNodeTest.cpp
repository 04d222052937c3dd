#include "util/TrieNode.h"

#include <memory>
#include <string>
#include <type_traits>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/FieldOrder.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

using Trie = TrieNode<std::string>;

std::vector<std::string> find(Trie& trie, const std::string& key) {
    std::vector<std::string*> results;
    trie.findData(key, results);
    std::vector<std::string> values;
    for (const std::string* const result : results) {
        values.push_back(*result);
    }
    return values;
}

// Counts the live values.
struct Counted {
    explicit Counted(int* count) : live(count) { ++*live; }
    Counted(const Counted& other) : live(other.live) { ++*live; }
    Counted& operator=(const Counted&) = delete;
    ~Counted() { --*live; }

    int* live;
};

// How callers see a node.
static_assert(std::is_same_v<decltype(Trie::_children), Trie * [Trie::ALPHABET_SIZE]>);
static_assert(std::is_same_v<decltype(Trie::_dataList), std::vector<std::string>>);
static_assert(std::is_same_v<decltype(&Trie::clear), void (Trie::*)()>);
static_assert(std::is_same_v<decltype(&Trie::findData),
                             void (Trie::*)(const std::string&, std::vector<std::string*>&)>);
static_assert(!std::is_polymorphic_v<Trie>);

TEST(TrieNodeTest, HasOneSlotPerByteValueAndStartsEmpty) {
    static_assert(Trie::ALPHABET_SIZE == 256);
    Trie trie;
    EXPECT_TRUE(standInOrder({&trie._children, &trie._dataList}));
    EXPECT_EQ(256u, std::size(trie._children));
    for (const Trie* const child : trie._children) {
        EXPECT_EQ(nullptr, child);
    }
    EXPECT_THAT(trie._dataList, IsEmpty());
    EXPECT_THAT(find(trie, ""), IsEmpty());
    EXPECT_THAT(find(trie, "abc"), IsEmpty());
}

TEST(TrieNodeTest, FindsWhatIsStoredUnderAnyBeginningOfTheKey) {
    Trie trie;
    trie.addData("ab", "ab 1");
    trie.addData("", "root 1");
    trie.addData("abc", "abc");
    trie.addData("a", "a");
    trie.addData("ab", "ab 2");
    trie.addData("", "root 2");
    trie.addData("b", "b");
    EXPECT_THAT(find(trie, ""), ElementsAre("root 1", "root 2"));
    EXPECT_THAT(find(trie, "a"), ElementsAre("root 1", "root 2", "a"));
    EXPECT_THAT(find(trie, "abc"), ElementsAre("root 1", "root 2", "a", "ab 1", "ab 2", "abc"));
    EXPECT_THAT(find(trie, "abcd"), ElementsAre("root 1", "root 2", "a", "ab 1", "ab 2", "abc"));
    EXPECT_THAT(find(trie, "abd"), ElementsAre("root 1", "root 2", "a", "ab 1", "ab 2"));
    EXPECT_THAT(find(trie, "b"), ElementsAre("root 1", "root 2", "b"));
    EXPECT_THAT(find(trie, "ba"), ElementsAre("root 1", "root 2", "b"));
    EXPECT_THAT(find(trie, "c"), ElementsAre("root 1", "root 2"));
}

TEST(TrieNodeTest, ReplacesTheResults) {
    Trie trie;
    trie.addData("a", "a");
    std::string stale;
    std::vector<std::string*> results{&stale, nullptr};
    trie.findData("a", results);
    ASSERT_EQ(1u, results.size());
    EXPECT_EQ("a", *results[0]);
    trie.findData("b", results);
    EXPECT_THAT(results, IsEmpty());
}

TEST(TrieNodeTest, KeepsTheRoomOfTheResults) {
    Trie trie;
    for (int i = 0; i < 100; ++i) {
        trie.addData("a", "a");
    }
    std::vector<std::string*> results;
    trie.findData("a", results);
    const auto* const storage = results.data();
    const std::size_t room = results.capacity();
    for (const char* const key : {"b", "", "ab"}) {
        trie.findData(key, results);
        EXPECT_EQ(storage, results.data()) << key;
        EXPECT_EQ(room, results.capacity()) << key;
    }
}

TEST(TrieNodeTest, StoresACopyAndLeavesTheOriginalAlone) {
    Trie trie;
    const std::string key = "a";
    std::string data = "a value that is longer than any small string";
    const std::string before = data;
    trie.addData(key, data);
    EXPECT_EQ(before, data);
    data = "changed";
    EXPECT_THAT(find(trie, "a"), ElementsAre(before));
}

TEST(TrieNodeTest, ResultsPointIntoTheTrie) {
    Trie trie;
    trie.addData("a", "before");
    std::vector<std::string*> results;
    trie.findData("a", results);
    *results.at(0) = "after";
    EXPECT_THAT(find(trie, "a"), ElementsAre("after"));
}

TEST(TrieNodeTest, IndexesBytesFrom128AsUnsigned) {
    Trie trie;
    trie.addData("\x80\xff", "high");
    ASSERT_NE(nullptr, trie._children[0x80]);
    EXPECT_NE(nullptr, trie._children[0x80]->_children[0xff]);
    EXPECT_THAT(find(trie, "\x80\xff"), ElementsAre("high"));
    EXPECT_THAT(find(trie, "\x80\xff\xfe"), ElementsAre("high"));
    EXPECT_THAT(find(trie, "\x80\x7f"), IsEmpty());
}

TEST(TrieNodeTest, TakesNulBytesInKeys) {
    Trie trie;
    trie.addData(std::string("a\0b", 3), "nul");
    EXPECT_THAT(find(trie, std::string("a\0b", 3)), ElementsAre("nul"));
    EXPECT_THAT(find(trie, "a"), IsEmpty());
}

TEST(TrieNodeTest, ClearEmptiesTheWholeTreeAndItCanBeFilledAgain) {
    int live = 0;
    TrieNode<Counted> trie;
    for (const char* const key : {"", "a", "ab", "ac", "b", "zzz", "\xff\x80"}) {
        trie.addData(key, Counted(&live));
        trie.addData(key, Counted(&live));
    }
    EXPECT_EQ(14, live);
    trie.clear();
    EXPECT_EQ(0, live);
    EXPECT_TRUE(trie._dataList.empty());
    for (const auto* const child : trie._children) {
        EXPECT_EQ(nullptr, child);
    }
    trie.clear();
    trie.addData("ab", Counted(&live));
    std::vector<Counted*> results;
    trie.findData("abc", results);
    EXPECT_EQ(1u, results.size());
}

// Every node of three levels has children on all 256 slots in turn.
TEST(TrieNodeTest, ClearsAFullTree) {
    int live = 0;
    TrieNode<Counted> trie;
    for (int first = 0; first < 256; ++first) {
        for (int second = 0; second < 256; second += first % 3 == 0 ? 5 : 85) {
            const char key[] = {static_cast<char>(first), static_cast<char>(second)};
            trie.addData(std::string(key, 2), Counted(&live));
        }
    }
    EXPECT_GT(live, 4000);
    trie.clear();
    EXPECT_EQ(0, live);
}

TEST(TrieNodeTest, CopiesTheSubtree) {
    auto original = std::make_unique<Trie>();
    original->addData("", "root");
    original->addData("ab", "ab");
    original->addData("ac", "ac");
    original->addData("\xff", "high");
    original->addData(std::string(1, '\0'), "nul");
    Trie copy(*original);
    original->addData("ab", "later");
    original.reset();
    EXPECT_THAT(find(copy, "ab"), ElementsAre("root", "ab"));
    EXPECT_THAT(find(copy, "ac"), ElementsAre("root", "ac"));
    EXPECT_THAT(find(copy, "\xff"), ElementsAre("root", "high"));
    EXPECT_THAT(find(copy, std::string(1, '\0')), ElementsAre("root", "nul"));
    EXPECT_EQ(nullptr, copy._children[int{'b'}]);
}

TEST(TrieNodeTest, StoresACopyOfAValueOfItsOwn) {
    const std::string value = "longer than a string holds in itself";
    Trie trie;
    trie.addData("k", value);
    std::vector<std::string*> results;
    // Far enough for the list to move several times.
    for (int i = 0; i < 5000; ++i) {
        trie.findData("k", results);
        trie.addData("k", *results.front());
    }
    EXPECT_EQ(std::vector<std::string>(5001, value), find(trie, "k"));
}

}  // namespace
