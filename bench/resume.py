"""How long a start takes that resumes logs of a [[log]] table: from the start of the process to the
events of what was written while it was stopped. Prints the rows of a table.

    /usr/bin/python3 bench/resume.py [--agent build/bin/zrmagent] [--runs 5]
"""

import argparse
import contextlib
import os
import resource
import sqlite3
import statistics
import subprocess
import sys
import tempfile
import time
from pathlib import Path

LIMIT = 300  # seconds that any wait may take
LINE = "Nov 22 07:03:09 web1 app[412]: line %d of a log that is resumed, of the usual length, more or less\n"
GIGABYTE = 10**9


class Agent:
    """Follows all logs of a directory, and is started again and again."""

    def __init__(self, program, directory):
        self.program, self.directory = program, directory
        self.configuration = directory / "zrm.toml"
        self.configuration.write_text(
            f'state_directory = "{directory}/state"\n[http]\nlisten = ""\n'
            f'[[log]]\npath = "{directory}/logs/*.log"\n'
            '[[sink]]\ntype = "jsonl"\npath = "-"\n'
            '[[situation]]\nname = "every"\ntext = "every"\nseverity = "info"\n'
        )

    @contextlib.contextmanager
    def running(self):
        process = subprocess.Popen(
            [self.program, "--config", self.configuration],
            stdin=subprocess.DEVNULL,
            stdout=subprocess.PIPE,
            stderr=subprocess.DEVNULL,
        )
        try:
            yield process
        finally:
            process.terminate()
            status = process.wait(LIMIT)
        if status != 0:
            sys.exit(f"the agent ended with status {status}")

    def positions(self):
        """How many logs have a stored position."""
        path = self.directory / "state" / "history.db"
        if not path.exists():
            return 0
        with contextlib.closing(sqlite3.connect(f"file:{path}?mode=ro", uri=True)) as history:
            try:
                return history.execute("SELECT count(*) FROM log_positions").fetchone()[0]
            except sqlite3.OperationalError:
                return 0  # it is being made

    def store_positions(self, count):
        deadline = time.monotonic() + LIMIT
        with self.running():
            while self.positions() < count:
                if time.monotonic() > deadline:
                    sys.exit(f"{self.positions()} of {count} positions are stored")
                time.sleep(0.05)

    def resume(self, count):
        """Seconds from the start to the first event and to that many, and of CPU to the end."""
        times = []
        before = resource.getrusage(resource.RUSAGE_CHILDREN)
        begin = time.monotonic()
        with self.running() as process:
            events = 0
            while events < count:
                data = os.read(process.stdout.fileno(), 1 << 20)
                if not data:
                    sys.exit("the agent ended")
                events += data.count(b"\n")
                times.append(time.monotonic() - begin)
        after = resource.getrusage(resource.RUSAGE_CHILDREN)
        cpu = after.ru_utime + after.ru_stime - before.ru_utime - before.ru_stime
        return times[0], times[-1], cpu


def append(logs, number):
    for log in logs:
        with open(log, "a", encoding="ascii") as stream:
            stream.write(LINE % number)


def measure(program, runs, name, logs, size):
    with tempfile.TemporaryDirectory(dir=Path(program).resolve().parent) as directory:
        directory = Path(directory)
        (directory / "logs").mkdir()
        paths = [directory / "logs" / f"app{number}.log" for number in range(logs)]
        block = LINE % 0 * (1 << 13)
        for path in paths:
            with open(path, "w", encoding="ascii") as stream:
                for _ in range(max(size // len(block), 1) if size else 0):
                    stream.write(block)
        append(paths, 0)
        agent = Agent(program, directory)
        agent.store_positions(logs)
        times = []
        for run in range(runs):
            append(paths, run + 1)
            times.append(agent.resume(logs))
        first, last, cpu = (statistics.median(column) for column in zip(*times))
        print(f"| {name} | {first:.2f} s | {last:.2f} s | {cpu:.2f} s |", flush=True)


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawTextHelpFormatter)
    parser.add_argument("--agent", default="build/bin/zrmagent")
    parser.add_argument("--runs", type=int, default=5)
    arguments = parser.parse_args()
    print(f"Load average of one minute before the first run: {os.getloadavg()[0]:.2f}.\n")
    print("| start with stored positions | first new event | last new event | CPU |\n|---|---|---|---|")
    measure(arguments.agent, arguments.runs, "1 log of 1 GB, 1 new line", 1, GIGABYTE)
    measure(arguments.agent, arguments.runs, "1000 logs, 1 new line each", 1000, 0)


if __name__ == "__main__":
    main()
