"""Episodes in the console."""

from browser.support import begin, failed_login, prepare

NOTE = "<i>blocked</i> at the firewall"


def test_an_open_episode_is_acknowledged_and_that_is_withdrawn(page, agent, fast_polls):
    logs = prepare(agent)
    agent.situations[-1]["resolve_after"] = "1h"
    begin(agent, *logs)
    page.on(agent, "episodes")
    page.wait_text("No open episode")
    page.pictures("episodes-empty")
    logs[0].append(failed_login(1))
    page.wait_text("ssh-failed")
    page.click("Acknowledge episode 1")
    page.type("Your name", "anna")
    page.type("Note", NOTE)
    page.pictures("episode-form")
    page.click("Acknowledge", "//form")
    page.wait_text(NOTE)
    (row,) = page.rows("Episodes")
    assert "Acknowledged" in row and "anna, " in row
    page.pictures("episodes")
    page.cells_fit()
    page.click("Withdraw the acknowledgement of episode 1")
    page.click("Withdraw", "//dialog")
    page.wait_text("Open")
    page.click("Silence")
    page.heading("Silences")
    assert page.control("Situation").get_attribute("value") == "ssh-failed"
