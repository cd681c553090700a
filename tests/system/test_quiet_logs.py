"""Logs that fall silent, have no file or change their format, although they are monitored."""

import contextlib
import sqlite3
import time

from api import Api
from conftest import syslog_line, wait_until
from test_metrics import metrics, value

WEEK_OF_HOURS = 7 * 24


def start(agent, quiet):
    agent.listen = "127.0.0.1:0"
    agent.agent_keys["log_config"] = None
    agent.watched = agent.log("app.log", syslog_line("old").encode())
    agent.path = agent.watched.path
    agent.follow(agent.watched, quiet=quiet)
    agent.start()
    agent.api = Api(agent)


def ledger(agent):
    status, _, answer = agent.api.request("GET", f"/api/v1/logs?log={agent.path}")
    assert status == 200, answer
    return answer["logs"][0]["ledger"] if answer["logs"] else None


def health(agent):
    told = ledger(agent)
    return told and told.get("health")


def test_a_log_is_quiet_until_its_next_entry(agent):
    start(agent, "10s")
    wait_until(lambda: health(agent) == "ok", "the first look at the log")
    wait_until(lambda: health(agent) == "quiet", "the log to be quiet", 40)
    (warning,) = ledger(agent)["warnings"]
    assert warning["kind"] == "quiet"
    assert warning["text"].endswith("The configuration expects one every 10 seconds.")
    assert agent.wait_trace(f"{agent.path}: The log has had no entries for 1")
    assert value(metrics(agent.api), "zrm_log_warning", log=str(agent.path), warning="quiet") == 1
    agent.watched.append(syslog_line("here again"))
    wait_until(lambda: health(agent) == "ok", "the log to be well again")
    assert ledger(agent)["warnings"] == []
    agent.path.unlink()
    wait_until(lambda: health(agent) == "dead", "the log to have no file", 60)
    assert "dead" in [warning["kind"] for warning in ledger(agent)["warnings"]]


def test_a_rhythm_is_learned_and_kept(agent):
    start(agent, "learn")
    wait_until(lambda: health(agent) == "learning", "the first look at the log")
    agent.watched.append(syslog_line("an entry"))
    wait_until(lambda: ledger(agent)["rows"] == 1, "the entry")
    time.sleep(6)  # beyond the next look, which learns that the log is not silent
    agent.stop()
    with contextlib.closing(sqlite3.connect(agent.directory / "state/history.db")) as history:
        hours = history.execute("SELECT log, hour, silence FROM rhythms").fetchall()
        assert hours
        log, hour, _ = hours[0]
        past = [(log, hour - before, 60) for before in range(1, 2 * WEEK_OF_HOURS)]
        history.executemany("INSERT INTO rhythms VALUES (?, ?, ?)", past)
        history.commit()
    agent.start()
    agent.api = Api(agent)
    wait_until(lambda: health(agent) == "ok", "the rhythm of the earlier weeks")
