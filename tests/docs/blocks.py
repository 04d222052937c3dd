#!/usr/bin/env python3
"""Tests the code blocks of a Markdown page.

Usage: blocks.py extract PAGE DIRECTORY    write each cpp block to DIRECTORY/NUMBER.cpp
       blocks.py run PAGE DIRECTORY        run the page's commands with the programs
                                           DIRECTORY/NUMBER; exits with 1 if one prints anything
                                           else than the page shows

Blocks are fenced and name their language:
    cpp         a program; without main(), the body of a function, which sees all includes of the
                page
    properties  a file, whose name is its first line: "# NAME"
    console     commands, each after "$ " and followed by what it prints; "./NAME" is the program of
                the last cpp block
    sh, cmake, mermaid
                not tested here
The commands of a page run in one temporary directory, which the page calls /srv.
"""
import pathlib
import re
import shutil
import subprocess
import sys
import tempfile

BLOCK = re.compile(r'^```(.*)\n((?:.*\n)*?)```$', re.MULTILINE)
INCLUDE = re.compile(r'^#include .*\n', re.MULTILINE)
NOT_TESTED = ('sh', 'cmake', 'mermaid')


def blocks(page):
    """Yields the language, the text and the first line's number of each block."""
    text = page.read_text()
    for found in BLOCK.finditer(text):
        yield found[1], found[2], text.count('\n', 0, found.start(2)) + 1


def cpp_blocks(page):
    return [block[1:] for block in blocks(page) if block[0] == 'cpp']


def program(code, line, page, includes):
    """Returns the source of a program; compilers report its errors at their place in the page."""
    code = f'#line {line} "{page}"\n{code}'
    if 'int main(' in code:
        return code
    code = INCLUDE.sub('\n', code)
    return f'{includes}void body();\nvoid body() {{\n{code}}}\nint main() {{}}\n'


def extract(page, directory):
    directory.mkdir(parents=True, exist_ok=True)
    codes = cpp_blocks(page)
    includes = ''.join(line for code, _ in codes for line in INCLUDE.findall(code))
    sources = {directory / f'{number}.cpp': program(code, line, page, includes)
               for number, (code, line) in enumerate(codes)}
    for stale in set(directory.glob('*.cpp')) - set(sources):
        stale.unlink()
    for path, source in sources.items():
        if not path.exists() or path.read_text() != source:  # avoids needless compilations
            path.write_text(source)
    return 0


def run_commands(text, binary, directory):
    """Runs the commands of a console block. Returns the block as it should be."""
    result = ''
    for command in re.findall(r'^\$ (.*)', text, re.MULTILINE):
        for name in re.findall(r'\./(\w+)', command):
            shutil.copy(binary, directory / name)
        done = subprocess.run(command, shell=True, cwd=directory, text=True, timeout=60,
                              stdout=subprocess.PIPE, stderr=subprocess.STDOUT, check=False)
        result += f'$ {command}\n' + done.stdout.replace(str(directory), '/srv')
    return result


def run(page, directory):
    status = 0
    number = -1
    with tempfile.TemporaryDirectory() as scratch:
        scratch = pathlib.Path(scratch)
        for language, text, line in blocks(page):
            if language == 'cpp':
                number += 1
            elif language == 'properties':
                (scratch / text.split('\n')[0].removeprefix('# ')).write_text(text)
            elif language == 'console':
                real = run_commands(text, directory / str(number), scratch)
                if real != text:
                    print(f'{page}:{line}: the commands print\n{real}')
                    status = 1
            elif language not in NOT_TESTED:
                print(f'{page}:{line}: a block of an unknown language, "{language}"')
                status = 1
    return status


def main():
    actions = {'extract': extract, 'run': run}
    if len(sys.argv) != 4 or sys.argv[1] not in actions:
        sys.exit(__doc__)
    return actions[sys.argv[1]](*map(pathlib.Path, sys.argv[2:]))


if __name__ == '__main__':
    sys.exit(main())
