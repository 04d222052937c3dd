#!/usr/bin/env python3
"""Tests the tables that bench/report.py makes of Google Benchmark's results."""
import json
import pathlib
import sys
import tempfile
import unittest

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[2] / 'bench'))
import report  # noqa: E402


def run(name, time, **fields):
    return {'name': name, 'run_type': 'iteration', 'threads': 1, 'time_unit': 'ns',
            'real_time': time, 'cpu_time': time, **fields}


class Report(unittest.TestCase):
    def tables(self, *runs):
        with tempfile.TemporaryDirectory() as directory:
            context = {'peers that are not installed': 'spdlog '}
            text = json.dumps({'context': context, 'benchmarks': runs})
            (pathlib.Path(directory) / 'a.json').write_text(text)
            return report.tables(report.Results(pathlib.Path(directory)))

    def test_shows_medians_and_multiples_of_this_system(self):
        self.assertIn('''## A log line

|  | Logger | bare write |
|---|---|---|
| date, 1 thread | 800 ns | 400 ns (0.5) |
| date, 4 threads | 1.20 µs | – |
''', self.tables(
            *(run('log line date/Logger/real_time', time) for time in (900, 100, 800)),
            run('log line date/Logger/real_time_median', 7, run_type='aggregate'),
            run('log line date/bare write/real_time', 400),
            run('log line date/Logger/real_time/threads:4', 1.2, threads=4, time_unit='us')))

    def test_keeps_sizes_and_counters_apart(self):
        text = self.tables(run('set of urls/RuleSystem/1000/manual_time', 5e6, lookup_ns=281.4),
                           run('set of urls/RuleSystem/30000/manual_time', 2e9, bytes=1.18e9))
        for row in ('## Set of urls: build\n\n|  | RuleSystem |\n|---|---|\n'
                    '| 1,000 patterns | 5.00 ms |',
                    '| 30,000 patterns | 2.00 s |', '| 30,000 patterns | 1.18 GB |',
                    '| 1,000 patterns | 281 ns |'):
            self.assertIn(row, text)

    def test_subtracts_the_draws_from_the_whole_program(self):
        self.assertIn('| 2.50 s | 2.00 s | 500 ms (20%) | 1.25 | 1.20 GB |', self.tables(
            run('whole process/Rete/iterations:1', 1, cpu_ns=2.5e9, peak_bytes=1.2e9),
            run('whole process/random() draws alone/iterations:1', 2, time_unit='s')))

    def test_lists_what_is_left_out(self):
        text = self.tables(run('layout only/date', 1), run(
            'set of urls/RE2::Set/10', 0, error_occurred=True, error_message='out of memory'))
        self.assertIn('## Left out\n\n- set of urls, RE2::Set: out of memory\n'
                      '- spdlog: not installed', text)

    def test_refuses_results_without_a_number(self):
        with self.assertRaises(ValueError):
            self.tables()


if __name__ == '__main__':
    unittest.main()
