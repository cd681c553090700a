"""What the views say when something is off, refused, wrong, or cut short."""

import http.client
import json
from contextlib import ExitStack
from signal import SIGCONT, SIGSTOP
from urllib.parse import quote

from browser.conftest import until

from browser.support import FIELDS, app_entry, begin, failed_login, logs_agent

MOST_CLIENTS = 32


# ---------------------------------------------------------------------- history off


def test_without_a_history_the_views_say_so_and_what_to_do(page, agent):
    agent.history = {"enabled": False}
    auth, _ = logs_agent(agent)
    page.on(agent)
    page.wait_text("The history is off, so events are not kept. Set enabled = true under [history].")
    assert "auth.log" in page.text()
    page.pictures("logs-history-off")
    page.open_log(auth)
    page.wait_text("The history is off, so rates are not kept. Set enabled = true under [history].")
    page.wait_text("Monitored since")
    page.open("events")
    page.wait_text("Set enabled = true under [history]")
    assert page.text_of("//*[@class='state bad']") == "History off"
    page.pictures("events-history-off")


# ---------------------------------------------------------------------- too many clients


def test_a_full_stream_says_so_and_goes_live_when_there_is_room(page, agent, fast_polls):
    auth, _ = logs_agent(agent)
    page.on(agent)
    page.wait_text("Connected")
    with ExitStack() as others:
        for _ in range(MOST_CLIENTS):
            client = http.client.HTTPConnection("127.0.0.1", page.api.port, timeout=10)
            others.callback(client.close)
            client.request("GET", "/api/v1/events/stream", headers={"Authorization": f"Bearer {page.token}"})
            answer = client.getresponse()
            others.callback(answer.close)
            assert answer.status == 200
        page.go("Events")
        page.wait_text("New events do not appear by themselves: too many clients are following the events: at most 32.")
        page.wait_text("Not live; next try in")
        page.pictures("events-full")
    page.wait_live(30)
    assert "too many clients" not in page.text()
    auth.append(failed_login(1))
    page.wait_text("203.0.113.1")


# ---------------------------------------------------------------------- reports


def test_a_report_is_cancelled_and_run_again(page, agent):
    auth, _ = logs_agent(agent)
    page.on(agent, "reports")
    page.choose("Log", str(auth))
    page.wait_text("Connected")
    agent.send(SIGSTOP)
    try:
        page.click("Run the report")
        page.wait_text("Reading the log, 1 s")
        page.pictures("report-running")
        page.click("Run the report")  # the first run ends silently
        page.wait_text("Reading the log, 1 s")
        page.click("Cancel")
        page.wait_text("Cancelled")
        assert "Reading the log" not in page.text()
    finally:
        agent.send(SIGCONT)
    page.run_report(auth, "40 entries")


def test_a_report_is_saved_as_json(page, agent):
    auth, _ = logs_agent(agent)
    page.on(agent, "reports")
    page.run_report(auth, "40 entries")
    rows = json.loads(page.saved("JSON"))
    assert len(rows) == 40
    assert rows[0]["LOGNAME"] == "auth.log" and "Failed password" in rows[0]["ENTRYDESC"]


# ---------------------------------------------------------------------- a log's page


def test_a_log_shows_rejected_lines_and_skipped_ranges(page, agent):
    app = agent.log("app.log", content=app_entry("before the start").encode() * 20, fields=FIELDS)
    begin(agent, app)
    page.on(agent)
    app.append(app_entry("fits") + "this does not fit\n" + "2026-11-20 07:03:09\n")
    counts = "//tbody/tr[contains(., 'app.log')]/td[@data-label='{}']"
    until(lambda: page.text_of(counts.format("Rejected")) == "2", "the count of rejected lines")
    assert page.text_of(counts.format("Entries")) == "1"  # a rejected line is not an entry

    def ledger():
        return page.api.request("GET", f"/api/v1/logs?log={quote(str(app))}")[2]["logs"][0]["ledger"]

    until(lambda: ledger()["format_errors"] == 2, "the rejected lines")
    page.open_log(app)
    page.wait_text("2 lines do not fit the format")
    assert "Open the log" not in page.text()
    page.wait_text("in 3 lines")

    rows = page.rows("Rejected lines")
    assert len(rows) == 2 and "this does not fit" in rows[1]
    assert "A number for %d is expected here." in rows[1]
    assert "Skipped by truncations" not in page.text()
    app.path.write_bytes(app_entry("written at once").encode() * 3)  # shorter than it was
    size = app.path.stat().st_size
    until(lambda: ledger()["truncations"] == 1, "the truncation")
    page.driver.refresh()
    page.wait_text("Skipped by truncations")
    assert len(page.rows("Skipped ranges")) == 1
    assert f" {size} unknown found while it was shorter" in page.rows("Skipped ranges")[0]
    page.pictures("log-ledger")


def test_a_log_that_cannot_be_shown_says_why(page, agent):
    logs_agent(agent)
    page.on(agent)
    page.open_log(agent.directory / "broken.log")
    page.wait_text("The format of this log cannot be used")
    assert page.text_of("//*[@class='state bad']") == "Error"
    page.pictures("log-error")
    page.open_log(agent.directory / "other.log")
    page.wait_text("This log is not monitored")
    assert "last 24 hours" not in page.text() and "Rejected" not in page.text()
    page.pictures("log-not-monitored")


def test_a_log_keeps_its_state_over_a_lost_connection(page, agent, fast_polls):
    logs = logs_agent(agent)
    page.on(agent)
    page.open_log(logs[0])
    page.wait_text("Monitored since")
    page.lose(agent)
    asked = "return performance.getEntriesByType('resource').filter((one) => one.name.includes('/logs?log=')).length"
    before = page.run(asked)
    until(lambda: page.run(asked) >= before + 2, "two more questions")
    assert "Monitored since" in page.text() and "That did not work" not in page.text() and "does not answer" not in page.text()
    page.find("//nav//a[normalize-space()='Situations']").click()  # not even its module comes
    page.wait_text("The agent does not answer")
    begin(agent, *logs)
    page.wait_text("ssh-failed", 40)
    page.expect_complaints()


# ---------------------------------------------------------------------- long paths

# Gives each element in sight that goes beyond its panel or the window.
BEYOND = """
return [...document.querySelectorAll('main *')].filter((e) => {
  if (!e.checkVisibility() || e.closest('.unseen, svg, thead, select, [role=listbox]')) return false;
  const panel = e.closest('.panel');
  const limit = Math.min(innerWidth, panel ? panel.getBoundingClientRect().right : innerWidth);
  return e.getBoundingClientRect().right > limit + 1;
}).map((e) => `${e.tagName}.${e.className} ${e.textContent.slice(0, 60)}`);
"""


def test_long_paths_wrap_on_a_narrow_screen(page, agent):
    name = "application-server-of-the-payments/instances/production-europe-west/" + "x" * 60 + "/transactions_and_settlements.log"
    (agent.directory / name).parent.mkdir(parents=True)
    log = agent.log(name, fields=FIELDS)
    agent.situation("declined", log=log, severity="major")
    agent.start()
    log.append(app_entry("declined"))
    until(agent.events, "the event")
    page.on(agent)
    views = {"logs": "Recent events", "situations": "declined", "situations?name=declined": "Events of this situation", "reports": "Run the report", "try": "of the lines fit"}
    views[f"logs?log={quote(str(log))}"] = "Monitored since"
    for view, text in views.items():
        page.open(view)
        page.wait_text(text)
        page.find("//h1")
        for width in (360, 800, 1280):
            page.size(width)
            page.settle()
            assert page.run(BEYOND) == [], f"{view} at {width}"
    page.open("logs")
    page.wait_text("transactions_and_settlements.log")
    page.pictures("logs-long-path")
    page.open_log(log)
    page.wait_text("Monitored since")
    page.pictures("log-long-path")
    page.open("events")
    page.find("//*[@role='option']").click()
    page.wait_text("ORIGINNODE")
    page.size(360)
    assert page.run(BEYOND) == []


def test_a_situation_that_is_not_there_says_so(page, agent):
    logs_agent(agent)
    page.on(agent)
    for view in ("situations?name=gone", "situations?edit=gone"):
        page.open(view)
        page.wait_text("No situation is called gone.")
        page.click("All situations")
        page.heading("Situations")
    page.expect_complaints()


# ---------------------------------------------------------------------- configured, and not monitored


def test_a_log_that_is_not_monitored_says_why_until_it_is(page, agent, fast_polls):
    auth, _ = logs_agent(agent)
    missing = agent.directory / "missing.log"
    agent.configure(f"{missing} ;N ;S", "relative.log", append=True)
    page.on(agent)
    page.wait_text("3 in trouble")
    row = page.text_of(f"//tbody/tr[contains(., '{missing}')]")
    assert "Not read" in row and "No such file or directory. Create the file, or correct the path." in row
    assert "Correct line 5 of the log configuration." in page.text_of("//tbody/tr[contains(., 'relative.log')]")
    assert str(agent.logs_conf) in page.text()
    page.pictures("logs-not-monitored")
    page.open_log(missing)
    page.wait_text("It is on line 4 of the log configuration.")
    assert "last 24 hours" not in page.text()
    page.pictures("log-not-read")
    page.go("Logs")
    missing.write_text("")
    page.wait_text("The agent has not read this line yet.")
    page.click("Re-read configuration")
    page.wait_text("An unchanged file changes nothing.")
    agent.configure(append=True)  # touched
    page.click("Re-read configuration")
    page.wait_text("2 in trouble")
    assert "Running" in page.text_of(f"//tbody/tr[contains(., '{missing}')]")
    agent.logs_conf.unlink()
    page.wait_text(f"The log configuration {agent.logs_conf} cannot be read: No such file or directory.")
    page.pictures("logs-no-configuration")


# ---------------------------------------------------------------------- another agent behind the same address


def test_events_begin_anew_with_a_new_history(page, agent, fast_polls):
    auth, app = logs_agent(agent)
    page.on(agent, "events")
    page.wait_live()
    for number in (1, 2):
        auth.append(failed_login(number))
    page.wait_text("203.0.113.2")
    page.lose(agent)
    for file in (agent.directory / "state").glob("history.db*"):
        file.unlink()
    begin(agent, auth, app)
    auth.append(failed_login(3))
    page.wait_text("203.0.113.3", 40)
    until(lambda: "203.0.113.2" not in page.text(), "the events of before to go")
    assert len(page.all("[role=option]")) == 1
    page.expect_complaints()


def test_a_new_token_is_asked_for_and_the_view_goes_on(page, agent, fast_polls):
    logs = logs_agent(agent)
    page.on(agent, "situations?name=ssh-failed")
    page.wait_text("Events of this situation")
    page.lose(agent)
    token = agent.directory / "state/api-token"
    token.unlink()
    begin(agent, *logs)
    page.wait_text("The agent refused this token", 40)
    assert page.run("return document.activeElement.type") == "password"
    page.type("API token", token.read_text().strip())
    page.click("Open the console")
    page.heading("ssh-failed")
    page.wait_text("Events of this situation")
    page.expect_complaints()
