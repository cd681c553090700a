#!/usr/bin/python3
"""What logs cost to which nothing is written: CPU seconds of the agent's process in the default
configuration, with its logs in the log configuration and in a [[log]] table. The two take turns, so
that what else the machine does affects both.

    bench/idle.py [--logs 1000] [--seconds 60] [--runs 3]
"""

import argparse
import json
import statistics
import tempfile
import time

import cases
import data
import process


def measure(options, is_followed):
    """CPU seconds, and resident megabytes."""
    with tempfile.TemporaryDirectory(dir=options.directory) as directory:
        logs = [f"{directory}/app{number}.log" for number in range(options.logs)]
        for log in logs:
            with open(log, "wb") as stream:
                stream.write(data.initial_line("syslog"))
        pattern = json.dumps(f"{directory}/*.log")
        with process.AgentProcess(
            options.agent,
            directory,
            logs,
            cases.situations(1, logs[0], cases.NEVER),
            log_lines=dict.fromkeys(logs) if is_followed else None,
            followed=f"[[log]]\npath = {pattern}\n" if is_followed else "",
            history=True,
            http=True,
        ) as agent:
            time.sleep(10)  # what the start leaves to do, until the positions are stored
            before = agent.cpu()
            time.sleep(options.seconds)
            return agent.cpu() - before, agent.resident_kilobytes() / 1024


def main():
    parser = argparse.ArgumentParser(
        description=__doc__, formatter_class=argparse.RawTextHelpFormatter
    )
    parser.add_argument("--agent", default="build/bin/zrmagent", help="the agent's program")
    parser.add_argument("--logs", type=int, default=1000)
    parser.add_argument("--seconds", type=int, default=60)
    parser.add_argument("--runs", type=int, default=3, help="runs of which the median counts")
    parser.add_argument("--directory", help="where the logs are written")
    options = parser.parse_args()
    runs = [[measure(options, is_followed) for is_followed in (False, True)] for _ in range(options.runs)]
    print(f"| {options.logs} idle logs | CPU in {options.seconds} s | % of a core | resident |")
    print("|---|---|---|---|")
    for name, results in zip(("`logs.conf`", "`[[log]]`"), zip(*runs)):
        cpu, resident = (statistics.median(column) for column in zip(*results))
        print(f"| {name} | {cpu:.2f} s | {100 * cpu / options.seconds:.2f} | {resident:.1f} MB |")
    ratios = [followed[0] / plain[0] for plain, followed in runs]
    print(f"\n`[[log]]` costs {statistics.median(ratios):.2f} times `logs.conf`.")


if __name__ == "__main__":
    main()
