"""Events sent to other systems: batches, signatures, TLS, receivers that fail."""

import hashlib
import hmac
import json
import os
import re
import socket
import subprocess
import time

import pytest

from api import Api
from conftest import PATIENCE, descriptions, syslog_line, wait_until
from receiver import Receiver, free_port, slowly


def wait_for(receiver, count, agent):
    return wait_until(
        lambda: receiver.events() if len(receiver.events()) >= count else None,
        lambda: f"{count} events; there are {len(receiver.events())}: {agent.stderr.text()[-2000:]}",
    )


@pytest.fixture
def log(agent):
    log = agent.log()
    agent.situation("watch", log=log, severity="major")
    return log


def append(log, first, last):
    log.append("".join(syslog_line(f"entry {number}") for number in range(first, last + 1)))


def entries(first, last):
    return [f"entry {number}" for number in range(first, last + 1)]


def test_a_webhook_gets_signed_batches_in_order(agent, log):
    with Receiver() as receiver:
        agent.more_sinks.append(
            {
                "type": "webhook",
                "url": receiver.url + "/hook",
                "secret": "key",
                "batch": 10,
                "headers": {"Authorization": "Bearer abc"},
            }
        )
        agent.start()
        append(log, 1, 100)
        events = wait_for(receiver, 100, agent)
        assert agent.stop() == 0
    assert descriptions(events) == entries(1, 100)
    assert events == agent.events()
    for request in receiver.taken:
        assert request.path == "/hook"
        assert len(request.json["events"]) <= 10
        assert list(request.json) == ["events"]
        signature = hmac.new(b"key", request.body, hashlib.sha256).hexdigest()
        assert request.headers["X-Zrm-Signature"] == "sha256=" + signature
        assert request.headers["Authorization"] == "Bearer abc"
        assert request.headers["Content-Type"] == "application/json"
        ids = [event["id"] for event in request.json["events"]]
        assert request.headers["Idempotency-Key"].startswith(f"{ids[0]}-{ids[-1]}-")


def test_a_receiver_that_comes_late_gets_everything(agent, log):
    port = free_port()
    agent.more_sinks.append({"type": "webhook", "url": f"http://127.0.0.1:{port}", "name": "late"})
    agent.start()
    append(log, 1, 100)
    agent.wait_events(100)  # standard output does not wait for the other sink
    agent.wait_trace("Error delivering events to late: no connection")
    with Receiver(port) as receiver:
        assert descriptions(wait_for(receiver, 100, agent)) == entries(1, 100)
        agent.wait_trace("Sink late takes events again.")
    assert agent.stop() == 0


def test_a_receiver_that_was_down_for_a_whole_run_gets_everything_after_a_restart(agent, log):
    port = free_port()
    agent.more_sinks.append({"type": "webhook", "url": f"http://127.0.0.1:{port}", "name": "down"})
    agent.start()
    append(log, 1, 3000)  # more than the queue holds: the logs do not wait for the sink
    first = agent.wait_events(3000)
    assert agent.stop() == 0
    with Receiver(port) as receiver:
        agent.start()
        append(log, 3001, 3010)
        events = wait_for(receiver, 3010, agent)
        assert agent.stop() == 0
    assert descriptions(events) == entries(1, 3010)
    assert events[:3000] == first
    assert all(len(request.json["events"]) <= 100 for request in receiver.taken)


def test_nothing_is_lost_or_out_of_order_while_a_receiver_fails_in_every_way(agent, log):
    turns = [200, 500, ConnectionResetError(), 400, 200, 503, 302]
    count = 0

    def answer(request):
        nonlocal count
        count += 1
        turn = turns[count % len(turns)]
        if isinstance(turn, Exception):
            raise turn
        return turn, b"{}"

    with Receiver() as receiver:
        receiver.answer = answer
        agent.more_sinks.append({"type": "webhook", "url": receiver.url, "batch": 5})
        agent.start()
        append(log, 1, 50)
        events = wait_for(receiver, 50, agent)
        assert descriptions(events) == entries(1, 50)
        assert agent.stop() == 0
        assert receiver.refused


def test_a_slow_receiver_delays_nobody(agent, log):
    with Receiver() as receiver:
        receiver.answer = slowly(2)
        agent.more_sinks.append({"type": "webhook", "url": receiver.url, "batch": 1})
        agent.start()
        append(log, 1, 200)
        began = time.monotonic()
        agent.wait_events(200)
        assert len(receiver.events()) < 200
        receiver.answer = lambda request: 200
        assert descriptions(wait_for(receiver, 200, agent)) == entries(1, 200)
        assert agent.stop() == 0
        assert time.monotonic() - began < PATIENCE


def test_a_receiver_that_never_answers_does_not_hold_up_the_end(agent, log):
    listener = socket.create_server(("127.0.0.1", 0))
    agent.more_sinks.append(
        {"type": "webhook", "url": f"http://127.0.0.1:{listener.getsockname()[1]}", "timeout": "60s"}
    )
    agent.start()
    append(log, 1, 3)
    agent.wait_events(3)
    began = time.monotonic()
    assert agent.stop() == 0
    assert time.monotonic() - began < 20
    agent.wait_trace("3 events were not delivered to webhook")
    listener.close()


# ------------------------------------------------------------------------------------ TLS


@pytest.fixture(scope="module")
def authority(tmp_path_factory):
    """Makes certificates: for a host, each signed by its own authority."""
    directory = tmp_path_factory.mktemp("certificates")

    def openssl(*arguments):
        subprocess.run(["openssl", *arguments], cwd=directory, check=True, capture_output=True)

    new = ["-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:prime256v1", "-nodes", "-days", "2"]
    openssl("req", "-x509", *new, "-keyout", "ca.key", "-out", "ca.pem", "-subj", "/CN=Test CA")
    for name, host in (("right", "IP:127.0.0.1"), ("wrong", "DNS:other.example.com")):
        openssl(
            "req", "-x509", *new, "-keyout", f"{name}.key", "-out", f"{name}.pem",
            "-subj", f"/CN={name}", "-addext", f"subjectAltName={host}",
            "-CA", "ca.pem", "-CAkey", "ca.key",
        )  # fmt: skip
    return directory


def certificate(authority, name):
    return authority / f"{name}.pem", authority / f"{name}.key"


def test_events_go_to_a_trusted_server_over_tls(agent, log, authority):
    with Receiver(certificate=certificate(authority, "right")) as receiver:
        agent.more_sinks.append(
            {"type": "webhook", "url": receiver.url, "ca_file": str(authority / "ca.pem")}
        )
        agent.start()
        append(log, 1, 3)
        wait_for(receiver, 3, agent)
        append(log, 4, 5)
        assert descriptions(wait_for(receiver, 5, agent)) == entries(1, 5)
        assert agent.stop() == 0


def test_nothing_goes_to_a_server_that_is_not_trusted(agent, log, authority):
    """Neither to one of an unknown authority nor to one whose certificate is for another host."""
    with (
        Receiver(certificate=certificate(authority, "right")) as right,
        Receiver(certificate=certificate(authority, "wrong")) as wrong,
    ):
        trusted = str(authority / "ca.pem")
        agent.more_sinks += [
            {"type": "webhook", "url": right.url, "name": "unknown"},
            {"type": "webhook", "url": wrong.url, "name": "other", "ca_file": trusted},
        ]
        agent.start()
        append(log, 1, 3)
        why = "the server's certificate is not trusted for this host"
        agent.wait_trace(f"Error delivering events to unknown: {why} ({right.url[8:]})")
        agent.wait_trace(f"Error delivering events to other: {why} ({wrong.url[8:]})")
        assert agent.stop() == 0
        assert right.taken == wrong.taken == []


def test_nothing_goes_to_a_server_without_modern_ciphers(agent, log, authority):
    with Receiver(
        certificate=certificate(authority, "right"), old_ciphers="ECDHE-ECDSA-AES128-SHA"
    ) as receiver:
        agent.more_sinks.append(
            {"type": "webhook", "url": receiver.url, "ca_file": str(authority / "ca.pem"), "name": "old"}
        )
        agent.start()
        append(log, 1, 3)
        agent.wait_trace("Error delivering events to old: no TLS connection")
        assert agent.stop() == 0
        assert receiver.taken == []


def test_authorities_are_reported_until_they_can_be_read(agent, log, authority, tmp_path):
    trusted = tmp_path / "trusted.pem"
    with Receiver(certificate=certificate(authority, "right")) as receiver:
        agent.more_sinks.append(
            {"type": "webhook", "url": receiver.url, "name": "hook", "ca_file": str(trusted)}
        )
        agent.start()
        append(log, 1, 3)
        agent.wait_trace("Error delivering events to hook: ca_file cannot be read")
        trusted.write_bytes((authority / "ca.pem").read_bytes())
        assert descriptions(wait_for(receiver, 3, agent)) == entries(1, 3)
        assert agent.stop() == 0


# ------------------------------------------------------------------------------------ files


def test_a_line_torn_at_the_end_of_standard_output_is_terminated(agent, log):
    """What a killed agent has left in a file to which the next one appends."""
    path = agent.directory / "out.jsonl"
    path.write_bytes(b'{"id": 1, "tor')
    agent.sink = "-"
    with open(path, "ab") as output:
        agent.start(stdout=output)
    append(log, 1, 1)
    wait_until(lambda: path.read_bytes().endswith(b"}\n"), "the event")
    assert agent.stop() == 0
    torn, line, rest = path.read_bytes().split(b"\n")
    assert (torn, rest) == (b'{"id": 1, "tor', b"")
    assert descriptions([json.loads(line)]) == entries(1, 1)


# ------------------------------------------------------------------------------------ pipes


def test_a_pipe_whose_reader_stalls_is_failing_until_it_reads(agent, log):
    pipe = agent.directory / "pipe"
    os.mkfifo(pipe)
    reader = os.open(pipe, os.O_RDONLY | os.O_NONBLOCK)
    agent.more_sinks.append({"type": "jsonl", "path": str(pipe), "name": "pipe"})
    agent.listen = "127.0.0.1:0"
    agent.start()
    api = Api(agent)
    append(log, 1, 500)  # more than a pipe holds

    def sink():
        return next(one for one in api.request("GET", "/api/v1/status")[2]["sinks"] if one["name"] == "pipe")

    stalled = wait_until(
        lambda: sink() if sink()["state"] == "failing" else None, lambda: f"a failing sink: {sink()}"
    )
    assert re.fullmatch(r"the reader has taken nothing for \d+ s", stalled["error"])
    received = b""
    os.set_blocking(reader, True)
    while received.count(b"\n") < 500:
        received += os.read(reader, 65536)
    assert descriptions(json.loads(line) for line in received.splitlines()) == entries(1, 500)
    wait_until(lambda: sink()["state"] == "up" and not sink().get("error"), "a sink that is up")
    assert agent.stop() == 0
    os.close(reader)
