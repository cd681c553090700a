"""The HTTP API from outside: reports, Monitored Logs, refusals."""

import http.client
import os
import re
import stat
import threading
import time
from signal import SIGTERM

import pytest

from api import Api, refuses_connections, stamp
from conftest import syslog_line

EVER = ("0700101000000000", "1991231235959000")


def lines_of_the_last_hour(count):
    """One line for each second up to now, oldest first, and the time of the first."""
    begin = int(time.time()) - count
    return begin, "".join(
        syslog_line(f"number {i}", source="app" if i % 2 else "sshd[7]", when=time.localtime(begin + i))
        for i in range(count)
    )


def described(answer):
    return [row["ENTRYDESC"] for row in answer["rows"]]


def test_health_needs_no_token(serving):
    _, api = serving()
    status, kind, answer = api.request("GET", "/healthz", headers={"Authorization": None})
    assert (status, kind, answer) == (200, "application/json", {"status": "ok"})


def test_only_the_owner_can_read_the_token_file(serving):
    _, api = serving()
    assert stat.S_IMODE(os.stat(api.token_file).st_mode) == 0o600
    assert re.fullmatch("[0-9a-f]{64}", api.token)


def test_a_report_gives_the_entries_of_its_window_newest_first(serving):
    begin, text = lines_of_the_last_hour(600)
    log, api = serving(text)
    answer = api.report(log, stamp(begin + 100), stamp(begin + 149))
    assert described(answer) == [f"number {i}" for i in range(149, 99, -1)]
    assert (answer["table"], answer["count"], answer["truncated"]) == ("RMLOGENT", 50, False)
    row = answer["rows"][0]
    assert row["ENTRYTIME"] == stamp(begin + 149)
    assert (row["ENTRYSYS"], row["ENTRYSRC"]) == ("web1", "app")
    assert (row["LOGPATH"], row["LOGNAME"]) == (f"{log.path.parent}/", "app.log")


def test_a_report_takes_iso_times_and_further_conditions(serving):
    begin, text = lines_of_the_last_hour(600)
    log, api = serving(text)
    as_iso = lambda when: time.strftime("%Y-%m-%dT%H:%M:%SZ", time.gmtime(when))
    answer = api.report(
        log, as_iso(begin), as_iso(begin + 19), ("ENTRYSRC", "starts", "sshd"),
        ("ENTRYDESC", "in", ["number 4", "number 8", "number 9"]),
    )  # fmt: skip
    assert described(answer) == ["number 8", "number 4"]


def test_a_report_ends_at_the_row_limit(agent, serving):
    _, text = lines_of_the_last_hour(300)
    agent.agent_keys["max_rows"] = 25
    log, api = serving(text)
    answer = api.report(log, *EVER)
    assert described(answer) == [f"number {i}" for i in range(299, 274, -1)]
    assert (answer["count"], answer["truncated"]) == (25, True)
    # 25 entries were read, however many a further filter leaves.
    answer = api.report(log, *EVER, ("ENTRYSRC", "=", "app"))
    assert described(answer) == [f"number {i}" for i in range(299, 274, -2)]
    assert answer["truncated"]


def test_reports_on_empty_and_shrinking_logs_end_with_what_there_is(serving):
    log, api = serving(b"")
    assert api.report(log, *EVER)["rows"] == []
    log.append(syslog_line("one"))
    assert described(api.report(log, *EVER)) == ["one"]
    os.truncate(log.path, 0)
    assert api.report(log, *EVER)["rows"] == []
    log.path.unlink()
    assert api.report(log, *EVER)["rows"] == []


def test_a_report_includes_what_was_in_the_log_before_the_start(serving):
    _, text = lines_of_the_last_hour(3000)
    log, api = serving(text)
    log.append(syslog_line("the newest"))
    answer = api.report(log, *EVER)
    assert answer["count"] == 1000 and answer["truncated"]
    assert described(answer)[:2] == ["the newest", "number 2999"]


def test_monitored_logs_show_state_counts_size_and_time(agent, serving):
    log, api = serving("x\n", fields=";Y")
    agent.wait_open(log)
    log.append(syslog_line("one") + syslog_line("two"))

    def counted():
        row = api.logs()["app.log"]
        return row if row["NUMEVENTS"] == 2 else None

    row = None
    deadline = time.monotonic() + 30
    while row is None and time.monotonic() < deadline:
        row = counted()
        time.sleep(0.05)
    assert row is not None
    status = os.stat(log.path)
    assert row["LOGPATH"] == row["ULOGPATH"] == f"{log.path.parent}/"
    assert row["ULOGNAME"] == "app.log"
    assert (row["LOGTYPE"], row["MONSTATUS"], row["DEBUGMODE"]) == ("S", "Running", "Y")
    assert (row["NUMERRORS"], row["LOGSIZE"]) == (0, status.st_size)
    assert row["LOGMODDATE"] == stamp(status.st_mtime)
    assert row["FORMATTER"] == ""
    assert len(row["MONTIME"]) == len(row["TIMESTAMP"]) == 16
    log.path.unlink()
    row = api.logs()["app.log"]
    assert (row["LOGSIZE"], row["LOGMODDATE"]) == (-1, "0" * 16)


def test_monitored_logs_can_be_filtered(agent, serving):
    for name in ("b.log", "c.log"):
        agent.log(name)
    _, api = serving()
    assert set(api.logs()) == {"app.log", "b.log", "c.log"}
    status, _, answer = api.sample("RMMONLOG", ("LOGNAME", "!=", "b.log"), ("LOGSIZE", ">", 0))
    assert status == 200
    assert [row["LOGNAME"] for row in answer["rows"]] == ["c.log"]


def test_requests_during_refreshes_succeed(agent, serving):
    begin, text = lines_of_the_last_hour(2000)
    log, api = serving(text)
    agent.wait_open(log)
    other = agent.directory / "other.log"
    other.write_bytes(b"old\n")
    failures, done = [], threading.Event()

    def ask():
        while not done.is_set():
            try:
                answer = api.report(log, stamp(begin + 10), stamp(begin + 1000))
                assert answer["count"] == 991, answer["count"]
                assert "app.log" in api.logs()
            except BaseException as error:  # noqa: BLE001 - raised by the test's thread
                failures.append(error)
                return

    threads = [threading.Thread(target=ask) for _ in range(4)]
    for thread in threads:
        thread.start()
    for change in range(12):
        agent.configure(str(log), *([str(other)] if change % 2 == 0 else []))
        agent.refresh()
        agent.wait_trace("Manager thread waiting for a signal.", count=change + 2)
    done.set()
    for thread in threads:
        thread.join(60)
    assert failures == []
    assert len(agent.trace(f"Deleting log object for file {other}.")) == 6
    assert agent.stop() == 0


LOG = [("LOGPATH", "=", "/x/"), ("LOGNAME", "=", "y")]
WINDOW = [("ENTRYTIME", ">=", EVER[0]), ("ENTRYTIME", "<=", EVER[1])]

# Filters on a table, and the member of the body that the answer names.
REFUSED = {
    "unknown column": ("RMLOGENT", [*LOG, *WINDOW, ("COLOUR", "=", "x")], "filters[4].column"),
    "lower-case column": ("RMMONLOG", [("logname", "=", "x")], "filters[0].column"),
    "column of the other table": ("RMMONLOG", [("ENTRYSRC", "=", "x")], "filters[0].column"),
    "unknown operator": ("RMMONLOG", [("LOGNAME", "~", "x")], "filters[0].op"),
    "pattern that is none": ("RMMONLOG", [("LOGNAME", "matches", "(")], "filters[0].value"),
    "text for a number": ("RMMONLOG", [("LOGSIZE", ">", "big")], "filters[0].value"),
    "malformed time": (
        "RMLOGENT",
        [*LOG, ("ENTRYTIME", ">=", "yesterday"), WINDOW[1]],
        "filters[2].value",
    ),
    "no such day": (
        "RMLOGENT",
        [*LOG, ("ENTRYTIME", ">=", "2026-02-30"), WINDOW[1]],
        "filters[2].value",
    ),
    "report without a log": ("RMLOGENT", WINDOW, "filters"),
    "report without a window": ("RMLOGENT", LOG, "filters"),
    "report on a log that is not monitored": ("RMLOGENT", [*LOG, *WINDOW], "filters"),
}


@pytest.mark.parametrize("case", REFUSED)
def test_a_refused_filter_is_named_in_the_problem(serving, case):
    table, filters, field = REFUSED[case]
    _, api = serving()
    status, kind, problem = api.sample(table, *filters)
    assert kind == "application/problem+json"
    assert status == problem["status"] == (404 if "not monitored" in case else 400)
    assert problem["field"] == field
    assert problem["detail"]


def test_invalid_bodies_are_refused(serving):
    _, api = serving()
    path = "/api/v1/tables/RMMONLOG/sample"
    for body, status, field in (
        ("{", 400, "body"),
        ("[]", 400, "body"),
        ('{"filter": []}', 400, "filter"),
        ('{"filters": {}}', 400, "filters"),
        ('{"filters": [7]}', 400, "filters[0]"),
        ('{"filters": [{"column": "LOGNAME"}]}', 400, "filters[0].op"),
        (b"\xff\xfe", 400, "body"),
        ('{"filters": "' + "x" * 1_100_000 + '"}', 413, None),
        ("[" * 60_000, 400, "body"),
    ):
        got, kind, problem = api.request("POST", path, body)
        assert (got, kind) == (status, "application/problem+json"), body[:50]
        if field is not None:
            assert problem["field"] == field, body[:50]


def test_strangers_are_refused(serving):
    _, api = serving()
    path = "/api/v1/tables/RMMONLOG/sample"
    for headers, status, field in (
        ({"Authorization": None}, 401, "Authorization"),
        ({"Authorization": "Bearer wrong"}, 401, "Authorization"),
        ({"Authorization": f"Bearer {api.token}x"}, 401, "Authorization"),
        ({"Host": "evil.example"}, 421, "Host"),
        ({"Origin": "http://evil.example"}, 403, "Origin"),
    ):
        got, kind, problem = api.request("POST", path, {}, headers=headers)
        assert (got, kind) == (status, "application/problem+json"), headers
        assert problem["field"] == field
    got, _, problem = api.request("POST", path, "{}", content_type="text/plain")
    assert (got, problem["field"]) == (415, "Content-Type")


def test_unknown_paths_are_not_found(serving):
    _, api = serving()
    got, kind, problem = api.sample("RMNONE")
    assert (got, kind, problem["field"]) == (404, "application/problem+json", "table")
    for method, path in (("GET", "/none"), ("GET", "/api/v1/tables/RMMONLOG/sample"), ("POST", "/x")):
        got, kind, _ = api.request(method, path, "" if method == "POST" else None)
        assert got in (404, 405) and kind == "application/problem+json", path


def test_a_report_on_a_log_that_is_not_monitored_is_not_an_agent_error(agent, serving):
    log, api = serving()
    before = agent.trace(" Error")
    begin, end = EVER
    for method, path, body in (
        ("POST", "/api/v1/reports", {"log": "/no/such.log", "from": begin}),
        ("POST", "/api/v1/tables/RMLOGENT/sample", {"filters": [
            {"column": "LOGPATH", "op": "=", "value": "/no/"},
            {"column": "LOGNAME", "op": "=", "value": "such.log"},
            {"column": "ENTRYTIME", "op": ">=", "value": begin},
            {"column": "ENTRYTIME", "op": "<=", "value": end}]}),
    ):  # fmt: skip
        got, _, problem = api.request(method, path, body)
        assert (got, problem["detail"]) == (404, "the agent does not monitor this log")
    assert agent.stop() == 0
    assert agent.trace("such.log") == [] and agent.trace(" Error") == before


def test_without_a_place_for_the_token_monitoring_goes_on(agent):
    log = agent.log()
    (agent.directory / "state").write_text("a file, no directory")
    agent.listen = "127.0.0.1:0"
    agent.situation(log=log)
    agent.start()
    agent.wait_trace("zrmagent: HTTP is off: ")
    log.append(syslog_line("read all the same"))
    agent.wait_events(1)
    assert agent.stop() == 0


def test_a_port_in_use_does_not_keep_the_agent_from_its_logs(agents):
    first = agents()
    first.log()
    first.listen = "127.0.0.1:0"
    first.start()
    second = agents()
    log = second.log()
    second.situation(log=log)
    second.listen = f"127.0.0.1:{Api(first).port}"
    second.start()
    second.wait_trace("HTTP is off: ")
    log.append(syslog_line("read all the same"))
    second.wait_events(1)
    assert second.stop() == 0


def test_a_stop_ends_the_server_with_idle_connections_open(agent, serving):
    _, api = serving()
    idle = http.client.HTTPConnection("127.0.0.1", api.port)
    idle.request("GET", "/healthz")
    idle.getresponse().read()
    assert agent.stop(SIGTERM) == 0
    assert refuses_connections(api.port)
    idle.close()


def test_the_token_survives_a_restart(agent, serving):
    _, api = serving()
    assert agent.stop() == 0
    agent.start()
    assert Api(agent).token == api.token
