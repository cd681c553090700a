"""Faults around the agent: logs that it may not read, sinks that it cannot write."""

import json
import os
import time
from pathlib import Path

from conftest import descriptions, syslog_line, wait_until

# Root reads everything; without these two capabilities it reads only what others may.
AS_ORDINARY_READER = [
    "setpriv", "--bounding-set", "-dac_override,-dac_read_search", "--inh-caps",
    "-dac_override,-dac_read_search",
]  # fmt: skip


def test_an_unreadable_log_is_traced_and_recovers_with_the_next_configuration(agent):
    readable, secret = agent.log("readable.log"), agent.log("secret.log")
    for log in (readable, secret):
        agent.situation(log.path.stem, log=log)
    secret.path.chmod(0)
    agent.start(wait=False, wrapper=AS_ORDINARY_READER if os.geteuid() == 0 else [])
    agent.wait_trace(f"Error opening file {secret}.  errno = 13; Permission denied")
    agent.wait_trace("Agent server is listening; signal sent.")
    agent.wait_open(readable)
    readable.append(syslog_line("goes on"))
    assert descriptions(agent.wait_events(1)) == ["goes on"]
    secret.path.chmod(0o600)
    agent.configure(str(secret), str(readable))
    agent.refresh()
    agent.wait_open(secret)
    secret.append(syslog_line("no secret any more"))
    assert descriptions(agent.wait_events(2))[1] == "no secret any more"
    assert agent.stop() == 0


def test_a_sink_that_cannot_be_written_is_retried_and_nothing_is_dropped(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.sink = agent.directory / "not-yet" / "events.jsonl"
    agent.start()
    log.append("".join(syslog_line(f"number {i}") for i in range(5000)))  # more than the queue holds
    agent.wait_trace(
        f"Error delivering events to {agent.sink}: open failed: No such file or directory. "
        "Trying again."
    )
    log.append("".join(syslog_line(f"number {i}") for i in range(5000, 5100)))
    agent.sink.parent.mkdir()
    agent.wait_trace(f"Sink {agent.sink} takes events again.")
    assert descriptions(agent.wait_events(5100)) == [f"number {i}" for i in range(5100)]
    assert agent.stop() == 0
    assert len(agent.events()) == 5100


def test_a_sink_that_is_full_all_along_does_not_hold_up_the_stop(agent):
    log = agent.log(fields=";Y ;S")
    agent.situation(log=log)
    agent.sink = Path("/dev/full")
    agent.environment["AGENT_DEBUG_LOG"] = str(agent.directory / "debug.log")
    agent.history = {"enabled": False}
    agent.start()
    log.append("".join(syslog_line(f"number {i}") for i in range(5000)))
    agent.wait_trace("Error delivering events to /dev/full: write failed: No space left on device.")
    agent.wait_debug_records(2048)  # the queue is full, and the log waits for room
    assert agent.stop() == 0
    assert agent.trace("zrmagent: 2048 events were not delivered to /dev/full")


def test_a_sink_file_that_is_moved_away_is_opened_anew(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.sink = agent.directory / "events.jsonl"
    agent.start()
    log.append(syslog_line("first"))
    assert descriptions(agent.wait_events(1)) == ["first"]
    moved = agent.directory / "events.1"
    agent.sink.rename(moved)
    count = 0

    def made_anew():  # the path is looked at once a second, before a delivery
        nonlocal count
        count += 1
        log.append(syslog_line(f"later {count}"))
        time.sleep(0.2)
        return agent.sink.exists()

    wait_until(made_anew, "a new file")
    wait_until(lambda: f'"later {count}"' in agent.sink.read_text(), "the last event")
    assert agent.stop() == 0
    everything = moved.read_bytes() + agent.sink.read_bytes()
    assert descriptions(map(json.loads, everything.splitlines())) == [
        "first",
        *(f"later {i}" for i in range(1, count + 1)),
    ]


def test_a_reader_of_standard_output_that_goes_away_does_not_end_the_agent(agent):
    log = agent.log()
    agent.situation(log=log)
    reading, writing = os.pipe()
    agent.start(stdout=writing)
    os.close(writing)
    os.close(reading)
    log.append(syslog_line("nobody listens"))
    agent.wait_trace("Broken pipe")
    assert agent.stop() == 0


def test_closed_standard_streams_are_not_reused(agent):
    """The files that the agent opens must not get the numbers of its standard streams."""
    log = agent.log()
    agent.situation(log=log)
    debug = agent.directory / "debug.log"
    agent.agent_keys["debug_log"] = str(debug)
    output = agent.directory / "events.jsonl"
    agent.more_sinks = [{"type": "jsonl", "path": str(output)}]
    trace = agent.directory / "trace"
    agent.start(
        "--trace-file",
        str(trace),
        wait=False,
        wrapper=["sh", "-c", 'exec "$0" "$@" 0<&- 1>&- 2>&-'],
    )
    wait_until(lambda: trace.exists() and "signal sent" in trace.read_text(), "the start")
    opened = lambda: any(
        os.path.realpath(link) == str(log) for link in Path(f"/proc/{agent.process.pid}/fd").iterdir()
    )
    wait_until(opened, "the open log")
    streams = [os.readlink(f"/proc/{agent.process.pid}/fd/{number}") for number in range(3)]
    assert streams == ["/dev/null"] * 3
    log.append(syslog_line("nobody listens"))
    wait_until(lambda: "events to standard output: write failed" in trace.read_text(), "the failure")
    assert agent.stop() == 0
    assert len(output.read_text().splitlines()) == 1
