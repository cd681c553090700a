"""zrmctl from outside: following events, exit statuses, trusted certificates."""

import json
import re
import subprocess
from signal import SIGINT, SIGKILL, SIGTERM

import pytest

from api import Api
from conftest import PATIENCE, Lines, syslog_line, wait_until
from receiver import free_port
from test_http_tls import make_certificate
from zrmctl import ZRMCTL, environment, run


class Follower:
    """zrmctl events -f --json."""

    def __init__(self, agent):
        self.process = subprocess.Popen(
            [ZRMCTL, "events", "-f", "--json", "--config", str(agent.zrm_toml)],
            stdin=subprocess.DEVNULL,
            stdout=subprocess.PIPE,
            stderr=subprocess.PIPE,
            env=environment(),
        )
        self.output, self.errors = Lines(self.process.stdout), Lines(self.process.stderr)

    def ids(self):
        return [json.loads(line)["id"] for line in self.output()]

    def wait(self, count):
        wait_until(lambda: len(self.output()) >= count, lambda: f"{count}: {self.errors.text()}")

    def end(self, number):
        self.process.send_signal(number)
        status = self.process.wait(PATIENCE)
        self.output.finish()
        self.errors.finish()
        return status


@pytest.fixture
def followed(agent):
    log = agent.log()
    agent.situation(log=log)
    agent.listen = f"127.0.0.1:{free_port()}"
    agent.start()
    followers = []

    def follow():
        followers.append(Follower(agent))
        return followers[-1]

    yield agent, log, follow
    for follower in followers:
        if follower.process.poll() is None:
            follower.end(SIGKILL)


def test_following_continues_across_restarts_of_the_agent(followed):
    agent, log, follow = followed
    log.append(syslog_line("before"))
    agent.wait_events(1)
    follower = follow()
    follower.wait(1)
    for number, ending in enumerate((SIGTERM, SIGKILL), 1):
        log.append(syslog_line("one") + syslog_line("two"))
        follower.wait(3 * number)
        agent.send(ending)
        agent.wait_end()
        wait_until(lambda: len(follower.errors()) == 2 * number - 1, "the loss to be reported")
        agent.start()
        log.append(syslog_line("meanwhile"))
        follower.wait(3 * number + 1)
        wait_until(lambda: len(follower.errors()) == 2 * number, "the connection to be reported")
    assert follower.ids() == list(range(1, 8))
    assert follower.end(SIGINT) == 0
    assert follower.ids() == list(range(1, 8))
    lost = "zrmctl: the connection to the agent was lost; reconnecting"
    assert follower.errors.text().splitlines() == [lost, "zrmctl: reconnected"] * 2


def test_ctrl_c_ends_following_with_status_0(followed):
    agent, log, follow = followed
    log.append(syslog_line("before"))
    agent.wait_events(1)
    connected, waiting = follow(), follow()
    connected.wait(1)
    waiting.wait(1)
    assert connected.end(SIGINT) == 0 and connected.errors.text() == ""
    assert agent.stop() == 0
    wait_until(lambda: waiting.errors(), "the loss to be reported")
    assert waiting.end(SIGTERM) == 0  # also while no agent is there


def test_exit_statuses_show_what_failed(followed, tmp_path):
    agent, log, _ = followed
    config = ("--config", str(agent.zrm_toml))
    assert run(["logs", *config])[0] == 0
    assert run(["logs", str(log) + "x", *config])[0] == 1
    assert run(["logs", "--config", str(tmp_path / "none.toml")])[0] == 2
    (tmp_path / "broken.toml").write_text("[http\n")
    assert run(["logs", "--config", str(tmp_path / "broken.toml")])[0] == 2
    code, output, errors = run(["logs", *config], ZRM_TOKEN="wrong")
    assert (code, output) == (4, "")
    assert errors.endswith(
        "does not accept the token from ZRM_TOKEN: give the right one with --token-file or --config\n"
    )
    assert run(["logs", *config, "--token-file", str(tmp_path / "none")])[0] == 4
    assert agent.stop() == 0
    code, output, errors = run(["logs", *config])
    assert (code, output) == (3, "")
    assert errors.startswith(f"zrmctl: cannot reach the agent at http://{agent.listen}: is zrmagent")


def test_one_wrong_key_does_not_keep_zrmctl_from_the_agent(followed, tmp_path):
    agent, _, _ = followed
    wrong = tmp_path / "wrong.toml"
    wrong.write_text("nonsense = 1\n" + agent.zrm_toml.read_text() + "\n[[situation]]\nname = 5\n")
    assert run(["status", "--config", str(wrong)])[0] == 0
    assert run(["check", "--host", str(wrong)])[0] == 1


def test_check_ends_with_status_1_when_something_is_wrong(agent):
    log = agent.log()
    agent.listen = "127.0.0.1:0"
    agent.start()
    api = Api(agent)
    access = ["--url", f"http://127.0.0.1:{api.port}", "--token-file", str(api.token_file)]
    wait_until(lambda: run(["logs", "--check", *access])[0] == 0, "the log to run")
    assert run(["logs", str(log), "--check", *access])[0] == 0
    assert run(["status", "--check", *access])[0] == 0
    log.path.rename(log.path.with_name("elsewhere"))
    assert run(["logs", *access])[0] == 0
    assert run(["logs", "--check", *access])[0] == 1
    code, output, _ = run(["logs", str(log), "--check", "--json", *access])
    assert code == 1 and json.loads(output)["log"] == str(log)


def test_check_names_the_sink_that_fails(agent):
    log = agent.log()
    agent.listen = "127.0.0.1:0"
    agent.situation(log=log)
    agent.sink = str(log.path.parent / "no" / "such" / "file")
    agent.start()
    api = Api(agent)
    access = ["--url", f"http://127.0.0.1:{api.port}", "--token-file", str(api.token_file)]
    log.append(syslog_line("one"))
    wait_until(lambda: run(["status", "--check", *access])[0] == 1, "the sink to fail")
    assert run(["status", *access])[0] == 0
    code, _, errors = run(["status", "--check", *access])
    assert code == 1 and re.search("the sink .* fails: .*No such file", errors), errors


def test_the_certificate_of_the_configuration_is_trusted(agent):
    certificate, key = make_certificate(agent.directory)
    agent.log()
    agent.listen = f"0.0.0.0:{free_port()}"
    agent.http_keys = {"certificate": certificate, "key": key}
    agent.start()
    agent.wait_trace("HTTP at https://")  # the token exists by now
    code, output, errors = run(["logs", "--config", str(agent.zrm_toml)])
    assert (code, errors) == (0, "") and "app.log" in output
    token = agent.directory / "state" / "api-token"
    url = "https://" + agent.listen.replace("0.0.0.0", "127.0.0.1")
    code, _, errors = run(["logs", "--url", url, "--token-file", str(token)])
    assert code == 3 and "has no certificate that this machine trusts" in errors
    assert errors.endswith(", with --ca-file\n")
    by_hand = ["logs", "--url", url, "--token-file", str(token)]
    code, output, errors = run([*by_hand, "--ca-file", str(certificate)])
    assert (code, errors) == (0, "") and "app.log" in output
    assert run(by_hand, ZRM_CA_FILE=str(certificate))[0] == 0
    other, _ = make_certificate(agent.directory, "other")
    assert run([*by_hand, "--ca-file", str(other)], ZRM_CA_FILE=str(certificate))[0] == 3
    # The requested name must be one of the certificate's.
    code, _, errors = run([*by_hand[:2], url.replace("127.0.0.1", "127.0.0.2"), *by_hand[3:],
                           "--ca-file", str(certificate)])  # fmt: skip
    assert code == 3 and "trusts for this address" in errors


def test_a_private_authority_is_trusted_when_it_is_named(agent):
    directory = agent.directory
    openssl = lambda *words: subprocess.run(
        ["openssl", *map(str, words)], check=True, capture_output=True
    )
    request = ("-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:prime256v1", "-nodes")
    openssl("req", "-x509", *request, "-subj", "/CN=House", "-days", "2",
            "-keyout", directory / "ca.key", "-out", directory / "ca.pem")  # fmt: skip
    openssl("req", *request, "-subj", "/CN=agent", "-keyout", directory / "a.key",
            "-out", directory / "a.csr")  # fmt: skip
    (directory / "names").write_text("subjectAltName=IP:127.0.0.1\n")
    openssl("x509", "-req", "-in", directory / "a.csr", "-CA", directory / "ca.pem", "-CAkey",
            directory / "ca.key", "-CAcreateserial", "-days", "2", "-extfile", directory / "names",
            "-out", directory / "a.pem")  # fmt: skip
    agent.log()
    agent.listen = f"0.0.0.0:{free_port()}"
    agent.http_keys = {"certificate": directory / "a.pem", "key": directory / "a.key"}
    agent.start()
    agent.wait_trace("HTTP at https://")  # the token exists by now
    url = "https://" + agent.listen.replace("0.0.0.0", "127.0.0.1")
    arguments = ["logs", "--url", url, "--token-file", str(directory / "state" / "api-token")]
    assert run(arguments)[0] == 3
    code, output, errors = run([*arguments, "--ca-file", str(directory / "ca.pem")])
    assert (code, errors) == (0, "") and "app.log" in output
    assert agent.stop() == 0
