#!/usr/bin/env python3
"""Checks that every test that a document names exists.

Usage: check_named_tests.py TESTS_DIR DOCUMENT

A test is named as `Suite.Case`. Exits with 1 when a name has no test, or the document has no name.
"""
import pathlib
import re
import sys

NAMED = re.compile(r'`([A-Z]\w+\.[A-Z]\w+)`')
DEFINED = re.compile(r'^TEST(?:_F|_P)?\(\s*(\w+)\s*,\s*(\w+)\s*\)', re.MULTILINE)


def main():
    tests_dir, document = (pathlib.Path(arg) for arg in sys.argv[1:3])
    defined = {f'{suite}.{case}' for path in tests_dir.rglob('*.cpp')
               for suite, case in DEFINED.findall(path.read_text())}
    lines = document.read_text().splitlines()
    named = [(number, name) for number, line in enumerate(lines, 1) for name in NAMED.findall(line)]
    missing = [(number, name) for number, name in named if name not in defined]
    for number, name in missing:
        print(f'{document}:{number} names {name}, and there is no such test')
    print(f'{len(named)} tests named, {len(missing)} missing')
    return 1 if missing or not named else 0


if __name__ == '__main__':
    sys.exit(main())
