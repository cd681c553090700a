"""Login accounting logs from outside: records appended with the tool of the tests, reports."""

import subprocess
import sys
import time

import pytest
from api import Api
from conftest import ROOT, wait_until

sys.path.insert(0, str(ROOT / "tests/tools"))
from accounting import record  # noqa: E402

NINE = 1160038980  # 2006-10-05 09:03:00 UTC


@pytest.fixture
def log(agent):
    agent.environment["TZ"] = "UTC0"
    log = agent.log("wtmp", content=record(user="before", when=NINE - 3600), fields=";N ;A")
    agent.situation(log=log)
    return log


def rows(events):
    return [event["row"] for event in events]


def columns(row, *names):
    return tuple(row[name] for name in names)


def test_appended_records_become_events_within_about_a_second(agent, log):
    agent.start()
    begin = time.monotonic()
    log.append(record("root", "ts/1", "pts/1", pid=4711, exit=1, when=NINE))
    events = agent.wait_events(1)
    assert time.monotonic() - begin < 10
    log.append(record("eightlet", "co", "console", pid=-2, type=3, termination=15, when=NINE + 61))
    log.append(record(type=2, line="system boot", when=NINE + 3600) + record(type=12, when=0))
    events = agent.wait_events(4)
    described = [
        columns(row, "ENTRYTIME", "ENTRYSRC", "ENTRYTYPE", "ENTRYDESC") for row in rows(events)
    ]
    assert described == [
        (
            "1061005090300000",
            "pts/1",
            "User process",
            "user = root; id = ts/1; pid = 4711; term status = 0; exit status = 1",
        ),
        (
            "1061005090401000",
            "console",
            "User logon time",
            "user = eightlet; id = co; pid = -2; term status = 15; exit status = 0",
        ),
        (
            "1061005100300000",
            "system boot",
            "System boot time",
            "user = ; id = ; pid = 0; term status = 0; exit status = 0",
        ),
        (
            "0700101000000000",
            "",
            "Unknown",
            "user = ; id = ; pid = 0; term status = 0; exit status = 0",
        ),
    ]
    for row in rows(events):
        assert columns(row, "ENTRYSYS", "ENTRYCLASS", "LOGNAME") == ("", "", "wtmp")
        assert row["UENTRYSRC"] == row["ENTRYSRC"] and row["UENTRYDESC"] == row["ENTRYDESC"]
    assert agent.stop() == 0


def test_the_command_line_of_the_tool_appends_records(agent, log):
    agent.start()
    tool = ROOT / "tests/tools/accounting.py"
    arguments = ["--user", "anna", "--line", "tty1", "--time", str(NINE), "--count", "3"]
    subprocess.run([sys.executable, tool, str(log), *arguments], check=True)
    assert [row["ENTRYSRC"] for row in rows(agent.wait_events(3))] == ["tty1"] * 3


def test_a_partial_record_ends_the_monitor_and_a_refresh_restarts_it(agent, log):
    agent.start()
    log.append(record("whole", when=NINE) + b"x" * 20)
    agent.wait_trace(
        f"Incomplete record read from file {log}. Bytes read = 20; bytes expected = 40"
    )
    assert len(agent.wait_events(1)) == 1
    wait_until(lambda: not agent.is_open(log), "the log to be closed")
    log.append(record("unseen", when=NINE))

    agent.configure(f"{log} ;N ;A")
    agent.refresh()
    agent.wait_open(log)
    log.append(record("after", when=NINE))
    events = agent.wait_events(2)
    assert [row["ENTRYDESC"].split(";")[0] for row in rows(events)] == [
        "user = whole",
        "user = after",
    ]
    assert agent.stop() == 0


def test_many_records_in_one_go_all_arrive_in_order(agent, log):
    agent.start()
    count = 20000
    log.append(b"".join(record(f"u{i}", when=NINE + i) for i in range(count)))
    users = [row["ENTRYDESC"].split(";")[0] for row in rows(agent.wait_events(count))]
    assert users == [f"user = u{i}" for i in range(count)]
    assert agent.stop() == 0


def test_a_report_reads_the_log_backwards_within_its_window(agent, log):
    agent.listen = "127.0.0.1:0"
    log.path.write_bytes(b"".join(record(f"u{i}", when=NINE + 60 * i) for i in range(1000)))
    agent.start()
    answer = Api(agent).report(log, "2006-10-05T09:05:00Z", "2006-10-05T09:08:00Z")
    users = [row["ENTRYDESC"].split(";")[0] for row in answer["rows"]]
    assert users == ["user = u5", "user = u4", "user = u3", "user = u2"]
    assert agent.stop() == 0
