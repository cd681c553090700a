"""Whatever its threads wait for, the agent ends when it is stopped and answers until then."""

import http.client
import json
import os
import socket
import subprocess
import threading
import time
from pathlib import Path
from signal import SIGINT, SIGQUIT, SIGTERM

import pytest
from api import Api
from conftest import descriptions, syslog_line, wait_until
from stopping import (
    ANSWER,
    END,
    FLOOD,
    answers,
    cpu_seconds,
    flood,
    queue_is_full,
    queue_stands_still,
    stop,
)

pytestmark = pytest.mark.slow


# ------------------------------------------------------------------ sinks that take nothing


def stuck_webhook(agent):
    listener = socket.create_server(("127.0.0.1", 0))  # accepts, and never answers
    agent.sink = None
    agent.more_sinks = [{"type": "webhook", "url": f"http://127.0.0.1:{listener.getsockname()[1]}/"}]
    return listener


def stuck_syslog(agent):
    listener = socket.create_server(("127.0.0.1", 0), backlog=0)
    address = listener.getsockname()
    waiting = [socket.socket() for _ in range(3)]  # nobody accepts these, nor any later ones
    for client in waiting:
        client.setblocking(False)
        client.connect_ex(address)
    agent.sink = None
    agent.more_sinks = [{"type": "syslog", "address": f"127.0.0.1:{address[1]}"}]
    return listener, waiting


def stuck_fifo(agent):
    path = agent.directory / "events.fifo"
    os.mkfifo(path)
    agent.sink = path
    return os.open(path, os.O_RDWR)  # a reader that never reads


STUCK = {"webhook": stuck_webhook, "syslog": stuck_syslog, "fifo": stuck_fifo}


def full_queue(agent, sink, logs=2):
    """An agent without a history whose sink takes nothing and whose logs wait for room."""
    kept = STUCK[sink](agent)
    agent.history = {"enabled": False}
    agent.listen = "127.0.0.1:0"
    made = [agent.log(f"app{i}.log") for i in range(logs)]
    agent.situation()
    agent.start()
    api = Api(agent)
    for log in made:
        flood(log)
    wait_until(lambda: queue_stands_still(api), "a full queue")
    return api, made, kept


@pytest.mark.parametrize("number", (SIGTERM, SIGINT))
@pytest.mark.parametrize("refresh", ("nothing", "drop", "replace"))
@pytest.mark.parametrize("sink", STUCK)
def test_a_full_queue_delays_neither_signals_nor_requests(agent, sink, refresh, number):
    api, logs, kept = full_queue(agent, sink)
    if refresh == "drop":
        agent.configure(str(logs[0]))
    elif refresh == "replace":
        agent.configure(str(logs[0]), f'{logs[1]} ;N ;U ;A,"%255[^\\n]" , description')
    if refresh != "nothing":
        agent.refresh()
        agent.wait_trace("Manager thread waiting for a signal.", 2, seconds=END)
    answers(api)
    assert stop(agent, number) == 0
    text = agent.stderr.text()
    assert " events were not delivered to " in text
    assert " lines that were waiting in the logs were not read" in text
    assert kept is not None


@pytest.mark.parametrize("sink", STUCK)
def test_quit_aborts_an_agent_whose_queue_is_full(agent, sink):
    api, _, kept = full_queue(agent, sink)
    begin = time.monotonic()
    agent.send(SIGQUIT)
    agent.wait_end(END)
    assert agent.process.returncode == -6
    assert time.monotonic() - begin < 3
    assert kept is not None and api is not None


def test_a_refresh_releases_a_log_and_the_others_neither_lose_nor_repeat_entries(agent):
    log, dropped = agent.log("stays.log"), agent.log("goes.log")
    agent.situation(log=log)
    agent.situation("other", log=dropped)
    agent.history = {"enabled": False}
    agent.sink = agent.directory / "events.fifo"
    agent.listen = "127.0.0.1:0"
    os.mkfifo(agent.sink)
    reader = os.open(agent.sink, os.O_RDONLY | os.O_NONBLOCK)
    agent.start()
    api = Api(agent)
    flood(log)
    flood(dropped)
    wait_until(lambda: queue_is_full(api), "a full queue")
    agent.configure(str(log))
    begin = time.monotonic()
    agent.refresh()
    agent.wait_trace("Manager thread waiting for a signal.", 2)
    assert time.monotonic() - begin < END
    data = bytearray()

    def all_of_it():
        try:
            data.extend(os.read(reader, 1 << 20))
        except BlockingIOError:
            pass
        return data.count(b'"situation":"every-entry"') >= FLOOD

    wait_until(all_of_it, lambda: f"{data.count(bytes([10]))} events read")
    stays = [line for line in bytes(data).split(b"\n") if b'"situation":"every-entry"' in line]
    numbers = [json.loads(line)["row"]["ENTRYDESC"] for line in stays[:FLOOD]]
    assert numbers == [f"number {i}" for i in range(FLOOD)]
    os.close(reader)
    assert stop(agent) == 0


def test_a_log_that_waits_for_room_turns_health_red_and_green_again(agent):
    api, logs, kept = full_queue(agent, "fifo", logs=1)
    status, _, answer = wait_until(
        lambda: (lambda a: a if a[0] == 503 else None)(api.request("GET", "/healthz")),
        "a red health",
        20,
    )
    assert "the thread of a log has made no progress for" in answer["detail"]
    assert str(logs[0]) not in answer["detail"], "names are not for everybody"
    agent.wait_trace(f"zrmagent: the thread of {logs[0]} has made no progress for ")
    ended = threading.Event()

    def read():
        os.set_blocking(kept, False)
        while not ended.is_set():
            try:
                os.read(kept, 1 << 16)
            except BlockingIOError:
                time.sleep(0.01)

    reader = threading.Thread(target=read, daemon=True)
    reader.start()
    wait_until(lambda: api.request("GET", "/healthz")[0] == 200, "a green health")
    assert stop(agent) == 0
    ended.set()


# ------------------------------------------------------------------ files that are not files


def test_a_log_that_became_a_pipe_delays_neither_reports_nor_its_restart(serving, agent):
    log, api = serving("Jan  1 00:00:00 web1 old: line\n")
    log.path.unlink()
    os.mkfifo(log.path)
    begin = time.monotonic()
    api.report(log, "1260101000000000", "1991231235959000")
    answers(api)
    assert time.monotonic() - begin < 3 * ANSWER
    assert stop(agent) == 0


def test_a_report_over_a_huge_hole_ends_with_its_client(agent):
    log = agent.log()
    os.truncate(log.path, 1 << 40)  # before the monitor, which begins at the end
    agent.listen = "127.0.0.1:0"
    agent.start()
    api = Api(agent)
    body = json.dumps({"log": str(log), "from": "2026-01-01T00:00:00", "to": "2099-01-01T00:00:00"})
    connection = http.client.HTTPConnection("127.0.0.1", api.port, timeout=60)
    headers = {"Authorization": f"Bearer {api.token}", "Content-Type": "application/json"}
    connection.request("POST", "/api/v1/reports", body, headers)
    wait_until(lambda: cpu_seconds(agent) > 0.3, "the reading of the hole")
    answers(api)
    connection.close()

    def is_quiet():
        before = cpu_seconds(agent)
        time.sleep(1)
        return cpu_seconds(agent) - before < 0.3

    wait_until(is_quiet, "an end of the reading that nobody waits for", 15)
    assert stop(agent) == 0


def test_a_log_that_grows_by_a_terabyte_of_zeros_can_be_dropped_and_stopped(agent):
    log, other = agent.log(), agent.log("other.log")
    agent.situation()
    agent.listen = "127.0.0.1:0"
    agent.start()
    api = Api(agent)
    os.truncate(log.path, 1 << 40)
    wait_until(lambda: api.logs()["app.log"]["NUMEVENTS"] > 1000, "the reading of zeros")
    answers(api)
    agent.configure(str(other))
    agent.refresh()
    agent.wait_trace("Manager thread waiting for a signal.", 2, seconds=END)
    assert list(api.logs()) == ["other.log"]
    os.truncate(other.path, 1 << 40)
    wait_until(lambda: api.logs()["other.log"]["NUMEVENTS"] > 1000, "the reading of zeros")
    assert stop(agent) == 0


def test_a_debug_log_that_is_a_pipe_delays_nothing(agent):
    path = agent.directory / "debug.fifo"
    os.mkfifo(path)
    agent.environment["AGENT_DEBUG_LOG"] = str(path)
    agent.listen = "127.0.0.1:0"
    log = agent.log(fields=";Y ;S")
    agent.situation(log=log)
    agent.start()
    api = Api(agent)
    agent.wait_trace(f'Error opening debug log "{path}"; errno = 6; ')
    reader = os.open(path, os.O_RDWR)  # never reads: the next refresh opens it
    agent.refresh()
    agent.wait_trace("Manager thread waiting for a signal.", 2)
    flood(log, 200)
    assert len(agent.wait_events(200)) == 200
    answers(api)
    assert stop(agent) == 0
    os.close(reader)


# ------------------------------------------------------------------ standard error, starts


def test_a_standard_error_that_nobody_reads_delays_nothing(agent):
    log = agent.log()
    agent.sink = agent.directory / "events.jsonl"
    agent.situation(log=log)
    agent._write_toml()
    environment = {**os.environ, "QFW_TRC1": "all"}
    reader, writer = os.pipe()
    process = subprocess.Popen(
        [os.environ.get("ZRM_AGENT", str(Path(__file__).resolve().parents[2] / "build/dev/bin/zrmagent")),
         "--config", str(agent.zrm_toml)],
        stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL, stderr=writer, env=environment,
    )  # fmt: skip
    try:
        os.close(writer)
        time.sleep(4)  # the pipe is full long before
        deadline = time.monotonic() + 30
        while not (agent.sink.exists() and agent.sink.stat().st_size):
            log.append(syslog_line("nobody reads"))
            time.sleep(0.5)
            assert time.monotonic() < deadline, "no event"
        begin = time.monotonic()
        process.send_signal(SIGTERM)
        assert process.wait(30) == 0
        assert time.monotonic() - begin < END
    finally:
        process.kill()
        process.wait()
        os.close(reader)


@pytest.mark.parametrize("number", (SIGTERM, SIGINT, SIGQUIT))
def test_a_start_without_usable_logs_can_be_stopped(agent, number):
    agent.configure("/no/such/log")
    agent.start(wait=False)
    agent.wait_trace("Agent has no work to do.  Exiting...")
    status = stop(agent, number)
    assert status == (-6 if number == SIGQUIT else 0)


def test_entries_that_come_before_the_situations_are_open_are_judged(agent):
    """Every line that is written after the agent begins to read a log is raised."""
    log = agent.log()
    for number in range(200):  # they take a while to open
        agent.situation(f"pattern-{number}", log=log, when=[f"ENTRYDESC matches '(a|b){{{number % 20}}}x{number}'"])
    agent.situation(log=log)
    agent.start(wait=False)
    agent.wait_open(log.path)
    log.append(syslog_line("at once"))
    events = [e for e in agent.wait_events(1) if e["situation"] == "every-entry"]
    assert descriptions(events) == ["at once"]
    assert stop(agent) == 0
