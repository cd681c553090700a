"""Situations: thresholds, every operator, changes of their file."""

import time

from conftest import descriptions, syslog_line, wait_until


def lines(count, text="hit"):
    return "".join(syslog_line(f"{text} {i}") for i in range(count))


def test_at_least_five_entries_within_a_minute(agent):
    log = agent.log()
    agent.situation(
        "many", log=log, when=["ENTRYDESC starts 'hit'"], frequency=">= 5", period="60s"
    )
    agent.situation("all", log=log)
    agent.start()
    log.append(lines(4) + syslog_line("miss"))
    agent.wait_events(5)
    assert [e["situation"] for e in agent.events()] == ["all"] * 5
    log.append(lines(3, "hit again"))
    events = agent.wait_events(5 + 3 + 3)
    many = [e for e in events if e["situation"] == "many"]
    assert descriptions(many) == [f"hit again {i}" for i in range(3)]
    # The row has the observed frequency.
    assert [e["row"]["FREQTHRESH"] for e in many] == [5, 6, 7]
    assert {e["row"]["PERIODTHRS"] for e in many} == {60}


def test_at_most_two_entries_within_an_hour(agent):
    log = agent.log()
    agent.situation("few", log=log, frequency="<= 2", period="1h")
    agent.start()
    log.append(lines(5) + syslog_line("the last"))
    assert descriptions(agent.wait_events(2)) == ["hit 0", "hit 1"]
    assert agent.stop() == 0
    assert [e["row"]["FREQTHRESH"] for e in agent.events()] == [1, 2]


def test_old_entries_do_not_count(agent):
    log = agent.log()
    agent.situation("many", log=log, frequency=">= 2", period="60s")
    agent.situation("all", log=log)
    agent.start()
    old = time.localtime(time.time() - 600)
    log.append(syslog_line("old", when=old) * 3 + lines(1) + syslog_line("second"))
    events = agent.wait_events(6)
    assert agent.stop() == 0
    assert descriptions(e for e in agent.events() if e["situation"] == "many") == ["second"]
    assert len(events) == 6


def test_every_operator(agent):
    log = agent.log()
    conditions = {
        "equal": "ENTRYSRC = 'cron'",
        "unequal": "ENTRYSRC != 'cron'",
        "contains": "ENTRYDESC contains 'eta'",
        "starts": "ENTRYDESC starts 'al'",
        "matches": "ENTRYDESC matches '^(alpha|gamma)$'",
        "in": "ENTRYDESC in ['beta', 'gamma']",
        "greater": "ENTRYDESC > 'beta'",
        "at-least": "ENTRYDESC >= 'beta'",
        "less": "ENTRYDESC < 'beta'",
        "at-most": "ENTRYDESC <= 'beta'",
    }
    for name, condition in conditions.items():
        agent.situation(name, log=log, when=[condition])
    agent.start()
    log.append(
        syslog_line("alpha", source="cron")
        + syslog_line("beta", source="su")
        + syslog_line("gamma", source="cron")
    )
    expected = {
        "equal": ["alpha", "gamma"],
        "unequal": ["beta"],
        "contains": ["beta"],
        "starts": ["alpha"],
        "matches": ["alpha", "gamma"],
        "in": ["beta", "gamma"],
        "greater": ["gamma"],
        "at-least": ["beta", "gamma"],
        "less": ["alpha"],
        "at-most": ["alpha", "beta"],
    }
    agent.wait_events(sum(map(len, expected.values())))
    assert agent.stop() == 0
    found = {name: [] for name in conditions}
    for event in agent.events():
        found[event["situation"]].append(event["row"]["ENTRYDESC"])
    assert found == expected


def test_a_changed_situation_file_is_loaded_and_a_broken_one_is_not(agent):
    log = agent.log()
    agent.situation("first", log=log)
    agent.start()
    log.append(syslog_line("one"))
    agent.wait_events(1)

    good = agent.zrm_toml.read_text()
    agent.zrm_toml.write_text(good + "\n[[situation]]\nname = 5\n")
    agent.wait_trace("was not loaded; the situations and the logs stay as they were")
    log.append(syslog_line("two"))
    assert [e["situation"] for e in agent.wait_events(2)] == ["first"] * 2

    agent.zrm_toml.write_text(good.replace('"first"', '"second"'))

    def renamed():
        log.append(syslog_line("probe"))
        time.sleep(0.3)
        return any(event["situation"] == "second" for event in agent.events())

    wait_until(renamed, "an event of the new situation")
    assert agent.stop() == 0
    names = [event["situation"] for event in agent.events()]
    assert names == sorted(names)  # the new one from then on, and only it


def test_event_numbers_and_times_rise(agent):
    log = agent.log()
    agent.situation("a", log=log)
    agent.situation("b", log=log)
    agent.start()
    log.append(lines(50))
    events = agent.wait_events(100)
    assert [e["id"] for e in events] == list(range(1, 101))
    raised = [e["raised"] for e in events]
    assert raised == sorted(raised)
