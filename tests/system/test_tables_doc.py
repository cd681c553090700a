"""The sample rows of docs/tables.md are rows that the agent makes."""

import json
import re
import subprocess
import sys

from api import Api
from conftest import ROOT
from test_error_log import log, start, uname_aix  # noqa: F401 (fixtures)

DOCUMENT = (ROOT / "docs/tables.md").read_text(encoding="utf-8")

# What depends on the machine and the time.
VARYING = ("ORIGINNODE", "LOGPATH", "ULOGPATH", "TIMESTAMP", "MONTIME", "LOGMODDATE")


def sample_rows():
    blocks = re.findall(r"```json\n(.*?)```", DOCUMENT, re.S)
    return {row["LOGNAME"]: row for row in map(json.loads, blocks)}


def monitored_rows():
    """The cells of the last table, as text."""
    lines = [line for line in DOCUMENT.splitlines() if line.startswith("|")][-6:]
    cells = [[cell.strip(" `") for cell in line[1:-1].split(" |")] for line in lines]
    return {row[0]: dict(zip(cells[0], row)) for row in cells[2:]}


def indented(start):
    """The indented line that begins like this, without its indentation."""
    line = next(s for s in DOCUMENT.splitlines() if s.startswith(f"    {start}"))
    return line.strip().replace("/srv/zrm-samples/", "")


# A syslog line has no year, and the error log's system is this machine.
ALSO_VARYING = {"auth.log": ("ENTRYTIME",), "errlog": ("ENTRYSYS",)}


def expected_columns(row):
    """The columns of a documented row that are the same everywhere and always."""
    varying = VARYING + ALSO_VARYING.get(row["LOGNAME"], ())
    return {column: value for column, value in row.items() if column not in varying}


def test_the_sample_rows_are_made_by_the_agent(agent, log):  # noqa: F811
    agent.listen = "127.0.0.1:0"
    agent.situations.clear()
    agent.situation()
    header = "IDENTIFIER TIMESTAMP  T C RESOURCE_NAME  DESCRIPTION"
    entry = indented("A924A5FC ")
    log.errpt(
        f"echo '{header}'; while [ ! -e go ]; do sleep 0.05; done; echo '{entry}'; exec sleep 1000"
    )
    fields = indented("/srv/zrm-samples/orders.log ").removeprefix("orders.log ")
    user_log = agent.log("orders.log", content=b"", fields=fields)
    syslog = agent.log("auth.log", content=b"", fields=";Y ;S")
    wtmp = agent.log("wtmp", content=b"", fields=";N ;A")
    start(agent)
    for followed in (user_log, syslog, wtmp):
        agent.wait_open(followed)

    user_log.append(indented("2026-11-20 ") + "\n")
    syslog.append(indented("Nov 20 ") + "\n")
    command = indented("accounting.py ").split()
    tool = ROOT / "tests/tools" / command[0]
    subprocess.run([sys.executable, tool, *command[1:]], cwd=agent.directory, check=True)
    (agent.directory / "go").touch()

    rows = {event["row"]["LOGNAME"]: event["row"] for event in agent.wait_events(4)}
    assert rows.keys() == sample_rows().keys()
    for name, row in sample_rows().items():
        expected = expected_columns(row)
        assert {column: rows[name][column] for column in expected} == expected
    assert rows["auth.log"]["ENTRYTIME"][3:] == sample_rows()["auth.log"]["ENTRYTIME"][3:]
    assert list(sample_rows()["orders.log"]) == list(rows["orders.log"])

    monitored = Api(agent).logs()
    assert monitored.keys() == monitored_rows().keys()
    for name, row in monitored_rows().items():
        expected = expected_columns(row)
        assert {column: str(monitored[name][column]) for column in expected} == expected
    assert agent.stop() == 0
