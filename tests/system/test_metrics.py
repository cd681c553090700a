"""/metrics as Prometheus sees it: linted by promtool, scraped by the real program."""

import http.client
import json
import re
import shutil
import socket
import subprocess
import time

import pytest

from api import Api
from conftest import syslog_line, wait_until


def metrics(api):
    connection = http.client.HTTPConnection("127.0.0.1", api.port)
    connection.request("GET", "/metrics", headers={"Authorization": f"Bearer {api.token}"})
    response = connection.getresponse()
    assert response.status == 200
    assert response.getheader("Content-Type") == "text/plain; version=0.0.4; charset=utf-8"
    text = response.read().decode()
    connection.close()
    return text


def value(text, name, **labels):
    """The value of the one sample of this name that has these labels."""
    found = []
    for line in text.splitlines():
        match = re.fullmatch(rf"{name}(?:\{{(.*)\}})? (\S+)", line)
        if match is None:
            continue
        has = dict(re.findall(r'(\w+)="((?:[^"\\]|\\.)*)"', match.group(1) or ""))
        if all(has.get(key) == wanted for key, wanted in labels.items()):
            found.append(float(match.group(2)))
    assert len(found) == 1, (name, labels, found)
    return found[0]


@pytest.fixture
def serving(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.situation(name='odd "name"\\', log=log, when=["ENTRYDESC contains 'never'"])
    agent.configure(f"{agent.directory}/gone.log ;N", append=True)
    agent.listen = "127.0.0.1:0"
    agent.start()
    return log, Api(agent)


def test_metrics_count_what_happens(agent, serving):
    log, api = serving
    before = log.path.stat().st_size
    for number in range(3):
        log.append(syslog_line(f"line {number}"))
    agent.wait_events(3)
    api.request("GET", "/nothing")
    api.request("GET", "/api/v1/status")
    wait_until(lambda: value(metrics(api), "zrm_log_entries_total", log=str(log)) == 3, "3 entries")
    text = metrics(api)
    assert value(text, "zrm_log_lines_total", log=str(log)) == 3
    assert value(text, "zrm_log_read_bytes_total", log=str(log)) == log.path.stat().st_size - before
    for count in ("format_errors", "truncations", "skipped_bytes", "restarts"):
        assert value(text, f"zrm_log_{count}_total", log=str(log)) == 0, count
    assert abs(value(text, "zrm_log_last_entry_timestamp_seconds", log=str(log)) - time.time()) < 120
    assert value(text, "zrm_log_size_bytes", log=str(log)) == log.path.stat().st_size
    assert value(text, "zrm_log_running", log=str(log)) == 1
    assert value(text, "zrm_log_state", log=str(log), state="Running") == 1
    assert (value(text, "zrm_logs"), value(text, "zrm_logs_unmonitored")) == (1, 1)
    gone = f"{agent.directory}/gone.log"
    assert value(text, "zrm_log_running", log=gone) == 0
    assert value(text, "zrm_log_state", log=gone, state="Not monitored") == 1
    for count, expected in (("offered", 3), ("matched", 3), ("discarded", 0), ("raised", 3)):
        assert value(text, f"zrm_situation_{count}_total", situation="every-entry") == expected
    assert value(text, "zrm_situation_matched_total", situation='odd \\"name\\"\\\\') == 0
    assert abs(value(text, "zrm_situation_last_raised_timestamp_seconds") - time.time()) < 120
    assert value(text, "zrm_queue_capacity_events") > 0
    assert value(text, "zrm_queue_waits_total") == 0
    assert value(text, "zrm_sink_up", type="jsonl") == 1
    assert value(text, "zrm_sink_delivered_events_total", type="jsonl") == 3
    assert value(text, "zrm_sink_failures_total", type="jsonl") == 0
    assert value(text, "zrm_http_requests_total", route="none", status="404", method="GET") == 1
    assert value(text, "zrm_http_requests_total", route="/api/v1/status", status="200") == 1
    assert value(text, "zrm_http_request_duration_seconds_count", route="/api/v1/status") == 1
    assert value(text, "zrm_http_connections") >= 1
    assert value(text, "zrm_http_refused_connections_total") == 0
    assert value(text, "process_cpu_seconds_total") > 0
    assert value(text, "process_resident_memory_bytes") > 1e6
    assert value(text, "process_open_fds") > 3
    assert abs(value(text, "process_start_time_seconds") - time.time()) < 600
    assert value(text, "zrm_build_info") == 1


def test_counts_and_sizes_have_more_than_32_bits(agent):
    """Sizes come from the system, not from the table's rows."""
    log = agent.log()
    with open(log.path, "ab") as stream:
        stream.truncate(5 * 2**32 + 17)  # a hole
    agent.listen = "127.0.0.1:0"
    agent.start()
    assert value(metrics(Api(agent)), "zrm_log_size_bytes", log=str(log)) == 5 * 2**32 + 17


def test_odd_names_of_logs_are_labels(agent):
    log = agent.log(name='quo"te\\back{}=,\xe9.log')
    agent.listen = "127.0.0.1:0"
    agent.start()
    text = metrics(Api(agent))
    name = str(log).replace("\\", "\\\\").replace('"', '\\"')
    assert f'zrm_log_lines_total{{log="{name}"}} 0' in text.splitlines()
    linted = subprocess.run(
        ["promtool", "check", "metrics"], input=text, capture_output=True, text=True, timeout=60
    )
    assert (linted.returncode, linted.stdout + linted.stderr) == (0, "")


def test_metrics_show_that_a_configuration_cannot_be_loaded(agent, serving):
    _, api = serving
    successful = lambda: value(metrics(api), "zrm_config_last_reload_successful")
    assert successful() == 1
    usable = agent.zrm_toml.read_text(encoding="utf-8")
    agent.zrm_toml.write_text("nonsense = 1\n" + usable, encoding="utf-8")
    wait_until(lambda: successful() == 0, "the configuration to be refused")
    agent.zrm_toml.write_text(usable + "# mended\n", encoding="utf-8")
    wait_until(lambda: successful() == 1, "the configuration to be taken over")


def test_metrics_show_that_most_situations_were_removed(agent):
    log = agent.log()
    agent.listen = "127.0.0.1:0"
    agent.start()
    api = Api(agent)
    whole = agent.zrm_toml.read_text(encoding="utf-8")
    lost = lambda: value(metrics(api), "zrm_config_last_reload_removed_most_situations")
    running = lambda: metrics(api).count("zrm_situation_running{")

    def change(names, outcome):
        situations = (f"\n[[situation]]\nname = '{name}'\nlog = '{log}'\n" for name in names)
        agent.zrm_toml.write_text(whole + "".join(situations), encoding="utf-8")
        wait_until(lambda: running() == len(names), f"the situations {names}")
        assert lost() == outcome

    assert lost() == 0
    change("abc", 0)
    change("ab", 0)
    change("b", 0)  # one of two is not more than half
    change("wxyz", 1)
    change("w", 1)
    agent.zrm_toml.write_text("")
    agent.wait_trace("is empty; write the configuration into it again")
    assert (running(), lost()) == (1, 1)
    change("wv", 0)


def test_metrics_need_the_token(serving):
    _, api = serving
    status, _, _ = api.request("GET", "/metrics", headers={"Authorization": None})
    assert status == 401


def test_promtool_accepts_the_metrics(agent, serving):
    log, api = serving
    log.append(syslog_line("one"))
    agent.wait_events(1)
    metrics(api)  # so that there are requests to count
    linted = subprocess.run(
        ["promtool", "check", "metrics"], input=metrics(api), capture_output=True, text=True, timeout=60
    )
    assert (linted.returncode, linted.stdout + linted.stderr) == (0, "")


def free_port():
    with socket.socket() as listener:
        listener.bind(("127.0.0.1", 0))
        return listener.getsockname()[1]


def asked(port, query):
    connection = http.client.HTTPConnection("127.0.0.1", port, timeout=30)
    try:
        connection.request("GET", f"/api/v1/query?query={query}")
        return json.load(connection.getresponse())["data"]["result"]
    except (OSError, ValueError):
        return []
    finally:
        connection.close()


def test_prometheus_scrapes_the_agent(agent, serving, tmp_path):
    log, api = serving
    for number in range(4):
        log.append(syslog_line(f"line {number}"))
    agent.wait_events(4)
    config = tmp_path / "prometheus.yml"
    config.write_text(
        f"""
global: {{scrape_interval: 1s}}
scrape_configs:
  - job_name: zrmagent
    authorization: {{credentials_file: {api.token_file}}}
    static_configs: [{{targets: ["127.0.0.1:{api.port}"]}}]
"""
    )
    subprocess.run(["promtool", "check", "config", str(config)], check=True, capture_output=True)
    port = free_port()
    with open(tmp_path / "prometheus.log", "wb") as output:
        prometheus = subprocess.Popen(
            [
                shutil.which("prometheus"),
                f"--config.file={config}",
                f"--storage.tsdb.path={tmp_path / 'data'}",
                f"--web.listen-address=127.0.0.1:{port}",
            ],
            stdin=subprocess.DEVNULL,
            stdout=output,
            stderr=output,
        )
    try:
        (up,) = wait_until(lambda: asked(port, "up==1"), "a scrape that succeeded")
        assert up["metric"]["job"] == "zrmagent"
        (raised,) = asked(port, 'zrm_situation_raised_total{situation="every-entry"}')
        assert raised["value"][1] == "4"
        (entries,) = asked(port, "zrm_log_entries_total")
        assert entries["metric"]["log"] == str(log)
    finally:
        prometheus.terminate()
        prometheus.wait(60)
