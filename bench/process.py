"""The agent as the benchmark sees it: a process whose CPU, memory and events are measured."""

import http.client
import json
import os
import re
import subprocess
import sys
import threading
import time
from pathlib import Path

FORMATS = Path(__file__).resolve().parent.parent / "formats"
LIMIT = 300  # seconds that any wait may take


class AgentProcess:
    """A running agent on the given logs; ends with the `with` block."""

    def __init__(self, program, directory, logs, situations, log_lines=None, **settings):
        program = [program] if isinstance(program, str) else program
        self.directory = Path(directory)
        self.logs = logs
        kinds = log_lines or {}  # what the configuration says of a log beside its path; None: nothing
        lines = [(log, kinds.get(log, ";N ;S")) for log in logs]
        (self.directory / "logs.conf").write_text(
            "".join(f"{log} {kind}\n" for log, kind in lines if kind)
        )
        config = self.directory / "zrm.toml"
        config.write_text(self._configuration(situations, **settings))
        self.events = 0
        self.last_event_time = None
        self.trace = open(self.directory / "trace", "wb")
        self.process = subprocess.Popen(
            [*program, "--config", str(config)],
            stdin=subprocess.DEVNULL,
            stdout=subprocess.PIPE,
            stderr=self.trace,
            env={**os.environ, "QFW_TRC1": "error,LogManager=error+detail"},
        )
        self.reader = threading.Thread(target=self._count_events, daemon=True)
        self.reader.start()

    def _configuration(self, situations, http=False, max_rows=None, history=False, sink="-", followed=""):
        text = f'state_directory = "{self.directory}/state"\n'
        text += f'[agent]\nlog_config = "{self.directory}/logs.conf"\n'
        if max_rows is not None:
            text += f"max_rows = {max_rows}\n"
        text += f'[http]\nlisten = "{"127.0.0.1:0" if http else ""}"\n'
        text += f"[history]\nenabled = {'true' if history else 'false'}\n"
        text += f'[[sink]]\ntype = "jsonl"\npath = "{sink}"\n[formats]\ndirectory = "{FORMATS}"\n{followed}'
        for situation in situations:
            keys = {"text": "benchmark", "severity": "info", **situation}
            text += "[[situation]]\n"
            text += "".join(f"{key} = {json.dumps(value)}\n" for key, value in keys.items())
        return text

    def _count_events(self):
        while data := os.read(self.process.stdout.fileno(), 1 << 20):
            self.last_event_time = time.monotonic()
            self.events += data.count(b"\n")

    def __enter__(self):
        trace = self.directory / "trace"
        self._wait(lambda: b"Agent server is listening" in trace.read_bytes(), "the start")
        self._wait(self._all_at_end, "open logs")
        time.sleep(0.5)  # what the start leaves to do
        return self

    def __exit__(self, *_):
        self.process.terminate()
        status = self.process.wait(LIMIT)
        self.reader.join(LIMIT)
        self.trace.close()
        if status != 0:
            sys.exit(f"the agent ended with status {status}")

    def _wait(self, condition, what):
        deadline = time.monotonic() + LIMIT
        while not condition():
            if self.process.poll() is not None or time.monotonic() > deadline:
                sys.exit(f"waited for {what}:\n{(self.directory / 'trace').read_text()[-2000:]}")
            time.sleep(0.005)

    def _positions(self):
        """Read position of each open file."""
        positions = {}
        for entry in os.scandir(f"/proc/{self.process.pid}/fd"):
            try:
                path = os.readlink(entry.path)
                info = Path(f"/proc/{self.process.pid}/fdinfo/{entry.name}").read_text()
            except OSError:
                continue
            positions[path] = int(re.search(r"pos:\s*(\d+)", info).group(1))
        return positions

    def _all_at_end(self):
        positions = self._positions()
        return all(positions.get(str(log)) == os.path.getsize(log) for log in self.logs)

    def report(self, log, begin, end, column, start):
        """A report's number of rows, and the seconds from the request to the end of its answer."""
        found = None
        deadline = time.monotonic() + LIMIT
        while found is None and time.monotonic() < deadline:
            trace = (self.directory / "trace").read_text()
            found = re.search(r"HTTP at http://([^/]+)/, token in (\S+)", trace)
        host, token = found.group(1), Path(found.group(2)).read_text().strip()
        filters = [
            ("LOGPATH", "=", f"{log.parent}/"),
            ("LOGNAME", "=", log.name),
            ("ENTRYTIME", ">=", begin),
            ("ENTRYTIME", "<=", end),
            (column, "starts", start),
        ]
        names = ("column", "op", "value")
        body = json.dumps({"filters": [dict(zip(names, values)) for values in filters]})
        headers = {"Authorization": f"Bearer {token}", "Content-Type": "application/json"}
        connection = http.client.HTTPConnection(host, timeout=LIMIT)
        since = time.monotonic()
        connection.request("POST", "/api/v1/tables/RMLOGENT/sample", body, headers)
        answer = connection.getresponse()
        text = answer.read()
        seconds = time.monotonic() - since
        connection.close()
        if answer.status != 200:
            sys.exit(f"report: {answer.status} {text[:500]}")
        return {"count": json.loads(text)["count"], "seconds": seconds}

    def wait_read(self, log):
        """Waits until the log has been read to its end."""
        self._wait(lambda: self._positions().get(str(log)) == os.path.getsize(log), "reading")

    def wait_events(self, count):
        """Waits for that many events; the number that came, counted a little longer."""
        self._wait(lambda: self.events >= count, f"{count} events")
        return self.events

    def cpu(self):
        """CPU seconds of all threads since the start, to the nanosecond."""
        clock = (~self.process.pid << 3) | 2  # the process's CPU clock, as clock_getcpuclockid has it
        return time.clock_gettime(clock)

    def wait_idle(self):
        """Waits until the process uses no CPU but for its polls; when that began."""
        deadline = time.monotonic() + LIMIT
        quiet_since, last = time.monotonic(), self.cpu()
        while time.monotonic() - quiet_since < 0.25:
            time.sleep(0.01)
            now = self.cpu()
            if now - last > 0.002:
                quiet_since = time.monotonic()
            last = now
            if time.monotonic() > deadline:
                sys.exit("the agent does not come to rest")
        return quiet_since

    def resident_kilobytes(self):
        status = Path(f"/proc/{self.process.pid}/status").read_text()
        return int(re.search(r"^VmRSS:\s*(\d+)", status, re.M).group(1))
