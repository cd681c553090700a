"""Entries of several lines in followed logs: stack traces are one entry, one event and one row."""

import contextlib
import json
import os
import random
import sqlite3
import time
from pathlib import Path
from signal import SIGKILL, SIGTERM

import pytest
from analysis import Analysis
from api import Api
from conftest import Log, descriptions, wait_until

TEXT = 'A,"%d-%d-%d %d:%d:%d %s %255[^\\n]" , year month day hour minute second type description'
# How often the agent is killed. More: ZRM_KILLS=1000.
KILLS = int(os.environ.get("ZRM_KILLS", "6"))
SEED = int(os.environ.get("ZRM_SEED", str(random.randrange(1 << 30))))


def line(text, level="ERROR"):
    return f"2026-11-19 10:00:00 {level} {text}\n"


def trace(text, lines=40):
    frames = "".join(f"\tat com.example.Service.call{n}(Service.java:{n})\n" for n in range(lines - 2))
    return line(text) + "java.lang.IllegalStateException: no connection\n" + frames


def followed(agent, **entry):
    log = Log(agent.directory / "app.log")
    log.path.write_text("")
    agent.agent_keys["log_config"] = None
    agent.sink = agent.directory / "events"
    agent.listen = "127.0.0.1:0"
    agent.follow(log, type="text", format=TEXT, rotate_wait="1s", entry={"starts": r"^\d{4}-\d\d-\d\d ", **entry})
    agent.situation(log=log)
    agent.start()
    agent.wait_open(log)
    return log


def entries(events):
    return [event["entry"] for event in events]


def test_an_event_carries_the_whole_trace(agent):
    log = followed(agent)
    first, second = trace("first"), line("second", "INFO")
    log.append(first + second + trace("third", 3))
    events = agent.wait_events(3)
    assert entries(events) == [first[:-1], second[:-1], trace("third", 3)[:-1]]
    assert descriptions(events) == ["first", "second", "third"]
    assert agent.stop() == 0


def test_a_trace_that_is_written_in_pieces_is_one_entry(agent):
    log = followed(agent, wait="20s")
    whole = trace("slowly written")
    for begin in range(0, len(whole), 300):  # within lines as well
        log.append(whole[begin : begin + 300])
        time.sleep(0.3)
    log.append(line("next"))
    assert entries(agent.wait_events(1)) == [whole[:-1]]
    assert agent.stop() == 0


def test_what_comes_later_than_the_wait_is_an_entry_of_its_own(agent):
    log = followed(agent)
    agent.situation("late", log=log)
    log.append(line("first") + "\tat a\n")
    agent.wait_events(1)  # after the wait of two seconds
    log.append("\tat b\n\tat c\n" + trace("second", 4))
    wait_until(lambda: Api(agent).logs()["app.log"]["NUMEVENTS"] == 3, "three entries")
    assert [entry.partition("\n")[0] for entry in entries(agent.wait_events(2))][0] == line("first")[:-1]
    assert agent.stop() == 0


def test_a_trace_through_a_rotation_and_restarts(agent):
    log = followed(agent, wait="20s")
    traces = [trace(f"number {number}") for number in range(4)]
    log.append(traces[0] + traces[1][:700])
    agent.wait_events(0)
    assert agent.stop() == 0  # the first trace waits, the second has no end yet
    log.append(traces[1][700:])
    agent.start()
    log.append(traces[2][:300])
    agent.send(SIGKILL)
    agent.wait_end()
    log.append(traces[2][300:])
    os.rename(log.path, f"{log}.1")
    log.path.write_text(traces[3] + line("end"))
    agent.start()
    assert entries(agent.wait_events(4)) == [one[:-1] for one in traces]
    assert agent.stop() == 0
    assert len(agent.events()) == 4


def test_a_report_has_a_row_for_each_entry(agent):
    log = followed(agent)
    log.append(trace("first") + trace("second") + trace("third"))
    agent.wait_events(3)
    body = {"log": str(log), "from": "2026-11-19", "to": "2026-11-20", "limit": 100}
    status, _, answer = Api(agent).request("POST", "/api/v1/reports", body)
    assert status == 200
    assert [row["ENTRYDESC"] for row in answer["rows"]] == ["third", "second", "first"]
    assert answer["skipped"] == 0


def test_lines_of_containers_are_joined_and_unwrapped(agent):
    docker = Log(agent.directory / "docker.log")
    cri = Log(agent.directory / "cri.log")
    for log in (docker, cri):
        log.path.write_text("")
    agent.follow(docker, unwrap="docker", entry={"starts": r"^\S"})
    agent.follow(cri, unwrap="cri", defaults={"source": "web"}, entry={"wait": "1m"})
    agent.situation(when=["field.stream = 'stderr'"])
    agent.start()
    agent.wait_open(docker)
    agent.wait_open(cri)
    for text in ("it \"broke\"\n", "\tat a ", "and b\n", "next\n"):
        entry = {"log": text, "stream": "stderr", "time": "2026-11-19T10:00:00.5Z"}
        docker.append(json.dumps(entry) + "\n")
    cri.append("2026-11-19T10:00:00.5Z stderr P two \n2026-11-19T10:00:00.6Z stderr F parts\n")
    rows = {event["row"]["LOGNAME"]: event["row"] for event in agent.wait_events(2)[:2]}
    assert rows["docker.log"]["ENTRYDESC"] == 'it "broke" \tat a and b'
    assert rows["docker.log"]["ENTRYTYPE"] == "stderr"
    assert rows["cri.log"]["ENTRYDESC"] == "two parts"
    assert rows["cri.log"]["ENTRYSRC"] == "web"
    assert agent.stop() == 0


def test_an_explanation_is_about_whole_entries(agent):
    log = followed(agent)
    log.append(trace("first") + trace("second"))
    agent.wait_events(2)
    explained = Analysis(agent).explain(definition={}, log=str(log), last=2)
    assert [one["line"] for one in explained] == [trace("first")[:-1], trace("second")[:-1]]
    assert [one["row"]["ENTRYDESC"] for one in explained] == ["first", "second"]


def test_a_java_trace_in_a_container_is_one_entry_with_the_exception_as_a_field(agent):
    log = Log(agent.directory / "pod.log")
    log.path.write_text("")
    agent.formats = Path(__file__).resolve().parents[2] / "formats"
    agent.follow(log, format="java", unwrap="cri")
    agent.situation(log=log, when=["field.exception contains 'IllegalState'", "field.stream = 'stderr'"])
    agent.start()
    agent.wait_open(log)
    text = (
        "2026-11-19 10:00:00.123 ERROR 1 --- [main] c.e.Shop : it broke\n"
        "java.lang.IllegalStateException: no cart\n\tat c.e.Cart.find(Cart.java:42)\n\t... 38 more\n"
    )
    wrapped = "".join(f"2026-11-19T09:00:00.2Z stderr F {one}\n" for one in text.splitlines())
    # The runtime has cut a line.
    log.append(wrapped.replace("F \tat c.e.", "P \tat c.e.\n2026-11-19T09:00:00.2Z stderr F "))
    (event,) = agent.wait_events(1)
    assert event["row"]["ENTRYDESC"] == "it broke"
    assert event["row"]["ENTRYSRC"] == "c.e.Shop"
    assert event["fields"] == {"exception": "java.lang.IllegalStateException", "stream": "stderr"}
    assert agent.stop() == 0


class Writer:
    """Writes numbered traces and rotates the log."""

    def __init__(self, path, dice):
        self.path, self.dice, self.written, self.rotations = path, dice, [], 0

    def write(self):
        traces = [trace(f"{len(self.written) + n}", self.dice.randrange(2, 60)) for n in range(self.dice.choice((1, 3, 30)))]
        self.written += [one[:-1] for one in traces]
        data = "".join(traces).encode()
        cut = self.dice.randrange(len(data))
        with open(self.path, "ab", buffering=0) as stream:
            stream.write(data[:cut])  # usually within a trace
            stream.write(data[cut:])

    def rotate(self):
        self.rotations += 1
        for number in range(self.rotations - 1, 0, -1):
            os.rename(f"{self.path}.{number}", f"{self.path}.{number + 1}")
        if self.dice.random() < 0.5:
            os.rename(self.path, f"{self.path}.1")
            self.path.write_bytes(b"")
        else:
            self.path.with_name(self.path.name + ".1").write_bytes(self.path.read_bytes())
            os.truncate(self.path, 0)


def stored(agent):
    """The texts of the events in the history."""
    try:
        with contextlib.closing(sqlite3.connect(f"file:{agent.directory}/state/history.db?mode=ro", uri=True)) as history:
            return [json.loads(text)["entry"] for (text,) in history.execute("SELECT json FROM events ORDER BY id")]
    except sqlite3.OperationalError:
        return []


@pytest.mark.slow
@pytest.mark.parametrize("number", (SIGKILL, SIGTERM), ids=("killed", "stopped"))
def test_traces_are_whole_and_raised_once_however_the_agent_ends(agent, number):
    print(f"seed {SEED}")
    dice = random.Random(SEED)
    log = followed(agent, wait="60s")  # a writer that the machine holds up splits nothing
    writer = Writer(log.path, dice)
    for _ in range(KILLS):
        end = time.monotonic() + dice.uniform(0.5, 2)
        while time.monotonic() < end:
            writer.write()
            if dice.random() < 0.05:
                writer.rotate()
            time.sleep(0.02)
        agent.send(number)
        agent.wait_end()
        writer.write()  # while nobody reads
        agent.start(wait=number == SIGTERM)
    log.append(line("end"))
    wait_until(lambda: len(stored(agent)) >= len(writer.written), "all traces", 120)
    assert agent.stop() == 0
    assert stored(agent) == writer.written, f"seed {SEED}"
