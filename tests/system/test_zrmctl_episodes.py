"""Episodes as an operator works with them: acknowledged with a name and a note, one line of `events` each."""

import json
import re
import subprocess
import urllib.request
from signal import SIGINT, SIGKILL

import pytest
import zrmctl
from api import Api
from conftest import PATIENCE, wait_until
from test_episodes import bruteforce, failed, followed, wait_stored

ADDRESS = "203.0.113.7"


@pytest.fixture
def ctl(agent):
    """Runs zrmctl on the agent, whichever port it has now."""
    agent.listen = "127.0.0.1:0"

    def run(*arguments, **variables):
        return zrmctl.run([*arguments, *access(agent)], **variables)

    return run


def access(agent):
    return ["--url", f"http://127.0.0.1:{Api(agent).port}", "--token-file", str(agent.directory / "state/api-token")]


def begun(agent, **keys):
    """An agent with one open episode."""
    log = followed(agent)
    bruteforce(agent, **{"resolve_after": "1h", **keys})
    agent.start()
    log.append("".join(failed(ADDRESS) for _ in range(7)))
    wait_stored(agent, 1)
    return log


def metrics(agent):
    api = Api(agent)
    request = urllib.request.Request(
        f"http://127.0.0.1:{api.port}/metrics", headers={"Authorization": f"Bearer {api.token}"}
    )
    with urllib.request.urlopen(request, timeout=PATIENCE) as answer:
        return answer.read().decode().splitlines()


def acknowledged(agent):
    (episode,) = Api(agent).request("GET", "/api/v1/episodes")[2]["episodes"]
    return episode["acknowledged"]


def test_an_episode_is_acknowledged_and_others_see_it(agent, ctl):
    begun(agent)
    assert "zrm_episodes_acknowledged 0" in metrics(agent)
    assert ctl("episodes", "--unacknowledged")[0] == 0
    status, out, err = ctl("ack", "1", "--note", "on \x1b[31mit", "--who", "anna")
    assert (status, out, err) == (0, "episode 1 is acknowledged by anna\n", "")
    assert (acknowledged(agent)["who"], acknowledged(agent)["note"]) == ("anna", "on \x1b[31mit")
    assert ctl("episodes", "--unacknowledged")[0] == 1
    shown = ctl("episodes")[1].splitlines()[1]
    assert "acknowledged" in shown and "  anna  " in shown
    shown = ctl("episodes", "show", "1")[1]
    assert re.search(r"^acknowledged +by anna, 20", shown, re.M) and "\\x1b[31mit" in shown and "\x1b" not in shown
    assert re.search(r"^ *1 .* acknowledged +\d ", ctl("events")[1], re.M)
    assert "zrm_episodes_acknowledged 1" in metrics(agent)
    status, _, err = ctl("ack", "1", SUDO_USER="ben")
    assert status == 1 and "episode 1 was acknowledged by anna at 20" in err and "withdraw that first" in err
    assert ctl("ack", "1", "--withdraw")[1] == "episode 1 is no longer acknowledged\n"
    assert acknowledged(agent) is None
    status, _, err = ctl("ack", "1", "--withdraw")
    assert status == 1 and "nobody has acknowledged episode 1" in err
    assert json.loads(ctl("ack", "1", "--json", SUDO_USER="ben")[1])["acknowledged"]["who"] == "ben"
    assert ctl("ack", "17")[0] == ctl("ack", "none")[0] == 1
    assert ctl("ack", "1", "--withdraw", "--note", "x")[0] == 2


def test_an_acknowledgement_survives_a_kill_a_restart_and_the_end_of_the_episode(agent, ctl):
    begun(agent, resolve_after="8s")
    assert ctl("ack", "1", "--who", "anna", "--note", "on it")[0] == 0
    agent.send(SIGKILL)  # what was answered is stored
    agent.wait_end()
    agent.start()
    assert acknowledged(agent)["who"] == "anna"
    assert agent.stop() == 0
    agent.start()
    assert acknowledged(agent)["note"] == "on it"
    raised, resolved = wait_stored(agent, 2)
    assert resolved["state"] == "resolved" and acknowledged(agent)["who"] == "anna"
    status, _, err = ctl("ack", "1", "--withdraw")
    assert status == 1 and "episode 1 is resolved" in err
    assert "zrm_episodes_acknowledged 0" in metrics(agent)


def test_events_are_listed_by_episode(agent, ctl):
    log = begun(agent, resolve_after="3s")
    agent.situation("plain", when=["ENTRYDESC contains 'plain'"])
    wait_stored(agent, 2)
    log.append("".join(failed("10.0.0.1") for _ in range(5)))
    raised = wait_stored(agent, 3)[2]
    lines = ctl("events")[1].splitlines()
    assert lines[0].split() == ["ID", "RAISED", "STATE", "COUNT", "SEVERITY", "SITUATION", "LOG", "ENTRY"]
    assert len(lines) == 3
    assert re.fullmatch(rf" 1 .* resolved +7 +info +bruteforce +{log} +ip={ADDRESS} sshd.*", lines[1]), lines
    assert re.match(rf" *{raised['id']} .* (open|resolved) +5 +info .* ip=10\.0\.0\.1", lines[2]), lines
    each = ctl("events", "--all")[1].splitlines()
    assert "STATE" not in each[0] and len(each) >= 4 and "resolved; 7 entries from" in each[2]
    assert [json.loads(line)["id"] for line in ctl("events", "--json")[1].splitlines()][:3] == [1, 2, 3]
    assert ctl("events", "--limit", "1")[1].count("\n") == 2
    only = ctl("events", "--limit", "2")[1].splitlines()
    assert [line.split()[0] for line in only[1:]] == ["1", str(raised["id"])], "of each episode one line"


def test_following_shows_when_an_episode_begins_and_when_it_ends(agent):
    agent.listen = "127.0.0.1:0"
    log = begun(agent, resolve_after="3s")
    wait_stored(agent, 2)
    command = [zrmctl.ZRMCTL, "events", "-f", *access(agent)]
    with subprocess.Popen(command, stdout=subprocess.PIPE, env=zrmctl.environment(), text=True) as client:
        try:
            begin, end = client.stdout.readline(), client.stdout.readline()
            assert re.match(rf"1 .* open \(5\) ip={ADDRESS}", begin), begin
            assert re.match(rf"1 .* resolved \(7\) ip={ADDRESS}", end), end
            log.append("".join(failed("10.0.0.1") for _ in range(6)))
            begin, end = client.stdout.readline(), client.stdout.readline()
            assert re.match(r"3 .* open \(5\) ip=10\.0\.0\.1 sshd\[412\]: Failed password", begin), begin
            assert re.match(r"3 .* resolved \(6\) ip=10\.0\.0\.1", end), end
        finally:
            client.send_signal(SIGINT)
            assert client.wait(PATIENCE) == 0


def test_metrics_count_silences_and_what_they_hold_back(agent, ctl):
    log = begun(agent)
    assert {"zrm_silences_active 0", "zrm_silenced_events_total 0"} <= set(metrics(agent))
    assert ctl("silence", "add", "--situation", "brute*", "--for", "1h", "--why", "x")[0] == 0
    log.append("".join(failed("10.0.0.1") for _ in range(5)))
    wait_stored(agent, 2)
    wait_until(lambda: "zrm_silenced_events_total 1" in metrics(agent), "the silenced event")
    assert "zrm_silences_active 1" in metrics(agent)
