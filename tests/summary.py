#!/usr/bin/python3
"""Counts test results: `summary.py DIRECTORY...` prints `N passed, N failed, N skipped`.

A directory may hold ctest.xml with one GoogleTest report per program in unit/, system.xml and
browser.xml from pytest, and `checks` with lines "passed NAME" or "failed NAME". A program that ended without its
report, or that failed although its report shows no failure (a sanitizer's finding at its end),
counts as one failure. Exit status 1 when anything failed or nothing ran.
"""

import sys
import xml.etree.ElementTree as ElementTree
from collections import Counter
from pathlib import Path


def case_outcome(case):
    if case.find("failure") is not None or case.find("error") is not None:
        return "failed"
    if (
        case.find("skipped") is not None
        or case.get("result") == "skipped"
        or case.get("status") in ("notrun", "disabled")
    ):
        return "skipped"
    return "passed"


def cases(path):
    try:
        return list(ElementTree.parse(path).getroot().iter("testcase"))
    except (OSError, ElementTree.ParseError):
        return None


def unit_outcomes(directory):
    """(name, outcome) of every test of every unit program."""
    programs = cases(directory / "ctest.xml")
    if programs is None:
        return
    for program in programs:
        name = program.get("name")
        failed = case_outcome(program) != "passed"
        tests = cases(directory / "unit" / f"{name}.xml")
        if tests is None:
            yield f"{name} (ended without a report)", "failed"
            continue
        outcomes = [(f"{t.get('classname')}.{t.get('name')}", case_outcome(t)) for t in tests]
        yield from outcomes
        if failed and all(outcome != "failed" for _, outcome in outcomes):
            yield f"{name} (failed after its tests)", "failed"


def outcomes(directory):
    yield from unit_outcomes(directory)
    for report in ("system.xml", "browser.xml"):
        for case in cases(directory / report) or []:
            yield f"{case.get('classname')}.{case.get('name')}", case_outcome(case)
    checks = directory / "checks"
    if checks.exists():
        for line in checks.read_text().splitlines():
            outcome, _, name = line.partition(" ")
            yield name, outcome


def missing_reports(directory):
    """A test runner that died leaves a mark of having begun and no report."""
    for log, report in (
        ("ctest.log", "ctest.xml"),
        ("system.log", "system.xml"),
        ("browser.log", "browser.xml"),
    ):
        if (directory / log).exists() and cases(directory / report) is None:
            yield f"{directory.name}: no {report}", "failed"


def main(arguments):
    counts = Counter()
    for directory in map(Path, arguments):
        for name, outcome in [*outcomes(directory), *missing_reports(directory)]:
            counts[outcome] += 1
            if outcome != "passed":
                print(f"{outcome}: [{directory.name}] {name}")
    print(f"{counts['passed']} passed, {counts['failed']} failed, {counts['skipped']} skipped")
    return 1 if counts["failed"] or not counts["passed"] else 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
