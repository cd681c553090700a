"""The log configuration: bad lines, fallback to the syslog configuration, SIGHUP."""

import time

from conftest import Log, descriptions, syslog_line

UNCHANGED = "has not changed since last refresh. No refresh performed."


def watch(agent, *names):
    logs = [agent.log(name) for name in names]
    for log in logs:
        agent.situation(log.path.stem, log=log)
    return logs


def test_an_unchanged_configuration_keeps_every_log(agent):
    (log,) = watch(agent, "app.log")
    agent.start()
    agent.refresh()
    agent.wait_trace(f"{agent.logs_conf} {UNCHANGED}")
    agent.wait_trace("Continuing to monitor existing log files.")
    log.append(syslog_line("still here"))
    assert descriptions(agent.wait_events(1)) == ["still here"]
    assert not agent.trace("Deleting log object")


def test_a_changed_configuration_adds_drops_and_keeps_logs(agent):
    kept, dropped = watch(agent, "kept.log", "dropped.log")
    agent.start()
    added = agent.log("added.log")
    agent.configure(str(kept), str(added))
    agent.refresh()
    agent.wait_trace(f"Deleting log object for file {dropped}.")
    agent.wait_open(added)
    dropped.append(syslog_line("unseen"))
    kept.append(syslog_line("kept goes on"))
    assert descriptions(agent.wait_events(1)) == ["kept goes on"]
    assert agent.stop() == 0
    assert len(agent.trace("Deleting log object for file")) == 3
    assert len(agent.events()) == 1


def test_lines_written_during_a_refresh_are_read_once(agent):
    (log,) = watch(agent, "app.log")
    agent.start()
    for i in range(20):
        log.append(syslog_line(f"line {i}"))
        agent.configure(f"{log} ;{'NY'[i % 2]}")
        agent.refresh()
    assert descriptions(agent.wait_events(20)) == [f"line {i}" for i in range(20)]
    assert agent.stop() == 0
    assert len(agent.events()) == 20


def test_a_log_whose_type_changed_gets_a_new_monitor(agent):
    (log,) = watch(agent, "app.log")
    agent.start()
    agent.configure(f"{log} ;N ;U ;%s")
    agent.refresh()
    agent.wait_trace(f"Deleting log object for file {log}.")
    assert agent.stop() == 0


def test_an_emptied_configuration_falls_back_to_the_syslog_configuration(agent):
    (log,) = watch(agent, "app.log")
    fallback = Log(agent.directory / "messages")
    fallback.path.write_text("old\n")
    agent.situation("fallback", log=fallback)
    agent.syslog_conf.write_text(f"*.err;kern.debug\t{fallback}\n*.alert root\n*.emerg *\n")
    agent.start()
    agent.configure("# nothing left")
    agent.refresh()
    agent.wait_trace(
        f"No valid log files found in {agent.logs_conf}.  "
        f"Attempting to build default list from syslog file {agent.syslog_conf}."
    )
    agent.wait_trace(f"Deleting log object for file {log}.")
    agent.wait_open(fallback)
    fallback.append(syslog_line("from the fallback"))
    assert descriptions(agent.wait_events(1)) == ["from the fallback"]


def test_an_emptied_configuration_without_fallback_keeps_the_logs(agent):
    (log,) = watch(agent, "app.log")
    agent.start()
    agent.configure("")
    agent.refresh()
    agent.wait_trace("Continuing to monitor existing log files.")
    log.append(syslog_line("still here"))
    assert descriptions(agent.wait_events(1)) == ["still here"]


def test_a_missing_configuration_starts_with_the_syslog_configuration(agent):
    fallback = Log(agent.directory / "messages")
    fallback.path.write_text("old\n")
    agent.situation(log=fallback)
    agent.syslog_conf.write_text(f"*.*\t{fallback}\n")
    agent.start(wait=False)
    agent.wait_trace(f"Attempting to build default list from syslog file {agent.syslog_conf}.")
    agent.wait_trace("Agent server is listening; signal sent.")
    agent.wait_open(fallback)
    fallback.append(syslog_line("read"))
    assert descriptions(agent.wait_events(1)) == ["read"]
    agent.refresh()
    agent.wait_trace(f"{agent.syslog_conf} has not changed since last refresh. No refresh performed")


def test_bad_lines_are_named_and_the_good_ones_are_used(agent):
    good = agent.log("good.log")
    agent.situation(log=good)
    agent.configure(
        "relative.log ;N ;S",
        ";N ;S",
        f"{agent.directory}/absent.log",
        f"{good} N ;S",
        f"{good} ;N ;Q",
        f"{good} ;N ;S",
        f"{good} ;Y ;S",
    )
    agent.start()
    for message in (
        "Absolute path name of log file must be specified for log . Ignoring remainder of line.",
        "File name cannot be defaulted. Skipping rest of line.",
        "Ignoring remainder of line.",
        f"Field separator missing after field 1 for log {len(str(agent.directory)) + 1}. "
        "Skipping rest of line.",
        f"Log type of Q for log {good} is invalid. Ignoring remainder of line.",
        f"Duplicate {good} entry found; entry ignored.",
    ):
        agent.wait_trace(message)
    good.append(syslog_line("monitored"))
    assert descriptions(agent.wait_events(1)) == ["monitored"]


def test_a_log_that_appears_later_is_monitored_when_the_configuration_changes(agent):
    (log,) = watch(agent, "app.log")
    late = Log(agent.directory / "late.log")
    agent.configure(str(late), append=True)
    agent.situation("late", log=late)
    agent.start(wait=False)
    agent.wait_trace("Agent server is listening; signal sent.")
    agent.wait_open(log)
    late.path.write_text("old\n")
    agent.configure(str(log), str(late))
    agent.refresh()
    agent.wait_open(late)
    late.append(syslog_line("here at last"))
    assert descriptions(agent.wait_events(1)) == ["here at last"]


def test_many_logs_are_dropped_and_stopped_in_the_time_of_one(agent):
    # Each monitor checks once a second whether it is to end; one after the other, the logs of this
    # test take 20 seconds to drop and 20 to stop.
    kept = [agent.log(f"kept{i}.log") for i in range(20)]
    for i in range(20):
        agent.log(f"dropped{i}.log")
    agent.start()
    agent.configure(*map(str, kept))
    agent.refresh()
    agent.wait_trace("Deleting log object for file", count=20, seconds=8)
    begin = time.monotonic()
    assert agent.stop() == 0
    assert time.monotonic() - begin < 8
    assert len(agent.trace("Deleting log object for file")) == 40
