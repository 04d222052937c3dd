#!/usr/bin/env python3
"""Checks that every test that documents name exists.

Usage: check_named_tests.py PROJECT_DIR DOCUMENT...

A test is named as `Suite.Case`, or by its source: `XTest`, `XBench` or `XFuzz`. Exits with 1 if a
test does not exist, or a document names none.
"""
import pathlib
import re
import sys

NAMED = re.compile(r'`([A-Z]\w+\.[A-Z]\w+|[A-Z]\w+(?:Test|Bench|Fuzz))`')
DEFINED = re.compile(r'^(?:TYPED_)?TEST(?:_F|_P)?\(\s*(\w+)\s*,\s*(\w+)\s*\)', re.MULTILINE)


def main():
    if len(sys.argv) < 3:
        sys.exit(__doc__)
    project, *documents = (pathlib.Path(arg) for arg in sys.argv[1:])
    sources = [path for directory in ('tests', 'bench', 'fuzz')
               for path in (project / directory).rglob('*.cpp')]
    defined = {f'{suite}.{case}' for path in sources
               for suite, case in DEFINED.findall(path.read_text())}
    defined |= {path.stem for path in sources}
    problems = []
    for document in documents:
        named = NAMED.findall(document.read_text())
        problems += [f'{document} names {name}, which does not exist'
                     for name in named if name not in defined]
        problems += [] if named else [f'{document} names no test']
    print(*problems, f'{len(problems)} problems', sep='\n')
    return 1 if problems else 0


if __name__ == '__main__':
    sys.exit(main())
