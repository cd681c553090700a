"""Logs of type "command": the lines that a command prints."""

import os
import time
from signal import SIGKILL

import pytest
from api import Api
from conftest import ROOT, descriptions, syslog_line, wait_until
from test_ledger import ledger_of
from test_log_warnings import zrmctl


@pytest.fixture
def runner(agent):
    """An agent that runs a command, not yet started."""
    agent.agent_keys["log_config"] = None
    agent.listen = "127.0.0.1:0"
    agent.formats = ROOT / "formats"

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


def test_the_ledger_says_why_a_line_does_not_fit(runner):
    command = ["sh", "-c", 'echo "no object"; echo \'{"msg":"fits"}\'; exec sleep 1000']
    agent = runner(command, name="app", format="json")
    assert descriptions(agent.wait_events(1)) == ["fits"]
    (rejected,) = wait_until(lambda: ledger_of(agent, "app")["rejected"], "the rejected line")
    assert (rejected["line"], rejected["reason"]) == ("no object", "It is not a JSON object.")


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


def resident(agent):
    """Resident memory in MB."""
    lines = open(f"/proc/{agent.process.pid}/status", encoding="ascii").read().splitlines()
    return next(int(line.split()[1]) for line in lines if line.startswith("VmRSS")) / 1024


@pytest.mark.parametrize("flood", ["yes 'some line of a flood'", "cat /dev/zero", "yes >&2", "yes | tr -d '\\n'"])
def test_a_flood_costs_no_memory_and_disturbs_no_other_log(runner, flood):
    agent = runner(f"echo begun; {flood}", name="flood")
    log = agent.directory / "app.log"
    log.write_text("")
    agent.situations[0]["when"] = ["ENTRYDESC starts 'hit'"]
    agent.follow(log)
    agent.reload()
    agent.wait_open(log)
    before = resident(agent)
    for number in range(1, 4):
        time.sleep(0.7)  # of flood
        with open(log, "a", encoding="ascii") as stream:
            stream.write(syslog_line(f"hit {number}"))
        wait_until(lambda: descriptions(agent.events())[-1:] == [f"hit {number}"], "the other log's event")
    assert resident(agent) < before + 50
    assert agent.stop() == 0


def test_a_command_that_never_writes_is_waited_for(runner):
    agent = runner(["sleep", "1000"], name="silent")
    wait_until(lambda: ledger_of(agent, "silent")["follow"]["state"] == "reading", "the log to be read")
    children = f"/proc/{agent.process.pid}/task"
    (process,) = {
        int(child)
        for task in os.listdir(children)
        for child in open(f"{children}/{task}/children", encoding="ascii").read().split()
    }
    assert is_alive(process) and ledger_of(agent, "silent")["follow"]["problem"] is None
    assert agent.stop() == 0
    wait_until(lambda: not is_alive(process), "the end of the command")


def test_a_command_that_closes_its_output_is_ended_and_started_again(runner):
    agent = runner("echo $$; exec >&-; exec sleep 1000", name="closed")
    first, second = (int(text) for text in descriptions(agent.wait_events(2))[:2])
    wait_until(lambda: not is_alive(first), "the end of the first run")
    assert agent.trace("the command has closed its output and gone on, so it was ended, and is started again")
    assert agent.stop() == 0
    wait_until(lambda: not is_alive(second), "the end of the second run")


def test_what_a_command_has_forked_ends_with_it_and_what_left_it_is_not_waited_for(runner):
    agent = runner(
        "for number in $(seq 50); do sleep 1000 & echo $!; done; mark=$(mktemp); "
        "setsid --fork sh -c \"echo left \\$\\$; rm $mark; exec sleep 1000\"; "
        "while [ -e $mark ]; do sleep 0.01; done; exit 5",
        name="forks",
    )
    texts = descriptions(agent.wait_events(102))  # of two runs
    assert agent.trace("the command ended with status 5, and is started again")
    children = [int(text) for text in texts[:50]]
    wait_until(lambda: not any(is_alive(child) for child in children), "the end of the children")
    left = [int(text.split()[1]) for text in texts if text.startswith("left")]
    assert all(is_alive(process) for process in left), "they have a group of their own"
    assert agent.stop() == 0
    for text in descriptions(agent.events()):
        if text.startswith("left"):
            os.kill(int(text.split()[1]), SIGKILL)


def test_lines_of_a_command_are_joined_to_entries(runner):
    trace = "java.lang.IllegalStateException: broken\n\tat a.b\n\tat c.d"
    agent = runner(
        ["sh", "-c", "printf '%s\n' \"$1\" next; sleep 0.1; printf ' last\n'; exec sleep 1000", "sh", trace],
        entry={"indented": True, "wait": "1s"},
    )
    events = agent.wait_events(2)
    assert [event["entry"] for event in events] == [trace, "next\n last"]
    assert agent.stop() == 0


def test_ready_formats_take_the_lines_of_a_command_apart(runner):
    line = '{"time":"2026-01-02T03:04:05Z","level":"ERROR","msg":"disk full","disk":{"free":5}}'
    agent = runner(["sh", "-c", 'echo "$1"; echo none; exec sleep 1000', "sh", line], format="json", keep=["disk.free"])
    (event,) = agent.wait_events(1)
    assert (event["row"]["ENTRYTYPE"], event["row"]["ENTRYDESC"]) == ("ERROR", "disk full")
    assert event["fields"] == {"disk.free": "5"}
    wait_until(lambda: ledger_of(agent, "sh")["format_errors"] == 1, "the line that does not fit")
    assert agent.stop() == 0


def test_an_event_of_a_command_is_explained_by_what_it_kept(runner):
    agent = runner(["sh", "-c", "echo 'user=anna port=5'; exec sleep 1000"], name="pairs", format=r"(?P<description>.*)",
                   pairs=True, keep=["port"])
    (event,) = agent.wait_events(1)
    body = {"event": event["id"], "definition": {"when": ["field.port = 5"]}}
    status, _, answer = agent.api.request("POST", "/api/v1/explain", body)
    (one,) = answer["explanations"]
    assert status == 200 and one["raised"] and one["line"] == "user=anna port=5"
    assert answer["reason"] == "what a command has printed cannot be read again"
    status, _, answer = agent.api.request("POST", "/api/v1/explain", {"situation": "every-entry", "log": "pairs", "last": 1})
    assert status == 409 and answer["detail"].startswith("what a command has printed cannot be read again")
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
    assert agent.stop() == 0
