#include "util/Pathname.h"

#include <algorithm>
#include <cstring>

#include "util/Assert.h"

const Pathname Pathname::root("/");
const Pathname Pathname::cur(".");
const Pathname Pathname::parent("..");

Pathname& Pathname::operator/=(const std::string& elem) {
    if (elem.empty()) {
        return *this;
    }
    // Read both before this path changes, because elem may be this path.
    const size_type length = elem.size();
    const size_type start = std::min(elem.find_first_not_of(sep), length);
    addTrailingSep();
    append(elem, start, length - start);
    return *this;
}

Pathname& Pathname::operator/=(const char* elem) {
    return *this /= std::string(elem);
}

Pathname Pathname::operator/(const std::string& elem) const {
    Pathname joined(*this);
    joined /= elem;
    return joined;
}

Pathname Pathname::operator/(const char* elem) const {
    return *this / std::string(elem);
}

void Pathname::addTrailingSep() {
    if (empty() || back() != sep) {
        push_back(sep);
    }
}

void Pathname::removeTrailingSeps() {
    while (size() > 1 && back() == sep) {
        pop_back();
    }
}

void Pathname::stripElement() {
    if (empty()) {
        return;
    }
    const size_type last = find_last_not_of(sep);
    if (last == npos) {
        resize(1);
        return;
    }
    const size_type slash = rfind(sep, last);
    if (slash == npos) {
        clear();
        return;
    }
    const size_type parentLast = find_last_not_of(sep, slash);
    resize(parentLast == npos ? 1 : parentLast + 1);
}

Pathname Pathname::toParent() const {
    Pathname result(*this);
    result.stripElement();
    return result;
}

Pathname Pathname::toLeaf() const {
    const size_type last = find_last_not_of(sep);
    if (last == npos) {
        // Not a copy of `root`, which may not be constructed yet when other units' static objects
        // call this.
        return Pathname(&sep, 1);
    }
    const size_type slash = rfind(sep, last);
    const char* const x = data() + (slash == npos ? 0 : slash + 1);
    const char* const p = data() + last + 1;
    QUELTA_ASSERT(x < p);
    return Pathname(x, static_cast<unsigned long>(p - x));
}

std::string Pathname::ext() const {
    const size_type found = find_last_of("/.");
    if (found == npos || (*this)[found] == sep) {
        return std::string();
    }
    return substr(found + 1);  // empty after a '.' at the end
}

std::string Pathname::basenameWithoutExt() const {
    const size_type slash = rfind(sep);
    const size_type start = slash == npos ? 0 : slash + 1;
    const size_type dot = rfind('.');
    const bool cuts = dot != npos && dot > start;
    return substr(start, cuts ? dot - start : npos);
}

void Pathname::removeDotDotSlash() {
    enum State { GROUND, START, GOT_ONE_DOT, GOT_TWO_DOTS };
    State state = START;
    size_type length = 0;
    // The text before a ".." ends in '/' or is empty, so the scan continues in START, and one pass
    // finds the same as a new scan after each deletion.
    for (size_type i = 0; i < size(); ++i) {
        const char c = (*this)[i];
        if (c == sep && state == GOT_TWO_DOTS) {
            length -= 2;
            state = START;
            continue;
        }
        (*this)[length++] = c;
        if (c == sep) {
            state = START;
        } else if (c == '.' && state == START) {
            state = GOT_ONE_DOT;
        } else if (c == '.' && state == GOT_ONE_DOT) {
            state = GOT_TWO_DOTS;
        } else {
            state = GROUND;
        }
    }
    if (state == GOT_TWO_DOTS) {
        // The '/' before the dots is removed too, unless it is all that is left.
        length -= length <= 3 ? 2 : 3;
    }
    resize(length);
}

void Pathname::removeDoubleSeps() {
    erase(std::unique(begin(), end(), [](char a, char b) { return a == sep && b == sep; }), end());
}

Pathname Pathname::removeDoubleSeps(const Pathname& path) {
    Pathname result(path);
    result.removeDoubleSeps();
    return result;
}

Pathname Pathname::removeDoubleSeps(const char* path) {
    return removeDoubleSeps(Pathname(path));
}

PathList::PathList(const char* list, char separator) {
    push_back_separated(list, separator);
}

PathList::PathList(const std::string& list, char separator) : PathList(list.c_str(), separator) {}

PathList::PathList(std::set<Pathname>::const_iterator first,
                   std::set<Pathname>::const_iterator last)
    : std::vector<Pathname>(first, last) {}

void PathList::push_back_separated(const char* list, char separator) {
    const char* const end = list + std::strlen(list);
    while (list != end) {
        const char* const pieceEnd = std::find(list, end, separator);
        if (pieceEnd != list) {
            emplace_back(list, static_cast<unsigned long>(pieceEnd - list));
        }
        list = pieceEnd == end ? end : pieceEnd + 1;
    }
}
