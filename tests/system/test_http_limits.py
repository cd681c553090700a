"""Clients that never finish, send too much or are too many: others notice nothing."""

import contextlib
import json
import os
import resource
import socket
import threading
import time
from email.utils import parsedate_to_datetime

import pytest

from api import Api
from conftest import syslog_line, wait_until

IDLE = 1000


@pytest.fixture
def serving(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.listen = "127.0.0.1:0"
    agent.start()
    return log, Api(agent)


def connect(api):
    return socket.create_connection(("127.0.0.1", api.port), timeout=60)


def exchange(api, data, end=True):
    """Sends bytes and returns the status and the body of the answer."""
    with connect(api) as client:
        # A request that is refused early need not be read whole; it is answered all the same.
        with contextlib.suppress(OSError):
            client.sendall(data)
            if end:
                client.shutdown(socket.SHUT_WR)
        answer = b""
        while piece := client.recv(65536):
            answer += piece
    head, _, body = answer.partition(b"\r\n\r\n")
    return int(head.split()[1]) if head else None, body


def prompt(api, path="/healthz"):
    begin = time.monotonic()
    status, _, answer = api.request("GET", path)
    assert status == 200, answer
    return time.monotonic() - begin


@pytest.mark.slow
def test_a_thousand_idle_connections_and_slow_senders_delay_nobody(agent, serving):
    log, api = serving
    _, hard = resource.getrlimit(resource.RLIMIT_NOFILE)
    resource.setrlimit(resource.RLIMIT_NOFILE, (min(hard, 8192), hard))
    slow_heads = [f"GET /healthz HTTP/1.1\r\nHost: localhost:{api.port}\r\nX-Slow: ".encode()] * 100
    slow_bodies = [
        (
            f"POST /api/v1/reports HTTP/1.1\r\nHost: localhost:{api.port}\r\n"
            f"Authorization: Bearer {api.token}\r\nContent-Type: application/json\r\n"
            "Content-Length: 50\r\n\r\n{"
        ).encode()
    ] * 100
    clients, slow = [], []
    done = threading.Event()

    def trickle():
        while not done.wait(0.5):
            for client in slow:
                try:
                    client.send(b"x")
                except OSError:
                    pass

    sender = threading.Thread(target=trickle)
    try:
        for number in range(IDLE + len(slow_heads) + len(slow_bodies)):
            clients.append(connect(api))
        slow.extend(clients[IDLE:])
        for client, begin in zip(slow, slow_heads + slow_bodies):
            client.sendall(begin)
        sender.start()
        # All are connected and wait; others and the logs are served.
        longest = 0.0
        for number in range(20):
            longest = max(longest, prompt(api), prompt(api, "/api/v1/logs"))
            log.append(syslog_line(f"line {number}"))
        agent.wait_events(20, seconds=20)
        assert longest < 5, "answered although a thousand others are connected"
        descriptors = len(os.listdir(f"/proc/{agent.process.pid}/fd"))
        assert descriptors > IDLE
        # A client that does not finish its request gets an error, and all are disconnected.
        for client in slow[:1] + slow[-1:]:
            client.settimeout(40)
            assert client.recv(65536).startswith(b"HTTP/1.1 408 "), "told within the time of a request"
        wait_until(
            lambda: len(os.listdir(f"/proc/{agent.process.pid}/fd")) < descriptors - IDLE,
            "idle connections being closed",
        )
        assert prompt(api) < 5
    finally:
        done.set()
        if sender.is_alive():
            sender.join()
        for client in clients:
            client.close()
    assert agent.stop() == 0


def test_a_stop_does_not_wait_for_slow_clients(agent, serving):
    _, api = serving
    client = connect(api)
    client.sendall(b"GET /healthz HTTP/1.1\r\nHost: ")
    prompt(api)
    begin = time.monotonic()
    assert agent.stop() == 0
    assert time.monotonic() - begin < 15
    client.close()


def test_long_heads_are_refused(serving):
    _, api = serving
    status, body = exchange(api, b"GET /healthz HTTP/1.1\r\nX: " + b"x" * 20000)
    assert status == 431 and json.loads(body)["status"] == 431
    many = b"".join(b"X-%d: y\r\n" % number for number in range(3000))
    assert exchange(api, b"GET /healthz HTTP/1.1\r\n" + many + b"\r\n")[0] == 431
    # A long path within the limit is simply unknown.
    path = b"/" + b"x" * 7000
    head = f" HTTP/1.1\r\nHost: localhost:{api.port}\r\nAuthorization: Bearer {api.token}\r\n\r\n"
    assert exchange(api, b"GET " + path + head.encode())[0] == 404
    status, body = exchange(api, b"GET " + path * 2 + head.encode())
    assert (status, json.loads(body)["title"]) == (414, "URI Too Long")


@pytest.mark.parametrize(
    "head, status",
    {
        "two lengths": ("Content-Length: 2\r\nContent-Length: 3\r\n", 400),
        "length and chunks": ("Content-Length: 2\r\nTransfer-Encoding: chunked\r\n", 400),
        "another coding": ("Transfer-Encoding: gzip, chunked\r\n", 400),
        "length that is none": ("Content-Length: two\r\n", 400),
        "negative length": ("Content-Length: -2\r\n", 400),
        "huge length": ("Content-Length: 99999999999999999999999\r\n", 400),
        "large length": ("Content-Length: 2000000\r\n", 413),
        "packed": ("Content-Length: 2\r\nContent-Encoding: gzip\r\n", 400),
        "another kind": ("Content-Length: 2\r\nContent-Type: application/jsonlines\r\n", 415),
        "with parameters": ("Content-Length: 2\r\nContent-Type: Application/JSON; charset=utf-8\r\n", 200),
        "form": ("Content-Length: 2\r\nContent-Type: multipart/form-data; boundary=x\r\n", 415),
        "blank before the colon": ("Content-Length : 2\r\n", 400),
        "encoded length": ("Content-Length: %32\r\n", 400),
        "line feed alone": ("Content-Length: 2\n\r\n", 400),
        "folded": ("Transfer-Encoding:\r\n chunked\r\n", 400),
        "encoded coding": ("Transfer-Encoding: chunke%64\r\n", 400),
        "two hosts": ("Host: evil.example\r\nContent-Length: 2\r\n", 400),
        "ranges": ("Content-Length: 2\r\nRange: bytes=" + "0-1," * 3000 + "5-6\r\n", 200),
        "range that is none": ("Content-Length: 2\r\nrAnGe: x\r\n", 200),
    }.values(),
)
def test_requests_that_could_be_read_in_two_ways_are_refused(serving, head, status):
    _, api = serving
    kind = "" if "Content-Type" in head else "Content-Type: application/json\r\n"
    request = (
        f"POST /api/v1/tables/RMMONLOG/sample HTTP/1.1\r\nHost: localhost:{api.port}\r\n"
        f"Authorization: Bearer {api.token}\r\nConnection: close\r\n{kind}{head}\r\n{{}}"
    ).encode()
    got, body = exchange(api, request)
    assert got == status, body
    assert json.loads(body)
    prompt(api)


def test_no_body_becomes_the_next_request(serving):
    """What a refused request leaves unread is never read as another request."""
    _, api = serving
    inner = f"GET /healthz HTTP/1.1\r\nHost: localhost:{api.port}\r\n\r\n"
    for method, path in (("POST", "/healthz"), ("GET", "/healthz"), ("POST", "/api/v1/reports")):
        request = (
            f"{method} {path} HTTP/1.1\r\nHost: localhost:{api.port}\r\n"
            f"Content-Length: {len(inner)}\r\n\r\n{inner}"
        ).encode()
        with connect(api) as client:
            client.sendall(request)
            answer = b""
            while piece := client.recv(65536):
                answer += piece
        assert answer.count(b"HTTP/1.1 ") == 1, answer
        assert b"Connection: close" in answer


def test_bytes_that_are_not_http_are_answered_and_harm_nobody(serving):
    _, api = serving
    for data in (
        b"\x16\x03\x01\x02\x00\x01\x00\x01\xfc\x03\x03" + bytes(range(256)) + b"\r\n\r\n",
        b"\x00" * 100 + b"\r\n\r\n",
        b"GET\r\n\r\n",
        b"GET / HTTP/9.9\r\n\r\n",
        b"BREW /pot HTTP/1.1\r\n\r\n",
        b"GET  / HTTP/1.1\r\n\r\n",
        b" / HTTP/1.1\r\n\r\n",
        b"GET / HTTP/1.1\nHost: x\n\n\r\n\r\n",
    ):
        status, body = exchange(api, data)
        assert status in (400, 421), (data[:20], status)
        assert json.loads(body)["status"] == status
    for data in (b"", b"\r\n", b"\r\n\r\n", b"GET / HT"):
        exchange(api, data)  # not answered; it must only not end anything
    prompt(api)


def test_nothing_after_chunks_is_a_request(serving):
    """Chunks may be written in many ways; what another reader could end earlier is refused."""
    _, api = serving
    head = (
        f"POST /api/v1/tables/RMMONLOG/sample HTTP/1.1\r\nHost: localhost:{api.port}\r\n"
        f"Authorization: Bearer {api.token}\r\nContent-Type: application/json\r\n"
        "Transfer-Encoding: chunked\r\n\r\n"
    ).encode()
    inner = b"GET /healthz HTTP/1.1\r\nHost: localhost:%d\r\n\r\n" % api.port
    with connect(api) as client:
        client.sendall(head + b"0x2;a=b\n{}\r\n0\r\n\r\n" + inner)
        answer = b""
        while piece := client.recv(65536):
            answer += piece
    assert answer.count(b"HTTP/1.1 ") == 1, answer
    assert b"Connection: close" in answer


def test_every_answer_has_a_date(serving):
    _, api = serving
    for request in (b"GET /healthz HTTP/1.1\r\nHost: x\r\n\r\n", b"GET  / HTTP/1.1\r\n\r\n",
                    b"GET /healthz HTTP/1.1\r\nX: " + b"x" * 20000):  # fmt: skip
        with connect(api) as client:
            client.sendall(request)
            head = client.recv(65536).partition(b"\r\n\r\n")[0]
        (date,) = [line for line in head.split(b"\r\n") if line.startswith(b"Date: ")]
        sent = parsedate_to_datetime(date[6:].decode()).timestamp()
        assert abs(sent - time.time()) < 120


def test_the_host_may_be_in_the_request_line(serving):
    _, api = serving
    for host, status in ((f"localhost:{api.port}", 200), ("evil.example", 421)):
        request = f"GET http://{host}/healthz HTTP/1.1\r\nHost: localhost:{api.port}\r\nConnection: Close\r\n\r\n"
        got, body = exchange(api, request.encode(), end=False)
        assert got == status, body


def test_chunked_bodies_are_read(serving):
    _, api = serving
    head = (
        f"POST /api/v1/tables/RMMONLOG/sample HTTP/1.1\r\nHost: localhost:{api.port}\r\n"
        f"Authorization: Bearer {api.token}\r\nContent-Type: application/json\r\n"
        "Connection: close\r\nTransfer-Encoding: chunked\r\n\r\n"
    ).encode()
    status, body = exchange(api, head + b"1\r\n{\r\n1\r\n}\r\n0\r\n\r\n", end=False)
    assert status == 200 and json.loads(body)["table"] == "RMMONLOG"
    status, body = exchange(api, head + b"zz\r\n{}\r\n0\r\n\r\n")
    assert status in (400, 413), body
    begin = time.monotonic()
    status, body = exchange(api, head + b"1" * 9_000_000, end=False)
    assert status == 400, "a size that never ends"
    assert time.monotonic() - begin < 9
    huge = b"".join(b"10000\r\n" + b" " * 65536 + b"\r\n" for _ in range(20)) + b"0\r\n\r\n"
    status, body = exchange(api, head + huge)
    assert status == 413, body


def test_more_connections_than_are_served_are_turned_away(agents):
    """With few descriptors fewer connections are served, and enough are left for the agent."""
    agent = agents()
    log = agent.log()
    agent.situation(log=log)
    agent.listen = "127.0.0.1:0"
    agent.start(wrapper=("sh", "-c", 'ulimit -n 64; exec "$@"', "sh"))
    api = Api(agent)
    clients = [connect(api) for _ in range(60)]
    try:
        turned_away = 0
        for client in clients:
            client.settimeout(0.05)
            try:
                turned_away += client.recv(1) == b""
            except OSError:
                pass
        assert turned_away >= 20
        log.append(syslog_line("read all the same"))
        agent.wait_events(1)
    finally:
        for client in clients:
            client.close()
    wait_until(lambda: exchange(api, b"GET /healthz HTTP/1.1\r\nHost: localhost:%d\r\nConnection: close\r\n\r\n" % api.port)[0] == 200, "an answer")  # fmt: skip
    assert agent.stop() == 0
