#!/usr/bin/env python3
"""Breaks one operator, constant or comparison of a source at a time and checks that a test fails.

Works on copies of the project below build/mutation, one for each job. tests/units.txt lists the
tests of each source. equivalents.txt explains the mutants that no test can tell from the original.
Prints each survivor as path:line: before -> after, and the fields to list it with. Exits with 1 if
a mutant survives without explanation, or an explained one does not survive or does not exist.
"""
import argparse
import bisect
import collections
import concurrent.futures
import contextlib
import dataclasses
import filecmp
import os
import pathlib
import queue
import random
import re
import shutil
import signal
import subprocess
import sys
import time

HERE = pathlib.Path(__file__).resolve().parent
ROOT = HERE.parent.parent
sys.path.insert(0, str(HERE.parent))
import units  # noqa: E402

# Time limit per test program, on top of ten times its normal run time; a mutant that loops forever
# counts as killed.
GRACE_SECONDS = 3
UNBROKEN_SECONDS = 600

# Patterns and their replacements, applied to the code of a line: no comments, string literals,
# attributes or directives.
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
HIDDEN = re.compile(r'//.*|/\*(?s:.*?)\*/|"(?:[^"\\\n]|\\.)*"|\'(?:[^\'\\\n]|\\.)*\'|'
                    r'__attribute__\(\(.*\)\)|^ *#(?:.*\\\n)*.*', re.MULTILINE)
SKIPPED = re.compile(r'^\s*(QUELTA_ASSERT|static_assert|template|using|namespace|case .*:$)')

SCOPE = re.compile(r'(?s:.*)(?<!enum )\b(namespace|class|struct|union|extern)\b[\s\0]*'
                   r'([\w:]*)[^=()]*$')
ENUM = re.compile(r'\benum\s+(?:class\s+)?(\w+)')
FUNCTION = re.compile(r'((?:\w+::)*(?:operator\s*\(\)|operator\s*[^\s(]+|~?\w+))\s*\(')
VARIABLE = re.compile(r'(\w+)\s*(?:\[[^\]]*\]\s*)*(?:[={;]|$)')


@dataclasses.dataclass
class Mutant:
    path: pathlib.Path  # from the project's root
    number: int  # of the line, from 0
    line: str
    mutated: str
    key: tuple  # source, place, mutation, its number among equal mutations of that place


def declared_name(declaration):
    head = re.split(r' = |\{', declaration)[0]
    match = ENUM.search(head) or FUNCTION.search(head) or VARIABLE.search(declaration)
    return match.group(1) if match else ''


def places(code):
    """Returns the functions and variables outside of functions: their ends, and their names."""
    ends, names, scopes = [], [], []
    begin = depth = 0

    def finish(end):
        nonlocal begin
        classes = [name for name in scopes if name]
        ends.append(end)
        names.append('::'.join(classes + [declared_name(code[begin:end])]))
        begin = end

    for match in re.finditer(r'[(){};]', code):
        bracket, end = match.group(), match.end()
        scope = SCOPE.match(code, begin, match.start()) if bracket == '{' and depth == 0 else None
        if scope:
            scopes.append(scope.group(2) if scope.group(1) != 'namespace' else '')
            begin = end
        elif bracket in '({':
            depth += 1
        elif bracket == '}' and depth == 0:
            scopes.pop()
            begin = end
        elif bracket in ')}':
            depth -= 1
            # A body ends its line; an initializer in braces does not.
            if bracket == '}' and depth == 0 and re.match(r'[ \0]*\n', code[end:]):
                finish(end)
        elif depth == 0:
            finish(end)
    return ends, names


def mutants(path, root=ROOT):
    """Yields the mutants of a source, line by line."""
    text = (root / path).read_text()
    code = HIDDEN.sub(lambda m: re.sub('[^\n]', '\0', m.group()), text)
    ends, names = places(code)
    seen = collections.Counter()
    start = 0
    for number, (line, visible) in enumerate(zip(text.split('\n'), code.split('\n'))):
        if not SKIPPED.match(visible):
            for pattern, replacement in MUTATIONS:
                for match in re.finditer(pattern, visible):
                    new = replacement(match) if callable(replacement) else match.expand(replacement)
                    place = names[bisect.bisect_right(ends, start + match.start())]
                    kind = path.name, place, f'{match.group().strip()} -> {new.strip()}'.strip()
                    seen[kind] += 1
                    mutated = line[:match.start()] + new + line[match.end():]
                    yield Mutant(path, number, line, mutated, (*kind, seen[kind]))
        start += len(line) + 1


def explained_mutants():
    rows = [row.split('\t') for row in (HERE / 'equivalents.txt').read_text().splitlines()
            if row and not row.startswith('#')]
    return [(source, place, mutation, int(number)) for source, place, mutation, number, _ in rows]


def check_explained(explained, present):
    """Prints each row that names no mutant or one already named; returns how many there are."""
    problems = [f'no such mutant: {key}' for key in explained if key not in present]
    problems += [f'listed twice: {key}' for key, count in collections.Counter(explained).items()
                 if count > 1]
    print(*problems, sep='\n', end='\n' * bool(problems))
    return len(problems)


def git(*arguments):
    return subprocess.run(['git', *arguments], cwd=ROOT, check=True, stdout=subprocess.PIPE,
                          text=True).stdout


def changed_lines(revision):
    """Returns the lines of src/ that differ from the revision: path to a set of numbers, from 0."""
    diff = git('diff', '-U0', '--no-color', '--no-prefix', revision, '--', 'src')
    changed, lines = {}, set()
    for line in diff.splitlines():
        if line.startswith('+++ '):
            lines = changed.setdefault(pathlib.Path(line[4:]), set())
        elif hunk := re.match(r'@@ -\S+ \+(\d+)(?:,(\d+))? @@', line):
            first, count = int(hunk.group(1)) - 1, int(hunk.group(2) or 1)
            lines.update(range(first, first + count))
    return changed


class Tree:
    """A copy of the project with a build of its own, in which the mutants live."""

    limits = {}  # test program to the seconds that it may take; once it has passed unbroken

    def __init__(self, directory, ninja_jobs):
        self.root = directory / 'tree'
        self.build = directory / 'build'
        self.ninja = ['ninja', f'-j{ninja_jobs}', '-C', self.build]
        self.programs = {}  # name to path
        self.original = None  # path and text of the source that is broken at the moment
        self.mirror()
        # ccache sees the same relative paths in each copy, and assertions print them mapped.
        launcher = 'ccache' if shutil.which('ccache') else ''
        self.environment = {**os.environ, 'CCACHE_BASEDIR': str(self.root),
                            'CCACHE_SLOPPINESS': 'pch_defines,time_macros'}
        # The cases are not listed after each link, as nothing runs them by ctest.
        subprocess.run(['cmake', '-G', 'Ninja', '-S', self.root, '-B', self.build,
                        '-DCMAKE_BUILD_TYPE=Debug', f'-DCMAKE_CXX_COMPILER_LAUNCHER={launcher}',
                        '-DCMAKE_CXX_FLAGS=-fmacro-prefix-map=../tree/=',
                        '-DCMAKE_CXX_FLAGS_DEBUG=-O0 -D_GLIBCXX_ASSERTIONS',
                        '-DCMAKE_GTEST_DISCOVER_TESTS_DISCOVERY_MODE=PRE_TEST',
                        f'-DCMAKE_PROJECT_INCLUDE={HERE}/precompile.cmake'],
                       check=True, stdout=subprocess.DEVNULL, env=self.environment)

    def mirror(self):
        names = git('ls-files', '--cached', '--others', '--exclude-standard', '-z').split('\0')
        files = {name for name in names if (ROOT / name).is_file()}
        for path in list(self.root.rglob('*')):
            if path.is_file() and str(path.relative_to(self.root)) not in files:
                path.unlink()
        for name in files:
            copy = self.root / name
            # An interrupted run may leave a mutant here. Do not copy time stamps, or the build
            # would think the object made from the mutant is up to date.
            if not copy.exists() or not filecmp.cmp(ROOT / name, copy, shallow=False):
                copy.parent.mkdir(parents=True, exist_ok=True)
                shutil.copy(ROOT / name, copy)

    def make(self, target):
        return subprocess.run([*self.ninja, target], stdout=subprocess.DEVNULL,
                              stderr=subprocess.DEVNULL, env=self.environment).returncode == 0

    def passes(self, target):
        if target not in self.programs:
            self.programs[target] = next(p for p in self.build.rglob(target) if p.is_file())
        program = self.programs[target]
        # In a session of its own, so that its children can be ended with it.
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

    def measure(self, target):
        built = self.make(target)
        started = time.monotonic()
        if not built or not self.passes(target):
            sys.exit(f'{target} does not pass unbroken')
        self.limits[target] = GRACE_SECONDS + 10 * (time.monotonic() - started)

    def restore(self):
        if self.original:
            self.original[0].write_text(self.original[1])
        self.original = None

    def survives(self, mutant, targets):
        """Returns whether all tests pass; None if the mutant does not compile."""
        path = self.root / mutant.path
        if self.original and self.original[0] != path:
            self.restore()
        for target in targets:
            if target not in self.limits:
                self.restore()
                self.measure(target)
        self.original = self.original or (path, path.read_text())
        lines = self.original[1].split('\n')
        lines[mutant.number] = mutant.mutated
        path.write_text('\n'.join(lines))
        for target in targets:
            if not self.make(target):
                return None
            if not self.passes(target):
                return False
        return True


def run(chosen, options, explained):
    """Tests (mutant, targets) pairs and prints the survivors; returns the counts and survivors."""
    trees = queue.SimpleQueue()
    jobs = min(options.jobs, len(chosen))
    for job in range(jobs):
        trees.put(Tree(options.build.resolve() / str(job), max(1, os.cpu_count() // jobs)))

    def test(pair):
        tree = trees.get()
        try:
            return tree.survives(*pair)
        finally:
            trees.put(tree)

    counts, survivors, shown = collections.Counter(), set(), None
    with concurrent.futures.ThreadPoolExecutor(jobs) as pool:
        for done, (pair, result) in enumerate(zip(chosen, pool.map(test, chosen))):
            mutant = pair[0]
            if mutant.path != shown or done % 50 == 0:
                shown = mutant.path
                print(f'{done} of {len(chosen)}: {shown}', file=sys.stderr, flush=True)
            counts[result] += 1
            if result:
                survivors.add(mutant.key)
                print(f'{mutant.path}:{mutant.number + 1}: {mutant.line.strip()}  ->  '
                      f'{mutant.mutated.strip()}  {mutant.key}'
                      f'{"  (equivalent)" if mutant.key in explained else ""}', flush=True)
    return counts, survivors


def main():
    parser = argparse.ArgumentParser(description=__doc__.split('\n')[0])
    parser.add_argument('sources', nargs='*', help='names of files of src/ (all)')
    parser.add_argument('--check', action='store_true', help='only check equivalents.txt')
    parser.add_argument('--since', metavar='REV', help='only lines that differ from that revision')
    parser.add_argument('--sample', type=int, default=0, help='mutants per source (all)')
    parser.add_argument('--seed', type=int, default=1, help='of the sample')
    parser.add_argument('--jobs', type=int, default=os.cpu_count(), help='copies at work at once')
    parser.add_argument('--build', type=pathlib.Path, default=ROOT / 'build' / 'mutation',
                        metavar='DIR', help='for the copies')
    options = parser.parse_args()

    listed = units.Units(HERE.parent / 'units.txt')
    programs = units.test_programs(HERE.parent)
    files = [path.relative_to(ROOT) for path in units.sources(ROOT / 'src')]
    by_file = {path: list(mutants(path)) for path in files}
    for name in set(options.sources) - {path.name for path in files}:
        parser.error(f'no such source: {name}')
    explained = explained_mutants()
    problems = check_explained(explained, {m.key for ms in by_file.values() for m in ms})
    print(f'{sum(map(len, by_file.values()))} mutants in {sum(map(bool, by_file.values()))} files, '
          f'{len(explained)} explained', flush=True)
    if options.check or problems:
        return 1 if problems else 0

    changed = changed_lines(options.since) if options.since else None
    chosen = []
    for path, ms in by_file.items():
        if options.sources and path.name not in options.sources:
            continue
        ms = [m for m in ms if changed is None or m.number in changed.get(path, ())]
        if options.sample and len(ms) > options.sample:
            ms = sorted(random.Random(options.seed).sample(ms, options.sample),
                        key=lambda m: m.number)
        targets = listed.tests_of(listed.name_of(path), programs)
        chosen += [(m, targets) for m in ms]
    if not chosen:
        print('no mutants to test')
        return 0 if options.since else 1

    counts, survivors = run(chosen, options, explained)
    unexplained = survivors - set(explained)
    stale = {m.key for m, _ in chosen}.intersection(explained) - survivors
    for key in sorted(stale):
        print('explained, but it does not survive:', key)
    print(f'{counts[False]} killed, {len(survivors)} survived ({len(unexplained)} unexplained), '
          f'{counts[None]} did not compile')
    return 1 if unexplained or stale else 0


if __name__ == '__main__':
    sys.exit(main())
