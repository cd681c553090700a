"""Logs of [[log]] tables through rotations and stops: each entry once."""

import os

from conftest import Log, descriptions, syslog_line


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
