"""Thresholds on logs of [[log]] tables: over restarts, clock changes and wrong clocks."""

import gzip
import random
import sqlite3
import time
from datetime import datetime, timedelta, timezone
from signal import SIGKILL
from zoneinfo import ZoneInfo

import pytest
from analysis import Analysis
from conftest import Log, descriptions, syslog_line, wait_until


def followed(agent, content="", **keys):
    log = Log(agent.directory / "app.log")
    log.path.write_text(content)
    agent.agent_keys["log_config"] = None
    agent.sink = agent.directory / "events"
    agent.follow(log, start="beginning", rotate_wait="1s", **keys)
    return log


def events_by_id(agent):
    """The events of the sink, which gets some again after the agent was killed."""
    return {event["id"]: event for event in agent.events()}


def wait_stored(agent, log):
    """Waits until all that is in the log is behind the position in the history."""
    def stored():
        try:
            with sqlite3.connect(f"file:{agent.directory}/state/history.db?mode=ro", uri=True) as history:
                rows = history.execute("SELECT offset FROM log_positions").fetchall()
        except sqlite3.OperationalError:
            return False
        return rows == [(log.path.stat().st_size,)]

    wait_until(stored, "the position to be stored")


@pytest.mark.parametrize("rotation", ("none", "rename", "compress", "copy and truncate"))
def test_a_situation_counts_on_after_the_agent_was_killed(agent, rotation):
    log = followed(agent)
    agent.situation("five", when=["ENTRYDESC starts 'fail'"], frequency=">= 5", period="1h")
    fields = ["field.tag = 'app'", "field.message starts 'fail'"]
    agent.situation("five-by-field", when=fields, frequency=">= 5", period="1h")
    agent.situation("six", when=["ENTRYDESC starts 'fail'"], frequency=">= 6", period="1h")
    agent.situation("every")
    agent.start()
    old = syslog_line("fail too long ago", when=time.localtime(time.time() - 2 * 3600))
    log.append(old + "".join(syslog_line(text) for text in ("fail 1", "other", "fail 2", "fail 3", "fail 4")))
    agent.wait_events(6)
    wait_stored(agent, log)
    rotated = agent.directory / "app.log.1"
    if rotation == "copy and truncate":
        rotated.write_bytes(log.path.read_bytes())
        log.path.write_bytes(b"")
    elif rotation != "none":
        log.path.rename(rotated)
        log.path.write_bytes(b"")
    if rotation != "none":
        log.append(syslog_line("after the rotation"))
        agent.wait_events(7)
        wait_stored(agent, log)
    if rotation == "compress":
        (agent.directory / "app.log.1.gz").write_bytes(gzip.compress(rotated.read_bytes()))
        rotated.unlink()
    agent.send(SIGKILL)
    agent.wait_end()
    known = events_by_id(agent)
    assert {event["situation"] for event in known.values()} == {"every"}
    agent.start()
    log.append(syslog_line("fail 5"))
    wait_until(lambda: len(events_by_id(agent)) >= len(known) + 3, "three more events")
    assert agent.stop() == 0
    raised = [event for number, event in events_by_id(agent).items() if number not in known]
    assert sorted((event["situation"], event["row"]["ENTRYDESC"]) for event in raised) == [
        ("every", "fail 5"),
        ("five", "fail 5"),
        ("five-by-field", "fail 5"),
    ]
    assert next(event for event in raised if event["situation"] == "five")["row"]["FREQTHRESH"] == 5


def test_what_is_counted_again_is_not_seen_anywhere_else(agent):
    agent.listen = "127.0.0.1:0"
    agent.environment["AGENT_DEBUG_LOG"] = str(agent.directory / "debug.log")
    log = followed(agent, debug=True)
    agent.situation("two", frequency=">= 2", period="1h")
    agent.start()
    log.append(syslog_line("one") + "a line without a time\n")
    agent.wait_events(1)
    wait_stored(agent, log)
    agent.send(SIGKILL)
    agent.wait_end()
    (agent.directory / "debug.log").unlink()
    agent.start()
    log.append(syslog_line("three"))
    wait_until(lambda: len(events_by_id(agent)) == 2, "the event of the new entry")
    agent.wait_debug_records(1)
    api = Analysis(agent)
    _, _, answer = api.request("GET", f"/api/v1/logs?log={log}")
    assert answer["logs"][0]["ledger"]["without_time"] == 0
    assert api.logs()["app.log"]["NUMEVENTS"] == 1
    counts = api.counts("two")
    assert (counts["offered"], counts["matched"], counts["raised"]) == (1, 1, 1)
    assert (agent.directory / "debug.log").read_bytes().count(b">>>>>>>>> RECORD ") == 1
    assert "without a time" not in agent.stderr.text()
    assert events_by_id(agent)[2]["row"]["FREQTHRESH"] == 3
    assert agent.stop() == 0


def last_change(zone, is_autumn):
    """The UTC time of the zone's last change of this kind, to the hour."""
    now = datetime.now(timezone.utc).replace(minute=0, second=0, microsecond=0) - timedelta(days=2)
    for hours in range(24 * 400):
        after = now - timedelta(hours=hours)
        before = after - timedelta(hours=1)
        moved = after.astimezone(zone).utcoffset() - before.astimezone(zone).utcoffset()
        if (moved < timedelta(0)) if is_autumn else (moved > timedelta(0)):
            return after
    raise AssertionError("the zone has no such change")


def times_around(change):
    """Bursts of three within a minute, and pairs that an hour is between, which are no burst."""
    times = []
    for minute in range(-150, 150, 10):
        begin = change + timedelta(minutes=minute)
        seconds = (0, 20, 40) if minute % 60 == 20 else (0, 25)
        times += [begin + timedelta(seconds=second) for second in seconds]
    return times


def naive(times, least, period):
    """How many of the entries are one of at least so many within the period."""
    stamps = [when.timestamp() for when in times]
    return sum(sum(1 for other in stamps[: n + 1] if other > stamp - period) >= least for n, stamp in enumerate(stamps))


def traditional(when, zone):
    return f"{when.astimezone(zone).strftime('%b %e %H:%M:%S')} web1 app: {when:%H%M%S}\n"


def with_offset(when, zone):
    return f"{when.astimezone(zone).isoformat()} web1 app: {when:%H%M%S}\n"


def in_utc(when, _zone):
    return f"{when:%Y-%m-%dT%H:%M:%SZ} web1 app: {when:%H%M%S}\n"


@pytest.mark.parametrize("form", (traditional, with_offset, in_utc))
@pytest.mark.parametrize("is_autumn", (True, False), ids=("autumn", "spring"))
@pytest.mark.parametrize("name", ("Europe/Berlin", "America/New_York"))
def test_a_change_of_the_clock_neither_hides_a_burst_nor_makes_one(agent, name, is_autumn, form):
    zone = ZoneInfo(name)
    times = times_around(last_change(zone, is_autumn))
    agent.environment["TZ"] = name
    check_counts(agent, "".join(form(when, zone) for when in times), times)


def test_times_of_a_configured_zone_are_told_apart_too(agent):
    zone = ZoneInfo("Europe/Berlin")
    times = times_around(last_change(zone, True))
    agent.environment["TZ"] = "Asia/Tokyo"
    check_counts(agent, "".join(traditional(when, zone) for when in times), times, timezone="Europe/Berlin")
    shown = [event["row"]["ENTRYTIME"][7:13] for event in agent.events() if event["situation"] == "every"]
    assert shown == [f"{when.astimezone(ZoneInfo('Asia/Tokyo')):%H%M%S}" for when in times]


def check_counts(agent, content, times, **keys):
    """Live, backtest and explanation agree with a plain count of the real times."""
    agent.listen = "127.0.0.1:0"
    expected = naive(times, 3, 60)
    assert 0 < expected < len(times) / 2
    followed(agent, content, **keys)
    agent.situation("three", frequency=">= 3", period="60s")
    agent.situation("every")
    agent.start()
    agent.wait_events(len(times) + expected)
    api = Analysis(agent)
    raised = [event["row"]["ENTRYTIME"] for event in agent.events() if event["situation"] == "three"]
    assert len(raised) == expected
    tested = api.backtest("2000-01-01", "2060-01-01", situation="three")
    assert (tested["raised"], tested["raised_at"]) == (expected, raised)
    explained = api.explain(situation="three", log=str(agent.directory / "app.log"), last=len(times))
    assert sum(one["raised"] for one in explained) == expected
    assert agent.stop() == 0


def test_backtests_and_explanations_count_as_the_agent_did(agent):
    """Random times: bursts, late lines, pauses, clocks that are set, lines without a time."""
    seed = random.randrange(1 << 30)
    print(f"seed {seed}")
    dice = random.Random(seed)
    now = datetime.now(timezone.utc) - timedelta(days=5)
    lines = []
    for number in range(600):
        now += timedelta(seconds=dice.choice((0, 0, 1, 3, 20, 20, 100)) if dice.random() < 0.98 else -4000)
        late = timedelta(seconds=dice.choice((0, 0, 0, 5, 40, 90, 3000, -86400)))
        lines.append(f"{now - late:%Y-%m-%dT%H:%M:%S}Z web1 app: {number}\n")
    agent.listen = "127.0.0.1:0"
    followed(agent, "".join(lines))
    situations = {
        "two": (">= 2", "10s"),
        "three": (">= 3", "60s"),
        "few": ("<= 2", "60s"),
        "many": (">= 40", "1h"),
        "none": (">= 601", "30d"),
    }
    for name, (frequency, period) in situations.items():
        agent.situation(name, frequency=frequency, period=period)
    agent.situation("every")
    agent.start()
    wait_until(lambda: sum(event["situation"] == "every" for event in agent.events()) == len(lines), "every line")
    api = Analysis(agent)
    for name in situations:
        live = [event["row"] for event in agent.events() if event["situation"] == name]
        tested = api.backtest("2000-01-01", "2060-01-01", situation=name)
        assert tested["raised"] == len(live), f"{name}, seed {seed}"
        assert tested["raised_at"] == [row["ENTRYTIME"] for row in live], f"{name}, seed {seed}"
        explained = api.explain(situation=name, log=str(agent.directory / "app.log"), last=len(lines))
        raised = [(one["row"]["ENTRYDESC"], one["window"]["count"]) for one in explained if one["raised"]]
        assert raised == [(row["ENTRYDESC"], row["FREQTHRESH"]) for row in live], f"{name}, seed {seed}"
    assert agent.stop() == 0


def test_wrong_times_hide_nothing(agent):
    now = time.time()

    def line(text, seconds):
        when = datetime.fromtimestamp(now + seconds, timezone.utc)
        return f"{when:%Y-%m-%dT%H:%M:%SZ} web1 app: {text}\n"

    year = 365 * 86400
    content = line("1", -100) + line("2", -99) + line("of last year", -year) + line("3 raises", -98)
    content += line("of next year", year) + line("4 raises", -97)
    content += "".join(line(f"after the clock was set back {n}{' raises' * (n > 2)}", n - 3700) for n in (1, 2, 3))
    followed(agent, content)
    agent.situation("three", frequency=">= 3", period="60s")
    agent.start()
    assert descriptions(agent.wait_events(3)) == [
        "3 raises",
        "4 raises",
        "after the clock was set back 3 raises",
    ]
    assert agent.stop() == 0
    assert len(agent.events()) == 3


def test_lines_without_a_time_count_and_are_traced_once(agent):
    log = followed(agent)
    for number in range(3):
        agent.situation(f"four-{number}", frequency=">= 4", period="60s")
    agent.start()
    log.append(syslog_line("1") + "no time 2\nno time 3\nno time 4\n")
    assert {event["row"]["ENTRYDESC"] for event in agent.wait_events(3)} == {"no time 4"}
    agent.wait_trace("Entry without a time that can be read in file")
    assert agent.stop() == 0
    assert len(agent.trace("Entry without a time that can be read in file")) == 1
    assert not agent.trace("Error converting timestamp")
