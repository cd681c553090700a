"""zrmctl silence: what an operator types and reads."""

import getpass
import json

import pytest
import zrmctl
from api import Api
from conftest import syslog_line, wait_until


@pytest.fixture
def ctl(agent):
    agent.listen = "127.0.0.1:0"
    agent.watched = agent.log()
    agent.situation("disk", log=agent.watched)
    agent.start()
    api = Api(agent)

    def run(*arguments, **variables):
        where = ["--url", f"http://127.0.0.1:{api.port}", "--token-file", api.token_file]
        return zrmctl.run([*arguments, *where], **variables)

    return run


def test_silences_are_created_listed_shown_and_expired(ctl, agent):
    assert ctl("silence") == (1, "", "zrmctl: no silence is active\n")
    status, out, err = ctl(
        "silence", "add", "--situation", "di*", "--for", "2h", "--why", "new \x1b[31mdisk", "--who", "anna"
    )
    assert (status, err) == (0, "") and out.startswith("silence 1 lasts until 20")
    agent.watched.append(syslog_line("full") * 3)
    wait_until(lambda: json.loads(ctl("silence", "show", "1", "--json")[1])["events"] == 3, "the events")
    status, out, _ = ctl("silence", "list")
    assert status == 0 and "situation=di*" in out and "anna" in out
    assert "\x1b" not in out
    assert out.splitlines()[1].split()[:2] == ["1", "active"]
    out = ctl("events")[1]
    assert out.count("[silence 1] app[1]: full") == 3
    assert ctl("events", "--silenced", "false")[0] == 1
    assert len(ctl("events", "--silenced", "true", "--json")[1].splitlines()) == 3
    status, out, _ = ctl("silence", "expire", "1", SUDO_USER="ben")
    assert (status, out) == (0, "silence 1 has expired; it held back 3 events\n")
    status, _, err = ctl("silence", "expire", "1")
    assert status == 1 and "when ben expired it" in err
    assert ctl("silence", "list")[0] == 1
    assert "expired" in ctl("silence", "list", "--expired")[1]
    shown = ctl("silence", "show", "1")[1]
    assert "expired by  ben" in shown and "last event  20" in shown


def test_a_silence_may_name_everything_that_an_event_has(ctl):
    status, out, _ = ctl(
        "silence", "add", "--log", "/var/log/*", "--severity", "m*", "--node", "web1",
        "--group", "ip=10.0.0.*", "--group", "user=a=b", "--until", "2099-01-01T00:00:00Z", "--why", "x", "--json",
    )  # fmt: skip
    silence = json.loads(out)
    assert status == 0 and silence["match"] == {
        "log": "/var/log/*",
        "severity": "m*",
        "node": "web1",
        "group": {"ip": "10.0.0.*", "user": "a=b"},
    }
    assert silence["until"] == "2099-01-01T00:00:00.000Z"
    assert silence["who"] == getpass.getuser()
    out = ctl("silence")[1]
    assert "log=/var/log/* severity=m* node=web1 group.ip=10.0.0.* group.user=a=b" in out
    assert ctl("silence", "add", "--all", "--for", "1m", "--why", "x")[0] == 0
    assert "every event" in ctl("silence")[1]


@pytest.mark.parametrize(
    "arguments, status, text",
    [
        (["--for", "2h", "--why", "x"], 2, "--all silences every event"),
        (["--situation", "a", "--why", "x"], 2, "say how long: --for 2h, or --until with a time"),
        (["--situation", "a", "--for", "1h", "--until", "18:00", "--why", "x"], 2, "excludes"),
        (["--situation", "a", "--for", "1h"], 2, "--why is required"),
        (["--group", "ip", "--for", "1h", "--why", "x"], 2, "write NAME=PATTERN in place of 'ip'"),
        (["--situation", "a", "--until", "yesterday", "--why", "x"], 1, "is in the past"),
        (["--situation", "a", "--for", "soon", "--why", "x"], 1, "neither a duration nor a time"),
        (["--situation", "a", "--all", "--for", "1h", "--why", "x"], 1, "every event is silenced"),
    ],
)
def test_what_is_wrong_is_said(ctl, arguments, status, text):
    done, out, err = ctl("silence", "add", *arguments)
    assert (done, out) == (status, "") and text in err, err
