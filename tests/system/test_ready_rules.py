"""Ready situations: switched on by `use`, zrmctl rules, the API."""

import json
import re
from pathlib import Path

import pytest
from api import Api
from conftest import PATIENCE, Log, wait_until
from zrmctl import run

ROOT = Path(__file__).resolve().parents[2]
RULES = ROOT / "rules"
NAMED = {
    "ssh-bruteforce", "ssh-bruteforce-success", "ssh-password-login", "sudo-failure", "account-created", "kernel-oom", "disk-error",
    "filesystem-error", "segfault", "systemd-unit-failed", "systemd-restart-loop", "certificate-expiry",
    "cron-failure", "http-5xx", "http-scan", "postgresql-deadlock", "postgresql-connections", "failover",
}  # fmt: skip
DIRECTORY = ["--directory", str(RULES)]


def failed(second, ip="203.0.113.7"):
    return f"Nov 20 07:03:{second:02d} web1 sshd[7]: Failed password for root from {ip} port 22 ssh2\n"


@pytest.fixture
def log(agent):
    agent.environment["TZ"] = "UTC0"
    agent.formats = ROOT / "formats"
    agent.rules = RULES
    agent.agent_keys["log_config"] = None
    log = Log(agent.directory / "auth.log")
    log.path.write_text("")
    agent.follow(log, start="beginning")
    return log


def test_a_rule_is_a_situation(agent, log):
    agent.use = ["ssh-bruteforce", "sudo-failure"]
    agent.listen = "127.0.0.1:0"
    agent.start()
    log.append("".join(failed(second) for second in range(5)))
    event, end = agent.wait_events(2)  # the entries are old: the episode is over
    assert (event["situation"], event["severity"], event["state"]) == ("ssh-bruteforce", "major", "raised")
    assert event["group"] == end["group"] == {"ip": "203.0.113.7"}
    assert event["text"] == "5 failed SSH logins from 203.0.113.7 on web1, the last as root"
    assert end["state"] == "resolved" and end["episode"]["id"] == event["id"]
    token = ["--url", f"http://127.0.0.1:{Api(agent).port}", "--token-file", str(agent.directory / "state/api-token")]
    shown = run([*token, "events"])[1].splitlines()
    assert len(shown) == 2 and shown[1].endswith(f"  {event['text']}") and "  resolved  " in shown[1]
    shown = run([*token, "events", "--all"])[1].splitlines()
    assert shown[1].endswith(f"  {event['text']}") and f"  Resolved: {end['text']}" in shown[2]


def test_a_table_changes_keys_of_a_rule(agent, log):
    agent.use = [
        {"rule": "ssh-bruteforce", "log": str(log), "frequency": ">= 2", "severity": "critical", "labels": {"a": "b"}},
        {"rule": "ssh-bruteforce", "name": "slow", "log": str(log), "frequency": ">= 3", "period": "1h"},
    ]
    agent.start()
    log.append(failed(1) + failed(2) + failed(3))
    raised = [event for event in agent.wait_events(4) if event["state"] == "raised"]
    assert sorted((event["situation"], event["severity"]) for event in raised) == [
        ("slow", "major"),
        ("ssh-bruteforce", "critical"),
    ]
    (labelled,) = [event for event in raised if event["situation"] == "ssh-bruteforce"]
    assert labelled["labels"] == {"a": "b"}


def test_rules_for_formats_read_their_fields(agent, log):
    web = Log(agent.directory / "access.log")
    web.path.write_text("")
    agent.follow(web, format="nginx-access", start="beginning")
    agent.use = [{"rule": "http-5xx", "log": str(web), "frequency": ">= 2"}]
    agent.start()
    line = '203.0.113.7 - - [19/Nov/2026:10:00:00 +0100] "GET /cart HTTP/1.1" {} 153 "-" "curl/8.5"\n'
    web.append(line.format(200) + line.format(503) + line.format(404) + line.format(502))
    event = agent.wait_events(2)[0]
    assert event["text"].startswith("2 answers with a status from 500, the last 502 for GET /cart")


def test_a_login_after_a_brute_force_is_reported_also_across_a_restart(agent, log):
    agent.use = ["ssh-bruteforce-success"]
    agent.listen = "127.0.0.1:0"
    agent.start()
    accepted = "Nov 20 07:0{}:05 web1 sshd[8]: Accepted {} for anna from {} port 22 ssh2\n"
    log.append("".join(failed(second) for second in range(4)) + failed(4, "2001:db8::7"))
    log.append(accepted.format(4, "password", "203.0.113.7"))  # after four
    log.append("".join(failed(second, "198.51.100.4") for second in range(5, 10)))
    api = Api(agent)

    def matched():
        (situation,) = api.request("GET", "/api/v1/situations")[2]["situations"]
        return situation["counts"]["matched"] == 11

    wait_until(matched, "the entries to be judged")
    assert agent.stop() == 0 and agent.events() == []
    agent.start()  # what was counted is counted again
    log.append(accepted.format(5, "publickey", "2001:db8::7"))
    log.append(accepted.format(6, "keyboard-interactive/pam", "198.51.100.4"))
    (event,) = agent.wait_events(1)
    assert (event["severity"], event["count"]) == ("critical", 5)
    assert event["text"] == "SSH login as anna from 198.51.100.4 on web1 after 5 failed ones"
    log.append(accepted.format(7, "password", "198.51.100.4"))  # it cools down
    log.append(failed(1, "198.51.100.4"))
    assert agent.stop() == 0 and len(agent.events()) == 1


def test_use_is_reloaded(agent, log):
    agent.start()
    agent.use = [{"rule": "ssh-password-login", "log": str(log)}]
    agent.reload()
    line = "Nov 20 07:03:{:02d} web1 sshd[7]: Accepted password for root from 203.0.113.7 port 22 ssh2\n"

    def raised():
        log.append(line.format(1))
        return agent.events()

    (event, *_) = wait_until(raised, "the rule to be in force")
    assert event["situation"] == "ssh-password-login"


def test_a_changed_rule_is_reloaded_alone(agent, log):
    agent.rules = agent.directory / "rules"
    agent.rules.mkdir()
    rule = agent.rules / "ours.toml"
    text = "description = 'Ours'\n[situation]\nseverity = '{}'\nwhen = \"ENTRYDESC contains '{}'\"\n"
    rule.write_text(text.format("minor", "Failed"))
    agent.use = ["ours"]
    agent.start()
    log.append(failed(1))
    assert [event["severity"] for event in agent.wait_events(1)] == ["minor"]
    rule.write_text(text.format("major", "password"))

    def raised():
        log.append(failed(2))
        return [event for event in agent.events() if event["severity"] == "major"]

    wait_until(raised, "the changed rule to be in force")
    rule.write_text("[situation]\nwhen = 'nonsense'\n")
    wait_until(lambda: "was not loaded; the situations and the logs stay" in agent.stderr.text(), "the refusal")
    before = len(agent.events())
    log.append(failed(3))
    assert agent.wait_events(before + 1)[-1]["severity"] == "major"
    rule.write_text(text.format("critical", "password"))
    wait_until(lambda: [log.append(failed(4))] and agent.events()[-1]["severity"] == "critical", "the fixed rule")


def start_refused(agent):
    agent.start(wait=False)
    assert agent.process.wait(PATIENCE) == 2
    agent.stderr.finish()
    return agent.stderr.text()


def test_an_unknown_rule_is_an_error_with_names_like_it(agent, log):
    agent.use = ["ssh-brutforce"]
    text = start_refused(agent)
    assert re.search(r"zrm\.toml:\d+: use: 'ssh-brutforce' is not a ready situation; write a name such as 'ssh-bruteforce'", text)


def test_a_wrong_key_is_an_error_at_the_table(agent, log):
    agent.use = [{"rule": "ssh-bruteforce", "frequency": "often"}]
    text = start_refused(agent)
    assert re.search(r"zrm\.toml:\d+: use\.frequency: 'often' is not a frequency", text)
    agent.use = [{"rule": "ssh-bruteforce", "colour": "red"}]
    assert re.search(r"zrm\.toml:\d+: use\.colour: unknown key", start_refused(agent))


def test_the_name_of_a_situation_is_taken_once(agent, log):
    agent.situation("ssh-bruteforce", log=log)
    agent.use = ["ssh-bruteforce"]
    assert "'ssh-bruteforce' is the name of the situation at line" in start_refused(agent)


def test_a_rule_without_its_log_is_a_warning_with_the_cure(agent, log):
    agent.use = ["kernel-oom"]
    agent.start()
    warning = "situation 'kernel-oom': no [[log]] table names /var/log/kern.log or /var/log/syslog"
    assert warning in agent.stderr.text()
    status, _, error = run(["check", "--host", str(agent.zrm_toml)])
    assert status == 0 and warning in error and "name the log that has such entries" in error


def test_the_api_lists_the_rules_and_who_uses_them(agent, log):
    agent.listen = "127.0.0.1:0"
    agent.use = [{"rule": "ssh-bruteforce", "name": "mine", "log": str(log)}]
    agent.start()
    status, _, answer = Api(agent).request("GET", "/api/v1/rules")
    assert status == 200
    rules = {rule["name"]: rule for rule in answer["rules"]}
    assert NAMED <= set(rules)
    assert rules["ssh-bruteforce"]["used_by"] == ["mine"]
    assert rules["ssh-bruteforce"]["definition"]["frequency"] == ">= 5"
    assert rules["kernel-oom"]["used_by"] == [] and rules["kernel-oom"]["problem"] is None


def test_list_has_every_rule_with_its_description():
    status, output, _ = run(["rules", "list", "--json", *DIRECTORY])
    assert status == 0
    rules = {one["name"]: one for one in json.loads(output)["rules"]}
    assert NAMED <= set(rules)
    assert all(one["description"] and one["logs"] and not one["problem"] for one in rules.values())
    status, output, _ = run(["rules", *DIRECTORY])
    assert status == 0 and "ssh-bruteforce" in output


def test_show_prints_the_file():
    status, output, _ = run(["rules", "show", "kernel-oom", *DIRECTORY])
    assert status == 0
    assert output == f"# {RULES}/kernel-oom.toml\n" + (RULES / "kernel-oom.toml").read_text(encoding="utf-8")
    status, _, error = run(["rules", "show", "kernel-om", *DIRECTORY])
    assert status == 1 and "write a name such as 'kernel-oom'" in error


@pytest.fixture
def configuration(tmp_path):
    file = tmp_path / "zrm.toml"
    file.write_text(f'[formats]\ndirectory = "{ROOT}/formats"\n[rules]\ndirectory = "{RULES}"\n')
    return ["--config", str(file)]


def test_every_rule_passes_its_samples(configuration):
    status, output, _ = run(["rules", "test", *configuration])
    assert status == 0, output
    assert output.endswith(" 0 rules failed\n")


def test_test_says_what_is_wrong_with_a_rule(tmp_path, configuration):
    file = tmp_path / "mine.toml"
    sample = "Nov 19 10:00:00 web1 app[1]: {}"
    file.write_text(
        "[situation]\nwhen = \"ENTRYDESC contains 'full'\"\n"
        f"[[sample]]\nentry = '{sample.format('empty')}'\n"
        f"[[sample]]\nentry = '{sample.format('full')}'\nmiss = true\n"
    )
    status, output, _ = run(["rules", "test", str(file), *configuration])
    assert status == 1
    assert f"{file}:4: the entry does not meet the conditions" in output
    assert f"{file}:6: the entry meets the conditions, but must not" in output
    file.write_text("[situation]\nname = 'x'\nwhen = \"GONE = 'x'\"\n")
    status, output, _ = run(["rules", "test", str(file), *configuration])
    assert status == 1 and "situation.name: belongs to the configuration that uses the rule" in output
    assert "'GONE' is not a column" in output
