#!/usr/bin/env python3
"""Checks src/ and tests/ against units.txt.

Usage: check_units.py PROJECT_DIR

Reports files without a unit, units without files or tests, includes of a higher layer, headers that
include each other, and headers that reach more than they may. Exits with 1 if there is a problem.
"""
import pathlib
import re
import sys

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parent.parent))
import units  # noqa: E402

INCLUDE = re.compile(r'^\s*#\s*include\s+["<]((?:util|services|xmlwrapp)/[^">]+)[">]', re.MULTILINE)


def includes(path):
    return [pathlib.PurePosixPath(name) for name in INCLUDE.findall(path.read_text())]


def upward_includes(files, listed):
    for path in files:
        unit = listed.by_name.get(listed.name_of(path))
        if unit is None:
            yield f'{path.name}: units.txt does not list this unit'
            continue
        for included in includes(path):
            other = listed.by_name.get(included.stem)
            if other and other.rank > unit.rank:
                yield (f'{path.name} is in the layer {unit.layer} and includes {included} of the '
                       f'higher layer {other.layer}')


def missing(files, listed, programs):
    present = {listed.name_of(path) for path in files}
    for name in listed.by_name:
        if name not in present:
            yield f'units.txt lists {name}, which has no file'
        tests = listed.tests_of(name, programs)
        if not tests:
            yield f'{name} has no test program'
        for test in tests:
            if test not in programs:
                yield f'units.txt lists {test} for {name}, and there is no such program'


def find_cycle(graph):
    """Returns a list of headers that include each other in a cycle, or None."""
    done = set()

    def visit(header, trail):
        if header in trail:
            return trail[trail.index(header):] + [header]
        if header in done:
            return None
        for other in graph.get(header, ()):
            cycle = visit(other, trail + [header])
            if cycle:
                return cycle
        done.add(header)
        return None

    return next(filter(None, (visit(header, []) for header in graph)), None)


def reachable(graph, header):
    seen, waiting = set(), [header]
    while waiting:
        for other in graph.get(waiting.pop(), ()):
            if other not in seen:
                seen.add(other)
                waiting.append(other)
    return seen


def check(project):
    listed = units.Units(project / 'tests' / 'units.txt')
    files = units.sources(project / 'src')
    problems = list(upward_includes(files, listed))
    problems += missing(files, listed, units.test_programs(project / 'tests'))
    graph = {p.stem: [i.stem for i in includes(p)] for p in files if p.suffix == '.h'}
    cycle = find_cycle(graph)
    if cycle:
        problems.append('headers include each other: ' + ' -> '.join(cycle))
    for unit, may in listed.reach.items():
        problems += [f'{unit}.h reaches {other}.h, and may reach only {sorted(may)}'
                     for other in sorted(reachable(graph, unit) - may)]
    return len(files), problems


def main():
    if len(sys.argv) != 2 or sys.argv[1] == '--help':
        sys.exit(__doc__)
    count, problems = check(pathlib.Path(sys.argv[1]))
    print(*problems, f'{count} files, {len(problems)} problems', sep='\n')
    return 1 if problems or count == 0 else 0


if __name__ == '__main__':
    sys.exit(main())
