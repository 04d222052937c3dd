#include "util/LogFormat.h"

#include <algorithm>
#include <charconv>
#include <cstring>
#include <limits>

#include "util/Assert.h"
#include "util/LogAtoms.h"

namespace {

constexpr std::uint32_t MAX_WIDTH = std::numeric_limits<std::uint32_t>::max();

// Reads a run of digits into `width`; a number beyond 32 bits reads as the largest. Without a
// digit `width` stays as it is.
// Returns: the first character behind the digits.
const char* readWidth(const char* p, std::uint32_t& width) {
    if (*p < '0' || *p > '9')
        return p;
    std::uint64_t value = 0;
    for (; *p >= '0' && *p <= '9'; ++p)
        value = std::min<std::uint64_t>(value * 10 + static_cast<unsigned>(*p - '0'), MAX_WIDTH);
    width = static_cast<std::uint32_t>(value);
    return p;
}

}  // namespace

// Delegates, so that the destructor releases what was built when an allocation fails half way.
LogFormat::LogFormat(const char* pattern) : LogFormat() {
    QUELTA_ASSERT(pattern != nullptr);
    _fmt = pattern;
    compile();
}

LogFormat::~LogFormat() {
    for (const Atom* a = _atoms; a != _atom_end; ++a) {
        if (a->what == Atom::TIME_FMT)
            delete a->arg.fdate;
    }
    delete[] _atoms;
}

void LogFormat::compile() {
    const char* p = _fmt.c_str();
    const char* const end = p + _fmt.size();
    while (p < end) {
        const char* const percent = std::find(p, end, '%');
        if (percent < end && percent[1] == '%') {
            addLiteral(p, percent + 1);
            p = percent + 2;
            continue;
        }
        addLiteral(p, percent);
        p = percent < end ? compileConversion(percent, end) : end;
    }
}

// Compiles the conversion that begins at `p`.
// Returns: the first character behind it; `end` for an incomplete one.
const char* LogFormat::compileConversion(const char* p, const char* end) {
    QUELTA_ASSERT(*p == '%');
    ++p;
    Atom* const a = new_atom();
    if (*p == '-' || *p == '0')
        a->justify = *p++ == '-' ? '\0' : '0';
    p = readWidth(p, a->minw);
    if (*p == '.')
        p = readWidth(p + 1, a->maxw);
    if (p == end) {
        --_atom_end;
        return end;
    }
    const char conversion = *p++;
    const char* arg = nullptr;
    std::size_t arglen = 0;
    if (*p == '{') {
        arg = p + 1;
        p = std::find(arg, end, '}');
        if (p == end) {
            --_atom_end;
            return end;
        }
        arglen = static_cast<std::size_t>(p - arg);
        ++p;
    }
    if (!setKind(*a, conversion, arg, arglen))
        --_atom_end;
    return p;
}

// Returns: false for a character that is no conversion.
bool LogFormat::setKind(Atom& atom, char conversion, const char* arg, std::size_t arglen) {
    switch (conversion) {
        case 'm':
            atom.what = Atom::MSG;
            return true;
        case 'n':
            // Deliberate: keeps its widths, so "%3n" is two spaces and a line feed.
            atom.what = Atom::STR;
            atom.arg.str = "\n";
            atom.slen = 1;
            return true;
        case 'c':
            atom.what = Atom::CATEGORY;
            return true;
        case 'p':
            atom.what = Atom::LEVEL;
            return true;
        case 't':
            atom.what = Atom::THREADNAME;
            return true;
        case 'r':
            atom.what = Atom::EPOCH_MSEC;
            return true;
        case 'R':
            atom.what = Atom::EPOCH_SEC;
            return true;
        case 'u':
            atom.what = Atom::TIME_PROC;
            return true;
        case 'd':
            atom.arg.fdate = new LogFormattedDate(arg, arglen);
            atom.what = Atom::TIME_FMT;
            return true;
        default:
            return false;
    }
}

// Adds literal text, whose own length as both widths keeps it from being padded or cut.
void LogFormat::addLiteral(const char* begin, const char* end) {
    if (begin == end)
        return;
    Atom* const a = new_atom();
    a->what = Atom::STR;
    a->arg.str = begin;
    a->slen = static_cast<std::size_t>(end - begin);
    a->minw = static_cast<std::uint32_t>(std::min<std::size_t>(a->slen, MAX_WIDTH));
    a->maxw = a->minw;
    a->justify = '\0';
}

// Returns: the next free atom, in its initial state and counted as used.
LogFormat::Atom* LogFormat::new_atom() {
    const auto natoms = static_cast<std::size_t>(_atom_end - _atoms);
    if (natoms >= _max_atoms) {
        QUELTA_ASSERT(natoms == _max_atoms);
        growAtoms(_atoms, _atom_end, _max_atoms);
    }
    *_atom_end = Atom();
    return _atom_end++;
}
