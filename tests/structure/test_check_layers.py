#!/usr/bin/env python3
"""Shows that check_layers.py reports what it is there to report."""
import pathlib
import tempfile
import unittest

import check_layers


class CheckLayers(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.root = pathlib.Path(folder.name)
        (self.root / 'src' / 'util').mkdir(parents=True)

    def problems(self, layers, **files):
        for name, text in files.items():
            (self.root / 'src' / 'util' / name.replace('_', '.')).write_text(text)
        layers_file = self.root / 'layers.txt'
        layers_file.write_text(layers)
        return check_layers.check(self.root / 'src', layers_file)[1]

    def test_accepts_includes_that_point_down(self):
        self.assertEqual([], self.problems('low: A\nhigh: B\n', A_h='', B_h='#include "util/A.h"\n'))

    def test_reports_a_header_that_includes_a_higher_layer(self):
        self.assertEqual(['A.h is in the layer low and includes util/B.h of the higher layer high'],
                         self.problems('low: A\nhigh: B\n', A_h='#include "util/B.h"\n', B_h=''))

    def test_reports_a_source_that_includes_a_higher_layer(self):
        self.assertEqual(['A.cpp is in the layer low and includes util/B.h of the higher layer high'],
                         self.problems('low: A\nhigh: B\n', A_cpp='#include "util/B.h"\n', B_h=''))

    def test_reports_a_circle(self):
        self.assertEqual(['headers include each other: A -> B -> A'],
                         self.problems('one: A B\n', A_h='#include "util/B.h"\n',
                                       B_h='#include "util/A.h"\n'))

    def test_reports_a_unit_without_a_layer(self):
        self.assertEqual(['B.h: no layer of layers.txt names this unit'], self.problems('low: A\n', A_h='', B_h=''))

    def test_reports_a_layer_that_names_nothing(self):
        self.assertEqual(['layers.txt names C, which does not exist'],
                         self.problems('low: A C\n', A_h=''))

    def test_reports_a_header_that_reaches_more_than_it_may(self):
        self.assertEqual(["C.h reaches A.h, and may reach only ['B']"],
                         self.problems('one: A B C\nonly C: B\n', A_h='',
                                       B_h='#include "util/A.h"\n', C_h='#include "util/B.h"\n'))


if __name__ == '__main__':
    unittest.main()
