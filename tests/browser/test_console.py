"""Every view used as a person would, on the real agent."""

import json
import re
import time

from browser.conftest import until
from conftest import Log
from selenium.webdriver.common.by import By
from selenium.webdriver.common.keys import Keys

from browser.support import MARKUP, begin, failed_login, fill_history, logs_agent, other_entry, syslog_line

FIRST_VIEW_BYTES = 100_000


# ---------------------------------------------------------------------- token and frame


def test_the_token_leaves_the_address_and_lasts_for_the_session(page, agent):
    logs_agent(agent)
    page.on(agent)
    page.heading("Logs")
    assert page.token not in page.driver.current_url
    page.driver.refresh()
    page.heading("Logs")
    page.wait_text("auth.log")


def test_without_a_token_the_page_asks_and_a_wrong_one_is_refused(page, agent):
    logs_agent(agent)
    page.on(agent)
    page.heading("Logs")
    page.run("sessionStorage.clear()")
    page.driver.get("about:blank")
    page.open(token=False)
    page.type("API token", "wrong")
    page.click("Open the console")
    page.wait_text("The agent refused this token")
    page.pictures("token")
    page.type("API token", page.token)
    page.click("Open the console")
    page.wait_text("auth.log")
    page.expect_complaints()


def test_the_first_view_is_small_and_runs_only_files_of_its_own(page, agent):
    logs_agent(agent)
    page.on(agent)
    page.wait_text("auth.log")
    loaded = page.run(
        "return performance.getEntriesByType('resource').concat(performance.getEntriesByType('navigation'))"
        ".map((one) => [one.name, one.decodedBodySize])"
    )
    files = {name: size for name, size in loaded if "/console/" in name or name.endswith("/")}
    assert len(files) > 5 and sum(files.values()) < FIRST_VIEW_BYTES, files
    assert not any("chart.js" in name for name in files)
    page.run("const s = document.createElement('script'); s.textContent = 'window.ran = true'; document.body.append(s)")
    assert page.run("return window.ran") is None
    assert any("Content Security Policy" in message for message in page.console_errors())


def test_a_lost_connection_shows_and_comes_back(page, agent, fast_polls):
    logs = logs_agent(agent)
    page.on(agent)
    page.wait_text("Connected")
    page.lose(agent)
    page.pictures("connection-lost")
    begin(agent, *logs)
    page.wait_text("The connection to the agent is back", 40)
    until(lambda: "is lost" not in page.text(), "the banner to go")
    page.expect_complaints()


def test_a_tab_opened_from_another_has_its_token(page, agent):
    auth, _ = logs_agent(agent)
    page.on(agent)
    page.wait_text("auth.log")
    first = page.driver.current_window_handle
    page.driver.switch_to.new_window("tab")
    try:
        page.driver.get(f"{page.address}#/logs?log={auth}")
        page.wait_text("Monitored since")
    finally:
        page.driver.close()
        page.driver.switch_to.window(first)
    page.wait_text("auth.log")


def test_the_way_back_leads_to_what_was_seen(page, agent):
    logs_agent(agent)
    page.on(agent)
    page.wait_text("auth.log")
    page.go("Events")
    page.choose("Severity", "critical")
    until(lambda: "severity=critical" in page.driver.current_url, "the filter in the address")
    page.go("Situations")
    page.driver.back()
    page.heading("Events")
    until(lambda: page.control("Severity").get_attribute("value") == "critical", "the filter")
    page.driver.refresh()
    until(lambda: page.control("Severity").get_attribute("value") == "critical", "the filter")
    page.driver.back()
    page.heading("Logs")
    page.driver.forward()
    page.heading("Events")


# ---------------------------------------------------------------------- logs


def test_logs_tell_trouble_first_and_why(page, agent, fast_polls):
    _, app = logs_agent(agent)
    app.append("2026-11-20 07:03:09 ERROR fine\nthis does not fit\n")
    page.on(agent)
    page.wait_text("1 in trouble")
    page.wait_text("The format of this log cannot be used")
    page.wait_text("1 line does not fit the format")
    first = page.text_of("//table//tbody/tr[1]")
    assert "broken.log" in first and "Error" in first
    page.pictures("logs")
    page.find("//input[@aria-label='Find a log']").send_keys("auth")
    until(lambda: len(page.all("tbody tr")) == 1, "one log")


def test_a_log_shows_its_state_and_rates(page, agent):
    auth, _ = logs_agent(agent)
    fill_history(agent, auth, 5)
    page.on(agent)
    until(lambda: page.find("//a[contains(@href, 'auth.log')]").click() or True, "a click on the log")
    page.heading(str(auth))
    page.wait_text("Monitored since")
    until(lambda: page.all("canvas"), "the chart")
    until(lambda: page.run("return typeof window.Chart") == "function", "the chart library")
    page.pictures("log")


def test_200_logs_stay_readable(page, agent):
    for number in range(200):
        agent.log(f"service-{number:03}.log")
    agent.start(wait=False)
    agent.wait_trace("Agent server is listening; signal sent.")
    page.on(agent)
    page.wait_text("200 running")
    until(lambda: len(page.all("tbody tr")) == 200, "200 rows")
    page.pictures("logs-200")


def test_no_log_says_what_to_do(page, agent):
    agent.configure("# none yet")
    agent.start(wait=False)
    agent.wait_trace("Agent server is listening; signal sent.")
    page.on(agent)
    page.wait_text("No log is monitored")
    page.pictures("logs-empty")
    for view, text in (("events", "No events yet"), ("situations", "No situations yet"), ("reports", "No log is monitored")):
        page.open(view)
        page.wait_text(text)
        page.pictures(f"{view}-first")


# ---------------------------------------------------------------------- events


def test_events_come_live_pause_and_open(page, agent):
    auth, _ = logs_agent(agent)
    page.on(agent, "events")
    page.wait_text("No events yet")
    page.pictures("events-empty")
    page.wait_live()
    auth.append(failed_login(1))
    page.wait_text("Failed password for root from 203.0.113.1")
    page.click("Pause")
    auth.append(failed_login(2))
    page.wait_text("Resume (1 new event)")
    assert "203.0.113.2 " not in page.text()
    page.find("//button[contains(., 'Resume')]").click()
    page.wait_text("203.0.113.2")
    rows = page.find("//*[@role='listbox']")
    rows.send_keys(Keys.ARROW_DOWN)
    page.wait_text("ORIGINNODE")
    assert len(page.all("aside dt.mono")) == 18
    page.click("Why was it raised?")
    page.wait_text("ENTRYSRC starts 'sshd'")
    page.pictures("events")


def test_events_resume_where_they_were_after_a_lost_connection(page, agent, fast_polls):
    auth, app = logs_agent(agent)
    page.on(agent, "events")
    page.wait_live()
    auth.append(failed_login(1))
    page.wait_text("203.0.113.1")
    page.lose(agent)
    page.wait_text("Not live")
    begin(agent, auth, app)
    auth.append(failed_login(2))
    page.wait_text("203.0.113.2", 60)
    assert page.text().count("203.0.113.1 ") == 1
    page.expect_complaints()


def test_fields_are_asked_for_and_an_event_shows_its_entry(page, agent):
    log = Log(agent.directory / "followed.log")
    log.path.write_text("")
    agent.follow(log, start="beginning")
    agent.listen = "127.0.0.1:0"
    agent.start()
    page.on(agent, "situations")
    page.click("New situation")
    page.type("Name", "high-pid")
    page.choose("Log", str(log))
    page.type("Entries before it", "1")
    page.click("Add a condition")
    group = "//*[@role='group' and @aria-label='Condition']"
    page.find(f"{group}//select[@aria-label='Column']/option[.='Field']").click()
    page.find(f"{group}//input[@aria-label='Field']").send_keys("pid")
    page.find(f"{group}//select[@aria-label='Operator']/option[.='more than']").click()
    page.find(f"{group}//input[@aria-label='Value']").send_keys("99.5")
    page.click("Create situation")
    page.heading("high-pid")
    page.wait_text("field.pid > 99.5")
    page.click("Edit high-pid")
    page.heading("Edit high-pid")
    assert page.find(f"{group}//input[@aria-label='Field']").get_attribute("value") == "pid"
    page.click("Save changes")
    page.heading("high-pid")
    log.append(syslog_line("before it", "app[7]") + syslog_line("x" * 300 + " the end", "app[100]"))
    page.go("Events")
    page.wait_text("high-pid")
    page.find("//*[@role='option']").click()
    page.wait_text("the end")
    assert "app[7]: before it" in page.text()
    page.pictures("event-with-fields")


def test_markup_in_a_log_line_stays_text(page, agent):
    auth, _ = logs_agent(agent)
    page.on(agent, "events")
    page.wait_live()
    auth.append(syslog_line(f"Failed password {MARKUP}", "sshd[1]"))
    page.wait_text(MARKUP)
    page.find("//*[@role='option']").click()
    page.wait_text("ORIGINNODE")
    assert page.run("return window.ran") is None
    assert page.all("main img, main script, main b") == []


def test_what_steers_text_is_shown_and_not_obeyed(page, agent):
    auth, _ = logs_agent(agent)
    page.on(agent, "events")
    page.wait_live()
    auth.append(syslog_line("Failed password for \u202etoor\u2066 \u009b31m\x1b[0m\x7f", "sshd[1]"))
    page.wait_text("Failed password for \\u202etoor\\u2066 \\u009b31m\\u001b[0m\\u007f")
    assert not set(page.run("return document.body.textContent")) & set("\u202e\u2066\u009b\x1b\x7f")


def test_events_are_filtered(page, agent):
    auth, _ = logs_agent(agent)
    for number in (1, 2):
        auth.append(failed_login(number))
    agent.wait_events(2)
    page.on(agent, "events")
    page.wait_text("203.0.113.2")
    page.type("Text", "113.1")
    until(lambda: len(page.all("[role=option]")) == 1, "one event")
    page.type("Text", " ")
    page.choose("Severity", "info")
    page.wait_text("No event in the history matches the filter.")
    page.click("Show all events")
    page.wait_text("203.0.113.2")
    assert "severity" not in page.driver.current_url


def test_ten_thousand_live_events_do_not_slow_the_page(page, agent):
    auth = agent.log("auth.log")
    agent.situation("every", log=auth)
    agent.sink = str(agent.directory / "events.jsonl")
    agent.start()
    page.on(agent, "events")
    page.wait_live()
    page.run(
        "window.longest = 0; let last = performance.now();"
        "const beat = () => { const now = performance.now(); window.longest = Math.max(window.longest, now - last); last = now; setTimeout(beat, 20); }; beat();"
    )
    auth.append("".join(other_entry(number) for number in range(10_000)))
    until(lambda: "10,0" in page.text() or "9,9" in page.text() or "10,000" in page.text(), "10,000 events", 60)
    page.wait_text("entry 9999")
    assert len(page.all("[role=option]")) < 80
    assert page.run("return window.longest") < 2000
    begin = time.monotonic()
    page.run("document.querySelector('.windowed').scrollTop = 150000")
    page.wait_text("entry 46")
    assert time.monotonic() - begin < 3


# ---------------------------------------------------------------------- situations


def test_a_situation_is_made_changed_stopped_started_and_deleted(page, agent, fast_polls):
    auth, _ = logs_agent(agent)
    page.on(agent, "situations")
    page.wait_text("ssh-failed")
    page.pictures("situations")
    page.click("New situation")
    page.type("Name", "root-login")
    page.choose("Log", str(auth))
    page.condition("for root")
    page.wait_text("Would have been raised 40 times in the last 24 hours")
    page.find("//textarea").send_keys(failed_login(7).strip())
    page.click("Explain")
    page.wait_text("Would be raised")
    page.pictures("situation-form")
    page.click("Create situation")
    page.heading("root-login")
    page.wait_text("Running")
    page.pictures("situation")
    page.click("Stop root-login")
    page.wait_text("Stopped")
    page.click("Start root-login")
    page.wait_text("Running")
    page.click("Edit root-login")
    page.heading("Edit root-login")
    page.choose("Severity", "major")
    page.click("Save changes")
    page.heading("root-login")
    page.wait_text("major")
    page.click("Delete root-login")
    page.click("Delete", "//dialog")
    page.heading("Situations")
    until(lambda: "root-login" not in page.text(), "the deletion")


def test_a_condition_is_judged_while_it_is_typed(page, agent):
    auth, _ = logs_agent(agent)
    page.on(agent, "situations?new")
    page.type("Name", "bad")
    page.choose("Log", str(auth))
    value = page.condition("port [", operator="matches")
    page.wait_text("Correct what is marked")
    assert value.get_attribute("aria-invalid") == "true"
    page.pictures("situation-problem")


# ---------------------------------------------------------------------- reports


def test_a_report_is_run_sorted_and_saved(page, agent):
    auth, _ = logs_agent(agent)
    page.on(agent, "reports")
    page.run_report(auth, "40 entries")
    first = page.text_of("//tbody/tr[1]")
    page.click("Time")
    until(lambda: page.find("//th[@aria-sort='ascending']"), "the order")
    assert page.text_of("//tbody/tr[1]") != first
    page.pictures("report")
    lines = page.saved("CSV").splitlines()
    assert lines[0].startswith("ORIGINNODE,LOGPATH") and len(lines) == 41
    value = page.condition("113.39 ")
    page.run_report(auth, "1 entry")
    value.send_keys("not there")
    page.click("Run the report")
    page.wait_text("No entries")


def test_what_is_saved_neither_steers_nor_computes(page, agent):
    auth, _ = logs_agent(agent)
    text = "=cmd()\u202e\u009b31m\x7f"
    auth.append(syslog_line(text, "sshd[1]"))
    page.on(agent, "reports")
    page.condition("cmd")
    page.run_report(auth, "1 entry")
    saved = page.saved("CSV")
    assert ",'=cmd()\\u202e\\u009b31m\\u007f" in saved
    assert not set(saved) & set("\u202e\u009b\x7f")
    saved = page.saved("JSON")
    assert not set(saved) & set("\u202e\u009b\x7f")
    assert json.loads(saved)[0]["ENTRYDESC"] == text


# ---------------------------------------------------------------------- try a format


def test_a_format_is_tried_while_it_is_typed(page, agent):
    logs_agent(agent)
    page.on(agent, "try")
    page.wait_text("100% of the lines fit")
    assert [mark.text for mark in page.all(".lines mark.f2")] == ["payment", "web"]
    page.type("Lines", "2026-11-20 07:03:09 ERROR payment: Card declined\nno entry at all")
    page.wait_text("50% of the lines fit")
    page.wait_text("Stops at column 1")
    page.wait_text("Card declined")
    page.pictures("try")
    page.type("Format", 'A , "%d %q" , year')
    page.wait_text("The format cannot be used")
    page.pictures("try-refused")
    assert re.search(r"Where the format stops", page.text())
    assert page.driver.find_elements(By.CSS_SELECTOR, "pre mark.stop")
