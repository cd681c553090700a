"""Backtests and explanations of situations with groups, episodes and pauses find what live judgement finds."""

import os
import random
import time

import pytest
import zrmctl
from analysis import Analysis
from api import stamp
from conftest import wait_until
from test_episodes import FAILED, at, failed, followed, stored

SEED = int(os.environ.get("ZRM_SEED", str(random.randrange(1 << 30))))
LINES = 400
SITUATIONS = {
    "groups": {"group_by": ["ip"], "frequency": ">= 3", "period": "60s", "resolve_after": "90s"},
    "users": {"group_by": ["ip"], "distinct": "user", "frequency": ">= 3", "period": "5m", "resolve_after": "2m"},
    "pauses": {"group_by": "ip", "frequency": ">= 2", "period": "30s", "cooldown": "10m"},
    "after": {"group_by": ["ip"], "frequency": ">= 2", "period": "5m", "then": "user=user3", "cooldown": "1m"},
    "lasting": {"group_by": ["ip"], "frequency": ">= 3", "period": "5m", "then": "user=user3", "resolve_after": "2m"},
    "episodes": {"resolve_after": "20s"},
    "alternating": {"group_by": ["user"], "max_groups": 2, "resolve_after": "30s"},
}


def write_lines(log, chance):
    """Two hours of failures, of which some are late and some come at once."""
    lines = []
    moment = -7200.0
    for _ in range(LINES):
        moment += chance.choice((0, 0, 1, 2, 5, 20, 40, 100))
        moment = min(moment, -600)
        late = chance.choice((0, 0, 0, 0, 3, 25))
        address = f"10.0.0.{chance.randrange(4)}"
        lines.append(failed(address, f"user{chance.randrange(4)}", when=at(moment - late)))
    log.append("".join(lines))
    return lines


def episode_of(event):
    episode = event["episode"]
    return (episode["first"], episode["last"], episode["count"], tuple(event.get("group", {}).items()))


def found(episode):
    return (episode["first"], episode["last"], episode["count"], tuple(episode.get("group", {}).items()))


@pytest.mark.parametrize("run", range(3))
def test_the_past_is_judged_as_it_was_live(agent, run):
    print(f"seed {SEED + run}")
    chance = random.Random(SEED + run)
    agent.listen = "127.0.0.1:0"
    log = followed(agent)
    for name, keys in SITUATIONS.items():
        agent.situation(name, when=FAILED, log=log, **keys)
    lines = write_lines(log, chance)  # before the start: the clock ends no episode between two of them
    agent.start()
    api = Analysis(agent)
    wait_until(lambda: api.counts("groups")["matched"] == len(lines), "the lines to be read")

    def is_stored():
        """Whether all events and the ends of all episodes are in the history."""
        events = stored(agent)
        states = [event.get("state") for event in events]
        raised = sum(api.counts(name)["raised"] for name in SITUATIONS)
        return len(events) - states.count("resolved") == raised and states.count("raised") == states.count("resolved")

    wait_until(is_stored, "the end of all episodes", 30)
    begin, end = stamp(time.time() - 10_000), stamp(time.time() + 60)
    for name in SITUATIONS:
        events = [event for event in stored(agent) if event["situation"] == name]
        raised = [event for event in events if event.get("state") != "resolved"]
        tested = api.backtest(begin, end, situation=name)
        assert tested["matched"] == len(lines) and not tested["truncated"]
        assert tested["raised"] == len(raised) > 0, name
        assert tested["raised_at"] == [event["row"]["ENTRYTIME"] for event in raised], name
        resolved = [event for event in events if event.get("state") == "resolved"]
        assert sorted(map(found, tested["episodes"])) == sorted(map(episode_of, resolved)), name
        assert tested["episode_count"] == len(resolved)
        assert all(episode["over"] for episode in tested["episodes"])
        status, _, answer = api.request("POST", "/api/v1/explain", {"situation": name, "log": str(log), "last": LINES})
        assert status == 200, answer
        explained = [one for one in answer["explanations"] if one["raised"]]
        assert [one["line"] for one in explained] == [event["entry"] for event in raised], name
        for one, event in zip(explained, raised):
            assert one.get("group") == event.get("group")
            if "episode" in event:
                assert one["episode"] == {"first": event["episode"]["first"], "count": event["episode"]["count"]}
                assert one["decision"].endswith("and an episode begins.")
    assert agent.stop() == 0


def test_an_explanation_says_what_became_of_an_entry(agent):
    agent.listen = "127.0.0.1:0"
    log = followed(agent)
    agent.situation("bruteforce", when=FAILED, log=log, **SITUATIONS["groups"])
    agent.situation("paused", when=FAILED, log=log, **SITUATIONS["pauses"])
    agent.situation("users", when=FAILED, log=log, **SITUATIONS["users"])
    agent.situation("after", when=FAILED, log=log, **SITUATIONS["after"])
    agent.start()
    api = Analysis(agent)
    log.append("".join(failed("10.0.0.1", f"user{second}", when=at(second - 3600)) for second in range(4)))
    wait_until(lambda: api.counts("users")["matched"] == 4, "the lines to be read")

    def decisions(name):
        status, _, answer = api.request("POST", "/api/v1/explain", {"situation": name, "log": str(log), "last": 4})
        assert status == 200, answer
        return [one["decision"] for one in answer["explanations"]]

    group = "of ip=10.0.0.1"
    first, second, third, fourth = decisions("bruteforce")
    assert first == f"Would not be raised: 1 entry {group} in 60 s, the threshold is >= 3."
    assert second == f"Would not be raised: 2 entries {group} in 60 s, the threshold is >= 3."
    assert third == f"Would be raised: 3 entries {group} in 60 s, the threshold is >= 3, and an episode begins."
    assert fourth.startswith(f"Would not be raised: it belongs to the episode {group} that began at ")
    assert "so far" in fourth
    assert decisions("paused")[2] == (
        f"Would not be raised: an event {group} was raised less than 10m before."
    )
    assert decisions("users")[1] == (
        f"Would not be raised: 2 different values of user {group} in 300 s, the threshold is >= 3."
    )
    assert decisions("after")[1:] == [
        f"Would not be raised: 2 entries {group} in 300 s, the threshold is >= 2, "
        "and only an entry with user=user3 raises an event.",
        f"Would not be raised: 3 entries {group} in 300 s, the threshold is >= 2, "
        "and only an entry with user=user3 raises an event.",
        f"Would be raised: 3 entries {group} in 300 s before it, the threshold is >= 2.",
    ]
    # A line that is not in the log comes after all that are.
    line = failed("10.0.0.1", "other", when=at(4 - 3600)).rstrip()
    (explained,) = api.request("POST", "/api/v1/explain", {"situation": "bruteforce", "log": str(log), "line": line})[2][
        "explanations"
    ]
    assert not explained["raised"] and explained["episode"]["count"] >= 4
    other = failed("10.0.0.2", "other", when=at(4 - 3600)).rstrip()
    (explained,) = api.request("POST", "/api/v1/explain", {"situation": "bruteforce", "log": str(log), "line": other})[2][
        "explanations"
    ]
    assert explained["group"] == {"ip": "10.0.0.2"} and explained["window"]["count"] == 1
    assert agent.stop() == 0


def test_the_client_lists_the_episodes_of_a_backtest(agent):
    agent.listen = "127.0.0.1:0"
    log = followed(agent)
    agent.situation("failed", when=FAILED, log=log, group_by=["ip"], resolve_after="30s")
    lines = [failed("10.0.0.1", when=at(seconds - 3600)) for seconds in (0, 10, 50)]
    log.append("".join([*lines, failed("10.0.0.2", when=at(-5))]))
    agent.start()
    api = Analysis(agent)
    wait_until(lambda: api.counts("failed")["matched"] == 4, "the lines to be read")
    where = ["--url", f"http://127.0.0.1:{api.port}", "--token-file", api.token_file]
    status, out, _ = zrmctl.run(["backtest", "failed", "--from", "-2h", *where])
    assert status == 0
    decision, heading, *rows = out.splitlines()
    assert decision.startswith("Would have been raised 3 times")
    assert heading.split() == ["STATE", "FIRST", "LAST", "COUNT", "GROUP"]
    assert [(row.split()[0], *row.split()[-2:]) for row in rows] == [
        ("resolved", "2", "ip=10.0.0.1"),
        ("resolved", "1", "ip=10.0.0.1"),
        ("open", "1", "ip=10.0.0.2"),
    ]
    assert agent.stop() == 0
