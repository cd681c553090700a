"""Logs of [[log]] tables: paths and globs in the host configuration."""

import pytest
from conftest import Log, descriptions, syslog_line


def file(agent, name, content="Jan  1 00:00:00 web1 old: before the start\n"):
    log = Log(agent.directory / name)
    log.path.parent.mkdir(exist_ok=True)
    log.path.write_text(content)
    return log


def test_one_file_configures_everything(agent):
    log = file(agent, "app.log")
    agent.agent_keys["log_config"] = None
    agent.follow(log)
    agent.situation(log=log)
    agent.start()
    agent.wait_open(log)
    log.append(syslog_line("followed"))
    assert descriptions(agent.wait_events(1)) == ["followed"]
    assert agent.stop() == 0


@pytest.mark.slow
def test_a_file_that_appears_under_a_glob_is_followed(agent):
    old = file(agent, "logs/old.log")
    agent.follow(agent.directory / "logs" / "*.log", exclude="secret*")
    agent.situation()
    agent.start()
    agent.wait_open(old)
    file(agent, "logs/secret.log")
    new = file(agent, "logs/new.log", "")
    agent.wait_open(new)
    new.append(syslog_line("in the new file"))
    old.append(syslog_line("in the old file"))
    assert sorted(descriptions(agent.wait_events(2))) == ["in the new file", "in the old file"]
    assert not agent.is_open(agent.directory / "logs" / "secret.log")


@pytest.mark.slow
def test_without_any_file_the_agent_waits_for_one(agent):
    agent.agent_keys["log_config"] = None
    agent.follow(agent.directory / "later" / "*.log")
    agent.situation()
    agent.start()
    agent.wait_trace("no log to monitor yet")
    log = file(agent, "later/app.log", "")
    agent.wait_open(log)
    log.append(syslog_line("at last"))
    assert descriptions(agent.wait_events(1)) == ["at last"]
    assert agent.stop() == 0


@pytest.mark.slow
def test_tables_come_and_go_while_the_agent_runs(agent):
    kept = agent.log("kept.log")
    first = file(agent, "first.log")
    second = file(agent, "second.log")
    agent.follow(first)
    agent.situation()
    agent.start()
    agent.wait_open(first)
    agent.tables.clear()
    agent.follow(second)
    agent.reload()
    agent.wait_open(second)
    agent.wait_trace(f"Deleting log object for file {first}.")
    second.append(syslog_line("second"))
    kept.append(syslog_line("kept"))
    assert sorted(descriptions(agent.wait_events(2))) == ["kept", "second"]
    assert not agent.trace(f"Deleting log object for file {kept}.")
    assert not agent.trace("takes effect at the next start")


def test_a_file_of_both_lists_belongs_to_the_log_configuration(agent):
    log = agent.log("app.log")
    agent.follow(agent.directory / "*.log")
    agent.situation()
    agent.start()
    agent.wait_trace(f"The log configuration names {log}, too; its line applies.")
    log.append(syslog_line("once"))
    assert descriptions(agent.wait_events(1)) == ["once"]
    assert agent.stop() == 0
    assert len(agent.events()) == 1
