#!/usr/bin/env python3
"""Checks that the assertions of src/ are the ones that assertions.txt lists, text for text.

Usage: check_assertions.py SRC_DIR LIST_FILE

A line of the list is a source below SRC_DIR, a tab and the text that a failure prints. Each
assertion must be listed as often as it is in its source. Exits with 1 if there is a problem.
"""
import collections
import pathlib
import re
import sys

ASSERTION = re.compile(r'^(?!#\s*define).*?\bQUELTA_ASSERT\((.*)\);', re.MULTILINE)


def found(source_dir):
    for path in sorted(source_dir.rglob('*')):
        if path.suffix in ('.h', '.cpp') and path.name != 'Assert.h':
            for text in ASSERTION.findall(path.read_text()):
                yield f'{path.relative_to(source_dir)}\t{text}'


def main():
    if len(sys.argv) != 3:
        sys.exit(__doc__)
    source_dir, list_file = (pathlib.Path(arg) for arg in sys.argv[1:3])
    listed = collections.Counter(line for line in list_file.read_text().splitlines()
                                 if line and not line.startswith('#'))
    present = collections.Counter(found(source_dir))
    for line in sorted((listed - present).elements()):
        print(f'listed in {list_file.name}, but not in the source: {line}')
    for line in sorted((present - listed).elements()):
        print(f'in the source, but not listed in {list_file.name}: {line}')
    print(f'{sum(present.values())} assertions')
    return 0 if present == listed and present else 1


if __name__ == '__main__':
    sys.exit(main())
