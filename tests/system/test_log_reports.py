"""Reports on logs of [[log]] tables: over generations, streamed, with a limit of found entries."""

import bz2
import gzip
import http.client
import json
import lzma
import os
import pty
import random
import signal
import socket
import subprocess
import time

import pytest
from api import Api
from conftest import PATIENCE, Log, wait_until
from receiver import free_port
from stopping import cpu_seconds
from zrmctl import ZRMCTL, environment, run

FROM = "2026-01-01T00:00:00"
BUSY = 2_000_000


def line(day, text, hour=12):
    return f"2026-03-{day:02}T{hour:02}:00:00 web1 app: {text}\n"


def watched(agent, content="", **keys):
    """The API of an agent that follows a log."""
    log = Log(agent.directory / "app.log")
    log.path.write_text(content)
    agent.agent_keys["log_config"] = None
    agent.listen = f"127.0.0.1:{free_port()}"
    agent.follow(log, **keys)
    agent.start()
    return log, Api(agent)


def report(api, log, **members):
    body = {"log": str(log), "from": FROM, **members}
    status, _, answer = api.request("POST", "/api/v1/reports", body)
    assert status == 200, answer
    return answer


def texts(answer):
    return [row["ENTRYDESC"] for row in answer["rows"]]


def names(answer, read=True):
    return [os.path.basename(file["file"]) for file in answer["files"] if file["read"] == read]


def compress_zstd(data):
    return subprocess.run(["zstd", "-q", "-c"], input=data, stdout=subprocess.PIPE, check=True).stdout


def test_a_report_reads_generations_in_all_four_formats(agent):
    log, api = watched(agent, line(9, "nine"))
    older = {
        "app.log.1": line(8, "eight").encode(),
        "app.log.2.gz": gzip.compress(line(7, "seven").encode() + line(7, "seven and a half").encode()),
        "app.log.3.xz": lzma.compress(line(6, "six").encode()),
        "app.log.4.zst": compress_zstd(line(5, "five").encode()),
        "app.log.5.bz2": bz2.compress(line(4, "four").encode()),
        "app.log.12": line(3, "three").encode(),
    }
    for name, content in older.items():
        (agent.directory / name).write_bytes(content)
    answer = report(api, log)
    assert texts(answer) == "nine,eight,seven and a half,seven,six,five,four,three".split(",")
    assert names(answer) == ["app.log", *older]
    assert (answer["complete"], answer["truncated"], answer["skipped"]) == (True, False, 0)
    some = report(api, log, **{"from": "2026-03-06", "to": "2026-03-07T13:00:00"})
    assert texts(some) == ["seven and a half", "seven", "six"]
    assert names(some, read=False) == ["app.log", "app.log.1", "app.log.5.bz2", "app.log.12"]


def test_a_report_reads_what_logrotate_leaves(agent):
    directory = agent.directory / "logs"
    directory.mkdir(mode=0o755)
    log = Log(directory / "app.log")
    log.path.write_text(line(1, "number 1"))
    configuration = agent.directory / "logrotate.conf"
    configuration.write_text(f"{log} {{\nrotate 9\ncompress\ndelaycompress\ncreate\n}}\n")
    configuration.chmod(0o600)
    agent.agent_keys["log_config"] = None
    agent.listen = f"127.0.0.1:{free_port()}"
    agent.follow(log)
    agent.start()
    for number in range(2, 6):
        state = agent.directory / "logrotate.state"
        subprocess.run(["logrotate", "--force", "--state", state, configuration], check=True, timeout=60)
        log.append(line(number, f"number {number}"))
    assert sorted(os.listdir(directory)) == ["app.log", "app.log.1", "app.log.2.gz", "app.log.3.gz", "app.log.4.gz"]
    answer = report(Api(agent), log)
    assert texts(answer) == [f"number {number}" for number in range(5, 0, -1)]


def test_lines_that_do_not_fit_or_are_long_do_not_end_it(agent):
    format = r'A , "%d-%d-%d %255[^\n]" , year month day description'
    odd = "neither\n" * 30 + "2026-03-02 long " + "x" * 100_000 + "\n"
    log, api = watched(agent, "2026-03-01 one\n" + odd + "2026-03-03 two\n", type="text", format=format)
    answer = report(api, log)
    assert [text[:4] for text in texts(answer)] == ["two", "long", "one"]
    assert (answer["skipped"], answer["complete"]) == (30, True)
    code, _, errors = run(["report", str(log), "--from", FROM, "--config", str(agent.zrm_toml)])
    assert code == 0
    assert errors == "zrmctl: 30 lines that are not entries were passed over\n"


def test_a_damaged_generation_and_a_forbidden_one_are_named(agent):
    log, api = watched(agent, line(9, "newest"))
    random.seed(9)
    whole = "".join(line(5, f"{random.getrandbits(256):x}") for _ in range(20_000)).encode()
    packed = gzip.compress(whole)
    (agent.directory / "app.log.1.gz").write_bytes(packed[: len(packed) // 2])
    (agent.directory / "app.log.2").write_text(line(4, "forbidden"))
    (agent.directory / "app.log.2").chmod(0)
    (agent.directory / "app.log.3").write_text(line(3, "oldest"))
    answer = report(api, log, limit=10_000)
    found = texts(answer)
    assert (found[0], found[-1]) == ("newest", "oldest")
    assert len(found) > 5000
    problems = {os.path.basename(file["file"]): file["problem"] for file in answer["files"] if file["problem"]}
    assert problems["app.log.1.gz"].startswith("it is damaged: only the first ")
    if os.geteuid() != 0:
        assert problems["app.log.2"] == "it cannot be opened: Permission denied"
    assert answer["complete"] is False
    assert answer["reason"].startswith(f"not all of {log}.1.gz was read: it is damaged")


def test_the_limit_counts_the_entries_that_meet_the_conditions(agent):
    content = "".join(line(1, f"{'hit' if i % 1000 == 0 else 'miss'} {i}") for i in range(5000))
    log, api = watched(agent, content)
    (agent.directory / "app.log.1.gz").write_bytes(gzip.compress((line(1, "older") + content).encode()))
    where = ["ENTRYDESC starts 'hit'"]
    assert len(texts(report(api, log, where=where))) == 10, "beyond the 1000 that a sample reads"
    answer = report(api, log, where=where, limit=7)
    assert texts(answer) == [f"hit {i}" for i in (4000, 3000, 2000, 1000, 0, 4000, 3000)]
    assert (answer["truncated"], answer["complete"], answer["limit"]) == (True, False, 7)
    assert len(texts(report(api, log))) == 1000
    for limit in (0, 10_001, "x"):
        body = {"log": str(log), "from": FROM, "limit": limit}
        assert api.request("POST", "/api/v1/reports", body)[0] == 400
    access = ["--config", str(agent.zrm_toml)]
    code, output, errors = run(["report", str(log), "--from", FROM, "--limit", "3", "--format", "csv", *access])
    assert (code, len(output.splitlines())) == (0, 4)
    assert "has found 3 entries, the most that it may" in errors


def lines_of(api, body):
    """The response of a report as JSON lines, not read yet, and its connection."""
    connection = http.client.HTTPConnection("127.0.0.1", api.port, timeout=PATIENCE)
    headers = {
        "Authorization": f"Bearer {api.token}",
        "Content-Type": "application/json",
        "Accept": "application/x-ndjson",
    }
    connection.request("POST", "/api/v1/reports", json.dumps(body), headers)
    return connection, connection.getresponse()


def test_the_report_as_lines(agent):
    log, api = watched(agent, line(1, "one") + line(2, "two"))
    connection, response = lines_of(api, {"log": str(log), "from": FROM})
    assert response.getheader("Content-Type") == "application/x-ndjson"
    kinds = [json.loads(one) for one in response.read().splitlines()]
    assert next(iter(kinds[0])) == "begin" and next(iter(kinds[-1])) == "end"
    assert kinds[0]["begin"]["log"] == str(log)
    assert [one["row"]["ENTRYDESC"] for one in kinds if "row" in one] == ["two", "one"]
    shown = [one["progress"] for one in kinds if "progress" in one]
    assert shown and all(one["read"] <= one["total"] for one in shown)
    assert kinds[-1]["end"]["count"] == 2
    connection.close()


@pytest.fixture
def busy(agent):
    """A log whose report takes long, and finds something at once."""
    log, api = watched(agent)
    with open(log.path, "w", encoding="ascii") as stream:
        text = "".join(line(1, "miss") for _ in range(10_000))
        for _ in range(BUSY // 10_000):
            stream.write(text)
        stream.write(line(2, "hit"))
    return agent, log, api


def is_quiet(agent):
    before = cpu_seconds(agent)
    time.sleep(1)
    return cpu_seconds(agent) - before < 0.3


@pytest.fixture
def endless(agent):
    """A log whose report finds something at once, and then reads a terabyte of zeros."""
    log = agent.directory / "app.log"
    log.touch()
    os.truncate(log, 1 << 40)
    with open(log, "a", encoding="ascii") as stream:
        stream.write("\n" + line(2, "hit"))
    agent.listen = f"127.0.0.1:{free_port()}"
    agent.follow(log)  # begins at the end
    agent.log("other.log")
    agent.start()
    return agent, log, Api(agent)


def test_rows_come_as_they_are_found_and_the_reading_ends_with_the_caller(endless):
    agent, log, api = endless
    connection, response = lines_of(api, {"log": str(log), "from": FROM})
    for text in response:
        if b'"row"' in text:
            break
    assert json.loads(text)["row"]["ENTRYDESC"] == "hit"
    wait_until(lambda: cpu_seconds(agent) > 0.3, "the reading of the rest")
    response.close()
    connection.close()
    wait_until(lambda: is_quiet(agent), "an end of the reading", 15)
    assert agent.stop() == 0


def test_a_refresh_does_not_wait_for_a_report(endless):
    agent, log, api = endless
    connection, response = lines_of(api, {"log": str(log), "from": FROM})
    response.readline()
    agent.log("further.log")
    agent.refresh()
    wait_until(lambda: len(api.logs()) == 3, "the further log")
    before = cpu_seconds(agent)
    wait_until(lambda: cpu_seconds(agent) > before + 0.2, "the reading that goes on")
    connection.close()
    assert agent.stop() == 0


def test_a_stop_does_not_wait_for_a_report(endless):
    agent, log, api = endless
    connection, response = lines_of(api, {"log": str(log), "from": FROM})
    response.readline()
    begin = time.monotonic()
    assert agent.stop() == 0
    assert time.monotonic() - begin < 8
    connection.close()


def test_a_report_does_not_wait_for_a_client_that_reads_nothing(agent):
    log, api = watched(agent, "".join(line(1, "x" * 250) for _ in range(100_000)))
    body = json.dumps({"log": str(log), "from": FROM, "limit": 10_000}).encode()
    clients = []
    for _ in range(4):
        client = socket.socket()
        client.setsockopt(socket.SOL_SOCKET, socket.SO_RCVBUF, 4096)
        client.connect(("127.0.0.1", api.port))
        client.sendall(
            f"POST /api/v1/reports HTTP/1.1\r\nHost: localhost:{api.port}\r\n"
            f"Authorization: Bearer {api.token}\r\nContent-Type: application/json\r\n"
            f"Content-Length: {len(body)}\r\n\r\n".encode() + body
        )
        clients.append(client)

    def has_room():
        return api.request("POST", "/api/v1/reports", {"log": str(log), "from": FROM, "limit": 1})[0] == 200

    wait_until(has_room, "a place of a report that was given up", 30)
    for client in clients:
        client.close()


def test_a_log_that_became_a_pipe_delays_nothing(agent):
    log, api = watched(agent, line(2, "two"))
    log.path.rename(f"{log}.1")
    os.mkfifo(log.path)
    answer = report(api, log)
    assert texts(answer) == ["two"]
    assert answer["files"][0]["problem"] == "it is not a regular file"
    log.path.unlink()
    os.symlink("/dev/zero", log.path)
    assert report(api, log)["files"][0]["problem"] == "it is not a regular file"
    assert agent.stop() == 0


def test_zrmctl_shows_progress_on_a_terminal_only(busy):
    agent, log, _ = busy
    command = [ZRMCTL, "report", str(log), "--from", FROM, "--where", "ENTRYDESC = 'hit'"]
    command += ["--config", str(agent.zrm_toml)]
    ours, its = pty.openpty()
    with subprocess.Popen(command, stdout=subprocess.PIPE, stderr=its, env=environment()) as process:
        os.close(its)
        shown = b""
        try:
            while piece := os.read(ours, 65536):
                shown += piece
        except OSError:  # the other end is closed
            pass
        output = process.stdout.read()
    os.close(ours)
    assert process.returncode == 0
    assert b"hit" in output and b"reading" not in output
    assert b"reading: " in shown and b" MB, 1 entry" in shown
    assert shown.endswith(b" \r"), "the line is gone at the end"
    code, _, errors = run(command[1:])
    assert (code, errors) == (0, "")


def test_zrmctl_says_that_the_answer_broke_off(endless):
    agent, log, _ = endless
    command = [ZRMCTL, "report", str(log), "--from", FROM, "--format", "csv", "--config", str(agent.zrm_toml)]
    with subprocess.Popen(command, stdout=subprocess.PIPE, stderr=subprocess.PIPE, env=environment()) as process:
        process.stdout.readline()  # it writes what has come
        agent.process.send_signal(signal.SIGKILL)
        _, errors = process.communicate(timeout=PATIENCE)
    assert process.returncode == 3
    assert b"ended before the answer did" in errors
