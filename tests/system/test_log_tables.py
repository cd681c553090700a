"""Logs of [[log]] tables: paths and globs in the host configuration."""

import pytest
from api import Api
from conftest import Log, descriptions, syslog_line, wait_until
from test_metrics import metrics


def file(agent, name, content=""):
    log = Log(agent.directory / name)
    log.path.parent.mkdir(exist_ok=True)
    log.path.write_text(content)
    return log


def follow(agent, path, **keys):
    """Follows from the beginning, so that no test waits for the agent to have opened a file."""
    agent.follow(path, start="beginning", **keys)


def test_one_file_configures_everything(agent):
    log = file(agent, "app.log")
    agent.agent_keys["log_config"] = None
    follow(agent, log)
    agent.situation(log=log)
    agent.start()
    log.append(syslog_line("followed"))
    assert descriptions(agent.wait_events(1)) == ["followed"]
    assert agent.stop() == 0


@pytest.mark.slow
def test_a_file_that_appears_under_a_glob_is_followed(agent):
    file(agent, "logs/old.log", syslog_line("old"))
    agent.follow(agent.directory / "logs" / "*.log", exclude="secret*")
    agent.situation()
    agent.start()
    file(agent, "logs/secret.log", syslog_line("secret"))
    file(agent, "logs/new.log", syslog_line("in the new file"))
    assert descriptions(agent.wait_events(1)) == ["in the new file"]
    assert agent.stop() == 0
    assert len(agent.events()) == 1


@pytest.mark.slow
def test_without_any_file_the_agent_waits_for_one(agent):
    agent.agent_keys["log_config"] = None
    follow(agent, agent.directory / "later" / "*.log")
    agent.situation()
    agent.start()
    agent.wait_trace("no log to monitor yet")
    file(agent, "later/app.log", syslog_line("at last"))
    assert descriptions(agent.wait_events(1)) == ["at last"]
    assert agent.stop() == 0


@pytest.mark.slow
def test_tables_come_and_go_while_the_agent_runs(agent):
    kept = agent.log("kept.log")
    first = file(agent, "first.log")
    second = file(agent, "second.log")
    follow(agent, first)
    agent.situation()
    agent.start()
    agent.tables.clear()
    follow(agent, second)
    agent.reload()
    agent.wait_trace(f"Deleting log object for file {first}.")
    second.append(syslog_line("second"))
    kept.append(syslog_line("kept"))
    assert sorted(descriptions(agent.wait_events(2))) == ["kept", "second"]
    assert not agent.trace(f"Deleting log object for file {kept}.")
    assert not agent.trace("takes effect at the next start")


def test_a_file_of_both_lists_belongs_to_the_log_configuration(agent):
    log = agent.log("app.log")
    follow(agent, agent.directory / "*.log")
    agent.situation()
    agent.start()
    agent.wait_trace(f"The log configuration names {log}, too; its line applies.")
    log.append(syslog_line("once"))
    assert descriptions(agent.wait_events(1)) == ["once"]
    assert agent.stop() == 0
    assert len(agent.events()) == 1


def test_the_api_and_the_client_show_the_tables(agent):
    log = file(agent, "app.log")
    file(agent, "app.log.1")
    follow(agent, agent.directory / "app.*")
    agent.listen = "127.0.0.1:0"
    agent.start()
    answer = Api(agent).request("GET", "/api/v1/logs")[2]
    assert [one["log"] for one in answer["logs"]] == [str(log)]
    (table,) = answer["tables"]
    assert table["files"] == [str(log)]
    assert table["passed_over"] == [
        {"file": f"{log}.1", "reason": f"It is an older generation of {log}."}
    ]


@pytest.mark.slow
def test_a_log_that_is_named_twice_has_a_warning(agent):
    log = agent.log("app.log")
    follow(agent, log)
    agent.listen = "127.0.0.1:0"
    agent.start()
    agent.wait_trace("and a [[log]] table both name this file")
    (only,) = Api(agent).request("GET", "/api/v1/logs")[2]["logs"]
    assert [warning["kind"] for warning in only["ledger"]["warnings"]] == ["named_twice"]


def test_every_form_of_syslog_lines_is_read(agent):
    log = file(agent, "syslog")
    agent.environment["TZ"] = "Europe/Berlin"
    follow(agent, log, timezone="UTC")
    agent.situation(log=log)
    agent.start()
    log.append(
        "Nov 20 06:03:09 web1 sshd[412]: traditional\n"
        "2026-11-20T07:03:09.123456+01:00 web1 sshd[412]: iso\n"
        "<34>1 2026-11-20T06:03:09Z web1 sshd 412 - - rfc5424\n"
    )
    rows = [event["row"] for event in agent.wait_events(3)]
    assert [row["ENTRYDESC"] for row in rows] == ["traditional", "iso", "rfc5424"]
    assert {row["ENTRYTIME"][1:] for row in rows} == {"261120070309000"}
    assert {row["ENTRYSRC"] for row in rows} == {"sshd[412]"}
    assert [(row["ENTRYTYPE"], row["ENTRYCLASS"]) for row in rows] == [("", ""), ("", ""), ("crit", "auth")]


@pytest.mark.slow
def test_a_rotation_is_followed_and_shown(agent):
    log = file(agent, "app.log")
    follow(agent, log, rotate_wait="1s")
    agent.situation(log=log)
    agent.listen = "127.0.0.1:0"
    agent.start()
    api = Api(agent)

    def following(state="reading"):
        _, _, answer = api.request("GET", f"/api/v1/logs?log={log}")
        now = answer["logs"][0]["ledger"]["follow"] if answer.get("logs") else None
        return now if now and now["state"] == state else None

    wait_until(following, "the log to be read")
    log.append(syslog_line("before"))
    agent.wait_events(1)
    log.path.rename(agent.directory / "app.log.1")
    log.append(syslog_line("after"))
    assert descriptions(agent.wait_events(2)) == ["before", "after"]
    size = log.path.stat().st_size
    shown = wait_until(lambda: (now := following()) and now["position"] == size and now, "the position")
    assert (shown["generation"], shown["generations"], shown["behind"]) == (str(log), 2, 0)
    assert (shown["lost_bytes"], shown["lost"], shown["recovered"]) == (0, [], [])
    text = metrics(api)
    assert f'zrm_log_generations_total{{log="{log}"}} 2' in text
    assert f'zrm_log_position_bytes{{log="{log}"}} {size}' in text
