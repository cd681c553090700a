"""The standalone host from outside: configuration, live situations, sinks, ends."""

import os
import subprocess
import time
from signal import SIGINT, SIGTERM

from conftest import PROGRAM, descriptions, syslog_line, wait_until


def run(*arguments):
    return subprocess.run(
        [PROGRAM, *arguments], stdin=subprocess.DEVNULL, capture_output=True, text=True, timeout=60
    )


def test_help_and_version():
    assert run("--version").stdout.startswith("zrmagent ")
    result = run("--help")
    assert result.returncode == 0
    assert "--config FILE" in result.stdout


def test_an_unusable_command_line_or_configuration_ends_with_status_2(tmp_path):
    result = run("--frob")
    assert (result.returncode, result.stderr) == (
        2,
        "zrmagent: unknown argument '--frob'; zrmagent --help lists the arguments\n",
    )
    config = tmp_path / "zrm.toml"
    config.write_text("[agent]\nlog = 5\n[[situation]]\n")
    result = run("--config", str(config))
    assert result.returncode == 2
    assert result.stdout == ""
    assert result.stderr.splitlines() == [
        f"zrmagent: {config}:2: agent.log: unknown key; the keys here are log_config, "
        "syslog_conf, debug_log, max_rows, trace",
        f"zrmagent: {config}:3: situation.name: is missing; give the situation a name",
    ]


def test_events_arrive_promptly_and_in_order(agent):
    log = agent.log()
    agent.situation("every", log)
    agent.situation("some", log, ["ENTRYDESC contains 'x'"], severity="critical")
    agent.start()
    log.append("".join(syslog_line(f"{n} {'x' if n % 10 == 0 else '-'}") for n in range(1000)))
    events = agent.wait_events(1100)
    assert [event["id"] for event in events] == list(range(1, 1101))
    for name, count in (("every", 1000), ("some", 100)):
        numbers = [
            int(event["row"]["ENTRYDESC"].split()[0])
            for event in events
            if event["situation"] == name
        ]
        assert numbers == sorted(numbers) and len(numbers) == count
    assert {event["severity"] for event in events} == {"info", "critical"}
    assert agent.stop() == 0


def test_a_threshold_is_counted_over_its_period(agent):
    log = agent.log()
    agent.situation("three", log, ["ENTRYSRC = 'sshd'"], frequency=">= 3", period="1h")
    agent.start()
    log.append("".join(syslog_line(f"n{n}", source="sshd") for n in range(4)))
    events = agent.wait_events(2)
    assert descriptions(events) == ["n2", "n3"]
    assert [event["row"]["FREQTHRESH"] for event in events] == [3, 4]
    assert agent.stop() == 0


def test_situations_change_without_a_restart(agent):
    log = agent.log()
    agent.situation("before", log)
    agent.start()
    log.append(syslog_line("one"))
    assert agent.wait_events(1)[0]["situation"] == "before"
    agent.situations.clear()
    agent.situation("after", log)
    agent._write_toml()

    def changed():
        log.append(syslog_line("two"))
        time.sleep(0.5)
        return agent.events()[-1]["situation"] == "after"

    wait_until(changed, "an event of the new situation")
    agent.zrm_toml.write_text("[broken")
    agent.wait_trace("was not taken over; the situations go on as they were")
    count = len(agent.events())
    log.append(syslog_line("three"))
    assert agent.wait_events(count + 1)[-1]["situation"] == "after"
    assert agent.stop() == 0


def test_a_sink_file_that_was_moved_away_is_made_anew(agent):
    log = agent.log()
    agent.situation("every", log)
    agent.sink = agent.directory / "events.jsonl"
    agent.start()
    log.append(syslog_line("one"))
    agent.wait_events(1)
    moved = agent.directory / "events.jsonl.1"
    os.rename(agent.sink, moved)
    time.sleep(1)  # the path is looked at once a second
    log.append(syslog_line("two"))
    assert descriptions(agent.wait_events(1)) == ["two"]
    assert len(moved.read_text().splitlines()) == 1
    assert agent.stop() == 0


def test_a_sink_that_was_down_gets_everything_in_order(agent):
    log = agent.log()
    agent.situation("every", log)
    agent.sink = agent.directory / "later" / "events.jsonl"
    agent.start()
    log.append("".join(syslog_line(f"entry {n}") for n in range(5000)))  # more than the queue holds
    agent.wait_trace("Trying again.")
    agent.sink.parent.mkdir()
    events = agent.wait_events(5000)
    assert descriptions(events) == [f"entry {n}" for n in range(5000)]
    assert agent.stop() == 0


def test_a_stop_delivers_what_is_queued(agent):
    log = agent.log()
    agent.situation("every", log)
    agent.start()
    log.append("".join(syslog_line(f"entry {n}") for n in range(1500)))
    agent.wait_events(1)
    assert agent.stop(SIGINT) == 0
    events = agent.events()
    assert descriptions(events) == [f"entry {n}" for n in range(len(events))]


def test_a_stop_does_not_wait_for_a_dead_sink(agent):
    log = agent.log()
    agent.situation("every", log)
    agent.sink = "/dev/full"
    agent.start()
    log.append("".join(syslog_line(f"entry {n}") for n in range(5000)))
    agent.wait_trace("Trying again.")
    time.sleep(1)  # the queue is full and the log waits
    begin = time.monotonic()
    assert agent.stop(SIGTERM) == 0
    assert time.monotonic() - begin < 30
    assert agent.trace("2048 events were not delivered to /dev/full")


def test_no_log_is_told_once_in_plain_words(agent):
    agent.configure()
    agent.start(wait=False)
    agent.wait_trace("zrmagent: no log to monitor: ")
    time.sleep(2)
    assert len(agent.trace("no log to monitor")) == 1
