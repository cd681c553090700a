#!/usr/bin/python3
"""Whole-process benchmark of the agent, run by `./dev bench`.

Each case starts the release agent on an empty directory, lets a log grow or asks for a report, and
measures what the agent's process spent until it is idle again with everything read: CPU (of all its
threads), wall time and resident memory. Printed is the median of the runs, with the target that it
reaches or falls short of, and beside it a baseline in plain C over the same bytes
(bench/baseline.c). Data are generated into build/bench-data and used again.
"""

import argparse
import json
import os
import re
from pathlib import Path

import cases
import scaling
import table

LINES = 2_000_000
RUNS = 5


def parse_arguments():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("--agent", default="build/bin/zrmagent", help="the agent's program")
    parser.add_argument("--lines", type=int, default=LINES, help="lines by which a log grows")
    parser.add_argument("--runs", type=int, default=RUNS, help="runs of which the median counts")
    parser.add_argument("--only", default="", help="cases whose name matches this expression")
    parser.add_argument("--report-megabytes", type=int, default=1000, help="size of a report's log")
    parser.add_argument("--idle-logs", type=int, default=1000)
    parser.add_argument("--latency-lines", type=int, default=25)
    parser.add_argument("--directory", default=None, help="where the logs are written")
    parser.add_argument("--save", help="write the results to this file")
    parser.add_argument("--compare", help="show the change against this saved run")
    parser.add_argument("--scaling", action="store_true", help="how cost grows, in place of the cases")
    parser.add_argument("--markdown", help="put the table into this file, between its marks")
    options = parser.parse_args()
    options.wants = lambda name: re.search(options.only, name) is not None
    return options


def main():
    options = parse_arguments()
    if options.scaling:
        text = scaling.run(options)
        if options.markdown:
            table.write_markdown(options.markdown, text, scaling.BEGIN, scaling.END)
        return
    saved = {}
    if options.compare:
        saved = {r["case"]: r for r in json.loads(Path(options.compare).read_text())}
    busy = [os.getloadavg()[0]]
    results = []
    for case in cases.ALL:
        for result in case(options):
            results.append(result)
            table.show(result, saved)
    busy.append(os.getloadavg()[0])
    short = [result["case"] for result in results if table.verdict(result) is False]
    print(f"{len(results)} figures; short of their target: {', '.join(short) or 'none'}")
    if options.save:
        Path(options.save).write_text(json.dumps(results, indent=2) + "\n")
    if options.markdown:
        table.write_markdown(options.markdown, table.markdown(results, options.runs, busy))


if __name__ == "__main__":
    main()
