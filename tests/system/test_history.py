"""The history of events: what survives, and how sinks get what they missed."""

import json
import os
import random
import sqlite3
import subprocess
import threading
import time
from contextlib import closing
from pathlib import Path
from signal import SIGKILL

import pytest

from api import Api
from conftest import PROGRAM, descriptions, syslog_line, wait_until


def lines(numbers):
    return "".join(syslog_line(f"number {number}") for number in numbers)


def texts(numbers):
    return [f"number {number}" for number in numbers]


def history_file(agent):
    return agent.directory / "state" / "history.db"


def stored(agent):
    """The committed events: (id, description), by id."""
    uri = f"file:{history_file(agent)}?mode=ro"
    with closing(sqlite3.connect(uri, uri=True, timeout=20)) as database:
        rows = database.execute("SELECT id, json FROM events ORDER BY id").fetchall()
    events = []
    for number, text in rows:
        event = json.loads(text)
        assert event["id"] == number
        events.append((number, event["row"]["ENTRYDESC"]))
    return events


def jsonl(path):
    return [json.loads(line) for line in Path(path).read_bytes().split(b"\n")[:-1]]


def test_a_sink_gets_what_it_missed_after_a_restart(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.sink = agent.directory / "not-yet" / "events.jsonl"
    agent.start()
    log.append(lines(range(100)))
    wait_until(lambda: len(stored(agent)) == 100, "the history")
    assert agent.stop() == 0
    assert agent.trace(
        f"100 events were not delivered to {agent.sink}; it will get them when the agent runs again"
    )
    agent.sink.parent.mkdir()
    agent.start()
    assert descriptions(agent.wait_events(100)) == texts(range(100))
    log.append(lines(range(100, 110)))
    events = agent.wait_events(110)
    assert [event["id"] for event in events] == list(range(1, 111))
    assert descriptions(events) == texts(range(110))
    assert agent.stop() == 0
    agent.start()
    log.append(lines(range(110, 111)))
    assert descriptions(agent.wait_events(111)) == texts(range(111)), "nothing twice"
    assert agent.stop() == 0


def test_a_sink_that_is_down_stops_neither_the_others_nor_the_monitoring(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.sink = agent.directory / "good.jsonl"
    late = agent.directory / "not-yet" / "late.jsonl"
    agent.more_sinks = [{"type": "jsonl", "path": str(late)}]
    agent.start()
    for begin in range(0, 10_000, 1000):  # many times the queue's size
        log.append(lines(range(begin, begin + 1000)))
    assert descriptions(agent.wait_events(10_000)) == texts(range(10_000))
    late.parent.mkdir()
    agent.wait_trace(f"Sink {late} takes events again.")
    wait_until(lambda: len(jsonl(late)) == 10_000, "the late sink")
    assert descriptions(jsonl(late)) == texts(range(10_000))
    assert agent.stop() == 0


def test_a_slow_sink_gets_everything_in_order_and_delays_no_other(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.sink = agent.directory / "good.jsonl"
    pipe = agent.directory / "pipe"
    os.mkfifo(pipe)
    agent.more_sinks = [{"type": "jsonl", "path": str(pipe)}]
    reader = os.open(pipe, os.O_RDONLY | os.O_NONBLOCK)
    os.set_blocking(reader, True)
    agent.start()
    log.append(lines(range(6000)))
    assert descriptions(agent.wait_events(6000)) == texts(range(6000))
    got = b""
    begin = time.monotonic()
    while got.count(b"\n") < 6000:
        got += os.read(reader, 65536 if time.monotonic() - begin > 1 else 1024)
        if time.monotonic() - begin < 1:
            time.sleep(0.05)
    os.close(reader)
    assert descriptions(map(json.loads, got.splitlines())) == texts(range(6000))
    assert agent.stop() == 0


class Appender:
    """Appends numbered lines to a log until stopped."""

    def __init__(self, log, first):
        self.log, self.next, self.stopped = log, first, False
        self.thread = threading.Thread(target=self._run)
        self.thread.start()

    def _run(self):
        while not self.stopped:
            self.log.append(lines(range(self.next, self.next + 200)))
            self.next += 200
            time.sleep(0.02)

    def stop(self):
        self.stopped = True
        self.thread.join()
        return self.next


@pytest.mark.slow
def test_kill_at_random_moments_loses_nothing_that_was_committed(agent):
    seed = random.SystemRandom().randrange(1 << 32)
    print(f"seed {seed}")
    moments = random.Random(seed)
    log = agent.log()
    agent.situation(log=log)
    agent.sink = agent.directory / "events.jsonl"
    agent.history = {"keep_events": 10_000_000}
    number, before = 0, []
    for _ in range(6):
        agent.start()
        appender = Appender(log, number)
        time.sleep(moments.uniform(0.7, 2.2))
        agent.send(SIGKILL)
        agent.wait_end()
        number = appender.stop()
        now = stored(agent)
        assert now[: len(before)] == before
        before = now
    agent.start()
    log.append(lines([number]))
    last = agent._alive_until(
        lambda: [e for e in stored(agent) if e[1] == f"number {number}"], "the last line", 60
    )[0]
    wait_until(lambda: str(number) in agent.sink.read_text().split("\n")[-2], "the last event")
    assert agent.stop() == 0
    final = stored(agent)
    assert final[: len(before)] == before
    assert [event[0] for event in final] == list(range(1, last[0] + 1)), "ids without a gap"
    numbers = [int(event[1].split()[1]) for event in final]
    assert numbers == sorted(set(numbers)), "in the order of the log, none twice"
    with sqlite3.connect(history_file(agent)) as database:
        assert database.execute("PRAGMA integrity_check").fetchall() == [("ok",)]
    check_deliveries(agent.sink, dict(final))


def check_deliveries(path, events):
    """Every event arrived in order, and repeatedly only after the agent had ended."""
    newest, times_back, torn = 0, 0, 0
    for line in path.read_text().split("\n")[:-1]:
        try:
            event = json.loads(line)
        except ValueError:
            # An agent that is killed while it writes leaves a torn line; the next one ends it.
            assert '{"id":' not in line[1:], "an event stands alone on its line"
            torn += 1
            continue
        assert event["row"]["ENTRYDESC"] == events[event["id"]]
        if event["id"] != newest + 1:
            assert event["id"] <= newest, "an event was skipped"
            times_back += 1
        newest = event["id"]
    assert newest == max(events)
    assert times_back <= 6
    assert torn <= 6


@pytest.fixture(scope="session")
def full_disk(tmp_path_factory):
    library = tmp_path_factory.mktemp("preload") / "full_disk.so"
    source = Path(__file__).with_name("full_disk.c")
    subprocess.run(["cc", "-shared", "-fPIC", "-o", library, source, "-ldl"], check=True)
    return library


def test_a_full_disk_delays_events_and_loses_none(agent, full_disk):
    flag = agent.directory / "full"
    agent.environment.update(
        {
            "LD_PRELOAD": str(full_disk),
            "FULL_DISK": str(flag),
            "ASAN_OPTIONS": "verify_asan_link_order=0:" + os.environ.get("ASAN_OPTIONS", ""),
        }
    )
    log = agent.log()
    agent.situation(log=log)
    agent.start()
    log.append(lines(range(10)))
    agent.wait_events(10)
    flag.touch()
    log.append(lines(range(10, 5000)))
    agent.wait_trace(f"Error writing the history {history_file(agent)}: ")
    time.sleep(1)  # it has tried again by now
    assert len(agent.trace("Error writing the history")) == 1, "told once"
    assert len(agent.events()) == 10, "what is not stored is not delivered"
    flag.unlink()
    agent.wait_trace("The history takes events again.")
    assert descriptions(agent.wait_events(5000)) == texts(range(5000))
    assert agent.stop() == 0
    assert len(stored(agent)) == 5000


def test_a_corrupt_history_is_moved_aside(agent):
    log = agent.log()
    agent.situation(log=log)
    history_file(agent).parent.mkdir()
    history_file(agent).write_bytes(b"this is no database\n" * 1000)
    agent.start()
    said = agent.wait_trace(f"the history {history_file(agent)} is corrupt")[0]
    aside = said.split("it is kept as ")[1].split(",")[0]
    assert Path(aside).read_bytes() == b"this is no database\n" * 1000
    log.append(lines(range(3)))
    assert descriptions(agent.wait_events(3)) == texts(range(3))
    assert agent.stop() == 0
    assert len(stored(agent)) == 3


def test_a_removed_history_is_created_again_and_ids_continue(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.listen = "127.0.0.1:0"
    agent.start()
    log.append(lines(range(10)))
    agent.wait_events(10)
    for path in history_file(agent).parent.glob("history.db*"):
        path.unlink()
    agent.wait_trace("The history takes events again.")
    log.append(lines(range(10, 15)))
    assert descriptions(agent.wait_events(15)) == texts(range(15))
    assert [number for number, _ in stored(agent)] == list(range(11, 16))
    assert Api(agent).request("GET", "/api/v1/status")[2]["history"]["problem"] is None
    with closing(sqlite3.connect(history_file(agent))) as other:  # has the lost files open
        assert other.execute("SELECT count(*) FROM events").fetchone() == (5,)
        assert agent.stop() == 0
        history_file(agent).unlink()  # and while no agent runs
        agent.start()
        status = Api(agent).request("GET", "/api/v1/status")[2]
        assert status["history"]["problem"] is None, "a history, which alone knows the ids"
        log.append(lines(range(15, 16)))
        assert agent.wait_events(1)[0]["id"] == 16, agent.stderr.text()
    assert agent.stop() == 0


def test_a_flipped_byte_is_reported_and_not_served(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.listen = "127.0.0.1:0"
    agent.start()
    log.append(lines(range(100)))
    agent.wait_events(100)
    assert agent.stop() == 0
    with sqlite3.connect(history_file(agent)) as database:
        database.execute("PRAGMA wal_checkpoint(TRUNCATE)")
    content = bytearray(history_file(agent).read_bytes())
    for text in (b'"ENTRYDESC":"number 41"', b'"ENTRYDESC":"number 73"'):
        content[content.index(text) + 12] ^= 0x01  # the quote that begins the description
    history_file(agent).write_bytes(content)
    agent.start()
    api = Api(agent)
    answer = api.request("GET", "/api/v1/events?limit=1000&order=asc")[2]
    damaged = [42, 74]
    assert answer["damaged"] == damaged
    assert [one["id"] for one in answer["events"]] == [n for n in range(1, 101) if n not in damaged]
    status, _, problem = api.request("GET", "/api/v1/events/42")
    assert status == 503 and "event 42 is damaged" in problem["detail"]
    assert api.request("GET", "/api/v1/status")[2]["history"]["damaged"] == 2
    assert len(agent.wait_trace("Event 42 in the history")) == 1
    zrmctl = [Path(PROGRAM).with_name("zrmctl"), "events", "--url", f"http://127.0.0.1:{api.port}"]
    zrmctl += ["--token-file", agent.directory / "state" / "api-token"]
    said = subprocess.run(zrmctl, capture_output=True, text=True, check=True)
    assert "event 42 is damaged in the history" in said.stderr
    assert agent.stop() == 0


def test_without_a_place_for_the_history_the_agent_says_so_and_continues(agent):
    log = agent.log()
    agent.situation(log=log)
    (agent.directory / "plain").write_text("no directory")
    agent.history = {"directory": str(agent.directory / "plain")}
    agent.start()
    agent.wait_trace(
        f"zrmagent: the history is off: cannot open {agent.directory}/plain/history.lock: "
        "Not a directory; make it a directory that the agent may write, or set history.directory "
        "to one."
    )
    log.append(lines(range(3)))
    assert descriptions(agent.wait_events(3)) == texts(range(3))
    assert agent.stop() == 0


def test_two_agents_do_not_share_a_history(agents):
    first, second = agents(), agents()
    for one in (first, second):
        one.situation(log=one.log())
        one.history = {"directory": str(first.directory / "shared")}
    first.start()
    second.start()
    second.wait_trace(f"{first.directory}/shared is in use by another agent; give each its own")
    assert second.stop() == 0
    assert first.stop() == 0


def test_only_the_newest_events_are_kept(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.history = {"keep_events": 50}
    agent.start()
    log.append(lines(range(4000)))
    agent.wait_events(4000)
    wait_until(lambda: len(stored(agent)) == 50, "the removal")
    assert [event[1] for event in stored(agent)] == texts(range(3950, 4000))
    assert agent.stop() == 0
