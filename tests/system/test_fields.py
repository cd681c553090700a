"""Fields and texts of the entries of [[log]] tables: conditions on them, and what events keep."""

import gzip

import pytest
from api import Api
from conftest import Log, descriptions, syslog_line
from situations import Situations

RFC5424 = '<{pri}>1 2026-11-20T06:03:09Z web1 app 8710 ID47 [req@32473 status="{status}" user="{user}"] {text}\n'


def file(agent, name="app.log"):
    log = Log(agent.directory / name)
    log.path.write_text("")
    return log


def test_conditions_on_fields_raise_events_that_keep_them(agent):
    log = file(agent)
    agent.follow(log, start="beginning")
    agent.situation(log=log, when=["field.req@32473.status >= 500", "field.severity in ['crit', 'err']"])
    agent.start()
    for pri, status in ((34, "99"), (34, "500"), (38, "500"), (34, "1000.5"), (34, "none")):
        log.append(RFC5424.format(pri=pri, status=status, user="root", text=f"status {status}"))
    log.append(syslog_line("without fields of that kind"))
    events = agent.wait_events(2)
    assert agent.stop() == 0
    assert descriptions(agent.events()) == ["status 500", "status 1000.5"]
    assert events[0]["fields"] == {"severity": "crit", "req@32473.status": "500"}
    assert events[0]["entry"].startswith("<34>1 2026-11-20T06:03:09Z web1 app 8710")
    assert "entry_cut" not in events[0]


def test_a_reload_warns_of_fields_that_no_entry_has(agent):
    log = file(agent)
    agent.follow(log)
    agent.situation("first", log=agent.directory / "other.log", when=["field.user = 'root'"])
    agent.start()
    agent.wait_trace("situation 'first': field.user is in no entry: no [[log]] table names")
    agent.situation("second", log=log, when=["field.host = 'web1'"])
    agent.situation("third", log=agent.directory / "other.log", when=["field.host = 'web1'"])
    agent.reload()
    agent.wait_trace("situation 'third': field.host is in no entry: no [[log]] table names")
    assert agent.stop() == 0
    assert len(agent.trace("is in no entry")) == 2


def test_long_hosts_and_tags_are_whole_in_the_fields(agent):
    host = "ip-10-0-0-17.eu-central-1.compute.internal-" + "x" * 20
    tag = "systemd-networkd-wait-online-" + "y" * 200
    log = file(agent)
    agent.follow(log, start="beginning", keep=["host", "tag", "pid"])
    agent.situation(log=log, when=[f"field.host = '{host}'", f"field.tag = '{tag}'"])
    agent.start()
    log.append(f"Nov 20 07:03:09 {host} {tag}[12345]: text\n")
    (event,) = agent.wait_events(1)
    assert event["fields"] == {"host": host, "tag": tag, "pid": "12345"}
    assert event["row"]["ENTRYSYS"] == host[:32]


def test_the_text_of_an_event_is_the_whole_entry(agent):
    log = file(agent)
    short = file(agent, "short.log")
    none = file(agent, "none.log")
    agent.follow(log, start="beginning")
    agent.follow(short, start="beginning", entry_bytes=40)
    agent.follow(none, start="beginning", entry_bytes=0)
    agent.situation(when=["field.message contains 'needle'"])
    agent.start()
    line = syslog_line("x" * 50_000 + " needle")
    for one in (log, short, none):
        one.append(line)
    events = {event["row"]["LOGNAME"]: event for event in agent.wait_events(3)}
    assert events["app.log"]["entry"] == line.rstrip("\n")
    assert "entry_cut" not in events["app.log"]
    assert events["short.log"]["entry"] == line[:40]
    assert events["short.log"]["entry_cut"] is True
    assert "entry" not in events["none.log"]


def test_logs_of_the_log_configuration_stay_as_they_were(agent):
    log = agent.log("app.log")
    agent.situation(log=log, when=["field.host != 'other'"])
    agent.start()
    log.append(syslog_line("text"))
    (event,) = agent.wait_events(1)
    assert set(event) == {"id", "situation", "severity", "raised", "row"}


@pytest.mark.slow
def test_hostile_fields_are_bounded(agent):
    log = file(agent)
    agent.follow(log, start="beginning", keep="*")
    agent.situation(log=log, when=["field.user != 'x'"])
    agent.start()
    many = " ".join(f'p{number}="{number}"' for number in range(10_000))
    log.append(f"<34>1 2026-11-20T06:03:09Z h a p m [s {many}] many\n")
    log.append(b'<34>1 2026-11-20T06:03:09Z h a p m [s \xff\x01="\xc3(\x00\x1b[31m"] odd\n')
    log.append(b"<34>1 2026-11-20T06:03:09Z h a p m [s x=\"" + b"\\" * 100_000 + b"\n")
    many, odd, _ = agent.wait_events(3)
    assert len(many["fields"]) == 256
    assert many["fields"]["s.p0"] == "0"
    assert odd["fields"]["s.\ufffd\x01"] == "\ufffd(\x00\x1b[31m"
    assert agent.stop() == 0


def test_the_api_the_client_and_the_search_have_them(agent):
    log = file(agent)
    agent.follow(log, start="beginning")
    agent.listen = "127.0.0.1:0"
    agent.start()
    situations = Situations(agent)
    assert situations.add("api", when=["field.pid > 400.5"])["when"] == ["field.pid > 400.5"]
    situations.wait_opened(1)
    log.append("Nov 20 07:03:09 web1 sshd[412]: Failed " + "." * 300 + " needle\n")
    (event,) = agent.wait_events(1)
    assert event["fields"] == {"pid": "412"}
    api = Api(agent)
    assert api.request("GET", "/api/v1/events?text=needle")[2]["events"] == [event]
    assert api.request("GET", "/api/v1/events?text=nothing")[2]["events"] == []
    status, _, problem = api.request(
        "POST", "/api/v1/situations", {"name": "bad", "when": ["field.pid contains 4"]}
    )
    assert status == 400
    assert "'contains' compares text" in problem["detail"]


def test_reports_judge_fields_in_plain_and_compressed_generations(agent):
    log = file(agent)
    lines = [
        RFC5424.format(pri=34, status=status, user=user, text=f"{user} {status} " + "." * 3000)
        for status in (200, 500, 1000)
        for user in ("a", "b")
    ]
    with gzip.open(f"{log}.1.gz", "wt") as older:
        older.writelines(lines[:3])
    log.append("".join(lines[3:]))
    agent.follow(log, start="beginning")
    agent.listen = "127.0.0.1:0"
    agent.start()
    api = Api(agent)

    def found(*where):
        status, _, answer = api.request(
            "POST",
            "/api/v1/reports",
            {"log": str(log), "from": "2026-11-20", "to": "2026-11-21", "where": list(where)},
        )
        assert status == 200, answer
        return [row["ENTRYDESC"].rstrip(". ") for row in answer["rows"]]

    assert found("field.req@32473.status >= 500") == ["b 1000", "a 1000", "b 500", "a 500"]
    assert found("field.req@32473.status > 100", "field.req@32473.user = 'a'") == [
        "a 1000",
        "a 500",
        "a 200",
    ]
    assert len(found("field.message contains '.. '")) == 0
    assert found("field.absent = 'x'") == []


def test_explain_says_what_a_field_was(agent):
    log = file(agent)
    agent.follow(log, start="beginning")
    agent.listen = "127.0.0.1:0"
    agent.situation(name="slow", log=log, when=["ENTRYDESC contains 'text'", "field.req@32473.status >= 500"])
    agent.start()
    log.append(RFC5424.format(pri=34, status="404", user="root", text="text"))
    log.append(RFC5424.format(pri=34, status="503", user="root", text="text"))
    log.append(RFC5424.format(pri=34, status="-", user="root", text="text"))
    log.append(syslog_line("text"))
    (event,) = agent.wait_events(1)
    api = Api(agent)

    def explained(**body):
        status, _, answer = api.request("POST", "/api/v1/explain", {"situation": "slow", **body})
        assert status == 200, answer
        return answer["explanations"]

    decisions = [one["decision"].split(": ", 1)[1] for one in explained(last=4)]
    assert decisions == [
        "field.req@32473.status '404' is less than 500.",
        "every condition holds.",
        "field.req@32473.status '-' is not a number.",
        "the entry has no field.req@32473.status.",
    ]
    (one,) = explained(event=event["id"])
    assert [verdict["value"] for verdict in one["conditions"]][-2:] == ["text", "503"]
    (one,) = explained(line=syslog_line("other text").rstrip())
    assert [verdict["value"] for verdict in one["conditions"]][-2:] == ["other text", None]
    log.path.write_text("")
    (one,) = explained(event=event["id"])
    assert one["raised"] is True, "the event has the entry"


def test_a_backtest_judges_fields_over_all_generations(agent):
    log = file(agent)
    agent.follow(log, start="beginning")
    agent.situation(name="wanted", log=log, when=["field.message starts 'wanted'"])
    agent.listen = "127.0.0.1:0"
    log.append(syslog_line("wanted one") + syslog_line("other"))
    log.path.rename(f"{log}.1")
    log.path.write_text(syslog_line("wanted two"))
    agent.start()
    window = {"from": "2000-01-01", "to": "2099-01-01"}
    status, _, answer = Api(agent).request("POST", "/api/v1/backtest", {"situation": "wanted", **window})
    assert (status, answer["entries"], answer["matched"], answer["raised"]) == (200, 3, 2, 2)
    assert answer["complete"] is True
    assert agent.stop() == 0


def test_context_is_the_entries_before(agent):
    log = file(agent)
    other = file(agent, "other.log")
    agent.follow([log, other], start="beginning")
    agent.situation(name="with", log=log, when=["ENTRYDESC starts 'failed'"], context=2)
    agent.situation(name="without", when=["ENTRYDESC starts 'failed'"])
    agent.start()
    lines = [syslog_line(text) for text in ("one", "two", "three", "failed", "failed again")]
    log.append("".join(lines))
    other.append("".join(lines[2:4]))
    events = agent.wait_events(5)
    assert agent.stop() == 0
    texts = [line.rstrip("\n") for line in lines]
    assert [event["context"] for event in events if event["situation"] == "with"] == [
        texts[1:3],
        texts[2:4],
    ]
    assert all("context" not in event for event in events if event["situation"] == "without")


def test_the_fields_of_a_log_are_listed(agent):
    log = file(agent)
    plain = agent.log("plain.log", content=syslog_line("text").encode())
    log.append("".join(syslog_line("text", source) for source in ("app[1]", "cron", "app[2]")))
    agent.follow(log)
    agent.listen = "127.0.0.1:0"
    agent.start()
    api = Api(agent)
    status, _, answer = api.request("GET", f"/api/v1/fields?log={log}")
    assert status == 200
    assert [(one["name"], one["entries"], one["example"]) for one in answer["fields"]] == [
        ("host", 3, "web1"),
        ("message", 3, "text"),
        ("tag", 3, "app"),
        ("pid", 2, "2"),
    ]
    assert (answer["entries"], answer["complete"]) == (3, True)
    assert api.request("GET", f"/api/v1/fields?log={plain}")[2]["fields"] == []
    assert api.request("GET", "/api/v1/fields?log=/absent")[0] == 404
    assert api.request("GET", "/api/v1/fields")[0] == 400
