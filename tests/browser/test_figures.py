"""Figures and times that the console shows are those of the agent."""

import csv
import io
import json
import time
from datetime import datetime, timedelta
from zoneinfo import ZoneInfo

import pytest
from browser.conftest import until

from browser.support import app_entry, begin, failed_login, logs_agent, prepare, syslog_line

# One that the machine of the test does not have.
ZONE = "Asia/Kathmandu" if time.localtime().tm_gmtoff != 20700 else "Asia/Kolkata"


def counted(page, log):
    """The entries and events of a log per minute, by the API."""
    answer = page.api.request("GET", f"/api/v1/rates?log={log}")[2]
    return answer["logs"][0]


def cell(page, log, column):
    """What the table of logs has of a log."""
    row = page.find(f"//tbody/tr[.//a[.='{log}']]")
    return row.find_element("css selector", f"td[data-label='{column}']").text


# ---------------------------------------------------------------------- rates


def test_the_chart_has_the_values_of_the_rates(page, agent):
    auth, _ = logs_agent(agent)
    page.on(agent)
    auth.append("".join(failed_login(number) for number in range(7)))
    until(lambda: len(agent.events()) >= 7, "the events")
    until(lambda: sum(filter(None, counted(page, auth)["events"])) == 7, "the counts")
    page.open_log(auth)
    chart = "const chart = window.Chart?.getChart(document.querySelector('canvas'));"
    until(lambda: page.run(chart + "return Boolean(chart)"), "the chart")
    entries, events = page.run(chart + "return chart.data.datasets.map(({data}) => data)")
    kept = counted(page, auth)  # of a window that may begin a minute later
    assert list(filter(None, events)) == list(filter(None, kept["events"])) and sum(filter(None, events)) == 7
    assert len(entries) == len(events) and entries[-1] is None  # those of a minute are counted at its end
    text = page.find("//canvas").get_attribute("aria-label")
    assert "Events: 7 in all, at most" in text
    assert text.split(". ", 1)[1] in page.text()


def test_the_rate_of_entries_needs_no_history(page, agent, fast_polls):
    agent.history = {"enabled": False}
    auth, app = logs_agent(agent)
    page.on(agent)
    until(lambda: cell(page, app, "Entries/min") == "0", "the rate of a quiet log")
    auth.append("".join(failed_login(number) for number in range(500)))
    until(lambda: cell(page, auth, "Entries/min") not in ("–", "0"), "the rate")
    assert cell(page, auth, "Entries") == "500"


# ---------------------------------------------------------------------- what was raised


def test_a_loud_situation_does_not_hide_the_others(page, agent):
    auth, app = prepare(agent)
    agent.situation("loud", log=app)
    begin(agent, auth, app)
    auth.append(failed_login(1))
    until(lambda: len(agent.events()) == 1, "the event")
    app.append("".join(app_entry(f"number {number}") for number in range(30)))
    until(lambda: len(agent.events()) == 31, "the events")
    page.on(agent)
    page.wait_text("× 30")
    lately = page.find("//section[@aria-label='Recent events']")
    rows = [row.text for row in lately.find_elements("css selector", "li")]
    assert len(rows) == 2 and "number 29" in rows[0] and "ssh-failed" in rows[1]


def test_the_preview_says_what_happens(page, agent):
    auth, _ = prepare(agent)
    when = ["ENTRYDESC contains 'Failed password'"]
    agent.situation("burst", log=auth, when=when, frequency=">= 5", period="1h")
    begin(agent, auth)
    page.on(agent, "situations?new")
    page.type("Name", "same")
    page.choose("Log", str(auth))
    page.condition("Failed password")
    page.find("//label[contains(., 'Raise depending')]/input").click()
    control = page.find("//input[@aria-label='Period']")
    control.clear()
    control.send_keys("1")
    page.pick("Unit of the period", "hours")
    page.wait_text("Would have been raised")
    verdict = "//section[@aria-label='Preview']//p[@class='verdict']"
    times = lambda: int(page.text_of(verdict).split()[4])
    # The page asks after each change of the form. Of the 40 entries, four come before the fifth.
    until(lambda: times() == 36, "the preview of the whole form")
    auth.append("".join(failed_login(number) for number in range(9)))
    raised = lambda: page.api.request("GET", "/api/v1/situations/burst")[2]["counts"]
    until(lambda: raised()["matched"] == 9, "the entries")
    assert raised()["raised"] == 5  # the agent saw nothing of the hour before its start
    page.type("Text", "asks again")
    # The log has 40 entries of the last 40 minutes in front.
    until(lambda: times() == 36 + 9, "the preview")


# ---------------------------------------------------------------------- reports


def test_downloads_hold_every_value_as_it_is(page, agent):
    odd = ['quoted "word", and comma', "=1+1", "ünï → 日本", "<b>bold</b>"]
    lines = "".join(syslog_line(text) for text in odd)
    auth = agent.log("odd.log", content=lines.encode())
    agent.start()
    page.on(agent, "reports")
    page.run_report(auth, "4 entries")
    rows = json.loads(page.saved("JSON"))
    assert [row["UENTRYDESC"] for row in reversed(rows)] == odd
    table = list(csv.DictReader(io.StringIO(page.saved("CSV"))))
    as_text = [{name: str(value) for name, value in row.items()} for row in rows]
    # A spreadsheet must not calculate what a log says.
    for row in as_text:
        for name, value in row.items():
            row[name] = f"'{value}" if value.startswith("=") else value
    assert table == as_text


@pytest.fixture
def far_away(driver):
    driver.execute_cdp_cmd("Emulation.setTimezoneOverride", {"timezoneId": ZONE})
    yield
    driver.execute_cdp_cmd("Emulation.setTimezoneOverride", {"timezoneId": ""})


def test_a_report_from_another_time_zone(page, agent, far_away):
    now = time.time()
    lines = "".join(failed_login(hours, time.localtime(now - hours * 3600 - 60)) for hours in (5, 3, 1))
    log = agent.log("auth.log", content=lines.encode())
    agent.start()
    page.on(agent, "reports")
    page.wait_text("entries show the local time of the agent's machine")
    page.pictures("report-zone")
    # Two to four hours ago, on this browser's clock.
    there = datetime.fromtimestamp(now, ZoneInfo(ZONE))
    for label, hours in (("From", 4), ("To", 2)):
        page.run(
            "arguments[0].value = arguments[1]; arguments[0].dispatchEvent(new Event('input'))",
            page.control(label),
            (there - timedelta(hours=hours)).strftime("%Y-%m-%dT%H:%M:%S"),
        )
    page.run_report(log, "1 entry")
    assert "203.0.113.3 " in page.text()


def test_every_column_sorts(page, agent):
    content = "".join(f"{day} {name}\n" for day, name in ((3, "b"), (1, "c"), (2, "a")))
    log = agent.log("app.log", content=content.encode(), fields=';N ;U ;A , "%d %s" , day source')
    agent.start()
    page.on(agent, "reports")
    page.choose("Time", "Other times")
    page.run("arguments[0].value = '1980-01-01T00:00'", page.control("From"))
    page.run_report(log, "3 entries")
    column = lambda: [one.text for one in page.all("td[data-label='Source']")]
    orders = []
    for _ in range(2):
        page.click("Source ▲" if orders else "Source")
        orders.append(column())
    assert orders == [["a", "b", "c"], ["c", "b", "a"]]
    assert page.run("return document.activeElement.textContent") == "Source ▼"
    page.size(360)  # cards have no head; what sorts them stays in sight
    page.click("Time")
    until(lambda: page.find("//th[@aria-sort='ascending']/button"), "the order")
    shown = page.run("const r = document.activeElement.closest('thead').getBoundingClientRect(); return [r.width > 200, r.height > 20]")
    assert shown == [True, True] and column() == ["c", "a", "b"]
    page.pictures("report-sorted")
