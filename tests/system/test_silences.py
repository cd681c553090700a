"""Silences: what they hold back, and that they and their counts survive."""

import json
import sqlite3
import time
from contextlib import closing
from pathlib import Path
from signal import SIGKILL

import pytest
from api import Api
from conftest import descriptions, syslog_line, wait_until

SILENCES = "/api/v1/silences"
DAY = {"until": "1d", "who": "anna", "why": "maintenance"}


def jsonl(path):
    if not Path(path).exists():
        return []
    return [json.loads(line) for line in Path(path).read_bytes().split(b"\n")[:-1]]


class Silences:
    def __init__(self, agent):
        self.api = Api(agent)

    def send(self, method, path="", body=None):
        status, _, answer = self.api.request(method, SILENCES + path, body)
        return status, answer

    def add(self, **match):
        status, answer = self.send("POST", "", {"match": match, **DAY})
        assert status == 201, answer
        return answer

    def get(self, number):
        status, answer = self.send("GET", f"/{number}")
        assert status == 200, answer
        return answer

    def expire(self, number, who="ben"):
        return self.send("DELETE", f"/{number}", {"who": who})

    def events(self, query=""):
        status, _, answer = self.api.request("GET", f"/api/v1/events?order=asc&limit=1000{query}")
        assert status == 200, answer
        return answer["events"]

    def wait_events(self, count, query=""):
        def come():
            events = self.events(query)
            return events if len(events) >= count else None

        return wait_until(come, lambda: f"{count} events in the history: {self.events(query)}")


@pytest.fixture
def watching(agent):
    """An agent with two situations on one log."""
    agent.listen = "127.0.0.1:0"
    agent.sink = agent.directory / "events.jsonl"
    agent.watched = agent.log()
    agent.situation("disk", log=agent.watched, when=["ENTRYDESC contains 'disk'"])
    agent.situation("login", log=agent.watched, when=["ENTRYDESC contains 'login'"])
    agent.start()
    agent.silences = Silences(agent)
    return agent


def write(agent, *texts):
    agent.watched.append("".join(syslog_line(text) for text in texts))


def test_a_silence_keeps_its_events_from_the_sinks_but_not_from_the_history(watching):
    silences = watching.silences
    made = silences.add(situation="di*", log=str(watching.watched))
    assert made["state"] == "active" and made["match"] == {
        "situation": "di*",
        "log": str(watching.watched),
    }
    assert (made["who"], made["why"], made["events"], made["last"]) == ("anna", "maintenance", 0, None)
    write(watching, "disk 1", "login 1", "disk 2", "login 2")
    events = silences.wait_events(4)
    assert [event.get("silenced") for event in events] == [made["id"], None, made["id"], None]
    assert descriptions(watching.wait_events(2)) == ["login 1", "login 2"]
    assert descriptions(silences.events("&silenced=true")) == ["disk 1", "disk 2"]
    assert descriptions(silences.events("&silenced=false")) == ["login 1", "login 2"]
    counted = silences.get(made["id"])
    assert (counted["events"], counted["last"]) == (2, events[2]["raised"])
    status, ended = silences.expire(made["id"])
    assert status == 200 and (ended["state"], ended["expired_by"]) == ("expired", "ben")
    write(watching, "disk 3")
    assert descriptions(watching.wait_events(3)) == ["login 1", "login 2", "disk 3"]
    assert silences.get(made["id"])["events"] == 2
    assert watching.stop() == 0


def test_the_second_to_expire_a_silence_hears_who_was_first(watching):
    made = watching.silences.add(severity="info")
    assert watching.silences.expire(made["id"], "ben")[0] == 200
    status, answer = watching.silences.expire(made["id"], "carl")
    assert status == 409 and "when ben expired it" in answer["detail"], answer
    assert watching.silences.get(made["id"])["expired_by"] == "ben"
    assert watching.silences.expire(77)[0] == 404
    assert watching.silences.expire("x")[0] == 404


@pytest.mark.parametrize(
    "body, field, text",
    [
        (DAY, "match", "would silence every event"),
        ({**DAY, "match": {}}, "match", "would silence every event"),
        ({**DAY, "match": {"all": False}}, "match", "would silence every event"),
        ({**DAY, "match": {"all": True, "log": "/a"}}, "match.all", "leave one out"),
        ({**DAY, "match": {"situation": ""}}, "match.situation", "is empty"),
        ({**DAY, "match": {"severity": "loud"}}, "match.severity", "matches no severity"),
        ({**DAY, "match": {"host": "a"}}, "match.host", "unknown member"),
        ({**DAY, "match": {"group": {"ip": 7}}}, "match.group.ip", "write a text"),
        ({**DAY, "match": {"log": "x" * 2000}}, "match.log", "has 2000 bytes"),
        ({**DAY, "match": {"log": "/a"}, "until": "2020-01-01"}, "until", "is in the past"),
        ({**DAY, "match": {"log": "/a"}, "until": "soon"}, "until", "neither a duration nor a time"),
        ({**DAY, "match": {"log": "/a"}, "why": ""}, "why", "is empty"),
        ({**DAY, "match": {"log": "/a"}, "wo": "x"}, "wo", "unknown member"),
    ],
)
def test_what_is_wrong_with_a_silence_is_named(watching, body, field, text):
    status, answer = watching.silences.send("POST", "", body)
    assert status == 400 and answer["field"] == field and text in answer["detail"], answer


def test_a_silence_of_everything_must_be_meant(watching):
    made = watching.silences.add(all=True)
    assert made["match"] == {"all": True}
    write(watching, "disk 1", "login 1")
    events = watching.silences.wait_events(2, "&silenced=true")
    assert [event["silenced"] for event in events] == [made["id"]] * 2


def test_a_silence_ends_by_itself(watching):
    body = {"match": {"situation": "disk"}, **DAY, "until": "1s"}
    status, made = watching.silences.send("POST", "", body)
    assert status == 201
    wait_until(lambda: watching.silences.get(made["id"])["state"] == "expired", "its end")
    assert watching.silences.get(made["id"])["expired"] is None
    status, answer = watching.silences.expire(made["id"])
    assert status == 409 and "has been over since" in answer["detail"]
    write(watching, "disk 1")
    assert descriptions(watching.wait_events(1)) == ["disk 1"]


def test_hostile_texts_stay_texts(watching):
    why = "\x1b]0;x\x07 \u202e <script> '; DROP TABLE silences; --"
    body = {"match": {"group": {"\u202eip\"": "*\n"}}, **DAY, "why": why}
    status, made = watching.silences.send("POST", "", body)
    assert status == 201, made
    assert made["why"] == why and made["match"] == {"group": {"\u202eip\"": "*\n"}}
    assert watching.stop() == 0
    watching.start()
    assert Silences(watching).get(made["id"]) == made


def test_silences_and_what_they_hold_back_survive_kills(watching):
    """Each event is silenced in the history, counted once, and delivered by no run."""
    made = watching.silences.add(situation="disk")
    for _ in range(5):
        before = watching.silences.get(made["id"])["events"]
        while watching.silences.get(made["id"])["events"] == before:
            write(watching, *(f"disk {n}" for n in range(50)), "login")
            time.sleep(0.05)
        watching.send(SIGKILL)
        watching.wait_end()
        watching.start()
        watching.silences = Silences(watching)
    write(watching, "login end")
    wait_until(lambda: descriptions(jsonl(watching.sink))[-1:] == ["login end"], "the last event")
    delivered = descriptions(jsonl(watching.sink))
    assert not [text for text in delivered if text.startswith("disk")]
    with closing(sqlite3.connect(watching.directory / "state/history.db")) as history:
        rows = history.execute(
            "SELECT count(*), max(raised), count(DISTINCT silence) FROM events"
            " JOIN labels ON labels.id = label WHERE situation = 'disk'"
        ).fetchone()
        counted = history.execute("SELECT events, last FROM silences").fetchall()
    assert rows[2] == 1 and counted == [(rows[0], rows[1])]
    assert watching.silences.get(made["id"])["events"] == rows[0] > 0


def test_a_sink_that_catches_up_passes_over_what_was_silenced(agent):
    agent.listen = "127.0.0.1:0"
    agent.sink = agent.directory / "not-yet" / "events.jsonl"
    agent.watched = agent.log()
    agent.situation("disk", log=agent.watched, when=["ENTRYDESC contains 'disk'"])
    agent.situation("login", log=agent.watched, when=["ENTRYDESC contains 'login'"])
    agent.start()
    silences = Silences(agent)
    write(agent, "disk before")
    silences.wait_events(1)
    made = silences.add(situation="disk")
    write(agent, "disk 1", "login 1", "disk 2")
    silences.wait_events(4)
    assert agent.stop() == 0  # its events are no longer in memory
    agent.start()
    silences = Silences(agent)
    silences.expire(made["id"])
    write(agent, "disk after")
    silences.wait_events(5)
    agent.sink.parent.mkdir()
    assert descriptions(agent.wait_events(3)) == ["disk before", "login 1", "disk after"]
    status = Api(agent).request("GET", "/api/v1/status")[2]
    wait_until(lambda: Api(agent).request("GET", "/api/v1/status")[2]["sinks"][0]["lag"] == 0, status)


def test_without_a_history_silences_last_as_long_as_the_agent(agent):
    agent.listen = "127.0.0.1:0"
    agent.history = {"enabled": False}
    agent.sink = agent.directory / "events.jsonl"
    agent.more_sinks = [{"type": "jsonl", "path": str(agent.directory / "second.jsonl")}]
    agent.watched = agent.log()
    agent.situation("disk", log=agent.watched, when=["ENTRYDESC contains 'disk'"])
    agent.situation("login", log=agent.watched, when=["ENTRYDESC contains 'login'"])
    agent.start()
    silences = Silences(agent)
    made = silences.add(situation="disk")
    assert silences.send("GET")[1]["kept"] is False
    write(agent, "disk 1", "login 1")
    assert descriptions(agent.wait_events(1)) == ["login 1"]
    wait_until(lambda: silences.get(made["id"])["events"] == 1, "the count, once for both sinks")
    wait_until(lambda: len(jsonl(agent.directory / "second.jsonl")) == 1, "the second sink")
    assert agent.stop() == 0
    agent.start()
    assert Silences(agent).send("GET")[1]["silences"] == []


def test_a_history_that_is_removed_gets_the_silences_again(watching):
    made = watching.silences.add(situation="disk")
    for file in (watching.directory / "state").glob("history.db*"):
        file.unlink()
    watching.wait_trace("its files were removed or replaced while the agent ran")
    wait_until(lambda: (watching.directory / "state/history.db").exists(), "a new history")
    write(watching, "disk 1", "login 1")
    wait_until(lambda: descriptions(jsonl(watching.sink))[-1:] == ["login 1"], "the sink")
    watching.send(SIGKILL)
    watching.wait_end()
    watching.start()
    kept = Silences(watching).get(made["id"])
    assert (kept["state"], kept["events"]) == ("active", 1)


def test_a_silence_that_cannot_be_stored_is_refused_and_not_made(watching):
    """Another writer locks the file."""
    history = sqlite3.connect(watching.directory / "state/history.db", timeout=30)
    history.isolation_level = None
    with closing(history):
        history.execute("BEGIN IMMEDIATE")
        status, answer = watching.silences.send("POST", "", {"match": {"all": True}, **DAY})
        assert status == 503 and "the change was not made" in answer["detail"], answer
        history.execute("ROLLBACK")
    made = wait_until(
        lambda: (lambda answer: answer[0] == 201 and answer[1])(
            watching.silences.send("POST", "", {"match": {"situation": "login"}, **DAY})
        ),
        "a silence",
    )
    assert [one["id"] for one in watching.silences.send("GET")[1]["silences"]] == [made["id"]]


@pytest.mark.slow
def test_ten_thousand_silences_are_the_most(watching):
    silences = watching.silences
    with closing(sqlite3.connect(watching.directory / "state/history.db", timeout=30)) as history:
        assert watching.stop() == 0
        until = int(time.time() * 1000) + 86_400_000
        history.executemany(
            "INSERT INTO silences VALUES (?, ?, 1, ?, 'anna', 'w', NULL, '', 0, 0)",
            [(n, json.dumps({"situation": f"none {n}*"}), until) for n in range(1, 10_000)],
        )
        history.commit()
    watching.start()
    silences = Silences(watching)
    last = silences.add(situation="disk")
    assert last["id"] == 10_000
    status, answer = silences.send("POST", "", {"match": {"situation": "login"}, **DAY})
    assert status == 409 and "there are 10000 active silences" in answer["detail"]
    assert len(silences.send("GET")[1]["silences"]) == 10_000
    write(watching, *(f"disk {n}" for n in range(2000)), "login")
    assert descriptions(watching.wait_events(1)) == ["login"]
    assert silences.get(last["id"])["events"] == 2000
    assert silences.expire(1)[0] == 200
    assert silences.add(situation="login")["id"] == 10_001
