#!/usr/bin/python3
"""Checks that every test that docs/oddities.md names exists.

A test is named in the last column of a table row: `Suite.Name` for a unit test,
`test_file.py::test_name` for a system test.
"""

import re
import sys
from pathlib import Path

ROOT = Path(__file__).resolve().parents[1]


def existing_tests():
    names = set()
    for path in (ROOT / "tests/unit").rglob("*.cpp"):
        for suite, name in re.findall(r"^TEST(?:_F|_P)?\((\w+),\s*(\w+)\)", path.read_text(), re.M):
            names.add(f"{suite}.{name}")
    for path in (ROOT / "tests/system").glob("test_*.py"):
        for name in re.findall(r"^def (test_\w+)\(", path.read_text(), re.M):
            names.add(f"{path.name}::{name}")
    return names


def rows(text):
    """(behaviour, tests) of each table row."""
    for line in text.splitlines():
        if line.startswith("| ") and not line.startswith(("| Behaviour", "|--", "| --")):
            cells = [cell.strip() for cell in line.strip("|").split(" | ")]
            yield cells[0], re.findall(r"`([^`]+)`", cells[-1])


def main():
    existing = existing_tests()
    bad = 0
    for behaviour, tests in rows((ROOT / "docs/oddities.md").read_text()):
        for name in tests or ["(none named)"]:
            if name not in existing:
                print(f"docs/oddities.md: no such test: {name} ({behaviour[:60]})")
                bad += 1
    return 1 if bad else 0


if __name__ == "__main__":
    sys.exit(main())
