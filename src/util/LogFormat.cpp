#include "util/LogFormat.h"

#include <algorithm>
#include <charconv>
#include <ctime>
#include <string_view>

#include "util/Assert.h"
#include "util/LogMsgMetadata.h"
#include "util/Logger.h"
#include "util/Thread.h"
#include "util/Timeval.h"
#include "util/internal/LogAtoms.h"
#include "util/internal/LogGlobals.h"

namespace {

// Reads a run of digits into `width`, which stays as it is without a digit and for a number beyond
// 32 bits.
// Returns: the first character after the digits.
const char* readWidth(const char* p, const char* end, std::uint32_t& width) {
    return std::from_chars(p, end, width).ptr;
}

// Fits the text that `out` holds from `mark` on into the widths of an atom.
void fitWidths(std::string& out, std::size_t mark, const LogFormat::Atom& atom) {
    const std::size_t len = out.size() - mark;
    // Deliberate: a text that was cut is not padded, even when the maximum is below the minimum.
    if (len > atom.maxw) {
        out.resize(mark + atom.maxw);
    } else if (len < atom.minw) {
        if (atom.justify == '\0') {
            out.append(atom.minw - len, ' ');
        } else {
            out.insert(mark, atom.minw - len, atom.justify);
        }
    }
}

// Deliberate: a negative value, such as the time before the epoch, prints as its 64 bits unsigned.
void appendNumber(std::string& out, long long value) {
    char buf[21];  // 20 digits for 64 bits, and one to spare
    const std::to_chars_result result =
        std::to_chars(buf, buf + sizeof(buf), static_cast<unsigned long long>(value));
    const auto elen = static_cast<std::size_t>(result.ptr - buf);
    QUELTA_ASSERT(elen < sizeof(buf));
    out.append(buf, elen);
}

}  // namespace

LogFormat::LogFormat(const char* pattern) : _fmt(pattern) {
    compile();
}

LogFormat::~LogFormat() {
    for (const Atom* a = _atoms; a != _atom_end; ++a) {
        if (a->what == Atom::TIME_FMT) {
            delete a->arg.fdate;
        }
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
// Returns: the first character after it; `end` for an incomplete one.
const char* LogFormat::compileConversion(const char* p, const char* end) {
    QUELTA_ASSERT(*p == '%');
    ++p;
    Atom* const a = new_atom();
    if (*p == '-' || *p == '0') {
        a->justify = *p++ == '-' ? '\0' : '0';
    }
    p = readWidth(p, end, a->minw);
    if (*p == '.') {
        p = readWidth(p + 1, end, a->maxw);
    }
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
    if (!setKind(*a, conversion, arg, arglen)) {
        --_atom_end;
    }
    return p;
}

// Returns: false for a character that is not a conversion.
bool LogFormat::setKind(Atom& atom, char conversion, const char* arg, std::size_t arglen) {
    static constexpr std::string_view CONVERSIONS = "mncptrRud";  // in the order of Atom::Kind
    const std::size_t kind = CONVERSIONS.find(conversion);
    if (kind == std::string_view::npos) {
        return false;
    }
    atom.what = static_cast<Atom::Kind>(kind);
    if (atom.what == Atom::STR) {
        // Deliberate: keeps its widths, so "%3n" is two spaces and a newline.
        atom.arg.str = "\n";
        atom.slen = 1;
    } else if (atom.what == Atom::TIME_FMT) {
        atom.arg.fdate = new LogFormattedDate(arg, arglen);
    }
    return true;
}

// Adds literal text. Both widths are its own length, so it is never padded or cut.
void LogFormat::addLiteral(const char* begin, const char* end) {
    if (begin == end) {
        return;
    }
    Atom* const a = new_atom();
    a->what = Atom::STR;
    a->arg.str = begin;
    a->slen = static_cast<std::size_t>(end - begin);
    a->minw = a->maxw = static_cast<std::uint32_t>(a->slen);
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

void LogFormat::apply(std::string& out, const LogMsgMetadata& mdata, std::string_view msg) const {
    CachedTm tm;
    for (const Atom* a = _atoms; a != _atom_end; ++a) {
        const std::size_t mark = out.size();
        switch (a->what) {
            case Atom::MSG:
                out.append(msg);
                break;
            case Atom::STR:
                out.append(a->arg.str, a->slen);
                break;
            case Atom::CATEGORY:
                out.append(mdata.category->_channel_name, mdata.category->_channel_name_len);
                break;
            case Atom::LEVEL:
                out.append(levelName(mdata.level));
                break;
            case Atom::THREADNAME:
                out.append(Thread::currentName());
                break;
            case Atom::EPOCH_MSEC:
                appendNumber(out, Timeval::msecDifference(mdata.stamp, epoch_timeval()));
                break;
            case Atom::EPOCH_SEC:
                appendNumber(out, Timeval::msecDifference(mdata.stamp, epoch_timeval()) / 1000);
                break;
            case Atom::TIME_PROC:
                appendNumber(out, std::clock());
                break;
            default:
                QUELTA_ASSERT(a->what == Atom::TIME_FMT);
                a->arg.fdate->fmt(out, tm, mdata);
        }
        fitWidths(out, mark, *a);
    }
}
