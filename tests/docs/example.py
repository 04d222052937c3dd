#!/usr/bin/env python3
"""Writes a source with the example of a header: the indented lines of its first comment.

Usage: example.py HEADER INCLUDED_AS SOURCE

The example is the body of a function with the parameters of main; its includes come before. Exits
with 1 if the header has no example.
"""
import itertools
import sys

FRAME = """#include "{included_as}"
#include <cstdio>
#include <cstdlib>
{includes}
[[maybe_unused]] static void example([[maybe_unused]] int argc, [[maybe_unused]] char** argv,
                                     [[maybe_unused]] char** envp) {{
{body}}}
"""


def main():
    if len(sys.argv) != 4:
        sys.exit(__doc__)
    header, included_as, source = sys.argv[1:]
    with open(header, encoding='utf-8') as lines:
        rest = itertools.dropwhile(lambda line: not line.startswith('//'), lines)
        comment = list(itertools.takewhile(lambda line: line.startswith('//'), rest))
    example = [line[7:] for line in comment if line.startswith('//     ')]
    if not example:
        sys.exit(f'{included_as} does not start with an example')
    with open(source, 'w', encoding='utf-8') as output:
        output.write(FRAME.format(
            included_as=included_as,
            includes=''.join(line for line in example if line.startswith('#')),
            body=''.join(line for line in example if not line.startswith('#'))))


main()
