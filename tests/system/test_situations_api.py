"""Situations through the API: made, changed, stopped and removed while the agent runs."""

import json
import os
import random
import signal
import threading
import time
import urllib.parse

import pytest
from api import Api
from conftest import PATIENCE, descriptions, syslog_line, wait_until

SITUATIONS = "/api/v1/situations"


def path(name, *more):
    return "/".join([SITUATIONS, urllib.parse.quote(name, safe=""), *more])


class Situations:
    """The situations of a running agent."""

    def __init__(self, agent):
        self.api = Api(agent)

    def send(self, method, where, body=None):
        status, _, answer = self.api.request(method, where, body)
        return status, answer

    def add(self, name, **fields):
        status, answer = self.send("POST", SITUATIONS, {"name": name, **fields})
        assert status == 201, answer
        return answer

    def get(self, name):
        status, answer = self.send("GET", path(name))
        assert status == 200, answer
        return answer

    def list(self):
        status, answer = self.send("GET", SITUATIONS)
        assert status == 200, answer
        return answer["situations"]

    def names(self):
        return [situation["name"] for situation in self.list()]

    def wait_opened(self, count):
        """Waits until there are so many and each that runs is open, not only to be opened."""

        def opened():
            now = self.list()
            return len(now) == count and not any(
                s["state"] == "running" and s["problem"] is not None for s in now
            )

        wait_until(opened, lambda: f"{count} situations: {self.list()}")

    def post(self, name, what):
        status, answer = self.send("POST", path(name, what))
        assert status == 200, answer
        return answer

    def remove(self, name):
        return self.send("DELETE", path(name))

    def wait_counts(self, name, **counts):
        def counted():
            now = self.get(name)["counts"]
            return now if all(now[key] == value for key, value in counts.items()) else None

        return wait_until(counted, lambda: f"{counts} of {name}: {self.get(name)}")


@pytest.fixture
def running(agent):
    """An agent with one log and HTTP, and its situations."""
    agent.listen = "127.0.0.1:0"
    agent.watched = agent.log()
    agent.start()
    agent.situations_api = Situations(agent)
    return agent


def test_a_situation_is_made_raises_and_is_removed(running):
    api = running.situations_api
    made = api.add(
        "ssh",
        text="Failed logins",
        severity="critical",
        log=str(running.watched.path),
        when=["ENTRYSRC starts 'sshd'", "ENTRYDESC contains 'Failed'"],
        frequency=">= 2",
        period="60s",
    )
    assert made == {
        "name": "ssh",
        "text": "Failed logins",
        "severity": "critical",
        "log": str(running.watched.path),
        "when": ["ENTRYSRC starts 'sshd'", "ENTRYDESC contains 'Failed'"],
        "frequency": ">= 2",
        "period": "60s",
        "source": "api",
        "state": "running",
        "problem": None,
        "counts": {"offered": 0, "matched": 0, "discarded": 0, "raised": 0},
        "last_raised": None,
    }
    running.watched.append(
        syslog_line("Failed password 1", source="sshd[1]")
        + syslog_line("Accepted", source="sshd[1]")
        + syslog_line("Failed password 2", source="sshd[2]")
        + syslog_line("Failed password 3", source="su")
    )
    events = running.wait_events(1)
    assert [(e["situation"], e["severity"]) for e in events] == [("ssh", "critical")]
    assert descriptions(events) == ["Failed password 2"]
    counts = api.wait_counts("ssh", offered=4)
    assert counts == {"offered": 4, "matched": 2, "discarded": 1, "raised": 1}
    assert api.get("ssh")["last_raised"] == events[0]["raised"] or api.get("ssh")[
        "last_raised"
    ].startswith(events[0]["raised"][:17])
    assert api.remove("ssh") == (204, None)
    assert api.list() == []
    assert api.send("GET", path("ssh"))[0] == 404
    running.watched.append(syslog_line("Failed password 4", source="sshd[2]") * 3)
    api.add("all")
    running.watched.append(syslog_line("last"))
    assert {e["situation"] for e in running.wait_events(2)[1:]} == {"all"}
    assert running.stop() == 0


def test_counts_are_right_with_several_situations(running):
    api = running.situations_api
    log = str(running.watched.path)
    api.add("all", log=log)
    api.add("even", log=log, when=["ENTRYDESC matches '[02468]$'"])
    api.add("none", log=log, when=["ENTRYDESC = 'nothing'"])
    api.add("few", log=log, frequency="<= 3", period="1h")
    api.add("many", log=log, when=["ENTRYSRC = 'cron'"], frequency="> 4", period="1h")
    for n in range(10):
        running.watched.append(syslog_line(f"entry {n}", source="cron"))
    expected = {
        "all": (10, 10, 0, 10),
        "even": (10, 5, 0, 5),
        "none": (10, 0, 0, 0),
        "few": (10, 10, 7, 3),
        "many": (10, 10, 4, 6),
    }
    running.wait_events(sum(raised for *_, raised in expected.values()))
    keys = ("offered", "matched", "discarded", "raised")
    for name, counts in expected.items():
        api.wait_counts(name, **dict(zip(keys, counts)))
    shown = {s["name"]: (s["frequency"], s["period"]) for s in api.list()}
    assert shown["few"] == ("<= 3", "1h")
    assert shown["many"] == ("> 4", "1h")
    assert shown["all"] == (None, None)
    # They go on when the situation was stopped for a while.
    assert api.post("all", "stop")["state"] == "stopped"
    running.watched.append(syslog_line("unseen", source="cron"))
    api.wait_counts("even", offered=11)
    assert api.post("all", "start")["counts"]["offered"] == 10
    running.watched.append(syslog_line("seen", source="cron"))
    api.wait_counts("all", offered=11, raised=11)
    assert running.stop() == 0


def test_a_change_begins_anew_and_the_same_does_not(running):
    api = running.situations_api
    body = {"when": ["ENTRYDESC contains 'x'"], "frequency": ">= 2", "period": "1h"}
    api.add("a", **body)
    running.watched.append(syslog_line("x1"))
    api.wait_counts("a", matched=1)
    status, answer = api.send("PUT", path("a"), {"name": "a", **body})
    assert (status, answer["counts"]["matched"]) == (200, 1)
    running.watched.append(syslog_line("x2"))
    assert descriptions(running.wait_events(1)) == ["x2"]
    api.post("a", "stop")
    status, answer = api.send("PUT", path("a"), {**body, "severity": "info"})
    assert (status, answer["state"], answer["severity"]) == (200, "stopped", "info")
    assert answer["counts"] == {"offered": 0, "matched": 0, "discarded": 0, "raised": 0}
    assert api.post("a", "start")["state"] == "running"
    running.watched.append(syslog_line("x3"))
    api.wait_counts("a", matched=1, raised=0, discarded=1)
    status, answer = api.send("PUT", path("a"), {"name": "b"})
    assert (status, answer["field"]) == (400, "name")
    assert api.send("PUT", path("b"), {})[0] == 404
    assert running.stop() == 0


ODD_NAMES = [
    "a b",
    "ä€𝄞",
    "a/b/../c",
    "validate",
    "x/start",
    "%41%00%2F",
    "?q=1&b#c",
    "'; DROP TABLE events; --",
    '"quoted" \\back\\slash',
    "<script>alert(1)</script>",
    "+plus+",
    " blank ",
    "...",
    "n" * 128,
    "ü" * 64,
]


def test_names_with_odd_characters(running):
    api = running.situations_api
    for name in ODD_NAMES:
        answer = api.add(name, text=name)
        assert (answer["name"], answer["text"]) == (name, name)
    assert sorted(api.names()) == sorted(ODD_NAMES)
    running.watched.append(syslog_line("one"))
    events = running.wait_events(len(ODD_NAMES))
    assert sorted(e["situation"] for e in events) == sorted(ODD_NAMES)
    for name in ODD_NAMES:
        assert api.get(name)["state"] == "running"
        assert api.post(name, "stop")["state"] == "stopped"
        assert api.send("PUT", path(name), {"text": "changed"})[1]["text"] == "changed"
    assert running.stop() == 0
    running.start()
    api = Situations(running)
    assert sorted(api.names()) == sorted(ODD_NAMES)
    assert {s["state"] for s in api.list()} == {"stopped"}
    for name in ODD_NAMES:
        assert api.remove(name)[0] == 204
    assert api.list() == []
    assert running.stop() == 0


@pytest.mark.parametrize(
    ("body", "field", "detail"),
    [
        ({}, "name", "is missing"),
        ({"name": ""}, "name", "no usable name"),
        ({"name": "n" * 129}, "name", "1 to 128 bytes"),
        ({"name": "a\nb"}, "name", "no usable name"),
        ({"name": ".."}, "name", "no usable name"),
        ({"name": 5}, "name", "write a text"),
        ({"name": "a", "text": "t" * 1025}, "text", "at most 1024 bytes"),
        ({"name": "a", "severity": "bad"}, "severity", "'bad' is no severity"),
        ({"name": "a", "log": "relative"}, "log", "no absolute path"),
        ({"name": "a", "when": "ENTRYSRC = 'x'"}, "when", "list of at most 100"),
        ({"name": "a", "when": ["ENTRYSRC = 'x'", 5]}, "when[1]", "write a text"),
        ({"name": "a", "when": ["ENTRYSRC = 'x'", "NO = 'x'"]}, "when[1]", "'NO' is no column"),
        ({"name": "a", "when": ["ENTRYSRC matches '('"]}, "when[0]", "no regular expression"),
        ({"name": "a", "when": ["X" * 65537]}, "when", "at most 65536 bytes"),
        ({"name": "a", "frequency": ">= 5"}, "frequency", "has no period"),
        ({"name": "a", "period": "60s"}, "period", "has no frequency"),
        ({"name": "a", "frequency": "< 1", "period": "60s"}, "frequency", "no frequency"),
        ({"name": "a", "frequency": ">= 5", "period": "1y"}, "period", "is no period"),
        ({"name": "a", "colour": "red"}, "colour", "unknown member"),
        ("not json", "body", "no JSON"),
    ],
)
def test_what_cannot_be_a_situation(running, body, field, detail):
    api = running.situations_api
    status, answer = api.send("POST", SITUATIONS, body)
    assert (status, answer["field"]) == (400, field)
    assert detail in answer["detail"]
    assert api.list() == []
    if body != "not json":
        status, answer = api.send("POST", SITUATIONS + "/validate", body)
        assert status == 200
        assert field in [problem["field"] for problem in answer["problems"]]


def test_validation_names_every_problem(running):
    api = running.situations_api
    status, answer = api.send(
        "POST",
        SITUATIONS + "/validate",
        {"name": "", "severity": "x", "when": ["A = 1", "ENTRYSRC = 'x'", "ENTRYSRC = 5"]},
    )
    assert status == 200
    fields = [problem["field"] for problem in answer["problems"]]
    assert fields == ["name", "severity", "when[0]", "when[2]"]
    good = {"name": "a", "when": ["ENTRYSRC = 'x'"]}
    assert api.send("POST", SITUATIONS + "/validate", good)[1] == {"problems": []}
    assert api.list() == []


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

    # The file comes to have the name of one made through the API: the file's runs.
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
    # When the file gives the name back, the other one runs again.
    agent.zrm_toml.write_text(good)
    api.wait_opened(2)
    assert api.get("made")["state"] == "running"
    log.append(syslog_line("two"))
    events = agent.wait_events(4)[2:]
    assert sorted((e["situation"], e["severity"]) for e in events) == [
        ("filed", "info"),
        ("made", "warning"),
    ]
    # One that is hidden can be removed.
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
    # A change of the file elsewhere leaves it stopped.
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


def test_nothing_is_made_when_it_cannot_be_saved(running):
    api = running.situations_api
    api.add("kept")
    state = running.directory / "state" / "situations.json"
    before = state.read_bytes()
    # A directory in the place of the temporary file: no user may write that.
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


def test_what_was_saved_and_cannot_run_says_why(agent):
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
    assert "when[0]" in old["problem"] and "'GONE' is no column" in old["problem"]
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
                except OSError:
                    break
                except ValueError:
                    break
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
            running.watched.append(syslog_line("busy") * 200)
            time.sleep(0.01)

    writer = threading.Thread(target=write)
    writer.start()
    try:
        changes = 0
        while not running.events() or changes < 30:
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


def test_a_full_queue_holds_no_change_up_for_long(agent):
    """A sink that takes nothing: the log thread waits with the table's lock."""
    agent.history = {"enabled": False}  # the sink stands between the queue and the log
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
    assert late["state"] == "running" and "still to be opened" in late["problem"]
    assert time.monotonic() - begin < 10
    while api.get("late")["problem"] is not None:
        try:
            os.read(reader, 1 << 20)
        except BlockingIOError:
            time.sleep(0.01)
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
