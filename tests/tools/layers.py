#!/usr/bin/python3
"""Holds the layers of the sources and prints them, lowest first.

A folder of src/ or host/ is a layer. Its CMakeLists.txt names the layers right below it (BELOW of
zrm_layer); src/CMakeLists.txt and host/CMakeLists.txt list the folders, lower ones first. Checked is

- that a layer names only layers that are listed before it, so that there is no cycle of folders,
- that a file includes only files of its own folder and of those below,
- that no file includes itself by way of others,
- with --commands FILE (compile_commands.json): that the compiler finds the headers of a file's own
  layer and of those below, and no others.

Exit status 1 and a line per fault when something is wrong.
"""

import argparse
import json
import re
import shlex
import sys
from pathlib import Path

INCLUDE = re.compile(r'^\s*#\s*include\s+"([^"]+)"', re.M)
LAYER = re.compile(r"zrm_layer\(\s*(\w+)(?:\s+BELOW((?:\s+zrm_\w+)+))?")
SUBDIRECTORY = re.compile(r"^\s*add_subdirectory\((\w+)\)", re.M)


class Layers:
    """The layers of a tree, by folder ("src/base"), in the order in which they are listed."""

    def __init__(self, root):
        self.root = Path(root)
        self.faults = []
        self.below = {}  # folder -> the folders that it names
        self.all_below = {}  # folder -> every folder that it may include, itself among them
        folders = {}  # target -> folder
        for top in ("src", "host"):
            listed = SUBDIRECTORY.findall((self.root / top / "CMakeLists.txt").read_text())
            for folder in (f"{top}/{name}" for name in listed):
                self._read(folder, folders)
            self._find_unlisted(top, listed)

    def _read(self, folder, folders):
        match = LAYER.search((self.root / folder / "CMakeLists.txt").read_text())
        if not match:
            self.faults.append(f"{folder}/CMakeLists.txt: no zrm_layer()")
            return
        named = []
        for target in (match[2] or "").split():
            if target in folders:
                named.append(folders[target])
            else:
                self.faults.append(f"{folder}/CMakeLists.txt: {target} is not below {match[1]}")
        folders[match[1]] = folder
        self.below[folder] = named
        self.all_below[folder] = {folder}.union(*(self.all_below[name] for name in named))

    def _find_unlisted(self, top, listed):
        for path in sorted((self.root / top).iterdir()):
            if path.is_dir() and path.name not in listed and any(path.glob("*.h")):
                self.faults.append(f"{top}/CMakeLists.txt: {path.name} is not listed")

    def files(self):
        for folder in self.below:
            for path in sorted((self.root / folder).iterdir()):
                if path.suffix in (".h", ".cpp"):
                    yield folder, path

    def check_includes(self):
        included = {}
        for folder, path in self.files():
            name = f"{folder}/{path.name}"
            included[name] = []
            for spelled in INCLUDE.findall(path.read_text()):
                other = spelled if spelled.startswith("host/") else f"src/{spelled}"
                if not (self.root / other).is_file():
                    self.faults.append(f'{name}: "{spelled}" is not a file of src/ or host/')
                elif (parent := str(Path(other).parent)) not in self.all_below[folder]:
                    self.faults.append(f'{name}: "{spelled}" is in {parent}, not below {folder}')
                else:
                    included[name].append(other)
        self._check_cycles(included)

    def _check_cycles(self, included):
        left = dict(included)
        while True:
            free = [name for name, others in left.items() if not any(o in left for o in others)]
            if not free:
                break
            for name in free:
                del left[name]
        for name in sorted(left):
            self.faults.append(f"{name}: is in, or includes, a cycle of files")

    def check_commands(self, commands):
        """What the compiler can find is what the layer may include."""
        for entry in json.loads(Path(commands).read_text()):
            try:
                source = Path(entry["file"]).resolve().relative_to(self.root.resolve())
            except ValueError:
                continue
            folder = str(source.parent)
            if folder in self.below and source.name != "main.cpp":
                found = found_layers(entry["command"])
                if found != self.all_below[folder]:
                    wrong = ", ".join(sorted(found ^ self.all_below[folder]))
                    self.faults.append(f"{source}: the compiler's directories differ: {wrong}")


def found_layers(command):
    """The folders whose headers a compiler finds; any other directory of the project as it is."""
    found = set()
    words = shlex.split(command)
    for position, word in enumerate(words):
        if word in ("-I", "-isystem"):
            directory = words[position + 1]
        elif word.startswith("-I"):
            directory = word[2:]
        else:
            continue
        head, mark, folder = directory.partition("/layers/")
        if mark:
            found.add(folder)
        elif not directory.startswith("/usr/"):
            found.add(directory)
    return found


def main():
    parser = argparse.ArgumentParser(description="Checks and prints the layers of the sources.")
    parser.add_argument("--root", default=Path(__file__).resolve().parents[2])
    parser.add_argument("--commands", help="compile_commands.json of a build")
    arguments = parser.parse_args()
    layers = Layers(arguments.root)
    layers.check_includes()
    if arguments.commands:
        layers.check_commands(arguments.commands)
    for folder, named in layers.below.items():
        print(f"{folder:<16} {' '.join(named)}".rstrip())
    for fault in layers.faults:
        print(f"layers: {fault}", file=sys.stderr)
    return 1 if layers.faults else 0


if __name__ == "__main__":
    sys.exit(main())
