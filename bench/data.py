"""The benchmark's data: generated once into build/bench-data and used again by later runs."""

import subprocess
from pathlib import Path

DIRECTORY = Path(__file__).resolve().parent.parent / "build" / "bench-data"


class Data:
    """One generated file of `count` lines or records."""

    def __init__(self, options, kind, count):
        self.kind = kind
        self.count = count
        self.path = DIRECTORY / f"{kind}-{count}"
        self._programs = Path(options.agent).parent
        if not self.path.exists():
            DIRECTORY.mkdir(parents=True, exist_ok=True)
            unfinished = self.path.with_suffix(".part")
            with open(unfinished, "wb") as stream:
                generate = self._programs / "bench_generate"
                subprocess.run([generate, kind, str(count)], stdout=stream, check=True)
            unfinished.rename(self.path)

    @property
    def width(self):
        return self.path.stat().st_size / self.count

    def baseline(self, offset=0):
        """Lines, CPU seconds and wall seconds of plain C over the data from an offset on."""
        program = self._programs / "bench_baseline"
        fields = subprocess.run(
            [program, self.kind, self.path, str(offset)],
            check=True,
            capture_output=True,
            text=True,
        ).stdout.split()
        return {"lines": int(fields[0]), "cpu": float(fields[1]), "wall": float(fields[2])}


def idle_baseline(agent, log, seconds):
    """CPU seconds of a thousand threads in plain C that look at the log's end once a second."""
    program = Path(agent).parent / "bench_baseline"
    command = [program, "idle", log, str(seconds)]
    output = subprocess.run(command, check=True, capture_output=True, text=True).stdout
    return float(output.split()[1])


def initial_line(kind):
    """What a log holds before it grows."""
    if kind == "accounting":
        return bytes(40)
    if kind == "access":
        return b'192.0.2.1 - - [01/Jan/2026:00:00:00 +0000] "GET / HTTP/1.1" 200 1 "-" "before the start"\n'
    if kind == "json":
        return b'{"msg":"before the start"}\n'
    if kind == "user":
        return b"2026-01-01 00:00:00 INFO before the start\n"
    return b"Jan  1 00:00:00 web1 old: before the start\n"
