"""The clock is set forward by a day and back while episodes, absences and quiet logs are open."""

import threading
import time

import pytest
from conftest import Log, syslog_line
from test_episodes import followed, stored, wait_stored

DAY = 24 * 3600


class Feeder:
    """Writes a line to a log three times a second, with the time of a clock that is set."""

    def __init__(self, log):
        self.ahead = 0
        self.lines = 0
        self._log = log
        self._ends = threading.Event()
        self._thread = threading.Thread(target=self._run)
        self._thread.start()

    def _run(self):
        while not self._ends.wait(0.3):
            when = time.localtime(time.time() + self.ahead)
            self._log.append(syslog_line(f"error {self.lines}", when=when))
            self.lines += 1

    def end(self):
        self._ends.set()
        self._thread.join()


def of(agent, situation):
    return [event for event in stored(agent) if event["situation"] == situation]


def states(agent, situation):
    return [event["state"] for event in of(agent, situation)]


def wait_states(agent, situation, expected):
    deadline = time.monotonic() + 60
    while states(agent, situation) != expected:
        assert time.monotonic() < deadline, f"{situation}: {states(agent, situation)}, not {expected}"
        time.sleep(0.1)


@pytest.mark.slow
def test_a_clock_that_is_set_by_a_day_neither_raises_nor_loses_anything(agent, clock):
    offset = clock(agent)
    log = followed(agent, quiet="12s")
    still = Log(agent.directory / "still.log")
    still.path.write_text("")
    agent.follow(still, start="beginning", quiet="10s")
    agent.situation("errors", log, when=["ENTRYDESC contains 'error'"], resolve_after="5s")
    agent.situation("alive", log, absent="12s")
    agent.situation("missed", log, when=["ENTRYDESC contains 'backup'"], absent="3s")
    agent.start()
    feeder = Feeder(log)
    try:
        wait_states(agent, "missed", ["raised"])
        wait_states(agent, "log-quiet", ["raised"])
        for ahead in (DAY, 0):
            feeder.ahead = ahead
            offset.write_text(str(ahead))
            time.sleep(8)
        assert states(agent, "alive") == [] and states(agent, "missed") == ["raised"]
        assert [event["log"] for event in of(agent, "log-quiet")] == [str(still)]
        log.append(syslog_line("backup"))
        still.append(syslog_line("a line"))
        wait_states(agent, "missed", ["raised", "resolved", "raised"])
        wait_states(agent, "log-quiet", ["raised", "resolved"])
    finally:
        feeder.end()
    wait_states(agent, "alive", ["raised"])
    assert agent.stop() == 0
    ended = [event["episode"] for event in of(agent, "errors") if event["state"] == "resolved"]
    raised = [event["id"] for event in of(agent, "errors") if event["state"] == "raised"]
    assert sorted(episode["id"] for episode in ended) == raised and len(raised) == 3
    assert sum(episode["count"] for episode in ended) == feeder.lines


@pytest.mark.slow
def test_what_was_expected_before_the_clock_was_set_is_missed_in_time(agent, clock):
    offset = clock(agent)
    log = followed(agent)
    agent.situation("silent", log, absent="8s")
    agent.start()
    log.append(syslog_line("one"))
    time.sleep(2)
    begin = time.monotonic()
    for ahead in (DAY, -DAY):
        offset.write_text(str(ahead))
        time.sleep(1)
    (raised,) = wait_stored(agent, 1)
    assert 3 <= time.monotonic() - begin <= 12
    assert raised["episode"]["first"] <= raised["episode"]["last"]
    offset.write_text("0")
    assert agent.stop() == 0
    assert len(stored(agent)) == 1
