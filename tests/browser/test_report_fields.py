"""The choice of columns and fields of a report."""

import csv
import io

import pytest
from browser.conftest import harness, until

LINE = '{{"time":"2026-11-20T06:00:0{number}Z","msg":"text {number}","status":{status},"path":"{path}"}}\n'


@pytest.fixture
def agent_with_fields(agent):
    """A log of JSON objects, and one of the log configuration."""
    agent.fielded = harness.Log(agent.directory / "app.log")
    agent.fielded.path.write_text(
        "".join(LINE.format(number=number, status=status, path=path) for number, status, path in ((1, 99, "=a"), (2, 500, "/b"), (3, 1000, "/c")))
    )
    agent.follow(agent.fielded, type="json")
    agent.plain = agent.log("plain.log", content=harness.syslog_line("plain").encode())
    agent.start()
    return agent


def headings(page):
    return [element.text.split(" ")[0] for element in page.driver.find_elements("xpath", "//thead//th")]


def boxes(page, legend):
    """The labels of what can be chosen."""
    return [element.text for element in page.driver.find_elements("xpath", f"//fieldset[legend='{legend}']//label")]


def run_from_2026(page, log, entries):
    page.choose("Log", str(log))
    page.choose("Time", "Other times")
    page.run(
        "for (const [label, value] of [['From', '2026-11-01T00:00:00'], ['To', '2026-12-31T00:00:00']]) {"
        " const control = [...document.querySelectorAll('label')].find((l) => l.textContent === label).control;"
        " control.value = value; }"
    )
    page.run_report(log, entries)


def test_fields_are_chosen_from_those_that_were_seen(page, agent_with_fields):
    log = agent_with_fields.fielded
    page.on(agent_with_fields, "reports")
    page.choose("Log", str(log))
    page.find("//summary[.='Columns and fields']").click()
    until(lambda: {"status", "path"} <= set(boxes(page, "Fields")), "the fields of the log")
    page.control("status").click()
    run_from_2026(page, log, "3 entries")
    assert headings(page) == ["Time", "Description", "status"]
    page.click("status")
    page.click("status ▲")
    cells = [row.split() for row in page.rows("Entries of")]
    assert [row[-1] for row in cells] == ["1000", "500", "99"]  # by number
    page.pictures("report-fields")

    page.control("path").click()
    page.wait_text("Run the report again to read path.")
    page.control("Description").click()
    until(lambda: headings(page) == ["Time", "status"], "the columns to be drawn again")
    run_from_2026(page, log, "3 entries")
    until(lambda: headings(page) == ["Time", "status", "path"], "the new field")
    assert "Run the report again" not in page.text()
    head, *lines = csv.reader(io.StringIO(page.saved("CSV")))
    assert head[:2] == ["ORIGINNODE", "LOGPATH"] and head[-2:] == ["field.status", "field.path"]
    assert [line[-2:] for line in lines] == [["1000", "/c"], ["500", "/b"], ["99", "'=a"]]
    page.click("All columns")
    until(lambda: "ULOGNAME" in headings(page), "all columns")
    page.click("Usual columns")
    until(lambda: "ULOGNAME" not in headings(page), "the usual columns")


def test_a_field_is_typed_and_gone_with_another_log(page, agent_with_fields):
    page.on(agent_with_fields, "reports")
    page.choose("Log", str(agent_with_fields.fielded))
    page.find("//summary[.='Columns and fields']").click()
    until(lambda: "status" in boxes(page, "Fields"), "the fields of the log")
    page.find("//input[@aria-label='Another field to show']").send_keys("field.absent\n")
    until(lambda: "absent" in boxes(page, "Fields"), "the typed field")
    run_from_2026(page, agent_with_fields.fielded, "3 entries")
    assert headings(page) == ["Time", "Description", "absent"]
    page.choose("Log", str(agent_with_fields.plain))
    page.wait_text("No fields were seen in the latest entries of this log.")
    page.choose("Time", "Last 24 hours")
    page.run_report(agent_with_fields.plain, "1 entry")
    assert "absent" not in headings(page)
    page.find("//input[@aria-label='Another field to show']").send_keys("absent\n")
    page.click("Run the report")
    page.wait_text("monitor the log with [[log]]")
