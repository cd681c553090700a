"""Logs of type "command": the lines that a command prints."""

import time

import pytest
from api import Api
from conftest import descriptions, wait_until
from test_ledger import ledger_of
from test_log_warnings import zrmctl


@pytest.fixture
def runner(agent):
    """An agent that runs a command, not yet started."""
    agent.agent_keys["log_config"] = None
    agent.listen = "127.0.0.1:0"

    def start(command, **keys):
        agent.tables.append({"type": "command", "command": command, **keys})
        agent.situation()
        agent.start()
        agent.api = Api(agent)
        return agent

    return start


def is_alive(process):
    try:
        return open(f"/proc/{process}/stat", encoding="ascii").read().split()[2] != "Z"
    except FileNotFoundError:
        return False


def test_each_line_is_an_entry_of_the_present(runner):
    agent = runner(["sh", "-c", "echo one; echo 'two  2'; exec sleep 1000"], name="kernel")
    events = agent.wait_events(2)
    assert descriptions(events) == ["one", "two  2"]
    row = events[0]["row"]
    assert (row["LOGPATH"], row["LOGNAME"]) == ("", "kernel")
    now = time.strftime("1%y%m%d%H%M%S000", time.localtime())
    assert abs(int(row["ENTRYTIME"]) - int(now)) < 100 * 1000
    assert agent.stop() == 0


def test_a_command_that_ends_is_started_again_and_its_state_says_why(runner):
    agent = runner("echo line; echo 'no such device' >&2; exit 3")
    agent.wait_events(1)

    def problem():
        return ledger_of(agent, "echo")["follow"]["problem"]

    wait_until(problem, "the state of the log")
    assert problem() == "the command ended with status 3, after 'no such device', and is started again"
    agent.wait_events(2)
    assert len(agent.trace("no such device")) >= 1
    assert agent.stop() == 0


def test_format_takes_the_lines_apart(runner):
    agent = runner(
        ["sh", "-c", "echo '2026-01-02 03:04:05 ERROR disk full'; echo none; exec sleep 1000"],
        format=r"(?P<time>\S+ \S+) (?P<type>[A-Z]+) (?P<description>.*)",
    )
    (event,) = agent.wait_events(1)
    row = event["row"]
    assert (row["ENTRYTIME"], row["ENTRYTYPE"], row["ENTRYDESC"]) == ("1260102030405000", "ERROR", "disk full")
    wait_until(lambda: ledger_of(agent, "sh")["format_errors"] == 1, "the line that does not fit")
    assert agent.stop() == 0


def test_it_ends_with_its_group_at_a_stop_and_when_it_is_removed(runner):
    agent = runner(["sh", "-c", "trap '' TERM; sleep 1000 & echo $!; echo $$; wait"])
    processes = [int(text) for text in descriptions(agent.wait_events(2))]
    assert all(is_alive(process) for process in processes)
    agent.tables[0]["command"] = ["sh", "-c", "sleep 1000 & echo $!; wait"]
    agent.reload()
    processes.append(int(descriptions(agent.wait_events(3))[2]))
    wait_until(lambda: not any(is_alive(process) for process in processes[:2]), "the end of the first command")
    assert is_alive(processes[2])
    begun = time.monotonic()
    assert agent.stop() == 0
    assert time.monotonic() - begun < 30
    wait_until(lambda: not is_alive(processes[2]), "the end of the second command")


def test_a_flood_disturbs_no_stop(runner):
    agent = runner("yes", name="flood")
    agent.wait_events(1000)
    assert agent.stop() == 0


def test_nothing_of_the_agent_is_inherited(runner):
    agent = runner("grep SigBlk /proc/self/status; ls /proc/self/fd | tr '\\n' ' '; echo; exec sleep 1000")
    texts = descriptions(agent.wait_events(2))
    assert texts == ["SigBlk:\t0000000000000000", "0 1 2 3"]
    assert agent.stop() == 0


def test_the_client_shows_no_file_of_a_command(runner):
    agent = runner(["sh", "-c", "echo one; exec sleep 1000"], name="kernel")
    agent.wait_events(1)
    (line,) = zrmctl(agent, "logs").stdout.splitlines()[1:]
    assert line.split()[:3] == ["kernel", "command", "Running"] and "no file" not in line
    told = zrmctl(agent, "logs", "kernel").stdout
    assert "following" in told and "generation" not in told and "no file" not in told
