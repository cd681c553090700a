"""What the API, the client and the check say about logs of [[log]] tables."""

import json
import re
from signal import SIGCONT, SIGSTOP

import pytest
from api import Api
from conftest import Log, syslog_line, wait_until
from zrmctl import run

TIME = r"\d{4}-\d\d-\d\d \d\d:\d\d:\d\d"


class Client:
    """zrmctl on a running agent."""

    def __init__(self, agent):
        self.api = Api(agent)

    def __call__(self, *arguments):
        access = ["--url", f"http://127.0.0.1:{self.api.port}", "--token-file", self.api.token_file]
        return run([*access, *arguments])

    def log(self, log):
        status, _, answer = self.api.request("GET", f"/api/v1/logs?log={log}")
        assert status == 200, answer
        return answer["logs"][0]

    def ledger(self, log):
        return self.log(log)["ledger"] or {"follow": None, "warnings": []}


@pytest.fixture
def both(agent):
    """A configuration whose two lists have a file in common."""
    agent.shared = agent.log("shared.log")
    agent.own = Log(agent.directory / "own.log")
    agent.own.path.write_text(syslog_line("old"))
    (agent.directory / "own.log.gz").write_bytes(b"")
    agent.follow(agent.directory / "*.log*")
    agent.listen = "127.0.0.1:0"
    return agent


def test_the_check_marks_what_belongs_to_the_log_configuration(both):
    both._write_toml()
    line = 1 + both.zrm_toml.read_text().splitlines().index("[[log]]")
    status, text, errors = run(["check", "--host", str(both.zrm_toml)])
    assert (status, errors) == (0, "")
    assert text.splitlines() == [
        f"{both.zrm_toml} can be used",
        f"[[log]] at line {line}: 1 file",
        f"  {both.own}",
        f"  passed over  {both.own}.gz: It is compressed.",
        f"  passed over  {both.shared}: The log configuration names it, too, and its line applies.",
    ]
    status, text, errors = run(["--json", "check", "--host", str(both.zrm_toml)])
    (table,) = json.loads(text)["logs"]
    assert table == {
        "line": line,
        "format": "syslog",
        "path": [f"{both.directory}/*.log*"],
        "files": [str(both.own)],
        "passed_over": [
            {"file": f"{both.own}.gz", "reason": "It is compressed."},
            {"file": str(both.shared), "reason": "The log configuration names it, too, and its line applies."},
        ],
        "passed_over_count": 2,
        "problem": None,
    }
    both.shared.path.unlink()  # its line is refused, and it is not there to be matched
    assert "shared.log" not in run(["check", "--host", str(both.zrm_toml)])[1]


def test_the_agent_says_which_table_a_log_comes_from(both):
    both.start()
    both.wait_open(both.own)
    client = Client(both)
    (table,) = client.api.request("GET", "/api/v1/logs")[2]["tables"]
    assert table["files"] == [str(both.own)]
    assert [one["file"] for one in table["passed_over"]] == [f"{both.own}.gz", str(both.shared)]
    assert client.api.request("GET", f"/api/v1/logs?log={both.own}")[2]["tables"] == [table]
    assert client.api.request("GET", f"/api/v1/logs?log={both.logs_conf}")[0] == 404
    status, _, answer = client.api.request("GET", f"/api/v1/logs?log={both.own}.gz")
    assert status == 404
    assert f"the [[log]] at line {table['line']} passes over it: It is compressed" in answer["detail"]
    status, _, errors = client("logs", f"{both.own}.gz")
    assert status == 1 and "passes over it: It is compressed" in errors


@pytest.mark.slow
def test_the_client_shows_everything_about_a_followed_log(agent):
    log = Log(agent.directory / "app.log")
    log.path.write_text(syslog_line("old"))
    agent.follow(log)
    agent.situation(log=log)
    agent.sink = agent.directory / "events"
    agent.listen = "127.0.0.1:0"
    agent.start()
    agent.wait_open(log)
    client = Client(agent)
    log.append(syslog_line("one"))
    agent.wait_events(1)
    before = log.path.stat().st_size
    agent.send(SIGSTOP)
    log.append(syslog_line("only in the copy"))
    (agent.directory / "app.log.1").write_bytes(log.path.read_bytes())
    copied = log.path.stat().st_size
    log.path.write_bytes(syslog_line("present").encode())
    size = log.path.stat().st_size
    agent.send(SIGCONT)
    agent.wait_events(3)
    log.append("half a line")
    wait_until(lambda: client.ledger(log)["follow"]["position"] == size, "the position")
    wait_until(lambda: client.log(log)["row"]["LOGSIZE"] == size + 11, "the half line")
    wait_until(lambda: client.ledger(log)["follow"]["behind"] == 11, "the half line to be seen")
    log.path.write_bytes(b"")
    wait_until(lambda: client.ledger(log)["follow"]["lost_bytes"] == 11, "the loss")
    wait_until(lambda: client.ledger(log)["warnings"], "the warning")
    agent.wait_trace(f"zrmagent: {log}: Bytes {size} to {size + 11} were lost at ")
    status, text, errors = client("logs", str(log))
    assert (status, errors) == (0, "")
    facts, ranges = text.split("\n\n")
    shown = dict(re.split(r"  +", line, maxsplit=1) for line in facts.splitlines())
    read = shown.pop("read")
    assert re.fullmatch(r"\d+ B", read)
    warning = shown.pop("warning")
    assert warning.startswith(f"Bytes {size} to {size + 11} were lost at 2")
    assert warning.endswith("or name theirs in rotated_to.")
    for name in ("since", "changed", "last entry"):
        assert re.fullmatch(TIME, shown.pop(name)), name
    assert shown.pop("generations").isdigit()
    line = 1 + agent.zrm_toml.read_text().splitlines().index("[[log]]")
    assert shown == {
        "health": "ok",
        "log": str(log),
        "type": "syslog",
        "configured by": f"[[log]] at line {line}",
        "status": "Running (!)",
        "size": "0 B",
        "entries": "3",
        "errors": "0",
        "lines": "3",
        "parsed": "100.0 %",
        "rows": "3",
        "format errors": "0",
        "without a time": "0",
        "truncations": "2",
        "monitor restarts": "0",
        "following": "reading",
        "generation": str(log),
        "position": "0",
        "behind": "0 B",
        "recovered": f"{copied - before} B",
        "lost": "11 B",
        "cut entries": "0",
    }
    heading, recovered, lost = ranges.splitlines()
    assert heading.split() == "TIME WHAT FROM BYTE TO BYTE FILE".split()
    assert re.fullmatch(rf"{TIME} +recovered +{before} +{copied} +{re.escape(str(log))}\.1", recovered)
    assert re.fullmatch(rf"{TIME} +lost +{size} +{size + 11} *", lost)
    assert client("logs", "--check")[0] == 1


def test_a_refresh_looks_at_the_globs(agent):
    """Also covered where no interval can hide it, by the unit tests of LogList."""
    agent.follow(agent.directory / "*.log", start="beginning")
    agent.situation()
    agent.start()
    (agent.directory / "new.log").write_text(syslog_line("new"))
    agent.refresh()
    agent.wait_events(1)


@pytest.mark.slow
def test_a_log_that_cannot_be_read_has_a_warning_until_it_can(agent):
    """A path through a loop of links fails for every user."""
    directory = agent.directory / "logs"
    directory.mkdir()
    log = Log(directory / "app.log")
    log.path.write_text(syslog_line("old"))
    agent.follow(log)
    agent.situation(log=log)
    agent.listen = "127.0.0.1:0"
    agent.start()
    agent.wait_open(log)
    client = Client(agent)
    hidden = agent.directory / "hidden"
    directory.rename(hidden)
    directory.symlink_to(directory)
    warning = wait_until(lambda: client.ledger(log)["warnings"], "the warning")[0]
    assert warning["kind"] == "failing"
    assert "Too many levels of symbolic links" in warning["text"]
    agent.wait_trace("is tried again. errno = 40")
    status, text, _ = client("logs", str(log))
    assert "Running (!)" in text and "problem" in text
    assert client("logs", "--check")[0] == 1
    Log(hidden / "app.log").append(syslog_line("written meanwhile"))
    directory.unlink()
    hidden.rename(directory)
    agent.wait_events(1)
    wait_until(lambda: not client.ledger(log)["warnings"], "the end of the warning")


def test_a_trial_judges_lines_as_the_table_of_their_log(agent):
    log = Log(agent.directory / "app.log")
    log.path.write_text("Nov 20 06:03:09 web1 app[1]: first\nneither\n")
    agent.environment["TZ"] = "Europe/Berlin"
    agent.follow(log, timezone="UTC")
    text = Log(agent.directory / "text.log")
    text.path.write_text("2026-11-20T06:03:09Z hello\n")
    zoned = "A,\"%d-%d-%dT%d:%d:%d%s %99s\",year month day hour minute second zone description"
    agent.follow(text, type="text", format=zoned)
    plain = agent.log("plain.log", b"2026-11-20T06:03:09Z hello\n")
    agent.listen = "127.0.0.1:0"
    agent.start()
    agent.wait_open(text)
    client = Client(agent)

    def trial(expected=200, **body):
        status, _, answer = client.api.request("POST", "/api/v1/try", body)
        assert status == expected, answer
        return answer

    answer = trial(type="syslog", log=str(log), last=2)
    assert [line["matched"] for line in answer["lines"]] == [True, False]
    assert answer["lines"][0]["row"]["ENTRYTIME"].endswith("070309000")
    assert answer["lines"][1]["row"]["ENTRYDESC"] == "neither"
    assert answer["configuration_line"] is None
    assert answer["table"] == f"[[log]]\npath = '{log}'\ntimezone = 'UTC'\n"
    (line,) = trial(format=zoned, log=str(text), last=1)["lines"]
    assert line["row"]["ENTRYTIME"] == "1261120070309000"
    assert not trial(format=zoned, log=str(plain), last=1)["accepted"]
    assert trial(format=zoned, log=str(plain), last=1, rules="table")["accepted"]
    assert trial(format=zoned, lines=["x"], rules="log_config", log=str(text))["accepted"] is False
    assert trial(400, format="A", lines=["x"], timezone="Nowhere/Town")["field"] == "timezone"
    assert trial(400, lines=["x"])["field"] == "format"
    assert trial(400, type="xml", lines=["x"])["field"] == "type"
    assert trial(400, rules="none", format="A")["field"] == "rules"
    assert trial(400, rules="log_config", type="syslog", lines=["x"])["field"] == "rules"


@pytest.mark.slow
def test_a_rejected_line_of_a_table_has_its_reason(agent):
    text = Log(agent.directory / "text.log")
    text.path.write_text("")
    zoned = "A,\"%d-%d-%dT%d:%d:%d%s %99s\",year month day hour minute second zone description"
    agent.follow(text, type="text", format=zoned, start="beginning")
    agent.listen = "127.0.0.1:0"
    agent.start()
    client = Client(agent)
    text.append("2026-11-20T06:03:09Z fits\n2026-11-20T no time\n")
    (rejected,) = wait_until(lambda: client.ledger(text).get("rejected"), "the rejected line")
    assert rejected["reason"] == "A number for %d is expected here."


def test_the_client_tries_lines_as_a_table_would(tmp_path):
    file = tmp_path / "sys.log"
    file.write_text("2026-11-20T06:03:09Z web1 app[1]: first\nneither\n")
    status, text, errors = run(["try", "--type", "syslog", "--timezone", "UTC", str(file)], TZ="Europe/Berlin")
    assert (status, errors) == (0, "")
    assert "ENTRYTIME   2026-11-20 07:03:09" in text and "1 of 2 lines fit (50.0 %)" in text
    assert text.endswith(f"[[log]]\npath = '{file}'\ntimezone = 'UTC'\n")
    zoned = 'A,"%d-%d-%dT%d:%d:%d%s" , year month day hour minute second zone'
    assert run(["try", zoned, str(file)])[0] == 1
    status, text, _ = run(["try", "--table", zoned, str(file)], TZ="Europe/Berlin")
    assert status == 0 and "ENTRYTIME   2026-11-20 07:03:09" in text
    assert run(["try", "--type", "syslog", "A", str(file)])[0] == 2
    assert run(["try", "A"])[2] == "zrmctl: try: FILE is required\n"
    status, _, errors = run(["try", "--timezone", "Nowhere/Town", "A", str(file)])
    assert status == 2 and "'Nowhere/Town' is not a time zone of this machine" in errors
