#include "util/Pathname.h"

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <vector>

namespace {

// Constructed before the library's own static objects, whose order is not known to other units.
struct EarlyLeaves {
    const Pathname ofEmpty = Pathname().toLeaf();
    const Pathname ofSeparators = Pathname("///").toLeaf();
};
const EarlyLeaves EARLY_LEAVES __attribute__((init_priority(101)));

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
    EXPECT_EQ(3u, path.length());
    EXPECT_STREQ("a/b", path.c_str());
}

TEST(PathnameTest, IsAKeyOfOrderedContainers) {
    const std::set<Pathname> paths = {"b", "a/b", "a", "B", "a"};
    EXPECT_EQ((std::vector<Pathname>{"B", "a", "a/b", "b"}), PathList(paths.begin(), paths.end()));
}

TEST(PathnameTest, RecognisesAbsolutePathsAndSeparators) {
    const struct {
        const char* path;
        bool isAbsolute, containsSep;
    } rows[] = {{"", false, false},   {"a", false, false}, {"a/", false, true},
                {"a/b", false, true}, {"/", true, true},   {"/a", true, true},
                {"//", true, true},   {".", false, false}, {"\\a", false, false}};
    for (const auto& row : rows) {
        EXPECT_EQ(row.isAbsolute, Pathname(row.path).isAbsolute()) << row.path;
        EXPECT_EQ(row.containsSep, Pathname(row.path).containsSep()) << row.path;
    }
}

TEST(PathnameTest, JoinsWithOneSeparator) {
    const struct {
        const char *path, *elem, *expected;
    } rows[] = {
        {"a", "b", "a/b"},    {"a/", "b", "a/b"},      {"a/", "/b", "a/b"},
        {"a/", "//b", "a/b"}, {"a", "/b", "a/b"},      {"a", "///", "a/"},
        {"a/", "/", "a/"},    {"a//", "b", "a//b"},    {"a", "", "a"},
        {"", "", ""},         {"", "a", "/a"},         {"", "x", "/x"},
        {"", "/", "/"},       {"", "/a", "/a"},        {"/", "a", "/a"},
        {"/", "/", "/"},      {"a", "b/c/", "a/b/c/"}, {"a", "b//c", "a/b//c"},
        {"a", "..", "a/.."},
    };
    for (const auto& row : rows) {
        const Pathname path(row.path);
        EXPECT_EQ(row.expected, path / row.elem) << row.path << " / " << row.elem;
        EXPECT_EQ(row.expected, path / std::string(row.elem)) << row.path << " / " << row.elem;
        EXPECT_EQ(row.path, path);
        Pathname changed(path);
        EXPECT_EQ(&changed, &(changed /= row.elem));
        EXPECT_EQ(row.expected, changed);
        changed = path;
        EXPECT_EQ(&changed, &(changed /= std::string(row.elem)));
        EXPECT_EQ(row.expected, changed);
    }
}

TEST(PathnameTest, JoinsWithItself) {
    const std::string longName(1000, 'x');
    const struct {
        std::string path, expected;
    } rows[] = {{"", ""},
                {"/", "/"},
                {"a", "a/a"},
                {"/a", "/a/a"},
                {"a/", "a/a/"},
                {"///", "///"},
                {longName, longName + '/' + longName}};
    for (const auto& row : rows) {
        Pathname path(row.path);
        const Pathname& itself = path;
        path /= itself;
        EXPECT_EQ(row.expected, path);
        path = row.path;
        path.shrink_to_fit();
        path /= path.c_str();
        EXPECT_EQ(row.expected, path);
        path = row.path;
        EXPECT_EQ(row.expected, path / path);
    }
}

TEST(PathnameTest, JoinsSeveralElements) {
    EXPECT_EQ("a/b/c/d", Pathname("a") / Pathname("/b") / "c" / std::string("d"));
    Pathname path("a");
    (path /= "/b") /= "c";
    EXPECT_EQ("a/b/c", path);
    EXPECT_EQ("../x", Pathname::parent / "x");
}

TEST(PathnameTest, AddsAndRemovesTrailingSeparators) {
    const struct {
        const char *path, *added, *removed;
    } rows[] = {{"", "/", ""},       {"/", "/", "/"},     {"//", "//", "/"},
                {"a", "a/", "a"},    {"a/", "a/", "a"},   {"a//", "a//", "a"},
                {"/a", "/a/", "/a"}, {"///", "///", "/"}, {"//a//", "//a//", "//a"}};
    for (const auto& row : rows) {
        Pathname added(row.path), removed(row.path);
        added.addTrailingSep();
        removed.removeTrailingSeps();
        EXPECT_EQ(row.added, added) << row.path;
        EXPECT_EQ(row.removed, removed) << row.path;
    }
}

TEST(PathnameTest, StripsTheLastElement) {
    const struct {
        const char *path, *expected;
    } rows[] = {{"/a/b/", "/a"},  {"a//b", "a"}, {"/a", "/"},  {"//a", "/"},
                {"/", "/"},       {"", ""},      {"a", ""},    {"a/", ""},
                {"//", "/"},      {"///", "/"},  {"a/b", "a"}, {"/a//b//", "/a"},
                {"//a/b", "//a"}, {".", ""},     {"..", ""},   {"a/b/c", "a/b"}};
    for (const auto& row : rows) {
        Pathname path(row.path);
        EXPECT_EQ(row.expected, path.toParent()) << row.path;
        EXPECT_EQ(row.path, path);
        path.stripElement();
        EXPECT_EQ(row.expected, path) << row.path;
    }
}

TEST(PathnameTest, TakesTheLeaf) {
    const struct {
        const char *path, *expected;
    } rows[] = {{"/a/b//", "b"}, {"", "/"},    {"/", "/"},   {"///", "/"},
                {"a", "a"},      {"a/", "a"},  {"/a", "a"},  {"a/b", "b"},
                {"a//b", "b"},   {"..", ".."}, {"a/.", "."}, {"x/yz", "yz"}};
    for (const auto& row : rows) {
        EXPECT_EQ(row.expected, Pathname(row.path).toLeaf()) << row.path;
    }
}

TEST(PathnameTest, TakesTheLeafBeforeItsOwnStaticObjectsExist) {
    EXPECT_EQ("/", EARLY_LEAVES.ofEmpty);
    EXPECT_EQ("/", EARLY_LEAVES.ofSeparators);
}

// A leading dot counts for the extension only, a trailing one ends the name only.
TEST(PathnameTest, TakesTheExtensionAndTheNameWithoutIt) {
    const struct {
        const char *path, *ext, *basename;
    } rows[] = {
        {"", "", ""},
        {"/", "", ""},
        {"a", "", "a"},
        {"a.txt", "txt", "a"},
        {"a.tar.gz", "gz", "a.tar"},
        {"x/a.b.c", "c", "a.b"},
        {"x.y/a", "", "a"},
        {"x.y/", "", ""},
        {"a.b/", "", ""},
        {".bashrc", "bashrc", ".bashrc"},
        {"dir/.bashrc", "bashrc", ".bashrc"},
        {".a.b", "b", ".a"},
        {"file.", "", "file"},
        {"a.b.", "", "a.b"},
        {"a..b", "b", "a."},
        {".", "", "."},
        {"..", "", "."},
        {"...", "", ".."},
        {"a/.", "", "."},
        {"a/..", "", "."},
        {"..a", "a", "."},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(row.ext, Pathname(row.path).ext()) << row.path;
        EXPECT_EQ(row.basename, Pathname(row.path).basenameWithoutExt()) << row.path;
    }
}

TEST(PathnameTest, DeletesDotDotElementsWithoutResolvingThem) {
    const struct {
        const char *path, *expected;
    } rows[] = {
        {"a/../b", "a/b"},
        {"../../etc", "etc"},
        {"..", ""},
        {"/..", "/"},
        {"ab/..", "ab"},
        {"a/..", "a"},
        {"//..", "/"},
        {"..//a", "/a"},
        {"a//..", "a/"},
        {"x/...", "x/..."},
        {"..a", "..a"},
        {"a..", "a.."},
        {"...", "..."},
        {"", ""},
        {"/", "/"},
        {".", "."},
        {"./..", "."},
        {"../", ""},
        {"/../", "/"},
        {"../..", ""},
        {"../../..", ""},
        {"a/../..", "a"},
        {"/../..", "/"},
        {"/a/../../b", "/a/b"},
        {"a/..b/c", "a/..b/c"},
        {"a/./..", "a/."},
        {"///..", "//"},
        {"../.", "."},
    };
    for (const auto& row : rows) {
        Pathname path(row.path);
        path.removeDotDotSlash();
        EXPECT_EQ(row.expected, path) << row.path;
    }
}

TEST(PathnameTest, CollapsesRunsOfSeparators) {
    const struct {
        const char *path, *expected;
    } rows[] = {{"//a///b", "/a/b"}, {"////", "/"}, {"/", "/"},         {"", ""},
                {"a/b", "a/b"},      {"a//", "a/"}, {"a//b//", "a/b/"}, {"//", "/"}};
    for (const auto& row : rows) {
        Pathname path(row.path);
        EXPECT_EQ(row.expected, Pathname::removeDoubleSeps(path)) << row.path;
        EXPECT_EQ(row.expected, Pathname::removeDoubleSeps(row.path)) << row.path;
        EXPECT_EQ(row.expected, Pathname::removeDoubleSeps(std::string(row.path))) << row.path;
        EXPECT_EQ(row.path, path);
        path.removeDoubleSeps();
        EXPECT_EQ(row.expected, path) << row.path;
    }
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
    } rows[] = {{":a::b:", ':', {"a", "b"}},
                {"", ':', {}},
                {":", ':', {}},
                {":::", ':', {}},
                {"a", ':', {"a"}},
                {"b:a:b", ':', {"b", "a", "b"}},
                {" a : b ", ':', {" a ", " b "}},
                {"/x//y/:../z", ':', {"/x//y/", "../z"}},
                {"a:b", ',', {"a:b"}},
                {"a,b", ',', {"a", "b"}},
                {"a/b", '/', {"a", "b"}},
                {"a:b", '\0', {"a:b"}}};
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
