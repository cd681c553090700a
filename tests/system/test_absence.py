"""Situations with `absent`: raised when no entry comes, resolved by the next one, whatever the clock does."""

import json
import re
import sqlite3
import time
from signal import SIGKILL

import pytest
import zrmctl
from api import Api
from conftest import Log, syslog_line, wait_until
from test_episodes import followed, moment, stored, wait_stored

DONE = ["ENTRYDESC matches 'backup of (?P<host>[^ ]*) is done'"]


def done(host="db1", when=None):
    return syslog_line(f"backup of {host} is done", source="backup[7]", when=when)


def backup(agent, absent="3s", log=None, **keys):
    keys = {"text": "no backup since {first}", **keys}
    agent.situation("no-backup", log, when=DONE, absent=absent, **keys)


def states(events):
    return [(event["state"], event.get("group", {}).get("host")) for event in events]


def count_raised(agent):
    return sum(event["state"] == "raised" for event in stored(agent))


def test_the_absence_of_an_entry_is_raised_once_and_resolved_by_the_next(agent):
    log = followed(agent)
    backup(agent, log=log, labels={"team": "ops"})
    agent.start()
    log.append(done())
    came = time.time()
    log.append(syslog_line("backup of nothing"))
    (raised,) = wait_stored(agent, 1)
    assert came + 3 <= moment(raised["raised"]) + 1.1 and moment(raised["raised"]) <= came + 3 + 2 + 1
    assert raised["episode"]["id"] == raised["id"] and raised["episode"]["count"] == 0
    assert "row" not in raised and raised["log"] == str(log) and raised["labels"] == {"team": "ops"}
    assert abs(moment(raised["episode"]["first"]) - came) <= 2
    assert raised["text"] == f"no backup since {raised['episode']['first']}"
    time.sleep(4)  # it is raised once
    assert len(stored(agent)) == 1
    log.append(done())
    _, resolved = wait_stored(agent, 2)
    assert resolved["state"] == "resolved" and resolved["reason"] == "an entry has come"
    assert resolved["episode"]["id"] == raised["id"] and resolved["node"] == raised["node"]
    wait_stored(agent, 3)  # it is missed again
    assert agent.stop() == 0
    assert [event["state"] for event in stored(agent)] == ["raised", "resolved", "raised"]


def test_a_log_is_silent_from_the_start_on_though_it_does_not_exist(agent):
    agent.agent_keys["log_config"] = None
    log = Log(agent.directory / "later.log")
    agent.follow(log, start="beginning")
    agent.situation("silent", log, absent="2s")
    agent.start(wait=False)
    (raised,) = wait_stored(agent, 1)
    assert raised["log"] == str(log) and raised["node"].endswith(":ZRM")
    log.path.write_text(syslog_line("the first line"))
    _, resolved = wait_stored(agent, 2)
    assert resolved["state"] == "resolved" and resolved["node"] == raised["node"]
    assert agent.stop() == 0


def test_each_group_that_was_seen_is_missed_for_itself_also_after_a_restart(agent):
    log = followed(agent)
    backup(agent, "6s", log, group_by=["host"], text="{host}")
    agent.start()
    log.append(done("db1") + done("db2"))
    wait_until(lambda: groups_of(agent) == {"db1", "db2"}, "stored groups")
    assert agent.stop() == 0
    agent.start()
    deadline = time.monotonic() + 9
    while time.monotonic() < deadline:
        log.append(done("db2"))
        time.sleep(0.5)
    (raised,) = stored(agent)
    assert states([raised]) == [("raised", "db1")] and raised["text"] == "db1"
    log.append(done("db1"))
    assert states(wait_stored(agent, 2))[1] == ("resolved", "db1")
    assert agent.stop() == 0


def groups_of(agent):
    with sqlite3.connect(f"file:{agent.directory}/state/history.db?mode=ro", uri=True) as history:
        rows = history.execute("SELECT key FROM expected_groups").fetchall()
    return {bytes(key)[2:].decode() for (key,) in rows}


def test_the_time_in_which_no_agent_runs_does_not_count_and_what_was_written_then_does(agent):
    log = followed(agent)
    backup(agent, "6s", log)
    agent.start()
    log.append(done())
    time.sleep(2)
    assert agent.stop() == 0
    time.sleep(7)  # nobody watches
    agent.start()
    begin = time.time()
    (raised,) = wait_stored(agent, 1)
    assert moment(raised["raised"]) >= begin + 1
    assert agent.stop() == 0
    log.append(done())
    agent.start()
    _, resolved = wait_stored(agent, 2)
    assert resolved["state"] == "resolved"
    assert agent.stop() == 0


def test_the_time_before_a_restart_counts(agent):
    log = followed(agent)
    backup(agent, "12s", log)
    agent.start()
    log.append(done())
    time.sleep(8)
    assert agent.stop() == 0
    agent.start()
    begin = time.monotonic()
    wait_stored(agent, 1)
    assert time.monotonic() - begin < 11.5, "not counted anew"
    assert agent.stop() == 0


def test_a_kill_between_raising_and_resolving_loses_and_repeats_nothing(agent):
    log = followed(agent)
    backup(agent, "2s", log)
    agent.start()
    wait_stored(agent, 1)
    agent.send(SIGKILL)
    agent.wait_end()
    agent.start()
    time.sleep(4)  # it lasts
    assert len(stored(agent)) == 1
    log.append(done())
    agent.send(SIGKILL)
    agent.wait_end()
    agent.start()
    wait_stored(agent, 2)
    wait_stored(agent, 3)
    assert agent.stop() == 0
    events = stored(agent)[:3]
    assert [event["state"] for event in events] == ["raised", "resolved", "raised"]
    assert events[1]["episode"]["id"] == events[0]["id"]


def test_a_log_that_is_still_being_read_is_not_missed(agent):
    log = followed(agent)
    agent.situation("slow", log, when=["ENTRYDESC contains 'nothing'"])
    backup(agent, "2s", log)
    log.append(syslog_line("line of no interest") * 400_000 + done())
    agent.start(wait=False)
    (raised,) = wait_stored(agent, 1)
    assert abs(moment(raised["episode"]["first"]) + 2 - moment(raised["raised"])) <= 2.5
    assert agent.stop() == 0


@pytest.mark.parametrize("change", ("removed", "changed", "changed while stopped"))
def test_a_situation_that_ends_resolves_its_absences(agent, change):
    log = followed(agent)
    backup(agent, "2s", log)
    agent.start()
    wait_stored(agent, 1)
    agent.situations.clear()
    if change == "changed while stopped":
        assert agent.stop() == 0
    if change != "removed":
        backup(agent, "1h", log)
    if change == "changed while stopped":
        agent.start()
    else:
        agent.reload()
    _, resolved = wait_stored(agent, 2)
    expected = {
        "removed": "the situation was stopped or removed",
        "changed": "the situation was changed",
        "changed while stopped": "the situation was changed while the agent was not running",
    }
    assert resolved["reason"] == expected[change]
    assert agent.stop() == 0


def test_a_hostile_log_that_makes_groups_takes_bounded_room(agent):
    log = followed(agent)
    backup(agent, "2s", log, group_by="host", max_groups=50)
    agent.start()
    log.append("".join(done(f"x{number}") for number in range(5000)))
    wait_stored(agent, 50)
    log.append("".join(done(f"y{number}") for number in range(50)))
    events = wait_stored(agent, 150)
    assert agent.stop() == 0
    assert {event["reason"] for event in events[50:100]} == {"its group made room for others"}
    assert {group for _, group in states(events[:50])} == {f"x{number}" for number in range(4950, 5000)}
    assert {group for _, group in states(events[100:])} == {f"y{number}" for number in range(50)}


def test_a_log_of_the_log_configuration_is_missed_too(agent):
    log = agent.log()
    backup(agent, "3s", log)
    agent.start()
    log.append(done())
    (raised,) = wait_stored(agent, 1)
    assert raised["log"] == str(log)
    log.append(done())
    wait_stored(agent, 2)
    assert agent.stop() == 0


# ---------------------------------------------------------------------- the API, the client


def test_the_client_adds_explains_and_tries_an_absence(agent):
    log = followed(agent)
    agent.listen = "127.0.0.1:0"
    agent.start()
    api = Api(agent)
    access = ["--url", f"http://127.0.0.1:{api.port}", "--token-file", str(agent.directory / "state/api-token")]

    def ctl(*arguments):
        status, out, err = zrmctl.run([*access, *arguments])
        return status, out + err

    status, out = ctl("situations", "add", "no-backup", "--log", str(log), "--when", DONE[0], "--absent", "1h")
    assert status == 0, out
    status, out = ctl("situations", "show", "no-backup")
    assert re.search(r"^absent +1h$", out, re.M), out
    status, out = ctl("situations", "set", "no-backup", "--period", "1h", "--frequency", ">= 2")
    assert status == 1 and "has no effect with absent" in out
    now = int(time.time()) // 60 * 60
    hours = [now - 9 * 3600, now - 8 * 3600 - 1800, now - 5 * 3600, now - 4 * 3600 - 60]
    log.append("".join(done(when=time.localtime(hour)) for hour in hours))
    wait_until(lambda: api.request("GET", "/api/v1/situations/no-backup")[2]["counts"]["matched"] == 4, "entries")

    def stamp(seconds):
        return time.strftime("%Y-%m-%dT%H:%M:%S", time.localtime(seconds))

    span = ["--from", stamp(now - 9 * 3600), "--to", stamp(now - 3600)]
    result = json.loads(ctl("--json", "backtest", "no-backup", *span)[1])
    assert result["raised"] == 2 and result["matched"] == 4
    first, second = result["episodes"]
    assert (moment(first["first"]), moment(first["last"]), first["over"]) == (hours[1], hours[2], True)
    assert (moment(second["first"]), second["over"]) == (hours[3], False)
    assert "since no entry had come for 1h" in result["decision"]
    status, out = ctl("explain", "no-backup", "--log", str(log), "--last", "2")
    assert status == 0
    assert "it ends an absence: no entry had met every condition for 12600 s, and the limit is 1h" in out
    assert "it would be raised 1h after this entry unless another one comes" in out
    grouped = {"definition": {"name": "g", "log": str(log), "when": DONE, "group_by": ["host"], "absent": "9h"}}
    _, _, answer = api.request("POST", "/api/v1/backtest", {**grouped, "from": stamp(now - 9 * 3600), "to": stamp(now)})
    assert answer["raised"] == 0 and "never was there none for 9h" in answer["decision"]
    assert agent.stop() == 0


@pytest.mark.parametrize(
    "keys, problem",
    [
        ({"absent": "never"}, "absent: 'never' is not a duration"),
        ({"absent": "1h", "resolve_after": "1m"}, "resolve_after: has no effect with absent"),
        ({"absent": "1h", "cooldown": "1m"}, "cooldown: has no effect with absent"),
        ({"absent": "1h", "frequency": ">= 2", "period": "1m"}, "frequency: has no effect with absent"),
        ({"absent": "1h", "distinct": "host"}, "distinct: has no effect with absent"),
        ({"absent": "1h", "context": 3}, "context: has no effect with absent"),
    ],
)
def test_what_makes_no_sense_is_refused_with_its_line(agent, keys, problem):
    followed(agent)
    agent.situation("wrong", when=DONE, **keys)
    agent.start(wait=False)
    assert agent.wait_end() == 2
    assert problem in agent.stderr.text()
    assert re.search(r"zrm.toml:\d+", agent.stderr.text())
