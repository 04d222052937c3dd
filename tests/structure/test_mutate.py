#!/usr/bin/env python3
"""Tests how mutate.py names the place of a mutant, and that it reports rows without a mutant."""
import contextlib
import io
import pathlib
import sys
import tempfile
import unittest

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parent.parent / 'mutation'))
import mutate  # noqa: E402

SOURCE = r'''
#include "a < b"
#define TWO \
    2
namespace {
constexpr long LIMIT = long{1} << 20;  // 3
enum class Kind : int { FIRST = 0 };
bool isLess(int a, int b = 7) {
    return a < b && TWO < b;
}
}  // namespace
struct Counter {
    Counter() : _count{1} { /* 4 */ }
    bool operator==(const Counter& other) const { return _count == other._count; }
    int _count = 0;
    static const char* const NAMES[];
};
const char* const Counter::NAMES[] = {
    "5 == 5",
};
void Counter::print() {
    QUELTA_ASSERT(_count == 6);
    std::printf("%d", !isLess(_count, 8));
}
'''


class Mutate(unittest.TestCase):
    def mutants(self):
        with tempfile.TemporaryDirectory() as directory:
            (pathlib.Path(directory) / 'a.cpp').write_text(SOURCE)
            return list(mutate.mutants(pathlib.Path('a.cpp'), pathlib.Path(directory)))

    def test_names_the_place_of_each_mutant(self):
        self.assertEqual([
            ('LIMIT', '1 -> 2', 1), ('LIMIT', '20 -> 21', 1), ('Kind', '0 -> 1', 1),
            ('isLess', '7 -> 8', 1), ('isLess', '< -> <=', 1), ('isLess', '< -> <=', 2),
            ('isLess', '&& -> ||', 1), ('Counter::Counter', '1 -> 2', 1),
            ('Counter::operator==', '== -> !=', 1), ('Counter::_count', '0 -> 1', 1),
            ('Counter::print', '! ->', 1), ('Counter::print', '8 -> 9', 1),
        ], [mutant.key[1:] for mutant in self.mutants()])

    def test_changes_the_line_at_the_place(self):
        self.assertEqual('    return a < b && TWO <= b;', self.mutants()[5].mutated)

    def test_reports_a_row_that_names_no_mutant_and_one_that_is_listed_twice(self):
        present = {mutant.key for mutant in self.mutants()}
        row = ('a.cpp', 'LIMIT', '1 -> 2', 1)
        with contextlib.redirect_stdout(io.StringIO()):
            self.assertEqual(0, mutate.check_explained([row], present))
            self.assertEqual(1, mutate.check_explained([row, row], present))
            self.assertEqual(1, mutate.check_explained([('a.cpp', 'LIMIT', '1 -> 2', 2)], present))


if __name__ == '__main__':
    unittest.main()
