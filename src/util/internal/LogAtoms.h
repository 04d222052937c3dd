#ifndef QUELTA_UTIL_INTERNAL_LOGATOMS_H_
#define QUELTA_UTIL_INTERNAL_LOGATOMS_H_

// The growth of the atom arrays of LogFormat and LogFormattedDate.
// Not thread-safe; one thread at a time per object.

#include <algorithm>
#include <cstdint>

// Moves the used atoms [atoms, end) into a new array: 16 atoms for the first, then twice the old
// capacity.
// Owns: frees the old array; the caller releases the new one with delete[].
template <class Atom>
void growAtoms(Atom*& atoms, Atom*& end, std::uint32_t& capacity) {
    const std::uint32_t grown = capacity == 0 ? 16 : 2 * capacity;
    Atom* const array = new Atom[grown];
    end = std::copy(atoms, end, array);
    delete[] atoms;
    atoms = array;
    capacity = grown;
}

#endif  // QUELTA_UTIL_INTERNAL_LOGATOMS_H_
