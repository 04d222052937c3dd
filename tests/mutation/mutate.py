#!/usr/bin/env python3
"""Breaks one operator, constant or comparison of a source at a time and sees whether a test fails.

Usage: mutate.py BUILD_DIR [--jobs N] [--sample N] [--seed S] [SOURCE...]

Works in copies of the tree below BUILD_DIR, one for each job, never in the tree itself. targets.txt
names the test programs of each source, equivalents.txt the mutants that no test can tell from the
original, with the reason. Prints each survivor as path:line: before -> after. Exits with 1 when a
mutant survives that equivalents.txt does not explain, or when an explained one no longer survives.
"""
import argparse
import concurrent.futures
import contextlib
import os
import pathlib
import queue
import random
import re
import signal
import subprocess
import sys
import time

HERE = pathlib.Path(__file__).resolve().parent
ROOT = HERE.parent.parent

# A test program has so long to find a mutant, beyond ten times what it takes unbroken: one that
# runs on for ever is found too.
GRACE_SECONDS = 3
UNBROKEN_SECONDS = 600

# What is replaced by what, where the pattern stands outside of comments, texts, attributes and
# directives.
MUTATIONS = [
    (r' == ', ' != '), (r' != ', ' == '),
    (r' < ', ' <= '), (r' <= ', ' < '), (r' > ', ' >= '), (r' >= ', ' > '),
    (r' && ', ' || '), (r' \|\| ', ' && '),
    (r' \+ ', ' - '), (r' - ', ' + '), (r' \* (?=\d)', ' / '), (r' / ', ' * '), (r' % ', ' * '),
    (r'\+\+', '--'), (r'--', '++'), (r' \+= ', ' -= '), (r' -= ', ' += '),
    (r'\btrue\b', 'false'), (r'\bfalse\b', 'true'),
    (r'(?<=[(\s])!(?=[\w(*])', ''),
    (r'(?<![\w.\'"])(\d+)(?![\w.\'])', lambda m: str(int(m.group(1)) + 1)),
    (r'^(\s+)(break|continue);', r'\1;'),
]
HIDDEN = re.compile(r'//.*|"(?:[^"\\]|\\.)*"|\'(?:[^\'\\]|\\.)*\'|__attribute__\(\(.*\)\)')
SKIPPED = re.compile(r'^\s*(#|//|QUELTA_ASSERT|static_assert|template|using|namespace|case .*:$)')


def mutants(path):
    """Yields (line number, line, mutated line)."""
    for number, line in enumerate(path.read_text().splitlines()):
        if SKIPPED.match(line):
            continue
        code = HIDDEN.sub(lambda m: '\0' * len(m.group()), line)
        for pattern, replacement in MUTATIONS:
            for match in re.finditer(pattern, code):
                new = replacement(match) if callable(replacement) else match.expand(replacement)
                yield number, line, line[:match.start()] + new + line[match.end():]


def read_table(name):
    rows = (HERE / name).read_text().splitlines()
    return [row.split('\t') for row in rows if row and not row.startswith('#')]


class Tree:
    """A copy of the project with a build of its own, in which the mutants live."""

    def __init__(self, folder):
        self.root = folder / 'tree'
        self.build = folder / 'build'
        self.limits = {}  # seconds that a test program may take, once it is known
        self.root.mkdir(parents=True, exist_ok=True)
        # A mutant that an interrupted run left here is newer than the file that replaces it: with
        # the time of the original, the build would keep what was made of the mutant.
        subprocess.run(['rsync', '-a', '--checksum', '--no-times', '--delete', '--exclude=/build',
                        '--exclude=/.git', f'{ROOT}/', f'{self.root}/'], check=True)
        subprocess.run(['cmake', '-G', 'Ninja', '-S', self.root, '-B', self.build,
                        '-DCMAKE_BUILD_TYPE=Debug',
                        '-DCMAKE_CXX_FLAGS_DEBUG=-O0 -D_GLIBCXX_ASSERTIONS'],
                       check=True, stdout=subprocess.DEVNULL)

    def make(self, target):
        return subprocess.run(['ninja', '-j2', '-C', self.build, target], stdout=subprocess.DEVNULL,
                              stderr=subprocess.DEVNULL).returncode == 0

    def passes(self, target):
        program = next(p for p in self.build.rglob(target) if p.is_file())
        # In a session of its own, so that what it forked ends with it.
        run = subprocess.Popen([program, '--gtest_brief=1', '--gtest_fail_fast'],
                               cwd=program.parent, stdin=subprocess.DEVNULL,
                               stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL,
                               start_new_session=True)
        try:
            return run.wait(self.limits.get(target, UNBROKEN_SECONDS)) == 0
        except subprocess.TimeoutExpired:
            return False
        finally:
            with contextlib.suppress(ProcessLookupError):
                os.killpg(run.pid, signal.SIGKILL)
            run.wait()

    def passes_unbroken(self, target):
        if target in self.limits:
            return True
        if not self.make(target):
            return False
        started = time.monotonic()
        if not self.passes(target):
            return False
        self.limits[target] = GRACE_SECONDS + 10 * (time.monotonic() - started)
        return True

    def survives(self, source, number, mutated, targets):
        path = self.root / source
        original = path.read_text()
        lines = original.split('\n')
        lines[number] = mutated
        try:
            for target in targets:
                if not self.passes_unbroken(target):
                    sys.exit(f'{target} does not pass unbroken')
            path.write_text('\n'.join(lines))
            for target in targets:
                if not self.make(target):
                    return None  # does not compile: no mutant
                if not self.passes(target):
                    return False
            return True
        finally:
            path.write_text(original)


def test_source(pool, trees, source, targets, options):
    """Yields each mutant of a source with what Tree.survives says of it."""
    def with_tree(use):
        tree = trees.get()
        try:
            return use(tree)
        finally:
            trees.put(tree)

    chosen = list(mutants(ROOT / source))
    if options.sample and len(chosen) > options.sample:
        chosen = sorted(random.Random(options.seed).sample(chosen, options.sample))
    print(f'{source}: {len(chosen)} mutants', file=sys.stderr, flush=True)

    def run(mutant):
        return with_tree(lambda tree: tree.survives(source, mutant[0], mutant[2], targets))

    futures = [pool.submit(run, mutant) for mutant in chosen]
    for mutant, future in zip(chosen, futures):
        yield mutant, future.result()


def main():
    parser = argparse.ArgumentParser(description=__doc__.split('\n')[0])
    parser.add_argument('build_dir', type=pathlib.Path)
    parser.add_argument('sources', nargs='*')
    parser.add_argument('--jobs', type=int, default=os.cpu_count(), help='copies at work at once')
    parser.add_argument('--sample', type=int, default=0, help='mutants per source, 0 for all')
    parser.add_argument('--seed', type=int, default=1)
    options = parser.parse_intermixed_args()

    explained = {(row[0], row[1], row[2]) for row in read_table('equivalents.txt')}
    trees = queue.SimpleQueue()
    for job in range(options.jobs):
        trees.put(Tree(options.build_dir.resolve() / str(job)))
    killed = invalid = 0
    survivors = set()
    with concurrent.futures.ThreadPoolExecutor(options.jobs) as pool:
        for source, targets in read_table('targets.txt'):
            if options.sources and source not in options.sources:
                continue
            for mutant, result in test_source(pool, trees, source, targets.split(), options):
                if result is None:
                    invalid += 1
                elif not result:
                    killed += 1
                else:
                    number, line, mutated = mutant
                    row = (source, line.strip(), mutated.strip())
                    survivors.add(row)
                    print(f'{source}:{number + 1}: {row[1]}  ->  {row[2]}'
                          f'{"  (equivalent)" if row in explained else ""}', flush=True)
    unexplained = survivors - explained
    stale = set() if options.sample or options.sources else explained - survivors
    for row in sorted(stale):
        print('no longer survives:', *row, sep='\t')
    print(f'{killed} killed, {len(survivors)} survived ({len(unexplained)} unexplained), '
          f'{invalid} did not compile')
    return 1 if unexplained or stale or killed == 0 else 0


if __name__ == '__main__':
    sys.exit(main())
