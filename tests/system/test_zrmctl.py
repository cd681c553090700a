"""zrmctl from outside: what it prints, how it follows, how it ends.

What commands print is kept in golden/*.txt: into a pipe, and on terminals of two widths. After a
wanted change, ZRM_RENEW_GOLDEN=1 writes these files anew; read the difference before committing it.
"""

import difflib
import fcntl
import json
import os
import pty
import re
import shutil
import signal
import socket
import struct
import subprocess
import tempfile
import termios
import time
from pathlib import Path
from signal import SIGINT, SIGKILL, SIGTERM

import pytest

from api import Api
from conftest import PATIENCE, PROGRAM, Agent, Lines, syslog_line, wait_until
from test_http_tls import make_certificate

ZRMCTL = str(Path(PROGRAM).with_name("zrmctl"))
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


def free_port():
    with socket.socket() as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


def environment(**more):
    clean = {k: v for k, v in os.environ.items() if not k.startswith("ZRM_")}
    for name in ("COLUMNS", "NO_COLOR"):
        clean.pop(name, None)
    return {**clean, "LC_ALL": "C.UTF-8", "TERM": "xterm", **more}


def run(arguments, width=None, **variables):
    """(status, standard output, standard error) of zrmctl, on a terminal of that width or not."""
    if width is None:
        done = subprocess.run(
            [ZRMCTL, *arguments],
            stdin=subprocess.DEVNULL,
            capture_output=True,
            env=environment(**variables),
            timeout=PATIENCE,
        )
        return done.returncode, done.stdout.decode(), done.stderr.decode()
    ours, its = pty.openpty()
    fcntl.ioctl(its, termios.TIOCSWINSZ, struct.pack("HHHH", 24, width, 0, 0))
    with subprocess.Popen(
        [ZRMCTL, *arguments],
        stdin=subprocess.DEVNULL,
        stdout=its,
        stderr=subprocess.PIPE,
        env=environment(**variables),
    ) as process:
        os.close(its)
        output = b""
        try:
            while piece := os.read(ours, 65536):
                output += piece
        except OSError:  # the other end is closed
            pass
        os.close(ours)
        errors = process.stderr.read().decode()
    return process.returncode, output.decode().replace("\r\n", "\n"), errors


@pytest.fixture
def watched():
    """A running agent with two logs and six events, below a path as long as the one that is kept."""
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
    """The words of a command; those with blanks stand between bars."""
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


def test_outputs_are_as_kept(watched):
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


class Follower:
    """zrmctl events -f --json."""

    def __init__(self, agent):
        self.process = subprocess.Popen(
            [ZRMCTL, "events", "-f", "--json", "--config", str(agent.zrm_toml)],
            stdin=subprocess.DEVNULL,
            stdout=subprocess.PIPE,
            stderr=subprocess.PIPE,
            env=environment(),
        )
        self.output, self.errors = Lines(self.process.stdout), Lines(self.process.stderr)

    def ids(self):
        return [json.loads(line)["id"] for line in self.output()]

    def wait(self, count):
        wait_until(lambda: len(self.output()) >= count, lambda: f"{count}: {self.errors.text()}")

    def end(self, number):
        self.process.send_signal(number)
        status = self.process.wait(PATIENCE)
        self.output.finish()
        self.errors.finish()
        return status


@pytest.fixture
def followed(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.listen = f"127.0.0.1:{free_port()}"
    agent.start()
    followers = []

    def follow():
        followers.append(Follower(agent))
        return followers[-1]

    yield agent, log, follow
    for follower in followers:
        if follower.process.poll() is None:
            follower.end(SIGKILL)


def test_following_goes_on_over_restarts_of_the_agent(followed):
    agent, log, follow = followed
    log.append(syslog_line("before"))
    agent.wait_events(1)
    follower = follow()
    follower.wait(1)
    for number, ending in enumerate((SIGTERM, SIGKILL), 1):
        log.append(syslog_line("one") + syslog_line("two"))
        follower.wait(3 * number)
        agent.send(ending)
        agent.wait_end()
        wait_until(lambda: len(follower.errors()) == 2 * number - 1, "the loss to be told")
        agent.start()
        log.append(syslog_line("meanwhile"))
        follower.wait(3 * number + 1)
        wait_until(lambda: len(follower.errors()) == 2 * number, "the connection to be told")
    assert follower.ids() == list(range(1, 8))
    assert follower.end(SIGINT) == 0
    assert follower.ids() == list(range(1, 8))
    lost = "zrmctl: the connection to the agent was lost; reconnecting"
    assert follower.errors.text().splitlines() == [lost, "zrmctl: reconnected"] * 2


def test_ctrl_c_ends_following_with_status_0(followed):
    agent, log, follow = followed
    log.append(syslog_line("before"))
    agent.wait_events(1)
    connected, waiting = follow(), follow()
    connected.wait(1)
    waiting.wait(1)
    assert connected.end(SIGINT) == 0 and connected.errors.text() == ""
    assert agent.stop() == 0
    wait_until(lambda: waiting.errors(), "the loss to be told")
    assert waiting.end(SIGTERM) == 0  # also while no agent is there


def test_exit_statuses_tell_what_failed(followed, tmp_path):
    agent, log, _ = followed
    config = ("--config", str(agent.zrm_toml))
    assert run(["logs", *config])[0] == 0
    assert run(["logs", str(log) + "x", *config])[0] == 1
    assert run(["logs", "--config", str(tmp_path / "none.toml")])[0] == 2
    (tmp_path / "broken.toml").write_text("[http\n")
    assert run(["logs", "--config", str(tmp_path / "broken.toml")])[0] == 2
    code, output, errors = run(["logs", *config], ZRM_TOKEN="wrong")
    assert (code, output) == (4, "")
    assert errors.endswith(
        "does not accept the token from ZRM_TOKEN: give the right one with --token-file or --config\n"
    )
    assert run(["logs", *config, "--token-file", str(tmp_path / "none")])[0] == 4
    assert agent.stop() == 0
    code, output, errors = run(["logs", *config])
    assert (code, output) == (3, "")
    assert errors.startswith(f"zrmctl: cannot reach the agent at http://{agent.listen}: is zrmagent")


def test_one_wrong_key_keeps_nobody_from_the_agent(followed, tmp_path):
    agent, _, _ = followed
    wrong = tmp_path / "wrong.toml"
    wrong.write_text("nonsense = 1\n" + agent.zrm_toml.read_text() + "\n[[situation]]\nname = 5\n")
    assert run(["status", "--config", str(wrong)])[0] == 0
    assert run(["check", "--host", str(wrong)])[0] == 1


def test_check_ends_with_status_1_when_something_is_wrong(agent):
    log = agent.log()
    agent.listen = "127.0.0.1:0"
    agent.start()
    api = Api(agent)
    access = ["--url", f"http://127.0.0.1:{api.port}", "--token-file", str(api.token_file)]
    wait_until(lambda: run(["logs", "--check", *access])[0] == 0, "the log to run")
    assert run(["logs", str(log), "--check", *access])[0] == 0
    assert run(["status", "--check", *access])[0] == 0
    log.path.rename(log.path.with_name("elsewhere"))
    assert run(["logs", *access])[0] == 0
    assert run(["logs", "--check", *access])[0] == 1
    code, output, _ = run(["logs", str(log), "--check", "--json", *access])
    assert code == 1 and json.loads(output)["log"] == str(log)


def test_check_names_the_sink_that_fails(agent):
    log = agent.log()
    agent.listen = "127.0.0.1:0"
    agent.situation(log=log)
    agent.sink = str(log.path.parent / "no" / "such" / "file")
    agent.start()
    api = Api(agent)
    access = ["--url", f"http://127.0.0.1:{api.port}", "--token-file", str(api.token_file)]
    log.append(syslog_line("one"))
    wait_until(lambda: run(["status", "--check", *access])[0] == 1, "the sink to fail")
    assert run(["status", *access])[0] == 0
    code, _, errors = run(["status", "--check", *access])
    assert code == 1 and re.search("the sink .* fails: .*No such file", errors), errors


def test_the_certificate_of_the_configuration_is_trusted(agent):
    certificate, key = make_certificate(agent.directory)
    agent.log()
    agent.listen = f"0.0.0.0:{free_port()}"
    agent.http_keys = {"certificate": certificate, "key": key}
    agent.start()
    code, output, errors = run(["logs", "--config", str(agent.zrm_toml)])
    assert (code, errors) == (0, "") and "app.log" in output
    token = agent.directory / "state" / "api-token"
    url = "https://" + agent.listen.replace("0.0.0.0", "127.0.0.1")
    code, _, errors = run(["logs", "--url", url, "--token-file", str(token)])
    assert code == 3 and "has no certificate that this machine trusts" in errors
    assert errors.endswith(", with --ca-file\n")
    by_hand = ["logs", "--url", url, "--token-file", str(token)]
    code, output, errors = run([*by_hand, "--ca-file", str(certificate)])
    assert (code, errors) == (0, "") and "app.log" in output
    assert run(by_hand, ZRM_CA_FILE=str(certificate))[0] == 0
    other, _ = make_certificate(agent.directory, "other")
    assert run([*by_hand, "--ca-file", str(other)], ZRM_CA_FILE=str(certificate))[0] == 3
    # The name that is asked for must be one of the certificate's.
    code, _, errors = run([*by_hand[:2], url.replace("127.0.0.1", "127.0.0.2"), *by_hand[3:],
                           "--ca-file", str(certificate)])  # fmt: skip
    assert code == 3 and "trusts for this address" in errors


def test_an_authority_of_the_house_is_trusted_when_it_is_named(agent):
    directory = agent.directory
    openssl = lambda *words: subprocess.run(
        ["openssl", *map(str, words)], check=True, capture_output=True
    )
    request = ("-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:prime256v1", "-nodes")
    openssl("req", "-x509", *request, "-subj", "/CN=House", "-days", "2",
            "-keyout", directory / "ca.key", "-out", directory / "ca.pem")  # fmt: skip
    openssl("req", *request, "-subj", "/CN=agent", "-keyout", directory / "a.key",
            "-out", directory / "a.csr")  # fmt: skip
    (directory / "names").write_text("subjectAltName=IP:127.0.0.1\n")
    openssl("x509", "-req", "-in", directory / "a.csr", "-CA", directory / "ca.pem", "-CAkey",
            directory / "ca.key", "-CAcreateserial", "-days", "2", "-extfile", directory / "names",
            "-out", directory / "a.pem")  # fmt: skip
    agent.log()
    agent.listen = f"0.0.0.0:{free_port()}"
    agent.http_keys = {"certificate": directory / "a.pem", "key": directory / "a.key"}
    agent.start()
    url = "https://" + agent.listen.replace("0.0.0.0", "127.0.0.1")
    arguments = ["logs", "--url", url, "--token-file", str(directory / "state" / "api-token")]
    assert run(arguments)[0] == 3
    code, output, errors = run([*arguments, "--ca-file", str(directory / "ca.pem")])
    assert (code, errors) == (0, "") and "app.log" in output
    assert agent.stop() == 0


@pytest.mark.parametrize("command", ["report LOG", "report LOG --format csv", "events --limit 1000"])
def test_a_pipe_that_is_closed_early_ends_it_quietly(watched, command):
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
