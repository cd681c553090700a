"""The resources of the HTTP API: the agent, its logs, reports, trace, refresh."""

import http.client
import json
import time
from urllib.parse import quote

import pytest

from api import stamp
from conftest import syslog_line, wait_until


def as_iso(when):
    return time.strftime("%Y-%m-%dT%H:%M:%SZ", time.gmtime(when))


def get(api, path):
    status, kind, answer = api.request("GET", path)
    assert (status, kind) == (200, "application/json"), answer
    return answer


def problem(api, method, path, body=None, **keys):
    """(status, field, detail) of a refused request."""
    status, kind, answer = api.request(method, path, body, **keys)
    assert kind == "application/problem+json", answer
    assert answer["status"] == status
    return status, answer.get("field"), answer["detail"]


def test_status_describes_the_agent(serving):
    _, api = serving()
    before = time.time()
    answer = get(api, "/api/v1/status")
    assert answer["version"]
    assert answer["node"].endswith(":ZRM")
    assert as_iso(before - 60) <= answer["started"] <= answer["time"] <= as_iso(before + 60)
    assert set(answer["history"]) == {"enabled", "events", "oldest", "newest", "bytes", "damaged", "problem"}
    assert answer["queue"]["size"] == 0 and answer["queue"]["capacity"] > 0
    assert answer["queue"]["waits"] == 0
    (sink,) = answer["sinks"]
    assert (sink["type"], sink["lag"], sink["error"]) == ("jsonl", 0, None)
    assert sink["retry_in_seconds"] is None


def test_the_trace_is_changed_while_the_agent_runs(agent, serving):
    log, api = serving()
    assert get(api, "/api/v1/status")["trace"].startswith("error,")
    status, _, answer = api.request("PUT", "/api/v1/trace", {"levels": "error,LogFile=all"})
    assert (status, answer) == (200, {"levels": "error,LogFile=all"})
    assert get(api, "/api/v1/status")["trace"] == "error,LogFile=all"
    agent.wait_trace("LogFile.cpp:")
    assert problem(api, "PUT", "/api/v1/trace", {"levels": "loud"})[:2] == (400, "levels")
    assert problem(api, "PUT", "/api/v1/trace", {"level": "all"})[:2] == (400, "levels")
    for odd in ("error+", "a\n1 forged=fine", "x" * 4096 + "=fine"):
        assert problem(api, "PUT", "/api/v1/trace", {"levels": odd})[:2] == (400, "levels"), odd
    assert get(api, "/api/v1/status")["trace"] == "error,LogFile=all", "a refusal changes nothing"
    steering = "\u009b31m\u202e\x7f"
    sent = http.client.HTTPConnection("127.0.0.1", api.port, timeout=30)
    sent.request("PUT", "/api/v1/trace", json.dumps({"levels": steering}),
                 {"Authorization": f"Bearer {api.token}", "Content-Type": "application/json"})  # fmt: skip
    text = sent.getresponse().read().decode()
    assert not set(text) & set(steering[0] + steering[-2:])
    assert steering in json.loads(text)["detail"]
    sent.close()


def test_the_trace_shows_the_beginning_of_long_levels(agent, serving):
    _, api = serving()
    levels = "error," + ",".join(f"Unit{number}=all" for number in range(300))
    assert api.request("PUT", "/api/v1/trace", {"levels": levels})[2] == {"levels": levels}
    agent.wait_trace(f'Trace levels are now "{levels[:200]}" and more.')
    assert levels[:201] not in agent.stderr.text()
    for length in (200, 201):
        levels = "error,".ljust(length - 4, "u") + "=all"
        assert api.request("PUT", "/api/v1/trace", {"levels": levels})[0] == 200
        more = " and more" if length > 200 else ""
        agent.wait_trace(f'Trace levels are now "{levels[:200]}"{more}.')


def test_columns_are_those_of_conditions(serving):
    _, api = serving()
    answer = get(api, "/api/v1/columns")
    columns = {column["name"]: column for column in answer["columns"]}
    assert len(columns) == 18
    assert columns["ENTRYDESC"] == {"name": "ENTRYDESC", "type": "text", "width": 256}
    assert columns["ENTRYTIME"]["type"] == "time"
    assert columns["ROWNO"]["type"] == "number"
    assert answer["operators"] == ["=", "!=", ">=", "<=", "<", ">", "contains", "starts", "matches", "in"]  # fmt: skip


def test_logs_show_path_and_row(agent, serving):
    other = agent.log("b+%ü.log")
    log, api = serving()
    agent.wait_open(log)
    answer = get(api, "/api/v1/logs")
    rows = {one["log"]: one["row"] for one in answer["logs"]}
    assert set(rows) == {str(log), str(other)}
    assert rows[str(log)]["LOGNAME"] == "app.log"
    assert answer["time"].endswith("Z")
    answer = get(api, f"/api/v1/logs?log={log.path.parent}/b%2B%25%C3%BC.log")
    assert [one["log"] for one in answer["logs"]] == [str(other)]
    assert problem(api, "GET", "/api/v1/logs?log=/no/such")[:2] == (404, "log")
    assert problem(api, "GET", "/api/v1/logs?log=app.log")[:2] == (400, "log")


def test_configured_logs_that_are_not_monitored_say_why(agent, serving):
    gone = agent.directory / "gone.log"
    agent.configure("# logs", f"{gone} ;N ;S", "relative.log")
    log, api = serving()
    agent.wait_open(log)
    answer = get(api, "/api/v1/logs")
    assert [one["log"] for one in answer["logs"]] == [str(log)]
    assert answer["configuration"] == {"file": str(agent.logs_conf), "problem": None}
    missing = {
        "log": str(gone),
        "line": 2,
        "reason": "The file cannot be used: No such file or directory.",
        "cause": "file",
    }
    assert answer["unmonitored"][0] == missing
    assert [(one["log"], one["line"], one["cause"]) for one in answer["unmonitored"]] == [
        (str(gone), 2, "file"),
        ("relative.log", 3, "text"),
    ]
    answer = get(api, f"/api/v1/logs?log={gone}")
    assert (answer["logs"], answer["unmonitored"]) == ([], [missing])
    assert get(api, f"/api/v1/logs?log={log}")["unmonitored"] == []
    gone.write_text("")
    (waiting,) = get(api, f"/api/v1/logs?log={gone}")["unmonitored"]
    # The agent has read this version of the configuration: a refresh would not read it again.
    assert waiting["reason"].startswith("The agent has not read this line yet. A refresh alone")
    assert waiting["cause"] == "touch"
    agent.configure(append=True)  # touched
    agent.refresh()
    wait_until(lambda: get(api, f"/api/v1/logs?log={gone}")["logs"], "the log")
    assert get(api, f"/api/v1/logs?log={gone}")["unmonitored"] == []
    agent.logs_conf.unlink()
    answer = get(api, "/api/v1/logs")
    assert answer["configuration"]["problem"] == "No such file or directory"
    assert len(answer["logs"]) == 2


def test_a_refresh_reads_the_configuration_again(agent, serving):
    log, api = serving()
    other = agent.log("other.log")
    status, kind, answer = api.request("POST", "/api/v1/refresh")
    assert (status, kind, answer) == (202, "application/json", {"status": "asked"})
    wait_until(
        lambda: len(get(api, "/api/v1/logs")["logs"]) == 2, f"{other} among the monitored logs"
    )


def test_a_report_takes_conditions_as_texts(serving):
    begin = int(time.time()) - 300
    text = "".join(
        syslog_line(f"number {i}", source="app" if i % 2 else "sshd[7]", when=time.localtime(begin + i))
        for i in range(300)
    )
    log, api = serving(text)
    body = {
        "log": str(log),
        "from": as_iso(begin + 10),
        "to": as_iso(begin + 19),
        "where": ["ENTRYSRC starts 'sshd'", "ENTRYDESC in ['number 12', 'number 14', 'number 15']"],
    }
    status, _, answer = api.request("POST", "/api/v1/reports", body)
    assert status == 200, answer
    assert [row["ENTRYDESC"] for row in answer["rows"]] == ["number 14", "number 12"]
    assert answer["log"] == str(log)
    assert (answer["from"], answer["to"]) == (stamp(begin + 10), stamp(begin + 19))
    assert (answer["count"], answer["truncated"], answer["max_rows"]) == (2, False, 1000)
    assert answer["columns"] == list(answer["rows"][0])
    status, _, answer = api.request("POST", "/api/v1/reports", {**body, "limit": 1})
    assert [row["ENTRYDESC"] for row in answer["rows"]] == ["number 14"]
    assert (answer["truncated"], answer["complete"]) == (True, False)
    # Without an end, up to the newest entry.
    status, _, answer = api.request("POST", "/api/v1/reports", {"log": str(log), "from": as_iso(begin + 290)})
    assert answer["count"] == 10
    body["where"].append("ENTRYSRC like 'x'")
    assert problem(api, "POST", "/api/v1/reports", body)[:2] == (400, "where[2]")
    body = {"log": "/no/such", "from": as_iso(begin)}
    assert problem(api, "POST", "/api/v1/reports", body)[:2] == (404, "log")


HOSTILE = [
    "'; DROP TABLE event; --",
    "x' OR '1'='1",
    '"; DELETE FROM event; --',
    "%27%20OR%201=1",
    "\\'; SELECT load_extension('x')",
    "../../etc/passwd",
    "<script>alert(1)</script>",
    "ü€𝄞\u202e\ufeff",
    "a\tb\r\nSet-Cookie: x",
    "{{7*7}}",
    "x" * 5000,
]


@pytest.mark.parametrize("text", HOSTILE)
def test_hostile_texts_are_texts(serving, text):
    """In every string field: an answer or a problem, and nothing fails."""
    _, api = serving()
    encoded = quote(text, safe="")
    requests = [
        ("GET", f"/api/v1/logs?log={encoded}", None),
        ("GET", f"/api/v1/logs?{encoded}=1", None),
        ("GET", f"/api/v1/events?situation={encoded}&log={encoded}", None),
        ("GET", f"/api/v1/events?severity={encoded}", None),
        ("GET", f"/api/v1/events?after={encoded}", None),
        ("GET", f"/api/v1/events?from={encoded}", None),
        ("GET", f"/api/v1/events/{encoded}", None),
        ("GET", f"/api/v1/rates?step={encoded}", None),
        ("GET", f"/api/v1/{encoded}", None),
        ("POST", f"/api/v1/tables/{encoded}/sample", {}),
        ("POST", "/api/v1/tables/RMMONLOG/sample", {"filters": [{"column": text, "op": "=", "value": "x"}]}),
        ("POST", "/api/v1/tables/RMMONLOG/sample", {"filters": [{"column": "LOGNAME", "op": text, "value": "x"}]}),
        ("POST", "/api/v1/tables/RMMONLOG/sample", {"filters": [{"column": "LOGNAME", "op": "=", "value": text}]}),
        ("POST", "/api/v1/tables/RMMONLOG/sample", {text: []}),
        ("PUT", "/api/v1/trace", {"levels": text}),
        ("POST", "/api/v1/reports", {"log": text, "from": "2026-01-01"}),
        ("POST", "/api/v1/reports", {"log": "/x", "from": text}),
        ("POST", "/api/v1/reports", {"log": "/x", "from": "2026-01-01", "where": [text]}),
        ("POST", "/api/v1/reports", {"log": "/x", "from": "2026-01-01", "where": [f"ENTRYDESC = '{text}'"]}),
    ]  # fmt: skip
    for method, path, body in requests:
        status, kind, answer = api.request(method, path, body)
        assert status in (200, 400, 404, 409, 414), (method, path[:80], answer)
        assert kind.startswith("application/problem+json" if status >= 400 else "application/json")
    assert get(api, "/api/v1/status")["version"]


def test_names_that_are_not_text_are_refused(serving):
    _, api = serving()
    for path in ("/api/v1/events/%ff", "/api/v1/events/%00", "/api/v1/events/%", "/api/v1/events/%zz"):
        assert problem(api, "GET", path)[:2] == (400, "path"), path
    assert problem(api, "GET", "/api/v1/logs?log=%ff")[:2] == (400, "query")


def test_the_methods_of_a_path_are_named(serving):
    _, api = serving()
    for method, path, allow in (
        ("DELETE", "/api/v1/status", "GET, HEAD"),
        ("GET", "/api/v1/trace", "PUT"),
        ("PATCH", "/api/v1/reports", "POST"),
        ("OPTIONS", "/healthz", "GET, HEAD"),
    ):
        connection = http.client.HTTPConnection("127.0.0.1", api.port)
        connection.request(method, path, headers={"Authorization": f"Bearer {api.token}"})
        response = connection.getresponse()
        answer = json.load(response)
        assert (response.status, response.getheader("Allow")) == (405, allow), answer
        connection.close()


def test_head_returns_only_the_headers(serving):
    _, api = serving()
    connection = http.client.HTTPConnection("127.0.0.1", api.port)
    for _ in range(2):  # nothing remains unread in the connection
        connection.request("HEAD", "/api/v1/status", headers={"Authorization": f"Bearer {api.token}"})
        response = connection.getresponse()
        assert response.status == 200
        assert int(response.getheader("Content-Length")) > 0
        assert response.read() == b""
    connection.close()
