#include "util/Pathname.h"

#include <gtest/gtest.h>

#include <cstring>
#include <set>
#include <string>
#include <vector>

#include "support/Examples.h"

namespace {

// Constructed before the library's own static objects, whose order is not known to other units.
struct EarlyLeaves {
    const Pathname ofEmpty = Pathname().toLeaf();
    const Pathname ofSeparators = Pathname("///").toLeaf();
};
const EarlyLeaves EARLY_LEAVES __attribute__((init_priority(101)));

// expectEach for an operation that changes its path.
void expectEdits(void (Pathname::*edit)(), Examples examples) {
    expectEach(
        [edit](Pathname path) {
            (path.*edit)();
            return path;
        },
        examples);
}

TEST(PathnameTest, HasTheSpecialPathsAndEnumerators) {
    EXPECT_EQ('/', Pathname::sep);
    EXPECT_EQ("/", Pathname::root);
    EXPECT_EQ(".", Pathname::cur);
    EXPECT_EQ("..", Pathname::parent);
    EXPECT_EQ(0, Pathname::CREATE_NORMAL);
    EXPECT_EQ(1, Pathname::CREATE_PRIVATE);
    EXPECT_EQ(2, Pathname::CREATE_READABLE_NONPUBLIC);
    EXPECT_EQ(0, Pathname::MKDIR_PRIVATE);
    EXPECT_EQ(1, Pathname::MKDIR_GROUP_RW);
    EXPECT_EQ(2, Pathname::MKDIR_PUBLIC);
    EXPECT_EQ(3, Pathname::MKDIR_WORLD_READ);
}

TEST(PathnameTest, IsBuiltFromStrings) {
    const std::string text = "a/b";
    EXPECT_EQ("", Pathname());
    EXPECT_EQ("a/b", Pathname("a/b"));
    EXPECT_EQ("a/b", Pathname(text));
    EXPECT_EQ("a/b", Pathname(Pathname(text)));
    EXPECT_EQ("a/", Pathname("a/bcd", 2));
    EXPECT_EQ(std::string("a\0b", 3), Pathname("a\0b", 3));
    Pathname assigned;
    assigned = text;
    EXPECT_EQ("a/b", assigned);
    assigned = "c";
    EXPECT_EQ("c", assigned);
}

TEST(PathnameTest, ComparesAsTheStringItIs) {
    const Pathname path("a/b"), later("a/c");
    const std::string text = "a/b";
    EXPECT_TRUE(path == "a/b" && "a/b" == path && path == text && text == path);
    EXPECT_TRUE(path != later && path < later && path < "b" && later > text);
    EXPECT_EQ("a/b.c", path + ".c");
}

TEST(PathnameTest, IsAKeyOfOrderedContainers) {
    const std::set<Pathname> paths = {"b", "a/b", "a", "B", "a"};
    EXPECT_EQ((std::vector<Pathname>{"B", "a", "a/b", "b"}), PathList(paths.begin(), paths.end()));
}

TEST(PathnameTest, RecognisesAbsolutePathsAndSeparators) {
    for (const char* const path : {"", "a", "a/", "a/b", "/", "/a", "//", ".", "\\a"}) {
        EXPECT_EQ(path[0] == '/', Pathname(path).isAbsolute()) << path;
        EXPECT_EQ(std::strchr(path, '/') != nullptr, Pathname(path).containsSep()) << path;
    }
}

TEST(PathnameTest, JoinsWithOneSeparator) {
    const struct {
        const char *path, *elem, *expected;
    } rows[] = {
        {"a", "b", "a/b"},    {"a/", "b", "a/b"},      {"a/", "/b", "a/b"},
        {"a/", "//b", "a/b"}, {"a", "/b", "a/b"},      {"a", "///", "a/"},
        {"a/", "/", "a/"},    {"a//", "b", "a//b"},    {"a", "", "a"},
        {"", "", ""},         {"", "a", "/a"},         {"/", "a", "/a"},
        {"", "/", "/"},       {"", "/a", "/a"},        {"a", "..", "a/.."},
        {"/", "/", "/"},      {"a", "b/c/", "a/b/c/"}, {"a", "b//c", "a/b//c"},
    };
    for (const auto& row : rows) {
        const Pathname path(row.path);
        EXPECT_EQ(row.expected, path / row.elem) << row.path << " / " << row.elem;
        EXPECT_EQ(row.expected, path / std::string(row.elem)) << row.path << " / " << row.elem;
        Pathname changed(path);
        EXPECT_EQ(&changed, &(changed /= row.elem));
        EXPECT_EQ(row.expected, changed);
        changed = path;
        EXPECT_EQ(&changed, &(changed /= std::string(row.elem)));
        EXPECT_EQ(row.expected, changed);
    }
    EXPECT_EQ("../a/b/c", Pathname::parent / Pathname("/a") / "b" / std::string("c"));
}

TEST(PathnameTest, JoinsWithItself) {
    const auto join = [](Pathname path) {
        path.shrink_to_fit();
        Pathname other(path);
        other /= static_cast<const Pathname&>(other);
        path /= path.c_str();
        EXPECT_EQ(other, path);
        return path;
    };
    const std::string x(1000, 'x');
    expectEach(join, {" > ", "/ > /", "a > a/a", "/a > /a/a", "a/ > a/a/", "/// > ///",
                      x + " > " + x + '/' + x});
}

TEST(PathnameTest, AddsAndRemovesTrailingSeparators) {
    expectEdits(&Pathname::addTrailingSep, {" > /", "/ > /", "// > //", "a > a/", "a/ > a/",
                                            "a// > a//", "/a > /a/", "//a// > //a//"});
    expectEdits(&Pathname::removeTrailingSeps, {" > ", "/ > /", "// > /", "/// > /", "a > a",
                                                "a/ > a", "a// > a", "/a > /a", "//a// > //a"});
}

TEST(PathnameTest, StripsTheLastElement) {
    const Examples examples = {"/a/b/ > /a",  "a//b > a", "/a > /",  "//a > /",
                               "/ > /",       " > ",      "a > ",    "a/ > ",
                               "// > /",      "/// > /",  "a/b > a", "/a//b// > /a",
                               "//a/b > //a", ". > ",     ".. > ",   "a/b/c > a/b"};
    expectEdits(&Pathname::stripElement, examples);
    expectEach([](const Pathname& path) { return path.toParent(); }, examples);
}

TEST(PathnameTest, TakesTheLeaf) {
    expectEach([](const Pathname& path) { return path.toLeaf(); },
               {"/a/b// > b", " > /", "/ > /", "/// > /", "a > a", "a/ > a", "/a > a", "a/b > b",
                "a//b > b", ".. > ..", "a/. > .", "x/yz > yz"});
    EXPECT_EQ("/", EARLY_LEAVES.ofEmpty);
    EXPECT_EQ("/", EARLY_LEAVES.ofSeparators);
}

// A leading dot counts for the extension only, a trailing one ends the name only.
TEST(PathnameTest, TakesTheExtensionAndTheNameWithoutIt) {
    expectEach([](const Pathname& path) { return path.ext(); },
               {" > ", "/ > ", "a > ", "a.txt > txt", "a.tar.gz > gz", "x/a.b.c > c", "x.y/a > ",
                "x.y/ > ", ".bashrc > bashrc", "d/.bashrc > bashrc", ".a.b > b", "file. > ",
                "a.b. > ", "a..b > b", ". > ", ".. > ", "a/.. > ", "..a > a"});
    expectEach(
        [](const Pathname& path) { return path.basenameWithoutExt(); },
        {" > ", "/ > ", "a > a", "a.txt > a", "a.tar.gz > a.tar", "x/a.b.c > a.b", "x.y/a > a",
         "x.y/ > ", ".bashrc > .bashrc", "d/.bashrc > .bashrc", ".a.b > .a", "file. > file",
         "a.b. > a.b", "a..b > a.", ". > .", ".. > .", "a/.. > .", "..a > ."});
}

TEST(PathnameTest, DeletesDotDotElementsWithoutResolvingThem) {
    expectEdits(&Pathname::removeDotDotSlash,
                {"a/../b > a/b", "../../etc > etc", ".. > ", "/.. > /", "ab/.. > ab", "a/.. > a",
                 "//.. > /", "..//a > /a", "a//.. > a/", "x/... > x/...", "..a > ..a", "a.. > a..",
                 "... > ...", " > ", "/ > /", ". > ."});
    expectEdits(
        &Pathname::removeDotDotSlash,
        {"./.. > .", "../ > ", "/../ > /", "../.. > ", "a/../.. > a", "/../.. > /",
         "/a/../../b > /a/b", "a/..b/c > a/..b/c", "a/./.. > a/.", "///.. > //", "../. > ."});
}

TEST(PathnameTest, CollapsesRunsOfSeparators) {
    const Examples examples = {"//a///b > /a/b", "//// > /", "/ > /",         " > ",
                               "a/b > a/b",      "a// > a/", "a//b// > a/b/", "// > /"};
    expectEdits(&Pathname::removeDoubleSeps, examples);
    using Collapsed = Pathname (*)(const Pathname&);
    expectEach(static_cast<Collapsed>(&Pathname::removeDoubleSeps), examples);
    EXPECT_EQ("/a/", Pathname::removeDoubleSeps("//a//"));
}

TEST(PathnameTest, RemovesFromLongPathsInLinearTime) {
    constexpr unsigned long ELEMENTS = 4000000;
    std::string dots, seps;
    for (unsigned long i = 0; i < ELEMENTS; ++i) {
        dots += "../";
        seps += "//a";
    }
    Pathname path(dots + "end");
    path.removeDotDotSlash();
    EXPECT_EQ("end", path);
    path = seps;
    path.removeDoubleSeps();
    EXPECT_EQ(2 * ELEMENTS, path.size());
}

TEST(PathListTest, KeepsEachPieceThatIsNotEmpty) {
    const struct {
        const char* list;
        char separator;
        std::vector<Pathname> expected;
    } rows[] = {
        {":a::b:", ':', {"a", "b"}},
        {"", ':', {}},
        {":::", ':', {}},
        {"b:a:b", ':', {"b", "a", "b"}},
        {" a : b ", ':', {" a ", " b "}},
        {"/x//y/:../z", ':', {"/x//y/", "../z"}},
        {"a:b", ',', {"a:b"}},
        {"a/b", '/', {"a", "b"}},
        {"a:b", '\0', {"a:b"}},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(row.expected, PathList(row.list, row.separator)) << row.list;
        EXPECT_EQ(row.expected, PathList(std::string(row.list), row.separator)) << row.list;
    }
}

TEST(PathListTest, AppendsAfterWhatItHolds) {
    PathList list("z:a", ':');
    list.push_back_separated("a,:", ',');
    EXPECT_EQ((std::vector<Pathname>{"z", "a", "a", ":"}), list);
}

TEST(PathListTest, SeparatesByAColonByDefault) {
    EXPECT_EQ(':', PathList::listSep);
    const std::vector<Pathname> expected = {"a", "b,c"};
    EXPECT_EQ(expected, PathList("a:b,c"));
    EXPECT_EQ(expected, PathList(std::string("a:b,c")));
    PathList list;
    EXPECT_TRUE(list.empty());
    list.push_back_separated("a:b,c");
    EXPECT_EQ(expected, list);
}

}  // namespace
