"""AIX error logs from outside: a preloaded uname() and an errpt of the tests' own."""

import os
import re
import stat
import subprocess
import time
from pathlib import Path
from signal import SIGKILL, SIGTERM

import pytest
from api import Api
from conftest import descriptions, wait_until

HEADER = "IDENTIFIER TIMESTAMP  T C RESOURCE_NAME  DESCRIPTION"
ENTRY = "A924A5FC   1005090306 P S SYSPROC        SOFTWARE PROGRAM ABNORMALLY TERMINATED"
OTHER = "BFE4C025   1005091706 T H sysplanar0     UNDETERMINED ERROR"
ENDLESS = f"while :; do echo '{ENTRY}'; done"

# Writes the header, then what is and will be in the file "entries".
FOLLOW = f"echo '{HEADER}'; exec tail -n +1 -s 0.05 -f entries"

# An entry that comes before the situations are open raises no event.
AWAIT_SITUATIONS = "until [ -e situations-open ]; do sleep 0.02; done"

# The errors, and what happens to the children.
TRACE = "error,LogManager=error+detail,ErrLogFileChild=error+detail"


@pytest.fixture(scope="session")
def uname_aix(tmp_path_factory):
    library = tmp_path_factory.mktemp("preload") / "uname_aix.so"
    source = Path(__file__).with_name("uname_aix.c")
    subprocess.run(["cc", "-shared", "-fPIC", "-o", library, source], check=True)
    return library


class ErrorLog:
    """An error log and its errpt, which keeps its arguments and then runs a script."""

    def __init__(self, agent):
        self.agent = agent
        self.path = agent.directory / "errlog"
        self.bin = agent.directory / "bin"
        self.bin.mkdir()
        self.path.touch()
        (agent.directory / "entries").touch()
        self.configure()

    def configure(self, command="errpt -c -smmddhhmmyy"):
        """Makes the log the only one of the configuration, and so changes the configuration."""
        self.agent.configure(f"{self.path} ;N ;E ;{command}")

    def __str__(self):
        return str(self.path)

    def errpt(self, following=FOLLOW, reporting="exit 1"):
        """Sets what errpt does when it follows the log, and for a report."""
        program = self.bin / "errpt"
        new = self.bin / "errpt.new"
        new.write_text(
            "#!/bin/sh\n"
            f"cd {self.agent.directory}\n"
            'case "$*" in\n'
            f'-c*) echo "$$ $*" >> calls; {AWAIT_SITUATIONS}; {following};;\n'
            f'*) echo "$$ $*" >> report-calls; {reporting};;\n'
            "esac\n"
        )
        new.chmod(stat.S_IRWXU)
        new.rename(program)

    def append(self, *lines):
        with open(self.agent.directory / "entries", "a", encoding="utf-8") as stream:
            stream.writelines(line + "\n" for line in lines)

    def calls(self, name="calls"):
        """(process number, arguments) of each run of errpt so far."""
        path = self.agent.directory / name
        text = path.read_text(encoding="utf-8") if path.exists() else ""
        parts = (line.partition(" ") for line in text.splitlines())
        return [(int(pid), arguments) for pid, _, arguments in parts]

    def end_commands(self):
        """Ends what a killed agent has left behind: it would keep the agent's outputs open."""
        for pid, _ in self.calls() + self.calls("report-calls"):
            try:
                if os.readlink(f"/proc/{pid}/cwd") == str(self.agent.directory):
                    os.killpg(os.getpgid(pid), SIGKILL)
            except (FileNotFoundError, ProcessLookupError):
                continue

    def wait_calls(self, count):
        return wait_until(
            lambda: self.calls() if len(self.calls()) >= count else None, f"{count} runs of errpt"
        )


@pytest.fixture
def log(agent, uname_aix):
    log = ErrorLog(agent)
    log.errpt()
    agent.environment.update(
        {
            "TZ": "UTC0",
            "LD_PRELOAD": str(uname_aix),
            "PATH": f"{log.bin}:{os.environ['PATH']}",
            # The preloaded library comes before a sanitizer's.
            "ASAN_OPTIONS": "verify_asan_link_order=0:" + os.environ.get("ASAN_OPTIONS", ""),
        }
    )
    agent.situation(log=log)
    yield log
    if agent.process is not None and agent.running():
        agent.process.kill()  # the test has failed
    log.end_commands()


def start(agent, **keys):
    """The agent does not open an error log itself: it has started when it listens."""
    situations_open = agent.directory / "situations-open"
    situations_open.unlink(missing_ok=True)
    agent.start(wait=False, trace=TRACE, **keys)
    agent.wait_trace("Agent server is listening; signal sent.")
    situations_open.touch()


def has_ended(pid):
    """True for a process that is gone; the agent's zombies are not."""
    try:
        return "\nState:\tZ" in Path(f"/proc/{pid}/status").read_text()
    except (FileNotFoundError, ProcessLookupError):
        return True


def children(agent):
    """The agent's children, running or not yet reaped."""
    found = []
    for status in Path("/proc").glob("[0-9]*/status"):
        try:
            if re.search(rf"^PPid:\t{agent.process.pid}$", status.read_text(), re.M):
                found.append(int(status.parent.name))
        except (FileNotFoundError, ProcessLookupError):
            continue
    return found


def test_the_lines_of_the_command_become_events_as_they_come(agent, log):
    agent.listen = "127.0.0.1:0"
    start(agent)
    log.append(ENTRY)
    assert descriptions(agent.wait_events(1)) == [
        "A924A5FC: SOFTWARE PROGRAM ABNORMALLY TERMINATED"
    ]
    log.append(OTHER, OTHER)
    row = agent.wait_events(3)[2]["row"]
    names = ("ENTRYTIME", "ENTRYSYS", "ENTRYTYPE", "ENTRYCLASS", "ENTRYSRC", "ENTRYDESC")
    assert [row[name] for name in names] == [
        "1061005091700000",
        os.uname().nodename[:32],
        "T",
        "H",
        "sysplanar0",
        "BFE4C025: UNDETERMINED ERROR",
    ]
    state = Api(agent).logs()[log.path.name]
    assert (state["MONSTATUS"], state["NUMEVENTS"], state["NUMERRORS"]) == ("Running", 4, 1)
    assert agent.stop() == 0


def test_the_command_is_given_the_time_of_its_start(agent, log):
    before = time.strftime("%m%d%H%M%y", time.gmtime())
    start(agent)
    arguments = log.wait_calls(1)[0][1]
    after = time.strftime("%m%d%H%M%y", time.gmtime())
    assert arguments in (f"-c -s{before}", f"-c -s{after}")
    assert agent.stop() == 0


def test_stopping_ends_the_command_and_its_offspring_at_once(agent, log):
    log.errpt(f"echo '{ENTRY}'; sleep 1000 & echo $! > offspring; wait")
    start(agent)
    agent.wait_events(1)
    pids = [pid for pid, _ in log.calls()] + [int((agent.directory / "offspring").read_text())]
    assert not any(has_ended(pid) for pid in pids)
    begin = time.monotonic()
    assert agent.stop() == 0
    assert time.monotonic() - begin < 10
    wait_until(lambda: all(has_ended(pid) for pid in pids), f"the end of {pids}")
    assert agent.trace("has terminated abnormally; signal number = 15")


def test_stopping_does_not_hang_while_the_command_writes_for_ever(agent, log):
    log.errpt(ENDLESS)
    agent.situations.clear()
    agent.situation(log=log, when=["ENTRYDESC contains 'no such text'"])
    agent.listen = "127.0.0.1:0"
    start(agent)
    wait_until(lambda: Api(agent).logs()[log.path.name]["NUMEVENTS"] > 10000, "10000 entries")
    assert agent.stop() == 0
    wait_until(lambda: all(has_ended(pid) for pid, _ in log.calls()), "the command's end")


def test_stopping_waits_for_a_command_that_ignores_the_signal_for_a_while(agent, log):
    log.configure("exec errpt -c -smmddhhmmyy")
    log.errpt("trap '' TERM; while [ ! -e enough ]; do sleep 0.05; done; exit 7")
    start(agent)
    log.wait_calls(1)
    agent.send(SIGTERM)
    agent.wait_trace('issuing "kill -15" to kill child process')
    time.sleep(0.5)
    assert agent.running()
    (agent.directory / "enough").touch()
    assert agent.wait_end() == 0
    assert agent.trace("has terminated normally; exit status = 7")


def test_a_command_that_ends_ends_the_monitor_and_a_refresh_starts_it_again(agent, log):
    agent.listen = "127.0.0.1:0"
    log.errpt(f"echo '{ENTRY}'; exit 3")
    start(agent)
    agent.wait_events(1)
    agent.wait_trace("EOF detected during fgets() system call on pipe")
    agent.wait_trace("has terminated normally; exit status = 3")
    assert Api(agent).logs()[log.path.name]["MONSTATUS"] == "Error: log read failed"
    assert children(agent) == []

    log.errpt()
    log.append(OTHER)
    log.configure()
    agent.refresh()
    assert descriptions(agent.wait_events(2))[1] == "BFE4C025: UNDETERMINED ERROR"
    assert Api(agent).logs()[log.path.name]["MONSTATUS"] == "Running"
    assert agent.stop() == 0


def test_a_command_that_crashes_is_reported_and_reaped(agent, log):
    log.configure("exec errpt -c -smmddhhmmyy")
    log.errpt(f"echo '{ENTRY}'; kill -KILL $$")
    start(agent)
    agent.wait_trace("has terminated abnormally; signal number = 9")
    assert len(agent.wait_events(1)) == 1
    assert children(agent) == []
    assert agent.stop() == 0


def test_a_line_may_come_in_parts(agent, log):
    log.errpt(f"printf '%s' '{ENTRY[:40]}'; sleep 0.3; echo '{ENTRY[40:]}'; exec sleep 1000")
    start(agent)
    assert descriptions(agent.wait_events(1)) == [
        "A924A5FC: SOFTWARE PROGRAM ABNORMALLY TERMINATED"
    ]
    assert agent.stop() == 0


def test_the_shells_complaint_about_a_missing_command_ends_the_monitor(agent, log):
    (log.bin / "errpt").unlink()
    start(agent)
    agent.wait_trace("has terminated normally; exit status = 127")
    assert agent.stop() == 0


def test_removing_a_log_from_the_configuration_ends_its_command(agent, log):
    other = agent.log("app.log")
    start(agent)
    pid = log.wait_calls(1)[0][0]
    assert not has_ended(pid)
    agent.configure(str(other))
    agent.refresh()
    wait_until(lambda: children(agent) == [] and has_ended(pid), "the command's end")
    assert agent.stop() == 0


def test_refreshes_leave_neither_zombies_nor_descriptors(agent, log):
    log.errpt(f"echo '{ENTRY}'; exit")
    start(agent)
    descriptors = Path(f"/proc/{agent.process.pid}/fd")
    agent.wait_trace("has terminated normally; exit status = 0", count=1)
    agent.wait_events(1)  # the history and the sink are open, too
    before = len(list(descriptors.iterdir()))
    for i in range(2, 12):
        log.configure()
        agent.refresh()
        agent.wait_trace("has terminated normally; exit status = 0", count=i)
    assert children(agent) == []
    wait_until(lambda: len(list(descriptors.iterdir())) <= before, "the end of all that was opened")
    assert agent.stop() == 0


def test_the_command_inherits_no_descriptors(agent, log):
    agent.log("app.log")
    agent.listen = "127.0.0.1:0"
    agent.environment["AGENT_DEBUG_LOG"] = str(agent.directory / "debug.log")
    log.errpt("readlink /proc/self/fd/* > open; ls /proc/self/fd > numbers; exec sleep 1000")
    start(agent)
    numbers = agent.directory / "numbers"
    wait_until(lambda: numbers.exists() and numbers.read_text().endswith("\n"), "the list")
    # Standard input, output and error, and the directory that ls reads.
    assert len(numbers.read_text().split()) == 4
    opened = (agent.directory / "open").read_text()
    assert "app.log" not in opened and "debug.log" not in opened and "socket:" not in opened
    assert agent.stop() == 0


def test_a_report_runs_a_command_of_its_own_over_its_window(agent, log):
    agent.listen = "127.0.0.1:0"
    log.errpt(reporting=f"echo '{HEADER}'; echo '{OTHER}'; echo '{ENTRY}'")
    start(agent)
    log.wait_calls(1)
    answer = Api(agent).report(log, "2006-10-05T07:03:09Z", "2006-10-31T23:59:59Z")
    assert descriptions([{"row": row} for row in answer["rows"]]) == [
        "BFE4C025: UNDETERMINED ERROR",
        "A924A5FC: SOFTWARE PROGRAM ABNORMALLY TERMINATED",
    ]
    assert [words for _, words in log.calls("report-calls")] == ["-s1005070306 -e1031235906"]
    agent.wait_trace("Report command errpt -s1005070306 -e1031235906 ( pid = ")
    # The monitor's command is still running.
    assert not has_ended(log.calls()[0][0])
    assert agent.stop() == 0


def test_a_report_that_has_enough_ends_a_command_that_writes_for_ever(agent, log):
    agent.listen = "127.0.0.1:0"
    agent.agent_keys["max_rows"] = 50
    log.errpt(reporting=f"echo '{HEADER}'; {ENDLESS}")
    start(agent)
    answer = Api(agent).report(log, "2006-10-05T07:03:09Z", "2006-10-31T23:59:59Z")
    assert len(answer["rows"]) == 50
    pid = log.calls("report-calls")[0][0]
    wait_until(lambda: has_ended(pid), f"the end of {pid}")
    how = "has terminated abnormally; signal number = 13"
    agent.wait_trace(f"( pid = {pid} ) for file {log} {how}")
    assert agent.stop() == 0


def test_a_report_without_the_program_is_empty_and_hurts_nothing_else(agent, log):
    agent.listen = "127.0.0.1:0"
    start(agent)
    log.append(ENTRY)
    agent.wait_events(1)
    (log.bin / "errpt").unlink()
    answer = Api(agent).report(log, "2006-10-05T07:03:09Z", "2006-10-31T23:59:59Z")
    assert answer["rows"] == []
    message = (
        "Error executing command errpt -s1005070306 -e1031235906 for report on file  "
        f"{log}. errno = 2; No such file or directory.  Use the error number and message to "
        "investigate the failure.  Agent is terminating."
    )
    agent.wait_trace("has terminated normally; exit status = 255")
    assert len(agent.wait_trace(message)) == 1
    # The child did not run the agent's exit routine: the monitor's command is still there.
    log.append(OTHER)
    agent.wait_events(2)
    assert agent.stop() == 0
