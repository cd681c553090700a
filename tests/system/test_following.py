"""Logs of [[log]] tables through rotations and stops: each entry once."""

import contextlib
import os
import sqlite3

import pytest
from api import Api
from conftest import Log, descriptions, syslog_line, wait_until
from test_ledger import ledger_of


def followed(agent, **keys):
    log = Log(agent.directory / "app.log")
    log.path.write_text(syslog_line("before the start"))
    agent.agent_keys["log_config"] = None
    agent.sink = agent.directory / "events"
    agent.follow(log, rotate_wait="1s", **keys)
    agent.situation(log=log)
    agent.start()
    agent.wait_open(log)
    return log


def rotate(log):
    """Renames the log and makes a new one, as log rotation does by default."""
    for number in range(5, 0, -1):
        older = f"{log}.{number}"
        if os.path.exists(older):
            os.rename(older, f"{log}.{number + 1}")
    os.rename(log.path, f"{log}.1")
    log.path.write_text("")


def test_a_rotated_log_is_read_to_its_end_and_its_successor_after_it(agent):
    log = followed(agent)
    log.append(syslog_line("first"))
    rotate(log)
    log.append(syslog_line("second"))
    assert descriptions(agent.wait_events(2)) == ["first", "second"]
    assert agent.stop() == 0


def test_what_a_truncation_removed_is_read_from_the_copy(agent):
    log = followed(agent)
    log.append(syslog_line("known"))
    agent.wait_events(1)
    log.append(syslog_line("only in the copy"))
    (agent.directory / "app.log.1").write_bytes(log.path.read_bytes())
    log.path.write_bytes(b"")
    log.append(syslog_line("after it"))
    assert descriptions(agent.wait_events(3)) == ["known", "only in the copy", "after it"]


def test_what_was_written_while_the_agent_was_stopped_is_read(agent):
    log = followed(agent)
    log.append(syslog_line("one"))
    agent.wait_events(1)
    assert agent.stop() == 0
    log.append(syslog_line("two"))
    rotate(log)
    log.append(syslog_line("three"))
    rotate(log)
    log.append(syslog_line("four"))
    agent.start()
    assert descriptions(agent.wait_events(4)) == ["one", "two", "three", "four"]
    assert agent.stop() == 0
    agent.start()
    log.append(syslog_line("five"))
    assert descriptions(agent.wait_events(5)) == ["one", "two", "three", "four", "five"]


def test_a_file_that_appears_while_the_agent_is_stopped_is_read_from_its_beginning(agent):
    """A log whose name has the date, over midnight."""
    logs = agent.directory / "logs"
    logs.mkdir()
    (logs / "old.log").write_text(syslog_line("before the first start"))
    yesterday = Log(logs / "app-20261121.log")
    yesterday.path.write_text("")
    agent.agent_keys["log_config"] = None
    agent.sink = agent.directory / "events"
    agent.follow(logs / "*.log")
    agent.situation()
    agent.start()
    agent.wait_open(yesterday)
    yesterday.append(syslog_line("yesterday"))
    agent.wait_events(1)
    wait_until(lambda: watched(agent), "the glob to be known as watched")
    assert agent.stop() == 0
    (logs / "app-20261122.log").write_text(syslog_line("today"))
    moved = logs / "moved.log"
    moved.write_text(syslog_line("long ago"))
    os.utime(moved, (1_700_000_000, 1_700_000_000))
    agent.start()
    assert descriptions(agent.wait_events(2)) == ["yesterday", "today"]
    assert agent.stop() == 0
    assert len(agent.events()) == 2


def watched(agent):
    """The paths of which the history knows that they were watched."""
    with contextlib.closing(sqlite3.connect(agent.directory / "state" / "history.db")) as history:
        return history.execute("SELECT path, watched FROM watched_paths").fetchall()


def test_without_the_file_of_the_position_the_younger_generations_are_read(agent):
    log = followed(agent)
    log.append(syslog_line("one"))
    agent.wait_events(1)
    assert agent.stop() == 0
    log.path.unlink()
    first = agent.directory / "app.log.2"
    first.write_text(syslog_line("two"))
    later = os.stat(first).st_mtime_ns + 2_000_000_000
    second = agent.directory / "app.log.1"
    second.write_text(syslog_line("three"))
    os.utime(second, ns=(later, later))
    log.path.write_text(syslog_line("four"))
    agent.start()
    assert descriptions(agent.wait_events(4)) == ["one", "two", "three", "four"]
    agent.wait_trace(f"Lines of {log} may have been lost: the file in which reading stopped at byte")
    assert agent.stop() == 0


@pytest.mark.slow
def test_a_log_whose_name_a_directory_takes_is_read_to_its_end_and_then_its_successor(agent):
    agent.listen = "127.0.0.1:0"
    log = followed(agent)
    agent.api = Api(agent)
    rotated = Log(agent.directory / "app.log.1")
    log.path.rename(rotated.path)
    log.path.mkdir()
    wait_until(lambda: followed_as(agent, log)["state"] == "not a file", "the state of the log")
    agent.refresh()  # looks for the files again
    agent.wait_trace("not a regular file")
    rotated.append(syslog_line("still written"))
    assert descriptions(agent.wait_events(1)) == ["still written"]
    log.path.rmdir()
    log.path.write_text(syslog_line("new"))
    assert descriptions(agent.wait_events(2)) == ["still written", "new"]


def followed_as(agent, log):
    status, _, answer = agent.api.request("GET", f"/api/v1/logs?log={log}")
    assert status == 200, answer
    return answer["logs"][0]["ledger"]["follow"]


def test_a_log_that_moves_from_the_log_configuration_begins_where_start_says(agent):
    log = agent.log("app.log", b"")
    other = agent.log("other.log", b"")
    agent.sink = agent.directory / "events"
    agent.situation()
    agent.start()
    for one in (log, other):
        one.append(syslog_line(f"as a line of it: {one.path.name}"))
    agent.wait_events(2)
    assert agent.stop() == 0
    agent.configure("# none")
    agent.follow(log, start="beginning")
    agent.follow(other)
    agent.start()
    agent.wait_trace(f"{log} was monitored before, but not as a log of a [[log]] table")
    assert not agent.trace(f"{other} was monitored before")
    assert descriptions(agent.wait_events(3))[-1] == "as a line of it: app.log"
    assert agent.stop() == 0
    agent.start()  # from here on there is a position
    agent.wait_open(log)
    assert not agent.trace("was monitored before")


@pytest.mark.slow
def test_a_log_of_both_lists_that_leaves_the_log_configuration_is_not_read_again(agent):
    log = agent.log("app.log", b"")
    agent.sink = agent.directory / "events"
    agent.follow(agent.directory / "*.log")
    agent.situation()
    agent.start()
    log.append(syslog_line("as a line of it"))
    agent.wait_events(1)
    wait_until(lambda: watched(agent), "the glob to be known as watched")
    assert agent.stop() == 0
    agent.configure("# none")
    log.append(syslog_line("while it was stopped"))
    (agent.directory / "new.log").write_text(syslog_line("in a new file"))
    agent.start()
    agent.wait_events(2)
    assert agent.stop() == 0
    assert descriptions(agent.events()) == ["as a line of it", "in a new file"]


def test_truncations_are_counted(agent):
    agent.listen = "127.0.0.1:0"
    log = followed(agent)
    log.append(syslog_line("one"))
    agent.wait_events(1)
    log.path.write_bytes(b"")
    log.append(syslog_line("two"))
    agent.wait_events(2)
    agent.api = Api(agent)
    assert ledger_of(agent, log)["truncations"] == 1


def test_without_resumption_the_log_begins_at_its_end(agent):
    log = followed(agent, resume=False)
    log.append(syslog_line("one"))
    agent.wait_events(1)
    assert agent.stop() == 0
    log.append(syslog_line("while it was stopped"))
    agent.start()
    agent.wait_open(log)
    log.append(syslog_line("two"))
    assert descriptions(agent.wait_events(2)) == ["one", "two"]


@pytest.mark.parametrize("has_history", [True, False])
def test_a_log_with_changed_settings_is_not_read_again(agent, has_history):
    agent.history["enabled"] = has_history
    log = followed(agent, start="beginning", resume=False)
    agent.wait_events(1)
    agent.tables[0]["rotate_wait"] = "3s"
    agent.reload()
    agent.wait_trace(f"Deleting log object for file {log}.")
    log.append(syslog_line("one"))
    assert descriptions(agent.wait_events(2)) == ["before the start", "one"]


@pytest.mark.slow
def test_a_log_renamed_within_its_glob_is_read_on_under_its_new_name(agent):
    agent.agent_keys["log_config"] = None
    agent.sink = agent.directory / "events"
    logs = agent.directory / "logs"
    logs.mkdir()
    old, new = Log(logs / "old.log"), Log(logs / "new.log")
    old.path.write_text("")
    agent.follow(logs / "*.log")
    agent.situation()
    agent.listen = "127.0.0.1:0"
    agent.start()
    agent.wait_open(old)

    def names():
        return [event["row"]["LOGNAME"] for event in agent.events()]

    def is_dropped():
        answer = Api(agent).request("GET", "/api/v1/logs")[2]
        reasons = "".join(one["reason"] for table in answer["tables"] for one in table["passed_over"])
        monitored = [log["log"] for log in answer["logs"]]
        return "once it is written to" in reasons and str(old) not in monitored

    old.append(syslog_line("one"))
    agent.wait_events(1)
    old.path.rename(new.path)
    new.append(syslog_line("two"))
    agent.wait_events(2)
    wait_until(is_dropped, "the old name to be dropped", 120)
    # The thread that followed the old name reads what it finds until it has ended.
    later = []
    while names()[-1] != "new.log":
        later.append(f"later {len(later)}")
        new.append(syslog_line(later[-1]))
        agent.wait_events(2 + len(later))
        assert len(later) < 20
    before = ["one", "two", *later]
    old.path.write_text(syslog_line("anew"))
    agent.wait_events(len(before) + 1)
    assert agent.stop() == 0
    new.append(syslog_line("five"))
    old.append(syslog_line("on"))
    agent.start()
    agent.wait_events(len(before) + 3)
    agent.wait_open(new)
    texts = descriptions(agent.events())
    assert texts[: len(before) + 1] == [*before, "anew"]
    assert sorted(texts[len(before) + 1 :]) == ["five", "on"]
    assert names()[: len(before) + 1] == ["old.log"] * (len(before) - 1) + ["new.log", "old.log"]


def test_a_log_that_is_renamed_over_another_is_read_on_as_that(agent):
    """Each line is read once, and each file as one log."""
    agent.agent_keys["log_config"] = None
    agent.sink = agent.directory / "events"
    logs = agent.directory / "logs"
    logs.mkdir()
    a, b = Log(logs / "a.log"), Log(logs / "b.log")
    for log in (a, b):
        log.path.write_text("")
    agent.follow(a, rotate_wait="1s")
    agent.follow(logs / "*.log", rotate_wait="1s")
    agent.situation()
    agent.start()
    for log in (a, b):
        agent.wait_open(log)
        log.append(syslog_line(f"of {log.path.name}"))
    agent.wait_events(2)
    a.path.rename(b.path)
    b.append(syslog_line("renamed"))
    agent.wait_events(3)
    a.path.write_text(syslog_line("made anew"))
    agent.wait_events(4)
    wait_until(lambda: known_positions(agent).get(str(b)) == b.path.stat().st_size, "the position", 60)
    b.append(syslog_line("of the other"))
    last = agent.wait_events(5)[-1]
    assert (last["row"]["LOGNAME"], last["row"]["ENTRYDESC"]) == ("b.log", "of the other")
    a.path.rename(b.path)
    assert agent.stop() == 0
    b.append(syslog_line("while it was stopped"))
    agent.start()
    agent.wait_events(6)
    b.append(syslog_line("last"))
    agent.wait_events(7)
    assert agent.stop() == 0
    texts = descriptions(agent.events())
    assert sorted(texts[:2]) == ["of a.log", "of b.log"]
    assert texts[2:] == ["renamed", "made anew", "of the other", "while it was stopped", "last"]


def test_lines_written_late_to_a_rotated_file_are_read(agent):
    log = followed(agent)
    rotated = Log(f"{log}.1")
    log.append(syslog_line("one"))
    agent.wait_events(1)
    rotate(log)
    log.append(syslog_line("two"))
    agent.wait_events(2)
    rotated.append(syslog_line("late"))
    agent.wait_events(3)
    log.append(syslog_line("three"))
    agent.wait_events(4)
    assert agent.stop() == 0
    log.append(syslog_line("four"))
    agent.start()
    agent.wait_events(5)
    rotate(log)
    log.append(syslog_line("five"))
    agent.wait_events(6)
    assert descriptions(agent.events()) == ["one", "two", "late", "three", "four", "five"]
    assert agent.stop() == 0


def test_a_log_whose_old_file_keeps_its_writer_is_read_under_both_names(agent):
    """A log is moved away under its glob and made anew, and its writer is not told."""
    agent.agent_keys["log_config"] = None
    agent.sink = agent.directory / "events"
    logs = agent.directory / "logs"
    logs.mkdir()
    log, moved = Log(logs / "app.log"), Log(logs / "moved.log")
    log.path.write_text("")
    agent.follow(logs / "*.log", start="beginning", rotate_wait="1s")
    agent.situation()
    agent.listen = "127.0.0.1:0"
    agent.start()
    agent.wait_open(log)
    log.append(syslog_line("one"))
    agent.wait_events(1)
    log.path.rename(moved.path)
    log.path.write_text(syslog_line("two"))
    agent.wait_events(2)
    for number in range(3):
        moved.append(syslog_line(f"late {number}"))
        agent.wait_events(3 + number)
    wait_until(lambda: known_positions(agent).get(str(moved)) == moved.path.stat().st_size, "the position", 60)
    assert agent.stop() == 0
    moved.append(syslog_line("stopped"))
    agent.start()
    agent.wait_events(6)
    moved.append(syslog_line("later"))
    agent.wait_events(7)
    assert descriptions(agent.events()) == ["one", "two", "late 0", "late 1", "late 2", "stopped", "later"]


def known_positions(agent):
    """The offsets that the history has, by log."""
    with contextlib.closing(sqlite3.connect(agent.directory / "state/history.db")) as database:
        return dict(database.execute("SELECT log, offset FROM log_positions"))
