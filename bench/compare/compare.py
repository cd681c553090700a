#!/usr/bin/python3
"""Compares the agent with other log readers on the same work.

A syslog file grows by two million lines of which one in a hundred is a failed login; each program
follows the file, looks for these lines by two conditions, and writes or counts what it finds. What
counts is the CPU time of the process and its children from before the growth until everything is
read and the process rests. Each program runs in a temporary directory of its own, with the
configuration beside this script that suits it best, and is ended afterwards.

Missing packages are installed from Debian's, without starting their services (root or sudo). The
two system loggers exclude each other, so syslog-ng is unpacked into build/bench-data instead.
"""

import argparse
import os
import re
import shutil
import statistics
import subprocess
import sys
import tempfile
import time
from pathlib import Path

HERE = Path(__file__).resolve().parent
sys.path.insert(0, str(HERE.parent))

import cases  # noqa: E402
import data as data_files  # noqa: E402
import table  # noqa: E402
from data import Data  # noqa: E402

LIMIT = 300  # seconds that any wait may take
BEGIN, END = "<!-- compare: begin -->", "<!-- compare: end -->"

UNPACKED = {"syslog-ng-core": "usr/lib/syslog-ng"}  # with the directory of its libraries

# name, package, configuration, command; {dir} is the temporary directory
PEERS = [
    ("rsyslog, direct queue, no fields", "rsyslog", "rsyslog.conf",
     ["/usr/sbin/rsyslogd", "-n", "-f", "{dir}/conf", "-i", "{dir}/pid"]),
    ("rsyslog, direct queue, fields parsed", "rsyslog", "rsyslog-fields.conf",
     ["/usr/sbin/rsyslogd", "-n", "-f", "{dir}/conf", "-i", "{dir}/pid"]),
    ("syslog-ng, large fetches", "syslog-ng-core", "syslog-ng.conf",
     ["{unpacked}/usr/sbin/syslog-ng", "-F",
      "--module-path={unpacked}/usr/lib/syslog-ng/3.38", "--no-caps", "-f", "{dir}/conf", "-R", "{dir}/persist",
      "-p", "{dir}/pid", "-c", "{dir}/control"]),
    ("mtail, one expression", "mtail", "logins.mtail",
     ["/usr/bin/mtail", "--progs", "{dir}/conf", "--logs", "{dir}/app.log", "--address",
      "127.0.0.1", "--port", "0", "--poll_interval", "250ms"]),
    ("sec, one rule", "sec", "sec.conf",
     ["/usr/bin/sec", "--conf={dir}/conf", "--input={dir}/app.log", "--tail", "--quiet",
      "--blocksize=65536", "--poll-timeout=0.1"]),
]  # fmt: skip


def status_of(package):
    return subprocess.run(
        ["dpkg-query", "-W", "-f=${db:Status-Status} ${Version}", package],
        capture_output=True,
        text=True,
        check=False,
    ).stdout.split()


def install(packages):
    """Installs what is missing; no service of theirs is started."""
    missing = [package for package in packages if status_of(package)[:1] != ["installed"]]
    if not missing:
        return
    root = [] if os.geteuid() == 0 else ["sudo"]
    policy = Path("/usr/sbin/policy-rc.d")
    own_policy = not policy.exists()
    print("installing", *missing, flush=True)
    if own_policy:
        text = b"#!/bin/sh\nexit 101\n"
        subprocess.run([*root, "tee", policy], input=text, stdout=subprocess.DEVNULL, check=True)
        subprocess.run([*root, "chmod", "755", policy], check=True)
    try:
        apt = [*root, "env", "DEBIAN_FRONTEND=noninteractive", "apt-get", "-q", "-y"]
        subprocess.run([*apt, "update"], stdin=subprocess.DEVNULL, check=True)
        command = [*apt, "install", "--no-install-recommends", *missing]
        subprocess.run(command, stdin=subprocess.DEVNULL, check=True)
    finally:
        if own_policy:
            subprocess.run([*root, "rm", "-f", policy], check=True)


def unpack(package):
    """Unpacks a package that must not be installed; what it needs is installed."""
    target = data_files.DIRECTORY / "unpacked" / package
    if not target.exists():
        shown = subprocess.run(
            ["apt-cache", "depends", package], capture_output=True, text=True, check=True
        ).stdout
        install(re.findall(r"^  Depends: (lib\S+)$", shown, re.M))
        with tempfile.TemporaryDirectory() as directory:
            subprocess.run(["apt-get", "-q", "download", package], cwd=directory, check=True)
            (archive,) = Path(directory).glob("*.deb")
            target.parent.mkdir(parents=True, exist_ok=True)
            subprocess.run(["dpkg-deb", "-x", archive, target], check=True)
            version = subprocess.run(
                ["dpkg-deb", "-f", archive, "Version"], capture_output=True, text=True, check=True
            )
            (target / "version").write_text(version.stdout)
    return target


def version_of(package):
    if package in UNPACKED:
        return (unpack(package) / "version").read_text().strip()
    return status_of(package)[1]


class Peer:
    """One run of another program; ends with the `with` block."""

    def __init__(self, directory, package, config, command):
        environment, unpacked = dict(os.environ), None
        if package in UNPACKED:
            unpacked = unpack(package)
            environment["LD_LIBRARY_PATH"] = str(unpacked / UNPACKED[package])
        self.directory = directory
        self.log = directory / "app.log"
        self.log.write_bytes(data_files.initial_line("syslog"))
        text = (HERE / config).read_text().replace("@DIR@", str(directory))
        if config.endswith(".mtail"):
            (directory / "conf").mkdir()
            (directory / "conf" / config).write_text(text)
        else:
            (directory / "conf").write_text(text)
        self.output = open(directory / "output", "wb")
        self.process = subprocess.Popen(
            [part.format(dir=directory, unpacked=unpacked) for part in command],
            env=environment,
            stdin=subprocess.DEVNULL,
            stdout=self.output,
            stderr=subprocess.STDOUT,
            cwd=directory,
        )

    def __enter__(self):
        self.wait(lambda: self.position() is not None, "the log to be opened")
        time.sleep(2)  # what the start leaves to do
        return self

    def __exit__(self, *_):
        self.process.terminate()
        try:
            self.process.wait(20)
        except subprocess.TimeoutExpired:
            self.process.kill()
            self.process.wait()
        self.output.close()

    def wait(self, condition, what):
        deadline = time.monotonic() + LIMIT
        while not condition():
            if self.process.poll() is not None or time.monotonic() > deadline:
                text = (self.directory / "output").read_text(errors="replace")
                sys.exit(f"waited for {what}:\n{text[-2000:]}")
            time.sleep(0.02)

    def position(self):
        """How far the log has been read; None while it is not open."""
        base = Path(f"/proc/{self.process.pid}")
        positions = []
        for entry in (base / "fd").iterdir():
            try:
                if os.readlink(entry) == str(self.log):
                    text = (base / "fdinfo" / entry.name).read_text()
                    positions.append(int(re.search(r"pos:\s*(\d+)", text).group(1)))
            except OSError:
                continue
        return max(positions, default=None)

    def cpu(self):
        clock = (~self.process.pid << 3) | 2
        return time.clock_gettime(clock)

    def resident(self):
        text = Path(f"/proc/{self.process.pid}/status").read_text()
        return int(re.search(r"VmRSS:\s*(\d+)", text).group(1)) / 1024

    def measure(self, data):
        cpu, begin = self.cpu(), time.monotonic()
        cases.append(data.path, self.log)
        size = self.log.stat().st_size
        self.wait(lambda: self.position() == size, "the reading")
        quiet, last = time.monotonic(), self.cpu()
        while time.monotonic() - quiet < 1.0:
            time.sleep(0.05)
            if self.cpu() - last > 0.01:
                quiet = time.monotonic()
            last = self.cpu()
        return {"cpu": last - cpu, "wall": quiet - begin, "resident": self.resident()}

    def found(self):
        """Matches that were written, None for a program that only counts."""
        path = self.directory / "matches"
        return path.read_bytes().count(b"\n") if path.exists() else None


def run_peer(options, data, package, config, command):
    directory = Path(tempfile.mkdtemp(prefix="zrm-compare-", dir=options.directory))
    try:
        with Peer(directory, package, config, command) as peer:
            result = peer.measure(data)
        result["found"] = peer.found()
        return result
    finally:
        shutil.rmtree(directory)


def row(name, version, runs, count):
    cpu = statistics.median(run["cpu"] for run in runs)
    wall = statistics.median(run["wall"] for run in runs)
    resident = statistics.median(run["resident"] for run in runs)
    return [name, version, f"{count / cpu:,.0f}", f"{cpu:.2f}", f"{wall:.2f}", f"{resident:.1f}"]


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("--agent", default="build/bin/zrmagent")
    parser.add_argument("--lines", type=int, default=2_000_000)
    parser.add_argument("--runs", type=int, default=3)
    parser.add_argument("--only", default="")
    parser.add_argument("--directory", default=None)
    parser.add_argument("--markdown", help="put the table into this file, between its marks")
    options = parser.parse_args()
    peers = [peer for peer in PEERS if re.search(options.only, peer[0])]
    install(sorted({package for _, package, _, _ in peers} - UNPACKED.keys()))
    data = Data(options, "syslog", options.lines)
    expected = options.lines // 100
    busy = os.getloadavg()[0]

    header = ["program", "version", "lines per CPU second", "CPU s", "wall s", "resident MB"]
    rows = [header]

    def add(cells):
        rows.append(cells)
        print(" | ".join(cells), flush=True)

    own = [
        cases.throughput_run(options, data, lambda log, _: cases.situations(1, log, cases.ONE_PERCENT), 0.01)
        for _ in range(options.runs)
    ]  # fmt: skip
    version = subprocess.run([options.agent, "--version"], capture_output=True, text=True, check=True)
    add(row("zrmagent, one situation", version.stdout.split()[-1], own, options.lines))
    for name, package, config, command in peers:
        runs = [run_peer(options, data, package, config, command) for _ in range(options.runs)]
        for run in runs:
            if run["found"] not in (None, expected):
                print(f"{name}: {run['found']} of {expected} lines found")
        add(row(name, version_of(package), runs, options.lines))
    if options.markdown:
        lines = [
            f"Machine: {table.machine()}. Load average of one minute before the first run "
            f"{busy:.2f}. Median of {options.runs} runs, {options.lines:,} lines.",
            "",
            "| " + " | ".join(header) + " |",
            "|" + "---|" * len(header),
            *("| " + " | ".join(cells) + " |" for cells in rows[1:]),
        ]
        table.write_markdown(options.markdown, "\n".join(lines), BEGIN, END)


if __name__ == "__main__":
    main()
