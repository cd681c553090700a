"""Native login records: wtmp and btmp, followed and in reports, held to what `last` says."""

import gzip
import random
import re
import subprocess
import sys

import pytest
from api import Api
from conftest import ROOT, Log, wait_until

sys.path.insert(0, str(ROOT / "tests/tools"))
import wtmp  # noqa: E402
from wtmp import record  # noqa: E402

TEN = 1795341600  # 2026-11-22 10:00:00 UTC


@pytest.fixture
def log(agent):
    agent.environment["TZ"] = "UTC0"
    log = Log(agent.directory / "wtmp")
    log.path.write_bytes(b"")
    agent.listen = "127.0.0.1:0"
    return log


def report(agent, log, where=(), **times):
    times = times or {"from": "2026-11-20", "to": "2026-11-25"}
    status, _, answer = Api(agent).request(
        "POST", "/api/v1/reports", {"log": str(log), "where": list(where), **times}
    )
    assert status == 200, answer
    return answer


def test_records_become_events_with_fields(agent, log):
    agent.follow(log, type="wtmp", start="beginning", keep=["*"])
    agent.situation(log=log)
    agent.start()
    log.append(record("reboot", "~", wtmp.BOOT_TIME, "~~", host="6.1.0-41-amd64", when=TEN))
    log.append(
        record("anna", "pts/0", id="ts/0", pid=412, host="client", address="203.0.113.7", session=9, when=TEN + 60)
    )
    log.append(record(line="pts/0", type=wtmp.DEAD_PROCESS, pid=412, when=TEN + 120))
    boot, login, logout = agent.wait_events(3)
    names = ("ENTRYTIME", "ENTRYSYS", "ENTRYSRC", "ENTRYTYPE", "ENTRYCLASS", "ENTRYDESC")
    assert tuple(login["row"][name] for name in names) == (
        "1261122100100000",
        "",
        "pts/0",
        "User process",
        "",
        "user = anna; id = ts/0; pid = 412; term status = 0; exit status = 0",
    )
    assert login["fields"] == {
        "type": "USER_PROCESS",
        "user": "anna",
        "line": "pts/0",
        "id": "ts/0",
        "host": "client",
        "address": "203.0.113.7",
        "pid": "412",
        "session": "9",
        "termination": "0",
        "exit": "0",
    }
    assert "entry" not in login, "a record is not a text"
    assert (boot["row"]["ENTRYTYPE"], boot["row"]["ENTRYSRC"]) == ("System boot time", "~")
    assert (logout["row"]["ENTRYTYPE"], logout["fields"]["type"]) == ("Zombie process", "DEAD_PROCESS")


def test_situations_ask_for_addresses(agent, log):
    agent.follow(log, type="wtmp", start="beginning")
    agent.situation(name="abroad", log=log, when=["field.address starts '2001:db8:'", "field.user != 'root'"])
    agent.start()
    for user, address in (("root", "2001:db8::1"), ("anna", "203.0.113.7"), ("bert", "2001:db8::2"), ("carl", None)):
        log.append(record(user, "ssh:notty", wtmp.LOGIN_PROCESS, address=address, when=TEN))
    (event,) = agent.wait_events(1)
    assert event["fields"] == {"address": "2001:db8::2", "user": "bert"}
    status, _, answer = Api(agent).request("POST", "/api/v1/explain", {"situation": "abroad", "last": 4})
    assert status == 200, answer
    assert [one["decision"].split(": ", 1)[1] for one in answer["explanations"]] == [
        "field.user 'root' is 'root'.",
        "field.address '203.0.113.7' does not start with '2001:db8:'.",
        "every condition holds.",
        "the entry has no field.address.",
    ]
    assert agent.stop() == 0
    assert len(agent.events()) == 1


def test_half_records_wait_and_damaged_ones_are_rejected(agent, log):
    agent.follow(log, type="wtmp", start="beginning")
    agent.situation(log=log)
    agent.start()
    whole = record("anna", "pts/0", when=TEN)
    log.append(whole[:100])
    log.append(bytes(0))
    log.append(whole[100:] + bytes(384) + record("bert", "pts/1", type=77, when=TEN) + record("carl", "pts/2", when=TEN))
    events = agent.wait_events(2)
    assert [event["row"]["ENTRYSRC"] for event in events] == ["pts/0", "pts/2"]
    api = Api(agent)

    def ledger():
        return api.request("GET", f"/api/v1/logs?log={log}")[2]["logs"][0]["ledger"]

    wait_until(lambda: ledger()["lines"] == 4, "the records")
    assert (ledger()["rows"], ledger()["format_errors"]) == (2, 2)
    assert [one["reason"] for one in ledger()["rejected"]] == [
        "The login record has no time.",
        "The type of the login record is not one of the known ones.",
    ]
    log.append(whole[:383])
    assert agent.stop() == 0


def test_a_rotation_and_a_restart_lose_no_record(agent, log):
    agent.follow(log, type="wtmp", start="beginning", rotate_wait="1s")
    agent.situation(log=log)
    agent.start()
    log.append(record("one", "pts/1", when=TEN))
    agent.wait_events(1)
    log.path.rename(f"{log}.1")
    with open(f"{log}.1", "ab") as older:
        older.write(record("two", "pts/2", when=TEN + 1))
    log.path.write_bytes(record("three", "pts/3", when=TEN + 2))
    agent.wait_events(3)
    assert agent.stop() == 0
    assert [event["row"]["ENTRYSRC"] for event in agent.events()] == ["pts/1", "pts/2", "pts/3"]
    log.append(record("four", "pts/4", when=TEN + 3))
    agent.start()
    agent.wait_events(1)
    assert agent.stop() == 0
    assert [event["row"]["ENTRYSRC"] for event in agent.events()] == ["pts/4"]


def test_reports_read_generations_backwards(agent, log):
    records = [record(f"user{n}", f"pts/{n}", address=f"192.0.2.{n}", when=TEN + n * 3600) for n in range(8)]
    with gzip.open(f"{log}.2.gz", "wb") as oldest:
        oldest.write(b"".join(records[:3]))
    (agent.directory / "wtmp.1").write_bytes(b"".join(records[3:5]))
    log.append(b"".join(records[5:7]) + bytes(384) + records[7])
    agent.follow(log, type="wtmp", start="beginning")
    agent.start()
    rows = report(agent, log)["rows"]
    assert [row["ENTRYSRC"] for row in rows] == [f"pts/{n}" for n in range(7, -1, -1)]
    rows = report(agent, log, **{"from": "2026-11-22T12:00:00", "to": "2026-11-22T15:00:00"})["rows"]
    assert [row["ENTRYSRC"] for row in rows] == ["pts/5", "pts/4", "pts/3", "pts/2"]
    rows = report(agent, log, ["field.address = '192.0.2.1'"])["rows"]
    assert [row["ENTRYSRC"] for row in rows] == ["pts/1"]
    fields = Api(agent).request("GET", f"/api/v1/fields?log={log}")[2]["fields"]
    assert {"user", "address", "type"} <= {one["name"] for one in fields}


def test_the_system_sees_the_same_records(agent, log):
    """utmpdump and last, of the same file."""
    chance = random.Random(20261122)
    records = []
    for number in range(200):
        address = chance.choice([None, f"198.51.100.{number}", f"2001:db8::{number + 1:x}"])
        records.append(
            record(
                chance.choice(["root", "anna", "u" * 32, "ä"]),
                f"pts/{number}",
                chance.choice([wtmp.USER_PROCESS, wtmp.DEAD_PROCESS, wtmp.LOGIN_PROCESS]),
                f"{number:04}",
                number,
                chance.choice(["", "host.example.com", "h" * 256]),
                address,
                when=TEN + number,
            )
        )
    log.append(b"".join(records))
    agent.follow(log, type="wtmp", start="beginning", keep=["*"])
    agent.situation(log=log)
    agent.start()
    events = agent.wait_events(len(records))
    dump = subprocess.run(["utmpdump", str(log)], capture_output=True, check=True).stdout
    seen = re.findall(
        rb"^\[(\d)\] \[(\d+)\] \[(.{4})\] \[(.*?) *\] \[(.*?) *\] \[(.*?) *\] \[(\S+) *\] \[([^]]*)\]$", dump, re.MULTILINE
    )
    assert len(seen) == len(records)
    types = ("LOGIN_PROCESS", "USER_PROCESS", "DEAD_PROCESS")
    for event, (kind, pid, id, user, line, host, address, when) in zip(events, seen):
        fields = event["fields"]
        assert fields["type"] == types[int(kind) - 6]
        assert (fields["pid"], fields["id"], fields["line"]) == (pid.decode().lstrip("0") or "0", id.decode(), line.decode())
        assert fields.get("host", "") == host.decode()
        assert fields.get("address", "0.0.0.0") == address.decode()
        # utmpdump shows other characters than ASCII as question marks.
        assert re.sub("[^ -~]+", "", fields["user"]) == user.decode().strip("?")
        assert event["row"]["ENTRYTIME"][7:13] == when[11:19].replace(b":", b"").decode()
    last = subprocess.run(
        ["last", "-w", "-i", "-f", str(log), "--time-format", "iso"], capture_output=True, check=True, env={"TZ": "UTC0"}
    ).stdout.decode("utf-8", "replace")
    # last takes a getty's record with a user for a login, as it is in btmp.
    logins = [event["fields"]["line"] for event in events if event["fields"]["type"] != "DEAD_PROCESS"]
    assert re.findall(r"^\S+ +(pts/\d+)", last, re.MULTILINE) == logins[::-1]


def test_keys_without_meaning_are_refused(agent, log):
    agent.follow(log, type="wtmp", timezone="UTC", columns={"time": "t"})
    agent.start(wait=False)
    agent.wait_end()
    message = agent.stderr.text()
    assert 'log.timezone: has no meaning for type "wtmp"' in message
    assert 'log.columns: has no meaning for type "wtmp"' in message
