"""Starts with fewer threads or descriptors than the agent would take."""

import http.client
import os
import subprocess
from pathlib import Path

import pytest

from api import Api
from conftest import PATIENCE, syslog_line


@pytest.fixture(scope="session")
def few_threads(tmp_path_factory):
    library = tmp_path_factory.mktemp("preload") / "few_threads.so"
    source = Path(__file__).with_name("few_threads.c")
    subprocess.run(["cc", "-shared", "-fPIC", "-o", library, source, "-ldl"], check=True)
    return library


@pytest.mark.parametrize("history", [True, False])
def test_a_start_without_a_thread_ends_with_one_sentence(agents, few_threads, history):
    """Whichever thread is the first that cannot be started, up to the sinks' threads."""
    ends = []
    for threads in range(10):
        agent = agents()
        agent.situation(log=agent.log())
        agent.more_sinks = [{"type": "jsonl", "path": str(agent.directory / "more.jsonl")}]
        agent.history = {"enabled": history}
        agent.environment.update(preloaded(few_threads) | {"THREADS": str(threads)})
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
        assert says_why(said), said
        assert said.count("zrmagent: ") <= 1, said
    assert ends[0] == 255 and ends[-1] is None
    assert set(ends) == {255, None}, ends
    assert ends.index(None) >= 3, ends


def test_a_stream_without_a_thread_is_refused(agent, few_threads):
    agent.situation(log=agent.log())
    agent.listen = "127.0.0.1:0"
    no_threads = agent.directory / "no-threads"
    agent.environment.update(preloaded(few_threads) | {"NO_THREADS": str(no_threads)})
    agent.start()
    api = Api(agent)
    assert api.request("GET", "/healthz")[0] == 200  # a worker for short requests has been started
    no_threads.touch()
    status, _, problem = api.request("GET", "/api/v1/events/stream")
    assert (status, problem["detail"]) == (503, "the agent has no thread for the stream: try again")
    no_threads.unlink()
    connection = http.client.HTTPConnection("127.0.0.1", api.port, timeout=PATIENCE)
    connection.request("GET", "/api/v1/events/stream", headers={"Authorization": f"Bearer {api.token}"})
    response = connection.getresponse()
    assert (response.status, response.readline()) == (200, b"retry: 2000\n")
    connection.close()
    assert agent.stop() == 0


def preloaded(library):
    return {
        "LD_PRELOAD": str(library),
        "ASAN_OPTIONS": "verify_asan_link_order=0:" + os.environ.get("ASAN_OPTIONS", ""),
    }


def says_why(said):
    """Whether the agent has reported that a thread could not be started, whichever it was."""
    return any(
        sentence in said
        for sentence in (
            "manager thread",
            "zrmagent: no thread can be started: raise the limit on processes",
            "zrmagent: cannot start a thread (Resource",
        )
    )


def user_without_processes():
    """The wrapper that makes the agent one, and the limits to try: only root can change its user.
    Any other user has this test's processes, too: a limit of one process is always reached."""
    if os.geteuid() != 0:
        return (), (1,)
    user = str(400_000 + os.getpid() % 100_000)
    wrapper = ("setpriv", f"--reuid={user}", f"--regid={user}", "--clear-groups",
               "--inh-caps=-all,+dac_override", "--ambient-caps=+dac_override")  # fmt: skip
    return wrapper, (1, 2, 3, 4, 5, 12)


def test_a_user_who_has_no_processes_left_gets_a_message(agents):
    """The limit itself, in place of a library that imitates it."""
    as_user, limits = user_without_processes()
    ends = {}
    for processes in limits:
        agent = agents()
        agent.situation(log=agent.log())
        agent.listen = "127.0.0.1:0"
        limit = ("prlimit", f"--nproc={processes}:{processes}")
        agent.start(trace="error", wait=False, wrapper=as_user + limit)
        if processes == 12:
            agent.wait_trace("zrmagent: HTTP at")
            ends[processes] = agent.stop()
            continue
        ends[processes] = agent.wait_end()
        said = agent.stderr.text()
        assert says_why(said), said
    assert ends == {processes: 0 if processes == 12 else 255 for processes in limits}


@pytest.mark.parametrize("logs, descriptors, kept", [(300, 256, 64), (2000, 1024, 256)])
def test_many_logs_leave_descriptors_for_everything_else(agent, logs, descriptors, kept):
    paths = [agent.directory / f"{number}.log" for number in range(logs)]
    for path in paths:
        path.touch()
    agent.configure(*map(str, paths))
    agent.situation(log=None)
    agent.sink = agent.directory / "events.jsonl"
    agent.listen = "127.0.0.1:0"
    limit = ("prlimit", f"--nofile={descriptors}:{descriptors}")
    agent.start(trace="error", wait=False, wrapper=limit)
    said = agent.wait_trace("logs could not be opened")[0]
    assert f"of {descriptors} descriptors {kept} are kept" in said
    api = Api(agent)
    states = [row["MONSTATUS"] for row in api.logs().values()]
    assert len(states) == logs
    failed = sum(state != "Running" for state in states)
    assert said.startswith(f"zrmagent: {failed} logs could not be opened"), (failed, said)
    assert logs - (descriptors - kept) <= failed < logs - (descriptors - kept) + 92
    for path in paths:
        path.write_text(syslog_line("line"), encoding="utf-8")
    events = agent.wait_events(logs - failed)
    assert len(events) == logs - failed
    assert agent.stop() == 0
