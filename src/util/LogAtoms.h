#ifndef QUELTA_UTIL_LOGATOMS_H_
#define QUELTA_UTIL_LOGATOMS_H_

// The growth that the two kinds of atom array have in common. Internal to the layouts.
// Not thread-safe; one thread at a time per object.

#include <algorithm>
#include <cstdint>
#include <limits>
#include <stdexcept>

// Moves the used atoms [atoms, end) into a new array: 16 atoms for the first, then twice the old
// capacity.
// Errors: std::bad_alloc, or std::length_error when 32 bits cannot count the atoms; nothing is
// changed then.
// Owns: frees the old array; the caller releases the new one with delete[].
template <class Atom>
void growAtoms(Atom*& atoms, Atom*& end, std::uint32_t& capacity) {
    if (capacity > std::numeric_limits<std::uint32_t>::max() / 2) {
        throw std::length_error("too many atoms in a log layout");
    }
    const std::uint32_t grown = capacity == 0 ? 16 : 2 * capacity;
    Atom* const array = new Atom[grown];
    end = std::copy(atoms, end, array);
    delete[] atoms;
    atoms = array;
    capacity = grown;
}

#endif  // QUELTA_UTIL_LOGATOMS_H_
