#!/usr/bin/env python3
"""Compares log_watch with grep.

Makes a log of which one line in a hundred is a failed login that a rule describes, and 10, 1,000 and
30,000 such rules. Runs the programs in turn, checks that they find the same lines, and prints the
medians as a table, in lines per second of the whole process. All of them write the lines that they
find to a file; log_watch also logs them.
"""
import argparse
import itertools
import os
import pathlib
import random
import statistics
import subprocess
import sys
import tempfile
import time

LINES = 1_000_000
SHORT = 20_000  # lines, where many rules must all be tried for each
RULES = (10, 1_000, 30_000)
MESSAGES = (
    'CRON[811]: (root) CMD (test -x /usr/sbin/anacron)',
    'systemd[1]: Started Daily apt download activities.',
    'sshd[4711]: Accepted publickey for deploy from 10.0.0.7 port 50522 ssh2',
    'sshd[4711]: Failed password for nobody-{n} from 10.0.0.9 port 50524 ssh2',
    'kernel: eth0: Link is Up - 1Gbps/Full - flow control rx/tx, event {n}',
    'named[77]: client 10.0.0.3#5353: query: host{n}.example.test IN A',
    'postfix/smtpd[902]: connect from unknown[10.0.0.12]',
)


def write_log(path, names, generator):
    with path.open('w') as log:
        for n in range(LINES):
            message = generator.choice(MESSAGES).format(n=n)
            if n % 100 == 42:
                name = generator.choice(names)
                message = f'sshd[{n}]: Failed password for {name} from 10.0.0.9 port 50524 ssh2'
            log.write(f'Nov 22 {n // 3600 % 24:02}:{n // 60 % 60:02}:{n % 60:02} web1 {message}\n')


def write_rules(directory, names):
    for file, form in (('fixed', '{0}'), ('expressions', '{0}.*port'),
                       ('inside', '{0}: *{0}*'), ('prefix', '{0}: {0}*')):
        texts = (form.format(f'Failed password for {name} from') for name in names)
        directory.joinpath(file).write_text(''.join(f'{text}\n' for text in texts))


def run(command, log, directory):
    """Returns the lines found and the seconds of the process."""
    environment = {'PATH': os.environ['PATH'], 'LC_ALL': 'C', 'QUELTA_HOME': str(directory),
                   'QUELTA_DB': str(directory)}
    output = directory / 'output'
    with (directory / log).open() as source, output.open('w') as found:
        start = time.monotonic()
        subprocess.run(command, stdin=source, stdout=found, cwd=directory, env=environment,
                       check=True)
        seconds = time.monotonic() - start
    with output.open() as found:
        lines = [line[line.index('Nov '):] for line in found if 'Nov ' in line]
    return lines, seconds


def make_inputs(directory, count):
    """Makes the rules, and the logs `log` and `short`, which is its start."""
    generator = random.Random(count)
    names = [''.join(generator.choices('abcdefghijklmnopqrstuvwxyz', k=8)) for _ in range(count)]
    write_rules(directory, names)
    write_log(directory / 'log', names, generator)
    with (directory / 'log').open() as log, (directory / 'short').open('w') as short:
        short.writelines(itertools.islice(log, SHORT))


def compare(log_watch, count, rounds, directory):
    make_inputs(directory, count)
    watch = [log_watch, '--', '-w', '1']
    programs = {
        'log_watch, `text*` after `-f 5`': (watch + ['-f', '5', 'prefix'], 'log'),
        'log_watch, `*text*`': (watch + ['inside'], 'log' if count <= 1_000 else 'short'),
        'grep -F': (['grep', '-F', '-f', 'fixed'], 'log'),
        'grep -E, `text.*port`': (['grep', '-E', '-f', 'expressions'], 'log'),
    }
    expected = {log: run(programs['grep -F'][0], log, directory)[0] for log in ('log', 'short')}
    times = {name: [] for name in programs}
    for _ in range(rounds):
        for name, (command, log) in programs.items():
            found, seconds = run(command, log, directory)
            if found != expected[log]:
                sys.exit(f'{name} finds other lines than grep -F')
            times[name].append(seconds)
    for name, (_, log) in programs.items():
        speed = (LINES if log == 'log' else SHORT) / statistics.median(times[name])
        print(f'| {count:,} | {name} | {speed:,.0f} |', flush=True)


def main():
    parser = argparse.ArgumentParser(description=__doc__)
    parser.add_argument('log_watch', type=pathlib.Path, help='the program')
    parser.add_argument('rounds', type=int, nargs='?', default=5)
    options = parser.parse_args()
    print('| rules | program | lines per second |\n|---|---|---|')
    with tempfile.TemporaryDirectory() as scratch:
        directory = pathlib.Path(scratch)
        (directory / 'etc/myinstall').mkdir(parents=True)
        (directory / 'var/log').mkdir(parents=True)
        (directory / 'etc/log-cmdline.cfg').touch()
        for count in RULES:
            compare(str(options.log_watch.resolve()), count, options.rounds, directory)


main()
