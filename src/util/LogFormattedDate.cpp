#include "util/LogFormat.h"

#include <algorithm>
#include <cstring>
#include <ctime>
#include <string>
#include <string_view>

#include "util/Assert.h"
#include "util/LogMsgMetadata.h"
#include "util/Timeval.h"
#include "util/internal/LogAtoms.h"

namespace {

using std::string_view;

// The buffer stops growing at the larger of these. If strftime still yields nothing, the text is
// empty, as that of "%Z" in a zone without a name.
constexpr std::size_t MIN_BUFFER_CAP = std::size_t{1} << 20;  // bytes
constexpr std::size_t CAP_PER_CHARACTER = 256;                // bytes per character of the piece

constexpr string_view MSEC_CONVERSION = "%l";
constexpr string_view ISO8601_PATTERN = "%Y-%m-%d %H:%M:%S,%l";

// Returns: the pattern that a date argument selects: that of a name, or the argument itself.
string_view datePattern(string_view arg) {
    if (arg.empty() || arg == "ISO8601") {
        return ISO8601_PATTERN;
    }
    if (arg == "DATE") {
        return "%d %b %Y %H:%M:%S,%l";
    }
    if (arg == "ABSOLUTE") {
        return "%H:%M:%S,%l";
    }
    return arg;
}

// Appends the milliseconds of a stamp, three digits.
void appendMsec(std::string& out, const Timeval& stamp) {
    const std::string padded = std::to_string(1000 + stamp.msec() - stamp.sec() * 1000);
    out.append(padded, 1);
}

// Returns: whether strftime may legitimately produce no text for a piece, which it reports like a
// buffer that is too small. Only "%p" with any flags can: some locales have no AM and PM.
bool mayBeEmpty(const char* piece) {
    for (const char* p = piece; *p != '\0'; ++p) {
        if (*p++ != '%') {
            return false;
        }
        if (*p != '\0' && std::strchr("_-^#", *p) != nullptr) {
            ++p;
        }
        while (*p >= '0' && *p <= '9') {
            ++p;
        }
        if (*p == 'E' || *p == 'O') {
            ++p;
        }
        if (*p != 'p') {
            return false;
        }
    }
    return true;
}

void appendPiece(std::string& out, CachedTm& tm, const char* piece, const LogMsgMetadata& mdata) {
    char first[64];
    std::string larger;
    char* buf = first;
    std::size_t size = sizeof(first);
    for (;;) {
        const std::size_t len = tm.ftime(buf, size, piece, mdata);
        if (len > 0 && len < size) {
            out.append(buf, len);
            return;
        }
        if ((len == 0 && mayBeEmpty(piece)) ||
            size >= std::max(MIN_BUFFER_CAP, CAP_PER_CHARACTER * std::strlen(piece))) {
            return;
        }
        size *= 2;
        larger.resize(size);
        buf = larger.data();
    }
}

}  // namespace

// The format comes from a configuration file, so the compiler cannot check it.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
std::size_t CachedTm::ftime(char* buf, std::size_t size, const char* fmt,
                            const LogMsgMetadata& mdata) {
    if (!_stampSet) {
        mdata.stamp.localtime(_stamp);
        _stampSet = true;
    }
    return std::strftime(buf, size, fmt, &_stamp);
}
#pragma GCC diagnostic pop

LogFormattedDate::LogFormattedDate(const char* fmtstr, std::size_t fmtlen) {
    const string_view pattern =
        datePattern(fmtstr == nullptr ? string_view() : string_view(fmtstr, fmtlen));
    compile(pattern.data(), pattern.data() + pattern.size());
}

LogFormattedDate::~LogFormattedDate() {
    while (_sstor != nullptr) {
        StringStorage* const node = _sstor;
        _sstor = node->next;
        delete[] node->str;
        delete node;
    }
    delete[] _atoms;
}

// Splits [fmtstr, fmtend) at every "%l".
// Deliberate: "%l" is recognised wherever the two characters occur, even after another "%".
void LogFormattedDate::compile(const char* fmtstr, const char* fmtend) {
    const char* p = fmtstr;
    while (p < fmtend) {
        if (!string_view(p, static_cast<std::size_t>(fmtend - p)).starts_with(MSEC_CONVERSION)) {
            ++p;
            continue;
        }
        addPiece(fmtstr, p);
        new_atom()->what = Atom::MSEC;
        p += MSEC_CONVERSION.size();
        QUELTA_ASSERT(p > fmtstr);
        QUELTA_ASSERT(p <= fmtend);
        fmtstr = p;
    }
    QUELTA_ASSERT(p == fmtend);
    addPiece(fmtstr, fmtend);
}

void LogFormattedDate::addPiece(const char* begin, const char* end) {
    if (begin == end) {
        return;
    }
    const char* const piece = store_string(begin, static_cast<std::size_t>(end - begin));
    Atom* const a = new_atom();
    a->what = Atom::STRFTIME;
    a->str = piece;
}

// Returns: the next free atom, in its initial state and counted as used.
LogFormattedDate::Atom* LogFormattedDate::new_atom() {
    const auto natoms = static_cast<std::size_t>(_atom_end - _atoms);
    if (natoms >= _max_atoms) {
        QUELTA_ASSERT(natoms == _max_atoms);
        growAtoms(_atoms, _atom_end, _max_atoms);
    }
    *_atom_end = Atom();
    return _atom_end++;
}

// Returns: a NUL-terminated copy that lives as long as this object.
const char* LogFormattedDate::store_string(const char* str, std::size_t len) {
    char* const copy = new char[len + 1];
    copy[std::string_view(str, len).copy(copy, len)] = '\0';
    _sstor = new StringStorage{copy, _sstor};
    return copy;
}

void LogFormattedDate::fmt(std::string& out, CachedTm& tm, const LogMsgMetadata& mdata) const {
    for (const Atom* a = _atoms; a != _atom_end; ++a) {
        if (a->what == Atom::MSEC) {
            appendMsec(out, mdata.stamp);
        } else {
            appendPiece(out, tm, a->str, mdata);
        }
    }
}
