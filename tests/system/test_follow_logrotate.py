"""Followed logs under the real logrotate, while lines are written: each line once, in order."""

import gzip
import json
import os
import sqlite3
import subprocess
import threading
import time

import pytest
from conftest import syslog_line, wait_until

# Lines and rotations of each way to rotate. More: ZRM_ROTATIONS=20 ZRM_LINES=200000.
ROTATIONS = int(os.environ.get("ZRM_ROTATIONS", "5"))
LINES = int(os.environ.get("ZRM_LINES", "10000"))

WAYS = {
    "rename and create": "create",
    "rename, compressed later": "create\ncompress\ndelaycompress",
    "copy and truncate": "copytruncate",
    "copy, truncate and compress": "copytruncate\ncompress",
    "rename to another directory": "create\nolddir old",
    "copy to another directory and truncate": "copytruncate\nolddir old",
}


def stored(agent):
    """The numbers of the lines in the history's events, in order."""
    try:
        with sqlite3.connect(f"file:{agent.directory}/state/history.db?mode=ro", uri=True) as history:
            texts = history.execute("SELECT json FROM events ORDER BY id").fetchall()
    except sqlite3.OperationalError:
        return []
    return [int(json.loads(text)["row"]["ENTRYDESC"].split()[0]) for (text,) in texts]


class Rotation:
    """logrotate with a configuration of its own for one log."""

    def __init__(self, log, directives):
        self.configuration = log.parent / "logrotate.conf"
        self.state = log.parent / "logrotate.state"
        self.configuration.write_text(f"{log} {{\nrotate 100\nmissingok\n{directives}\n}}\n")
        self.configuration.chmod(0o600)

    def __call__(self):
        command = ["logrotate", "--force", "--state", str(self.state), str(self.configuration)]
        subprocess.run(command, check=True, stdin=subprocess.DEVNULL, timeout=60)


def contents(log):
    """The numbers of the lines that are in the log's files."""
    numbers = set()
    for path in [*log.parent.glob(log.name + "*"), *log.parent.glob(f"old/{log.name}*")]:
        opener = gzip.open if path.suffix == ".gz" else open
        with opener(path, "rb") as stream:
            numbers.update(int(line.split()[5]) for line in stream.read().splitlines() if line.count(b" ") >= 5)
    return numbers


@pytest.mark.slow
@pytest.mark.parametrize("way", WAYS)
def test_every_line_is_raised_once_whatever_logrotate_does(agent, way):
    directory = agent.directory / "logs"
    directory.mkdir(mode=0o755)
    log = directory / "app.log"
    log.write_text(syslog_line("1 line"))
    agent.sink = None
    agent.agent_keys["log_config"] = None
    (directory / "old").mkdir(mode=0o755)
    keys = {"rotated_to": "old"} if "olddir" in WAYS[way] else {}
    agent.follow(log, start="beginning", rotate_wait="1s", **keys)
    agent.situation("every")
    agent.start(trace="error", wait=False)
    wait_until(lambda: stored(agent), "the first line")
    rotate = Rotation(log, WAYS[way])

    def write():
        for number in range(2, LINES + 1, 10):
            lines = "".join(syslog_line(f"{count} line") for count in range(number, min(number + 10, LINES + 1)))
            with open(log, "ab", buffering=0) as stream:
                stream.write(lines.encode())
            time.sleep(0.001)

    writer = threading.Thread(target=write)
    writer.start()
    for _ in range(ROTATIONS):
        time.sleep(0.7)
        rotate()
    writer.join()
    with open(log, "ab", buffering=0) as stream:
        stream.write(syslog_line(f"{LINES + 1} last").encode())
    wait_until(lambda: stored(agent)[-1:] == [LINES + 1], "the last line", 90)
    assert agent.stop() == 0
    raised = stored(agent)
    assert raised == sorted(set(raised)), "each once and in order"
    missing = set(range(1, LINES + 2)) - set(raised)
    # What is written between the copy and the truncation is in no file.
    assert not missing & contents(log), f"{len(missing)} lines"
    if "truncate" not in way:
        assert not missing
    print(json.dumps({"way": way, "rotations": ROTATIONS, "lines": LINES, "not in any file": len(missing)}))
