"""The debug log: every line as read and as a row, for the logs whose debug mode is on."""

import re

from conftest import syslog_line

ROW = 2864


def records(data):
    """(number, line as read, row or None) of each record."""
    parts = re.split(rb"\t\t>>>>>>>>> RECORD (\d+) <<<<<<<<<\n", data)
    assert parts[0] == b""
    for number, body in zip(parts[1::2], parts[2::2]):
        line, rest = body.split(b"\n", 1)
        assert rest[:1] == b"\n"  # the line's own newline, then the record's
        row = rest[1:]
        assert row == b"" or (len(row) == ROW + 1 and row.endswith(b"\n"))
        yield int(number), line, row[:ROW] or None


def test_two_logs_share_one_debug_log_and_the_third_stays_out(agent):
    path = agent.directory / "debug.log"
    agent.environment["AGENT_DEBUG_LOG"] = str(path)
    loud = [agent.log(f"{name}.log", fields=";Y ;S") for name in ("one", "two")]
    quiet = agent.log("quiet.log", fields=";N ;S")
    for log in [*loud, quiet]:
        agent.situation(log.path.stem, log=log)
    agent.start()
    written = {}
    for log in [*loud, quiet]:
        lines = [syslog_line(f"{log.path.stem} {i}") for i in range(200)]
        written[log.path.stem] = [line.rstrip("\n").encode() for line in lines]
        log.append("".join(lines))
    agent.wait_events(600)
    assert agent.stop() == 0
    found = list(records(path.read_bytes()))
    assert [number for number, _, _ in found] == list(range(1, 401))
    for name in ("one", "two"):
        assert [line for _, line, _ in found if f": {name} ".encode() in line] == written[name]
    assert all(row is not None and row[320:327] in (b"one.log", b"two.log") for _, _, row in found)


def test_debug_mode_follows_the_configuration_with_the_next_entry(agent):
    path = agent.directory / "debug.log"
    agent.environment["AGENT_DEBUG_LOG"] = str(path)
    log = agent.log(fields=";N ;S")
    agent.situation(log=log)
    agent.start()
    log.append(syslog_line("unseen"))
    agent.wait_events(1)
    agent.configure(f"{log} ;Y ;S")
    agent.refresh()
    agent.wait_trace("Manager thread waiting for a signal.", count=2)
    log.append(syslog_line("seen"))
    agent.wait_events(2)
    assert agent.stop() == 0
    assert [(number, line[-4:]) for number, line, _ in records(path.read_bytes())] == [(1, b"seen")]


def test_a_debug_log_grows_across_restarts(agents):
    path = None
    for run in range(2):
        agent = agents()
        path = path or agent.directory / "debug.log"
        agent.environment["AGENT_DEBUG_LOG"] = str(path)
        log = agent.log(fields=";Y ;S")
        agent.situation(log=log)
        agent.start()
        log.append(syslog_line(f"run {run}"))
        agent.wait_events(1)
        assert agent.stop() == 0
    assert [number for number, _, _ in records(path.read_bytes())] == [1, 1]


def test_a_debug_log_that_cannot_be_opened_only_disables_the_copying(agent):
    path = agent.directory / "absent" / "debug.log"
    agent.environment["AGENT_DEBUG_LOG"] = str(path)
    log = agent.log(fields=";Y ;S")
    agent.situation(log=log)
    agent.start()
    assert agent.trace(
        f'Error opening debug log "{path}"; errno = 2; No such file or directory'
    )
    log.append(syslog_line("goes on"))
    agent.wait_events(1)
    assert agent.stop() == 0
