"""Situations through the API: created, changed, stopped and removed while the agent runs."""

import pytest
from conftest import descriptions, syslog_line
from situations import SITUATIONS, Situations, path, running  # noqa: F401 - running is a fixture


def test_a_situation_is_created_raises_events_and_is_removed(running):
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
        "context": 0,
        "runbook": None,
        "labels": {},
        "version": made["version"],
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
    # They continue after the situation was stopped for a while.
    assert api.post("all", "stop")["state"] == "stopped"
    running.watched.append(syslog_line("unseen", source="cron"))
    api.wait_counts("even", offered=11)
    assert api.post("all", "start")["counts"]["offered"] == 10
    running.watched.append(syslog_line("seen", source="cron"))
    api.wait_counts("all", offered=11, raised=11)
    assert running.stop() == 0


def test_only_a_situation_that_changed_starts_over(running):
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
        ({"name": ""}, "name", "not a usable name"),
        ({"name": "n" * 129}, "name", "1 to 128 bytes"),
        ({"name": "a\nb"}, "name", "not a usable name"),
        ({"name": ".."}, "name", "not a usable name"),
        ({"name": 5}, "name", "write a text"),
        ({"name": "a", "text": "t" * 1025}, "text", "at most 1024 bytes"),
        ({"name": "a", "severity": "bad"}, "severity", "'bad' is not a severity"),
        ({"name": "a", "log": "relative"}, "log", "not the absolute path"),
        ({"name": "a", "when": "ENTRYSRC = 'x'"}, "when", "list of at most 100"),
        ({"name": "a", "when": ["ENTRYSRC = 'x'", 5]}, "when[1]", "write a text"),
        ({"name": "a", "when": ["ENTRYSRC = 'x'", "NO = 'x'"]}, "when[1]", "'NO' is not a column"),
        ({"name": "a", "when": ["ENTRYSRC matches '('"]}, "when[0]", "not a regular expression"),
        ({"name": "a", "when": ["X" * 65537]}, "when", "at most 65536 bytes"),
        ({"name": "a", "frequency": ">= 5"}, "frequency", "has no period"),
        ({"name": "a", "period": "60s"}, "period", "has no frequency"),
        ({"name": "a", "frequency": "< 1", "period": "60s"}, "frequency", "not a frequency"),
        ({"name": "a", "frequency": ">= 5", "period": "1y"}, "period", "is not a period"),
        ({"name": "a", "colour": "red"}, "colour", "unknown member"),
        ("not json", "body", "not JSON"),
    ],
)
def test_invalid_situations_are_refused(running, body, field, detail):
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


def test_the_second_of_two_operators_who_change_a_situation_is_told(running):
    api = running.situations_api
    made = api.add("disk", log=str(running.watched.path), severity="minor")
    assert made["version"] == api.get("disk")["version"]
    change = {"log": made["log"], "version": made["version"]}
    status, first = api.send("PUT", path("disk"), {**change, "severity": "major"})
    assert status == 200 and first["version"] != made["version"]
    status, answer = api.send("PUT", path("disk"), {**change, "severity": "critical"})
    assert (status, answer["field"]) == (412, "version")
    assert answer["detail"].startswith("somebody has changed the situation 'disk' since you read it")
    assert api.get("disk")["severity"] == "major"
    assert running.stop() == 0
    running.start()
    api = Situations(running)
    assert api.get("disk")["version"] == first["version"], "of every run"
    status, _ = api.send("PUT", path("disk"), {**change, "version": first["version"], "severity": "info"})
    assert status == 200
    status, _ = api.send("PUT", path("disk"), {"log": made["log"], "severity": "major"})
    assert status == 200, "who names no version replaces whatever is there"
    assert api.send("POST", SITUATIONS, {**change, "name": "other"})[0] == 400
