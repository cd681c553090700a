"""docs/openapi.yaml against the routes of the sources and the answers of the running agent."""

import http.client
import json
import re
import sqlite3

import jsonschema
import pytest
import yaml

from api import Api
from conftest import ROOT, Log, syslog_line, wait_until

DOCUMENT = yaml.safe_load((ROOT / "docs/openapi.yaml").read_text(encoding="utf-8"))
METHODS = ("get", "put", "post", "delete", "patch")
OPERATIONS = {
    (method.upper(), path)
    for path, item in DOCUMENT["paths"].items()
    for method in item
    if method in METHODS
}


def resolved(node):
    while "$ref" in node:
        found = DOCUMENT
        for part in node["$ref"].removeprefix("#/").split("/"):
            found = found[part]
        node = found
    return node


def response_of(method, path, status):
    responses = DOCUMENT["paths"][path][method.lower()]["responses"]
    return resolved(responses.get(str(status), responses["default"])), str(status) in responses


def validate(schema, value):
    """Checks a value against a schema of the document."""
    jsonschema.Draft202012Validator(
        schema, resolver=jsonschema.RefResolver("", DOCUMENT)
    ).validate(value)


def test_every_route_is_documented_and_every_documented_one_exists():
    routes = set()
    for source in (ROOT / "host").rglob("*.cpp"):
        text = source.read_text(encoding="utf-8")
        if "::addRoutes(Router&" in text:
            added = re.findall(r'\(\s*"(GET|PUT|POST|DELETE|PATCH)",\s*"(/[^"]*)"', text)
            assert added, f"{source} adds routes that this test cannot read"
            routes.update(added)
    assert routes == OPERATIONS


def test_every_schema_is_valid():
    for schema in DOCUMENT["components"]["schemas"].values():
        jsonschema.Draft202012Validator.check_schema(schema)
    used = set(re.findall(r'"#/components/(\w+)/(\w+)"', (ROOT / "docs/openapi.yaml").read_text()))
    declared = {
        (kind, name)
        for kind, entries in DOCUMENT["components"].items()
        if kind != "securitySchemes"
        for name in entries
    }
    assert used == declared


DEFINITION = {
    "name": "made/here",
    "text": "made here",
    "severity": "minor",
    "log": None,
    "when": ["ENTRYDESC contains 'x'"],
    "frequency": ">= 2",
    "period": "60s",
}
SILENCE = {"match": {"group": {"ip": "10.*"}, "log": "/a"}, "until": "2h", "who": "anna", "why": "x"}
FROM = "2026-01-01T00:00:00Z"

# The requests: method, path of the document, path and body of the request, expected status.
EXAMPLES = [
    ("GET", "/healthz", None, None, 200),
    ("GET", "/", None, None, 200),
    ("GET", "/console/*", "/console/main.js", None, 200),
    ("GET", "/console/*", "/console/none", None, 404),
    ("GET", "/metrics", None, None, 200),
    ("GET", "/api/v1/status", None, None, 200),
    ("PUT", "/api/v1/trace", None, {"levels": "error"}, 200),
    ("PUT", "/api/v1/trace", None, {"levels": "loud"}, 400),
    ("GET", "/api/v1/columns", None, None, 200),
    ("GET", "/api/v1/logs", None, None, 200),
    ("GET", "/api/v1/logs", "/api/v1/logs?log={log}", None, 200),
    ("GET", "/api/v1/logs", "/api/v1/logs?log=/none", None, 404),
    ("GET", "/api/v1/fields", "/api/v1/fields?log={log}", None, 200),
    ("GET", "/api/v1/fields", "/api/v1/fields?log=/none", None, 404),
    ("POST", "/api/v1/refresh", None, None, 202),
    ("POST", "/api/v1/tables/{table}/sample", "/api/v1/tables/RMMONLOG/sample", {}, 200),
    ("POST", "/api/v1/tables/{table}/sample", "/api/v1/tables/NONE/sample", {}, 404),
    ("POST", "/api/v1/reports", None, {"log": "{log}", "from": FROM}, 200),
    ("POST", "/api/v1/reports", None, {"log": "{log}", "from": FROM, "fields": ["pid"]}, 400),
    ("POST", "/api/v1/reports", None, {"log": "/none", "from": FROM}, 404),
    ("GET", "/api/v1/events", None, None, None),
    ("GET", "/api/v1/events", "/api/v1/events?limit=1&order=asc&severity=info", None, None),
    ("GET", "/api/v1/events/{id}", "/api/v1/events/1", None, None),
    ("GET", "/api/v1/episodes", None, None, None),
    ("GET", "/api/v1/episodes", "/api/v1/episodes?state=open&group=ip%3D1&limit=1", None, None),
    ("GET", "/api/v1/episodes/{id}", "/api/v1/episodes/1", None, None),
    ("POST", "/api/v1/episodes/{id}/ack", "/api/v1/episodes/1/ack", {"who": "anna"}, None),
    ("DELETE", "/api/v1/episodes/{id}/ack", "/api/v1/episodes/1/ack", None, None),
    ("GET", "/api/v1/rates", None, None, None),
    ("GET", "/api/v1/rates", "/api/v1/rates?step=3600&log={log}", None, None),
    ("GET", "/api/v1/rules", None, None, 200),
    ("GET", "/api/v1/situations", None, None, 200),
    ("POST", "/api/v1/situations/validate", None, {"name": "x", "when": ["y"]}, 200),
    ("POST", "/api/v1/situations", None, DEFINITION, 201),
    ("POST", "/api/v1/situations", None, DEFINITION, 409),
    ("GET", "/api/v1/situations/{name}", "/api/v1/situations/made%2Fhere", None, 200),
    ("GET", "/api/v1/situations/{name}", "/api/v1/situations/none", None, 404),
    ("PUT", "/api/v1/situations/{name}", "/api/v1/situations/made%2Fhere", DEFINITION, 200),
    ("PUT", "/api/v1/situations/{name}", "/api/v1/situations/made%2Fhere", {**DEFINITION, "version": "0"}, 412),
    ("POST", "/api/v1/situations/{name}/stop", "/api/v1/situations/made%2Fhere/stop", None, 200),
    ("POST", "/api/v1/situations/{name}/start", "/api/v1/situations/made%2Fhere/start", None, 200),
    ("POST", "/api/v1/silences", None, SILENCE, 201),
    ("POST", "/api/v1/silences", None, {**SILENCE, "match": {}}, 400),
    ("GET", "/api/v1/silences", None, None, 200),
    ("GET", "/api/v1/silences", "/api/v1/silences?state=expired", None, 200),
    ("GET", "/api/v1/silences/{id}", "/api/v1/silences/1", None, 200),
    ("GET", "/api/v1/silences/{id}", "/api/v1/silences/2", None, 404),
    ("DELETE", "/api/v1/silences/{id}", "/api/v1/silences/1", {"who": "ben"}, 200),
    ("DELETE", "/api/v1/silences/{id}", "/api/v1/silences/1", None, 409),
    ("DELETE", "/api/v1/silences/{id}", "/api/v1/silences/2", None, 404),
    ("POST", "/api/v1/explain", None, {"situation": "every-entry", "last": 2}, 200),
    ("POST", "/api/v1/explain", None, {"definition": DEFINITION, "log": "{log}", "line": "no entry"}, 200),
    ("POST", "/api/v1/explain", None, {"situation": "none", "log": "{log}", "line": "x"}, None),
    ("POST", "/api/v1/backtest", None, {"situation": "every-entry", "from": FROM, "to": "2099-01-01"}, 200),
    ("POST", "/api/v1/try", None, {"format": 'A , "%s" , type', "lines": ["word", ""]}, 200),
    ("POST", "/api/v1/try", None, {"format": 'A , "%*s %d %[^\n]" , day description', "log": "{log}", "last": 3}, 200),
    ("POST", "/api/v1/try", None, {"format": 'A , "%q" , type', "lines": ["word"]}, 200),
    ("POST", "/api/v1/try", None, {"format": "A", "log": "/none", "last": 3}, 400),
    ("POST", "/api/v1/suggest", None, {"lines": ["time=2026-11-19T10:00:00Z level=info msg=x"]}, 200),
    ("POST", "/api/v1/suggest", None, {"lines": ["WARN 2026-11-19 10:00:00 x"], "log": "/a"}, 200),
    ("POST", "/api/v1/suggest", None, {"log": "/none"}, 400),
    ("POST", "/api/v1/check", None, {"config": "# logs\n{log}\n/none ;N\nlast"}, 200),
    ("POST", "/api/v1/check", None, {"config": 7}, 400),
    ("DELETE", "/api/v1/situations/{name}", "/api/v1/situations/made%2Fhere", None, 204),
    ("DELETE", "/api/v1/situations/{name}", "/api/v1/situations/every-entry", None, 409),
]  # fmt: skip

# Refusals that any request can meet: the default of every operation.
GENERAL = (400, 401, 403, 405, 408, 413, 414, 415, 421, 431, 500)

# Tested elsewhere: their answers do not end.
STREAMS = {("GET", "/api/v1/events/stream")}


def exchange(api, method, path, body=None, token=True):
    connection = http.client.HTTPConnection("127.0.0.1", api.port, timeout=60)
    headers = {"Authorization": f"Bearer {api.token}"} if token else {}
    if body is not None:
        headers["Content-Type"] = "application/json"
    try:
        connection.request(method, path, None if body is None else json.dumps(body), headers)
        response = connection.getresponse()
        return response.status, response.getheader("Content-Type"), response.read()
    finally:
        connection.close()


def check(method, path, status, kind, data):
    """Checks an answer against what the document says about it."""
    response, is_named = response_of(method, path, status)
    assert is_named or status in GENERAL, f"{method} {path}: {status} is not documented"
    content = response.get("content", {})
    if not content:
        assert data == b"" and kind is None
        return
    sent = kind.split(";")[0]
    assert sent in content, (method, path, data)
    value = json.loads(data) if sent.endswith("json") else data.decode()
    validate(resolved(content[sent]["schema"]), value)


@pytest.fixture
def serving(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.listen = "127.0.0.1:0"
    agent.start()
    for number in range(3):
        log.append(syslog_line(f"line {number}"))
    agent.wait_events(3)
    return log, Api(agent)


def test_every_answer_is_as_documented(serving):
    assert {example[:2] for example in EXAMPLES} | STREAMS == OPERATIONS
    log, api = serving
    insert = lambda text: text.replace("{log}", str(log)) if isinstance(text, str) else text
    for method, path, url, body, expected in EXAMPLES:
        if isinstance(body, dict):
            body = {key: insert(value) for key, value in body.items()}
        status, kind, data = exchange(api, method, insert(url or path), body)
        assert expected is None or status == expected, (method, path, data)
        check(method, path, status, kind, data)


def test_every_refusal_is_as_documented(serving):
    _, api = serving
    for method, path in sorted(OPERATIONS):
        url = re.sub(r"\{\w+\}", "1", path)
        operation = DOCUMENT["paths"][path][method.lower()]
        if operation.get("security") != []:
            status, kind, data = exchange(api, method, url, token=False)
            assert status == 401, (method, path)
            check(method, path, status, kind, data)
        status, kind, data = exchange(api, "PATCH", url, {})
        assert status == 405, (path, data)
        check(method, path, status, kind, data)
        if method in ("PUT", "POST"):
            for body in ([], {"no such member": 1}):
                status, kind, data = exchange(api, method, url, body)
                # Validation reports what is wrong in its answer; an unknown table comes first.
                expected = {"/api/v1/situations/validate": (200, 400), "/api/v1/tables/{table}/sample": (404,)}
                assert status in expected.get(path, (400,)), (method, path, status, data)
                check(method, path, status, kind, data)
        if path not in ("/healthz", "/", "/console/*"):
            body = None if method in ("GET", "DELETE") else {}
            status, kind, data = exchange(api, method, url + "?nosuch=1", body)
            assert status == 400 and b"no parameters" in data or b"the parameters are" in data, (path, data)
            check(method, path, status, kind, data)


def test_events_are_as_documented(serving):
    log, api = serving
    status, _, data = exchange(api, "GET", "/api/v1/status")
    if not json.loads(data)["history"]["enabled"]:
        assert exchange(api, "GET", "/api/v1/events")[0] == 409
        return

    def arrived():
        answer = json.loads(exchange(api, "GET", "/api/v1/events")[2])
        return answer if len(answer["events"]) == 3 else None

    for event in wait_until(arrived, "3 events in the history")["events"]:
        validate(DOCUMENT["components"]["schemas"]["Event"], event)
        status, kind, data = exchange(api, "GET", f"/api/v1/events/{event['id']}")
        assert status == 200 and json.loads(data) == event
        check("GET", "/api/v1/events/{id}", status, kind, data)


def test_rows_with_fields_are_as_documented(agent):
    log = Log(agent.directory / "app.log")
    log.path.write_text(syslog_line("line", "app[7]"))
    agent.agent_keys["log_config"] = None
    agent.follow(log)
    agent.listen = "127.0.0.1:0"
    agent.start()
    body = {"log": str(log), "from": FROM, "fields": ["*"]}
    status, kind, data = exchange(Api(agent), "POST", "/api/v1/reports", body)
    check("POST", "/api/v1/reports", status, kind, data)
    (row,) = json.loads(data)["rows"]
    assert row["fields"]["pid"] == "7"
    validate(DOCUMENT["components"]["schemas"]["ReportRow"], row)
    with pytest.raises(jsonschema.ValidationError):
        validate(DOCUMENT["components"]["schemas"]["EntryRow"], row)


def test_episodes_and_their_events_are_as_documented(agent):
    log = Log(agent.directory / "app.log")
    log.path.write_text("")
    agent.agent_keys["log_config"] = None
    agent.follow(log, start="beginning")
    agent.situation(log=log, group_by=["ENTRYSYS"], resolve_after="1s")
    agent.situation("lasts", log=log, resolve_after="1h")
    agent.situation("counted", log=log, group_by=["ENTRYSYS"], frequency=">= 1", period="1m", cooldown="1h")
    agent.listen = "127.0.0.1:0"
    agent.start()
    api = Api(agent)
    log.append(syslog_line("line"))

    def resolved():
        status, kind, data = exchange(api, "GET", "/api/v1/episodes?state=resolved")
        check("GET", "/api/v1/episodes", status, kind, data)
        return json.loads(data)["episodes"]

    (episode,) = wait_until(resolved, "the end of the episode")
    status, kind, data = exchange(api, "GET", f"/api/v1/episodes/{episode['id']}")
    check("GET", "/api/v1/episodes/{id}", status, kind, data)
    assert [event["state"] for event in json.loads(data)["events"]] == ["raised", "resolved"]
    (lasting,) = json.loads(exchange(api, "GET", "/api/v1/episodes?state=open")[2])["episodes"]
    ack = "/api/v1/episodes/{id}/ack"
    for method, body, expected in (
        ("POST", {"who": "anna", "note": "on it"}, 200),
        ("POST", {"who": "ben"}, 409),
        ("DELETE", None, 200),
        ("DELETE", None, 409),
    ):
        status, kind, data = exchange(api, method, ack.format(id=lasting["id"]), body)
        assert status == expected, data
        check(method, ack, status, kind, data)
    status, kind, data = exchange(api, "POST", ack.format(id=episode["id"]), {"who": "anna"})
    assert (status, b"is resolved" in data) == (409, True), data
    check("POST", ack, status, kind, data)
    for event in json.loads(exchange(api, "GET", "/api/v1/events")[2])["events"]:
        validate(DOCUMENT["components"]["schemas"]["Event"], event)
    status, kind, data = exchange(api, "GET", "/api/v1/situations")
    check("GET", "/api/v1/situations", status, kind, data)
    assert json.loads(data)["situations"][1]["resolve_after"] == "1s"


def test_a_history_that_cannot_be_read_is_documented(agent, serving):
    assert agent.stop() == 0
    agent.start()  # so that no event is in memory
    api = Api(agent)
    with sqlite3.connect(agent.directory / "state/history.db") as history:
        for table in ("events", "rates"):
            history.execute(f"ALTER TABLE {table} RENAME TO gone_{table}")
    history.close()
    for method, path, url, body in (
        ("GET", "/api/v1/events", None, None),
        ("GET", "/api/v1/events/{id}", "/api/v1/events/1", None),
        ("GET", "/api/v1/rates", None, None),
        ("POST", "/api/v1/explain", None, {"event": 1}),
    ):
        status, kind, data = exchange(api, method, url or path, body)
        assert (status, b"the history cannot be read" in data) == (503, True), (path, data)
        check(method, path, status, kind, data)
    assert exchange(api, "GET", "/api/v1/status")[0] == 200
    assert exchange(api, "GET", "/metrics")[0] == 200
