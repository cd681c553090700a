"""The real agent, run from outside: processes, files and signals."""

import io
import json
import os
import re
import resource
import subprocess
import threading
import time
from pathlib import Path
from signal import SIGHUP, SIGTERM

import pytest

ROOT = Path(__file__).resolve().parents[2]
PROGRAM = os.environ.get("ZRM_AGENT", str(ROOT / "build/dev/bin/zrmagent"))

# Sanitized programs on a busy machine are slow; a test that passes never waits this long.
PATIENCE = 60

# SIGQUIT aborts the agent; its core file is of no use here.
resource.setrlimit(resource.RLIMIT_CORE, (0, 0))

SANITIZER = re.compile(
    r"ERROR: AddressSanitizer|ERROR: LeakSanitizer|WARNING: ThreadSanitizer|runtime error:"
)

# The variables that the agent reads; a test sets those that it needs.
AGENT_VARIABLES = (
    "ZRM_CONFIG_FILE",
    "ZRM_SYSLOG_CONF",
    "AGENT_DEBUG_LOG",
    "ZRM_MAX_ROWS",
    "CTREQ_NODETYPE",
    "QFW_TRC1",
)

# Errors of every unit, and the decisions of the log manager.
DEFAULT_TRACE = "error," + ",".join(
    f"{path.stem}=error+detail" for path in sorted((ROOT / "src/logmgr").glob("LogManager*.cpp"))
)


def wait_until(condition, what, seconds=PATIENCE):
    """Polls until `condition()` is true and returns its value; fails the test after the limit."""
    deadline = time.monotonic() + seconds
    while True:
        value = condition()
        if value:
            return value
        if time.monotonic() > deadline:
            pytest.fail(f"waited {seconds} s for {what() if callable(what) else what}")
        time.sleep(0.02)


class Lines:
    """The lines of one output of a process, collected by a thread until it ends."""

    def __init__(self, stream):
        self._lines = []
        self._stream = stream
        self._thread = threading.Thread(target=self._collect, daemon=True)
        self._thread.start()

    def _collect(self):
        for line in self._stream:
            self._lines.append(line.rstrip(b"\n"))

    def __call__(self):
        return list(self._lines)

    def text(self):
        return b"\n".join(self._lines).decode("utf-8", "replace")

    def finish(self):
        self._thread.join(PATIENCE)
        self._stream.close()


class Log:
    """A monitored log file."""

    def __init__(self, path):
        self.path = Path(path)

    def __str__(self):
        return str(self.path)

    def append(self, data):
        """One write, so that the agent sees all of it or nothing."""
        data = data.encode() if isinstance(data, str) else data
        with open(self.path, "ab", buffering=0) as stream:
            stream.write(data)


def syslog_line(message, source="app[1]", host="web1", when=None):
    stamp = time.strftime("%b %e %H:%M:%S", when or time.localtime())
    return f"{stamp} {host} {source}: {message}\n"


def toml_value(value):
    """A text, a number, or a table or list of such, as TOML."""
    if isinstance(value, dict):
        inside = ", ".join(f"{json.dumps(k)} = {toml_value(v)}" for k, v in value.items())
        return "{ " + inside + " }"
    if isinstance(value, list):
        return "[" + ", ".join(toml_value(v) for v in value) + "]"
    return json.dumps(value)


class Agent:
    """A zrmagent in a directory of its own: configuration, process, outputs."""

    def __init__(self, directory):
        self.directory = Path(directory)
        self.logs_conf = self.directory / "logs.conf"
        self.zrm_toml = self.directory / "zrm.toml"
        self.syslog_conf = self.directory / "syslog.conf"
        self.environment = {}
        self.tables = []  # keys of each [[log]]
        self.situations = []
        self.sink = "-"
        self.more_sinks = []
        self.listen = ""
        self.http_keys = {}
        self.history = {}  # keys of [history]
        self.formats = None  # directory of [formats]
        self.rules = None  # directory of [rules]
        self.use = []  # names of ready situations, or the keys of each [[use]]
        self.agent_keys = {}
        self.process = None
        self.stdout = None
        self.stderr = None

    # ------------------------------------------------------------------ configuration

    def log(self, name="app.log", content=b"Jan  1 00:00:00 web1 old: before the start\n", fields=""):
        """Makes a log file and its configuration line. It has an old line by default."""
        log = Log(self.directory / name)
        log.path.write_bytes(content)
        self.configure(f"{log} {fields}".rstrip(), append=True)
        return log

    def configure(self, *lines, append=False):
        """Writes configuration lines; a changed file always has a changed modification time."""
        before = self.logs_conf.stat().st_mtime if self.logs_conf.exists() else None
        with open(self.logs_conf, "a" if append else "w", encoding="utf-8") as stream:
            stream.writelines(line + "\n" for line in lines)
        if before is not None:
            os.utime(self.logs_conf, (before + 2, before + 2))

    def follow(self, path, **keys):
        """Adds a [[log]] table for a path or a glob, or a list of them."""
        paths = path if isinstance(path, list) else [path]
        self.tables.append({"path": [str(one) for one in paths], **keys})

    def situation(self, name="every-entry", log=None, when=(), **keys):
        """A situation on a log; by default every entry raises it."""
        keys = {"name": name, "text": name, "severity": "info", **keys}
        if log is not None:
            keys["log"] = str(log)
        if when:
            keys["when"] = list(when)
        self.situations.append(keys)

    def _write_toml(self):
        keys = {"log_config": str(self.logs_conf), "syslog_conf": str(self.syslog_conf)}
        keys.update(self.agent_keys)
        names = [one for one in self.use if isinstance(one, str)]
        text = f"use = {json.dumps(names)}\n" if names else ""
        text += f"state_directory = {json.dumps(str(self.directory / 'state'))}\n[agent]\n"
        text += "".join(f"{k} = {json.dumps(v)}\n" for k, v in keys.items() if v is not None)
        if self.formats is not None:
            text += f"[formats]\ndirectory = {json.dumps(str(self.formats))}\n"
        if self.rules is not None:
            text += f"[rules]\ndirectory = {json.dumps(str(self.rules))}\n"
        text += f"[http]\nlisten = {json.dumps(self.listen)}\n"
        text += "".join(f"{k} = {json.dumps(str(v))}\n" for k, v in self.http_keys.items())
        text += "[history]\n"
        text += "".join(f"{k} = {json.dumps(v)}\n" for k, v in self.history.items())
        if self.sink is not None:
            text += f'\n[[sink]]\ntype = "jsonl"\npath = {json.dumps(str(self.sink))}\n'
        for sink in self.more_sinks:
            text += "\n[[sink]]\n"
            text += "".join(f"{k} = {toml_value(v)}\n" for k, v in sink.items())
        for table in self.tables:
            text += "\n[[log]]\n"
            text += "".join(f"{k} = {toml_value(v)}\n" for k, v in table.items())
        for use in [one for one in self.use if isinstance(one, dict)]:
            text += "\n[[use]]\n"
            text += "".join(f"{k} = {toml_value(v)}\n" for k, v in use.items())
        for situation in self.situations:
            text += "\n[[situation]]\n"
            text += "".join(f"{k} = {toml_value(v)}\n" for k, v in situation.items())
        self.zrm_toml.write_text(text, encoding="utf-8")

    # ------------------------------------------------------------------ process

    def start(self, *arguments, trace=DEFAULT_TRACE, wait=True, wrapper=(), stdout=None):
        """Starts the agent and waits until it serves and every configured log is open.

        `wrapper` is a command that ends by becoming the agent; `stdout` a descriptor to write to.
        """
        self._write_toml()
        environment = {k: v for k, v in os.environ.items() if k not in AGENT_VARIABLES}
        environment["QFW_TRC1"] = trace
        environment.update(self.environment)
        self.process = subprocess.Popen(
            [*wrapper, PROGRAM, "--config", str(self.zrm_toml), *arguments],
            stdin=subprocess.DEVNULL,
            stdout=subprocess.PIPE if stdout is None else stdout,
            stderr=subprocess.PIPE,
            cwd=self.directory,
            env=environment,
        )
        self.stdout = Lines(self.process.stdout or io.BytesIO())
        self.stderr = Lines(self.process.stderr)
        if wait:
            self.wait_trace("Agent server is listening; signal sent.")
            text = self.logs_conf.read_text(encoding="utf-8") if self.logs_conf.exists() else ""
            for line in text.splitlines():
                if line.startswith("/") and os.access(line.split()[0], os.R_OK):
                    self.wait_open(line.split()[0])
        return self

    def reload(self):
        """Writes the host configuration again, as it is now; the agent takes it by itself."""
        self._write_toml()

    def running(self):
        return self.process.poll() is None

    def send(self, number):
        self.process.send_signal(number)

    def refresh(self):
        self.send(SIGHUP)

    def wait_end(self, seconds=PATIENCE):
        """Waits until the process ends by itself; its exit status, negative for a signal."""
        try:
            self.process.wait(seconds)
        except subprocess.TimeoutExpired:
            pytest.fail(f"the agent did not end within {seconds} s\n{self.stderr.text()[-3000:]}")
        self.stdout.finish()
        self.stderr.finish()
        return self.process.returncode

    def stop(self, number=SIGTERM):
        """Stops the agent; its exit status."""
        self.send(number)
        return self.wait_end()

    def dispose(self):
        if self.process is not None and self.process.poll() is None:
            self.process.kill()
            self.wait_end()

    # ------------------------------------------------------------------ waiting

    def _describe(self):
        tail = self.stderr.text()[-3000:]
        return f"{len(self.events())} events so far; standard error ends:\n{tail}"

    def _alive_until(self, condition, what, seconds):
        def check():
            value = condition()
            if not value and not self.running():
                self.stdout.finish()
                self.stderr.finish()
                value = condition()
                if not value:
                    pytest.fail(f"the agent ended before {what}: {self._describe()}")
            return value

        return wait_until(check, lambda: f"{what}: {self._describe()}", seconds)

    def wait_trace(self, text, count=1, seconds=PATIENCE):
        """Waits until `count` lines of standard error contain the text; those lines."""

        def found():
            lines = self.trace(text)
            return lines if len(lines) >= count else None

        return self._alive_until(found, f"{count} times {text!r} on standard error", seconds)

    def trace(self, text=""):
        """The lines of standard error so far that contain the text."""
        lines = (line.decode("utf-8", "replace") for line in self.stderr())
        return [line for line in lines if text in line]

    def events(self):
        """The events so far: of standard output, or of the sink's file."""
        if self.sink in ("-", None):
            lines = self.stdout()
        else:
            path = Path(self.sink)
            data = path.read_bytes() if path.is_file() else b""
            lines = data.split(b"\n")[:-1]
        return [json.loads(line) for line in lines]

    def wait_events(self, count, seconds=PATIENCE):
        """Waits for at least `count` events; all events so far."""

        def arrived():
            events = self.events()
            return events if len(events) >= count else None

        return self._alive_until(arrived, f"{count} events", seconds)

    def wait_debug_records(self, count):
        """Waits until the debug log has that many records: lines that were read and offered."""
        path = Path(self.environment["AGENT_DEBUG_LOG"])

        def written():
            return path.read_bytes().count(b">>>>>>>>> RECORD ") >= count

        self._alive_until(written, f"{count} records in the debug log", PATIENCE)

    def wait_open(self, path):
        """Waits until the agent has the file open and is at its end: it monitors from here."""
        path = os.path.realpath(str(path))

        def at_end():
            size = os.path.getsize(path)
            for position in self._positions(path):
                if position == size:
                    return True
            return False

        self._alive_until(at_end, f"{path} open at its end", PATIENCE)
        if os.path.getsize(path) == 0:
            time.sleep(0.3)  # from outside, a seek to the end of nothing cannot be seen

    def _positions(self, path):
        """The read positions of the agent's descriptors of a file."""
        descriptors = Path(f"/proc/{self.process.pid}/fd")
        try:
            names = list(descriptors.iterdir())
        except OSError:
            return
        for name in names:
            try:
                if os.readlink(name) == path:
                    text = Path(f"/proc/{self.process.pid}/fdinfo/{name.name}").read_text()
                    yield int(re.search(r"^pos:\s*(\d+)", text, re.M).group(1))
            except OSError:
                continue

    def is_open(self, path):
        return any(True for _ in self._positions(os.path.realpath(str(path))))

    def resident_kilobytes(self):
        status = Path(f"/proc/{self.process.pid}/status").read_text()
        return int(re.search(r"^VmRSS:\s*(\d+)", status, re.M).group(1))


def pytest_configure(config):
    config.addinivalue_line("markers", "slow: waits for real; begun first, beside the others")


def pytest_collection_modifyitems(items):
    items.sort(key=lambda item: item.get_closest_marker("slow") is None)


def descriptions(events):
    return [event["row"]["ENTRYDESC"] for event in events]


@pytest.fixture
def agents(tmp_path):
    """Makes agents, and checks that none outlives its test or leaves a sanitizer's finding."""
    made = []

    def make():
        directory = tmp_path / f"agent{len(made)}"
        directory.mkdir()
        made.append(Agent(directory))
        return made[-1]

    yield make
    for agent in made:
        agent.dispose()
    for agent in made:
        if agent.stderr is not None:
            text = agent.stderr.text()
            if finding := SANITIZER.search(text):
                pytest.fail(text[finding.start() : finding.start() + 6000])


@pytest.fixture
def agent(agents):
    return agents()


@pytest.fixture
def serving(agent):
    """Starts the agent with HTTP on a free port and a log with this content; (log, API)."""
    from api import Api  # which itself needs this module

    def start(content=b"", **keys):
        log = agent.log(content=content.encode() if isinstance(content, str) else content, **keys)
        agent.listen = "127.0.0.1:0"
        agent.start()
        return log, Api(agent)

    return start


@pytest.fixture(scope="session")
def clock_library(tmp_path_factory):
    library = tmp_path_factory.mktemp("preload") / "clock.so"
    source = Path(__file__).with_name("clock.c")
    subprocess.run(["cc", "-shared", "-fPIC", "-o", library, source, "-ldl"], check=True)
    return library


@pytest.fixture
def clock(clock_library):
    """Gives an agent a wall clock of its own; returns the file with the seconds that it is ahead."""

    def prepare(agent):
        offset = agent.directory / "offset"
        offset.write_text("0")
        agent.environment.update(
            {
                "LD_PRELOAD": str(clock_library),
                "CLOCK_OFFSET": str(offset),
                "ASAN_OPTIONS": "verify_asan_link_order=0:" + os.environ.get("ASAN_OPTIONS", ""),
            }
        )
        return offset

    return prepare
