"""Ready formats: in [[log]] tables of a running agent, zrmctl formats, zrmctl suggest, the API."""

import json
import os
import re
import subprocess
from pathlib import Path

import pytest
from api import Api
from conftest import PATIENCE, Log, descriptions
from zrmctl import ZRMCTL, environment, run

FORMATS = Path(__file__).resolve().parents[2] / "formats"
NAMED = {
    "syslog-iso", "rfc5424", "nginx-access", "nginx-error", "apache-access", "apache-error", "postgresql",
    "mysql-error", "haproxy", "redis", "java", "python", "go-slog", "docker", "cri", "klog", "auditd", "dpkg",
    "apt-history", "fail2ban", "postfix", "sshd", "sudo", "kernel", "systemd", "zrmagent",
}  # fmt: skip
DIRECTORY = ["--directory", str(FORMATS)]


@pytest.fixture
def log(agent):
    agent.environment["TZ"] = "UTC0"
    agent.formats = FORMATS
    log = Log(agent.directory / "app.log")
    log.path.write_text("")
    return log


def access(status, when="10:00:00", path="/"):
    return f'203.0.113.7 - anna b [19/Nov/2026:{when} +0100] "GET {path} HTTP/1.1" {status} 5 "" "a \\"b\\""\n'


def test_a_table_names_a_format(agent, log):
    agent.follow(log, format="nginx-access", start="beginning")
    agent.situation("broken", log=log, when=["field.status >= 500"])
    log.append(access(200) + access(503, "10:00:01", "/cart"))
    agent.start()
    (event,) = agent.wait_events(1)
    row = event["row"]
    assert (row["ENTRYTIME"], row["ENTRYSRC"]) == ("1261119090001000", "203.0.113.7")
    assert (row["ENTRYTYPE"], row["ENTRYDESC"]) == ("503", "GET /cart HTTP/1.1")
    assert event["fields"] == {"status": "503"}


def test_the_api_and_the_client_name_the_format_of_a_log(agent, log):
    agent.follow(log, format="nginx-access")
    agent.situation(log=log)
    agent.sink = agent.directory / "events"
    agent.listen = "127.0.0.1:0"
    agent.start()
    agent.wait_open(log)
    api = Api(agent)
    access = ["--url", f"http://127.0.0.1:{api.port}", "--token-file", api.token_file]
    (table,) = api.request("GET", "/api/v1/logs")[2]["tables"]
    assert table["format"] == "nginx-access"
    _, output, _ = run([*access, "logs"])
    assert re.search(rf"{re.escape(str(log))} +nginx-access +Running", output), output
    _, output, _ = run([*access, "logs", str(log)])
    assert re.search(r"^type +nginx-access$", output, re.MULTILINE), output


def test_traces_of_several_lines_are_one_entry(agent, log):
    agent.follow(log, format="java", start="beginning", keep=["exception"])
    agent.situation(log=log)
    trace = "".join(f"\tat com.example.Cart.show(Cart.java:{line})\n" for line in range(40))
    log.append(
        "2026-11-19 10:00:00,123 ERROR [main] com.example.Cart: no room\n"
        f"java.lang.IllegalStateException: boom\n{trace}"
        "2026-11-19 10:00:01,123 INFO [main] com.example.Cart: next\n"
    )
    agent.start()
    first, second = agent.wait_events(2)
    assert descriptions([first, second]) == ["no room", "next"]
    assert first["row"]["ENTRYSRC"] == "com.example.Cart"
    assert first["fields"] == {"exception": "java.lang.IllegalStateException"}
    assert first["entry"].count("\n") == 41


def test_several_syslog_formats_are_joined(agent, log):
    agent.follow(log, format=["sshd", "sudo"], start="beginning", keep=["*"])
    agent.situation(log=log)
    log.append(
        "Nov 19 10:00:00 web1 sshd[7]: Failed password for root from 203.0.113.7 port 40022 ssh2\n"
        "Nov 19 10:00:01 web1 sudo: anna : TTY=pts/0 ; PWD=/ ; USER=root ; COMMAND=/bin/ls\n"
    )
    agent.start()
    ssh, sudo = agent.wait_events(2)
    assert ssh["fields"]["address"] == "203.0.113.7" and ssh["fields"]["user"] == "root"
    assert sudo["fields"]["command"] == "/bin/ls" and sudo["fields"]["user"] == "anna"


def test_a_table_changes_what_the_format_says(agent, log):
    agent.follow(log, format="nginx-access", unwrap="cri", start="beginning", defaults={"system": "web"})
    agent.situation(log=log)
    log.append("2026-11-19T10:00:00.5Z stdout F " + access(404))
    agent.start()
    (event,) = agent.wait_events(1)
    assert event["row"]["ENTRYTYPE"] == "404" and event["row"]["ENTRYSYS"] == "web"


def test_an_unknown_name_is_an_error_with_names_like_it(agent, log):
    agent.follow(log, format="nginx-acces")
    agent.start(wait=False)
    assert agent.process.wait(PATIENCE) == 2
    agent.stderr.finish()
    text = agent.stderr.text()
    assert "log.format: 'nginx-acces' is not a ready format; write a name such as 'nginx-access'" in text


def test_list_has_every_format_with_its_description():
    status, output, _ = run(["formats", "list", "--json", *DIRECTORY])
    assert status == 0
    formats = {one["name"]: one for one in json.loads(output)["formats"]}
    assert NAMED <= set(formats)
    assert all(one["description"] and one["type"] and not one["problem"] for one in formats.values())
    status, output, _ = run(["formats", *DIRECTORY])
    assert status == 0 and "nginx-access" in output


def test_show_prints_the_file():
    status, output, _ = run(["formats", "show", "redis", *DIRECTORY])
    assert status == 0
    assert output == f"# {FORMATS}/redis.toml\n" + (FORMATS / "redis.toml").read_text(encoding="utf-8")
    status, _, error = run(["formats", "show", "reddis", *DIRECTORY])
    assert status == 1 and "write a name such as 'redis'" in error


def test_every_format_passes_its_samples():
    status, output, _ = run(["formats", "test", *DIRECTORY])
    assert status == 0, output
    assert output.endswith(" 0 formats failed\n")


def test_test_says_what_differs(tmp_path):
    file = tmp_path / "mine.toml"
    file.write_text(
        """type = "logfmt"
[[sample]]
entry = "level=info msg=started"
type = "warn"
description = "started"
""",
        encoding="utf-8",
    )
    for arguments in ([str(file)], ["mine", "--directory", str(tmp_path)]):
        status, output, _ = run(["formats", "test", *arguments])
        assert status == 1
        assert output.splitlines() == [
            f'{file}:3: type is "info", not "warn"',
            "1 formats, 1 samples, 1 formats failed",
        ]
    file.write_text("type = 'logfmt'\nx = 1\n", encoding="utf-8")
    status, output, _ = run(["formats", "test", str(file)])
    assert status == 1 and f"{file}:2: x: unknown key" in output
    status, _, error = run(["formats", "test", "no-such"])
    assert status == 1 and "'no-such' is not a ready format" in error


def test_suggest_names_the_format_and_the_table(tmp_path):
    log = tmp_path / "access.log"
    log.write_text("".join(access(200, f"10:00:{i:02}") for i in range(60)) + "broken\n", encoding="utf-8")
    status, output, _ = run(["suggest", str(log), *DIRECTORY])
    assert status == 0
    assert output.startswith("98.3 % of 61 lines  ")
    assert f"\n[[log]]\npath = '{log}'\nformat = '" in output
    status, output, _ = run(["suggest", str(log), "--json", *DIRECTORY])
    answer = json.loads(output)
    assert answer["ready"][0]["percent"] == 98.3 and answer["ready"][0]["percent_time"] == 100.0
    assert answer["proposal"] is None
    named = tmp_path / "nginx" / "access.log"
    named.parent.mkdir()
    named.write_bytes(log.read_bytes())
    _, output, _ = run(["suggest", str(named), *DIRECTORY])
    assert output.startswith("98.3 % of 61 lines  nginx-access: ")
    assert "\n        fits equally: apache-access\n" in output


def test_suggest_reads_standard_input_and_makes_a_format():
    lines = "".join(f"WARN 2026-11-19 10:00:00 | number {i}\n" for i in range(5000))
    done = subprocess.run(
        [ZRMCTL, "suggest", "-", *DIRECTORY],
        input=lines.encode(),
        capture_output=True,
        env=environment(),
        timeout=PATIENCE,
        check=False,
    )
    output = done.stdout.decode()
    assert done.returncode == 0, output
    assert "100.0 % of 1000 lines  made from the shape of the lines" in output
    assert "type = 'regex'" in output and "path = '/path/to/the.log'" in output


def test_suggest_says_that_nothing_fits(tmp_path):
    log = tmp_path / "poem"
    log.write_text("Lorem ipsum dolor\nsit amet\n", encoding="utf-8")
    status, output, error = run(["suggest", str(log), *DIRECTORY])
    assert status == 1 and output == "" and "no format fits these lines" in error
    log.write_text("", encoding="utf-8")
    status, _, error = run(["suggest", str(log), *DIRECTORY])
    assert status == 1 and "has no lines" in error
    status, _, error = run(["suggest", str(tmp_path / "none"), *DIRECTORY])
    assert status == 2 and "cannot read" in error
    os.mkfifo(tmp_path / "pipe")
    status, _, error = run(["suggest", str(tmp_path / "pipe"), *DIRECTORY])
    assert status == 2 and "is not a regular file" in error


def test_the_api_suggests_for_lines_and_for_a_log(agent, log):
    agent.follow(log, type="syslog")
    agent.situation(log=log)
    agent.listen = "127.0.0.1:0"
    log.append(access(200) * 3)
    agent.start()
    api = Api(agent)
    for body in ({"lines": [access(200).rstrip("\n")]}, {"log": str(log)}, {"log": str(log), "last": 2}):
        status, _, answer = api.request("POST", "/api/v1/suggest", body)
        assert status == 200, answer
        assert answer["ready"][0]["percent"] == 100.0
        assert answer["ready"][0]["formats"][0].endswith("-access")
    assert f"path = '{log}'" in answer["ready"][0]["table"]
    for body, field in (
        ({}, "lines"),
        ({"lines": ["x"], "last": 1}, "last"),
        ({"log": "/etc/passwd"}, "log"),
        ({"lines": ["x" * 16385]}, "lines[0]"),
    ):
        status, _, answer = api.request("POST", "/api/v1/suggest", body)
        assert status == 400 and answer["field"] == field, answer
