"""Events over HTTP: what the history holds, and the live stream."""

import http.client
import json
import socket
import threading
import time

import pytest

from api import Api
from conftest import syslog_line, wait_until


@pytest.fixture
def serving(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.situation(name="rare", log=log, severity="critical", when=["ENTRYDESC contains 'rare'"])
    agent.listen = "127.0.0.1:0"
    agent.start()
    return log, Api(agent)


def get(api, path):
    status, kind, answer = api.request("GET", path)
    assert (status, kind) == (200, "application/json"), answer
    return answer


def write(log, count, begin=0, text="line"):
    log.append("".join(syslog_line(f"{text} {number}") for number in range(begin, begin + count)))


def wait_newest(api, count):
    wait_until(lambda: get(api, "/api/v1/events?limit=1")["newest"] >= count, f"{count} events")


class Follower:
    """A client of the stream, on a thread of its own."""

    def __init__(self, api, query="", last=None):
        self.messages, self.comments, self.ended = [], 0, threading.Event()
        self._connection = http.client.HTTPConnection("127.0.0.1", api.port, timeout=60)
        headers = {"Authorization": f"Bearer {api.token}", "Accept": "text/event-stream"}
        if last is not None:
            headers["Last-Event-ID"] = str(last)
        self._connection.request("GET", f"/api/v1/events/stream{query}", headers=headers)
        self.response = self._connection.getresponse()
        if self.response.status == 200:
            assert self.response.getheader("Content-Type") == "text/event-stream"
            self._thread = threading.Thread(target=self._read, daemon=True)
            self._thread.start()

    def _read(self):
        message = {}
        try:
            while line := self.response.readline():
                text = line.decode().rstrip("\n")
                if text.startswith(":"):
                    self.comments += 1
                elif text:
                    name, _, value = text.partition(": ")
                    message[name] = value
                else:
                    if "data" in message:
                        self.messages.append(message)
                    message = {}
        except (OSError, ValueError, AttributeError, http.client.HTTPException):  # closed meanwhile
            pass
        self.ended.set()

    def ids(self):
        return [int(message["id"]) for message in self.messages]

    def wait(self, count):
        wait_until(lambda: len(self.messages) >= count, f"{count} messages")

    def close(self):
        sock = self._connection.sock or self.response.fp.raw._sock
        sock.shutdown(socket.SHUT_RDWR)
        self._connection.close()


def test_events_can_be_queried(serving):
    log, api = serving
    write(log, 5)
    write(log, 2, text="rare")
    wait_newest(api, 9)
    answer = get(api, "/api/v1/events")
    assert [event["id"] for event in answer["events"]] == list(range(9, 0, -1))
    assert (answer["next"], answer["oldest"], answer["newest"]) == (None, 1, 9)
    answer = get(api, "/api/v1/events?order=asc&limit=4&after=2")
    assert [event["id"] for event in answer["events"]] == [3, 4, 5, 6] and answer["next"] == 6
    answer = get(api, "/api/v1/events?situation=rare")
    assert {event["situation"] for event in answer["events"]} == {"rare"}
    assert len(answer["events"]) == 2
    assert len(get(api, "/api/v1/events?severity=critical&severity=info")["events"]) == 9
    assert len(get(api, f"/api/v1/events?log={log}")["events"]) == 9
    assert get(api, "/api/v1/events?log=/none")["events"] == []
    event = get(api, "/api/v1/events/3")
    assert get(api, f"/api/v1/events?from={event['raised']}&to={event['raised']}")["events"]
    assert api.request("GET", "/api/v1/events/99")[0] == 404
    status = get(api, "/api/v1/status")
    assert status["history"]["enabled"] and status["history"]["newest"] == 9


def test_followers_get_every_event_in_order(serving):
    log, api = serving
    write(log, 3)
    wait_newest(api, 3)
    live, rare, again = Follower(api), Follower(api, "?severity=critical"), Follower(api, "?after=1")
    again.wait(2)
    write(log, 500)
    write(log, 1, text="rare")
    live.wait(502)
    assert live.ids() == list(range(4, 506))
    assert again.ids()[:2] == [2, 3]
    again.wait(504)
    assert again.ids() == list(range(2, 506))
    rare.wait(1)
    event = json.loads(rare.messages[0]["data"])
    assert (event["situation"], rare.messages[0]["event"]) == ("rare", "event")
    # A client that comes back continues where it was.
    live.close()
    write(log, 5)
    resumed = Follower(api, last=live.ids()[-1])
    resumed.wait(5)
    assert resumed.ids() == list(range(506, 511))
    for follower in (rare, again, resumed):
        follower.close()
    wait_until(lambda: b"zrm_http_stream_clients 0" in metrics(api), "every follower gone")


def metrics(api):
    connection = http.client.HTTPConnection("127.0.0.1", api.port)
    connection.request("GET", "/metrics", headers={"Authorization": f"Bearer {api.token}"})
    text = connection.getresponse().read()
    connection.close()
    return text


def test_the_number_of_followers_is_limited(serving):
    log, api = serving
    followers = [Follower(api) for _ in range(32)]
    assert {follower.response.status for follower in followers} == {200}
    refused = Follower(api)
    assert refused.response.status == 503
    assert "at most 32" in json.loads(refused.response.read())["detail"]
    write(log, 2)
    for follower in followers:
        follower.wait(2)
    followers[0].close()
    wait_until(lambda: Follower(api).response.status == 200, "room for another one")
    for follower in followers[1:]:
        follower.close()


@pytest.mark.slow
def test_a_follower_that_reads_nothing_is_disconnected_and_delays_nobody(agent, serving):
    log, api = serving
    with socket.socket() as client:
        client.setsockopt(socket.SOL_SOCKET, socket.SO_RCVBUF, 4096)
        client.connect(("127.0.0.1", api.port))
        client.sendall(
            f"GET /api/v1/events/stream HTTP/1.1\r\nHost: localhost:{api.port}\r\n"
            f"Authorization: Bearer {api.token}\r\n\r\n".encode()
        )
        wait_until(lambda: b"zrm_http_stream_clients 1" in metrics(api), "the follower")
        for part in range(20):
            write(log, 500, text="x" * 200)
        agent.wait_events(10_000)
        wait_until(lambda: b"zrm_http_stream_clients 0" in metrics(api), "the follower being gone")
    write(log, 1)
    agent.wait_events(10_001)


def test_a_stop_ends_the_streams(agent, serving):
    _, api = serving
    followers = [Follower(api) for _ in range(3)]
    begin = time.monotonic()
    assert agent.stop() == 0
    assert time.monotonic() - begin < 15
    for follower in followers:
        assert follower.ended.wait(10)


@pytest.mark.slow
def test_rates_count_entries_and_events(serving):
    log, api = serving
    write(log, 4)
    write(log, 1, text="rare")
    wait_newest(api, 6)

    def counted():
        for one in get(api, "/api/v1/rates")["logs"]:
            if one["log"] == str(log):
                return (sum(filter(None, one["entries"])), sum(filter(None, one["events"]))) == (5, 6)
        return False

    wait_until(counted, "5 entries and 6 events in the rates", seconds=150)


def test_a_text_search_covers_the_whole_history_and_the_stream(serving):
    log, api = serving
    write(log, 3000, text="usual")
    write(log, 1, begin=7, text="disk FULL on")
    write(log, 3000, text="usual")
    wait_newest(api, 6001)
    found = get(api, "/api/v1/events?text=Disk+full&limit=10")
    events = found["events"]
    while found["next"] is not None:  # a search may take several requests
        found = get(api, f"/api/v1/events?text=Disk+full&before={found['next']}")
        events += found["events"]
    assert [(one["id"], one["row"]["ENTRYDESC"]) for one in events] == [(3001, "disk FULL on 7")]
    follower = Follower(api, "?text=DISK", last=0)
    write(log, 1, text="another disk")
    wait_until(lambda: len(follower.messages) == 2, "both events")
    assert [json.loads(one["data"])["id"] for one in follower.messages] == [3001, 6002]
