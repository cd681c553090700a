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


def query(agent, sql):
    """What the history answers; nothing if there is none yet."""
    try:
        connection = sqlite3.connect(f"file:{agent.directory}/state/history.db?mode=ro", uri=True)
        rows = connection.execute(sql).fetchall()
        connection.close()
        return rows
    except sqlite3.OperationalError:
        return []


def stored(agent):
    """The numbers of the entries in the history's events, in order: by situation and log."""
    numbers = defaultdict(list)
    for (text,) in query(agent, "SELECT json FROM events ORDER BY id"):
        event = json.loads(text)
        row = event["row"]
        numbers[event["situation"], row["LOGNAME"]].append(int(row["ENTRYDESC"].split()[0]))
    return numbers


class Writer:
    """Writes numbered lines into a log and rotates it; nobody else writes, so rotation loses nothing."""

    def __init__(self, path, rotation, dice):
        self.path, self.rotation, self.dice = path, rotation, dice
        self.last = self.rotations = 0
        path.write_bytes(b"")

    def write(self):
        count = self.dice.choice((1, 3, 40, 700))
        lines = "".join(
            syslog_line(f"{self.last + number + 1} " + "x" * self.dice.randrange(1, 60)) for number in range(count)
        ).encode()
        cut = self.dice.randrange(len(lines))
        with open(self.path, "ab", buffering=0) as stream:
            stream.write(lines[:cut])  # usually within a line
            stream.write(lines[cut:])
        self.last += count

    def rotate(self):
        self.rotations += 1
        for number in range(self.rotations - 1, 0, -1):
            self._generation(number).rename(self._generation(number + 1))
        if self.rotation == "copy and truncate":
            self._generation(1).write_bytes(self.path.read_bytes())
            os.truncate(self.path, 0)
        else:
            self.path.rename(self._generation(1))
            if self.rotation == "rename and create":
                self.path.write_bytes(b"")

    def _generation(self, number):
        return self.path.with_name(f"{self.path.name}.{number}")


@pytest.mark.slow
@pytest.mark.parametrize("number, ends", [(SIGKILL, KILLS), (SIGTERM, KILLS // 3)], ids=("killed", "stopped"))
def test_an_agent_that_ends_under_load_raises_each_event_once_and_in_order(agent, number, ends):
    print(f"seed {SEED}")
    dice = random.Random(SEED)
    agent.sink = None
    agent.agent_keys["log_config"] = None
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
    agent.situation("fifth", when=["ENTRYDESC matches '^[0-9]*[05] '"])  # the same entry raises two events

    def work(seconds):
        end = time.monotonic() + seconds
        while time.monotonic() < end:
            writer = dice.choice(writers)
            writer.write()
            if dice.random() < 0.05:
                writer.rotate()
            time.sleep(0.01)

    for writer in writers:
        writer.write()
    for run in range(ends):
        agent.start(wait=number == SIGTERM)  # it takes the signal once it has blocked it
        if run == 0:  # from here on there are positions
            wait_until(lambda: len(stored(agent)) >= len(writers), "events of every log")
        work(dice.uniform(0.1, 3))
        agent.send(number)
        assert agent.wait_end() == (-SIGKILL if number == SIGKILL else 0)
        assert "were not read" not in agent.stderr.text()  # the next run reads them
        work(dice.uniform(0, 0.2))  # while nobody reads
    for writer in writers:
        writer.write()
    agent.start(wait=False, trace="error")
    expected = sum(writer.last + writer.last // 5 for writer in writers)
    wait_until(
        lambda: query(agent, "SELECT max(id) FROM events")[0][0] >= expected,
        lambda: f"{expected} events, have {query(agent, 'SELECT max(id) FROM events')}; {agent.stderr.text()[-3000:]}",
        120,
    )
    assert agent.stop() == 0
    raised = stored(agent)
    for writer in writers:
        name = writer.path.name
        assert raised["every", name] == list(range(1, writer.last + 1)), f"seed {SEED}, {name}"
        assert raised["fifth", name] == list(range(5, writer.last + 1, 5)), f"seed {SEED}, {name}"
    assert sum(writer.rotations for writer in writers) > ends // 2
