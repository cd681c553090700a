"""Log lines for the console's tests."""

import time

from browser.conftest import syslog_line, until

FIELDS = ';N ;U ;A , "%d-%d-%d %d:%d:%d %s %256[^\\n]" , year month day hour minute second type description'
REFUSED_FIELDS = ';N ;U ;A , "%q" , year'
MARKUP = "<img src=x onerror=window.ran=true><script>window.ran=true</script><b>bold</b>"


def failed_login(number, when=None):
    return syslog_line(f"Failed password for root from 203.0.113.{number} port 50122 ssh2", "sshd[2140]", when=when)


def app_entry(text):
    """A line that FIELDS fits."""
    return f"2026-11-20 07:03:09 ERROR {text}\n"


def other_entry(number):
    return syslog_line(f"entry {number} of many", "app[7]")


def history_of(count):
    """Failed logins of the last hours, the newest last, as a log holds them."""
    now = time.time()
    lines = (failed_login(number, time.localtime(now - (count - number) * 60)) for number in range(count))
    return "".join(lines).encode()


def fill_history(agent, log, count):
    """Appends failed logins and waits for their events."""
    before = len(agent.events())
    for number in range(count):
        log.append(failed_login(number))
    until(lambda: len(agent.events()) >= before + count, "the events")


def prepare(agent):
    """A syslog with a situation, a text log, and one whose format cannot be learned."""
    auth = agent.log("auth.log", content=history_of(40))
    app = agent.log("app.log", fields=FIELDS)
    agent.log("broken.log", fields=REFUSED_FIELDS)
    agent.situation("ssh-failed", log=auth, when=["ENTRYSRC starts 'sshd'", "ENTRYDESC contains 'Failed password'"], severity="critical", text="A failed SSH login")
    return auth, app


def logs_agent(agent):
    logs = prepare(agent)
    begin(agent, *logs)
    return logs


def begin(agent, *logs):
    agent.start(wait=False)  # the broken log is never opened
    agent.wait_trace("Agent server is listening; signal sent.")
    for log in logs:
        agent.wait_open(log)
