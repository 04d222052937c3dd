#include <algorithm>
#include <cstring>
#include <memory>
#include <string_view>

#include "util/Assert.h"
#include "util/LogAtoms.h"
#include "util/LogFormat.h"

namespace {

using std::string_view;

constexpr string_view MSEC_CONVERSION = "%l";
constexpr string_view ISO8601_PATTERN = "%Y-%m-%d %H:%M:%S,%l";

// Returns: the pattern that a date argument stands for, which is itself unless it is a name.
string_view datePattern(string_view arg) {
    if (arg.empty() || arg == "ISO8601")
        return ISO8601_PATTERN;
    if (arg == "DATE")
        return "%d %b %Y %H:%M:%S,%l";
    if (arg == "ABSOLUTE")
        return "%H:%M:%S,%l";
    return arg;
}

}  // namespace

// Delegates, so that the destructor releases what was built when an allocation fails half way.
LogFormattedDate::LogFormattedDate(const char* fmtstr, std::size_t fmtlen) : LogFormattedDate() {
    const string_view pattern =
        datePattern(fmtstr == nullptr ? string_view() : string_view(fmtstr, fmtlen));
    compile(pattern.data(), pattern.data() + pattern.size());
}

LogFormattedDate::~LogFormattedDate() {
    while (_sstor != nullptr) {
        const std::unique_ptr<StringStorage> node(_sstor);
        _sstor = node->next;
        delete[] node->str;
    }
    delete[] _atoms;
}

// Splits [fmtstr, fmtend) at every "%l".
// Deliberate: "%l" is found wherever the two characters stand, behind another "%" too.
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
    if (begin == end)
        return;
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
    auto node = std::make_unique<StringStorage>();
    node->str = new char[len + 1];
    std::memcpy(node->str, str, len);
    node->str[len] = '\0';
    node->next = _sstor;
    _sstor = node.release();
    return _sstor->str;
}
