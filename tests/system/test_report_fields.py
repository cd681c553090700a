"""Fields in the rows of reports: over generations and every kind of log, with zrmctl, bounded."""

import csv
import gzip
import io
import json

import pytest
from api import Api
from conftest import ROOT, Log, syslog_line
from journal import Journal

import zrmctl

FROM = "2026-01-01T00:00:00Z"
FILL = "x" * 200


def access(number, status):
    """A line of an access log, whose path is neither JSON nor CSV in itself."""
    return (
        f'192.0.2.{number} - - [20/Nov/2026:06:00:{number:02} +0000] "GET /a\\,{number} HTTP/1.1" '
        f'{status} 5 "-" "agent"\n'
    )


@pytest.fixture
def api(agent):
    """The API of an agent that follows what a test adds before."""
    agent.listen = "127.0.0.1:0"
    agent.agent_keys["log_config"] = None
    agent.formats = ROOT / "formats"

    def started():
        agent.start()
        return Api(agent)

    return started


def rows(api, log, **members):
    status, _, answer = api.request("POST", "/api/v1/reports", {"log": str(log), "from": FROM, **members})
    assert status == 200, answer
    assert answer["count"] == len(answer["rows"])
    return answer["rows"]


def fields(api, log, **members):
    return [row["fields"] for row in rows(api, log, **members)]


def followed(agent, content="", **keys):
    log = Log(agent.directory / "app.log")
    log.path.write_text(content)
    agent.follow(log, **keys)
    return log


def shown(api, log, *options):
    """Standard output and error of zrmctl report."""
    reach = ["--url", f"http://127.0.0.1:{api.port}", "--token-file", str(api.token_file)]
    code, output, errors = zrmctl.run(["report", str(log), "--from", FROM, *options, *reach])
    assert code == 0, errors
    return output, errors


def test_rows_have_the_fields_that_were_asked_for(agent, api):
    log = followed(agent, access(7, 500), format="nginx-access")
    with gzip.open(f"{log}.2.gz", "wt") as oldest:
        oldest.write(access(1, 200) + access(2, 404))
    (agent.directory / "app.log.1").write_text(access(3, 201) + access(4, 301))
    api = api()
    assert fields(api, log, fields=["status"]) == [
        {"status": status} for status in ("500", "301", "201", "404", "200")
    ]
    assert fields(api, log, fields=["path", "absent", "status"], limit=4, where=["field.status < 500"]) == [
        {"path": f'/a\\,{number}', "status": status}
        for number, status in ((4, "301"), (3, "201"), (2, "404"), (1, "200"))
    ]
    assert fields(api, log, fields=["absent"], limit=1) == [{}]
    (everything,) = fields(api, log, fields=["*"], limit=1)
    assert {"status", "path", "referer", "method"} <= set(everything)
    assert "fields" not in rows(api, log, limit=1)[0]
    assert "fields" not in rows(api, log, limit=1, fields=[])[0]


def test_every_kind_of_entry_gives_its_fields(agent, api):
    def add(name, content, **keys):
        log = Log(agent.directory / name)
        log.path.write_text(content)
        agent.follow(log, **keys)
        return log

    pattern = r"^(?P<time>\S+) (?P<user>\w+) (?P<description>.*)"
    regex = add("regex.log", "2026-11-20T06:00:00Z anna text\n", type="regex", format=pattern)
    lines = add("json.log", '{"time":"2026-11-20T06:00:00Z","msg":"text","disk":{"free":5}}\n', type="json")
    system = add("system.log", syslog_line("text", "app[7]"))
    journal = Journal(agent.directory / "journal")
    journal.write("in the journal", CODE_LINE=17)
    agent.tables.append({"type": "journal", "directory": str(journal.directory)})
    api = api()
    assert fields(api, regex, fields=["user"]) == [{"user": "anna"}]
    assert fields(api, lines, fields=["disk.free", "msg"]) == [{"msg": "text", "disk.free": "5"}]
    assert fields(api, system, fields=["pid", "tag"]) == [{"tag": "app", "pid": "7"}]
    assert fields(api, "journal", fields=["CODE_LINE"]) == [{"CODE_LINE": "17"}]
    assert "_HOSTNAME" in fields(api, "journal", fields=["*"])[0]


def test_the_fields_of_a_row_are_bounded(agent, api):
    time = '"time":"2026-11-20T06:00:00Z"'
    long = f'{{{time},"msg":"long","a":"{"ä" * 10_000}","b":"lost"}}\n'
    many = f'{{{time},"msg":"many",' + ",".join(f'"f{number}":{number}' for number in range(300)) + "}\n"
    log = followed(agent, f'{{{time},"msg":"short","b":"kept"}}\n' + long + many, type="json")
    api = api()
    of_many, of_long, of_short = rows(api, log, fields=["*"])
    assert (len(of_many["fields"]), of_many["fields_cut"]) == (256, True)
    assert "fields_cut" not in of_short and of_short["fields"]["b"] == "kept"
    assert of_long["fields_cut"] is True and "b" not in of_long["fields"]
    assert set(of_long["fields"]["a"]) == {"ä"}
    size = sum(len((name + value).encode()) for name, value in of_long["fields"].items())
    assert 16 * 1024 - 1 <= size <= 16 * 1024
    _, of_long, of_short = rows(api, log, fields=["b"])
    assert (of_long["fields"], of_short["fields"]) == ({"b": "lost"}, {"b": "kept"})
    assert "fields_cut" not in of_long
    _, errors = shown(api, log, "--fields", "*")
    assert "not all fields of 2 entries are shown" in errors


def test_fields_that_fill_the_memory_end_a_report_with_their_file(agent, api):
    log = followed(agent, '{"time":"2026-11-22T06:00:00Z","n":"newest"}\n', type="json")
    times = [f"2026-11-20T06:{number // 60:02}:{number % 60:02}Z" for number in range(3000)]
    with gzip.open(f"{log}.1.gz", "wt", compresslevel=1) as older:
        older.writelines(f'{{"time":"{time}","n":"{time}","fill":"{"x" * 15000}"}}\n' for time in times)
    (agent.directory / "app.log.2").write_text('{"time":"2026-11-19T06:00:00Z","n":"oldest"}\n')
    api = api()
    body = {"log": str(log), "from": FROM, "limit": 10000}
    answer = api.request("POST", "/api/v1/reports", {**body, "fields": ["n", "fill"]})[2]
    found = [row["fields"]["n"] for row in answer["rows"]]
    assert 2000 < len(found) < 2500
    assert found == ["newest", *reversed(times[-len(found) + 1 :])]
    assert (answer["complete"], answer["truncated"]) == (False, False)
    problem = f"the fields of its newest {len(found) - 1} entries have 32 MiB"
    assert answer["files"][1]["problem"].startswith(problem)
    assert problem in answer["reason"]
    found = fields(api, log, limit=10000, fields=["n"])
    assert [one["n"] for one in found] == ["newest", *reversed(times), "oldest"]
    found = fields(api, log, limit=11, fields=["n", "fill"])
    assert [one["n"] for one in found] == ["newest", *reversed(times[-10:])]


def test_logs_of_the_log_configuration_and_odd_names_are_refused(agent, api):
    del agent.agent_keys["log_config"]
    plain = agent.log("plain.log", content=syslog_line("text").encode())
    api = api()

    def refusal(**members):
        body = {"log": str(plain), "from": FROM, **members}
        status, _, problem = api.request("POST", "/api/v1/reports", body)
        assert status == 400
        return problem["field"], problem["detail"]

    field, detail = refusal(fields=["*"])
    assert field == "fields" and "monitor the log with [[log]]" in detail
    assert refusal(fields="status")[0] == "fields"
    assert refusal(fields=["user", ""])[0] == "fields[1]"
    assert refusal(fields=["x" * 256])[0] == "fields[0]"
    assert "write 'user'" in refusal(fields=["field.user"])[1]
    assert len(rows(api, plain)[0]) == 18


def test_zrmctl_shows_fields_as_columns(agent, api):
    content = "".join(access(number, 200 + number) for number in (1, 2))
    log = followed(agent, content, format="nginx-access")
    api = api()
    output, _ = shown(api, log, "--columns", "ENTRYTIME", "--fields", "status,path,absent")
    heading, *lines = output.splitlines()
    assert heading.split() == ["ENTRYTIME", "field.status", "field.path", "field.absent"]
    assert [line.split()[2:] for line in lines] == [["202", '/a\\,2'], ["201", '/a\\,1']]
    assert "field.status" in shown(api, log, "--fields", "status")[0].splitlines()[0]

    output, _ = shown(api, log, "--format", "csv", "--columns", "ENTRYSYS", "--fields", "path", "--fields", "status")
    assert list(csv.reader(io.StringIO(output))) == [
        ["ENTRYSYS", "field.path", "field.status"],
        ["", '/a\\,2', "202"],
        ["", '/a\\,1', "201"],
    ]
    output, _ = shown(api, log, "--format", "csv", "--columns", "ENTRYSYS", "--fields", "*")
    heading, *lines = csv.reader(io.StringIO(output))
    assert {"field.status", "field.path", "field.referer"} <= set(heading) and heading[0] == "ENTRYSYS"
    assert [line[heading.index("field.status")] for line in lines] == ["202", "201"]

    output, _ = shown(api, log, "--json", "--columns", "ENTRYDESC", "--fields", "status")
    assert [sorted(row) for row in json.loads(output)["rows"]] == [["ENTRYDESC", "fields"]] * 2
    assert [row["fields"] for row in json.loads(output)["rows"]] == [{"status": "202"}, {"status": "201"}]


def test_fields_in_csv_neither_steer_nor_compute(agent, api):
    content = '{"time":"2026-11-20T06:00:00Z","msg":"x","a":"=1+1","b":"\\u001b[31m\\u202e"}\n'
    log = followed(agent, content, type="json")
    output, _ = shown(api(), log, "--format", "csv", "--columns", "ENTRYSYS", "--fields", "a,b")
    assert output.splitlines()[1] == ",'=1+1,\\x1b[31m\\u202e"
