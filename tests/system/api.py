"""A client of the agent's HTTP API."""

import http.client
import json
import re
import socket
import time

from conftest import PATIENCE


class Api:
    """Requests to a running agent, with its token by default."""

    def __init__(self, agent):
        line = agent.wait_trace("HTTP at http://")[0]
        match = re.search(r"HTTP at http://127\.0\.0\.1:(\d+)/, token in (.+)$", line)
        self.port = int(match.group(1))
        self.token_file = match.group(2)
        with open(self.token_file, encoding="ascii") as stream:
            self.token = stream.read().strip()

    def request(self, method, path, body=None, headers=None, content_type="application/json"):
        """(status, content type, parsed body or None); a header that is None is not sent."""
        send = {"Authorization": f"Bearer {self.token}", "Content-Type": content_type}
        send.update(headers or {})
        if body is not None and not isinstance(body, (bytes, str)):
            body = json.dumps(body)
        connection = http.client.HTTPConnection("127.0.0.1", self.port, timeout=PATIENCE)
        try:
            connection.request(
                method, path, body, {name: value for name, value in send.items() if value is not None}
            )
            response = connection.getresponse()
            text = response.read()
            answer = json.loads(text) if text else None
            return response.status, response.getheader("Content-Type"), answer
        finally:
            connection.close()

    def sample(self, table, *filters, **keys):
        body = {"filters": [dict(zip(("column", "op", "value"), one)) for one in filters]}
        return self.request("POST", f"/api/v1/tables/{table}/sample", body, **keys)

    def report(self, log, begin, end, *filters):
        """The answer to a report on a log over a window."""
        status, _, answer = self.sample(
            "RMLOGENT",
            ("LOGPATH", "=", f"{log.path.parent}/"),
            ("LOGNAME", "=", log.path.name),
            ("ENTRYTIME", ">=", begin),
            ("ENTRYTIME", "<=", end),
            *filters,
        )
        assert status == 200, answer
        return answer

    def logs(self):
        """The Monitored Logs rows by the log's name."""
        status, _, answer = self.sample("RMMONLOG")
        assert status == 200, answer
        return {row["LOGNAME"]: row for row in answer["rows"]}


def refuses_connections(port):
    with socket.socket() as client:
        return client.connect_ex(("127.0.0.1", port)) != 0


def stamp(when):
    """The 16-character time stamp of seconds since the epoch, in local time."""
    local = time.localtime(when)
    return f"{local.tm_year - 1900:03}" + time.strftime("%m%d%H%M%S000", local)
