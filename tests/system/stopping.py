"""An agent that is kept busy, and how long its end and its answers may take."""

import http.client
import os
import time
from pathlib import Path
from signal import SIGTERM

from conftest import syslog_line

END = 10  # seconds from the signal to the end, at most
ANSWER = 5  # seconds to any answer, at most
FLOOD = 6000  # lines, each an event: more than fit into the queue


def flood(log, count=FLOOD):
    log.append("".join(syslog_line(f"number {i}") for i in range(count)))


def stop(agent, number=SIGTERM):
    """The exit status of an agent that ends in time."""
    begin = time.monotonic()
    agent.send(number)
    agent.wait_end(END + 20)
    took = time.monotonic() - begin
    assert took < END, f"the end took {took:.1f} s\n{agent.stderr.text()[-2000:]}"
    return agent.process.returncode


def answers(api):
    """Every quick resource answers in time, with what it knows or with "busy"."""
    for path in ("/api/v1/logs", "/metrics", "/api/v1/status", "/api/v1/situations", "/healthz"):
        begin = time.monotonic()
        if path == "/metrics":
            status = status_of_text(api, path)
        else:
            status, _, _ = api.request("GET", path)
        took = time.monotonic() - begin
        assert took < ANSWER, f"{path} took {took:.1f} s"
        assert status in (200, 503), path


def status_of_text(api, path):
    connection = http.client.HTTPConnection("127.0.0.1", api.port, timeout=30)
    try:
        connection.request("GET", path, headers={"Authorization": f"Bearer {api.token}"})
        response = connection.getresponse()
        response.read()
        return response.status
    finally:
        connection.close()


def cpu_seconds(agent):
    fields = Path(f"/proc/{agent.process.pid}/stat").read_text().rpartition(")")[2].split()
    return sum(map(int, fields[11:13])) / os.sysconf("SC_CLK_TCK")


def queue_is_full(api):
    _, _, status = api.request("GET", "/api/v1/status")
    return status["queue"]["size"] >= status["queue"]["capacity"]


def queue_stands_still(api):
    """True when the queue is full, and not just for a moment."""
    for _ in range(20):
        if not queue_is_full(api):
            return False
        time.sleep(0.05)
    return True
