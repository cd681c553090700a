"""Servers whose answers crash or fill a careless client: the agent's receivers, zrmctl's agents."""

import resource
import socket
import subprocess
import threading
from pathlib import Path

import pytest

from conftest import PATIENCE, PROGRAM, descriptions, syslog_line, wait_until
from receiver import Receiver

ZRMCTL = str(Path(PROGRAM).with_name("zrmctl"))
HEAD = b"HTTP/1.1 500 Bad\r\nTransfer-Encoding: chunked\r\n\r\n"

# What is sent first, and then repeatedly; nothing means the end of the connection. None of
# these says that the events were taken.
ANSWERS = {
    "reason phrase": (b"HTTP/1.1 500 " + 40_000 * b"x" + b"\r\nContent-Length: 0\r\n\r\n", b""),
    "long reason phrase": (b"HTTP/1.1 200 " + 4_000_000 * b"x" + b"\r\n\r\n", b""),
    "reason phrase without end": (b"HTTP/1.1 200 ", 10_000 * b"x"),
    "header without end": (b"HTTP/1.1 200 OK\r\nX-One: ", 10_000 * b"x"),
    "headers without end": (b"HTTP/1.1 200 OK\r\n", 1000 * b"X-One: 1\r\n"),
    "interim answers without end": (b"", 100 * b"HTTP/1.1 103 Early Hints\r\n\r\n"),
    "size of a chunk without end": (HEAD + b"1;", 10_000 * b"x"),
    "body without end": (HEAD, b"2710\r\n" + 10_000 * b"x" + b"\r\n"),
    "trailers without end": (HEAD + b"0\r\n", 1000 * b"X-One: 1\r\n"),
    "redirect": (b"HTTP/1.1 307 Go\r\nLocation: http://127.0.0.1:1/\r\nContent-Length: 0\r\n\r\n", b""),
}


class HostileServer:
    """Gives every request the same answer."""

    def __init__(self, answer):
        self.begin, self.endless = answer
        self.connections = 0
        self._listener = socket.create_server(("127.0.0.1", 0))
        self.port = self._listener.getsockname()[1]
        self._thread = threading.Thread(target=self._serve)
        self._thread.start()

    def _serve(self):
        while True:
            try:
                connection = self._listener.accept()[0]
            except OSError:
                return
            self.connections += 1
            threading.Thread(target=self._answer, args=(connection,), daemon=True).start()

    def _answer(self, connection):
        with connection:
            try:
                connection.recv(65536)
                connection.sendall(self.begin)
                while self.endless:
                    connection.sendall(self.endless)
            except OSError:
                pass

    def __enter__(self):
        return self

    def __exit__(self, *exception):
        self._listener.shutdown(socket.SHUT_RDWR)
        self._listener.close()
        self._thread.join()


@pytest.mark.parametrize("answer", ANSWERS.values(), ids=ANSWERS.keys())
def test_no_answer_crashes_the_agent_or_fills_its_memory(agent, answer):
    log = agent.log()
    agent.situation("watch", log=log)
    with HostileServer(answer) as server:
        port = server.port
        url = f"http://127.0.0.1:{port}"
        agent.more_sinks.append({"type": "webhook", "url": url, "timeout": "1s"})
        for number in (1, 2):  # the event that was not taken is sent again by the next run
            before = server.connections
            agent.start()
            if number == 1:
                log.append(syslog_line("entry"))
            wait_until(lambda: server.connections >= before + 3, "three tries", PATIENCE)
            assert agent.resident_kilobytes() < 100_000
            if number == 1:
                assert agent.stop() == 0
    with Receiver(port) as receiver:
        events = wait_until(receiver.events, "the event at last", PATIENCE)
        assert descriptions(events) == ["entry"]
        assert agent.stop() == 0


# An endless size is discarded as it arrives, until the time for an answer is over, which is longer
# than a test has (HttpClientTest shows it with a shorter one).
FOR_ZRMCTL = {name: answer for name, answer in ANSWERS.items() if name != "size of a chunk without end"}


@pytest.mark.parametrize("answer", FOR_ZRMCTL.values(), ids=FOR_ZRMCTL.keys())
def test_no_answer_crashes_zrmctl_or_fills_its_memory(answer, tmp_path):
    token = tmp_path / "token"
    token.write_text("token\n")
    with HostileServer(answer) as server:
        command = [ZRMCTL, "--url", f"http://127.0.0.1:{server.port}", "--token-file", str(token)]
        for arguments in (["status"], ["events", "-f"]):
            limit = (768 << 20, 768 << 20)  # address space, of which libraries have their part
            ended = subprocess.run(
                command + arguments,
                capture_output=True,
                timeout=PATIENCE,
                preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_AS, limit),
            )
            assert ended.returncode in (1, 3), ended.stderr
            assert ended.stderr.startswith(b"zrmctl: ")
