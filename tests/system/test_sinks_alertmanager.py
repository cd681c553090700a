"""Events become alerts of a real Alertmanager."""

import json
import subprocess
import urllib.request

import pytest

from conftest import PATIENCE, syslog_line, wait_until
from receiver import free_port


class Alertmanager:
    """A prometheus-alertmanager on its own, which notifies nobody."""

    def __init__(self, directory):
        self.directory = directory
        self.port = free_port()
        self.url = f"http://127.0.0.1:{self.port}"
        self.process = None
        (directory / "alertmanager.yml").write_text(
            "route:\n  receiver: nobody\nreceivers:\n  - name: nobody\n"
        )

    def start(self):
        self.process = subprocess.Popen(
            [
                "prometheus-alertmanager",
                f"--config.file={self.directory}/alertmanager.yml",
                f"--storage.path={self.directory}/data",
                f"--web.listen-address=127.0.0.1:{self.port}",
                "--cluster.listen-address=",
            ],
            stdin=subprocess.DEVNULL,
            stdout=subprocess.DEVNULL,
            stderr=open(self.directory / "stderr", "ab"),
        )
        wait_until(self.is_ready, lambda: (self.directory / "stderr").read_text())

    def is_ready(self):
        try:
            with urllib.request.urlopen(self.url + "/-/ready", timeout=PATIENCE) as answer:
                return answer.status == 200
        except OSError:
            return False

    def alerts(self):
        with urllib.request.urlopen(self.url + "/api/v2/alerts", timeout=PATIENCE) as answer:
            return json.load(answer)

    def stop(self):
        if self.process is not None:
            self.process.terminate()
            self.process.wait(PATIENCE)


@pytest.fixture
def alertmanager(tmp_path):
    server = Alertmanager(tmp_path)
    yield server
    server.stop()


def wait_for_alerts(server, agent, condition):
    return wait_until(
        lambda: (alerts := server.alerts()) is not None and condition(alerts) and alerts or None,
        lambda: f"the alerts; there are {server.alerts()}: {agent.stderr.text()[-2000:]}",
    )


def test_an_event_is_an_alert_until_its_time_is_over(agent, alertmanager):
    log = agent.log()
    agent.situation("disk-full", log=log, severity="critical", text="A disk has no room left")
    agent.more_sinks.append(
        {
            "type": "alertmanager",
            "url": alertmanager.url,
            "resolve_after": "5s",
            "labels": {"team": "ops"},
            "generator_url": "https://web1.example.com/console",
        }
    )
    alertmanager.start()
    agent.start()
    log.append(syslog_line('no space on "/var" \u00e4', source="kernel"))
    (alert,) = wait_for_alerts(alertmanager, agent, lambda alerts: len(alerts) == 1)
    (event,) = agent.wait_events(1)
    assert alert["labels"] == {
        "alertname": "disk-full",
        "severity": "critical",
        "log": str(log),
        "node": event["row"]["ORIGINNODE"].rpartition(":")[0],
        "team": "ops",
    }
    assert alert["annotations"] == {
        "summary": f"A disk has no room left in {log}",
        "description": 'no space on "/var" \u00e4',
        "source": "kernel",
        "event": str(event["id"]),
    }
    assert alert["startsAt"] == event["raised"]
    assert alert["generatorURL"] == "https://web1.example.com/console"
    assert alert["status"]["state"] == "active"
    wait_until(lambda: alertmanager.alerts() == [], "the end of the alert")
    assert agent.stop() == 0


def test_a_repeated_event_extends_its_alert(agent, alertmanager):
    log = agent.log()
    agent.situation("flapping", log=log, severity="minor")
    agent.more_sinks.append(
        {"type": "alertmanager", "url": alertmanager.url, "resolve_after": "1h"}
    )
    alertmanager.start()
    agent.start()
    log.append(syslog_line("down 1"))
    (first,) = wait_for_alerts(alertmanager, agent, lambda alerts: len(alerts) == 1)
    log.append(syslog_line("down 2") + syslog_line("down 3"))
    (last,) = wait_for_alerts(
        alertmanager, agent, lambda alerts: alerts[0]["annotations"]["description"] == "down 3"
    )
    events = agent.wait_events(3)
    assert last["fingerprint"] == first["fingerprint"]
    assert last["startsAt"] == events[0]["raised"]
    assert last["endsAt"] > first["endsAt"]
    assert agent.stop() == 0


def test_alerts_wait_for_an_alertmanager_that_is_down(agent, alertmanager):
    log = agent.log()
    for severity in ("minor", "major"):
        agent.situation(f"is-{severity}", log=log, severity=severity)
    agent.more_sinks += [
        {"type": "alertmanager", "url": alertmanager.url, "name": "alerts"},
        {
            "type": "alertmanager",
            "url": alertmanager.url + "/",
            "name": "short",
            "resolve_after": "1s",
            "labels": {"kind": "over by then"},
        },
    ]
    agent.start()
    log.append(syslog_line("while nobody listens"))
    agent.wait_trace("Error delivering events to alerts: no connection")
    alertmanager.start()
    alerts = wait_for_alerts(alertmanager, agent, lambda alerts: len(alerts) == 2)
    assert {alert["labels"]["alertname"] for alert in alerts} == {"is-minor", "is-major"}
    agent.wait_trace("Sink short takes events again.")  # expired alerts are accepted, too
    assert agent.stop() == 0
