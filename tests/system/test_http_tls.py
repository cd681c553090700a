"""The HTTP API under TLS: for addresses that other machines can reach."""

import http.client
import json
import re
import socket
import ssl
import subprocess
import sys
import time

import pytest

from conftest import PATIENCE, wait_until

# Runs another program on a terminal at which nobody sits.
WITH_TERMINAL = (
    sys.executable,
    "-c",
    """
import fcntl, os, sys, termios
os.setsid()
for end in os.openpty():
    os.set_inheritable(end, True)
fcntl.ioctl(end, termios.TIOCSCTTY, 0)
os.execv(sys.argv[1], sys.argv[1:])
""",
)


def make_certificate(directory, name="agent"):
    """A certificate for agent.example and 127.0.0.1, and its key."""
    certificate, key = directory / f"{name}.pem", directory / f"{name}.key"
    subprocess.run(
        ["openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:prime256v1",
         "-nodes", "-subj", "/CN=agent.example", "-days", "2",
         "-addext", "subjectAltName=DNS:agent.example,IP:127.0.0.1",
         "-keyout", str(key), "-out", str(certificate)],
        check=True,
        capture_output=True,
    )  # fmt: skip
    return certificate, key


CERTIFICATES = {}


def certificate_of(context):
    """The certificate file that a client's context trusts."""
    return CERTIFICATES[context]


@pytest.fixture
def serving(agent):
    """Starts the agent under TLS; (port, token, context of a client that trusts it)."""

    def start(listen="0.0.0.0:0"):
        certificate, key = make_certificate(agent.directory)
        agent.log()
        agent.listen = listen
        agent.http_keys = {"certificate": certificate, "key": key}
        agent.start()
        line = agent.wait_trace("HTTP at https://")[0]
        port, token_file = re.search(r"https://[\d.]+:(\d+)/, token in (.+)$", line).groups()
        with open(token_file, encoding="ascii") as stream:
            token = stream.read().strip()
        context = ssl.create_default_context(cafile=str(certificate))
        CERTIFICATES[context] = certificate
        return int(port), token, context

    return start


def ask(port, token, context, path="/api/v1/status", **headers):
    connection = http.client.HTTPSConnection("127.0.0.1", port, context=context, timeout=PATIENCE)
    try:
        connection.request("GET", path, headers={"Authorization": f"Bearer {token}", **headers})
        response = connection.getresponse()
        return response.status, json.load(response)
    finally:
        connection.close()


def test_the_api_is_served_under_tls(serving):
    port, token, context = serving()
    status, answer = ask(port, token, context)
    assert status == 200 and answer["version"]
    assert ask(port, "wrong", context)[0] == 401
    # Large answers and several requests over one connection.
    connection = http.client.HTTPSConnection("127.0.0.1", port, context=context, timeout=PATIENCE)
    for _ in range(3):
        connection.request("GET", "/metrics", headers={"Authorization": f"Bearer {token}"})
        assert b"zrm_build_info" in connection.getresponse().read()
    connection.close()


def test_the_names_of_the_certificate_are_names_of_the_server(serving):
    port, token, context = serving()
    assert ask(port, token, context, Host=f"agent.example:{port}")[0] == 200
    assert ask(port, token, context, Host=f"localhost:{port}")[0] == 200
    assert ask(port, token, context, Host=f"evil.example:{port}")[0] == 421
    assert ask(port, token, context, Host=f"agent.example:{port + 1}")[0] == 421
    origin = lambda text: ask(port, token, context, Origin=text)[0]
    assert origin(f"https://agent.example:{port}") == 200
    assert origin(f"http://agent.example:{port}") == 403
    assert origin("https://evil.example") == 403


@pytest.mark.filterwarnings("ignore:ssl.TLSVersion.TLSv1")
def test_old_tls_and_no_tls_are_refused(serving):
    port, token, context = serving()
    old = ssl.create_default_context()
    old.check_hostname = False
    old.verify_mode = ssl.CERT_NONE
    old.set_ciphers("ALL:@SECLEVEL=0")
    old.minimum_version = ssl.TLSVersion.TLSv1
    old.maximum_version = ssl.TLSVersion.TLSv1_1
    with pytest.raises((ssl.SSLError, OSError)):
        ask(port, token, old)
    with socket.create_connection(("127.0.0.1", port), timeout=PATIENCE) as plain:
        plain.sendall(b"GET /healthz HTTP/1.1\r\nHost: localhost\r\n\r\n")
        try:
            assert not plain.recv(1000).startswith(b"HTTP/")
        except ConnectionResetError:
            pass
    assert ask(port, token, context)[0] == 200


def test_only_suites_with_forward_secrecy_are_accepted(serving):
    port, token, context = serving()

    def agreed(ciphers):
        old = ssl.create_default_context(cafile=str(certificate_of(context)))
        old.maximum_version = ssl.TLSVersion.TLSv1_2
        old.set_ciphers(ciphers)
        with socket.create_connection(("127.0.0.1", port), timeout=PATIENCE) as raw:
            with old.wrap_socket(raw, server_hostname="agent.example") as secured:
                return secured.cipher()[0]

    assert agreed("ECDHE+AESGCM").startswith("ECDHE-ECDSA-AES")
    assert "CHACHA20" in agreed("ECDHE+CHACHA20")
    for weak in ("ECDHE-ECDSA-AES256-SHA", "ECDHE-ECDSA-AES128-SHA256", "AES256-GCM-SHA384", "AES128-SHA"):
        with pytest.raises((ssl.SSLError, OSError)):
            agreed(weak)
    with socket.create_connection(("127.0.0.1", port), timeout=PATIENCE) as raw:
        with context.wrap_socket(raw, server_hostname="agent.example") as secured:
            assert secured.version() == "TLSv1.3", "what both know is preferred"


def test_browsers_are_told_to_stay_with_tls(agent, serving):
    port, token, context = serving()
    connection = http.client.HTTPSConnection("127.0.0.1", port, context=context, timeout=PATIENCE)
    for path in ("/healthz", "/none"):
        connection.request("GET", path)
        response = connection.getresponse()
        response.read()
        assert response.getheader("Strict-Transport-Security") == "max-age=31536000"
    connection.close()


def test_a_changed_token_and_certificate_are_taken_over(agent, serving):
    port, token, context = serving()
    kept = http.client.HTTPSConnection("127.0.0.1", port, context=context, timeout=PATIENCE)

    def status(token):
        kept.request("GET", "/api/v1/status", headers={"Authorization": f"Bearer {token}"})
        response = kept.getresponse()
        response.read()
        return response.status

    assert status(token) == 200
    descriptor = kept.sock.fileno()
    token_file = agent.directory / "state" / "api-token"
    renewed = "x" * 64
    token_file.write_text(renewed)
    wait_until(lambda: status(renewed) == 200, "the new token")
    assert status(token) == 401
    # A broken certificate is reported once, and the previous one stays in use.
    certificate, key = agent.directory / "agent.pem", agent.directory / "agent.key"
    whole = certificate.read_text()
    certificate.write_text("nonsense")
    agent.wait_trace("HTTP: the previous certificate stays in use: cannot use the certificate")
    assert ask(port, renewed, context)[0] == 200
    certificate.write_text(whole)
    make_certificate(agent.directory)

    def served():
        fresh = ssl.create_default_context(cafile=str(certificate))
        try:
            return ask(port, renewed, fresh)[0] == 200
        except ssl.SSLError:
            return False

    wait_until(served, "the new certificate")
    assert key.exists() and status(renewed) == 200
    assert kept.sock.fileno() == descriptor, "the connection lives on"
    assert len(agent.trace("the previous certificate stays in use")) == 1
    kept.close()


def test_clients_that_never_finish_the_handshake_delay_nobody(agent, serving):
    port, token, context = serving()
    silent = [socket.create_connection(("127.0.0.1", port)) for _ in range(50)]
    for client in silent[:25]:
        client.sendall(b"\x16\x03\x01")
    begin = time.monotonic()
    assert ask(port, token, context)[0] == 200
    assert time.monotonic() - begin < 5
    assert agent.stop() == 0
    for client in silent:
        client.close()


@pytest.mark.parametrize(
    "broken", ["certificate", "no certificate", "key", "no key", "passphrase", "pair"]
)
def test_without_a_usable_certificate_monitoring_goes_on(agent, broken):
    certificate, key = make_certificate(agent.directory)
    if broken == "pair":
        _, key = make_certificate(agent.directory, "other")
    elif broken == "passphrase":
        encrypted = key.with_suffix(".encrypted")
        subprocess.run(
            ["openssl", "pkey", "-aes128", "-passout", "pass:secret", "-in", key, "-out", encrypted],
            check=True, capture_output=True,
        )  # fmt: skip
        key = encrypted
    elif broken.startswith("no "):
        {"no certificate": certificate, "no key": key}[broken].unlink()
    else:
        {"certificate": certificate, "key": key}[broken].write_text("nonsense")
    agent.log()
    agent.listen = "127.0.0.1:0"
    agent.http_keys = {"certificate": certificate, "key": key}
    agent.start(wrapper=WITH_TERMINAL)
    expected = {
        "certificate": f"HTTP is off: cannot use the certificate {certificate}: no start line; it must be a PEM file",
        "no certificate": f"HTTP is off: cannot use the certificate {certificate}: No such file or directory",
        "key": f"HTTP is off: cannot use the key {key}: ",
        "no key": f"HTTP is off: cannot use the key {key}: No such file or directory",
        "passphrase": f"HTTP is off: cannot use the key {key}: ",
        "pair": f"HTTP is off: cannot use the key {key}: key values mismatch",
    }[broken]
    agent.wait_trace(expected)
    assert agent.stop() == 0


def test_other_machines_need_tls(agent):
    agent.log()
    agent.listen = "0.0.0.0:0"
    agent.start(wait=False)
    assert agent.wait_end() == 2
    assert agent.trace("can be reached from other machines; write a loopback address")


def test_a_client_that_closes_its_stream_is_noticed(serving):
    port, token, context = serving()

    def clients():
        connection = http.client.HTTPSConnection("127.0.0.1", port, context=context, timeout=PATIENCE)
        connection.request("GET", "/metrics", headers={"Authorization": f"Bearer {token}"})
        text = connection.getresponse().read().decode()
        connection.close()
        return re.search(r"^zrm_http_stream_clients (\d+)$", text, re.M).group(1)

    raw = socket.create_connection(("127.0.0.1", port), timeout=PATIENCE)
    stream = context.wrap_socket(raw, server_hostname="agent.example")
    stream.sendall(
        f"GET /api/v1/events/stream HTTP/1.1\r\nHost: agent.example:{port}\r\n"
        f"Authorization: Bearer {token}\r\n\r\n".encode()
    )
    assert stream.recv(100).startswith(b"HTTP/1.1 200")
    assert clients() == "1"
    left = time.monotonic()
    try:
        stream.unwrap()
    except ssl.SSLError:
        pass  # what the server has sent in the meantime is not read
    stream.close()
    wait_until(lambda: clients() == "0", "the end of the stream")
    assert time.monotonic() - left < 12, "not only when the stream has something to send"
