"""Logs of type "journal": each entry once, through rotations, removed files, stops and kills."""

import os
import random
import sqlite3
import subprocess
import time
from signal import SIGKILL, SIGTERM

import pytest
from api import Api
from conftest import ROOT, descriptions, syslog_line, wait_until
from journal import Journal
from test_ledger import ledger_of

import zrmctl

SEED = int(os.environ.get("ZRM_SEED", str(random.randrange(1 << 30))))


@pytest.fixture
def reader(agent):
    """An agent that reads a journal directory, not yet started."""
    agent.journal = Journal(agent.directory / "journal")
    agent.agent_keys["log_config"] = None
    agent.sink = agent.directory / "events"
    agent.tables.append({"type": "journal", "directory": str(agent.journal.directory)})
    agent.situation(log="journal")
    return agent


def test_entries_raise_events_with_columns_and_fields(reader):
    reader.journal.write("before the start")
    reader.tables[0]["keep"] = ["_PID", "CODE_LINE"]
    reader.situations[0]["when"] = ["field._SYSTEMD_UNIT = 'ssh.service'", "ENTRYTYPE = 'warning'"]
    reader.start()
    unit = {"_SYSTEMD_UNIT": "ssh.service", "SYSLOG_IDENTIFIER": "sshd", "_PID": 412}
    reader.journal.write("not urgent", **unit)
    reader.journal.write("another unit", PRIORITY=4, _SYSTEMD_UNIT="nginx.service")
    reader.journal.write("Failed password for root", PRIORITY=4, CODE_LINE=17, **unit)
    (event,) = reader.wait_events(1)
    row = event["row"]
    assert (row["LOGPATH"], row["LOGNAME"]) == ("", "journal")
    assert (row["ENTRYSYS"], row["ENTRYSRC"]) == ("web1", "sshd[412]")
    assert (row["ENTRYTYPE"], row["ENTRYCLASS"]) == ("warning", "ssh")
    assert row["ENTRYDESC"] == "Failed password for root"
    written = time.strftime("1%y%m%d%H%M%S000", time.localtime(reader.journal.time // 1_000_000))
    assert row["ENTRYTIME"] == written
    assert event["entry"] == "Failed password for root"
    assert event["fields"] == {"_PID": "412", "CODE_LINE": "17"}
    assert reader.stop() == 0


SSHD = {"SYSLOG_IDENTIFIER": "sshd", "_PID": 412, "_SYSTEMD_UNIT": "ssh.service"}


def test_expressions_and_ready_formats_read_fields_of_messages(reader):
    reader.listen = "127.0.0.1:0"
    reader.formats = ROOT / "formats"
    reader.tables[0].update(format=["sshd", "sudo"], keep=["user", "address", "port", "_PID"])
    reader.situations[0]["when"] = ["field.user = 'root'"]
    reader.journal.write("Failed password for root from 203.0.113.7 port 40021 ssh2", **SSHD)
    reader.start()
    reader.journal.write("Failed password for root from 203.0.113.7 port 40022 ssh2", SYSLOG_IDENTIFIER="other")
    reader.journal.write("Failed password for root from 203.0.113.7 port 40023 ssh2", **SSHD)
    (event,) = reader.wait_events(1)
    assert event["fields"] == {"_PID": "412", "user": "root", "address": "203.0.113.7", "port": "40023"}
    body = {"log": "journal", "from": "2020-01-01", "where": ["field.port < 40023"], "limit": 5}
    status, _, answer = Api(reader).request("POST", "/api/v1/reports", body)
    assert status == 200 and [row["ENTRYDESC"][-10:] for row in answer["rows"]] == ["40021 ssh2"], answer
    assert reader.stop() == 0


def test_messages_in_a_format_of_their_own_are_taken_apart(reader):
    reader.formats = ROOT / "formats"
    reader.tables[0].update(format="json", columns={"type": "lvl"}, keep=["disk.free"])
    reader.start()
    reader.journal.write("Started the service.", '{"lvl":"ERROR","msg":"disk full","disk":{"free":5}}', **SSHD)
    plain, parsed = reader.wait_events(2)
    assert (plain["row"]["ENTRYTYPE"], plain["row"]["ENTRYDESC"]) == ("info", "Started the service.")
    row = parsed["row"]
    assert (row["ENTRYTYPE"], row["ENTRYDESC"], row["ENTRYSRC"]) == ("ERROR", "disk full", "sshd[412]")
    assert parsed["fields"] == {"disk.free": "5"} and parsed["entry"].startswith('{"lvl"')
    assert reader.stop() == 0


def test_what_was_written_while_the_agent_was_stopped_is_read_once(reader):
    reader.journal.write("before the start")
    reader.start()
    reader.journal.write("one")
    reader.wait_events(1)
    assert reader.stop() == 0
    reader.journal.write("two")
    os.rename(reader.journal.directory / "system.journal", reader.journal.directory / "system@1.journal")
    reader.journal.write("three")
    reader.start()
    assert descriptions(reader.wait_events(3)) == ["one", "two", "three"]
    assert reader.stop() == 0
    assert descriptions(reader.events()) == ["one", "two", "three"]


def test_a_log_whose_settings_change_goes_on_where_it_was(reader):
    reader.journal.write("before the start")
    reader.start()
    reader.journal.write("one")
    reader.wait_events(1)
    reader.tables[0]["priority"] = "warning"
    reader.reload()
    reader.wait_trace("Deleting log object for file journal")
    reader.journal.write("not urgent")
    reader.journal.write("urgent", PRIORITY=3)
    assert descriptions(reader.wait_events(2)) == ["one", "urgent"]


def test_thresholds_count_entries_from_before_a_stop(reader):
    reader.situations.clear()
    reader.situation("three", log="journal", frequency=">= 3", period="60s")
    reader.journal.write("before the start")
    reader.start()
    reader.journal.time = int(time.time() * 1_000_000)
    reader.journal.write("1", "2")
    position = "SELECT cursor FROM log_positions WHERE log = 'journal'"
    first = wait_until(lambda: query(reader, position), "a position")
    wait_until(lambda: query(reader, position) != first or stored_time(reader) >= reader.journal.time, "two entries")
    assert reader.stop() == 0
    reader.journal.write("3")
    reader.start()
    (event,) = reader.wait_events(1)
    assert event["row"]["ENTRYDESC"] == "3"


def query(agent, sql):
    try:
        with sqlite3.connect(f"file:{agent.directory}/state/history.db?mode=ro", uri=True) as connection:
            return connection.execute(sql).fetchall()
    except sqlite3.OperationalError:
        return []


def stored_time(agent):
    """When the entry of the stored position was written, in microseconds."""
    for (cursor,) in query(agent, "SELECT cursor FROM log_positions"):
        for part in cursor.split(";"):
            if part.startswith("t="):
                return int(part[2:], 16)
    return 0


def test_a_position_whose_file_was_removed_is_a_loss_that_is_told(reader):
    reader.listen = "127.0.0.1:0"
    reader.journal.write("before the start")
    reader.start()
    reader.journal.write("one")
    reader.wait_events(1)
    assert reader.stop() == 0
    reader.journal.write("lost")
    os.remove(reader.journal.directory / "system.journal")
    reader.journal.write("two")
    reader.start()
    assert descriptions(reader.wait_events(2)) == ["one", "two"]
    reader.wait_trace("Entries of the journal may have been lost")
    reader.api = Api(reader)
    (lost,) = ledger_of(reader, "journal")["follow"]["lost"]
    assert lost["text"].startswith("Entries of the journal may have been lost: the entry at which reading stopped")


def test_without_a_journal_the_state_says_so_and_other_logs_go_on(agent):
    agent.listen = "127.0.0.1:0"
    agent.agent_keys["log_config"] = None
    log = agent.directory / "app.log"
    log.write_text("")
    agent.follow(log)
    agent.tables.append({"type": "journal", "directory": str(agent.directory / "none")})
    agent.situation()
    agent.start()
    agent.wait_open(log)
    agent.api = Api(agent)
    follow = ledger_of(agent, "journal")["follow"]
    assert (follow["state"], follow["problem"]) == ("waiting", "there is no journal")
    agent.wait_trace("Error while reading log journal: there is no journal.")
    with open(log, "a", encoding="ascii") as stream:
        stream.write(syslog_line("works"))
    assert descriptions(agent.wait_events(1)) == ["works"]
    Journal(agent.directory / "none").write("appeared")
    assert descriptions(agent.wait_events(2)) == ["works", "appeared"]
    wait_until(lambda: ledger_of(agent, "journal")["follow"]["problem"] is None, "no problem")
    assert len(agent.trace("there is no journal")) == 1
    assert agent.stop() == 0


@pytest.mark.slow
def test_an_agent_that_is_killed_raises_each_event_once_and_in_order(reader):
    print(f"seed {SEED}")
    dice = random.Random(SEED)
    journal, last, files = reader.journal, 0, 0
    reader.tables[0]["start"] = "beginning"

    def work(times):
        nonlocal last, files
        for _ in range(times):
            count = dice.choice((1, 3, 40, 300))
            journal.write(*(str(last + number + 1) for number in range(count)))
            last += count
            if dice.random() < 0.2:
                files += 1
                os.rename(journal.directory / "system.journal", journal.directory / f"system@{files:04}.journal")

    work(1)
    for _ in range(int(os.environ.get("ZRM_KILLS", "6"))):
        reader.start(wait=False)
        work(dice.randrange(1, 6))
        reader.send(SIGKILL)
        reader.wait_end()
        work(dice.randrange(0, 2))
    work(1)
    reader.start()
    events = reader.wait_events(last)
    assert reader.stop() == 0
    found = [int(text) for text in descriptions(reader.events())]
    # The sink may have got the last events before a kill twice; the history has each once.
    rows = query(reader, "SELECT json FROM events ORDER BY id")
    assert len(events) >= last and set(found) == set(range(1, last + 1)), f"seed {SEED}"
    assert len(rows) == last, f"seed {SEED}"


# A journal daemon, and beside it a program and what is written into a pipe for the shell.
JOURNALD = """
exec 9>&-
[ -n "$OWN_RUN" ] && { mount -t tmpfs none /run || exit; }
mkdir -p /run/systemd/journal /run/log
/lib/systemd/systemd-journald 2>/dev/null & daemon=$!
for attempt in $(seq 300); do [ -S /run/systemd/journal/socket ] && break; sleep 0.1; done
[ -S /run/systemd/journal/socket ] || exit
while read -r command; do sh -c "$command"; done <"$COMMANDS" & shell=$!
"$@" & agent=$!
trap 'kill $agent' TERM
while kill -0 $agent 2>/dev/null; do wait $agent; done
kill $daemon $shell
wait $daemon
[ -n "$OWN_RUN" ] || rm -rf /run/systemd/journal /run/log/journal
"""


def room_for_a_daemon():
    """How to start a program where a journal daemon has /run for itself, and the daemon's environment."""
    for namespace in (["unshare", "--mount"], ["unshare", "--map-root-user", "--mount"]):
        mount = subprocess.run([*namespace, "mount", "-t", "tmpfs", "none", "/run"], check=False, capture_output=True)
        if mount.returncode == 0:
            return namespace, {"OWN_RUN": "yes"}
    # A container may not mount, but has no daemon of its own either.
    assert not os.path.exists("/run/systemd/journal"), "run the tests as root, or allow user namespaces"
    return [], {}


def test_it_reads_what_a_running_journal_daemon_writes(agent):
    namespace, environment = room_for_a_daemon()
    pipe = agent.directory / "commands"
    os.mkfifo(pipe)
    agent.environment.update(environment, COMMANDS=str(pipe))
    agent.agent_keys["log_config"] = None
    agent.tables.append({"type": "journal", "identifiers": ["zrm-test"]})
    agent.situation(log="journal")
    agent.start(wrapper=[*namespace, "sh", "-c", JOURNALD, "sh"])
    with open(pipe, "w", encoding="ascii") as commands:
        print("systemd-cat -t zrm-test echo from the daemon", file=commands, flush=True)
        assert descriptions(agent.wait_events(1)) == ["from the daemon"]
        print("journalctl --rotate", file=commands, flush=True)
        print("systemd-cat -t zrm-test echo after a rotation", file=commands, flush=True)
        assert descriptions(agent.wait_events(2)) == ["from the daemon", "after a rotation"]
    agent.send(SIGTERM)
    agent.wait_end()


@pytest.fixture
def reporting(reader):
    """An agent with a journal of forty entries of four seconds."""
    reader.listen = "127.0.0.1:0"
    reader.situations[0]["when"] = ["field.NUMBER >= 38"]
    for number in range(40):
        reader.journal.write(f"entry {number}", NUMBER=number)
    reader.start()
    reader.api = Api(reader)
    return reader


def test_reports_read_the_journal_backwards(reporting):
    body = {"log": "journal", "from": "2020-01-01", "where": ["field.NUMBER >= 10"], "limit": 5}
    status, _, answer = reporting.api.request("POST", "/api/v1/reports", body)
    assert status == 200, answer
    assert [row["ENTRYDESC"] for row in answer["rows"]] == [f"entry {number}" for number in (39, 38, 37, 36, 35)]
    assert (answer["truncated"], answer["complete"]) == (True, False)
    older = {"log": "journal", "from": "2020-01-01", "to": answer["rows"][-1]["ENTRYTIME"], "limit": 1000}
    status, _, answer = reporting.api.request("POST", "/api/v1/reports", older)
    numbers = [int(row["ENTRYDESC"].split()[1]) for row in answer["rows"]]
    assert numbers[-1] == 0 and numbers == sorted(numbers, reverse=True) and 35 <= numbers[0] < 40
    assert (answer["truncated"], answer["complete"]) == (False, True)


def test_a_situation_on_the_journal_is_tested_on_its_past(reporting):
    body = {"situation": "every-entry", "from": "2020-01-01", "to": "2090-01-01"}
    status, _, answer = reporting.api.request("POST", "/api/v1/backtest", body)
    assert status == 200, answer
    assert (answer["entries"], answer["matched"]) == (40, 2), answer


def explained(agent, status=200, **body):
    got, _, answer = agent.api.request("POST", "/api/v1/explain", body)
    assert got == status, answer
    return answer


def test_the_newest_entries_of_the_journal_are_explained(reporting):
    answer = explained(reporting, situation="every-entry", log="journal", last=3)
    found = answer["explanations"]
    assert [one["line"] for one in found] == ["entry 37", "entry 38", "entry 39"]
    assert [one["raised"] for one in found] == [False, True, True]
    assert found[0]["decision"] == "Would not be raised: field.NUMBER '37' is less than 38."
    assert found[0]["conditions"][-1:] == [{"condition": "field.NUMBER >= 38", "value": "37", "holds": False}]
    assert (answer["complete"], answer["reason"]) == (True, None)
    assert found[0]["row"]["ENTRYDESC"] == "entry 37"


def test_older_entries_of_the_journal_are_explained_by_their_time(reporting):
    begin = reporting.journal.time // 1_000_000 - 2
    answer = explained(
        reporting, definition={"when": ["field.NUMBER >= 0"], "frequency": ">= 3", "period": "1s"}, log="journal",
        last=1, to=time.strftime("%Y-%m-%dT%H:%M:%S", time.localtime(begin)),
    )
    (one,) = answer["explanations"]
    stamp = time.strftime("1%y%m%d%H%M%S000", time.localtime(begin))
    assert one["row"]["ENTRYTIME"] == stamp
    number = int(one["line"].split()[1])
    assert 15 <= number < 30 and one["window"]["count"] >= 3 and one["raised"]


def test_an_event_of_the_journal_is_explained_from_the_journal(reporting):
    reporting.journal.write("entry 40", NUMBER=40)
    (event,) = reporting.wait_events(1)
    for number in range(41, 60):
        reporting.journal.write(f"entry {number}", NUMBER=number)
    reporting.wait_events(20)
    answer = explained(reporting, event=event["id"], definition={"when": ["field.NUMBER < 41", "field._BOOT_ID != ''"]})
    (one,) = answer["explanations"]
    assert (one["line"], one["raised"], one["event"]) == ("entry 40", True, event["id"])
    assert answer["complete"] is True
    # Once the journal has lost it, the history has what the event kept.
    os.remove(reporting.journal.directory / "system.journal")
    reporting.journal.write("another")
    (one,) = explained(reporting, event=event["id"])["explanations"]
    assert one["raised"] and one["conditions"][-1]["value"] == "40"


def test_the_fields_of_the_journal_are_suggested(reporting):
    status, _, answer = reporting.api.request("GET", "/api/v1/fields?log=journal")
    assert status == 200, answer
    names = {field["name"]: field["entries"] for field in answer["fields"]}
    assert answer["entries"] == 40 and names["NUMBER"] == names["MESSAGE"] == 40


def test_check_says_how_much_of_a_journal_can_be_read(reader):
    reader.journal.write("one")
    (reader.journal.directory / "bad.journal").write_bytes(b"x" * 1000)
    reader._write_toml()
    output = zrmctl.run(["check", "--host", str(reader.zrm_toml)])[1]
    assert "journal  1 of 2 files can be read, 8 MiB\n" in output
    assert "bad.journal: it is damaged\n" in output


def test_a_situation_of_the_api_names_a_log_that_there_is(reporting):
    definition = {"name": "by name", "log": "journal", "when": []}
    status, _, answer = reporting.api.request("POST", "/api/v1/situations", definition)
    assert status == 201, answer
    definition = {"name": "by a wrong name", "log": "syslog", "when": []}
    status, _, answer = reporting.api.request("POST", "/api/v1/situations", definition)
    assert (status, answer["field"]) == (400, "log")
    assert answer["detail"].startswith("'syslog' is not the absolute path of a file, and no log has this name")
