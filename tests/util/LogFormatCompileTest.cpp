// What a pattern is compiled to: the atoms, their widths and where their texts lie.

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <ctime>
#include <ostream>
#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

#include "util/LogFormat.h"

namespace {

using Atom = LogFormat::Atom;

constexpr std::uint32_t NO_LIMIT = 0xffffffff;

struct Expected {
    Atom::Kind what;
    std::string text;  // STR only
    std::uint32_t minw = 0;
    std::uint32_t maxw = NO_LIMIT;
    char justify = ' ';

    bool operator==(const Expected&) const = default;
};

std::ostream& operator<<(std::ostream& out, const Expected& e) {
    return out << "{kind " << e.what << " \"" << e.text << "\" " << e.minw << ".." << e.maxw
               << " justify " << int{e.justify} << "}";
}

Expected literal(const std::string& text) {
    const auto width = static_cast<std::uint32_t>(text.size());
    return {Atom::STR, text, width, width, '\0'};
}

std::vector<Expected> atomsOf(const LogFormat& layout) {
    std::vector<Expected> atoms;
    for (const Atom* a = layout._atoms; a != layout._atom_end; ++a) {
        const std::string text = a->what == Atom::STR ? std::string(a->arg.str, a->slen) : "";
        atoms.push_back({a->what, text, a->minw, a->maxw, a->justify});
    }
    return atoms;
}

struct Case {
    const char* pattern;
    std::vector<Expected> atoms;
};

void expectAtoms(const std::vector<Case>& cases) {
    for (const Case& c : cases) {
        const LogFormat layout(c.pattern);
        EXPECT_EQ(c.atoms, atomsOf(layout)) << "pattern \"" << c.pattern << '"';
    }
}

}  // namespace

TEST(LogFormatCompileTest, KindsHaveTheirFixedValues) {
    EXPECT_EQ(0u, Atom::MSG);
    EXPECT_EQ(1u, Atom::STR);
    EXPECT_EQ(2u, Atom::CATEGORY);
    EXPECT_EQ(3u, Atom::LEVEL);
    EXPECT_EQ(4u, Atom::THREADNAME);
    EXPECT_EQ(5u, Atom::EPOCH_MSEC);
    EXPECT_EQ(6u, Atom::EPOCH_SEC);
    EXPECT_EQ(7u, Atom::TIME_PROC);
    EXPECT_EQ(8u, Atom::TIME_FMT);
    EXPECT_EQ(0u, LogFormattedDate::Atom::STRFTIME);
    EXPECT_EQ(1u, LogFormattedDate::Atom::MSEC);
}

TEST(LogFormatCompileTest, FieldsStandInTheirOrder) {
    EXPECT_EQ(0u, offsetof(Atom, what));
    EXPECT_LT(offsetof(Atom, what), offsetof(Atom, arg));
    EXPECT_LT(offsetof(Atom, arg), offsetof(Atom, slen));
    EXPECT_LT(offsetof(Atom, slen), offsetof(Atom, minw));
    EXPECT_LT(offsetof(Atom, minw), offsetof(Atom, maxw));
    EXPECT_LT(offsetof(Atom, maxw), offsetof(Atom, justify));

    EXPECT_EQ(0u, offsetof(LogFormat, _fmt));
    EXPECT_LT(offsetof(LogFormat, _fmt), offsetof(LogFormat, _atoms));
    EXPECT_LT(offsetof(LogFormat, _atoms), offsetof(LogFormat, _atom_end));
    EXPECT_LT(offsetof(LogFormat, _atom_end), offsetof(LogFormat, _max_atoms));

    EXPECT_EQ(0u, offsetof(LogFormattedDate, _atoms));
    EXPECT_LT(offsetof(LogFormattedDate, _atoms), offsetof(LogFormattedDate, _atom_end));
    EXPECT_LT(offsetof(LogFormattedDate, _atom_end), offsetof(LogFormattedDate, _max_atoms));
    EXPECT_LT(offsetof(LogFormattedDate, _max_atoms), offsetof(LogFormattedDate, _sstor));

    EXPECT_EQ(0u, offsetof(CachedTm, _stamp));
    EXPECT_LT(offsetof(CachedTm, _stamp), offsetof(CachedTm, _stampSet));
}

TEST(LogFormatCompileTest, FieldsHaveTheirTypes) {
    Atom atom;
    EXPECT_TRUE((std::is_same_v<const char*, decltype(atom.arg.str)>));
    EXPECT_TRUE((std::is_same_v<LogFormattedDate*, decltype(atom.arg.fdate)>));
    EXPECT_TRUE((std::is_same_v<std::size_t, decltype(atom.slen)>));
    EXPECT_TRUE((std::is_same_v<std::uint32_t, decltype(atom.minw)>));
    EXPECT_TRUE((std::is_same_v<std::uint32_t, decltype(atom.maxw)>));
    EXPECT_TRUE((std::is_same_v<char, decltype(atom.justify)>));
    EXPECT_TRUE((std::is_same_v<std::uint32_t, decltype(LogFormat::_max_atoms)>));
    EXPECT_TRUE((std::is_same_v<std::uint32_t, decltype(LogFormattedDate::_max_atoms)>));
    EXPECT_TRUE((std::is_same_v<struct tm, decltype(CachedTm::_stamp)>));
    EXPECT_TRUE((std::is_same_v<bool, decltype(CachedTm::_stampSet)>));
    EXPECT_TRUE((std::is_same_v<std::size_t (CachedTm::*)(char*, std::size_t, const char*,
                                                          const LogMsgMetadata&),
                                decltype(&CachedTm::ftime)>));
}

TEST(LogFormatCompileTest, EveryConversionCharacterHasItsKind) {
    expectAtoms({{"%m", {{Atom::MSG, ""}}},
                 {"%n", {{Atom::STR, "\n"}}},
                 {"%c", {{Atom::CATEGORY, ""}}},
                 {"%p", {{Atom::LEVEL, ""}}},
                 {"%t", {{Atom::THREADNAME, ""}}},
                 {"%r", {{Atom::EPOCH_MSEC, ""}}},
                 {"%R", {{Atom::EPOCH_SEC, ""}}},
                 {"%u", {{Atom::TIME_PROC, ""}}},
                 {"%d", {{Atom::TIME_FMT, ""}}}});
}

TEST(LogFormatCompileTest, NoOtherCharacterIsAConversion) {
    for (int c = 1; c < 256; ++c) {
        const char letter = static_cast<char>(c);
        if (std::string_view("mncptrRud%-0123456789.").find(letter) != std::string_view::npos) {
            continue;
        }
        const std::string pattern = std::string("a%") + letter + "b";
        EXPECT_EQ((std::vector<Expected>{literal("a"), literal("b")}),
                  atomsOf(LogFormat(pattern.c_str())))
            << "conversion character " << c;
    }
}

TEST(LogFormatCompileTest, LiteralsAreCutAfterTheFirstOfADoubledPercentSign) {
    expectAtoms({{"", {}},
                 {"plain", {literal("plain")}},
                 {"%%", {literal("%")}},
                 {"%%%%", {literal("%"), literal("%")}},
                 {"a%%b", {literal("a%"), literal("b")}},
                 {"100%% %m", {literal("100%"), literal(" "), {Atom::MSG, ""}}},
                 {"%%%m", {literal("%"), {Atom::MSG, ""}}},
                 {"%m%%", {{Atom::MSG, ""}, literal("%")}},
                 {"%%m", {literal("%"), literal("m")}}});
}

TEST(LogFormatCompileTest, LiteralsPointIntoThePrivateCopyOfThePattern) {
    std::string pattern = "left %m right";
    const LogFormat layout(pattern.c_str());
    pattern.assign(pattern.size(), '#');
    ASSERT_EQ(3, layout._atom_end - layout._atoms);
    EXPECT_EQ(layout._fmt.data(), layout._atoms[0].arg.str);
    EXPECT_EQ(layout._fmt.data() + 7, layout._atoms[2].arg.str);
    EXPECT_EQ("left %m right", layout._fmt);
}

TEST(LogFormatCompileTest, FlagsAndWidths) {
    expectAtoms({{"%5m", {{Atom::MSG, "", 5}}},
                 {"%-5m", {{Atom::MSG, "", 5, NO_LIMIT, '\0'}}},
                 {"%05m", {{Atom::MSG, "", 5, NO_LIMIT, '0'}}},
                 {"%0m", {{Atom::MSG, "", 0, NO_LIMIT, '0'}}},
                 {"%-m", {{Atom::MSG, "", 0, NO_LIMIT, '\0'}}},
                 {"%.7m", {{Atom::MSG, "", 0, 7}}},
                 {"%.0m", {{Atom::MSG, "", 0, 0}}},
                 {"%3.7m", {{Atom::MSG, "", 3, 7}}},
                 {"%-3.7m", {{Atom::MSG, "", 3, 7, '\0'}}},
                 {"%7.3m", {{Atom::MSG, "", 7, 3}}},
                 {"%10.m", {{Atom::MSG, "", 10}}},
                 {"%.m", {{Atom::MSG, ""}}},
                 {"%.007m", {{Atom::MSG, "", 0, 7}}},
                 {"%3n", {{Atom::STR, "\n", 3}}},
                 {"%-3n", {{Atom::STR, "\n", 3, NO_LIMIT, '\0'}}},
                 {"%.0n", {{Atom::STR, "\n", 0, 0}}}});
}

TEST(LogFormatCompileTest, OnlyOneFlagIsRead) {
    expectAtoms({{"%-05m", {{Atom::MSG, "", 5, NO_LIMIT, '\0'}}},
                 {"%005m", {{Atom::MSG, "", 5, NO_LIMIT, '0'}}},
                 {"%0-5m", {literal("5m")}},
                 {"%--5m", {literal("5m")}},
                 {"%+5m", {literal("5m")}},
                 {"% m", {literal("m")}}});
}

TEST(LogFormatCompileTest, WidthsBeyond32BitsAreIgnored) {
    expectAtoms({{"%4294967294m", {{Atom::MSG, "", 4294967294u}}},
                 {"%4294967295m", {{Atom::MSG, "", NO_LIMIT}}},
                 {"%4294967296m", {{Atom::MSG, ""}}},
                 {"%99999999999999999999999999999999m", {{Atom::MSG, ""}}},
                 {"%.4294967294m", {{Atom::MSG, "", 0, 4294967294u}}},
                 {"%.4294967297m", {{Atom::MSG, "", 0, NO_LIMIT}}},
                 {"%.18446744073709551616m", {{Atom::MSG, "", 0, NO_LIMIT}}}});
}

TEST(LogFormatCompileTest, EveryConversionReadsAnArgumentAndOnlyTheDateUsesIt) {
    expectAtoms({{"%c{2}", {{Atom::CATEGORY, ""}}},
                 {"%m{}x", {{Atom::MSG, ""}, literal("x")}},
                 {"%n{abc}", {{Atom::STR, "\n"}}},
                 {"%q{abc}x", {literal("x")}},
                 {"%d{%H}}", {{Atom::TIME_FMT, ""}, literal("}")}},
                 {"%d{a{b}c", {{Atom::TIME_FMT, ""}, literal("c")}},
                 {"%{abc}", {literal("abc}")}},
                 {"%{{abc}x", {literal("x")}},
                 {"%m {x}", {{Atom::MSG, ""}, literal(" {x}")}}});
}

TEST(LogFormatCompileTest, AnUnterminatedArgumentEndsThePattern) {
    for (const char* const pattern :
         {"a%d{%H:%M %m", "a%c{2 %m%n", "a%q{", "a%m{", "a%n{x %m", "a%-5.7d{{"}) {
        EXPECT_EQ(std::vector<Expected>{literal("a")}, atomsOf(LogFormat(pattern))) << pattern;
    }
}

TEST(LogFormatCompileTest, AnIncompleteConversionAtTheEndIsDropped) {
    for (const char* const pattern :
         {"a%", "a%-", "a%0", "a%5", "a%-5", "a%05", "a%5.", "a%5.7", "a%.", "a%.7"}) {
        EXPECT_EQ(std::vector<Expected>{literal("a")}, atomsOf(LogFormat(pattern))) << pattern;
    }
}

TEST(LogFormatCompileTest, AConversionMayEndInAPercentSign) {
    expectAtoms({{"%5%m", {literal("m")}},
                 {"%5%%m", {{Atom::MSG, ""}}},
                 {"%-%%%", {literal("%")}},
                 {"%.5.3m", {literal("3m")}}});
}

TEST(LogFormatCompileTest, ArraysGrowFrom16ByDoubling) {
    std::string pattern;
    for (int atoms = 0; atoms <= 70; ++atoms) {
        const LogFormat layout(pattern.c_str());
        EXPECT_EQ(atoms, layout._atom_end - layout._atoms);
        const std::uint32_t expected = atoms == 0    ? 0
                                       : atoms <= 16 ? 16
                                       : atoms <= 32 ? 32
                                       : atoms <= 64 ? 64
                                                     : 128;
        EXPECT_EQ(expected, layout._max_atoms) << atoms << " atoms";
        pattern += "%m";
    }
}

TEST(LogFormatCompileTest, GrowthKeepsTheAtoms) {
    std::string pattern;
    std::vector<Expected> expected;
    for (std::uint32_t i = 0; i < 100; ++i) {
        pattern += "%" + std::to_string(i + 1) + "p%%";
        expected.push_back({Atom::LEVEL, "", i + 1});
        expected.push_back(literal("%"));
    }
    EXPECT_EQ(expected, atomsOf(LogFormat(pattern.c_str())));
}

TEST(LogFormatCompileTest, ADroppedAtomLeavesNoTrace) {
    expectAtoms({{"%-9.3q%m", {{Atom::MSG, ""}}}, {"%-09.3q%n", {{Atom::STR, "\n"}}}});
}

TEST(LogFormatDeathTest, AtomCountAboveTheCapacityIsAsserted) {
    LogFormat layout("%m");
    EXPECT_DEATH(
        {
            layout._max_atoms = 0;
            layout.new_atom();
        },
        "^src/util/LogFormat\\.cpp:[0-9]+: failed assertion `natoms == _max_atoms'\n$");
}

TEST(LogFormatDeathTest, AConversionMustBeginWithAPercentSign) {
    LogFormat layout("m");
    EXPECT_DEATH(layout.compileConversion(layout._fmt.c_str(), layout._fmt.c_str() + 1),
                 "^src/util/LogFormat\\.cpp:[0-9]+: failed assertion `\\*p == '%''\n$");
}
