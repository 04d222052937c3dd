"""Reads tests/units.txt, the list of the units of src/, their layers and their tests."""
import dataclasses
import pathlib
import re

SUFFIXES = ('.h', '.cpp')
PROGRAM = re.compile(r'\bquelta_test\(\s*(\w+)')


@dataclasses.dataclass
class Unit:
    rank: int  # of its layer, 0 for the lowest
    layer: str
    further_tests: list


class Units:
    def __init__(self, path):
        """Reads the file of that path."""
        self.by_name = {}  # name to Unit
        self.reach = {}  # name to the units that its header may include, directly or not
        layers = []
        for line in pathlib.Path(path).read_text().splitlines():
            fields = line.split('#')[0].split()
            if not fields:
                continue
            layer, name, *rest = fields
            if layer == 'only':
                self.reach[name] = set(rest)
                continue
            if layer not in layers:
                layers.append(layer)
            self.by_name[name] = Unit(layers.index(layer), layer, rest)

    def name_of(self, file):
        """Returns the name of the unit that the file belongs to, listed or not."""
        return file.name if file.name in self.by_name else file.stem

    def tests_of(self, name, programs):
        """Returns the unit's test programs in the order to run them."""
        return [f'{name}Test'] * (f'{name}Test' in programs) + self.by_name[name].further_tests


def sources(source_dir):
    return sorted(path for path in source_dir.rglob('*') if path.suffix in SUFFIXES)


def test_programs(tests_dir):
    """Returns the names of the test programs that the CMakeLists.txt below tests_dir define."""
    return {name for path in tests_dir.rglob('CMakeLists.txt')
            for name in PROGRAM.findall(path.read_text())}
