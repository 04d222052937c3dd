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
    named = set(NAMED.findall(document.read_text()))
    missing = sorted(named - defined)
    for name in missing:
        print(f'no such test: {name}')
    print(f'{len(named)} tests named, {len(missing)} missing')
    return 1 if missing or not named else 0


if __name__ == '__main__':
    sys.exit(main())
