"""Starts with fewer threads or descriptors than the agent would take."""

import os
import subprocess
from pathlib import Path

import pytest

from api import Api
from conftest import syslog_line


@pytest.fixture(scope="session")
def few_threads(tmp_path_factory):
    library = tmp_path_factory.mktemp("preload") / "few_threads.so"
    source = Path(__file__).with_name("few_threads.c")
    subprocess.run(["cc", "-shared", "-fPIC", "-o", library, source, "-ldl"], check=True)
    return library


@pytest.mark.parametrize("history", [True, False])
def test_a_start_without_a_thread_ends_with_one_sentence(agents, few_threads, history):
    """Whichever thread is the first that cannot be started, up to those of the sinks."""
    ends = []
    for threads in range(7):
        agent = agents()
        agent.situation(log=agent.log())
        agent.more_sinks = [{"type": "jsonl", "path": str(agent.directory / "more.jsonl")}]
        agent.history = {"enabled": history}
        agent.environment.update(
            {
                "LD_PRELOAD": str(few_threads),
                "THREADS": str(threads),
                "ASAN_OPTIONS": "verify_asan_link_order=0:" + os.environ.get("ASAN_OPTIONS", ""),
            }
        )
        agent.start(trace="error", wait=False)
        try:
            ends.append(agent.process.wait(15))
        except subprocess.TimeoutExpired:
            ends.append(None)  # it runs
            assert agent.stop() == 0
            continue
        agent.stdout.finish()
        agent.stderr.finish()
        said = agent.stderr.text()
        assert "manager thread" in said or "zrmagent: cannot start a thread (Resource" in said, said
        assert said.count("zrmagent: ") <= 1, said
    assert ends[0] == 255 and ends[-1] is None
    assert set(ends) == {255, None}, ends
    assert ends.index(None) >= 3, ends


def test_many_logs_leave_descriptors_for_everything_else(agent):
    logs = [agent.log(f"{number}.log") for number in range(300)]
    agent.situation(log=None)
    agent.sink = agent.directory / "events.jsonl"
    agent.listen = "127.0.0.1:0"
    agent.start(trace="error", wait=False, wrapper=("prlimit", "--nofile=256:256"))
    said = agent.wait_trace("logs could not be opened")[0]
    assert "of 256 descriptors 64 are kept" in said
    api = Api(agent)
    states = [row["MONSTATUS"] for row in api.logs().values()]
    assert len(states) == 300
    failed = sum(state != "Running" for state in states)
    assert said.startswith(f"zrmagent: {failed} logs could not be opened"), (failed, said)
    assert 300 - 192 <= failed < 300 - 100
    for log in logs:
        log.append(syslog_line("line"))
    events = agent.wait_events(300 - failed)
    assert len(events) == 300 - failed
    assert agent.stop() == 0
