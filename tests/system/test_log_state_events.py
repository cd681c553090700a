"""Events of logs that fall silent or lose their file, for tables with `quiet`."""

import time
from signal import SIGKILL

import pytest
from api import Api
from conftest import syslog_line, wait_until
from test_episodes import followed, stored, wait_stored
from test_ledger import ledger_of


def test_a_quiet_log_is_an_episode_that_outlasts_a_kill(agent):
    log = followed(agent, quiet="10s")
    agent.listen = "127.0.0.1:0"
    agent.start()
    (raised,) = wait_stored(agent, 1)
    assert (raised["situation"], raised["severity"], raised["state"]) == ("log-quiet", "warning", "raised")
    assert raised["log"] == str(log) and "The log has had no entries for" in raised["text"]
    wait_until(lambda: [event["id"] for event in agent.events()] == [raised["id"]], "the sink's event")
    agent.send(SIGKILL)
    agent.wait_end()
    agent.start()
    api = Api(agent)
    time.sleep(6)  # the states have been judged
    (episode,) = api.request("GET", "/api/v1/episodes?state=open")[2]["episodes"]
    assert episode["id"] == raised["id"] and len(stored(agent)) == 1
    body = {"match": {"situation": "log-*"}, "until": "1d", "who": "anna", "why": "known"}
    log.append(syslog_line("an entry"))
    _, resolved = wait_stored(agent, 2)
    assert resolved["reason"] == "an entry has come" and resolved["episode"]["id"] == raised["id"]
    status, _, answer = api.request("POST", "/api/v1/silences", body)
    assert status == 201, answer
    silenced = wait_stored(agent, 3)[2]  # it is quiet again
    assert silenced["situation"] == "log-quiet" and silenced["silenced"] == answer["id"]
    assert agent.stop() == 0
    assert [event["id"] for event in agent.events()] == [raised["id"], resolved["id"]]


@pytest.mark.slow
@pytest.mark.parametrize("is_there", (True, False))
def test_a_log_without_a_file_is_dead_until_there_is_one(agent, is_there):
    log = followed(agent, quiet="1h")
    if is_there:
        agent.listen = "127.0.0.1:0"
        agent.start()
        agent.api = Api(agent)
        wait_until(lambda: ledger_of(agent, log)["follow"]["state"] == "reading", "the file to be read")
        log.path.unlink()
    else:
        log.path.unlink()
        agent.start()
    (raised,) = wait_stored(agent, 1)
    assert raised["situation"] == "log-dead" and "no file that can be read" in raised["text"]
    log.path.write_text(syslog_line("again"))
    _, resolved = wait_stored(agent, 2)
    assert resolved["reason"] == "there is a file that can be read"
    assert agent.stop() == 0


@pytest.mark.parametrize("change", ("no quiet", "no log"))
def test_a_log_that_is_no_longer_watched_for_it_is_not_quiet(agent, change):
    followed(agent, quiet="10s")
    agent.start()
    wait_stored(agent, 1)
    if change == "no log":
        agent.tables.clear()
    else:
        del agent.tables[0]["quiet"]
    agent.reload()
    _, resolved = wait_stored(agent, 2)
    assert resolved["reason"] == "the log is no longer watched for it"
    assert agent.stop() == 0
