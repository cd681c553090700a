"""Situations of the file and of the API across restarts, kills and damage, and under load."""

import http.client
import json
import os
import random
import signal
import threading
import time

import pytest
from conftest import PATIENCE, syslog_line, wait_until
from situations import SITUATIONS, Situations, path, running  # noqa: F401 - running is a fixture


def test_the_file_and_the_api(agent):
    agent.listen = "127.0.0.1:0"
    log = agent.log()
    agent.situation("filed", log=log)
    agent.start()
    api = Situations(agent)
    filed = api.get("filed")
    assert (filed["source"], filed["state"], filed["log"]) == ("file", "running", str(log.path))
    for method, body in (("PUT", {"text": "t"}), ("DELETE", None)):
        status, answer = api.send(method, path("filed"), body)
        assert (status, answer["field"]) == (409, "name")
        assert "change it there" in answer["detail"]
    assert api.send("POST", SITUATIONS, {"name": "filed"})[0] == 409
    api.add("made")
    assert api.send("POST", SITUATIONS, {"name": "made"})[0] == 409

    # The file gets a situation with the name of one created through the API: the file's runs.
    good = agent.zrm_toml.read_text()
    agent.zrm_toml.write_text(good + '\n[[situation]]\nname = "made"\nseverity = "info"\n')
    api.wait_opened(3)
    of_name = {s["source"]: s for s in api.list() if s["name"] == "made"}
    assert of_name["file"]["state"] == "running"
    assert of_name["api"]["state"] == "failed"
    assert "configuration file has a situation of this name" in of_name["api"]["problem"]
    assert api.get("made")["source"] == "file"
    log.append(syslog_line("one"))
    events = agent.wait_events(2)
    assert sorted((e["situation"], e["severity"]) for e in events) == [
        ("filed", "info"),
        ("made", "info"),
    ]
    # When the file no longer has the name, the other one runs again.
    agent.zrm_toml.write_text(good)
    api.wait_opened(2)
    assert api.get("made")["state"] == "running"
    log.append(syslog_line("two"))
    events = agent.wait_events(4)[2:]
    assert sorted((e["situation"], e["severity"]) for e in events) == [
        ("filed", "info"),
        ("made", "warning"),
    ]
    # A hidden situation can be removed.
    agent.zrm_toml.write_text(good + '\n[[situation]]\nname = "made"\n')
    api.wait_opened(3)
    assert api.remove("made")[0] == 204
    assert [(s["name"], s["source"]) for s in api.list()] == [("filed", "file"), ("made", "file")]
    assert agent.stop() == 0


def test_what_is_stopped_stays_stopped(agent):
    agent.listen = "127.0.0.1:0"
    log = agent.log()
    agent.situation("filed", log=log)
    agent.situation("other", log=log)
    agent.start()
    api = Situations(agent)
    api.add("made", log=str(log.path))
    api.add("second", log=str(log.path))
    for name in ("filed", "made"):
        assert api.post(name, "stop")["state"] == "stopped"
    log.append(syslog_line("one"))
    assert sorted(e["situation"] for e in agent.wait_events(2)) == ["other", "second"]
    # Another change of the file leaves it stopped.
    agent.zrm_toml.write_text(agent.zrm_toml.read_text() + '\n[[situation]]\nname = "third"\n')
    api.wait_opened(5)
    assert api.get("filed")["state"] == "stopped"
    assert agent.stop() == 0

    agent.start()
    api = Situations(agent)
    states = {s["name"]: s["state"] for s in api.list()}
    assert states == {"filed": "stopped", "other": "running", "made": "stopped", "second": "running"}
    log.append(syslog_line("two"))
    agent.wait_events(2)
    assert api.post("filed", "start")["state"] == "running"
    log.append(syslog_line("three"))
    events = agent.wait_events(5)
    assert sorted(e["situation"] for e in events[2:]) == ["filed", "other", "second"]
    assert agent.stop() == 0


def test_nothing_is_created_when_it_cannot_be_saved(running):
    api = running.situations_api
    api.add("kept")
    state = running.directory / "state" / "situations.json"
    before = state.read_bytes()
    # A directory in place of the temporary file: no user can write that.
    (state.parent / "situations.json.new").mkdir()
    for method, where, body in (
        ("POST", SITUATIONS, {"name": "lost"}),
        ("PUT", path("kept"), {"text": "lost"}),
        ("DELETE", path("kept"), None),
        ("POST", path("kept", "stop"), None),
    ):
        status, answer = api.send(method, where, body)
        assert status == 503
        assert "cannot be saved and was not made" in answer["detail"]
    assert [(s["name"], s["text"], s["state"]) for s in api.list()] == [("kept", "", "running")]
    assert state.read_bytes() == before
    running.watched.append(syslog_line("one"))
    assert [e["situation"] for e in running.wait_events(1)] == ["kept"]
    (state.parent / "situations.json.new").rmdir()
    assert api.post("kept", "stop")["state"] == "stopped"
    assert running.stop() == 0


@pytest.mark.parametrize(
    "text",
    [b"", b"{", b"[]", b'{"version":2,"situations":[],"stopped":[]}', b'{"version":1}', b"\xff" * 99],
)
def test_a_damaged_file_is_moved_aside(agent, text):
    agent.listen = "127.0.0.1:0"
    agent.log()
    state = agent.directory / "state"
    state.mkdir()
    (state / "situations.json").write_bytes(text)
    agent.start()
    agent.wait_trace("situations.json cannot be used")
    aside = [p for p in state.iterdir() if p.name.startswith("situations.json.bad-")]
    assert [p.read_bytes() for p in aside] == [text]
    api = Situations(agent)
    api.add("new")
    assert json.loads((state / "situations.json").read_text())["situations"][0]["name"] == "new"
    assert agent.stop() == 0


def test_a_saved_situation_that_cannot_run_says_why(agent):
    agent.listen = "127.0.0.1:0"
    agent.log()
    state = agent.directory / "state"
    state.mkdir()
    one = {"name": "old", "when": ["GONE = 'x'"], "stopped": False}
    (state / "situations.json").write_text(
        json.dumps({"version": 1, "situations": [one], "stopped": []})
    )
    agent.start()
    api = Situations(agent)
    old = api.get("old")
    assert old["state"] == "failed"
    assert "when[0]" in old["problem"] and "'GONE' is not a column" in old["problem"]
    status, answer = api.send("PUT", path("old"), {"when": ["ENTRYSRC = 'x'"]})
    assert (status, answer["state"], answer["problem"]) == (200, "running", None)
    assert agent.stop() == 0


def test_an_agent_killed_while_it_saves_keeps_what_it_answered(agent):
    agent.listen = "127.0.0.1:0"
    agent.log()
    answered = set()
    for attempt in range(6):
        agent.start()
        api = Situations(agent)
        assert answered <= set(api.names())
        assert all(s["state"] == "running" for s in api.list())
        stopped = threading.Event()

        def make(prefix, api=api):
            for n in range(1000):
                name = f"{prefix}-{n}"
                try:
                    if api.send("POST", SITUATIONS, {"name": name})[0] == 201:
                        answered.add(name)
                except (OSError, ValueError, http.client.HTTPException):
                    break  # the agent was killed before, while or after it read or answered
            stopped.set()

        maker = threading.Thread(target=make, args=(f"round{attempt}",))
        maker.start()
        time.sleep(random.uniform(0.05, 0.3))
        agent.process.send_signal(signal.SIGKILL)
        agent.wait_end()
        maker.join(PATIENCE)
        assert stopped.is_set()
    assert answered
    agent.start()
    assert answered <= set(Situations(agent).names())
    assert not agent.trace("cannot be used")
    assert agent.stop() == 0


def test_situations_change_while_entries_arrive(running):
    api = running.situations_api
    api.add("all")
    over = threading.Event()

    def write():
        while not over.is_set():
            running.watched.append(syslog_line("busy") * 50)
            time.sleep(0.01)

    writer = threading.Thread(target=write)
    writer.start()
    try:
        changes = 0
        while changes < 30 or not running.events():
            changes += 1
            api.add("changing", when=["ENTRYDESC = 'never'"])
            api.post("changing", "stop")
            api.post("changing", "start")
            api.send("PUT", path("changing"), {"text": str(changes), "when": ["ENTRYDESC = 'no'"]})
            assert api.remove("changing")[0] == 204
    finally:
        over.set()
        writer.join()
    assert running.stop() == 0
    assert {e["situation"] for e in running.events()} == {"all"}


def test_a_full_queue_does_not_delay_a_change_for_long(agent):
    """A sink that takes nothing: the log thread waits without holding a lock."""
    agent.history = {"enabled": False}  # so that the sink reads the queue itself
    agent.listen = "127.0.0.1:0"
    agent.sink = str(agent.directory / "pipe")
    os.mkfifo(agent.sink)
    reader = os.open(agent.sink, os.O_RDONLY | os.O_NONBLOCK)
    log = agent.log()
    agent.start()
    api = Situations(agent)
    api.add("flood", log=str(log.path))
    log.append(syslog_line("x" * 200) * 60000)

    def stuck():
        before = api.get("flood")["counts"]["raised"]
        time.sleep(0.5)
        return before > 0 and api.get("flood")["counts"]["raised"] == before

    wait_until(stuck, "the queue to be full")
    begin = time.monotonic()
    assert api.post("flood", "stop")["state"] == "stopped"
    assert time.monotonic() - begin < 10
    begin = time.monotonic()
    late = api.add("late")
    assert time.monotonic() - begin < 10
    assert late["state"] == "running" and late["problem"] is None
    drain = threading.Event()

    def read_on():
        while not drain.is_set():
            try:
                if not os.read(reader, 1 << 20):
                    time.sleep(0.01)
            except BlockingIOError:
                time.sleep(0.01)

    thread = threading.Thread(target=read_on)
    thread.start()
    try:
        assert agent.stop() == 0
    finally:
        drain.set()
        thread.join()
        os.close(reader)
