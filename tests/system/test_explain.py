"""Why a situation is raised by an entry or not."""

import os
import time

import pytest
from analysis import Analysis
from conftest import syslog_line, wait_until


@pytest.fixture
def started(agent):
    """An agent with a syslog file that has no old line, and HTTP."""
    agent.listen = "127.0.0.1:0"
    agent.watched = agent.log(content=b"")
    agent.start()
    agent.analysis = Analysis(agent)
    return agent


# Every operator with a value that holds and one that does not, for an entry from sshd[7] with the
# description "Failed password for root", and what the decision then says.
OPERATORS = [
    ("ENTRYSRC = 'sshd[7]'", "ENTRYSRC = 'cron'", "ENTRYSRC 'sshd[7]' is not 'cron'"),
    ("ENTRYSRC != 'cron'", "ENTRYSRC != 'sshd[7]'", "ENTRYSRC 'sshd[7]' is 'sshd[7]'"),
    ("ENTRYSRC >= 'sshd'", "ENTRYSRC >= 'sshe'", "ENTRYSRC 'sshd[7]' is less than 'sshe'"),
    ("ENTRYSRC <= 'sshd[7]'", "ENTRYSRC <= 'sshd'", "ENTRYSRC 'sshd[7]' is greater than 'sshd'"),
    ("ENTRYSRC < 'sshe'", "ENTRYSRC < 'sshd[7]'", "ENTRYSRC 'sshd[7]' is not less than 'sshd[7]'"),
    ("ENTRYSRC > 'sshd'", "ENTRYSRC > 'sshd[7]'", "ENTRYSRC 'sshd[7]' is not greater than 'sshd[7]'"),
    (
        "ENTRYDESC contains 'password'",
        "ENTRYDESC contains 'Password'",
        "ENTRYDESC 'Failed password for root' does not contain 'Password'",
    ),
    (
        "ENTRYDESC starts 'Failed'",
        "ENTRYDESC starts 'failed'",
        "ENTRYDESC 'Failed password for root' does not start with 'failed'",
    ),
    (
        "ENTRYDESC matches 'for (root|admin)$'",
        "ENTRYDESC matches '^for'",
        "ENTRYDESC 'Failed password for root' does not match '^for'",
    ),
    (
        "ENTRYSRC in ['cron', 'sshd[7]']",
        "ENTRYSRC in ['cron', 'sshd']",
        "ENTRYSRC 'sshd[7]' is none of ['cron', 'sshd']",
    ),
    ("SAMPLENO = 0", "SAMPLENO = 5", "SAMPLENO 0 is not 5"),
    ("SAMPLENO in [0, 1]", "SAMPLENO in [1, 2]", "SAMPLENO 0 is none of [1, 2]"),
    (
        "ENTRYDESC != 'it''s'",
        "ENTRYDESC = 'it''s'",
        "ENTRYDESC 'Failed password for root' is not 'it''s'",
    ),
]


@pytest.mark.slow
def test_every_operator(started):
    line = syslog_line("Failed password for root", source="sshd[7]")
    for holding, failing, sentence in OPERATORS:
        for condition, holds in ((holding, True), (failing, False)):
            explained = started.analysis.explain_line(line, started.watched, when=[condition])
            verdict = explained["conditions"][0]
            assert (verdict["condition"], verdict["holds"]) == (condition, holds)
            column = condition.split()[0]
            assert verdict["value"] == explained["row"][column]
            assert (explained["matches"], explained["raised"]) == (holds, holds)
            assert explained["decision"] == (
                "Would be raised: every condition holds."
                if holds
                else f"Would not be raised: {sentence}."
            )


def test_the_columns_and_every_condition(started):
    line = syslog_line("Accepted publickey", source="sshd[9]")
    explained = started.analysis.explain_line(
        line,
        started.watched,
        log=str(started.watched.path),
        when=["ENTRYSRC starts 'sshd'", "ENTRYDESC contains 'Failed'", "ENTRYSYS = 'web2'"],
    )
    assert explained["line"] == line.rstrip("\n")
    assert explained["event"] is None and explained["reason"] is None
    row = explained["row"]
    assert len(row) == 18
    assert (row["ENTRYSYS"], row["ENTRYSRC"], row["ENTRYDESC"]) == (
        "web1",
        "sshd[9]",
        "Accepted publickey",
    )
    assert row["LOGPATH"] + row["LOGNAME"] == str(started.watched.path)
    assert explained["conditions"] == [
        {
            "condition": f"LOGPATH = '{started.watched.path.parent}/'",
            "value": f"{started.watched.path.parent}/",
            "holds": True,
        },
        {"condition": "LOGNAME = 'app.log'", "value": "app.log", "holds": True},
        {"condition": "ENTRYSRC starts 'sshd'", "value": "sshd[9]", "holds": True},
        {"condition": "ENTRYDESC contains 'Failed'", "value": "Accepted publickey", "holds": False},
        {"condition": "ENTRYSYS = 'web2'", "value": "web1", "holds": False},
    ]
    assert explained["window"] is None
    assert explained["decision"] == (
        "Would not be raised: ENTRYDESC 'Accepted publickey' does not contain 'Failed'."
    )
    nothing = started.analysis.explain_line(line, started.watched)
    assert nothing["decision"] == "Would be raised: the situation has no conditions."
    assert started.stop() == 0


def test_thresholds_count_what_the_log_holds(started):
    api = started.analysis
    limits = {"when": ["ENTRYDESC starts 'hit'"], "frequency": "> 2", "period": "1m"}
    old = time.localtime(time.time() - 300)
    started.watched.append(
        syslog_line("hit of old", when=old) + syslog_line("hit 1") + syslog_line("miss")
    )
    second = api.explain_line(syslog_line("hit 2"), started.watched, **limits)
    assert second["window"] == {"frequency": "> 2", "period": "1m", "count": 2}
    assert (second["matches"], second["raised"]) == (True, False)
    assert second["decision"] == "Would not be raised: 2 entries in 60 s, the threshold is >= 3."
    # The line is in the log now: it is explained where it is, and not counted twice.
    line = syslog_line("hit 2")
    started.watched.append(line)
    assert api.explain_line(line, started.watched, **limits)["window"]["count"] == 2
    third = api.explain_line(syslog_line("hit 3"), started.watched, **limits)
    assert third["window"]["count"] == 3 and third["raised"]
    assert third["decision"] == "Would be raised: 3 entries in 60 s, the threshold is >= 3."
    # An earlier line is counted with those before it.
    early = api.explain_line(syslog_line("hit early", when=old), started.watched, **limits)
    assert early["window"]["count"] == 2
    few = {**limits, "frequency": "<= 1"}
    assert api.explain_line(syslog_line("hit 3"), started.watched, **few)["decision"] == (
        "Would not be raised: 3 entries in 60 s, the threshold is <= 1."
    )
    # Thresholds may be among the conditions.
    inside = {"when": ["FREQTHRESH >= 4", "PERIODTHRS = 60"]}
    explained = api.explain_line(syslog_line("x"), started.watched, **inside)
    assert explained["window"] == {"frequency": ">= 4", "period": "60s", "count": 4}
    assert explained["conditions"] == []  # they are never compared with an entry
    assert explained["raised"]
    assert started.stop() == 0


def test_explanations_write_nothing_to_the_trace(agent):
    agent.listen = "127.0.0.1:0"
    lines = "".join(f"2026-11-20 10:00:{n:02} fits\ndoes not\n" for n in range(20))
    log = agent.log(
        content=lines.encode(),
        fields=';N ;U ;A,"%d-%d-%d %d:%d:%d %[^\\n]" , year month day hour minute second description',
    )
    agent.start(trace="error+detail+fine")
    api = Analysis(agent)
    api.make("kept", log=str(log.path), when=["ENTRYDESC contains 'none'"])
    rules = {"log": str(log.path), "frequency": ">= 1", "period": "1m"}
    wait_until(lambda: agent.trace("Opening situation kept"), "the situation's opening")
    before = len(agent.trace())
    assert len(api.explain(definition=rules, last=40)) == 40
    api.explain_line("does not", log.path, **rules)
    result = api.backtest("2026-11-20T00:00:00", "2026-11-21T00:00:00", definition=rules)
    assert result["raised"] == 20
    traced = "\n".join(agent.trace()[before:])
    for word in ("frequency", "definition", "report", "does not", "StringParser", "UserLogFile"):
        assert word not in traced, traced
    assert api.counts("kept")["offered"] == 0
    log.append("2026-11-20 11:00:00 fits\n")
    agent.wait_trace("Event passed to situation kept for evaluation.")
    assert agent.stop() == 0


def test_the_last_entries_of_a_log(started):
    api = started.analysis
    api.make("two", log=str(started.watched.path), frequency=">= 2", period="1h")
    started.watched.append("".join(syslog_line(f"entry {n}") for n in range(5)))
    explained = api.explain(situation="two", last=3)
    assert [e["row"]["ENTRYDESC"] for e in explained] == ["entry 2", "entry 3", "entry 4"]
    assert [e["window"]["count"] for e in explained] == [3, 4, 5]
    assert {e["raised"] for e in explained} == {True}
    explained = api.explain(situation="two", last=1000)
    assert [e["raised"] for e in explained] == [False] + [True] * 4
    assert api.explain(situation="two", last=1, log=str(started.watched.path))[0]["raised"]
    # A stopped situation is explained, too.
    api.post("situations/two/stop", None)
    assert api.explain(situation="two", last=1)[0]["decision"] == (
        "Would be raised if the situation were started: 5 entries in 3600 s, the threshold is >= 2."
    )
    assert started.stop() == 0


def test_a_user_logs_own_format_and_an_undisturbed_monitor(agent):
    agent.listen = "127.0.0.1:0"
    log = agent.log(
        content=b"", fields=';N ;U ;A,"%d-%d-%d %d:%d:%d %s %[^\\n]" , year month day hour minute '
        "second type description"
    )
    agent.situation("all", log=log)
    agent.start()
    api = Analysis(agent)
    good = time.strftime("%Y-%m-%d %H:%M:%S ERROR it broke")
    log.append(good + "\nnonsense\n")
    agent.wait_events(1)
    before = api.logs()["app.log"]
    assert (before["NUMEVENTS"], before["NUMERRORS"]) == (2, 1)
    counts = api.counts("all")
    explained = api.explain_line(good, log, when=["ENTRYTYPE = 'ERROR'"])
    assert explained["raised"]
    assert (explained["row"]["ENTRYTYPE"], explained["row"]["ENTRYDESC"]) == ("ERROR", "it broke")
    bad = api.explain_line("nonsense too", log, when=["ENTRYTYPE = 'ERROR'"])
    assert bad["row"] is None and not bad["matches"] and not bad["raised"]
    assert bad["conditions"] == []
    assert "does not match the log's format" in bad["reason"]
    assert bad["decision"] == "Would not be raised: the line yields no entry."
    explained = api.explain(situation="all", last=2)
    assert [e["line"] for e in explained] == [good, "nonsense"]
    # None of this was monitored.
    after = api.logs()["app.log"]
    assert (after["NUMEVENTS"], after["NUMERRORS"]) == (2, 1)
    assert api.counts("all") == counts
    log.append(good + "\n")
    assert len(agent.wait_events(2)) == 2
    assert agent.stop() == 0


def test_a_line_longer_than_a_monitor_reads_at_once(started):
    line = syslog_line("x" * 5000).rstrip("\n")
    explained = started.analysis.explain(definition={}, line=line, log=str(started.watched))
    assert [len(e["line"]) for e in explained] == [2047, 2047, len(line) - 2 * 2047]
    assert "".join(e["line"] for e in explained) == line


def test_questions_that_cannot_be_answered(started):
    log = str(started.watched.path)
    started.analysis.make("all")
    for body, status, field in (
        ({}, 400, "line"),
        ({"line": "x", "last": 1, "situation": "all"}, 400, "line"),
        ({"line": "x", "log": log}, 400, "situation"),
        ({"line": "x", "log": log, "situation": "all", "definition": {}}, 400, "situation"),
        ({"line": "x", "situation": "all"}, 400, "log"),
        ({"line": "a\nb", "log": log, "situation": "all"}, 400, "line"),
        ({"line": "x" * 16385, "log": log, "situation": "all"}, 400, "line"),
        ({"line": "x", "log": "/no/such.log", "situation": "all"}, 404, "log"),
        ({"line": "x", "log": log, "situation": "none"}, 404, "situation"),
        ({"line": "x", "log": log, "definition": {"when": ["A = 1"]}}, 400, "definition.when[0]"),
        ({"last": 0, "log": log, "situation": "all"}, 400, "last"),
        ({"last": 1001, "log": log, "situation": "all"}, 400, "last"),
        ({"last": 1, "log": log, "situation": "all", "more": 1}, 400, "more"),
        ({"event": 0, "situation": "all"}, 400, "event"),
    ):
        answer = started.analysis.post("explain", body, status)
        assert answer["field"] == field, answer
    for body, status, field in (
        ({"situation": "all", "from": "2026-01-01"}, 400, "to"),
        ({"situation": "all", "from": "2026-01-02", "to": "2026-01-01"}, 400, "to"),
        ({"situation": "all", "from": "soon", "to": "2026-01-01"}, 400, "from"),
        ({"from": "2026-01-01", "to": "2026-01-02"}, 400, "situation"),
        (
            {"definition": {"log": "/no/such.log"}, "from": "2026-01-01", "to": "2026-01-02"},
            404,
            "log",
        ),
    ):
        answer = started.analysis.post("backtest", body, status)
        assert answer["field"] == field, answer
    # A log that is gone, and a pipe in its place, which nobody writes to.
    started.watched.path.unlink()
    body = {"last": 1, "log": log, "situation": "all"}
    answer = started.analysis.post("explain", body, 409)
    assert answer["detail"] == "the log cannot be read: No such file or directory"
    os.mkfifo(log)
    answer = started.analysis.post("explain", body, 409)
    assert answer["detail"] == "the log cannot be read: it is not a regular file"
    window = {"from": "2026-01-01", "to": "2026-01-02"}
    answer = started.analysis.post("backtest", {"definition": {"log": log}, **window})
    assert (answer["entries"], answer["truncated"]) == (0, False)
    assert started.stop() == 0


def test_the_entry_of_an_event(agent):
    agent.listen = "127.0.0.1:0"
    log = agent.log(content=b"")
    agent.situation("many", log=log, when=["ENTRYDESC starts 'hit'"], frequency=">= 2", period="1h")
    agent.start()
    api = Analysis(agent)
    log.append(syslog_line("hit") * 3 + syslog_line("miss"))
    events = agent.wait_events(2)
    wait_until(lambda: api.request("GET", f"/api/v1/events/{events[1]['id']}")[0] == 200, "event")
    for event, count in zip(events, (2, 3)):
        explained = api.explain(event=event["id"])
        assert len(explained) == 1
        assert explained[0]["event"] == event["id"]
        assert explained[0]["line"].endswith("hit")
        assert explained[0]["window"]["count"] == count
        assert explained[0]["raised"]
    # What another situation would make of the same entry.
    other = api.explain(event=events[0]["id"], definition={"when": ["ENTRYDESC = 'miss'"]})[0]
    assert other["decision"] == "Would not be raised: ENTRYDESC 'hit' is not 'miss'."
    # The log is rewritten: the event's own row still has the count.
    log.path.write_bytes(b"")
    gone = api.explain(event=events[1]["id"])[0]
    assert gone["line"] is None and gone["row"]["ENTRYDESC"] == "hit"
    assert gone["decision"] == "Would be raised: 3 entries in 3600 s, the threshold is >= 2."
    other = api.explain(event=events[1]["id"], definition={"frequency": ">= 2", "period": "1h"})[0]
    assert other["window"]["count"] is None and not other["raised"]
    assert other["decision"].startswith("Cannot be determined: ")
    assert api.post("explain", {"event": 99}, 404)["field"] == "event"
    assert agent.stop() == 0


def test_without_a_history_there_is_no_event_to_explain(agent):
    agent.listen = "127.0.0.1:0"
    agent.history = {"enabled": False}
    log = agent.log()
    agent.situation("all", log=log)
    agent.start()
    answer = Analysis(agent).post("explain", {"event": 1, "situation": "all"}, 409)
    assert (answer["field"], answer["detail"]) == ("event", "the history is off")
    assert agent.stop() == 0


def test_the_last_entries_of_an_earlier_time(started):
    now = int(time.time())
    texts = ["a", "b", "c", "d"]
    started.watched.append("".join(syslog_line(text, when=time.localtime(now - 40 + 10 * number))
                                   for number, text in enumerate(texts)))
    definition = {"log": str(started.watched.path), "when": []}
    until = time.strftime("%Y-%m-%dT%H:%M:%S", time.localtime(now - 15))
    explained = started.analysis.explain(definition=definition, last=2, to=until)
    assert [one["row"]["ENTRYDESC"] for one in explained] == ["b", "c"]
    assert started.analysis.explain(definition=definition, last=2, to="2020-01-01") == []
    answer = started.analysis.post("explain", {"definition": definition, "last": 2, "to": "soon"}, 400)
    assert answer["field"] == "to"
    answer = started.analysis.post("explain", {"definition": definition, "line": "x", "to": until}, 400)
    assert answer["field"] == "to"
