"""Forms that take more than fields: a format on lines, and conditions as text."""

from pathlib import Path

import pytest
from browser.conftest import until

from browser.support import FIELDS, app_entry, logs_agent


# ---------------------------------------------------------------------- try a format


def test_the_last_lines_of_a_log_are_taken(page, agent):
    auth, app = logs_agent(agent)
    empty = agent.log("empty.log", content=b"")
    app.append("".join(app_entry(f"number {number}") for number in range(15)))
    agent.refresh()
    agent.wait_open(empty)
    page.on(agent, "try")
    page.wait_text("100% of the lines fit")
    page.type("Format", FIELDS.removeprefix(";N ;U ;"))
    page.pick("How many lines", "10")
    page.pick("Log", str(app))
    page.click("Take them")
    page.wait_text("10 of 10 lines")
    assert page.control("Lines").get_attribute("value").splitlines() == [app_entry(f"number {n}").strip() for n in range(5, 15)]
    until(lambda: page.text_of("//*[@aria-label='Configuration line']") == f"{app} {FIELDS}", "the configuration line")
    page.pictures("try-taken")
    page.type("Format", 'A , "%q" , year')
    page.click("Take them")
    page.wait_text("The format cannot be used")
    page.type("Format", FIELDS.removeprefix(";N ;U ;"))
    page.wait_text("10 of 10 lines")
    page.pick("Log", str(empty))
    page.click("Take them")
    page.wait_text("This log has no lines yet.")
    until(lambda: str(empty) in page.text_of("//*[@aria-label='Configuration line']"), "the configuration line")
    assert "of the lines fit" not in page.text()
    app.path.unlink()
    page.pick("Log", str(app))
    page.click("Take them")
    until(lambda: page.control("Lines").get_attribute("aria-invalid") == "true" and "no lines yet" not in page.text(), "the problem")
    page.pictures("try-no-file")


def test_the_format_that_fits_is_suggested(page, agent):
    agent.formats = Path(__file__).resolve().parents[2] / "formats"
    logs_agent(agent)
    page.on(agent, "try")
    page.type("Lines", '203.0.113.7 - - [19/Nov/2026:10:00:00 +0100] "GET / HTTP/1.1" 200 5 "-" "curl"\nbroken')
    page.click("Which format fits?")
    page.wait_text("50% of the lines fit")
    assert "format = 'nginx-access'" in page.text() or "format = 'apache-access'" in page.text()
    page.wait_text("0 of 2 lines")  # the format that is typed is tried as well
    assert "50% of the lines fit" in page.text()
    page.pictures("try-suggested")
    page.type("Lines", "Lorem ipsum")
    page.click("Which format fits?")
    page.wait_text("No format fits")


@pytest.mark.parametrize("permission", ["granted", "denied"])
def test_the_configuration_line_is_copied(page, agent, permission):
    logs_agent(agent)
    for name in ("clipboard-read", "clipboard-write"):
        page.driver.execute_cdp_cmd("Browser.setPermission", {"permission": {"name": name}, "setting": permission})
    try:
        page.on(agent, "try")
        line = page.text_of("//*[@aria-label='Configuration line']")
        page.click("Copy")
        if permission == "granted":
            page.wait_text("Copied.")
            copied = page.driver.execute_async_script("navigator.clipboard.readText().then(arguments[0], (e) => arguments[0](String(e)))")
        else:
            page.wait_text("Selected; copy it with the keyboard.")
            copied = page.run("return getSelection().toString()")
        assert copied == line and ' , "' in line
    finally:
        page.driver.execute_cdp_cmd("Browser.resetPermissions", {})


# ---------------------------------------------------------------------- conditions as text


def test_conditions_that_fields_cannot_hold_are_edited_as_text(page, agent):
    auth, _ = logs_agent(agent)
    page.on(agent)
    when = ["ENTRYTYPE = ''", "ENTRYSRC in ['a,b', 'c']", "ENTRYSYS in ['web1', 'web2']", "ENTRYDESC contains 'it''s'"]
    kept = {"labels": {"team": "web"}, "group_by": ["ENTRYSYS"], "max_groups": 7, "distinct": "ENTRYSRC", "then": "ENTRYSYS=web1", "cooldown": "1h"}
    body = {"name": "by-hand", "text": "Kept", "severity": "minor", "log": str(auth), "when": when, "frequency": ">= 2", "period": "60s", **kept}
    status, _, answer = page.api.request("POST", "/api/v1/situations", body)
    assert status == 201, answer

    def stored():
        return page.api.request("GET", "/api/v1/situations/by-hand")[2]

    page.open("situations?edit=by-hand")
    page.heading("Edit by-hand")
    texts = page.all("input[aria-label='Condition']")
    assert [one.get_attribute("value") for one in texts] == when[:2]
    page.choose("Severity", "major")
    page.click("Save changes")
    page.heading("by-hand")
    assert (stored()["when"], stored()["severity"]) == (when, "major")
    assert {key: stored()[key] for key in kept} == kept, "what the form does not show"
    page.click("Edit by-hand")
    page.heading("Edit by-hand")
    text = page.find("(//input[@aria-label='Condition'])[2]")
    text.send_keys(" or")
    page.wait_text("Correct what is marked")
    assert text.get_attribute("aria-invalid") == "true"
    page.pictures("situation-text")
    text.clear()
    text.send_keys("ENTRYSRC in ['a,b']")
    until(lambda: text.get_attribute("aria-invalid") is None, "the mark to go")
    page.click("Save changes")
    page.heading("by-hand")
    assert stored()["when"] == [when[0], "ENTRYSRC in ['a,b']", *when[2:]]


def test_a_situation_of_any_log_is_explained_and_edited(page, agent):
    auth, app = logs_agent(agent)
    page.on(agent)
    body = {"name": "anywhere", "text": "", "severity": "minor", "log": None, "when": ["ENTRYDESC contains 'declined'"]}
    assert page.api.request("POST", "/api/v1/situations", body)[0] == 201
    page.open("situations?name=anywhere")
    page.wait_text("any log")
    page.choose("Log it comes from", str(app))
    page.type("Line", app_entry("declined").strip())
    page.click("Explain")
    page.wait_text("Would be raised")
    page.click("Edit anywhere")
    page.heading("Edit anywhere")
    page.wait_text("Would have been raised 0 times in the last 24 hours")
    page.choose("Severity", "major")
    page.click("Save changes")
    page.heading("anywhere")
    page.wait_text("major")
    assert page.api.request("GET", "/api/v1/situations/anywhere")[2]["log"] is None
    page.open("situations?new")
    page.type("Name", "new")
    page.wait_text("Choose a log to see what it would have done.")
    assert "Log it comes from" not in page.text()
    page.choose("Log", "Any log")
    page.wait_text("Log it comes from")
    page.choose("Log", str(auth))
    until(lambda: "Log it comes from" not in page.text(), "the log of the line to go")


def test_groups_are_kept_when_a_situation_is_edited_and_absence_is_set(page, agent):
    auth, _ = logs_agent(agent)
    page.on(agent)
    body = {"name": "grouped", "text": "", "severity": "minor", "log": str(auth), "group_by": ["ENTRYSYS"], "max_groups": 7}
    assert page.api.request("POST", "/api/v1/situations", body)[0] == 201
    page.open("situations?edit=grouped")
    page.heading("Edit grouped")
    page.type("Missed after", "soon")
    page.wait_text("'soon' is not a duration")
    page.type("Missed after", "25h")
    page.wait_text("Would have been raised 0 times in the last 24 hours")
    page.click("Save changes")
    page.heading("grouped")
    page.wait_text("raised when none has come for 25h")
    page.wait_text("ENTRYSYS")
    stored = page.api.request("GET", "/api/v1/situations/grouped")[2]
    assert (stored["absent"], stored["group_by"], stored["max_groups"]) == ("25h", ["ENTRYSYS"], 7)
