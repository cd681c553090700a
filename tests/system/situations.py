"""The situations of a running agent, through its API."""

import urllib.parse

import pytest
from api import Api
from conftest import wait_until

SITUATIONS = "/api/v1/situations"


def path(name, *more):
    return "/".join([SITUATIONS, urllib.parse.quote(name, safe=""), *more])


class Situations:
    """The situations of a running agent."""

    def __init__(self, agent):
        self.api = Api(agent)

    def send(self, method, where, body=None):
        status, _, answer = self.api.request(method, where, body)
        return status, answer

    def add(self, name, **fields):
        status, answer = self.send("POST", SITUATIONS, {"name": name, **fields})
        assert status == 201, answer
        return answer

    def get(self, name):
        status, answer = self.send("GET", path(name))
        assert status == 200, answer
        return answer

    def list(self):
        status, answer = self.send("GET", SITUATIONS)
        assert status == 200, answer
        return answer["situations"]

    def names(self):
        return [situation["name"] for situation in self.list()]

    def wait_opened(self, count):
        """Waits until there are this many and all that run have been opened."""

        def opened():
            now = self.list()
            return len(now) == count and not any(
                s["state"] == "running" and s["problem"] is not None for s in now
            )

        wait_until(opened, lambda: f"{count} situations: {self.list()}")

    def post(self, name, what):
        status, answer = self.send("POST", path(name, what))
        assert status == 200, answer
        return answer

    def remove(self, name):
        return self.send("DELETE", path(name))

    def wait_counts(self, name, **counts):
        def counted():
            now = self.get(name)["counts"]
            return now if all(now[key] == value for key, value in counts.items()) else None

        return wait_until(counted, lambda: f"{counts} of {name}: {self.get(name)}")


@pytest.fixture
def running(agent):
    """An agent with one log and HTTP, and its situations."""
    agent.listen = "127.0.0.1:0"
    agent.watched = agent.log()
    agent.start()
    agent.situations_api = Situations(agent)
    return agent
