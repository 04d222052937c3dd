#!/usr/bin/env python3
"""Prints a header with its // comments as Doxygen reads them.

Usage: doxygen_filter.py HEADER

- The first comment describes the file. Any other comment describes the declaration after it and the
  overloads that follow immediately; a comment after a field or enumerator describes that.
- Labels such as "Requires:" at the start of a line become sections. A comment that starts with
  "Returns:" becomes a sentence, so that it is also the summary.
- Indented lines are examples, and "// --- NAME ---" starts a group of members.
- A comment in a function's body is left alone, and one before an empty line is dropped.
"""
import re
import sys

SECTIONS = {'Requires': r'\pre', 'Returns': r'\return'}
LABEL = re.compile(r'(Requires|Returns|Errors|Owns|Threads|Cost|Deliberate|Invariant): (.*)')
GROUP = re.compile(r'// --- (.*?) -+$')
SCOPE = re.compile(r'(template <.*>\s*)?(class|struct|union|enum|namespace)\b[^;()]*\{$')
NAME = re.compile(r'(operator[^\w\s(]+|~?\w+)\(')
LITERAL = re.compile(r'"(\\.|[^"\\])*"|\'(\\.|[^\'\\])+\'')


def escape(text):
    """Takes their meaning from Doxygen's special characters, except in `code`."""
    parts = text.split('`')
    parts[::2] = [re.sub(r'([\\@&$#<>%"]|--)', r'\\\1', part) for part in parts[::2]]
    return '`'.join(parts)


def described(comment):
    """Returns the lines of a comment, given without their //, as a description."""
    lines = []
    in_example = False
    for number, text in enumerate(comment):
        is_example = text.startswith('     ')
        if is_example != in_example:
            lines.append(r'\code{.cpp}' if is_example else r'\endcode')
            in_example = is_example
        label = LABEL.match(text.strip())
        if is_example:
            lines.append(text[5:])
        elif not label:
            lines.append(escape(text.strip()))
        elif number == 0 and label[1] == 'Returns':
            lines.append('Returns ' + escape(label[2]))
        else:
            lines += ['', SECTIONS.get(label[1], r'\par ' + label[1]), escape(label[2])]
    if in_example:
        lines.append(r'\endcode')
    return [('/// ' + line).rstrip() for line in lines]


class Filter:
    def __init__(self):
        self.output = []
        self.comment = []  # lines that wait for their declaration
        self.in_file_comment = True  # until the first comment has ended
        self.statement = ''  # the declaration under way, its body included
        self.name = None  # of the function declared last
        self.name_comment = []  # its description
        self.in_group = False

    def line(self, line):
        text = line.strip()
        group = GROUP.match(text)
        if self.statement:
            self.code(line)
        elif group:
            self.end_group()
            self.output += ['/// @name ' + group[1], '/// @{']
            self.in_group = True
        elif text.startswith('//'):
            self.comment.append(text[2:])
        elif text:
            self.declaration(line, text)
        else:
            self.empty_line()

    def end_group(self):
        if self.in_group:
            self.output.append('/// @}')
        self.in_group = False

    def empty_line(self):
        if self.comment and self.in_file_comment:
            self.output += [r'/// \file'] + described(self.comment)
            self.in_file_comment = False
        self.comment = []
        self.name = None
        self.output.append('')

    def declaration(self, line, text):
        if re.match(r'\}|(public|protected|private):|#endif', text):
            self.end_group()
        name = NAME.search(LITERAL.sub('0', text))
        name = name and name[1]
        comment = self.comment
        if not comment and text.endswith('= delete;'):
            comment = [' Deleted.']
        elif not comment and name and name == self.name:
            comment = self.name_comment
        self.output += described(comment)
        self.comment = []
        self.name, self.name_comment = name, comment
        self.code(line)

    def code(self, line):
        """Prints a line of code and finds out whether its declaration goes on."""
        code = LITERAL.sub('0', line).split('//')[0].strip()
        if not self.statement and not code.startswith(('}', '#')):
            line = re.sub('//(.*)', lambda comment: '///<' + escape(comment[1]), line)
        self.output.append(line)
        self.statement = f'{self.statement} {code}'.strip()
        if self.statement.startswith('#'):
            ended = not code.endswith('\\')
        else:
            is_open = sum(map(self.statement.count, '({')) > sum(map(self.statement.count, ')}'))
            ended = code.endswith((';', '}', ',', ':')) and not is_open
        if ended or SCOPE.match(self.statement) or self.statement.startswith('}'):
            self.statement = ''


def main():
    if len(sys.argv) != 2:
        sys.exit(__doc__)
    filtered = Filter()
    with open(sys.argv[1], encoding='utf-8') as header:
        for line in header.read().splitlines():
            filtered.line(line)
    print('\n'.join(filtered.output))


main()
