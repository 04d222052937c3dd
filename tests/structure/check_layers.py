#!/usr/bin/env python3
"""Checks the include graph of src/ against layers.txt.

Usage: check_layers.py SRC_DIR LAYERS_FILE

Reports every unit without a layer or without files, every include that points upwards, every
circle between headers and every header that reaches more than it may. Exits with 1 when there is
anything to report.
"""
import pathlib
import re
import sys

INCLUDE = re.compile(r'^\s*#\s*include\s+["<]((?:util|services|xmlwrapp)/[^">]+)[">]', re.MULTILINE)


def read_layers(path):
    """Returns ({unit: (rank, layer)}, {unit: units that its header may reach})."""
    ranks, allowed, order = {}, {}, []
    for line in path.read_text().splitlines():
        line = line.split('#')[0].strip()
        if not line:
            continue
        name, units = line.split(':')
        if name.startswith('only '):
            allowed[name.split()[1]] = set(units.split())
            continue
        if name not in order:
            order.append(name)
        for unit in units.split():
            ranks[unit] = (order.index(name), name)
    return ranks, allowed


def unit_of(path, ranks):
    """A source that has a layer of its own is named with its ending; all else by its stem."""
    return path.name if path.name in ranks else path.stem


def includes(path):
    return [pathlib.PurePosixPath(name) for name in INCLUDE.findall(path.read_text())]


def upward_includes(files, ranks):
    for path in files:
        unit = unit_of(path, ranks)
        if unit not in ranks:
            yield f'{path.name}: no layer of layers.txt names this unit'
            continue
        for included in includes(path):
            other = included.stem
            if other in ranks and ranks[other] > ranks[unit]:
                yield (f'{path.name} is in the layer {ranks[unit][1]} and includes {included} of the '
                       f'higher layer {ranks[other][1]}')


def find_circle(graph):
    """Returns a list of headers that include each other in a circle, or None."""
    done = set()

    def visit(header, trail):
        if header in trail:
            return trail[trail.index(header):] + [header]
        if header in done:
            return None
        for other in graph.get(header, ()):
            circle = visit(other, trail + [header])
            if circle:
                return circle
        done.add(header)
        return None

    for header in graph:
        circle = visit(header, [])
        if circle:
            return circle
    return None


def reachable(graph, header):
    seen, waiting = set(), [header]
    while waiting:
        for other in graph.get(waiting.pop(), ()):
            if other not in seen:
                seen.add(other)
                waiting.append(other)
    return seen


def check(source_dir, layers_file):
    ranks, allowed = read_layers(layers_file)
    files = sorted(p for p in source_dir.rglob('*') if p.suffix in ('.h', '.cpp'))
    problems = list(upward_includes(files, ranks))
    present = {unit_of(path, ranks) for path in files}
    problems += [f'layers.txt names {unit}, which does not exist' for unit in ranks
                 if unit not in present]
    graph = {p.stem: [i.stem for i in includes(p)] for p in files if p.suffix == '.h'}
    circle = find_circle(graph)
    if circle:
        problems.append('headers include each other: ' + ' -> '.join(circle))
    for unit, may in allowed.items():
        for other in sorted(reachable(graph, unit) - may):
            problems.append(f'{unit}.h reaches {other}.h, and may reach only {sorted(may)}')
    return len(files), problems


def main():
    source_dir, layers_file = (pathlib.Path(arg) for arg in sys.argv[1:3])
    count, problems = check(source_dir, layers_file)
    for problem in problems:
        print(problem)
    print(f'files checked against {layers_file}: {count}, problems: {len(problems)}')
    return 1 if problems or count == 0 else 0


if __name__ == '__main__':
    sys.exit(main())
