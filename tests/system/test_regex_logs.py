"""Logs that regular expressions take apart: an access log with its quotes, rotated; times; fields
of syslog messages."""

import gzip
import time

import pytest
from api import Api
from conftest import Log, descriptions

QUOTED = r'[^"\\]*(?:\\.[^"\\]*)*'
ACCESS = (
    r"(?P<source>\S+) \S+ (?P<user>.+?) \[(?P<time>[^\]]+)\] "
    rf'"(?P<description>{QUOTED})" (?P<type>(?P<status>\d{{3}})) (?P<bytes>\d+|-) '
    rf'"(?P<referer>{QUOTED})" "(?P<agent>{QUOTED})"(?: (?P<request_time>\d+\.\d+))?'
)
COLUMNS = ("ENTRYTIME", "ENTRYSYS", "ENTRYSRC", "ENTRYTYPE", "ENTRYCLASS", "ENTRYDESC")


@pytest.fixture
def log(agent):
    agent.environment["TZ"] = "UTC0"
    log = Log(agent.directory / "access.log")
    log.path.write_text("")
    return log


def access(path, status=200, took=None, user="-", agent="check", second=0):
    end = "" if took is None else f" {took}"
    return (
        f"203.0.113.7 - {user} [19/Nov/2026:10:00:{second:02} +0100] "
        f'"GET {path} HTTP/1.1" {status} 512 "-" "{agent}"{end}\n'
    )


def columns(event):
    return tuple(event["row"].get(name, "") for name in COLUMNS)


def test_an_access_log_with_quotes_and_blanks_through_a_rotation(agent, log):
    agent.follow(log, type="regex", format=ACCESS, start="beginning", rotate_wait="1s", keep=["*"])
    agent.situation(name="slow-5xx", log=log, when=["field.status >= 500", "field.request_time > 1.5"])
    agent.start()
    log.append(access("/fast", 503, 0.25) + access("/fine", 200, 9.5) + access("/untimed", 503))
    log.append(access("/slow", 503, 10.75, user="Anna Berg", agent=r"a \"b\" \\"))
    agent.wait_events(1)
    log.path.rename(log.path.with_suffix(".log.1"))
    log.path.write_text(access(r"/\"quoted\"", 500, 2.0, agent="", second=7))
    log.append('::1 - - [19/Nov/2026:10:00:08 +0100] "" 599 - "-" "-" 2.125\n')
    events = agent.wait_events(3)
    assert agent.stop() == 0
    assert [columns(event) for event in events] == [
        ("1261119090000000", "", "203.0.113.7", "503", "", "GET /slow HTTP/1.1"),
        ("1261119090007000", "", "203.0.113.7", "500", "", r"GET /\"quoted\" HTTP/1.1"),
        ("1261119090008000", "", "::1", "599", "", events[2]["entry"]),
    ]
    assert events[0]["fields"] == {
        "user": "Anna Berg",
        "status": "503",
        "bytes": "512",
        "referer": "-",
        "agent": r"a \"b\" \\",
        "request_time": "10.75",
    }
    assert events[1]["fields"]["agent"] == ""
    assert events[1]["entry"] == access(r"/\"quoted\"", 500, 2.0, agent="", second=7)[:-1]


def test_what_does_not_fit_is_in_the_ledger_with_the_reason(agent, log):
    agent.follow(log, type="regex", format=[r"(?P<time>\d\S+ \S+) (?P<description>.*)", "- (?P<x>.*)"])
    agent.listen = "127.0.0.1:0"
    agent.situation(log=log)
    agent.start()
    agent.wait_open(log)
    log.append("something\n2026-11-19 25:00:05 no such time\n- untimed\n2026-11-19 10:00:05 timed\n")
    events = agent.wait_events(2)
    assert descriptions(events) == ["- untimed", "timed"]
    api = Api(agent)
    status, _, answer = api.request("GET", f"/api/v1/logs?log={log}")
    assert status == 200, answer
    rejected = answer["logs"][0]["ledger"]["rejected"]
    assert [(one["line"], one["reason"]) for one in rejected] == [
        ("something", "It does not match the format."),
        ("2026-11-19 25:00:05 no such time", "Its time is not one that the format reads."),
    ]
    assert agent.stop() == 0


def test_a_report_reads_the_fields_of_older_generations(agent, log):
    agent.listen = "127.0.0.1:0"
    agent.follow(log, type="regex", format=ACCESS)
    agent.start()
    agent.wait_open(log)
    with gzip.open(f"{log}.2.gz", "wt") as stream:
        stream.write("".join(access(f"/old/{number}", 500 + number, 0.5) for number in range(3)))
    log.path.write_text("".join(access(f"/new/{number}", 500 + number, second=9) for number in range(3)))
    body = {
        "log": str(log),
        "from": "2026-11-19",
        "to": "2026-11-20",
        "where": ["field.status >= 501"],
    }
    status, _, answer = Api(agent).request("POST", "/api/v1/reports", body)
    assert status == 200, answer
    assert [row["ENTRYDESC"] for row in answer["rows"]] == [
        f"GET /{path} HTTP/1.1" for path in ("new/2", "new/1", "old/2", "old/1")
    ]
    assert agent.stop() == 0


def test_times_zones_and_texts_of_columns(agent, log):
    agent.follow(
        log,
        type="regex",
        format=r"(?P<type>[IWE]) (?P<time>[^|]*)\| (?P<description>.*)",
        time_format="%d. %B %y, %H Uhr %M",
        timezone="Europe/Berlin",
        start="beginning",
        defaults={"source": "till"},
        **{"values.type": {"W": "WARNING"}},
    )
    agent.situation(log=log)
    agent.start()
    log.append("W 19. November 26, 10 Uhr 05| low on paper\nI 19. July 26, 10 Uhr 05| sold\n")
    events = agent.wait_events(2)
    assert [columns(event) for event in events] == [
        ("1261119090500000", "", "till", "WARNING", "", "low on paper"),
        ("1260719080500000", "", "till", "I", "", "sold"),
    ]
    assert agent.stop() == 0


def test_a_time_of_day_alone_is_of_today_or_yesterday(agent, log):
    agent.listen = "127.0.0.1:0"
    agent.follow(
        log, type="regex", format=r"(?P<time>[\d:.]+) (?P<description>.*)", start="beginning"
    )
    agent.situation(log=log)
    agent.start()
    times = [time.gmtime(time.time() - ago) for ago in (82_000, 7200, 5)]
    log.append("".join(time.strftime("%H:%M:%S.123 it\n", one) for one in times))
    stamps = [time.strftime("1%y%m%d%H%M%S000", one) for one in times]
    assert [event["row"]["ENTRYTIME"] for event in agent.wait_events(3)] == stamps
    begin = time.strftime("%Y-%m-%d", time.gmtime(time.time() - 200_000))
    body = {"log": str(log), "from": begin, "where": ["ENTRYDESC = 'it'"]}
    status, _, answer = Api(agent).request("POST", "/api/v1/reports", body)
    assert status == 200, answer
    assert [row["ENTRYTIME"] for row in answer["rows"]] == stamps[::-1]
    assert agent.stop() == 0


def test_fields_of_syslog_messages(agent, log):
    extract = [
        {
            "source": "sshd*",
            "patterns": [r"Failed password for (?:invalid user )?(?P<user>\S+) from (?P<address>\S+)"],
        }
    ]
    agent.follow(log, type="syslog", extract=extract, start="beginning", keep=["user", "address", "pid"])
    agent.situation(log=log, when=["field.user = 'root'"])
    agent.start()
    head = "2026-11-19T10:00:05+01:00 web1"
    log.append(f"{head} sshd[412]: Failed password for anna from 203.0.113.7 port 40022 ssh2\n")
    log.append(f"{head} cron[412]: Failed password for root from 203.0.113.7 port 40022 ssh2\n")
    log.append(f"{head} sshd-session[413]: Failed password for root from 2001:db8::7 port 40022 ssh2\n")
    (event,) = agent.wait_events(1)
    assert event["fields"] == {"user": "root", "address": "2001:db8::7", "pid": "413"}
    assert columns(event)[:3] == ("1261119090005000", "web1", "sshd-session[413]")
    assert agent.stop() == 0
