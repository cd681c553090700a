"""Silences in the console."""

import re

from browser.conftest import until
from browser.support import failed_login, logs_agent

WHY = "<b>host</b> is being rebuilt"


def silence_from_event(page, auth):
    """Opens an event and silences those like it."""
    rows = page.find("//*[@role='listbox']")
    rows.send_keys("\ue015")  # arrow down
    page.click("Silence events like this")
    page.heading("Silences")
    assert page.control("Situation").get_attribute("value") == "ssh-failed"
    assert page.control("Log").get_attribute("value") == str(auth)
    page.type("Your name", "anna")
    page.type("Reason", WHY)


def test_an_event_is_silenced_and_those_after_it_are_grey_with_the_reason(page, agent, fast_polls):
    auth, _ = logs_agent(agent)
    page.on(agent, "silences")
    page.wait_text("No silence")
    page.pictures("silences-empty")
    page.open("events")
    page.wait_live()
    auth.append(failed_login(1))
    page.wait_text("203.0.113.1")
    silence_from_event(page, auth)
    page.type("Until", "yesterday")
    page.click("Silence")
    page.wait_text("'yesterday' is neither a duration nor a time")
    page.type("Until", "2h")
    page.pictures("silence-form")
    page.click("Silence")
    page.wait_text(f"situation = ssh-failed, log = {auth}")
    page.wait_text(WHY)
    auth.append(failed_login(2))
    count = re.compile(rf"\s1\s+{re.escape(WHY)}")
    until(lambda: any(map(count.search, page.rows("Silences"))), "the count of one event")
    page.pictures("silences")
    page.cells_fit()
    page.open("events")
    page.wait_text("203.0.113.2")
    assert [row.text for row in page.all(".windowed-row.silenced") if "203.0.113.2" in row.text]
    assert len(page.all(".windowed-row")) == 2
    page.find("//*[@role='listbox']").send_keys("\ue015")
    page.wait_text("by silence 1")
    page.wait_text(f"{WHY} (anna, until ")
    page.pictures("event-silenced")
    page.open("silences")
    page.click("Expire silence 1")
    page.click("Expire", "//dialog")
    page.wait_text("No silence")
    page.find("//label[contains(., 'Also those that are over')]").click()
    page.wait_text("expired by anna")


def test_a_silence_of_everything_is_refused_by_the_form(page, agent):
    logs_agent(agent)
    page.on(agent, "silences")
    page.click("New silence")
    page.type("Your name", "anna")
    page.type("Reason", "too loud")
    page.click("Silence")
    page.wait_text("it would silence every event")
    page.type("Group", "ip=10.0.0.7, user=root")
    page.click("Silence")
    page.wait_text("ip = 10.0.0.7, user = root")
