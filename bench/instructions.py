#!/usr/bin/python3
"""Instructions per line: callgrind counts what the agent executes, in all its threads, while a log
grows by a fixed input. History and HTTP are on, one situation judges every line and none meets its
conditions. The counts hardly change from run to run, whatever else the machine does.

    bench/instructions.py [--only REGEX] [--markdown docs/performance.md]
"""

import argparse
import json
import os
import re
import struct
import subprocess
import tempfile
import time
from pathlib import Path

import cases
import process
import table

BEGIN, END = "<!-- instructions: begin -->", "<!-- instructions: end -->"
LINES = 100_000
FIRST = 1_795_330_800  # seconds since 1970-01-01 UTC
ZONE = "CET-1CEST,M3.5.0,M10.5.0/3"
MESSAGE = "request %07d from 192.0.2.%d answered with 200 after %d ms, worker %d done"
SOURCES = [("app", "1402"), ("cron", "77"), ("nginx", "901"), ("kernel", "1")]
USER_TABLE = "type = \"text\"\nformat = '''%s'''" % cases.USER_FORMAT.split(";U ;")[1]
JUDGES = {
    "syslog": cases.NEVER["when"],
    "text": ["ENTRYTYPE = 'ERROR'", "ENTRYDESC contains 'no such words'"],
    "accounting": cases.ACCOUNTING_NEVER["when"],
    "status": ["field.status >= 500"],
    "field": ["field.tag = 'sshd'"],
    "type": ["ENTRYTYPE = 'error'", "ENTRYDESC contains 'no such words'"],
}


def numbered(number):
    return MESSAGE % (number, number % 250, number % 97 + 100, number % 8)


def traditional(number, seconds):
    (name, pid), stamp = SOURCES[number % 4], time.strftime("%b %e %H:%M:%S", seconds)
    return f"{stamp} web1 {name}[{pid}]: {numbered(number)}\n".encode()


def iso(number, seconds):
    (name, pid), stamp = SOURCES[number % 4], time.strftime("%Y-%m-%dT%H:%M:%S", seconds)
    return f"{stamp}.{number % 1_000_000:06d}+01:00 web1 {name}[{pid}]: {numbered(number)}\n".encode()


def rfc5424(number, seconds):
    (name, pid), stamp = SOURCES[number % 4], time.strftime("%Y-%m-%dT%H:%M:%S", seconds)
    stamp += f".{number % 1_000_000:06d}+01:00"
    return f"<{30 + number % 8}>1 {stamp} web1 {name} {pid} - - {numbered(number)}\n".encode()


def text(number, seconds):
    stamp = time.strftime("%Y-%m-%d %H:%M:%S", seconds)
    return f"{stamp} INFO {numbered(number)}, attempt 1, queue main\n".encode()


def access(number, seconds):
    return (
        b'192.0.2.%d - - [%s +0100] "GET /shop/item/%07d?from=list HTTP/1.1" 200 %d "https://www.example.org/shop" '
        b'"Mozilla/5.0 (X11; Linux x86_64; rv:132.0) Gecko/20100101 Firefox/132.0"\n'
        % (number % 250, time.strftime("%d/%b/%Y:%H:%M:%S", seconds).encode(), number, number % 40000)
    )


def json_object(number, seconds):
    return (
        b'{"ts":"%s.%03dZ","level":"info","logger":"http.server","msg":"request completed and answer sent",'
        b'"method":"GET","path":"/api/v1/orders/%07d/items","status":200,"bytes":%d,"duration":0.0%04d,'
        b'"remote":"192.0.2.%d","request":"5f2a8f4e-9f2b-4a4e-b6c6-%012d","http":{"version":1.1}}\n'
        % (
            time.strftime("%Y-%m-%dT%H:%M:%S", seconds).encode(),
            number % 1000,
            number,
            number % 40000,
            number % 9973,
            number % 250,
            number,
        )
    )


def accounting(number, seconds):
    user, line = b"user%d" % (number % 100), b"pts/%d" % (number % 40)
    numbers = 1000 + number % 30000, 7 + number % 2, 0, 0
    return struct.pack("=8s4s12s4hq", user, b"", line, *numbers, time.mktime(seconds).__trunc__())


# name, a line of the log, lines per second of its times, conditions, its line in the log
# configuration or the keys of its [[log]] table
CASES = [
    ("`logs.conf`: syslog", traditional, 1000, "syslog", ";N ;S", None),
    ("`logs.conf`: text", text, 1000, "text", cases.USER_FORMAT, None),
    ("`logs.conf`: accounting", accounting, 1000, "accounting", ";N ;A", None),
    ("`[[log]]`: syslog, traditional", traditional, 1000, "syslog", None, 'type = "syslog"'),
    ("`[[log]]`: syslog, traditional, a second per line", traditional, 1, "syslog", None, 'type = "syslog"'),
    ("`[[log]]`: syslog, traditional, a condition on a field", traditional, 1000, "field", None, 'type = "syslog"'),
    ("`[[log]]`: syslog, ISO 8601", iso, 1000, "syslog", None, 'type = "syslog"'),
    ("`[[log]]`: syslog, RFC 5424", rfc5424, 1000, "syslog", None, 'type = "syslog"'),
    ("`[[log]]`: text", text, 1000, "text", None, USER_TABLE),
    ("`[[log]]`: text, `entry.starts`", text, 1000, "text", None, USER_TABLE + "\nentry.starts = '^\\d{4}-'"),
    ("`[[log]]`: nginx-access, a condition on a field", access, 1000, "status", None, 'format = "nginx-access"'),
    ("`[[log]]`: accounting", accounting, 1000, "accounting", None, 'type = "accounting"'),
    ("`[[log]]`: JSON", json_object, 1000, "type", None, 'type = "json"'),
    ("`[[log]]`: JSON, a condition on a field", json_object, 1000, "status", None, 'type = "json"'),
]  # fmt: skip


def lines(line, per_second):
    return b"".join(line(n, time.localtime(FIRST + n // per_second)) for n in range(LINES))


def switch(agent, state):
    command = ["callgrind_control", "-i", state, str(agent.process.pid)]
    subprocess.run(command, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, check=True)


def measure(options, case, directory):
    """Instructions per line."""
    name, line, per_second, judge, conf, keys = case
    log = Path(directory) / "app.log"
    log.write_bytes(line(0, time.localtime(FIRST)))
    output = Path(options.keep or directory) / re.sub(r"\W+", "-", name).strip("-")
    callgrind = ["valgrind", "--tool=callgrind", "--instr-atstart=no", f"--callgrind-out-file={output}"]
    followed = f"[[log]]\npath = {json.dumps(str(log))}\n{keys}\n" if keys else ""
    situation = {"name": "judge", "log": str(log), "when": JUDGES[judge]}
    with process.AgentProcess(
        [*callgrind, options.agent],
        directory,
        [log],
        [situation],
        log_lines={log: conf},
        followed=followed,
        history=True,
        http=True,
    ) as agent:
        data = lines(line, per_second)
        switch(agent, "on")
        with open(log, "ab") as stream:
            stream.write(data)
        agent.wait_read(log)
        agent.wait_idle()
        switch(agent, "off")
    # It is written when the process ends.
    summary = re.search(r"^totals: (\d+)", output.read_text(), re.M)
    return int(summary.group(1)) / LINES


def main():
    parser = argparse.ArgumentParser(
        description=__doc__, formatter_class=argparse.RawTextHelpFormatter
    )
    parser.add_argument("--agent", default="build/bin/zrmagent", help="the agent's program")
    parser.add_argument("--only", default="", help="cases whose name matches this expression")
    parser.add_argument("--keep", help="keep callgrind's files in this directory")
    parser.add_argument("--markdown", help="put the table into this file, between its marks")
    options = parser.parse_args()
    os.environ["TZ"] = ZONE
    time.tzset()
    rows = ["| log, one situation | instructions per line |", "|---|---|"]
    for case in CASES:
        if re.search(options.only, case[0]):
            with tempfile.TemporaryDirectory() as directory:
                rows.append(f"| {case[0]} | {measure(options, case, directory):,.0f} |")
            print(rows[-1], flush=True)
    if options.markdown:
        table.write_markdown(options.markdown, "\n".join(rows), BEGIN, END)


if __name__ == "__main__":
    main()
