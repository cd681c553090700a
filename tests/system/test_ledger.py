"""What the monitor of a log has read and what it has skipped, as the API reports it."""

import os

import pytest
from api import Api
from conftest import syslog_line, wait_until

FORMAT = ' ;N ;U ;A , "%d %[^\\n]" , day description'


@pytest.fixture
def serving(agent):
    agent.listen = "127.0.0.1:0"
    agent.syslog = agent.log("sys.log")
    agent.user = agent.log("user.log", b"", FORMAT)
    agent.start()
    agent.wait_open(agent.syslog.path)
    agent.wait_open(agent.user.path)
    agent.api = Api(agent)
    return agent


def ledger_of(agent, log):
    status, _, answer = agent.api.request("GET", f"/api/v1/logs?log={log}")
    assert status == 200, answer
    return answer["logs"][0]["ledger"]


def test_a_new_ledger_is_empty(serving):
    assert ledger_of(serving, serving.syslog) == {
        "bytes_read": 0,
        "lines": 0,
        "rows": 0,
        "format_errors": 0,
        "percent_parsed": None,
        "without_time": 0,
        "truncations": 0,
        "skipped_bytes": 0,
        "restarts": 0,
        "last_entry": None,
        "follow": None,
        "warnings": [],
        "rejected": [],
        "shapes": [],
        "skipped": [],
    }


def test_it_counts_what_is_read_and_says_why_lines_do_not_fit(serving):
    lines = b"1 one\nnone\n2 two\n\n"
    serving.user.append(lines)
    wait_until(lambda: ledger_of(serving, serving.user)["bytes_read"] == len(lines), "the bytes")
    ledger = ledger_of(serving, serving.user)
    assert (ledger["lines"], ledger["rows"], ledger["format_errors"]) == (4, 2, 2)
    assert [(each["line"], each["reason"]) for each in ledger["rejected"]] == [
        ("none", "A number for %d is expected here."),
        ("", "A line without text is skipped."),
    ]
    assert ledger["percent_parsed"] == 50.0
    assert ledger["shapes"] == [{"shape": "a", "count": 1}]
    assert ledger["rejected"][0]["time"].endswith("Z")
    assert ledger["last_entry"] >= ledger["rejected"][0]["time"][:19]


def test_all_logs_at_once_come_without_samples(serving):
    serving.user.append(b"none\n")
    wait_until(lambda: ledger_of(serving, serving.user)["format_errors"] == 1, "the error")
    status, _, answer = serving.api.request("GET", "/api/v1/logs")
    assert status == 200
    ledgers = {log["log"]: log["ledger"] for log in answer["logs"]}
    assert set(ledgers) == {str(serving.syslog), str(serving.user)}
    assert ledgers[str(serving.user)]["format_errors"] == 1
    assert all("rejected" not in ledger and "skipped" not in ledger for ledger in ledgers.values())


def test_a_truncation_shows_the_bytes_that_it_skipped(serving):
    serving.syslog.append(syslog_line("one"))
    wait_until(lambda: ledger_of(serving, serving.syslog)["lines"] == 1, "the line")
    os.truncate(serving.syslog.path, 10)
    wait_until(lambda: ledger_of(serving, serving.syslog)["truncations"] == 1, "the truncation")
    ledger = ledger_of(serving, serving.syslog)
    assert ledger["skipped_bytes"] == 10
    assert without_times(ledger["skipped"]) == [
        {"from": 0, "to": 10, "unread": None, "regrown": False}
    ]


def without_times(ranges):
    assert all(each.pop("time").endswith("Z") for each in ranges)
    return ranges


def test_a_rotation_by_copying_shows_what_was_lost(serving):
    log = serving.syslog
    log.append(syslog_line("read"))
    wait_until(lambda: ledger_of(serving, log)["lines"] == 1, "the line")
    unread = syslog_line("written before the truncation").encode()
    copy = log.path.with_name(log.path.name + ".1")
    copy.write_bytes(log.path.read_bytes() + unread)
    os.truncate(log.path, 0)
    wait_until(lambda: ledger_of(serving, log)["truncations"] == 1, "the truncation")
    ledger = ledger_of(serving, log)
    assert ledger["skipped_bytes"] == len(unread)
    assert without_times(ledger["skipped"]) == [
        {"from": 0, "to": 0, "unread": len(unread), "regrown": False}
    ]


def test_a_truncation_between_two_polls_is_noticed(serving):
    log = serving.syslog
    log.append(syslog_line("read"))
    wait_until(lambda: ledger_of(serving, log)["lines"] == 1, "the line")
    size = log.path.stat().st_size
    # Shorter and longer again between two polls: the agent never sees the file short.
    with open(log.path, "r+b", buffering=0) as stream:
        stream.write("".join(syslog_line(f"new {n}") for n in range(100)).encode())
    wait_until(lambda: ledger_of(serving, log)["truncations"] == 1, "the truncation")
    assert serving.trace("truncated") == []
    ledger = ledger_of(serving, log)
    assert ledger["skipped_bytes"] == size
    assert without_times(ledger["skipped"]) == [
        {"from": 0, "to": size, "unread": None, "regrown": True}
    ]


def test_rows_without_a_time_are_counted(serving):
    serving.syslog.append(syslog_line("one") + "2026-11-20T07:03:09.412000+01:00 web1 cron[1]: two\n")
    wait_until(lambda: ledger_of(serving, serving.syslog)["lines"] == 2, "the lines")
    assert ledger_of(serving, serving.syslog)["without_time"] == 1


def test_a_ledger_lasts_through_refreshes_that_keep_the_log(serving):
    serving.user.append(b"1 one\nnone\n")
    wait_until(lambda: ledger_of(serving, serving.user)["bytes_read"] == 11, "the bytes")
    kept = ledger_of(serving, serving.user)
    other = serving.log("other.log")
    serving.configure(
        f"{serving.user} ;Y{FORMAT.removeprefix(' ;N')}", f"{other}", append=False
    )
    serving.refresh()
    wait_until(lambda: str(other) in logs_of(serving), "the refresh")
    assert ledger_of(serving, serving.user) == kept
    # A log with another format gets another monitor.
    serving.configure(f'{serving.user} ;N ;U ;A , "%s" , type', append=False)
    serving.refresh()
    wait_until(lambda: ledger_of(serving, serving.user)["lines"] == 0, "the new monitor")


def logs_of(agent):
    return [log["log"] for log in agent.api.request("GET", "/api/v1/logs")[2]["logs"]]


def test_ledgers_are_read_while_refreshes_run(serving):
    for turn in range(20):
        fields = FORMAT if turn % 2 else ""
        serving.configure(f"{serving.user}{fields}", f"{serving.syslog}", append=False)
        os.utime(serving.directory / "logs.conf", (turn + 1, turn + 1))
        serving.refresh()
        for _ in range(20):
            assert len(logs_of(serving)) == 2
    assert serving.running()
