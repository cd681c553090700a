#!/usr/bin/python3
"""Entries of a journal per CPU second of the agent's process, in the default configuration with one
situation that takes none of them but the last, beside `journalctl -o cat` over the same files.

    bench/journal.py [--entries 300000] [--runs 3]
"""

import argparse
import os
import resource
import statistics
import subprocess
import tempfile
import time

import process

REMOTE = "/lib/systemd/systemd-journal-remote"
BEGIN = 1_763_000_000_000_000  # microseconds


def write(directory, entries):
    """Entries with the fields that the journal gives those of a service."""
    with subprocess.Popen(
        [REMOTE, "-o", f"{directory}/bench.journal", "-"], stdin=subprocess.PIPE, stderr=subprocess.DEVNULL
    ) as remote:
        for number in range(entries):
            message = f"Failed password for invalid user u{number} from 203.0.113.{number % 250} port 40022 ssh2"
            remote.stdin.write(
                f"""__REALTIME_TIMESTAMP={BEGIN + number * 1000}
__MONOTONIC_TIMESTAMP={number * 1000 + 1}
_BOOT_ID=0123456789abcdef0123456789abcdef
_MACHINE_ID=3d1219c7c4c5404aaa1f6d2a48adfda4
_HOSTNAME=web1
_UID=0
_GID=0
_TRANSPORT=syslog
SYSLOG_FACILITY=10
SYSLOG_IDENTIFIER=sshd
SYSLOG_PID={number % 500}
_PID={number % 500}
_COMM=sshd
_EXE=/usr/sbin/sshd
_CMDLINE=sshd: root [priv]
_CAP_EFFECTIVE=1ffffffffff
_SYSTEMD_CGROUP=/system.slice/ssh.service
_SYSTEMD_SLICE=system.slice
_SYSTEMD_UNIT=ssh.service
PRIORITY={3 + number % 5}
_SOURCE_REALTIME_TIMESTAMP={BEGIN + number * 1000}
MESSAGE={message if number + 1 < entries else "the last entry"}

""".encode()
            )


def read_by_journalctl(journal):
    before = resource.getrusage(resource.RUSAGE_CHILDREN)
    command = ["journalctl", "--directory", journal, "--output", "cat", "--no-pager"]
    subprocess.run(command, stdout=subprocess.DEVNULL, check=True)
    after = resource.getrusage(resource.RUSAGE_CHILDREN)
    return after.ru_utime + after.ru_stime - before.ru_utime - before.ru_stime


def read_by_agent(options, journal):
    table = f'[[log]]\ntype = "journal"\nstart = "beginning"\ndirectory = "{journal}"\n'
    situation = {"name": "last", "log": "journal", "when": ["ENTRYDESC starts 'the last'"]}
    with tempfile.TemporaryDirectory(dir=options.directory) as directory:
        with process.AgentProcess(
            options.agent, directory, [], [situation], followed=table, history=True, http=True
        ) as agent:
            deadline = time.monotonic() + process.LIMIT
            while agent.events < 1 and time.monotonic() < deadline:
                time.sleep(0.01)
            return agent.cpu()


def main():
    parser = argparse.ArgumentParser(
        description=__doc__, formatter_class=argparse.RawTextHelpFormatter
    )
    parser.add_argument("--agent", default="build/bin/zrmagent", help="the agent's program")
    parser.add_argument("--entries", type=int, default=300_000)
    parser.add_argument("--runs", type=int, default=3, help="runs of which the median counts")
    parser.add_argument("--directory", help="where the journal is written")
    options = parser.parse_args()
    options.agent = os.path.abspath(options.agent)
    with tempfile.TemporaryDirectory(dir=options.directory) as journal:
        write(journal, options.entries)
        runs = [(read_by_agent(options, journal), read_by_journalctl(journal)) for _ in range(options.runs)]
    print("| journal, 22 fields, 1 situation | entries per CPU second |")
    print("|---|---|")
    for name, column in zip(("agent, its start included", "`journalctl -o cat`"), zip(*runs)):
        print(f"| {name} | {options.entries / statistics.median(column):,.0f} |")


if __name__ == "__main__":
    main()
