"""What situations add to their events: texts made for each event, runbooks, labels."""

import pytest
from api import Api
from conftest import PATIENCE, Log, syslog_line
from situations import SITUATIONS, Situations, path
from zrmctl import run

FAILED = "ENTRYDESC matches 'Failed password for (invalid user )?(?P<user>.*) from (?P<ip>[0-9a-f.:]+)'"


def login(user, ip, second=9, host="alpha"):
    return f"Nov 20 07:03:{second:02d} {host} sshd[7]: Failed password for {user} from {ip} port 22 ssh2\n"


@pytest.fixture
def log(agent):
    agent.environment["TZ"] = "UTC0"
    agent.listen = "127.0.0.1:0"
    log = Log(agent.directory / "auth.log")
    log.path.write_text("")
    agent.follow(log, start="beginning")
    return log


def zrmctl(agent, *arguments):
    url = agent.wait_trace("HTTP at http://")[0].split("HTTP at ")[1].split()[0].rstrip(",.;")
    status, output, error = run([*arguments, "--config", str(agent.zrm_toml), "--url", url])
    assert status == 0, error
    return output


def test_the_text_of_an_event_has_what_its_entry_says(agent, log):
    agent.situation(
        "ssh",
        when=[FAILED],
        text="{user} from {ip} on {ENTRYSYS} (pid {field.pid}) in {log}: {situation} {{{count}}}",
        runbook="https://wiki.example.org/ssh#failed",
        labels={"team": "web", "tier": "2"},
    )
    agent.start()
    log.append(login("root", "10.0.0.7") + login("invalid user eve", "2001:db8::1"))
    first, second = agent.wait_events(2)
    assert first["text"] == f"root from 10.0.0.7 on alpha (pid 7) in {log}: ssh {{1}}"
    assert second["text"].startswith("eve from 2001:db8::1 on alpha")
    assert first["runbook"] == "https://wiki.example.org/ssh#failed"
    assert first["labels"] == {"team": "web", "tier": "2"}
    # What the sink has is what is kept, shown and searched.
    status, _, kept = Api(agent).request("GET", f"/api/v1/events/{first['id']}")
    assert status == 200 and kept == first
    assert "root from 10.0.0.7 on alpha" in zrmctl(agent, "events")
    assert "2001:db8::1 on alpha" in zrmctl(agent, "events", "--text", "eve from 2001")
    shown = zrmctl(agent, "situations", "show", "ssh")
    assert "https://wiki.example.org/ssh#failed" in shown and "team=web" in shown


def test_counts_and_times_are_those_of_the_frequency(agent, log):
    agent.situation(
        "ssh", when=[FAILED], frequency=">= 3", period="60s", text="{count} until {last}, as {first}"
    )
    agent.start()
    log.append("".join(login("root", "10.0.0.7", second) for second in range(4)))
    texts = [event["text"].split()[0] for event in agent.wait_events(2)]
    assert texts == ["3", "4"]
    last = agent.events()[-1]
    time = last["text"].split()[2].rstrip(",")
    assert time.endswith("-11-20T07:03:03.000Z") and last["text"].endswith(f"as {time}")


def test_logs_of_the_log_configuration_have_texts_too(agent):
    log = agent.log()
    agent.situation("any", log=log, text="{ENTRYSRC}: {ENTRYDESC}")
    agent.start()
    log.append(syslog_line("disk full", source="kernel"))
    (event,) = agent.wait_events(1)
    assert event["text"].endswith(": disk full")


def test_a_hostile_entry_makes_a_short_text_on_one_line(agent, log):
    agent.situation("any", when=["field.message contains 'x'"], text="<{field.message}{field.message}>")
    agent.start()
    log.append(syslog_line("\x1b[2J\xff\t" + "x" * 60_000))
    (event,) = agent.wait_events(1)
    assert len(event["text"].encode()) <= 4096 + 3
    assert not any(ord(c) < 32 for c in event["text"])


def test_an_unknown_name_is_an_error_with_those_that_are_known(agent, log):
    agent.situation("ssh", when=[FAILED], text="{count} from {adress}")
    agent.start(wait=False)
    assert agent.process.wait(PATIENCE) == 2
    agent.stderr.finish()
    text = agent.stderr.text()
    assert "situation.text: {adress}: 'adress' is not a name of this situation; the names are user, ip, " in text


def test_a_text_from_before_there_were_names_is_kept_with_a_warning(agent, log):
    agent.situation("any", text="see {wiki}/any")
    agent.start()
    log.append(login("root", "10.0.0.7"))
    (event,) = agent.wait_events(1)
    assert "text" not in event
    assert "situation 'any': the text is kept as it is written" in agent.stderr.text()
    status, _, error = run(["check", "--host", str(agent.zrm_toml)])
    assert status == 0 and "{wiki}: 'wiki' is not a name of this situation" in error


def test_texts_runbooks_and_labels_through_the_api(agent, log):
    agent.start()
    situations = Situations(agent)
    more = {"runbook": "https://wiki.example.org/", "labels": {"team": "db"}}
    made = situations.add("ssh", when=[FAILED], text="from {ip}", **more)
    assert {key: made[key] for key in more} == more
    for field, value in (("text", "see {wiki}"), ("runbook", "javascript:alert(1)"), ("labels", {"log": "x"})):
        body = {"name": "other", "when": [FAILED], field: value}
        status, answer = situations.send("POST", SITUATIONS, body)
        assert status == 400 and answer["field"] == field, answer
    zrmctl(agent, "situations", "set", "ssh", "--label", "team=web", "--label", "a=b=c", "--text", "at {ENTRYSYS}")
    assert situations.get("ssh")["labels"] == {"team": "web", "a": "b=c"}
    log.append(login("root", "10.0.0.7"))
    (event,) = agent.wait_events(1)
    assert event["text"] == "at alpha" and event["labels"] == {"team": "web", "a": "b=c"}
    # They are kept.
    assert agent.stop() == 0
    agent.start()
    situations = Situations(agent)
    assert situations.get("ssh")["runbook"] == more["runbook"]
    status, answer = situations.send("PUT", path("ssh"), {"when": [], "labels": None})
    assert status == 200 and answer["labels"] == {} and answer["runbook"] is None
