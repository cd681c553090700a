"""Why a situation is raised by an entry or not, and what it would have made of the past."""

import os
import time
from concurrent.futures import ThreadPoolExecutor
from signal import SIGHUP

import pytest
from api import Api, stamp
from conftest import PATIENCE, syslog_line, wait_until


class Analysis(Api):
    """Questions to a running agent about its situations."""

    def post(self, what, body, status=200):
        got, _, answer = self.request("POST", f"/api/v1/{what}", body)
        assert got == status, answer
        return answer

    def explain(self, **body):
        return self.post("explain", body)["explanations"]

    def explain_line(self, line, where, /, **definition):
        return self.explain(definition=definition, line=line.rstrip("\n"), log=str(where))[0]

    def backtest(self, begin, end, **body):
        return self.post("backtest", {"from": begin, "to": end, **body})

    def make(self, name, **fields):
        return self.post("situations", {"name": name, **fields}, 201)

    def counts(self, name):
        status, _, answer = self.request("GET", f"/api/v1/situations/{name}")
        assert status == 200, answer
        return answer["counts"]


@pytest.fixture
def started(agent):
    """An agent with a syslog file that has no old line, and HTTP."""
    agent.listen = "127.0.0.1:0"
    agent.watched = agent.log(content=b"")
    agent.start()
    agent.analysis = Analysis(agent)
    return agent


# Every operator with a value that holds and one that does not, of an entry from sshd[7] with the
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
    # It is written: the line is explained where it stands, and not counted twice.
    line = syslog_line("hit 2")
    started.watched.append(line)
    assert api.explain_line(line, started.watched, **limits)["window"]["count"] == 2
    third = api.explain_line(syslog_line("hit 3"), started.watched, **limits)
    assert third["window"]["count"] == 3 and third["raised"]
    assert third["decision"] == "Would be raised: 3 entries in 60 s, the threshold is >= 3."
    # A line of the time before is counted with those before it.
    early = api.explain_line(syslog_line("hit early", when=old), started.watched, **limits)
    assert early["window"]["count"] == 2
    few = {**limits, "frequency": "<= 1"}
    assert api.explain_line(syslog_line("hit 3"), started.watched, **few)["decision"] == (
        "Would not be raised: 3 entries in 60 s, the threshold is <= 1."
    )
    # Thresholds may stand among the conditions.
    inside = {"when": ["FREQTHRESH >= 4", "PERIODTHRS = 60"]}
    explained = api.explain_line(syslog_line("x"), started.watched, **inside)
    assert explained["window"] == {"frequency": ">= 4", "period": "60s", "count": 4}
    assert explained["conditions"] == []  # they are never compared with an entry
    assert explained["raised"]
    assert started.stop() == 0


def test_what_is_judged_again_leaves_the_trace_alone(agent):
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
    # One that is stopped is explained all the same.
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


def test_a_backtest_equals_what_was_raised_live(agent):
    """The same lines, live and afterwards: as often, by the same entries, counted alike."""
    agent.listen = "127.0.0.1:0"
    agent.agent_keys = {"max_rows": 10}  # no limit of a backtest
    log = agent.log(content=b"")
    situations = {
        "all": {"log": str(log)},
        "failed": {"log": str(log), "when": ["ENTRYDESC contains 'fail'"]},
        "many": {
            "log": str(log),
            "when": ["ENTRYDESC contains 'fail'"],
            "frequency": ">= 5",
            "period": "1h",
        },
        "few": {"log": str(log), "frequency": "<= 3", "period": "1h"},
        "burst": {"log": str(log), "frequency": "> 12", "period": "3s"},
        "never": {"log": str(log), "when": ["ENTRYSRC = 'cron'"]},
        "everywhere": {"when": ["ENTRYDESC contains 'fail'"], "frequency": ">= 7", "period": "1h"},
    }
    for name, fields in situations.items():
        agent.situations.append({"name": name, **fields})
    agent.start()
    api = Analysis(agent)
    begin = time.time()
    written = 0
    for n in range(3):
        # Right behind a poll, so that every entry is read within the second of its writing.
        log.append("".join(syslog_line(f"{'fail' if i % 3 else 'ok'} {n}.{i}") for i in range(10)))
        written += 10
        wait_until(lambda: api.counts("all")["offered"] == written, "the lines to be read")
    end = time.time() + 1
    live = {name: api.counts(name) for name in situations}
    assert live["many"]["raised"] == 18 - 4 and live["few"]["raised"] == 3
    agent.wait_events(sum(counts["raised"] for counts in live.values()))
    for name, fields in situations.items():
        tested = api.backtest(stamp(begin), stamp(end), situation=name)
        assert tested["entries"] == written
        assert tested["matched"] == live[name]["matched"]
        assert tested["truncated"] is False
        raised = [e["row"]["ENTRYTIME"] for e in agent.events() if e["situation"] == name]
        if name != "burst":  # a window of seconds depends on when lines are read
            assert tested["raised"] == live[name]["raised"], name
            assert tested["raised_at"] == raised
        again = api.backtest(stamp(begin), stamp(end), definition=fields)
        assert again == tested
    assert api.backtest(stamp(begin), stamp(end), situation="never")["decision"] == (
        "Would not have been raised: none of 30 entries meets every condition."
    )
    many = api.backtest(stamp(begin), stamp(end), situation="many")
    assert many["decision"].startswith("Would have been raised 14 times, first at 20")
    assert many["decision"].endswith(": 18 of 30 entries meet every condition.")
    assert agent.stop() == 0


def test_a_backtest_of_a_past_that_was_not_monitored(agent):
    """Windows of a hand-made log: entries every 20 seconds, six within the minute at its end."""
    agent.listen = "127.0.0.1:0"
    base = int(time.time()) - 7200
    offsets = [0, 20, 40, 60, 80, 1000, 1001, 1002, 1059, 1060, 1061]
    lines = "".join(syslog_line(f"at {o}", when=time.localtime(base + o)) for o in offsets)
    log = agent.log(content=lines.encode())
    agent.start()
    api = Analysis(agent)

    def run(frequency, period, begin=0, end=2000):
        return api.backtest(
            stamp(base + begin),
            stamp(base + end),
            definition={"log": str(log), "frequency": frequency, "period": period},
        )

    # At 1059: 1000, 1001, 1002 and 1059 lie within 60 s; at 1060 the entry at 1000 is just out.
    tested = run(">= 4", "60s")
    assert tested["raised_at"] == [stamp(base + o) for o in (1059, 1060, 1061)]
    assert (tested["entries"], tested["matched"], tested["raised"]) == (11, 11, 3)
    assert run(">= 4", "59s")["raised_at"] == []
    assert run(">= 3", "60s")["raised_at"] == [
        stamp(base + o) for o in (40, 60, 80, 1002, 1059, 1060, 1061)
    ]
    assert run(">= 5", "60s")["raised"] == 0
    assert run(">= 5", "60s")["decision"] == (
        "Would not have been raised: 11 of 11 entries meet every condition, but never >= 5 in 60 s."
    )
    assert run("<= 1", "60s")["raised_at"] == [stamp(base), stamp(base + 1000)]
    # Only what lies between the two times counts.
    assert run(">= 3", "60s", begin=20, end=60)["raised_at"] == [stamp(base + 60)]
    assert run(">= 1", "60s", begin=100, end=900) == {
        "entries": 0,
        "matched": 0,
        "raised": 0,
        "truncated": False,
        "raised_at": [],
        "decision": "Would not have been raised: there are no entries between these times.",
        "complete": True,
        "reached": None,
        "reason": None,
    }
    assert agent.stop() == 0


def test_a_backtest_of_many_entries_names_the_first_thousand(agent):
    agent.listen = "127.0.0.1:0"
    now = int(time.time()) - 4000
    lines = "".join(syslog_line(f"n {n}", when=time.localtime(now + n // 2)) for n in range(3000))
    log = agent.log(content=lines.encode())
    agent.start()
    tested = Analysis(agent).backtest(stamp(now), stamp(now + 4000), definition={"log": str(log)})
    assert (tested["entries"], tested["raised"], tested["truncated"]) == (3000, 3000, False)
    assert tested["raised_at"] == [stamp(now + n // 2) for n in range(1000)]
    assert agent.stop() == 0


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
    # The log is written anew: the event's own row still tells how many were counted.
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


def test_a_refresh_waits_for_no_backtest(agent):
    agent.listen = "127.0.0.1:0"
    when = time.localtime(time.time() - 60)
    line = syslog_line("x" * 200, when=when).encode()
    log = agent.log(content=line * 200_000)
    agent.start()
    # Conditions that take long and all hold.
    slow = {"log": str(log), "when": ["ENTRYDESC matches 'x.*x$'"] * 100}
    begin = stamp(time.time() - 3600)
    end = stamp(time.time() + 3600)

    def run():
        while True:  # until those that ask whether two are under way leave room
            answer = Analysis(agent).request(
                "POST", "/api/v1/backtest", {"from": begin, "to": end, "definition": slow}
            )
            if "two backtests" not in answer[2].get("detail", ""):
                return answer

    with ThreadPoolExecutor() as pool:
        running = [pool.submit(run) for _ in range(2)]
        refused = []

        def both_run():
            status, _, answer = run_short(agent, begin, log)
            refused.append(answer)
            return status == 503 and "two backtests are already running" in answer["detail"]

        wait_until(both_run, lambda: f"two backtests: {refused[-1]}")
        begun = time.monotonic()
        agent.log("new.log")
        agent.send(SIGHUP)
        api = Api(agent)
        new = str(agent.directory / "new.log")
        wait_until(
            lambda: new in [one["log"] for one in api.request("GET", "/api/v1/logs")[2]["logs"]],
            "the new log",
        )
        taken = time.monotonic() - begun
        for answer in running:
            status, _, problem = answer.result(PATIENCE)
            assert status == 503, (status, problem, taken)
            assert problem["detail"] == (
                "the agent is re-reading its log configuration: try again"
            )
    # The same, left alone.
    status, _, answer = run_short(agent, begin, log)
    assert (status, answer["entries"]) == (200, 0)
    assert agent.stop() == 0


def run_short(agent, begin, log):
    definition = {"log": str(log), "when": ["ENTRYSRC = 'none'"]}
    return Analysis(agent).request(
        "POST", "/api/v1/backtest", {"from": begin, "to": begin, "definition": definition}
    )
