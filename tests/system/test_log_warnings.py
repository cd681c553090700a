"""Logs that are monitored without an error but need attention."""

import os
import subprocess
import time

import pytest
from api import Api
from conftest import syslog_line, wait_until
from zrmctl import ZRMCTL

ISO = "2026-11-20T07:03:09.412000+01:00 web1 cron[1]: two\n"


@pytest.fixture
def serving(agent):
    agent.listen = "127.0.0.1:0"
    agent.syslog = agent.log("sys.log", syslog_line("old").encode())
    agent.start()
    agent.wait_open(agent.syslog.path)
    agent.api = Api(agent)
    return agent


def get(agent, path):
    status, _, answer = agent.api.request("GET", path)
    assert status == 200, answer
    return answer


def warnings_of(agent):
    (log,) = get(agent, f"/api/v1/logs?log={agent.syslog}")["logs"]
    assert log["row"]["MONSTATUS"] == "Running"
    return log["ledger"]["warnings"]


def kinds(agent):
    return [warning["kind"] for warning in warnings_of(agent)]


def zrmctl(agent, *arguments):
    told = subprocess.run(
        [ZRMCTL, "--url", f"http://127.0.0.1:{agent.api.port}", "--token-file", agent.api.token_file, *arguments],
        stdout=subprocess.PIPE, stderr=subprocess.PIPE, encoding="utf-8", timeout=60, check=False,
    )
    assert told.returncode == 0, told
    return told


def test_a_rotation_by_renaming_is_reported_everywhere(serving):
    assert warnings_of(serving) == []
    path = serving.syslog.path
    path.rename(path.with_name("sys.log.1"))
    wait_until(lambda: kinds(serving) == ["missing"], "the warning of a missing name")
    serving.syslog.append(syslog_line("of the new file"))
    wait_until(lambda: kinds(serving) == ["replaced"], "the warning of another file")
    (warning,) = warnings_of(serving)
    assert "Another file now has this log's name" in warning["text"] and "copytruncate" in warning["text"]
    assert get(serving, "/api/v1/status")["warnings"] == [{"log": str(path), **warning}]
    assert serving.wait_trace(f"{path}: Another file now has this log's name")
    # A file that the monitor does not read explains nothing.
    status, _, explained = serving.api.request(
        "POST", "/api/v1/explain", {"definition": {"log": str(path)}, "last": 1}
    )
    assert status == 409 and "another file now has its name" in explained["detail"]
    definition = {"log": str(path), "when": ["ENTRYDESC = 'x'"]}
    status, _, explained = serving.api.request(
        "POST", "/api/v1/explain", {"definition": definition, "line": syslog_line("x").rstrip()}
    )
    assert (status, explained["complete"], explained["warnings"]) == (200, False, [warning])
    note = f"zrmctl: {path}: Another file"
    assert note in zrmctl(serving, "status").stderr and note in zrmctl(serving, "logs").stderr
    assert "Running (!)" in zrmctl(serving, "logs").stdout
    assert "Another file now has this log's name" in zrmctl(serving, "logs", str(path)).stdout
    # The file that was opened is back under its name.
    path.with_name("sys.log.1").replace(path)
    wait_until(lambda: kinds(serving) == [], "the end of the warning")


def test_a_syslog_file_without_times(serving):
    serving.syslog.append(ISO)
    wait_until(lambda: kinds(serving) == ["without_time"], "the warning")
    assert warnings_of(serving)[0]["text"].startswith("1 of 1 entries have no time")


def check(agent, *lines):
    config = agent.directory / "checked.conf"
    config.write_text("".join(line + "\n" for line in lines))
    told = subprocess.run([ZRMCTL, "check", str(config)], stdout=subprocess.PIPE, encoding="utf-8", check=False)
    assert told.returncode == 0
    return told.stdout


def test_check_warns_of_files_that_are_not_of_their_type(agent):
    iso = agent.directory / "iso.log"
    iso.write_text(ISO * 3)
    right = agent.directory / "right.log"
    right.write_text(syslog_line("right"))
    wtmp = agent.directory / "wtmp"
    wtmp.write_bytes(b"\x07" + bytes(383))
    assert "None of the file's last lines begins with a time" in check(agent, f"{iso} ;N ;S")
    assert "None of the file's" not in check(agent, f"{right} ;N ;S")
    assert "its size, 384 bytes, is not a multiple of 40" in check(agent, f"{wtmp} ;N ;A")


def test_a_change_that_a_refresh_would_miss_says_what_helps(serving):
    other = serving.directory / "other.log"
    other.write_text("")
    config = serving.directory / "logs.conf"
    seen = config.stat()
    config.write_text(config.read_text() + f"{other} ;N ;S\n")
    os.utime(config, ns=(seen.st_atime_ns, seen.st_mtime_ns))
    (log,) = get(serving, "/api/v1/logs")["unmonitored"]
    assert (log["log"], log["cause"]) == (str(other), "touch")
    assert "Touch the configuration, then refresh." in log["reason"]
    os.utime(config, (time.time() + 10, time.time() + 10))
    (log,) = get(serving, "/api/v1/logs")["unmonitored"]
    assert log["cause"] == "refresh"
    serving.refresh()
    wait_until(lambda: len(get(serving, "/api/v1/logs")["logs"]) == 2, "the refresh")
