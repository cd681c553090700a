"""What the benchmark measures. Each case yields results for the table (bench/table.py)."""

import os
import random
import shutil
import sqlite3
import statistics
import sys
import tempfile
import time
from pathlib import Path

import data as data_files
from data import Data
from process import AgentProcess

NEVER = {"when": ["ENTRYSRC starts 'sshd'", "ENTRYDESC contains 'no such words'"]}
ONE_PERCENT = {"when": ["ENTRYSRC starts 'sshd'", "ENTRYDESC contains 'Failed password'"]}
USER_ONE_PERCENT = {"when": ["ENTRYTYPE = 'ERROR'", "ENTRYDESC contains 'payment refused'"]}
ACCOUNTING_NEVER = {"when": ["ENTRYTYPE = 'Accounting'", "ENTRYDESC contains 'nobody'"]}
USER_FORMAT = (
    ';N ;U ;A,"%d-%d-%d %d:%d:%d %s %256[^\\n]" , '
    "year month day hour minute second type description"
)
KIND_LINE = {"syslog": ";N ;S", "user": USER_FORMAT, "accounting": ";N ;A"}
# The keys of the [[log]] table of kinds that have no line in the log configuration.
KIND_TABLE = {"access": 'format = "nginx-access"', "json": 'type = "json"'}
FIELD_ONE_PERCENT = {"when": ["field.status >= 500"]}
GROUPS = {
    "when": ["ENTRYDESC matches 'customer (?P<customer>[0-9]+)'"],
    "group_by": ["customer"],
    "max_groups": 100_000,
    "frequency": ">= 1000000",
    "period": "60s",
    "resolve_after": "15m",
}
SOURCES = ["app", "cron", "nginx", "kernel", "sshd"]


def situations(count, log, keys):
    return [{"name": f"s{i}", "log": str(log), **keys} for i in range(count)]


def searching(log):
    """A hundred situations, of which about twenty search the description of each line."""
    return [
        {
            "name": f"s{i}",
            "log": str(log),
            "when": [
                f"ENTRYSRC starts '{SOURCES[i % len(SOURCES)]}'",
                f"ENTRYDESC contains 'no such words {i}'",
            ],
        }
        for i in range(100)
    ]


def others(log, other):
    return situations(99, other, NEVER) + [{"name": "own", "log": str(log), **NEVER}]


# name, kind of log, situations on (log, another log), events per line, target
THROUGHPUT = [
    ("syslog, 1 situation, none match", "syslog", lambda log, _: situations(1, log, NEVER), 0, None),
    ("syslog, 1 situation, 1% match", "syslog", lambda log, _: situations(1, log, ONE_PERCENT), 0.01, 6e6),
    ("user log, 8 fields, 1% match", "user", lambda log, _: situations(1, log, USER_ONE_PERCENT), 0.01, 3e6),
    ("user log, all match, 99,991 groups", "user", lambda log, _: situations(1, log, GROUPS), 0, None),
    ("syslog, 100 situations, none match", "syslog", lambda log, _: situations(100, log, NEVER), 0, 1e6),
    ("syslog, 100 situations, 20 search each line", "syslog", lambda log, _: searching(log), 0, None),
    ("syslog, 99 of 100 on other logs", "syslog", others, 0, 4e6),
    ("[[log]]: nginx-access, a condition on a field, 1% match", "access", lambda log, _: situations(1, log, FIELD_ONE_PERCENT), 0.01, 1e6),
    ("[[log]]: JSON, 12 fields, a condition on a field, 1% match", "json", lambda log, _: situations(1, log, FIELD_ONE_PERCENT), 0.01, 1.5e6),
    ("accounting, 1 situation, none match", "accounting", lambda log, _: situations(1, log, ACCOUNTING_NEVER), 0, 8e6),
]  # fmt: skip


class Workplace:
    """A temporary directory for one run; the logs live there."""

    def __init__(self, options):
        self.options = options

    def __enter__(self):
        self.directory = Path(tempfile.mkdtemp(prefix="zrm-bench-", dir=self.options.directory))
        return self

    def __exit__(self, *_):
        shutil.rmtree(self.directory)

    def log(self, name, kind="syslog"):
        path = self.directory / name
        path.write_bytes(data_files.initial_line(kind))
        return path

    def agent(self, logs, chosen, **settings):
        return AgentProcess(self.options.agent, self.directory, logs, chosen, **settings)


def append(source, log):
    """Grows the log by the bytes of the source, as fast as the system copies."""
    with open(source, "rb") as data, open(log, "r+b") as stream:
        stream.seek(0, os.SEEK_END)
        while os.sendfile(stream.fileno(), data.fileno(), None, 1 << 26):
            pass


def median(runs, key):
    return statistics.median(run[key] for run in runs)


def settings_of(kind, log):
    """The agent's settings for a log of this kind. A table is used with its defaults."""
    if kind not in KIND_TABLE:
        return {"log_lines": {log: KIND_LINE[kind]}}
    table = f"[[log]]\npath = \"{log}\"\n{KIND_TABLE[kind]}\n"
    return {"log_lines": {log: None}, "followed": table, "history": True, "http": True}


def throughput_run(options, data, choose, share):
    with Workplace(options) as place:
        log, other = place.log("app.log", data.kind), place.log("other.log")
        with place.agent([log, other], choose(log, other), **settings_of(data.kind, log)) as agent:
            cpu, begin = agent.cpu(), time.monotonic()
            append(data.path, log)
            agent.wait_read(log)
            end = agent.wait_idle()
            result = {
                "cpu": agent.cpu() - cpu,
                "wall": end - begin,
                "resident": agent.resident_kilobytes() / 1024,
            }
            events = agent.wait_events(int(data.count * share))
        if events != int(data.count * share):
            sys.exit(f"wrong number of events: {events}")
        return result


def throughput(options):
    """Logs that grow: lines per CPU second of the agent."""
    baselines = {}
    for name, kind, choose, share, target in THROUGHPUT:
        if not options.wants(name):
            continue
        data = Data(options, kind, options.lines)
        if kind not in baselines and kind in KIND_LINE:
            cpu = statistics.median(data.baseline()["cpu"] for _ in range(options.runs))
            baselines[kind] = data.count / cpu
        runs = [throughput_run(options, data, choose, share) for _ in range(options.runs)]
        yield {
            "case": name,
            "figure": data.count / median(runs, "cpu"),
            "unit": f"{'records' if kind == 'accounting' else 'lines'}/CPU s",
            "target": target,
            "plain C": baselines.get(kind),
            **{key: median(runs, key) for key in ("cpu", "wall", "resident")},
        }


def count_lines(path, offset):
    """Newlines behind the offset, and the offset of the end."""
    with open(path, "rb") as stream:
        stream.seek(offset)
        data = stream.read()
    return data.count(b"\n"), offset + len(data)


def events_run(options, data):
    with Workplace(options) as place:
        log, sink = place.log("app.log"), place.directory / "events.jsonl"
        sink.touch()
        chosen = [{"name": "all", "log": str(log)}]
        with place.agent([log], chosen, history=True, sink=sink) as agent:
            cpu, begin = agent.cpu(), time.monotonic()
            append(data.path, log)
            count, offset, resident = 0, 0, 0
            while count < data.count:
                time.sleep(0.02)
                more, offset = count_lines(sink, offset)
                count += more
                resident = max(resident, agent.resident_kilobytes())
                if time.monotonic() - begin > 300:
                    sys.exit(f"only {count} events came")
            result = {
                "cpu": agent.cpu() - cpu,
                "wall": time.monotonic() - begin,
                "resident": resident / 1024,
            }
        with sqlite3.connect(place.directory / "state/history.db") as history:
            stored = history.execute("SELECT count(*), max(id) FROM events").fetchone()
        if stored != (data.count, data.count) or count != data.count:
            sys.exit(f"{data.count} events, but {stored} in the history and {count} in the file")
        return result


def events(options):
    """Every line is an event: stored in the history, and written to a file from there."""
    name = "every line an event, history, file"
    if options.wants(name):
        data = Data(options, "syslog", options.lines)
        runs = [events_run(options, data) for _ in range(options.runs)]
        plain = statistics.median(data.baseline()["wall"] for _ in range(options.runs))
        yield {
            "case": name,
            "figure": data.count / median(runs, "wall"),
            "unit": "events/s",
            "target": 150_000,
            "plain C": data.count / plain,
            **{key: median(runs, key) for key in ("cpu", "wall", "resident")},
        }


def stamp(line):
    """The 16-character time stamp of a syslog line of this year."""
    parsed = time.strptime(f"{time.localtime().tm_year} {line[:15].decode()}", "%Y %b %d %H:%M:%S")
    return f"1{time.strftime('%y%m%d%H%M%S', parsed)}000"


def stamp_at(path, offset):
    """The stamp of the first whole line behind the offset."""
    with open(path, "rb") as stream:
        stream.seek(offset)
        if offset > 0:
            stream.readline()
        return stamp(stream.readline())


def report_run(options, data, window):
    with Workplace(options) as place:
        log = data.path
        settings = {"http": True, "max_rows": 2_000_000_000}
        with place.agent([log], situations(1, log, NEVER), **settings) as agent:
            cpu = agent.cpu()
            answer = agent.report(log, *window, "ENTRYSRC", "sshd")
            return {
                "rows": answer["count"],
                "cpu": agent.cpu() - cpu,
                "wall": answer["seconds"],
                "resident": agent.resident_kilobytes() / 1024,
            }


def reports(options):
    """A report over a large file, whose rows are filtered so that one in a hundred is left."""
    # name, window as shares of the file, part of the file that is read, whether the time counts
    cases = [
        ("report, 1 GB, window its last 1%", (0.99, 1.0), 0.01, True),
        ("report, 1 GB, window its first 1%", (0.0, 0.01), 1.0, False),
    ]
    for name, (begin, end), share, is_time in cases:
        if not options.wants(name):
            continue
        data = Data(options, "syslog", int(options.report_megabytes * 1e6 / 110))
        size = data.path.stat().st_size
        window = stamp_at(data.path, int(size * begin)), stamp_at(data.path, int(size * end) - 300)
        runs = [report_run(options, data, window) for _ in range(options.runs)]
        read = data.count * share
        offset = int(size * (1 - share))
        plain = statistics.median(data.baseline(offset)["wall"] for _ in range(options.runs))
        wall = median(runs, "wall")
        yield {
            "case": name,
            "figure": 1000 * wall if is_time else read / wall,
            "unit": "ms" if is_time else "lines/s",
            "target": 60 if is_time else 5e6,
            "less": is_time,
            "plain C": 1000 * plain if is_time else read / plain,
            **{key: median(runs, key) for key in ("cpu", "wall", "resident")},
        }


def idle_run(options, count, seconds):
    with Workplace(options) as place:
        logs = [place.log(f"app{i}.log") for i in range(count)]
        with place.agent(logs, situations(1, logs[0], NEVER)) as agent:
            time.sleep(3)  # the samples that the start takes are over: what follows are the polls
            cpu = agent.cpu()
            time.sleep(seconds)
            return agent.cpu() - cpu, agent.resident_kilobytes()


def plain_idle_run(options, seconds):
    with Workplace(options) as place:
        return data_files.idle_baseline(options.agent, place.log("app.log"), seconds)


def idle_logs(options):
    """CPU and memory of logs to which nothing is written."""
    count, seconds = options.idle_logs, 10
    if not options.wants("idle logs"):
        return
    _, small = idle_run(options, 1, 0)
    runs = [idle_run(options, count, seconds) for _ in range(options.runs)]
    used = statistics.median(cpu for cpu, _ in runs)
    resident = statistics.median(kilobytes for _, kilobytes in runs)
    plain = statistics.median(plain_idle_run(options, seconds) for _ in range(options.runs))
    yield {
        "case": f"{count} idle logs, CPU",
        "figure": 100 * used / seconds,
        "unit": "% of a core",
        "plain C": 100 * plain * count / 1000 / seconds,
        "target": 1,
        "less": True,
        "cpu": used,
        "wall": float(seconds),
        "resident": resident / 1024,
    }
    yield {
        "case": f"{count} idle logs, memory",
        "figure": (resident - small) / max(count - 1, 1),
        "unit": "kB per log",
        "target": 60,
        "less": True,
        "cpu": used,
        "wall": float(seconds),
        "resident": resident / 1024,
    }


def latency(options):
    """From the write of a line to its event on standard output."""
    if not options.wants("latency: write to event"):
        return
    runs = [latency_run(options, random.Random(run)) for run in range(options.runs)]
    for key, target in (("median", 0.6), ("maximum", 1.1)):
        yield {
            "case": f"write to event, {options.latency_lines} lines, {key}",
            "figure": median(runs, key),
            "unit": "s",
            "target": target,
            "less": True,
            **{key: median(runs, key) for key in ("cpu", "wall", "resident")},
        }


def latency_run(options, pauses):
    delays = []
    with Workplace(options) as place:
        log = place.log("app.log")
        with place.agent([log], [{"name": "all", "log": str(log)}], history=True) as agent:
            cpu, begin = agent.cpu(), time.monotonic()
            for number in range(options.latency_lines):
                time.sleep(pauses.random())  # the writes fall all over the second of a poll
                line = time.strftime(f"%b %e %H:%M:%S web1 app[1]: number {number}\n")
                with open(log, "a", encoding="ascii") as stream:
                    stream.write(line)
                written = time.monotonic()
                agent.wait_events(number + 1)
                delays.append(agent.last_event_time - written)
            return {
                "median": statistics.median(delays),
                "maximum": max(delays),
                "cpu": agent.cpu() - cpu,
                "wall": time.monotonic() - begin,
                "resident": agent.resident_kilobytes() / 1024,
            }


ALL = [throughput, events, reports, idle_logs, latency]
