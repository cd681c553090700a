"""Reports, backtests and explanations say how far they reached and why they ended."""

import subprocess
import time

import pytest
from api import Api, stamp
from conftest import syslog_line
from zrmctl import ZRMCTL

FORMAT = ' ;N ;U ;A , "%d-%d-%dT%d:%d:%d %[^\\n]" , year month day hour minute second description'
ELEVEN = "eleven lines in a row do not fit the log's format, and a report ends there"


def text_line(when, text):
    return time.strftime("%Y-%m-%dT%H:%M:%S ", time.localtime(when)) + text + "\n"


class Questions(Api):
    def ask(self, what, **body):
        status, _, answer = self.request("POST", f"/api/v1/{what}", body)
        assert status == 200, answer
        return answer


def reach(answer):
    return answer["complete"], answer["reached"], answer["reason"]


@pytest.fixture
def serving(agent):
    """Four hits, the newest of them after something that ends a report."""
    agent.listen = "127.0.0.1:0"
    agent.now = int(time.time()) - 600
    agent.hits = [text_line(agent.now + second, "hit") for second in range(4)]
    agent.text = agent.log("app.log", "".join(agent.hits).encode(), FORMAT)
    agent.start()
    agent.wait_open(agent.text.path)
    agent.api = Questions(agent)
    agent.window = {"from": stamp(agent.now - 60), "to": stamp(agent.now + 60)}
    return agent


def zrmctl(agent, *arguments):
    return subprocess.run(
        [ZRMCTL, "--url", f"http://127.0.0.1:{agent.api.port}", "--token-file", agent.api.token_file, *arguments],
        stdout=subprocess.PIPE, stderr=subprocess.PIPE, encoding="utf-8", timeout=60, check=False,
    )


def ask_all(agent):
    log = str(agent.text)
    report = agent.api.ask("reports", log=log, **agent.window)
    backtest = agent.api.ask("backtest", definition={"log": log, "when": ["ENTRYDESC = 'hit'"]}, **agent.window)
    return report, backtest


def test_a_log_that_was_read_whole_is_complete(serving):
    whole = (True, stamp(serving.now), None)
    report, backtest = ask_all(serving)
    assert (report["count"], reach(report)) == (4, whole)
    assert (backtest["raised"], reach(backtest)) == (4, whole)
    definition = {"log": str(serving.text), "when": ["ENTRYDESC = 'hit'"]}
    assert reach(serving.api.ask("explain", definition=definition, last=1)) == whole
    status, _, sample = serving.api.sample("RMMONLOG")
    assert (status, reach(sample)) == (200, (True, None, None))
    assert zrmctl(serving, "report", str(serving.text)).stderr == ""


@pytest.mark.parametrize(
    "obstacle, reason",
    [
        ("nonsense\n" * 11, ELEVEN),
        (text_line(0, "x" * 2048), "a line is too long, and a report ends there"),
    ],
    ids=["eleven lines that do not fit", "a line of 2048 bytes"],
)
def test_a_report_says_what_ended_it(serving, obstacle, reason):
    serving.text.path.write_text("".join(serving.hits[:3]) + obstacle + serving.hits[3])
    reached = stamp(serving.now + 3)
    report, backtest = ask_all(serving)
    assert (report["count"], report["truncated"]) == (1, False)
    assert reach(report) == (False, reached, reason)
    assert (backtest["entries"], backtest["raised"], backtest["truncated"]) == (1, 1, False)
    assert reach(backtest) == (False, reached, f"{serving.text}: {reason}")
    assert backtest["decision"].endswith(f"; older entries were not examined: {serving.text}: {reason}.")
    told = zrmctl(serving, "report", str(serving.text))
    assert told.returncode == 0
    shown = time.strftime("%Y-%m-%d %H:%M:%S", time.localtime(serving.now + 3))
    assert told.stderr == f"zrmctl: not everything was read: {reason}; read back to {shown}\n"


def test_a_syslog_report_ends_at_a_line_without_a_time(agent):
    agent.listen = "127.0.0.1:0"
    now = time.time() - 60
    line = syslog_line("one", when=time.localtime(now))
    log = agent.log("sys.log", (line + "no time\n" + line).encode())
    agent.start()
    answer = Questions(agent).ask("reports", log=str(log), **{"from": stamp(now - 60), "to": stamp(now + 60)})
    assert answer["count"] == 1
    assert reach(answer) == (False, stamp(now), "an entry has no time, and a report ends there")


def test_a_log_that_is_gone_is_not_an_empty_one(serving):
    serving.text.path.unlink()
    report, backtest = ask_all(serving)
    assert reach(report) == (False, None, "the log cannot be read")
    assert reach(backtest) == (False, None, f"{serving.text}: the log cannot be read")


def test_the_row_limit_is_a_reason_too(agent):
    agent.listen = "127.0.0.1:0"
    agent.agent_keys["max_rows"] = 20
    now = int(time.time()) - 600
    log = agent.log("sys.log", "".join(syslog_line(f"n {n}", when=time.localtime(now + n)) for n in range(30)).encode())
    agent.start()
    answer = Questions(agent).ask("reports", log=str(log), **{"from": stamp(now), "to": stamp(now + 60)})
    assert (answer["count"], answer["truncated"]) == (20, True)
    assert reach(answer) == (False, stamp(now + 10), "the report has read as many entries as it may")
