"""Events become messages of a real system logger, over TCP and UDP."""

import json
import os
import subprocess

import pytest

from conftest import PATIENCE, syslog_line, wait_until
from receiver import free_port

# What rsyslogd makes of each message, one JSON object per line.
CONFIGURATION = """\
global(workDirectory="{directory}")
module(load="{module}")
module(load="mmpstrucdata")
input(type="{module}" address="127.0.0.1" port="{port}")
template(name="parsed" type="list" option.jsonf="on") {{
  property(outname="priority" name="pri" format="jsonf")
  property(outname="time" name="timereported" dateFormat="rfc3339" format="jsonf")
  property(outname="host" name="hostname" format="jsonf")
  property(outname="application" name="app-name" format="jsonf")
  property(outname="process" name="procid" format="jsonf")
  property(outname="message_id" name="msgid" format="jsonf")
  property(outname="id" name="$!rfc5424-sd!zrm@32473!id" format="jsonf")
  property(outname="situation" name="$!rfc5424-sd!zrm@32473!situation" format="jsonf")
  property(outname="severity" name="$!rfc5424-sd!zrm@32473!severity" format="jsonf")
  property(outname="log" name="$!rfc5424-sd!zrm@32473!log" format="jsonf")
  property(outname="text" name="msg" format="jsonf")
}}
action(type="mmpstrucdata")
action(type="omfile" file="{output}" template="parsed")
"""


class SystemLogger:
    """rsyslogd in the foreground, listening on its own port."""

    def __init__(self, directory, transport):
        self.directory = directory
        self.module = {"tcp": "imptcp", "udp": "imudp"}[transport]
        self.port = free_port()
        self.output = directory / "output"
        self.configuration = directory / "rsyslog.conf"
        self.configuration.write_text(CONFIGURATION.format(**vars(self)))
        self.process = None

    def start(self):
        self.process = subprocess.Popen(
            ["rsyslogd", "-n", "-f", self.configuration, "-i", self.directory / "pid"],
            stdin=subprocess.DEVNULL,
            stdout=subprocess.DEVNULL,
            stderr=open(self.directory / "stderr", "ab"),
            env={**os.environ, "PATH": os.environ["PATH"] + ":/usr/sbin:/sbin"},
        )
        wait_until(self.listens, lambda: (self.directory / "stderr").read_text())

    def listens(self):
        """Whether the port is in the system's lists of sockets."""
        wanted = f"0100007F:{self.port:04X}"
        for name in ("tcp", "udp"):
            for line in open(f"/proc/net/{name}", encoding="ascii"):
                fields = line.split()
                if fields[1] == wanted and fields[2] == "00000000:0000":
                    return True
        return False

    def messages(self):
        if not self.output.exists():
            return []
        lines = self.output.read_bytes().split(b"\n")[:-1]
        return [json.loads(line) for line in lines]

    def texts(self):
        return [message["text"].removeprefix("\ufeff") for message in self.messages()]

    def stop(self):
        if self.process is not None:
            self.process.terminate()
            self.process.wait(PATIENCE)
            self.process = None


@pytest.fixture
def loggers(tmp_path):
    made = []

    def make(transport):
        made.append(SystemLogger(tmp_path, transport))
        return made[-1]

    yield make
    for logger in made:
        logger.stop()


def wait_for(logger, count, agent):
    return wait_until(
        lambda: logger.messages() if len(logger.messages()) >= count else None,
        lambda: f"{count} messages; there are {len(logger.messages())}: "
        + agent.stderr.text()[-2000:],
    )


@pytest.mark.parametrize("transport", ["tcp", "udp"])
def test_a_message_says_what_the_event_says(agent, loggers, transport):
    logger = loggers(transport)
    logger.start()
    log = agent.log()
    agent.situation('quo"ted]', log=log, severity="major")
    agent.more_sinks.append(
        {
            "type": "syslog",
            "address": f"127.0.0.1:{logger.port}",
            "transport": transport,
            "facility": "local3",
        }
    )
    agent.start()
    log.append(syslog_line("plain text") + syslog_line("na\u00efve \U0001f600"))
    first, second = wait_for(logger, 2, agent)
    event = agent.wait_events(2)[0]
    assert first["priority"] == str(19 * 8 + 3)
    assert first["time"] == event["raised"]
    assert first["host"] == event["row"]["ORIGINNODE"].rpartition(":")[0]
    assert first["application"] == "zrmagent"
    assert first["process"] == str(agent.process.pid)
    assert first["message_id"] == "event"
    assert first["id"] == str(event["id"])
    assert first["situation"] == 'quo"ted]'
    assert first["severity"] == "major"
    assert first["log"] == str(log)
    assert first["text"] == "plain text"
    assert second["text"] == "\ufeffna\u00efve \U0001f600"
    assert agent.stop() == 0


def test_a_restarted_logger_gets_every_message_in_order(agent, loggers):
    """At least once: what was being sent when the connection broke may arrive again."""
    logger = loggers("tcp")
    logger.start()
    log = agent.log()
    agent.situation(log=log)
    agent.more_sinks.append({"type": "syslog", "address": f"127.0.0.1:{logger.port}"})
    agent.start()
    for turn in range(3):
        for number in range(20):
            log.append(syslog_line(f"turn {turn} entry {number:02}"))
        wait_until(lambda: f"turn {turn} entry 19" in logger.texts(), lambda: str(logger.texts()))
        logger.stop()
        log.append(syslog_line(f"turn {turn} while it is down"))
        agent.wait_events(21 * (turn + 1))
        logger.start()
    wait_until(lambda: "turn 2 while it is down" in logger.texts(), lambda: str(logger.texts()))
    expected = [
        f"turn {turn} {what}"
        for turn in range(3)
        for what in [*(f"entry {number:02}" for number in range(20)), "while it is down"]
    ]
    assert list(dict.fromkeys(logger.texts())) == expected
    assert agent.stop() == 0


def test_messages_wait_for_a_logger_that_is_down(agent, loggers):
    logger = loggers("tcp")
    log = agent.log()
    agent.situation(log=log)
    agent.more_sinks.append(
        {"type": "syslog", "address": f"127.0.0.1:{logger.port}", "name": "far"}
    )
    agent.start()
    log.append("".join(syslog_line(f"entry {number:02}") for number in range(50)))
    agent.wait_events(50)
    agent.wait_trace("Error delivering events to far: connect failed: Connection refused")
    logger.start()
    wait_for(logger, 50, agent)
    assert logger.texts() == [f"entry {number:02}" for number in range(50)]
    agent.wait_trace("Sink far takes events again.")
    assert agent.stop() == 0
