"""Command line, host configuration, start and stop."""

import json
import os
import subprocess
from signal import SIGINT, SIGQUIT, SIGABRT, SIGTERM

import pytest

from conftest import PATIENCE, PROGRAM, descriptions, syslog_line


def run(*arguments, **keys):
    return subprocess.run(
        [PROGRAM, *map(str, arguments)], capture_output=True, text=True, timeout=PATIENCE, **keys
    )


def test_help_names_every_option():
    result = run("--help")
    assert result.returncode == 0
    for option in ("--config", "--trace-file", "--version", "--help"):
        assert option in result.stdout


def test_version_is_the_products():
    result = run("--version")
    assert result.returncode == 0
    assert result.stdout.startswith("zrmagent ")
    assert result.stdout.split()[1][0].isdigit()


@pytest.mark.parametrize(
    "arguments", [("--confg", "x"), ("--config",), ("stray",), ("--trace-file",)]
)
def test_a_bad_command_line_ends_with_status_2_and_names_the_culprit(arguments):
    result = run(*arguments)
    assert result.returncode == 2
    assert arguments[0] in result.stderr


def test_a_missing_host_configuration_ends_with_status_2(tmp_path):
    result = run("--config", tmp_path / "absent.toml")
    assert result.returncode == 2
    assert "absent.toml" in result.stderr


BAD_CONFIGURATIONS = {
    "not TOML": ("[agent\n", ["zrm.toml"]),
    "unknown table": ("[agnet]\n", ["zrm.toml", "agnet"]),
    "unknown key": ('[agent]\nlog_confg = "/x"\n', ["zrm.toml", "log_confg"]),
    "wrong type": ("[agent]\nlog_config = 5\n", ["zrm.toml", "log_config"]),
    "unknown sink": ('[[sink]]\ntype = "pigeon"\n', ["zrm.toml", "pigeon"]),
    "situation without name": ('[[situation]]\nlog = "/x/y"\n', ["zrm.toml", "name"]),
    "duplicate situation": (
        '[[situation]]\nname = "twin"\nlog = "/x/y"\n' * 2,
        ["zrm.toml", "twin"],
    ),
    "unknown column": (
        '[[situation]]\nname = "a"\nlog = "/x/y"\nwhen = ["ENTRYCOLOR = \'x\'"]\n',
        ["zrm.toml", "ENTRYCOLOR"],
    ),
    "unknown operator": (
        '[[situation]]\nname = "a"\nlog = "/x/y"\nwhen = ["ENTRYSRC resembles \'x\'"]\n',
        ["zrm.toml", "resembles"],
    ),
    "bad severity": (
        '[[situation]]\nname = "a"\nlog = "/x/y"\nseverity = "dire"\n',
        ["zrm.toml", "dire"],
    ),
}


@pytest.mark.parametrize("case", BAD_CONFIGURATIONS)
def test_a_bad_host_configuration_ends_with_status_2_and_says_what_is_wrong(tmp_path, case):
    text, named = BAD_CONFIGURATIONS[case]
    path = tmp_path / "zrm.toml"
    path.write_text(text)
    result = run("--config", path)
    assert result.returncode == 2, result.stderr
    for name in named:
        assert name in result.stderr


def test_every_problem_of_a_host_configuration_is_reported_with_its_line_and_cure(tmp_path):
    path = tmp_path / "zrm.toml"
    path.write_text("[agent]\nlog = 5\n[[situation]]\n")
    result = run("--config", path)
    assert (result.returncode, result.stdout) == (2, "")
    assert result.stderr.splitlines() == [
        f"zrmagent: {path}:2: agent.log: unknown key; the keys here are log_config, syslog_conf, "
        "debug_log, max_rows, trace",
        f"zrmagent: {path}:3: situation.name: is missing; give the situation a name",
    ]


def test_the_trace_goes_to_the_file_of_the_command_line(agent):
    log = agent.log()
    agent.situation(log=log)
    path = agent.directory / "trace.log"
    agent.start("--trace-file", str(path), wait=False)
    agent.wait_open(log)
    assert agent.stop() == 0
    assert "Stop signal received." in path.read_text()
    assert "Stop signal received." not in agent.stderr.text()


@pytest.mark.parametrize("number", [SIGTERM, SIGINT])
def test_a_stop_signal_ends_the_agent_with_status_0(agent, number):
    """The server is up by then, so the stop need not wait for it."""
    log = agent.log()
    agent.situation(log=log)
    agent.start()
    assert agent.stop(number) == 0
    assert agent.trace("Stop signal received.")
    assert agent.trace("Log manager terminating framework.")
    assert agent.trace("Shutdown commencing.")
    assert agent.trace(f"Deleting log object for file {log}.")
    assert not agent.trace("Wait for server timed out")


def test_a_stop_right_after_the_start_ends_with_status_0(agent):
    agent.situation(log=agent.log())
    agent.start(wait=False)
    agent.wait_trace("Manager thread waiting for a signal.")
    assert agent.stop() == 0


def test_quit_aborts(agent):
    agent.situation(log=agent.log())
    agent.start()
    assert agent.stop(SIGQUIT) == -SIGABRT
    assert agent.trace("QUIT signal received. Aborting.")


def test_events_read_before_the_stop_are_delivered(agent):
    log = agent.log(fields=";Y ;S")
    agent.situation(log=log)
    agent.environment["AGENT_DEBUG_LOG"] = str(agent.directory / "debug.log")
    reading, writing = os.pipe()
    agent.start(stdout=writing)
    os.close(writing)
    # More than the pipe holds: most events are still waiting for their reader when the agent stops.
    log.append("".join(syslog_line(f"number {i}") for i in range(500)))
    agent.wait_debug_records(500)
    agent.send(SIGTERM)
    with open(reading, "rb") as stream:
        events = [json.loads(line) for line in stream]
    assert agent.wait_end() == 0
    assert descriptions(events) == [f"number {i}" for i in range(500)]


@pytest.mark.slow
def test_without_any_log_the_agent_says_so_and_ends_after_a_minute(agent):
    agent.agent_keys["log_config"] = None
    agent.start(wait=False)
    agent.wait_trace("Agent has no work to do.  Exiting...")
    assert agent.running()
    assert agent.wait_end(seconds=120) == 0
    # Once, in plain words, apart from the trace.
    (words,) = agent.trace("zrmagent: no log to monitor: ")
    assert "set log_config in" in words and "ZRM_CONFIG_FILE" in words
