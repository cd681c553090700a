"""Followed logs under load and rotation while the agent is killed: each event once, in order."""

import json
import os
import random
import sqlite3
import time
from collections import defaultdict
from signal import SIGKILL, SIGTERM

import pytest
from conftest import syslog_line, wait_until

# How often the agent is killed. More: ZRM_KILLS=1000.
KILLS = int(os.environ.get("ZRM_KILLS", "12"))
SEED = int(os.environ.get("ZRM_SEED", str(random.randrange(1 << 30))))

# Events of this many runs at least; older ones expire, so that a thousand runs fit any disk.
KEPT_EVENTS = 300_000
KEPT_GENERATIONS = 8
# The logs do not grow while the agent is further behind than this, on a busy machine for example.
MOST_BEHIND = 200_000


class Judged:
    """What the history has of each situation and writer: numbers without a gap, each once, in order.

    A text begins with its number and the name of its writer: the log, or whoever still writes to a
    rotated file of it.
    """

    def __init__(self, agent):
        self._file = f"file:{agent.directory}/state/history.db?mode=ro"
        self._event = 0
        self.steps = {"every": 1, "fifth": 5}  # the same entry may raise two events
        self.numbers = defaultdict(int)

    def read(self):
        """Looks at the events that are new; true if there were any."""
        before = self._event
        try:
            connection = sqlite3.connect(self._file, uri=True)
            rows = connection.execute(
                "SELECT id, json_extract(json, '$.situation', '$.row.LOGNAME', '$.row.ENTRYDESC')"
                " FROM events WHERE id > ? ORDER BY id",
                (before,),
            )
            for number, text in rows:
                self._take(number, *json.loads(text))
            connection.close()
        except sqlite3.OperationalError:
            assert before == 0  # there is no history yet
        return self._event > before

    def _take(self, number, situation, log, text):
        assert number == self._event + 1, f"seed {SEED}: event {number} follows {self._event}"
        self._event = number
        entry, writer = text.split()[:2]
        assert writer.startswith(log)
        expected = self.numbers[situation, writer] + self.steps[situation]
        assert int(entry) == expected, (
            f"seed {SEED}: {situation} of {writer} has {entry} in event {number} instead of {expected}"
        )
        self.numbers[situation, writer] = expected

    def has(self, written):
        """True if each situation has all that the writers wrote."""
        return all(
            self.numbers[situation, writer] == last // step * step
            for writer, last in written.items()
            for situation, step in self.steps.items()
        )


class Writer:
    """Writes numbered lines into a log and rotates it; nobody else writes, so rotation loses nothing.

    A program that was not told of the rotation may go on writing to the file that was renamed last.
    """

    def __init__(self, path, rotation, dice):
        self.path, self.rotation, self.dice = path, rotation, dice
        self.last = self.rotations = 0
        self.ends = []  # the last number of each generation, the newest first
        self.late = {}  # how many late lines each late writer has written
        self._late_stream = None
        path.write_bytes(b"")

    def write(self):
        count = self.dice.choice((1, 3, 40, 700))
        lines = self._lines(self.path.name, self.last, count)
        cut = self.dice.randrange(len(lines))
        with open(self.path, "ab", buffering=0) as stream:
            stream.write(lines[:cut])  # usually within a line
            stream.write(lines[cut:])
        self.last += count

    def write_late(self):
        if self._late_stream is not None:
            name = f"{self.path.name}/{self.rotations}"
            count = self.dice.choice((1, 30))
            self._late_stream.write(self._lines(name, self.late[name], count))
            self.late[name] += count

    def _lines(self, name, last, count):
        return "".join(
            syslog_line(f"{last + number + 1} {name} " + "x" * self.dice.randrange(1, 50)) for number in range(count)
        ).encode()

    def rotate(self):
        self.rotations += 1
        if self._late_stream is not None:
            self._late_stream.close()
            self._late_stream = None
        for number in range(len(self.ends), 0, -1):
            self._generation(number).rename(self._generation(number + 1))
        self.ends.insert(0, self.last)
        if self.rotation == "copy and truncate":
            self._generation(1).write_bytes(self.path.read_bytes())
            os.truncate(self.path, 0)
            return
        self.path.rename(self._generation(1))
        if self.dice.random() < 0.5:
            self._late_stream = open(self._generation(1), "ab", buffering=0)
            self.late[f"{self.path.name}/{self.rotations}"] = 0
        if self.rotation == "rename and create":
            self.path.write_bytes(b"")

    def written(self):
        """The last number of each writer."""
        return {self.path.name: self.last, **self.late}

    def remove_old(self, judged):
        """Removes generations whose entries, and one of a later generation, are in the history."""
        last = judged.numbers["every", self.path.name]
        while len(self.ends) > KEPT_GENERATIONS and self.ends[-1] < last and judged.has(self.late):
            self._generation(len(self.ends)).unlink()
            self.ends.pop()

    def _generation(self, number):
        return self.path.with_name(f"{self.path.name}.{number}")


@pytest.mark.slow
@pytest.mark.parametrize("number, ends", [(SIGKILL, KILLS), (SIGTERM, KILLS // 3)], ids=("killed", "stopped"))
def test_an_agent_that_ends_under_load_raises_each_event_once_and_in_order(agent, number, ends):
    print(f"seed {SEED}")
    dice = random.Random(SEED)
    agent.sink = None
    agent.agent_keys["log_config"] = None
    agent.history["keep_events"] = KEPT_EVENTS
    logs = agent.directory / "logs"
    logs.mkdir()
    writers = [
        Writer(logs / name, rotation, dice)
        for name, rotation in (
            ("renamed.log", "rename and create"),
            ("late.log", "rename"),
            ("copied.log", "copy and truncate"),
        )
    ]
    agent.follow(logs / "*.log", start="beginning", rotate_wait="1s")
    agent.situation("every")
    agent.situation("fifth", when=["ENTRYDESC matches '^[0-9]*[05] '"])
    judged = Judged(agent)

    def work(seconds):
        end = time.monotonic() + seconds
        while time.monotonic() < end:
            writer = dice.choice(writers)
            if writer.last - judged.numbers["every", writer.path.name] < MOST_BEHIND:
                writer.write()
                if dice.random() < 0.02:
                    writer.rotate()
            if dice.random() < 0.03:  # rarely enough for the file to be left meanwhile
                writer.write_late()
            time.sleep(0.01)

    for writer in writers:
        writer.write()
    for run in range(ends):
        agent.start(wait=number == SIGTERM)  # it takes the signal once it has blocked it
        if run == 0:  # from here on there are positions
            wait_until(lambda: judged.read() and len(judged.numbers) >= len(writers), "events of every log")
        work(dice.uniform(0.1, 3))
        agent.send(number)
        assert agent.wait_end() == (-SIGKILL if number == SIGKILL else 0)
        assert "were not read" not in agent.stderr.text()  # the next run reads them
        judged.read()
        for writer in writers:
            writer.remove_old(judged)
        for writer in writers:
            writer.write_late()
        work(dice.uniform(0, 0.2))  # while nobody reads
    for writer in writers:
        writer.write()
    agent.start(wait=False, trace="error")
    written = {name: last for writer in writers for name, last in writer.written().items()}

    def is_all_judged():
        judged.read()
        return judged.has(written)

    wait_until(is_all_judged, lambda: f"{written}, have {judged.numbers}; {agent.stderr.text()[-3000:]}", 240)
    assert agent.stop() == 0
    judged.read()
    assert judged.has(written), f"seed {SEED}"
    late = sum(last for writer in writers for last in writer.late.values())
    print(f"{ends} runs, {sum(writer.last for writer in writers)} entries and {late} late ones")
    assert sum(writer.rotations for writer in writers) > ends // 4
    assert late > 0
