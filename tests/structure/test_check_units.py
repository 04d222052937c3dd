#!/usr/bin/env python3
"""Tests that check_units.py reports each problem that it looks for."""
import pathlib
import tempfile
import unittest

import check_units


class CheckUnits(unittest.TestCase):
    def problems(self, listed, **files):
        """The problems of a project with this list, these files and the programs ATest, BTest."""
        with tempfile.TemporaryDirectory() as directory:
            root = pathlib.Path(directory)
            (root / 'src' / 'util').mkdir(parents=True)
            (root / 'tests').mkdir()
            (root / 'tests' / 'CMakeLists.txt').write_text('quelta_test(ATest)\n'
                                                           'quelta_test(\n  BTest)')
            (root / 'tests' / 'units.txt').write_text(listed)
            for name, text in files.items():
                (root / 'src' / 'util' / name.replace('_', '.')).write_text(text)
            return check_units.check(root)[1]

    def test_reports_each_problem(self):
        two_layers, one_layer = 'low A\nhigh B\n', 'one A\none B\n'
        include_a, include_b = '#include "util/A.h"\n', '#include "util/B.h"\n'
        for expected, listed, files in [
            ([], two_layers, {'A_h': '', 'B_h': include_a}),
            (['A.h is in the layer low and includes util/B.h of the higher layer high'],
             two_layers, {'A_h': include_b, 'B_h': ''}),
            (['A.cpp is in the layer low and includes util/B.h of the higher layer high'],
             two_layers, {'A_cpp': include_b, 'B_h': ''}),
            (['headers include each other: A -> B -> A'],
             one_layer, {'A_h': include_b, 'B_h': include_a}),
            (['B.h: units.txt does not list this unit'], 'low A\n', {'A_h': '', 'B_h': ''}),
            (['units.txt lists B, which has no file'], one_layer, {'A_h': ''}),
            (['C has no test program'], 'low C\n', {'C_h': ''}),
            (['units.txt lists CTest for A, and there is no such program'],
             'low A CTest\n', {'A_h': ''}),
            (["C.h reaches A.h, and may reach only ['B']"], one_layer + 'one C BTest\nonly C B\n',
             {'A_h': '', 'B_h': include_a, 'C_h': include_b}),
        ]:
            with self.subTest(expected):
                self.assertEqual(expected, self.problems(listed, **files))


if __name__ == '__main__':
    unittest.main()
