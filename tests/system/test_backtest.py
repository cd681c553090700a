"""What a situation would have made of the past."""

import time
from concurrent.futures import ThreadPoolExecutor
from signal import SIGHUP

from analysis import Analysis
from api import Api, stamp
from conftest import PATIENCE, syslog_line, wait_until


def test_a_backtest_equals_what_was_raised_live(agent):
    """The same lines, live and afterwards: raised by the same entries with the same counts."""
    agent.listen = "127.0.0.1:0"
    agent.agent_keys = {"max_rows": 10}  # does not limit a backtest
    log = agent.log(content=b"")
    situations = {
        "all": {"log": str(log)},
        "failed": {"log": str(log), "when": ["ENTRYDESC contains 'fail'"]},
        "many": {
            "log": str(log),
            "when": ["ENTRYDESC contains 'fail'"],
            "frequency": ">= 5",
            "period": "1h",
        },
        "few": {"log": str(log), "frequency": "<= 3", "period": "1h"},
        "burst": {"log": str(log), "frequency": "> 12", "period": "3s"},
        "never": {"log": str(log), "when": ["ENTRYSRC = 'cron'"]},
        "everywhere": {"when": ["ENTRYDESC contains 'fail'"], "frequency": ">= 7", "period": "1h"},
    }
    for name, fields in situations.items():
        agent.situations.append({"name": name, **fields})
    agent.start()
    api = Analysis(agent)
    begin = time.time()
    written = 0
    for n in range(3):
        # Right after a poll, so that every entry is read in the second in which it is written.
        log.append("".join(syslog_line(f"{'fail' if i % 3 else 'ok'} {n}.{i}") for i in range(10)))
        written += 10
        wait_until(lambda: api.counts("all")["offered"] == written, "the lines to be read")
    end = time.time() + 1
    live = {name: api.counts(name) for name in situations}
    assert live["many"]["raised"] == 18 - 4 and live["few"]["raised"] == 3
    agent.wait_events(sum(counts["raised"] for counts in live.values()))
    for name, fields in situations.items():
        tested = api.backtest(stamp(begin), stamp(end), situation=name)
        assert tested["entries"] == written
        assert tested["matched"] == live[name]["matched"]
        assert tested["truncated"] is False
        raised = [e["row"]["ENTRYTIME"] for e in agent.events() if e["situation"] == name]
        if name != "burst":  # a window of seconds depends on when lines are read
            assert tested["raised"] == live[name]["raised"], name
            assert tested["raised_at"] == raised
        again = api.backtest(stamp(begin), stamp(end), definition=fields)
        assert again == tested
    assert api.backtest(stamp(begin), stamp(end), situation="never")["decision"] == (
        "Would not have been raised: none of 30 entries meets every condition."
    )
    many = api.backtest(stamp(begin), stamp(end), situation="many")
    assert many["decision"].startswith("Would have been raised 14 times, first at 20")
    assert many["decision"].endswith(": 18 of 30 entries meet every condition.")
    assert agent.stop() == 0


def test_a_backtest_of_a_past_that_was_not_monitored(agent):
    """Windows of a hand-made log: entries every 20 seconds, six within the minute at its end."""
    agent.listen = "127.0.0.1:0"
    base = int(time.time()) - 7200
    offsets = [0, 20, 40, 60, 80, 1000, 1001, 1002, 1059, 1060, 1061]
    lines = "".join(syslog_line(f"at {o}", when=time.localtime(base + o)) for o in offsets)
    log = agent.log(content=lines.encode())
    agent.start()
    api = Analysis(agent)

    def run(frequency, period, begin=0, end=2000):
        return api.backtest(
            stamp(base + begin),
            stamp(base + end),
            definition={"log": str(log), "frequency": frequency, "period": period},
        )

    # At 1059: 1000, 1001, 1002 and 1059 lie within 60 s; at 1060 the entry at 1000 is just out.
    tested = run(">= 4", "60s")
    assert tested["raised_at"] == [stamp(base + o) for o in (1059, 1060, 1061)]
    assert (tested["entries"], tested["matched"], tested["raised"]) == (11, 11, 3)
    assert run(">= 4", "59s")["raised_at"] == []
    assert run(">= 3", "60s")["raised_at"] == [
        stamp(base + o) for o in (40, 60, 80, 1002, 1059, 1060, 1061)
    ]
    assert run(">= 5", "60s")["raised"] == 0
    assert run(">= 5", "60s")["decision"] == (
        "Would not have been raised: 11 of 11 entries meet every condition, but never >= 5 in 60 s."
    )
    assert run("<= 1", "60s")["raised_at"] == [stamp(base), stamp(base + 1000)]
    # Only what is between the two times counts.
    assert run(">= 3", "60s", begin=20, end=60)["raised_at"] == [stamp(base + 60)]
    assert run(">= 1", "60s", begin=100, end=900) == {
        "entries": 0,
        "matched": 0,
        "raised": 0,
        "truncated": False,
        "raised_at": [],
        "decision": "Would not have been raised: there are no entries between these times.",
        "complete": True,
        "reached": None,
        "reason": None,
    }
    assert agent.stop() == 0


def test_a_backtest_of_many_entries_names_the_first_thousand(agent):
    agent.listen = "127.0.0.1:0"
    now = int(time.time()) - 4000
    lines = "".join(syslog_line(f"n {n}", when=time.localtime(now + n // 2)) for n in range(3000))
    log = agent.log(content=lines.encode())
    agent.start()
    tested = Analysis(agent).backtest(stamp(now), stamp(now + 4000), definition={"log": str(log)})
    assert (tested["entries"], tested["raised"], tested["truncated"]) == (3000, 3000, False)
    assert tested["raised_at"] == [stamp(now + n // 2) for n in range(1000)]
    assert agent.stop() == 0


def test_a_refresh_does_not_wait_for_a_backtest(agent):
    agent.listen = "127.0.0.1:0"
    when = time.localtime(time.time() - 60)
    line = syslog_line("x" * 200, when=when).encode()
    log = agent.log(content=line * 200_000)
    agent.start()
    # Conditions that take long and all hold.
    slow = {"log": str(log), "when": ["ENTRYDESC matches 'x.*x$'"] * 100}
    begin = stamp(time.time() - 3600)
    end = stamp(time.time() + 3600)

    def run():
        while True:  # again when a short one has taken the room
            answer = Analysis(agent).request(
                "POST", "/api/v1/backtest", {"from": begin, "to": end, "definition": slow}
            )
            if "two backtests" not in answer[2].get("detail", ""):
                return answer

    with ThreadPoolExecutor() as pool:
        running = [pool.submit(run) for _ in range(2)]
        refused = []

        def both_run():
            status, _, answer = run_short(agent, begin, log)
            refused.append(answer)
            return status == 503 and "two backtests are already running" in answer["detail"]

        wait_until(both_run, lambda: f"two backtests: {refused[-1]}")
        begun = time.monotonic()
        agent.log("new.log")
        agent.send(SIGHUP)
        api = Api(agent)
        new = str(agent.directory / "new.log")
        wait_until(
            lambda: new in [one["log"] for one in api.request("GET", "/api/v1/logs")[2]["logs"]],
            "the new log",
        )
        taken = time.monotonic() - begun
        for answer in running:
            status, _, problem = answer.result(PATIENCE)
            assert status == 503, (status, problem, taken)
            assert problem["detail"] == (
                "the agent is re-reading its log configuration: try again"
            )
    # The same question when nothing else runs.
    status, _, answer = run_short(agent, begin, log)
    assert (status, answer["entries"]) == (200, 0)
    assert agent.stop() == 0


def run_short(agent, begin, log):
    definition = {"log": str(log), "when": ["ENTRYSRC = 'none'"]}
    return Analysis(agent).request(
        "POST", "/api/v1/backtest", {"from": begin, "to": begin, "definition": definition}
    )
