"""The HTTP API of the running agent."""

import http.client
import json
import re
import threading
import time
from signal import SIGHUP

import pytest

from conftest import syslog_line, wait_until


class Api:
    """A client of one agent's API."""

    def __init__(self, agent):
        line = agent.wait_trace("HTTP at http://")[0]
        self.port = int(re.search(r"http://127\.0\.0\.1:(\d+)/", line).group(1))
        self.token = (agent.directory / "state/api-token").read_text().strip()

    def ask(self, method, path, body=None, headers=None):
        connection = http.client.HTTPConnection("127.0.0.1", self.port, timeout=60)
        headers = {"Authorization": f"Bearer {self.token}", **(headers or {})}
        if body is not None:
            body = body if isinstance(body, (bytes, str)) else json.dumps(body)
            headers.setdefault("Content-Type", "application/json")
        connection.request(method, path, body, headers)
        response = connection.getresponse()
        text = response.read()
        connection.close()
        return response.status, json.loads(text)

    def sample(self, table, *filters):
        body = {"filters": [dict(zip(("column", "op", "value"), each)) for each in filters]}
        return self.ask("POST", f"/api/v1/tables/{table}/sample", body)


def window(log):
    return (
        ("LOGPATH", "=", f"{log.path.parent}/"),
        ("LOGNAME", "=", log.path.name),
        ("ENTRYTIME", ">=", time.strftime("%Y-%m-%dT00:00:00", time.localtime(time.time() - 86400))),
        ("ENTRYTIME", "<=", time.strftime("%Y-%m-%dT%H:%M:%SZ", time.gmtime(time.time() + 3600))),
    )


@pytest.fixture
def served(agent):
    token = agent.directory / "state/api-token"
    agent.extra_toml = f'\n[http]\nlisten = "127.0.0.1:0"\ntoken_file = "{token}"\n'
    return agent


def test_health_needs_no_token(served):
    served.log()
    served.start()
    assert Api(served).ask("GET", "/healthz", headers={"Authorization": ""}) == (
        200,
        {"status": "ok"},
    )
    assert served.stop() == 0


def test_monitored_logs_are_sampled(served):
    first, second = served.log("first.log"), served.log("second.log")
    served.start()
    api = Api(served)
    first.append(syslog_line("one") + syslog_line("two"))
    wait_until(lambda: api.sample("RMMONLOG", ("NUMEVENTS", "=", 2))[1]["count"], "two lines read")
    status, sample = api.sample("RMMONLOG")
    assert status == 200
    assert sample["count"] == 2 and not sample["truncated"]
    rows = {row["LOGNAME"]: row for row in sample["rows"]}
    assert rows["first.log"]["NUMEVENTS"] == 2
    assert rows["first.log"]["LOGSIZE"] == first.path.stat().st_size
    assert rows["second.log"]["MONSTATUS"] == "Running"
    assert rows["second.log"]["LOGPATH"] == f"{second.path.parent}/"
    assert served.stop() == 0


def test_a_report_gives_entries_newest_first_up_to_the_row_limit(served):
    log = served.log()
    served.agent_keys["max_rows"] = 25
    served.start()
    api = Api(served)
    log.append("".join(syslog_line(f"entry {n}", source=f"app[{n % 2}]") for n in range(30)))
    status, report = api.sample("RMLOGENT", *window(log))
    assert status == 200
    assert [row["ENTRYDESC"] for row in report["rows"]] == [f"entry {n}" for n in range(29, 4, -1)]
    assert report["count"] == 25 and report["truncated"]
    status, report = api.sample(
        "RMLOGENT", *window(log), ("ENTRYSRC", "=", "app[1]"), ("ENTRYDESC", "matches", "y 2[0-9]$")
    )
    assert [row["ENTRYDESC"] for row in report["rows"]] == [f"entry {n}" for n in range(29, 19, -2)]
    assert report["truncated"], "25 entries were read, whatever the filters left over"
    assert served.stop() == 0


def test_a_report_on_an_unknown_log_is_a_problem(served):
    log = served.log()
    served.start()
    api = Api(served)
    log.path = log.path.with_name("other.log")
    status, problem = api.sample("RMLOGENT", *window(log))
    assert status == 404
    assert problem["detail"] == "the agent does not monitor this log"
    assert served.stop() == 0


def test_refused_requests_name_what_is_wrong(served):
    served.log()
    served.start()
    api = Api(served)
    path = "/api/v1/tables/RMMONLOG/sample"
    for status, field, arguments in (
        (401, "Authorization", dict(path=path, body={}, headers={"Authorization": "Bearer x"})),
        (421, "Host", dict(path=path, body={}, headers={"Host": "evil.example"})),
        (403, "Origin", dict(path=path, body={}, headers={"Origin": "http://evil.example"})),
        (404, "table", dict(path="/api/v1/tables/NONE/sample", body={})),
        (413, "body", dict(path=path, body=" " * 70000)),
        (415, "Content-Type", dict(path=path, body="x", headers={"Content-Type": "text/plain"})),
        (400, "body", dict(path=path, body="{")),
        (400, "filters[0].column", dict(path=path, body={"filters": [{"op": "="}]})),
    ):
        got, problem = api.ask("POST", **arguments)
        assert (got, problem.get("field")) == (status, field)
    assert api.ask("GET", "/healthz")[0] == 200
    assert served.stop() == 0


def test_requests_during_refreshes_wait_and_succeed(served):
    log = served.log()
    served.start()
    api = Api(served)
    log.append("".join(syslog_line(f"entry {n}") for n in range(200)))
    failures, over = [], threading.Event()

    def ask():
        while not over.is_set():
            status, report = api.sample("RMLOGENT", *window(log))
            if status != 200 or report["count"] != 200:
                failures.append((status, report))

    clients = [threading.Thread(target=ask) for _ in range(3)]
    for client in clients:
        client.start()
    for _ in range(10):
        served.configure(str(log))  # the same log, in a file that has changed
        served.send(SIGHUP)
        time.sleep(0.1)
    over.set()
    for client in clients:
        client.join()
    assert not failures
    assert served.stop() == 0


def test_the_token_is_the_owners_and_stays(served):
    served.log()
    served.start()
    token = served.directory / "state/api-token"
    assert token.stat().st_mode & 0o777 == 0o600
    text = token.read_text()
    assert re.fullmatch(r"[0-9a-f]{64}\n", text)
    assert served.stop() == 0
    served.start()
    Api(served)
    assert token.read_text() == text
    assert served.stop() == 0


def test_without_a_place_for_the_token_monitoring_goes_on(served):
    log = served.log()
    (served.directory / "state").write_text("a file, no directory")
    served.situation()
    served.start()
    served.wait_trace("zrmagent: HTTP is off: cannot read ")
    log.append(syslog_line("seen"))
    served.wait_events(1)
    assert served.stop() == 0
