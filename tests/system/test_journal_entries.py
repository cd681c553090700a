"""Messages of a journal that make one entry: traces that a program writes line by line."""

import os
import random
from signal import SIGKILL

import pytest
from api import Api
from conftest import ROOT, wait_until
from journal import Journal

SEED = int(os.environ.get("ZRM_SEED", str(random.randrange(1 << 30))))
SHOP = {"_PID": 7, "SYSLOG_IDENTIFIER": "java", "_SYSTEMD_UNIT": "shop.service"}
OTHER = {"_PID": 8, "SYSLOG_IDENTIFIER": "cron", "_SYSTEMD_UNIT": "cron.service"}


@pytest.fixture
def reader(agent):
    """An agent that joins indented messages of a journal directory, not yet started."""
    agent.journal = Journal(agent.directory / "journal")
    agent.agent_keys["log_config"] = None
    agent.listen = "127.0.0.1:0"
    agent.sink = agent.directory / "events"
    agent.tables.append(
        {
            "type": "journal",
            "directory": str(agent.journal.directory),
            "start": "beginning",
            "entry": {"indented": True, "wait": "1s"},
        }
    )
    agent.situation(log="journal")
    return agent


def entries(agent):
    return [event["entry"] for event in agent.events()]


def test_a_trace_is_one_event_although_others_write_meanwhile(reader):
    journal = reader.journal
    journal.write("java.lang.IllegalStateException: no stock", PRIORITY=3, **SHOP)
    journal.write("(root) CMD (true)", **OTHER)
    journal.write("\tat shop.Stock.take(Stock.java:17)", **SHOP)
    journal.write("  not of the trace", **OTHER)
    journal.write("\tat shop.Main.main(Main.java:3)", **SHOP)
    journal.write("started", **SHOP)
    trace = "java.lang.IllegalStateException: no stock\n\tat shop.Stock.take(Stock.java:17)\n\tat shop.Main.main(Main.java:3)"
    expected = [trace, "(root) CMD (true)\n  not of the trace", "started"]
    reader.start()
    reader.wait_events(3)
    assert entries(reader) == expected
    row = reader.events()[0]["row"]
    assert (row["ENTRYTYPE"], row["ENTRYSRC"], row["ENTRYCLASS"]) == ("err", "java[7]", "shop")
    api = Api(reader)
    body = {"log": "journal", "from": "2020-01-01", "fields": ["MESSAGE", "_PID"]}
    status, _, answer = api.request("POST", "/api/v1/reports", body)
    assert status == 200, answer
    assert [row["fields"] for row in answer["rows"]] == [
        {"MESSAGE": text, "_PID": pid} for text, pid in zip(reversed(expected), ("7", "8", "7"))
    ]
    status, _, answer = api.request("POST", "/api/v1/explain", {"situation": "every-entry", "last": 3})
    assert status == 200 and [one["line"] for one in answer["explanations"]] == expected
    assert reader.stop() == 0


def test_a_ready_format_of_entries_of_several_lines_joins_them(reader):
    reader.formats = ROOT / "formats"
    del reader.tables[0]["entry"]
    reader.tables[0]["format"] = "java"
    first = "2026-11-19 10:00:00,123 ERROR [main] shop.Stock - no stock"
    reader.journal.write(first, "java.lang.IllegalStateException: no", "\tat shop.Stock.take(Stock.java:17)", **SHOP)
    reader.journal.write("2026-11-19 10:00:01,123 INFO [main] shop.Stock - next", **SHOP)
    reader.start()
    failed, following = reader.wait_events(2)
    assert failed["entry"].splitlines()[0] == first and len(failed["entry"].splitlines()) == 3
    assert failed["row"]["ENTRYTYPE"] == "ERROR"
    assert following["entry"].endswith("next")
    assert reader.stop() == 0


def test_what_waits_for_further_lines_at_a_stop_is_whole_in_the_next_run(reader):
    reader.tables[0]["entry"]["wait"] = "1m"
    reader.journal.write("done", **OTHER)
    reader.journal.write("begins", **SHOP)
    reader.journal.write("next", **OTHER)
    reader.start()
    reader.wait_events(1)
    assert reader.stop() == 0
    assert entries(reader) == ["done"]
    reader.journal.write("\tgoes on", **SHOP)
    reader.journal.write("over", **SHOP)
    reader.journal.write("last", **OTHER)
    reader.start()
    reader.wait_events(3)
    assert entries(reader) == ["done", "begins\n\tgoes on", "next"]
    assert reader.stop() == 0


@pytest.mark.slow
def test_each_line_is_in_one_entry_after_kills(reader):
    print(f"ZRM_SEED={SEED}")
    chance = random.Random(SEED)
    reader.tables[0]["entry"]["wait"] = "1m"
    expected = []
    last = {}
    for number in range(160):
        writer = chance.randrange(3)
        text = f"{'  ' if chance.random() < 0.6 else ''}{number}"
        if text.startswith(" ") and writer in last:
            expected[last[writer]] += f"\n{text}"
        else:
            last[writer] = len(expected)
            expected.append(text)
        reader.journal.write(text, **dict(SHOP, _PID=writer))
        if number % 40 == 39:
            before = len(reader.events())
            reader.start()
            reader.wait_events(before + chance.randrange(1, 5))
            reader.send(SIGKILL)
            reader.wait_end()
    reader.journal.time += 120_000_000  # nothing waits for so long
    reader.journal.write("later", **OTHER)
    reader.start()
    api = Api(reader)

    def stored():
        return [event["entry"] for event in api.request("GET", "/api/v1/events?order=asc&limit=1000")[2]["events"]]

    wait_until(lambda: len(stored()) >= len(expected), lambda: f"{len(expected)} events, not {len(stored())}")
    assert stored() == expected
    assert reader.stop() == 0
