"""Disks that are full or frozen delay neither the end of the agent nor its answers."""

import subprocess
import time
from pathlib import Path
from signal import SIGINT, SIGTERM

import pytest
from api import Api
from conftest import wait_until
from stopping import ANSWER, END, FLOOD, answers, flood, queue_is_full, queue_stands_still, stop

pytestmark = pytest.mark.slow


@pytest.fixture(scope="session")
def disk(tmp_path_factory):
    """A library to preload: writes of the database fail or wait while a file exists."""
    library = tmp_path_factory.mktemp("preload") / "disk.so"
    for name in ("full_disk", "frozen_disk"):
        subprocess.run(
            ["cc", "-shared", "-fPIC", "-o", library.with_name(name + ".so"),
             Path(__file__).with_name(name + ".c"), "-ldl"],
            check=True,
        )  # fmt: skip
    return library.parent


def use_disk(agent, disk, kind, **environment):
    """Gives the agent a disk of this kind; it takes nothing while the returned file exists."""
    flag = agent.directory / "flag"
    agent.environment = {
        "LD_PRELOAD": str(disk / f"{kind}_disk.so"),
        f"{kind.upper()}_DISK": str(flag),
        "ASAN_OPTIONS": "verify_asan_link_order=0",
        **environment,
    }
    return flag


def refresh_onto(agent, log):
    """Makes this the only log, and waits until the agent watches it."""
    agent.configure(str(log))
    agent.refresh()
    agent.wait_trace("Manager thread waiting for a signal.", 2, seconds=END)


IGNORING_SIGINT = ("sh", "-c", 'trap "" INT; exec "$@"', "sh")  # as a shell starts it in the background


@pytest.mark.parametrize("wrapper", ((), IGNORING_SIGINT), ids=("", "ignoring SIGINT"))
@pytest.mark.parametrize("number", (SIGTERM, SIGINT))
def test_a_stop_while_the_history_opens_is_a_stop(agent, disk, number, wrapper):
    flag = use_disk(agent, disk, "frozen")
    flag.touch()
    agent.log()
    agent.start(wait=False, wrapper=wrapper)
    lock = agent.directory / "state" / "history.lock"
    wait_until(lambda: lock.exists() or not agent.running(), "the history to be opened")
    assert stop(agent, number) == 0


@pytest.mark.parametrize("kind", ("full", "frozen"))
@pytest.mark.parametrize("refresh", (False, True))
def test_a_disk_that_takes_nothing_delays_neither_signals_nor_requests(
    agent, disk, kind, refresh
):
    flag = use_disk(agent, disk, kind)
    agent.listen = "127.0.0.1:0"
    log, other = agent.log(), agent.log("other.log")
    agent.situation()
    agent.start()
    api = Api(agent)
    flag.touch()
    flood(log, 10_000)
    wait_until(lambda: queue_is_full(api), "a full queue")
    if refresh:
        refresh_onto(agent, other)
    answers(api)
    begin = time.monotonic()
    api.request("GET", "/api/v1/events")
    assert time.monotonic() - begin < ANSWER
    stop(agent)
    text = agent.stderr.text()
    assert "2048 events were not stored in the history" in text
    if not refresh:
        assert "7952 lines that were waiting in the logs were not read" in text


@pytest.mark.parametrize("history", (True, False))
def test_a_sink_on_a_frozen_disk_delays_neither_signals_nor_requests(agent, disk, history):
    flag = use_disk(agent, disk, "frozen", FROZEN_FILES=".jsonl")
    agent.history = {"enabled": history}
    agent.sink = agent.directory / "events.jsonl"
    agent.listen = "127.0.0.1:0"
    log, other = agent.log(), agent.log("other.log")
    agent.situation()
    agent.start()
    api = Api(agent)
    flag.touch()
    flood(log)
    if history:
        wait_until(
            lambda: api.request("GET", "/api/v1/status")[2]["history"]["events"] == FLOOD, "the events"
        )
    else:
        wait_until(lambda: queue_stands_still(api), "a full queue")
    refresh_onto(agent, other)
    answers(api)
    stop(agent)
    assert agent.sink.read_bytes() == b""
