"""From a growing file to events on standard output."""

import time

from conftest import descriptions, syslog_line


def started(agent, **keys):
    log = agent.log(**keys)
    agent.situation(log=log)
    agent.start()
    return log


def test_a_new_line_becomes_an_event_with_every_column(agent):
    log = started(agent)
    log.append("Oct  5 07:03:09 web1 sshd[412]: Failed password for root\n")
    (event,) = agent.wait_events(1)
    assert event["situation"] == "every-entry"
    assert event["severity"] == "info"
    assert event["raised"].endswith("Z")
    row = event["row"]
    assert list(row) == [
        "ORIGINNODE", "LOGPATH", "LOGNAME", "ENTRYTIME", "ENTRYSYS", "ENTRYSRC", "ENTRYTYPE",
        "ENTRYCLASS", "ENTRYDESC", "FREQTHRESH", "PERIODTHRS", "TIMESTAMP", "SAMPLENO", "ROWNO",
        "ULOGPATH", "ULOGNAME", "UENTRYSRC", "UENTRYDESC",
    ]  # fmt: skip
    year = time.localtime().tm_year - 1900
    assert row["ENTRYTIME"] == f"{year:03}1005070309000"
    assert row["ENTRYSYS"] == "web1"
    assert row["ENTRYSRC"] == row["UENTRYSRC"] == "sshd[412]"
    assert row["ENTRYDESC"] == row["UENTRYDESC"] == "Failed password for root"
    assert row["ENTRYTYPE"] == row["ENTRYCLASS"] == ""
    assert row["LOGPATH"] == row["ULOGPATH"] == f"{agent.directory}/"
    assert row["LOGNAME"] == row["ULOGNAME"] == "app.log"
    assert row["ORIGINNODE"] != ""
    assert (row["FREQTHRESH"], row["PERIODTHRS"], row["SAMPLENO"], row["ROWNO"]) == (0, 0, 0, 0)
    assert len(row["TIMESTAMP"]) == 16


def test_a_line_arrives_within_about_a_second(agent):
    log = started(agent)
    begun = time.monotonic()
    log.append(syslog_line("quick"))
    agent.wait_events(1)
    assert time.monotonic() - begun < 5  # one poll; the margin is for a busy machine


def test_what_the_log_held_before_the_start_is_not_reported(agent):
    log = started(agent, content=syslog_line("old").encode() * 10)
    log.append(syslog_line("new"))
    assert descriptions(agent.wait_events(1)) == ["new"]


def test_a_log_that_is_empty_at_the_start_is_monitored(agent):
    log = started(agent, content=b"")
    log.append(syslog_line("first ever"))
    assert descriptions(agent.wait_events(1)) == ["first ever"]


def test_many_lines_keep_their_order(agent):
    log = started(agent)
    for block in range(10):
        log.append("".join(syslog_line(f"line {block * 300 + i}") for i in range(300)))
    assert descriptions(agent.wait_events(3000)) == [f"line {i}" for i in range(3000)]


def test_a_last_line_without_newline_is_reported_as_it_is_and_its_rest_as_a_new_line(agent):
    log = started(agent)
    log.append(syslog_line("first half").rstrip("\n"))
    # The description loses its last byte, newline or not.
    assert descriptions(agent.wait_events(1)) == ["first hal"]
    log.append(" second half\n" + syslog_line("whole"))
    events = agent.wait_events(3)
    assert descriptions(events) == ["first hal", "", "whole"]
    assert events[1]["row"]["ENTRYTIME"] == ""


def test_a_long_line_arrives_in_pieces(agent):
    agent.environment["AGENT_DEBUG_LOG"] = str(agent.directory / "debug.log")
    log = started(agent, fields=";Y ;S")
    head = syslog_line("").rstrip("\n")
    line = head + "x" * (5000 - len(head)) + "\n"
    assert len(line) == 5001
    log.append(line)
    events = agent.wait_events(3)
    assert descriptions(events) == ["x" * 256, "", ""]
    log.append(syslog_line("after"))
    assert descriptions(agent.wait_events(4))[3] == "after"
    pieces = (agent.directory / "debug.log").read_bytes().split(b" <<<<<<<<<\n")[1:]
    assert [len(piece.split(b"\n")[0]) for piece in pieces] == [2047, 2047, 906, len(head) + 5]


def test_truncation_is_noticed_once_and_reading_goes_on_at_the_new_end(agent):
    log = started(agent, content=b"x\n" * 5000)
    with open(log.path, "r+b") as stream:
        stream.truncate(40)
    warning = f"Warning: log file {log} truncated. Resetting EOF to offset 40."
    agent.wait_trace(warning)
    log.append(syslog_line("after the cut"))
    assert descriptions(agent.wait_events(1)) == ["after the cut"]
    assert len(agent.trace("truncated")) == 1


def test_truncation_to_nothing(agent):
    log = started(agent)
    log.append(syslog_line("before"))
    agent.wait_events(1)
    with open(log.path, "wb"):
        pass
    agent.wait_trace("truncated. Resetting EOF to offset 0.")
    log.append(syslog_line("after"))
    assert descriptions(agent.wait_events(2)) == ["before", "after"]


def test_a_log_that_is_moved_away_is_followed_and_its_successor_is_not(agent):
    log = started(agent)
    moved = log.path.with_suffix(".1")
    log.path.rename(moved)
    log.append(syslog_line("in the successor"))
    with open(moved, "a", encoding="ascii") as stream:
        stream.write(syslog_line("in the file moved away"))
    assert descriptions(agent.wait_events(1)) == ["in the file moved away"]
    assert agent.stop() == 0
    assert len(agent.events()) == 1


def test_a_log_that_vanishes_leaves_the_agent_running(agent):
    log = started(agent)
    other = None
    log.path.unlink()
    other = agent.log("other.log")
    agent.refresh()
    agent.wait_trace(f"Deleting log object for file {log}.")
    agent.wait_open(other)
    assert agent.stop() == 0


def test_two_logs_at_once(agent):
    logs = [agent.log(f"{name}.log") for name in ("one", "two")]
    for log in logs:
        agent.situation(log.path.stem, log=log)
    agent.start()
    for i in range(200):
        for log in logs:
            log.append(syslog_line(f"{log.path.stem} {i}"))
    events = agent.wait_events(400)
    for log in logs:
        own = [e for e in events if e["situation"] == log.path.stem]
        assert descriptions(own) == [f"{log.path.stem} {i}" for i in range(200)]
        assert {e["row"]["LOGNAME"] for e in own} == {log.path.name}


def test_conditions_select_the_lines(agent):
    log = agent.log()
    agent.situation(
        "failed", log=log, when=["ENTRYSRC starts 'sshd'", "ENTRYDESC contains 'Failed password'"]
    )
    agent.situation("kernel", log=log, when=["ENTRYSRC = 'kernel'"], severity="critical")
    agent.start()
    log.append(
        syslog_line("Failed password for root", source="sshd[1]")
        + syslog_line("Accepted password", source="sshd[1]")
        + syslog_line("Failed password for su", source="su")
        + syslog_line("oops", source="kernel")
    )
    events = agent.wait_events(2)
    assert [(e["situation"], e["severity"], e["row"]["ENTRYDESC"]) for e in events] == [
        ("failed", "info", "Failed password for root"),
        ("kernel", "critical", "oops"),
    ]
    assert agent.stop() == 0
    assert len(agent.events()) == 2
