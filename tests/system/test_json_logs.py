"""Logs of JSON objects: columns, fields, what is rejected, what events keep, reports."""

import gzip
import json

import pytest
from api import Api
from conftest import Log, descriptions, wait_until

COLUMNS = ("ENTRYTIME", "ENTRYSYS", "ENTRYSRC", "ENTRYTYPE", "ENTRYDESC")

# What loggers write, and the columns of it.
LOGGERS = [
    (
        '{"time":"2026-11-20T07:03:09.123456789+01:00","level":"WARN","msg":"slow query","ms":1200}',
        ("1261120060309000", "", "", "WARN", "slow query"),
    ),
    (
        '{"level":30,"time":1795154589123,"pid":7,"hostname":"web1","name":"api","msg":"listening"}',
        ("1261120060309000", "web1", "api", "INFO", "listening"),
    ),
    (
        '{"level":"error","ts":1795154589.5,"logger":"db","caller":"db.go:12","msg":"no connection"}',
        ("1261120060309000", "", "db", "error", "no connection"),
    ),
    (
        '{"@timestamp":"2026-11-20T06:03:09.123Z","@version":"1","message":"started",'
        '"logger_name":"com.example.Main","thread_name":"main","level":"INFO","level_value":20000}',
        ("1261120060309000", "", "com.example.Main", "INFO", "started"),
    ),
    (
        '{"asctime": "2026-11-20 06:03:09,123", "levelname": "ERROR", "name": "app", '
        '"message": "failed: \\"x\\"\\n  at line 3"}',
        ("1261120060309000", "", "app", "ERROR", 'failed: "x"   at line 3'),
    ),
]


@pytest.fixture
def log(agent):
    agent.environment["TZ"] = "UTC0"
    log = Log(agent.directory / "app.log")
    log.path.write_text("")
    return log


def entry(**members):
    return json.dumps({"time": "2026-11-20T06:03:09Z", **members}, separators=(",", ":")) + "\n"


def ledger_of(api, log):
    status, _, answer = api.request("GET", f"/api/v1/logs?log={log}")
    assert status == 200, answer
    return answer["logs"][0]["ledger"]


def test_common_loggers_need_no_columns(agent, log):
    agent.follow(log, type="json", start="beginning")
    agent.situation(log=log)
    agent.start()
    log.append("".join(line + "\n" for line, _ in LOGGERS))
    events = agent.wait_events(len(LOGGERS))
    for event, (line, columns) in zip(events, LOGGERS):
        assert tuple(event["row"][name] for name in COLUMNS) == columns
        assert event["entry"] == line


def test_named_fields_fill_the_columns(agent, log):
    agent.follow(
        log,
        type="json",
        start="beginning",
        time_format="%d.%m.%Y %H:%M",
        columns={"time": "at", "type": "how.bad", "description": "what", "source": ""},
        defaults={"system": "here"},
        **{"values.type": {"1": "BAD"}},
    )
    agent.situation(log=log)
    agent.start()
    log.append('{"name":"n","msg":"m","at":"20.11.2026 06:03","how":{"bad":1},"what":"it broke"}\n')
    (event,) = agent.wait_events(1)
    assert tuple(event["row"][name] for name in COLUMNS) == (
        "1261120060300000",
        "here",
        "",
        "BAD",
        "it broke",
    )


def test_conditions_on_fields_and_what_events_keep(agent, log):
    agent.follow(log, type="json", start="beginning", keep=["http.status", "tags.1", "user"])
    agent.situation(name="5xx", log=log, when=["field.http.status >= 500", "field.took > 1.5"])
    agent.start()
    for status, took in ((200, 2), (503, 1.25), (503, 1.75), ("504", 1e1), (None, 9)):
        log.append(entry(msg=f"{status} {took}", http={"status": status}, took=took, tags=["a", "b"]))
    log.append('{"http":{"status":99999999999999999999999},"took":2E+400,"msg":"large"}\n')
    events = agent.wait_events(2)
    assert agent.stop() == 0
    assert descriptions(agent.events()) == ["503 1.75", "504 10.0"]
    assert events[0]["fields"] == {"http.status": "503", "tags.1": "b"}


def test_rejected_lines_are_in_the_ledger_with_the_reason(agent, log):
    agent.follow(log, type="json", start="beginning")
    agent.listen = "127.0.0.1:0"
    agent.situation(log=log)
    agent.start()
    rejected = [
        (b"panic: no object", "it is not a JSON object"),
        (b'{"msg":"cut', "a text in it has no closing quote"),
        (b'{"msg":"a" "b":1}', "it is not JSON, at byte 12"),
        (b'{"msg":"\xff"}', "it is not valid UTF-8"),
        (b'{"time":"soon","msg":"m"}', "field time is not a time"),
    ]
    for line, _ in rejected:
        log.append(line + b"\n")
    log.append(entry(msg="good"))
    (event,) = agent.wait_events(1)
    assert event["row"]["ENTRYDESC"] == "good"
    api = Api(agent)
    wait_until(lambda: ledger_of(api, log)["lines"] == 6, "the lines")
    ledger = ledger_of(api, log)
    assert (ledger["rows"], ledger["format_errors"]) == (1, 5)
    assert [one["reason"] for one in ledger["rejected"]] == [
        reason[0].upper() + reason[1:] + "." for _, reason in rejected
    ]


def test_hostile_objects_disturb_nothing(agent, log):
    agent.follow(log, type="json", start="beginning", keep=["*"])
    agent.situation(name="any", log=log, when=["field.n != 'x'"])
    agent.start()
    log.append('{"a":' * 10_000 + "1" + "}" * 10_000 + "\n")
    log.append('{"msg":"array","a":' + "[" * 10_000 + "]" * 10_000 + "}\n")
    log.append('{"msg":"many",' + ",".join(f'"f{n}":{n}' for n in range(5000)) + "}\n")
    log.append('{"msg":"first","msg":"second","n":1,"n":2}\n')
    log.append('{"msg":"long","n":"' + "x" * 10_000_000 + '"}\n')
    log.append(b'{"msg":"nul \\u0000 end","n":"\\u0000"}\n')
    log.append(entry(msg="last"))
    events = agent.wait_events(6)
    assert [event["row"]["ENTRYDESC"][:5] for event in events] == [
        '{"a":',
        "array",
        "many",
        "first",
        "nul  ",
        "last",
    ]
    assert len(events[2]["fields"]) == 256
    assert events[3]["fields"] == {"msg": "first", "n": "1"}
    assert agent.stop() == 0


@pytest.mark.parametrize("kind, last", [("json", entry(msg="last")), ("logfmt", "msg=last n=2\n")])
def test_a_line_of_100_megabytes_costs_little_memory(agent, log, kind, last):
    agent.follow(log, type=kind, start="beginning")
    agent.situation(log=log, when=["field.msg = 'last'"])
    agent.start()
    before = agent.resident_kilobytes()
    with open(log.path, "ab") as stream:
        stream.write(b'{"n":"' if kind == "json" else b"n=")
        for _ in range(100):
            stream.write(b"x" * 1_000_000)
        stream.write(b'"}\n' if kind == "json" else b"\n")
    log.append(last)
    (event,) = agent.wait_events(1)
    assert event["row"]["ENTRYDESC"] == "last"
    assert agent.resident_kilobytes() < before + 20_000
    assert agent.stop() == 0


def test_numbers_beyond_64_bits_compare(agent, log):
    agent.follow(log, type="json", start="beginning")
    agent.situation(log=log, when=["field.n > 18446744073709551616"])
    agent.start()
    for number in ("18446744073709551615", "-1e400", "9" * 400, "18446744073709559999", "1e30"):
        log.append(f'{{"msg":"{number}","n":{number}}}\n')
    log.append('{"msg":"end","n":1e31}\n')
    events = agent.wait_events(3)
    assert [event["row"]["ENTRYDESC"] for event in events] == ["18446744073709559999", "1e30", "end"]
    assert agent.stop() == 0


def test_rotation_and_restart_lose_nothing(agent, log):
    agent.follow(log, type="json", start="beginning", rotate_wait="1s")
    agent.situation(log=log)
    agent.start()
    log.append(entry(msg="one"))
    agent.wait_events(1)
    log.path.rename(f"{log}.1")
    with open(f"{log}.1", "a", encoding="utf-8") as older:
        older.write(entry(msg="two"))
    log.path.write_text(entry(msg="three"))
    agent.wait_events(3)
    assert agent.stop() == 0
    assert descriptions(agent.events()) == ["one", "two", "three"]
    log.append(entry(msg="four"))
    agent.start()
    agent.wait_events(1)
    assert agent.stop() == 0
    assert descriptions(agent.events()) == ["four"]


def test_reports_and_suggestions_have_the_fields(agent, log):
    with gzip.open(f"{log}.1.gz", "wt") as older:
        older.write(entry(msg="older", status=500) + "no object\n" + entry(msg="fine", status=200))
    log.append(entry(msg="newer", status=503, http={"path": "/"}))
    agent.follow(log, type="json", start="beginning")
    agent.listen = "127.0.0.1:0"
    agent.start()
    api = Api(agent)
    status, _, answer = api.request(
        "POST",
        "/api/v1/reports",
        {
            "log": str(log),
            "from": "2026-11-20",
            "to": "2026-11-21",
            "where": ["field.status >= 500"],
        },
    )
    assert status == 200, answer
    assert [row["ENTRYDESC"] for row in answer["rows"]] == ["newer", "older"]
    status, _, answer = api.request("GET", f"/api/v1/fields?log={log}")
    assert status == 200
    assert {one["name"] for one in answer["fields"]} == {"time", "msg", "status", "http.path"}


def test_long_objects_are_explained_and_suggested_from_whole(agent, log):
    log.append(entry(msg="x" * 50_000, status=503))
    agent.follow(log, type="json", start="beginning")
    agent.situation(name="5xx", log=log, when=["field.status >= 500", "field.msg contains 'xxx'"])
    agent.listen = "127.0.0.1:0"
    agent.start()
    agent.wait_events(1)
    api = Api(agent)
    status, _, answer = api.request("POST", "/api/v1/explain", {"situation": "5xx", "last": 1})
    assert status == 200, answer
    assert answer["explanations"][0]["decision"].endswith("every condition holds.")
    fields = api.request("GET", f"/api/v1/fields?log={log}")[2]["fields"]
    assert {one["name"] for one in fields} == {"time", "msg", "status"}


def test_a_wrong_table_is_refused_with_its_place(agent, log):
    agent.follow(log, type="json", columns={"level": "lvl"})
    agent.start(wait=False)
    agent.wait_end()
    message = agent.stderr.text()
    assert "log.columns.level: 'level' is not a column; the columns are time, system," in message
