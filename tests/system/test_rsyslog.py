"""A real system logger writes what real programs send."""

import os
import subprocess
import tempfile
import time
from pathlib import Path

import pytest

from conftest import PATIENCE, wait_until

CONFIGURATION = """\
module(load="imuxsock" SysSock.Use="off")
input(type="imuxsock" Socket="{socket}")
global(workDirectory="{directory}")
auth,authpriv.* action(type="omfile" file="{auth}" template="RSYSLOG_TraditionalFileFormat")
*.* action(type="omfile" file="{all}" template="RSYSLOG_TraditionalFileFormat")
*.* action(type="omfile" file="{iso}" template="RSYSLOG_FileFormat")
"""


class SystemLogger:
    """rsyslogd in the foreground, with its own configuration and socket."""

    def __init__(self, directory):
        self.directory = Path(directory)
        self.socket = self.directory / "log"
        self.auth = self.directory / "auth.log"
        self.all = self.directory / "syslog"
        self.iso = self.directory / "iso"
        for path in (self.auth, self.all, self.iso):
            path.write_text("Jan  1 00:00:00 web1 old: before the start\n")
        configuration = self.directory / "rsyslog.conf"
        configuration.write_text(CONFIGURATION.format(**vars(self)))
        self.process = subprocess.Popen(
            ["rsyslogd", "-n", "-f", str(configuration), "-i", str(self.directory / "pid")],
            stdin=subprocess.DEVNULL,
            stdout=subprocess.DEVNULL,
            stderr=open(self.directory / "stderr", "wb"),
            env={**os.environ, "PATH": os.environ["PATH"] + ":/usr/sbin:/sbin"},
        )
        wait_until(self.socket.exists, lambda: (self.directory / "stderr").read_text())

    def send(self, tag, priority, message):
        subprocess.run(
            ["logger", "-u", str(self.socket), "-t", tag, "-p", priority, "--", message],
            check=True,
        )

    def stop(self):
        self.process.terminate()
        self.process.wait(PATIENCE)


@pytest.fixture
def system_logger():
    # A socket's path must be short: not below pytest's long directories.
    with tempfile.TemporaryDirectory(prefix="zrm-") as directory:
        logger = SystemLogger(directory)
        yield logger
        logger.stop()


def test_what_programs_log_becomes_events(agent, system_logger):
    agent.configure(str(system_logger.auth), f"{system_logger.all} ;N ;S")
    agent.situation(
        "failed-login",
        log=system_logger.auth,
        when=["ENTRYSRC starts 'sshd'", "ENTRYDESC contains 'Failed password'"],
        severity="warning",
    )
    agent.situation("everything", log=system_logger.all)
    agent.start()
    system_logger.send("sshd[77]", "auth.info", "Failed password for root from 203.0.113.7")
    system_logger.send("sshd[77]", "auth.info", "Accepted publickey for operator")
    system_logger.send("backup", "daemon.notice", "done: 3 files")
    events = agent.wait_events(4)
    assert agent.stop() == 0
    failed = [e["row"] for e in events if e["situation"] == "failed-login"]
    every = [e["row"] for e in events if e["situation"] == "everything"]
    assert [(row["ENTRYSRC"], row["ENTRYDESC"]) for row in failed] == [
        ("sshd[77]", "Failed password for root from 203.0.113.7")
    ]
    assert [(row["ENTRYSRC"], row["ENTRYDESC"]) for row in every] == [
        ("sshd[77]", "Failed password for root from 203.0.113.7"),
        ("sshd[77]", "Accepted publickey for operator"),
        ("backup", "done: 3 files"),
    ]
    assert all(len(row["ENTRYTIME"]) == 16 and row["ENTRYSYS"] for row in every)
    assert len(events) == 4


def test_a_followed_log_of_iso_times_needs_no_layout(agent, system_logger):
    agent.follow(system_logger.iso, start="beginning")
    agent.situation(log=system_logger.iso)
    agent.start()
    before = time.strftime("%m%d%H%M%S")
    system_logger.send("sshd[77]", "auth.info", "Failed password for root from 203.0.113.7")
    _, event = agent.wait_events(2)  # the first was there before the start
    row = event["row"]
    assert (row["ENTRYSRC"], row["ENTRYDESC"]) == (
        "sshd[77]",
        "Failed password for root from 203.0.113.7",
    )
    assert row["ENTRYSYS"]
    assert before <= row["ENTRYTIME"][3:13] <= time.strftime("%m%d%H%M%S")
    assert agent.stop() == 0
