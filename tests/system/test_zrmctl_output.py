"""What zrmctl prints, into a pipe and on terminals of two widths.

The outputs are kept in golden/*.txt. After a wanted change, ZRM_RENEW_GOLDEN=1 rewrites these files;
read the difference before committing it.
"""

import difflib
import os
import re
import shutil
import signal
import subprocess
import tempfile
import time
from pathlib import Path

import pytest

from api import Api
from conftest import PATIENCE, Agent, syslog_line, wait_until
from receiver import free_port
from zrmctl import ZRMCTL, environment, run

GOLDEN = Path(__file__).with_name("golden")
WIDTHS = (64, 120)

# Each file holds the commands of one line below, in this order. LOG and TEXTLOG are monitored logs,
# GONE is configured without a file.
COMMANDS = {
    "program": ["--version", "--help", "", "nonsense", "status --nonsense"],
    "status": ["status", "status --json"],
    "logs": ["logs", "logs LOG", "logs TEXTLOG", "logs TEXTLOG --json", "logs GONE", "logs /none"],
    "events": [
        "events",
        "events --limit 1",
        "events --after 1 --severity critical --json",
        "events --situation none",
        "events --from yesterday --to 1h",
    ],
    "report": [
        "report LOG",
        "report LOG --where|ENTRYDESC contains 'root'|--columns|ENTRYSRC,ENTRYDESC",
        "report LOG --format csv",
        "report LOG --format json",
        "report LOG --where|ENTRYSRC is 'sshd'",
        "report LOG --from 2001-01-01 --to 2001-01-02",
        "report /none",
        "report LOG --format xml",
    ],
    "situations": [
        "situations",
        "situations list --json",
        "situations show ssh",
        "situations validate disk --severity fatal --text x --log LOG",
        "situations validate disk --severity minor --text x --log LOG",
        "situations add disk --severity minor --text|The disk is full|--log LOG "
        "--when|ENTRYDESC contains 'disk full'",
        "situations add disk --severity minor --text again",
        "situations set disk --severity major --frequency|>= 3|--period 5m",
        "situations set disk",
        "situations stop disk",
        "situations show disk",
        "situations start disk",
        "situations show disk --json",
        "situations remove disk",
        "situations show disk",
        "situations remove ssh",
    ],
    "explain": [
        "explain ssh --log LOG --last 2",
        "explain ssh --log LOG --line|Nov 20 07:03:09 web1 cron[1]: nothing",
        "explain ssh --event 1",
        "explain ssh --event 1 --json",
        "explain ssh",
        "explain none --event 1",
    ],
    "backtest": ["backtest ssh", "backtest ssh --json", "backtest none"],
    "trace": ["trace", "trace error,LogManager=error+detail", "trace", "trace nonsense", "trace error"],
    "refresh": ["refresh", "refresh --json"],
}

FIXED = [
    (r'("version": ?)"[0-9a-f]{16}"', r'\1"0123456789abcdef"'),  # of a situation, by its log's path
    (r"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d\.\d{3}Z", "2026-01-02T03:04:05.678Z"),
    (r"20[1-9]\d-\d\d-\d\d \d\d:\d\d:\d\d", "2026-01-02 03:04:05"),
    (r"\b1\d{15}\b", "1260102030405000"),
    (r"20[1-9]\d-\d\d-\d\d(?=…)", "2026-01-02"),
    (r"(?!Nov 20 07)[A-Z][a-z]{2} [ \d]\d \d\d:\d\d:\d\d", "Jan  2 03:04:05"),
    (r"(up(?:␛\[0m)? +)\d+ \w+(?: \d+ s)?(?=, since)", r"\g<1>7 s"),
    (r"(events, 1 to \d+, )[\d.]+ \w+", r"\g<1>460 kB"),
    (r'("bytes": ?)\d+', r"\g<1>460000"),
    (r"127\.0\.0\.1:\d+", "127.0.0.1:7186"),
]


@pytest.fixture
def watched():
    """A running agent with two logs and six events; its path is as long as in the kept files."""
    directory = Path(tempfile.mkdtemp(prefix="z-", suffix="-test", dir="/tmp"))
    agent = Agent(directory)
    try:
        months_ago = time.localtime(time.time() - 180 * 86400)  # before every report's window
        log = agent.log("auth.log", syslog_line("old", when=months_ago).encode())
        text = agent.log("app.log", b"12:00 old\n", ';N ;U ;A,"%d:%d %s" , hour minute type')
        agent.configure(f"{directory}/gone ;N ;S", append=True)
        agent.situation("ssh", log, ["ENTRYSRC starts 'sshd'"], text="Failed logins",
                        severity="critical", frequency=">= 2", period="1h")  # fmt: skip
        agent.situation("every-entry", log)
        agent.environment["LC_ALL"] = "C.UTF-8"
        agent.listen = f"127.0.0.1:{free_port()}"
        agent.start()
        when = time.localtime()
        entry = lambda message: syslog_line(message, "sshd[4]", when=when)
        log.append(
            entry("Failed password for root from 203.0.113.7 port 4711 ssh2, again and again")
            + entry("Schlüssel für root abgelehnt")
            + entry("odd \x1b[31mred, \"quoted\" text")
            + syslog_line("disk full", "kernel", when=when)
        )
        text.append("12:31 good\n25:xx bad\n")
        agent.wait_events(6)
        api = Api(agent)
        answer = lambda path: api.request("GET", path)[2]

        def is_settled():
            sink = answer("/api/v1/status")["sinks"][0]
            ledgers = {one["log"]: one["ledger"] for one in answer("/api/v1/logs")["logs"]}
            return sink["delivered"] == 6 and ledgers[str(text)]["lines"] == 2

        wait_until(is_settled, "the sink and both logs")
        assert api.request("PUT", "/api/v1/trace", {"levels": "error"})[0] == 200
        yield agent, log, text, answer("/api/v1/status")
    finally:
        agent.dispose()
        shutil.rmtree(directory)


def arguments_of(command, log, text):
    """The words of a command; those with blanks are between bars."""
    places = {"LOG": str(log), "TEXTLOG": str(text), "GONE": str(log.path.with_name("gone"))}
    words = []
    for number, part in enumerate(command.split("|")):
        words += [part] if number % 2 else part.split()
    return [places.get(word, word) for word in words]


def transcript(agent, log, text, status, commands):
    result = ""
    for width in (None, *WIDTHS):
        result += "\n" if result else ""
        result += f"======== {'a pipe' if width is None else f'a terminal of {width} columns'}\n"
        for command in commands:
            arguments = arguments_of(command, log, text)
            if arguments and not arguments[0].startswith("-"):
                arguments += ["--config", str(agent.zrm_toml)]
            code, output, errors = run(arguments, width)
            result += f"\n$ zrmctl {command}\n{output}"
            result += "".join(f"! {line}\n" for line in errors.splitlines())
            result += f"= {code}\n"
    result = result.replace(str(agent.directory), "/var/log/zrmctl-test").replace("\x1b", "␛")
    result = result.replace(status["node"], "web1:ZRM").replace(status["version"], "1.2.3")
    for pattern, instead in FIXED:
        result = re.sub(pattern, instead, result)
    return result


def test_outputs_match_the_kept_ones(watched):
    differences = []
    for name, commands in COMMANDS.items():
        path = GOLDEN / f"{name}.txt"
        got = transcript(*watched, commands)
        if os.environ.get("ZRM_RENEW_GOLDEN"):
            path.write_text(got, encoding="utf-8")
        kept = path.read_text(encoding="utf-8")
        differences += difflib.unified_diff(
            kept.splitlines(), got.splitlines(), str(path), "now", lineterm=""
        )
    assert not differences, "\n".join(differences)
    assert {path.stem for path in GOLDEN.glob("*.txt")} == set(COMMANDS)


def test_a_report_as_csv_neither_steers_nor_computes(agent):
    log = agent.log(content=b"")
    agent.listen = "127.0.0.1:0"
    agent.start()
    texts = ["=1+1", "+1", "-1", "@sum", "1=1", "a\u202eb\u009bc\x1b[31m\x7f"]
    log.append("".join(syslog_line(text) for text in texts))
    api = Api(agent)
    access = ["--url", f"http://127.0.0.1:{api.port}", "--token-file", str(api.token_file)]
    report = ["report", str(log), "--format", "csv", "--columns", "ENTRYDESC,ENTRYTIME", *access]
    code, output, _ = run(report)
    head, *lines = output.splitlines()
    assert (code, head) == (0, "ENTRYDESC,ENTRYTIME")
    times = [line.rpartition(",")[2] for line in lines]
    assert all(re.fullmatch(r"20\d\d-\d\d-\d\d \d\d:\d\d:\d\d", each) for each in times), times
    descriptions = [line.rpartition(",")[0] for line in reversed(lines)]
    assert descriptions == [
        "'=1+1", "'+1", "'-1", "'@sum", "1=1", "a\\u202eb\\u009bc\\x1b[31m\\x7f",
    ]  # fmt: skip


def test_nothing_is_wider_than_the_terminal(watched):
    agent, log, text, _ = watched
    for command in ("status", "logs", "events", "report LOG", "situations"):
        for width in (*WIDTHS, 91):
            arguments = [*arguments_of(command, log, text), "--config", str(agent.zrm_toml)]
            code, output, _ = run(arguments, width)
            plain = re.sub("\x1b\\[\\d*m", "", output)
            assert code == 0 and max(map(len, plain.splitlines())) <= width, plain
            assert "\x1b[31mred" not in output  # of a log line


@pytest.mark.parametrize("command", ["report LOG", "report LOG --format csv", "events --limit 1000"])
def test_a_pipe_that_is_closed_early_ends_zrmctl_quietly(watched, command):
    agent, log, text, _ = watched
    arguments = [*arguments_of(command, log, text), "--config", str(agent.zrm_toml)]
    reading, writing = os.pipe()
    os.close(reading)
    done = subprocess.run(
        [ZRMCTL, *arguments], stdout=writing, stderr=subprocess.PIPE, env=environment(),
        timeout=PATIENCE, preexec_fn=lambda: signal.signal(signal.SIGPIPE, signal.SIG_DFL),
    )  # fmt: skip
    os.close(writing)
    assert (done.returncode, done.stderr) == (-signal.SIGPIPE, b"")
