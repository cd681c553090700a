"""Reports on logs through the agent's API."""

import json
import re
import urllib.request


def serve_reports(agent):
    """Lets the agent serve its API on a free port; before its start."""
    token = agent.directory / "token"
    agent.extra_toml += f'\n[http]\nlisten = "127.0.0.1:0"\ntoken_file = "{token}"\n'


def sample(agent, table, filters=()):
    """The answer to one sample of a table."""
    address = re.search(r"http://[^/\s]+", agent.wait_trace("HTTP at http://")[0]).group(0)
    names = ("column", "op", "value")
    request = urllib.request.Request(
        f"{address}/api/v1/tables/{table}/sample",
        data=json.dumps({"filters": [dict(zip(names, each)) for each in filters]}).encode(),
        headers={
            "Authorization": "Bearer " + (agent.directory / "token").read_text().strip(),
            "Content-Type": "application/json",
        },
    )
    with urllib.request.urlopen(request, timeout=60) as response:
        return json.load(response)


def report(agent, log, begin, end):
    """The answer to a report on a log over a window of ISO 8601 times."""
    return sample(
        agent,
        "RMLOGENT",
        [
            ("LOGPATH", "=", f"{log.path.parent}/"),
            ("LOGNAME", "=", log.path.name),
            ("ENTRYTIME", ">=", begin),
            ("ENTRYTIME", "<=", end),
        ],
    )


def monitored(agent, log):
    """The log's row of the Monitored Logs table."""
    rows = sample(agent, "RMMONLOG", [("LOGNAME", "=", log.path.name)])["rows"]
    assert len(rows) == 1
    return rows[0]
