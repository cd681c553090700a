"""Logs of [[log]] tables on a host where something is off: an old history, the clock, a bad copy."""

import gzip
import os
import re
import sqlite3
import sys
from contextlib import closing
from pathlib import Path
from signal import SIGCONT, SIGSTOP

import pytest
from api import Api
from conftest import ROOT, Log, descriptions, syslog_line, wait_until

sys.path.insert(0, str(ROOT / "tests/tools"))
from accounting import record  # noqa: E402

HOUR = 3600


def followed(agent, content="", **keys):
    log = Log(agent.directory / "app.log")
    log.path.write_bytes(content.encode() if isinstance(content, str) else content)
    agent.agent_keys["log_config"] = None
    agent.sink = agent.directory / "events"
    agent.follow(log, **{"rotate_wait": "1s", **keys})
    agent.situation(log=log)
    return log


# ---------------------------------------------------------------------- a history of before


def schema_steps():
    """The SQL of each version of the history, as the agent has it."""
    text = (ROOT / "host/history/Schema.cpp").read_text(encoding="utf-8")
    table = text[text.index("steps = {") : text.index("};\n\n} // namespace")]
    steps = re.split(r"^    // \d+: ", table, flags=re.M)[1:]
    return ["".join(re.findall(r'^    "(.*?)",?$', step, flags=re.M)) for step in steps]


def history_file(agent):
    return agent.directory / "state/history.db"


def test_a_history_without_positions_is_taken_over(agent):
    """Version 4 is the last that knows nothing of followed logs."""
    log = followed(agent, syslog_line("before the start"))
    history_file(agent).parent.mkdir()
    with closing(sqlite3.connect(history_file(agent))) as database:
        for step in schema_steps()[:4]:
            database.executescript(step)
        database.execute("INSERT INTO logs VALUES (1, '/var/log/old.log')")
        database.execute("INSERT INTO labels VALUES (1, 'old', 'minor', 1, 'Old')")
        database.execute("INSERT INTO events VALUES (41, 1795158189412, 1, '{\"id\": 41}', NULL)")
        database.execute("PRAGMA user_version = 4")
        database.commit()
    agent.listen = "127.0.0.1:0"
    agent.start()
    agent.wait_open(log)
    log.append(syslog_line("one"))
    wait_until(lambda: [event["id"] for event in agent.events()][-1:] == [42], "the event after the old one")
    status, _, answer = Api(agent).request("GET", "/api/v1/events?situation=old")
    assert status == 200 and len(answer["events"]) == 1
    assert agent.stop() == 0
    log.append(syslog_line("while it was stopped"))
    agent.start()
    wait_until(lambda: descriptions(agent.events()[-2:]) == ["one", "while it was stopped"], "the rest")
    assert agent.stop() == 0
    with closing(sqlite3.connect(history_file(agent))) as database:
        assert database.execute("PRAGMA user_version").fetchone()[0] == len(schema_steps())


# ---------------------------------------------------------------------- the clock


@pytest.mark.slow
def test_a_clock_that_is_set_back_neither_stops_nor_repeats_entries(agent, clock):
    offset = clock(agent)
    log = followed(agent)
    agent.start()
    agent.wait_open(log)
    log.append(syslog_line("before"))
    (before,) = agent.wait_events(1)
    offset.write_text(str(-HOUR))
    log.append(syslog_line("after"))
    after = agent.wait_events(2)[1]
    assert after["raised"] < before["raised"]
    log.path.rename(agent.directory / "app.log.1")  # older and newer are told apart without the clock
    log.path.write_text(syslog_line("rotated"))
    agent.wait_events(3)
    assert agent.stop() == 0
    log.append(syslog_line("while it was stopped"))
    agent.start()
    assert descriptions(agent.wait_events(4)) == ["before", "after", "rotated", "while it was stopped"]
    offset.write_text("0")
    log.append(syslog_line("set forward"))
    agent.wait_events(5)
    assert agent.stop() == 0
    assert [event["id"] for event in agent.events()] == [1, 2, 3, 4, 5]
    assert not agent.trace("Error")


# ---------------------------------------------------------------------- login accounting


def test_an_accounting_log_is_followed_through_a_rotation(agent):
    log = followed(agent, record("before"), type="accounting")

    def users():
        return [re.match(r"user = (\w+)", text)[1] for text in descriptions(agent.events())]

    agent.start()
    agent.wait_open(log)
    log.append(record("first"))
    agent.wait_events(1)
    log.append(record("last"))
    log.path.rename(agent.directory / "app.log.1")
    log.path.write_bytes(record("present"))
    agent.wait_events(3)
    assert users() == ["first", "last", "present"]
    assert agent.stop() == 0
    log.append(record("stopped"))
    log.path.rename(agent.directory / "app.log.1")
    log.path.write_bytes(record("new"))
    agent.start()
    agent.wait_events(5)
    log.append(record("whole") + record("cut")[:15])
    agent.wait_events(6)
    log.append(record("cut")[15:])
    agent.wait_events(7)
    assert users() == ["first", "last", "present", "stopped", "new", "whole", "cut"]
    assert agent.stop() == 0


# ---------------------------------------------------------------------- a damaged copy


def follow_of(agent, log):
    answer = Api(agent).request("GET", f"/api/v1/logs?log={log}")[2]
    logs = answer.get("logs") or [{}]
    return (logs[0].get("ledger") or {}).get("follow") or {"lost": [], "state": ""}


def warnings_of(agent, log):
    return Api(agent).request("GET", f"/api/v1/logs?log={log}")[2]["logs"][0]["ledger"]["warnings"]


@pytest.mark.slow
@pytest.mark.parametrize("is_running", [True, False])
def test_a_damaged_copy_costs_what_it_held_and_nothing_else(agent, is_running):
    log = followed(agent)
    other = Log(agent.directory / "other.log")
    other.path.write_text("")
    agent.follow(other)
    agent.situation("other", log=other)
    agent.listen = "127.0.0.1:0"
    agent.start()
    agent.wait_open(log)
    agent.wait_open(other)
    log.append(syslog_line("known"))
    agent.wait_events(1)
    known = log.path.stat().st_size
    if is_running:
        agent.send(SIGSTOP)
    else:
        assert agent.stop() == 0
    unread = "".join(syslog_line(f"unread {number} " + os.urandom(40).hex()) for number in range(4000))
    log.append(unread)
    packed = gzip.compress(log.path.read_bytes())
    (agent.directory / "app.log.1.gz").write_bytes(packed[: len(packed) // 2])
    if is_running:
        log.path.write_text(syslog_line("present"))
        agent.send(SIGCONT)
    else:
        log.path.unlink()
        log.path.write_text(syslog_line("present"))
        agent.start()
    wait_until(lambda: "present" in descriptions(agent.events()), "the present file to be read")
    assert descriptions(agent.events()) == ["known", "present"]  # damage may make wrong lines before it shows
    wait_until(lambda: follow_of(agent, log)["lost"], "the loss in the ledger")
    follow = follow_of(agent, log)
    (lost,) = follow["lost"]
    assert known == lost["from"] <= lost["to"]
    copy = agent.directory / "app.log.1.gz"
    assert lost["source"] == str(copy)
    agent.wait_trace(f"{copy} cannot be read from byte {known} of its contents on. A damaged file")
    assert follow["state"] == "reading" and follow["problem"] is None
    (warning,) = wait_until(lambda: warnings_of(agent, log), "the warning")
    assert warning["kind"] == "lost"
    other.append(syslog_line("undisturbed"))
    wait_until(lambda: "undisturbed" in descriptions(agent.events()), "the other log")
    log.append(syslog_line("later"))
    wait_until(lambda: descriptions(agent.events())[-1] == "later", "the next entry")
    assert agent.stop() == 0


def without_privileges():
    """What makes permissions count, for a superuser too."""
    kinds = "-dac_override,-dac_read_search"
    sets = ["--bounding-set", kinds, "--inh-caps", kinds, "--ambient-caps", "-all"]
    return ("setpriv", *sets) if os.geteuid() == 0 else ()


def stopped_behind_an_entry(agent):
    """A followed log with a position behind its entry "one", and HTTP for the next run."""
    log = followed(agent)
    agent.listen = "127.0.0.1:0"
    agent.start()
    agent.wait_open(log)
    log.append(syslog_line("one"))
    agent.wait_events(1)
    assert agent.stop() == 0
    return log


def test_a_generation_that_is_forbidden_is_read_once_it_is_allowed(agent):
    log = stopped_behind_an_entry(agent)
    log.path.rename(agent.directory / "app.log.2")
    forbidden = Log(agent.directory / "app.log.1")
    forbidden.append(syslog_line("two"))
    forbidden.path.chmod(0)
    log.path.write_text(syslog_line("three"))
    agent.start(wrapper=without_privileges())
    agent.wait_trace(f"Error while following file {log}: open of {forbidden} failed and is tried again.")
    assert descriptions(agent.events()) == ["one"]
    forbidden.path.chmod(0o644)
    agent.wait_trace(f"File {log} is read again.")
    agent.wait_events(3)
    assert descriptions(agent.events()) == ["one", "two", "three"]
    assert follow_of(agent, log)["lost"] == [] and follow_of(agent, log)["problem"] is None
    assert agent.stop() == 0


@pytest.mark.slow
def test_a_generation_that_cannot_be_read_is_named_and_waited_for(agent):
    log = stopped_behind_an_entry(agent)
    log.path.rename(agent.directory / "app.log.3")
    readable, damaged = agent.directory / "app.log.2.gz", agent.directory / "app.log.1.gz"
    readable.write_bytes(b"\x1f\x8b\x08\x00" + b"not compressed" * 20)
    damaged.write_bytes(readable.read_bytes())
    log.path.write_text(syslog_line("four"))
    agent.start()
    agent.wait_trace(f"Error while following file {log}: read of {readable} failed and is tried again.")
    problem = wait_until(lambda: follow_of(agent, log)["problem"], "the problem")
    assert problem.startswith(f"read of {readable} failed and is tried again: ")
    readable.write_bytes(gzip.compress(syslog_line("two").encode()))
    agent.wait_events(2)
    agent.wait_events(3)
    assert descriptions(agent.events()) == ["one", "two", "four"]
    agent.wait_trace(f"Lines of {log} were lost: {damaged} cannot be read from byte 0 of its contents on.")
    (lost,) = follow_of(agent, log)["lost"]
    assert lost["source"] == str(damaged) and (lost["from"], lost["to"]) == (0, 0)

    def losses():
        return [one for one in warnings_of(agent, log) if one["kind"] == "lost"]

    (warning,) = wait_until(losses, "the warning")
    assert f"{damaged} cannot be read." in warning["text"]
    assert agent.stop() == 0


# ---------------------------------------------------------------------- a file without entries


def test_a_huge_file_without_entries_does_not_hold_up_the_stop(agent):
    log = followed(agent)
    agent.start()
    agent.wait_open(log)
    os.truncate(log.path, 1 << 42)  # a hole, as a writer leaves it that does not append
    wait_until(lambda: read_to(agent, log) > 1 << 28, "the hole to be read")
    assert agent.stop() == 0


def test_the_search_of_a_huge_compressed_file_does_not_hold_up_the_stop(agent):
    log = followed(agent)
    agent.start()
    agent.wait_open(log)
    log.append(syslog_line("one"))
    agent.wait_events(1)
    assert agent.stop() == 0
    positions = "SELECT offset FROM log_positions"
    with closing(sqlite3.connect(history_file(agent))) as database:
        database.execute("UPDATE log_positions SET inode = 1, offset = 1 << 40, guard = 1")
        database.commit()
    packed = agent.directory / "app.log.1.gz"
    packed.write_bytes(gzip.compress(bytes(1 << 26)) * 2000)  # 125 GiB
    agent.start(wait=False)
    wait_until(lambda: read_to(agent, packed) > 1 << 20, "the search to begin")
    assert agent.stop() == 0
    with closing(sqlite3.connect(history_file(agent))) as database:
        assert database.execute(positions).fetchone()[0] == 1 << 40
    assert not agent.trace("Lines of")


def read_to(agent, path):
    """How far the agent's descriptor of the file is moved."""
    process = Path(f"/proc/{agent.process.pid}")
    for descriptor in (process / "fd").iterdir():
        if os.path.realpath(descriptor) == str(path):
            return int((process / "fdinfo" / descriptor.name).read_text().split()[1])
    return 0
