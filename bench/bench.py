#!/usr/bin/python3
"""Whole-process benchmark of the agent, run by `./dev bench`.

Each scenario starts the release agent on an empty directory, lets a log grow, and measures what the
agent's process spent from before the growth until it is idle again with everything read: CPU (of
all its threads), wall time and resident memory. Printed is the median of the runs. Beside it stands
a baseline in plain C over the same bytes (bench/baseline.c).
"""

import argparse
import json
import os
import random
import re
import shutil
import statistics
import subprocess
import sys
import tempfile
import time
from pathlib import Path

from process import AgentProcess

LINES = 2_000_000
RUNS = 5

NEVER = {"when": ["ENTRYSRC starts 'sshd'", "ENTRYDESC contains 'no such words'"]}
ONE_PERCENT = {"when": ["ENTRYSRC starts 'sshd'", "ENTRYDESC contains 'Failed password'"]}


def situations(count, log, keys):
    return [{"name": f"s{i}", "log": str(log), **keys} for i in range(count)]


# name, situations on (log, another log), expected events per line
THROUGHPUT = [
    ("syslog, 1 situation, none match", lambda log, other: situations(1, log, NEVER), 0),
    ("syslog, 1 situation, 1% match", lambda log, other: situations(1, log, ONE_PERCENT), 0.01),
    ("syslog, 100 situations, none match", lambda log, other: situations(100, log, NEVER), 0),
    (
        "syslog, 99 of 100 on other logs",
        lambda log, other: situations(99, other, NEVER)
        + [{"name": "own", "log": str(log), **NEVER}],
        0,
    ),
]


class Workplace:
    """A temporary directory for one run; the logs live there."""

    def __init__(self, options):
        self.options = options

    def __enter__(self):
        base = self.options.directory
        self.directory = Path(tempfile.mkdtemp(prefix="zrm-bench-", dir=base))
        return self

    def __exit__(self, *_):
        shutil.rmtree(self.directory)

    def log(self, name):
        path = self.directory / name
        path.write_bytes(b"Jan  1 00:00:00 web1 old: before the start\n")
        return path

    def agent(self, logs, chosen):
        return AgentProcess(self.options.agent, self.directory, logs, chosen)


def append(source, log):
    """Grows the log by the bytes of the source, as fast as the system copies."""
    with open(source, "rb") as data, open(log, "r+b") as stream:
        stream.seek(0, os.SEEK_END)
        while os.sendfile(stream.fileno(), data.fileno(), None, 1 << 26):
            pass


def throughput_run(options, data, choose, share):
    with Workplace(options) as place:
        log, other = place.log("app.log"), place.log("other.log")
        with place.agent([log, other], choose(log, other)) as agent:
            cpu, begin = agent.cpu(), time.monotonic()
            append(data, log)
            agent.wait_read(log)
            end = agent.wait_idle()
            result = {
                "cpu": agent.cpu() - cpu,
                "wall": end - begin,
                "resident": agent.resident_kilobytes(),
            }
            events = agent.wait_events(int(options.lines * share))
        if events != int(options.lines * share):
            sys.exit(f"wrong number of events: {events}")
        return result


def baseline_run(options, data):
    program = Path(options.agent).with_name("bench_baseline")
    lines, cpu, _ = subprocess.run(
        [program, data], check=True, capture_output=True, text=True
    ).stdout.split()
    assert int(lines) == options.lines
    return float(cpu)


def median(runs, key):
    return statistics.median(run[key] for run in runs)


def throughput(options, data, baseline):
    for name, choose, share in THROUGHPUT:
        if not re.search(options.only, name):
            continue
        runs = [throughput_run(options, data, choose, share) for _ in range(options.runs)]
        rate = options.lines / median(runs, "cpu")
        yield {
            "scenario": name,
            "lines per CPU second": round(rate),
            "CPU s": round(median(runs, "cpu"), 3),
            "wall s": round(median(runs, "wall"), 2),
            "resident kB": round(median(runs, "resident")),
            "of plain C": round(rate / baseline, 3),
        }


def idle_logs(options):
    """CPU and memory of logs to which nothing is written."""
    count, seconds = options.idle_logs, 10
    with Workplace(options) as place:
        first = [place.log("app0.log")]
        with place.agent(first, situations(1, first[0], NEVER)) as agent:
            small = agent.resident_kilobytes()
    with Workplace(options) as place:
        logs = [place.log(f"app{i}.log") for i in range(count)]
        with place.agent(logs, situations(1, logs[0], NEVER)) as agent:
            cpu = agent.cpu()
            time.sleep(seconds)
            used = agent.cpu() - cpu
            resident = agent.resident_kilobytes()
    return {
        "scenario": f"{count} idle logs",
        "CPU % of one core": round(100 * used / seconds, 2),
        "kB per log": round((resident - small) / max(count - 1, 1), 1),
    }


def latency(options):
    """From the write of a line to its event on standard output."""
    delays, pauses = [], random.Random(1)
    with Workplace(options) as place:
        log = place.log("app.log")
        with place.agent([log], [{"name": "all", "log": str(log)}]) as agent:
            for number in range(options.latency_lines):
                time.sleep(pauses.random())  # the writes fall all over the second of a poll
                line = time.strftime(f"%b %e %H:%M:%S web1 app[1]: number {number}\n")
                with open(log, "a", encoding="ascii") as stream:
                    stream.write(line)
                written = time.monotonic()
                agent.wait_events(number + 1)
                delays.append(agent.last_event_time - written)
    return {
        "scenario": f"write to event, {len(delays)} lines",
        "median s": round(statistics.median(delays), 3),
        "maximum s": round(max(delays), 3),
    }


def show(result, saved):
    before = saved.get(result["scenario"], {})
    cells = []
    for key, value in result.items():
        if key == "scenario":
            continue
        text = f"{value:,}" if isinstance(value, int) else f"{value}"
        if before.get(key):
            text += f" ({100 * (value - before[key]) / before[key]:+.0f}%)"
        cells.append(f"{key} {text}")
    print(f"{result['scenario']:<36} {' | '.join(cells)}", flush=True)


def parse_arguments():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("--agent", default="build/bin/zrmagent", help="the agent's program")
    parser.add_argument("--lines", type=int, default=LINES, help="lines by which a log grows")
    parser.add_argument("--runs", type=int, default=RUNS, help="runs of which the median counts")
    parser.add_argument("--only", default="", help="scenarios whose name matches this expression")
    parser.add_argument("--idle-logs", type=int, default=1000)
    parser.add_argument("--latency-lines", type=int, default=25)
    parser.add_argument("--directory", default=None, help="where the logs are written")
    parser.add_argument("--save", help="write the results to this file")
    parser.add_argument("--compare", help="show the change against this saved run")
    return parser.parse_args()


def main():
    options = parse_arguments()
    saved = {}
    if options.compare:
        saved = {r["scenario"]: r for r in json.loads(Path(options.compare).read_text())}
    results = []

    def add(result):
        results.append(result)
        show(result, saved)

    with tempfile.TemporaryDirectory(prefix="zrm-data-", dir=options.directory) as directory:
        data = Path(directory) / "lines"
        with open(data, "wb") as stream:
            generate = Path(options.agent).with_name("bench_generate")
            subprocess.run([generate, str(options.lines)], stdout=stream, check=True)
        width = data.stat().st_size / options.lines
        print(f"{options.lines:,} lines of {width:.0f} bytes; median of {options.runs} runs")
        cpu = statistics.median(baseline_run(options, data) for _ in range(options.runs))
        baseline = options.lines / cpu
        add({"scenario": "plain C baseline", "lines per CPU second": round(baseline)})
        for result in throughput(options, data, baseline):
            add(result)
    for name, run in (("idle logs", idle_logs), ("latency: write to event", latency)):
        if re.search(options.only, name):
            add(run(options))
    if options.save:
        Path(options.save).write_text(json.dumps(results, indent=2) + "\n")


if __name__ == "__main__":
    main()
