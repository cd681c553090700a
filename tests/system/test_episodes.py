"""Groups and episodes of situations: raised once, resolved once, across restarts, kills and changes."""

import json
import os
import random
import re
import sqlite3
import time
import urllib.request
from collections import Counter
from datetime import datetime, timezone
from signal import SIGKILL

import pytest
import zrmctl
from api import Api
from conftest import PATIENCE, Log, syslog_line, wait_until

# How often the agent is killed. More: ZRM_KILLS=200.
KILLS = int(os.environ.get("ZRM_KILLS", "10"))
SEED = int(os.environ.get("ZRM_SEED", str(random.randrange(1 << 30))))
FAILED = ["ENTRYDESC matches 'Failed password for (?P<user>[^ ]*) from (?P<ip>[^ ]*)'"]


def failed(ip, user="root", when=None):
    return syslog_line(f"Failed password for {user} from {ip} port 22", source="sshd[412]", when=when)


def at(seconds):
    """The local time that many seconds from now, as syslog_line takes it."""
    return time.localtime(time.time() + seconds)


def moment(text):
    return datetime.strptime(text, "%Y-%m-%dT%H:%M:%S.%fZ").replace(tzinfo=timezone.utc).timestamp()


def followed(agent, **keys):
    log = Log(agent.directory / "auth.log")
    log.path.write_text("")
    agent.agent_keys["log_config"] = None
    agent.follow(log, start="beginning", rotate_wait="1s", **keys)
    return log


def bruteforce(agent, **keys):
    keys = {"group_by": ["ip"], "frequency": ">= 5", "period": "60s", "resolve_after": "3s", **keys}
    agent.situation("bruteforce", when=FAILED, **keys)


def stored(agent):
    """The events of the history, in order."""
    try:
        with sqlite3.connect(f"file:{agent.directory}/state/history.db?mode=ro", uri=True) as history:
            return [json.loads(text) for (text,) in history.execute("SELECT json FROM events ORDER BY id")]
    except sqlite3.OperationalError:
        return []


def wait_stored(agent, count):
    wait_until(lambda: len(stored(agent)) >= count, lambda: f"{count} events, have {stored(agent)}")
    return stored(agent)


def states(events):
    return [(event["state"], event.get("group", {}).get("ip"), event["episode"]["count"]) for event in events]


def test_a_brute_force_is_one_episode_and_seventy_forgetful_users_are_none(agent):
    log = followed(agent)
    bruteforce(agent)
    agent.start()
    log.append("".join(failed(f"10.0.0.{user}", f"user{user}") for user in range(70)))
    log.append("".join(failed("203.0.113.7") for _ in range(74)))
    raised, resolved = wait_stored(agent, 2)
    assert states([raised, resolved]) == [("raised", "203.0.113.7", 5), ("resolved", "203.0.113.7", 74)]
    assert raised["episode"]["id"] == raised["id"] == resolved["episode"]["id"]
    assert "row" in raised and "row" not in resolved
    assert resolved["log"] == str(log) and resolved["node"] == raised["row"]["ORIGINNODE"]
    end = moment(resolved["episode"]["last"]) + 3
    assert end <= moment(resolved["raised"]) <= end + 2
    assert agent.stop() == 0
    assert len(stored(agent)) == 2


def test_an_episode_goes_on_after_a_restart_and_after_a_kill(agent):
    log = followed(agent)
    bruteforce(agent, resolve_after="6s")
    agent.start()
    log.append("".join(failed("203.0.113.7") for _ in range(7)))
    wait_stored(agent, 1)
    assert agent.stop() == 0
    log.append(failed("203.0.113.7"))
    agent.start()
    log.append(failed("203.0.113.7"))
    time.sleep(1.5)  # no event says that it was read
    agent.send(SIGKILL)
    agent.wait_end()
    log.append(failed("203.0.113.7"))
    agent.start()
    events = wait_stored(agent, 2)
    assert states(events) == [("raised", "203.0.113.7", 5), ("resolved", "203.0.113.7", 10)]
    assert agent.stop() == 0


def test_an_episode_that_ran_out_while_the_agent_was_stopped_is_resolved_at_the_start(agent):
    log = followed(agent)
    bruteforce(agent, resolve_after="4s")
    agent.start()
    log.append("".join(failed("203.0.113.7") for _ in range(6)))
    wait_stored(agent, 1)
    assert agent.stop() == 0
    last = time.time()
    time.sleep(5)  # it runs out
    assert len(stored(agent)) == 1
    agent.start()
    events = wait_stored(agent, 2)
    assert states(events) == [("raised", "203.0.113.7", 5), ("resolved", "203.0.113.7", 6)]
    assert "reason" not in events[1]
    assert moment(events[1]["episode"]["last"]) <= last
    assert agent.stop() == 0


def test_the_end_of_an_episode_says_what_its_beginning_said_also_after_a_restart(agent):
    log = followed(agent)
    bruteforce(agent, resolve_after="4s", text="{count} failures of {user} from {ip} on {ENTRYSYS}")
    agent.start()
    log.append("".join(failed("203.0.113.7") for _ in range(6)))
    wait_stored(agent, 1)
    agent.send(SIGKILL)
    agent.wait_end()
    time.sleep(5)  # it runs out
    agent.start()
    raised, resolved = wait_stored(agent, 2)
    host = raised["row"]["ENTRYSYS"]
    assert host and raised["text"] == f"5 failures of root from 203.0.113.7 on {host}"
    assert resolved["text"] == f"6 failures of root from 203.0.113.7 on {host}"
    assert agent.stop() == 0


def test_entries_from_while_the_agent_was_stopped_are_judged_as_if_read_in_time(agent):
    log = followed(agent)
    bruteforce(agent, resolve_after="60s")
    agent.start()
    now = time.time()
    for offset in (-3600, -1800):  # two bursts, of which the later ends the first episode
        times = (time.localtime(now + offset + second) for second in range(20))
        log.append("".join(failed("203.0.113.7", when=when) for when in times))
    events = wait_stored(agent, 4)
    assert [state for state, _, _ in states(events)] == ["raised", "resolved", "raised", "resolved"]
    assert [event["episode"]["count"] for event in events] == [5, 20, 5, 20]
    assert moment(events[2]["episode"]["first"]) - moment(events[0]["episode"]["first"]) == 1800
    assert agent.stop() == 0


@pytest.mark.parametrize("change", ("removed", "changed", "changed while stopped", "removed while stopped"))
def test_a_situation_that_ends_resolves_its_episodes_and_says_why(agent, change):
    log = followed(agent)
    bruteforce(agent, resolve_after="1h")
    agent.start()
    log.append("".join(failed("203.0.113.7") for _ in range(5)))
    wait_stored(agent, 1)
    is_stopped = "while stopped" in change
    if is_stopped:
        assert agent.stop() == 0
    agent.situations.clear()
    if "changed" in change:
        bruteforce(agent, resolve_after="2h")
    if is_stopped:
        agent.start()
    else:
        agent.reload()
    events = wait_stored(agent, 2)
    assert states(events)[1] == ("resolved", "203.0.113.7", 5)
    expected = {
        "removed": "the situation was stopped or removed",
        "changed": "the situation was changed",
        "changed while stopped": "the situation was changed while the agent was not running",
        "removed while stopped": "the situation was stopped or removed while the agent was not running",
    }
    assert events[1]["reason"] == expected[change]
    assert agent.stop() == 0


def test_a_cooldown_outlasts_a_restart(agent):
    log = followed(agent)
    agent.situation("cool", when=FAILED, group_by="ip", cooldown="1h")
    agent.situation("every", when=FAILED)
    agent.start()
    log.append(failed("10.0.0.1") + failed("10.0.0.2") + failed("10.0.0.1"))
    wait_stored(agent, 5)
    agent.send(SIGKILL)
    agent.wait_end()
    agent.start()
    log.append(failed("10.0.0.1") + failed("10.0.0.3"))
    events = wait_stored(agent, 8)
    assert agent.stop() == 0
    assert [event["group"]["ip"] for event in events if event["situation"] == "cool"] == [
        "10.0.0.1",
        "10.0.0.2",
        "10.0.0.3",
    ]


def test_different_values_are_counted(agent):
    log = followed(agent)
    agent.situation("many-users", when=FAILED, group_by=["ip"], distinct="user", frequency=">= 3", period="60s")
    agent.start()
    log.append("".join(failed("10.0.0.1", "root") for _ in range(9)))
    log.append("".join(failed("10.0.0.2", user) for user in ("root", "admin", "root", "guest")))
    (event,) = wait_stored(agent, 1)
    assert event["group"] == {"ip": "10.0.0.2"} and event["count"] == 3
    assert agent.stop() == 0


def test_hostile_groups_cost_little_and_stay_apart(agent):
    log = followed(agent)
    when = [FAILED[0].replace("ENTRYDESC", "field.message")]  # columns hold the first 256 bytes only
    agent.situation("any", when=when, group_by=["ip"], max_groups=100, frequency=">= 2", period="60s")
    agent.start()
    log.append("".join(failed(f"{number:x}") for number in range(50_000)))
    log.append(failed("\x1b[31m\x01\xff") * 2)
    (event,) = wait_stored(agent, 1)
    assert event["group"]["ip"].startswith("\x1b[31m\x01")
    log.append((failed("x" * 1500 + "1") + failed("x" * 1500 + "2")) * 2)
    events = wait_stored(agent, 3)
    assert len({event["group"]["ip"] for event in events}) == 3
    assert all(len(event["group"]["ip"]) <= 256 for event in events)
    assert agent.stop() == 0
    assert len(stored(agent)) == 3


@pytest.mark.slow
def test_killed_under_load_no_episode_is_lost_none_is_there_twice_and_counts_are_exact(agent):
    print(f"seed {SEED}")
    dice = random.Random(SEED)
    agent.sink = None
    log = followed(agent)
    bruteforce(agent, frequency=">= 3", period="1h", resolve_after="1h")
    bursts = Counter()
    hour = 0

    def write():
        """Episodes that end by the entries' times: the next entries of an address are two hours later."""
        nonlocal hour
        hour += 2
        lines = ""
        for ip in dice.sample(range(5), 3):
            count = dice.choice((1, 2, 3, 10, 300))
            when = time.localtime(begin + hour * 3600 + dice.randrange(60))
            lines += failed(f"10.0.0.{ip}", when=when) * count
            if count >= 3:
                bursts[f"10.0.0.{ip}", count] += 1
        log.append(lines)

    begin = time.time() - 300 * 24 * 3600
    for _ in range(KILLS):
        agent.start(wait=False)
        end = time.monotonic() + dice.uniform(0.2, 2)
        while time.monotonic() < end:
            if hour < 250 * 24:
                write()
            time.sleep(0.01)
        agent.send(SIGKILL)
        agent.wait_end()
    agent.start(wait=False)
    total = sum(bursts.values())

    def ended():
        return [event for event in stored(agent) if event["state"] == "resolved"]

    wait_until(lambda: len(ended()) >= total, lambda: f"{total} ends, have {len(ended())}; seed {SEED}", 120)
    assert agent.stop() == 0
    events = stored(agent)
    raised = [event["id"] for event in events if event["state"] == "raised"]
    assert sorted(event["episode"]["id"] for event in ended()) == raised, f"seed {SEED}"
    found = Counter((event["group"]["ip"], event["episode"]["count"]) for event in ended())
    assert found == bursts, f"seed {SEED}"


def test_the_client_and_the_metrics_show_episodes(agent):
    log = followed(agent)
    bruteforce(agent, resolve_after="1h")
    agent.listen = "127.0.0.1:0"
    agent.start()
    api = Api(agent)
    log.append("".join(failed("203.0.113.7") for _ in range(7)) + failed("10.0.0.1"))
    wait_stored(agent, 1)
    wait_until(lambda: api.request("GET", "/api/v1/episodes")[2]["episodes"][0]["count"] == 7, "the count")
    access = ["--url", f"http://127.0.0.1:{api.port}", "--token-file", str(agent.directory / "state/api-token")]
    status, out, _ = zrmctl.run([*access, "episodes", "--state", "open", "--group", "ip=203.0.113.7"])
    assert status == 0
    assert re.search(r"open +info +bruteforce .* 7 +ip=203.0.113.7$", out, re.M), out
    assert zrmctl.run([*access, "episodes", "--group", "ip=10.0.0.1"])[0] == 1
    (episode,) = json.loads(zrmctl.run([*access, "--json", "episodes"])[1])["episodes"]
    status, out, _ = zrmctl.run([*access, "episodes", "show", str(episode["id"])])
    assert status == 0 and re.search(r"entries +7$", out, re.M) and "ip=203.0.113.7" in out
    status, out, _ = zrmctl.run([*access, "events"])
    assert "ip=203.0.113.7 sshd[412]: Failed password" in out
    request = urllib.request.Request(
        f"http://127.0.0.1:{api.port}/metrics", headers={"Authorization": f"Bearer {api.token}"}
    )
    with urllib.request.urlopen(request, timeout=PATIENCE) as answer:
        metrics = answer.read().decode()
    assert "\nzrm_episodes_open 1\n" in metrics and "\nzrm_groups 2\n" in metrics
    assert agent.stop() == 0


def test_a_history_from_before_episodes_goes_on(agent):
    log = followed(agent)
    agent.situation("every")
    agent.start()
    log.append(failed("10.0.0.1"))
    wait_stored(agent, 1)
    assert agent.stop() == 0
    with sqlite3.connect(agent.directory / "state" / "history.db") as history:
        history.execute("DROP TABLE episodes")
        history.execute("DROP TABLE episode_logs")
        history.execute("DROP TABLE rhythms")
        history.execute("DROP TABLE expected_groups")
        history.execute("DROP TABLE watched_time")
        history.execute("PRAGMA user_version = 9")
    bruteforce(agent)
    agent.start()
    log.append("".join(failed("203.0.113.7") for _ in range(5)))
    wait_until(lambda: len(stored(agent)) == 8, lambda: f"eight events, have {stored(agent)}")
    assert agent.stop() == 0


@pytest.mark.parametrize(
    "keys, problem",
    [
        ({"resolve_after": "soon"}, "resolve_after: 'soon' is not a duration"),
        ({"resolve_after": "1m", "cooldown": "1m"}, "cooldown: has no effect with resolve_after"),
        ({"group_by": ["nobody"]}, "group_by: "),
        ({"group_by": ["ip", "ip"]}, "group_by: 'ip' is there twice"),
        ({"max_groups": 5}, "max_groups: has no effect without group_by"),
        ({"group_by": "ip", "max_groups": 0}, "max_groups: 0 is not a usable number of groups"),
        ({"then": "user=root"}, "then: has no effect without frequency and period"),
        ({"then": "root", "frequency": ">= 2", "period": "1m"}, "then: 'root' is not a name and a value"),
        ({"distinct": "user"}, "distinct: has no effect without frequency and period"),
    ],
)
def test_a_key_that_cannot_be_used_is_refused_with_its_line(agent, keys, problem):
    followed(agent)
    agent.situation("wrong", when=FAILED, **keys)
    agent.start(wait=False)
    assert agent.wait_end() == 2
    assert problem in agent.stderr.text()
    assert re.search(r"zrm.toml:\d+", agent.stderr.text())
