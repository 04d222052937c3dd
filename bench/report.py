#!/usr/bin/python3
"""Turns the results of the benchmarks into Markdown tables and SVG charts.

Reads the JSON files of Google Benchmark in DIRECTORY and writes tables.md, lookup.svg and
log-line.svg there. Every number is the median of the repetitions.
"""
import argparse
import collections
import json
import pathlib
import platform
import re
import statistics

OURS = ('RuleSystem', 'trie and matcher', 'WildcardMatcher', 'Logger', 'Rete')
NANOSECONDS = {'ns': 1, 'us': 1e3, 'ms': 1e6, 's': 1e9}
SINGLE = ('middle found', 'middle missing', 'start and end', 'start and middle and end',
          'run of one letter', 'short word', 'short hit')
SETS = ('set of program', 'set of urls', 'set of short terms')
LINES = ('log line plain', 'log line date')


class Results:
    def __init__(self, directory):
        """Reads all files of the directory; raises ValueError if they hold no result."""
        self.values = collections.defaultdict(list)  # by (topic, size, threads, peer, metric)
        self.left_out = {}  # (topic, peer) to the reason
        self.missing = set()
        for path in sorted(directory.glob('*.json')):
            data = json.loads(path.read_text())
            self.missing.update(data['context'].get('peers that are not installed', '').split())
            for run in data['benchmarks']:
                if run['run_type'] == 'iteration':
                    self._add(run)
        if not self.values:
            raise ValueError(f'no results in {directory}')

    def _add(self, run):
        topic, peer, *rest = run['name'].split('/')
        if run.get('error_occurred'):
            self.left_out[topic, peer] = run['error_message']
            return
        size = int(rest[0]) if rest and rest[0].isdigit() else 0
        metrics = {name: value for name, value in run.items() if re.search('_ns$|bytes$', name)}
        for clock in ('real', 'cpu'):
            metrics[f'{clock}_time'] = run[f'{clock}_time'] * NANOSECONDS[run['time_unit']]
        for metric, value in metrics.items():
            self.values[topic, size, run['threads'], peer, metric].append(value)

    def median(self, topic, size, threads, peer, metric):
        """Returns the median of the repetitions, or None if there are none."""
        values = self.values.get((topic, size, threads, peer, metric))
        return statistics.median(values) if values else None

    def rows(self, *topics):
        """Returns the (topic, size, threads) that were measured, in the order of the topics."""
        found = {key[:3] for key in self.values if key[0] in topics}
        return sorted(found, key=lambda row: (topics.index(row[0]), *row[1:]))

    def peers(self, topics, metric):
        """Returns the peers with that metric, this system's first."""
        found = {key[3] for key in self.values if key[0] in topics and key[4] == metric}
        return sorted(found, key=lambda peer: (peer not in OURS, peer))


def human(value, is_bytes=False):
    """Returns the value with three significant digits and its unit."""
    if value is None:
        return '–'
    units = ('B', 'kB', 'MB', 'GB') if is_bytes else ('ns', 'µs', 'ms', 's')
    while value >= 999.5 and len(units) > 1:
        value, units = value / 1000, units[1:]
    return f'{value:#.3g}'.rstrip('.') + f' {units[0]}'


def threads(count):
    return '1 thread' if count == 1 else f'{count} threads'


def table(heading, columns, rows):
    lines = [f'## {heading}', '', f'| {" | ".join(columns)} |', '|---' * len(columns) + '|']
    return '\n'.join(lines + [f'| {" | ".join(row)} |' for row in rows]) + '\n'


def peer_table(results, heading, topics, metric, label):
    """One row for each place, named by label; a column for each peer, with its multiple of ours."""
    peers = results.peers(topics, metric)
    rows = []
    for place in results.rows(*topics):
        values = [results.median(*place, peer, metric) for peer in peers]
        ours = values[0] if values and peers[0] in OURS else None
        cells = [human(value, 'bytes' in metric) for value in values]
        for i, value in enumerate(values):
            if value and ours and i > 0:
                cells[i] += f' ({float(f"{value / ours:.2g}"):g})'
        rows.append([label(place), *cells])
    return [table(heading, ['', *peers], rows)] if peers else []


def program_table(results):
    place = 'whole process', 0, 1
    process = results.median(*place, 'Rete', 'cpu_ns')
    draws = results.median(*place, 'random() draws alone', 'cpu_time')
    if not process or not draws:
        return []
    peak = results.median(*place, 'Rete', 'peak_bytes')
    return [table('The whole program, processor time',
                  ['process', 'draws alone', 'outside the draws', 'process / draws', 'peak memory'],
                  [[human(process), human(draws),
                    f'{human(process - draws)} ({(process - draws) / process:.0%})',
                    f'{process / draws:.2f}', human(peak, True)]])]


def tables(results):
    parts = program_table(results)
    for topic in SETS:
        for metric, name in (('real_time', 'build'), ('bytes', 'memory'), ('miss_ns', 'miss'),
                             ('lookup_ns', 'lookup'), ('span_ns', 'span')):
            parts += peer_table(results, f'{topic.capitalize()}: {name}', (topic,), metric,
                                lambda place: f'{place[1]:,} patterns')
    parts += peer_table(results, 'Single matches', SINGLE, 'real_time',
                        lambda place: f'{place[0]}, {place[1]:,}')
    parts += peer_table(results, 'A log line', LINES, 'real_time',
                        lambda place: f'{place[0].split()[-1]}, {threads(place[2])}')
    parts += peer_table(results, 'A suppressed message', ('suppressed message',), 'real_time',
                        lambda place: '')
    parts += peer_table(results, 'The layout alone', ('layout only',), 'real_time',
                        lambda place: '')
    left_out = [f'- {topic}, {peer}: {reason}\n'
                for (topic, peer), reason in sorted(results.left_out.items())]
    left_out += [f'- {peer}: not installed\n' for peer in sorted(results.missing)]
    return '\n'.join(parts + ([f'## Left out\n\n{"".join(left_out)}'] if left_out else []))


def machine():
    model = re.search(r'model name\s*: (.*)', pathlib.Path('/proc/cpuinfo').read_text())
    return f'{model.group(1) if model else platform.machine()}, Linux {platform.release()}'


def lookup_chart(pyplot, results):
    figure, axes = pyplot.subplots(1, 2, figsize=(11, 4.5), layout='constrained')
    peers = results.peers(SETS[:2], 'lookup_ns')
    for axis, topic, metric, title in (
            (axes[0], 'set of program', 'miss_ns', 'Patterns of the program, a miss'),
            (axes[1], 'set of urls', 'lookup_ns', 'URL prefixes')):
        for peer in results.peers((topic,), metric):
            medians = [(place[1], results.median(*place, peer, metric))
                       for place in results.rows(topic)]
            points = [(size, value / 1e3) for size, value in medians if value is not None]
            axis.plot(*zip(*points), f'C{peers.index(peer)}o-', label=peer,
                      linewidth=3 if peer in OURS else 1.2)
        axis.set(xscale='log', yscale='log', xlabel='patterns', ylabel='µs per lookup', title=title)
        axis.grid(alpha=0.3)
        axis.legend(fontsize='small')
    return figure


def log_chart(pyplot, results):
    figure, axes = pyplot.subplots(1, 2, figsize=(11, 3.5), layout='constrained', sharex=True)
    for axis, topic in zip(axes, LINES):
        peers = results.peers((topic,), 'real_time')
        places = results.rows(topic)
        for index, place in enumerate(places):
            values = [results.median(*place, peer, 'real_time') or 0 for peer in peers]
            height = 0.8 / len(places)
            axis.barh([y + height * (index - (len(places) - 1) / 2) for y in range(len(peers))],
                      values, height, label=threads(place[2]))
        axis.set_yticks(range(len(peers)), peers)
        axis.invert_yaxis()
        axis.set(xlabel='ns per line', title=f'A line, layout {topic.split()[-1]}')
        axis.legend(fontsize='small')
    return figure


def write_charts(results, directory):
    import matplotlib
    matplotlib.use('svg')
    # The same results give the same files.
    matplotlib.rcParams.update({'svg.hashsalt': 'quelta', 'svg.fonttype': 'none'})
    from matplotlib import pyplot
    for name, chart, topics in (('lookup', lookup_chart, SETS[:2]), ('log-line', log_chart, LINES)):
        if results.rows(*topics):
            chart(pyplot, results).savefig(directory / f'{name}.svg', metadata={'Date': None})


def main():
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument('directory', type=pathlib.Path)
    directory = parser.parse_args().directory
    results = Results(directory)
    (directory / 'tables.md').write_text(f'Machine: {machine()}.\n\n{tables(results)}')
    write_charts(results, directory)


if __name__ == '__main__':
    main()
