"""What the console shows of logs of [[log]] tables: where they come from, and what rotations cost."""

import gzip
from signal import SIGCONT, SIGSTOP

import pytest
from browser.conftest import harness, until

from browser.support import failed_login


@pytest.fixture
def followed(agent):
    """A log that is followed, beside files that its table passes over."""
    directory = agent.directory / "logs"
    directory.mkdir()
    agent.app = harness.Log(directory / "app.log")
    agent.app.path.write_text(failed_login(0))
    (directory / "app.log.2.gz").write_bytes(b"")
    agent.shared = agent.log("logs/shared.log")
    agent.follow(directory / "*.log*", rotate_wait="1s")
    agent.follow(agent.directory / "none" / "*.log")
    agent.situation(log=agent.app)
    agent.sink = agent.directory / "events"
    agent.start()
    agent.wait_open(agent.app)
    return agent


def ledger(page, log):
    logs = page.api.request("GET", f"/api/v1/logs?log={log}")[2].get("logs") or [{}]
    return logs[0].get("ledger") or {"follow": {"position": None, "behind": None}, "warnings": []}


def lose_and_recover(agent, page):
    """The log is truncated twice: a copy holds what was lost first, nothing holds the rest."""
    log = agent.app
    log.append(failed_login(1))
    agent.wait_events(1)
    agent.send(SIGSTOP)
    log.append(failed_login(2))
    log.path.with_name("app.log.1").write_bytes(log.path.read_bytes())
    log.path.write_text(failed_login(3))
    agent.send(SIGCONT)
    agent.wait_events(3)
    log.append("half a line")
    until(lambda: ledger(page, log)["follow"]["behind"] == 11, "the half line to be seen")
    log.path.write_bytes(b"")
    until(lambda: ledger(page, log)["warnings"], "the warning")


def test_a_followed_log_shows_what_was_recovered_and_lost(page, followed, fast_polls):
    page.on(followed)
    page.open_log(followed.app)
    page.wait_text("Nothing was lost, and nothing had to be recovered.")
    fact = "//dt[.='{}']/following-sibling::dd"
    assert page.text_of(fact.format("State")) == "reading the file of this name"
    assert page.text_of(fact.format("Generation")) == str(followed.app)
    assert page.text_of(fact.format("Configured by")).startswith("[[log]] at line ")
    page.pictures("log-followed")
    lose_and_recover(followed, page)
    until(lambda: len(page.rows("Recovered and lost")) == 2, "both ranges")
    lost, recovered = page.rows("Recovered and lost")
    size = len(failed_login(3))
    assert "Lost" in lost and f"{size} {size + 11} 11" in lost
    assert "Recovered" in recovered and recovered.endswith(f"{followed.app}.1")
    assert page.text_of(fact.format("Lost in rotations")) == "11 B"
    page.wait_text(f"Bytes {size} to {size + 11} were lost at ")
    assert page.text_of("//*[@class='state warn']") == "Lost bytes"
    page.pictures("log-lost")
    page.go("Logs")
    page.wait_text("2 with warnings")
    assert "Lost bytes" in page.text_of("//tbody/tr[contains(., 'app.log')]")
    page.pictures("logs-lost")


def test_the_tables_show_what_they_match_and_pass_over(page, followed, fast_polls):
    page.on(followed)
    page.wait_text("Tables of the configuration")
    items = page.all("[aria-label=Tables] li")
    assert "follows 1 file" in items[0].text and f"{followed.directory}/logs/*.log*" in items[0].text
    assert "It is compressed." not in page.text()
    page.find("//summary[normalize-space()='Passes over 2 files']").click()
    page.wait_text(f"{followed.app}.2.gz It is compressed.")
    page.wait_text(f"{followed.shared} The log configuration names it, too, and its line applies.")
    page.wait_text("No file that can be followed matches now.")
    page.pictures("logs-tables")
    followed.app.path.with_name("app.log.3.gz").write_bytes(b"")
    page.wait_text("Passes over 3 files", 30)
    page.wait_text("It is compressed.")  # still open
    page.open_log(followed.shared)
    page.wait_text("Monitored since")
    assert page.text_of("//dt[.='Configured by']/following-sibling::dd") == "log configuration"
    page.open_log(f"{followed.app}.2.gz")
    page.wait_text("This log is not monitored")
    page.wait_text("passes over it: It is compressed.")
    page.pictures("log-passed-over")
    page.expect_complaints()


def test_a_log_that_cannot_be_read_shows_why(page, followed, fast_polls):
    page.on(followed)
    directory = followed.app.path.parent
    directory.rename(followed.directory / "hidden")
    directory.symlink_to(directory)  # fails for every user
    page.wait_text("Failing", 30)
    page.wait_text("Too many levels of symbolic links")
    page.open_log(followed.app)
    page.wait_text("The log cannot be read at present")
    assert "Too many levels of symbolic links" in page.text_of("//dt[.='Problem']/following-sibling::dd")
    page.pictures("log-failing")
    directory.unlink()
    (followed.directory / "hidden").rename(directory)
    until(lambda: page.text_of("//span[starts-with(@class, 'state')]") == "Running", "the end of the warning", 30)


def test_lines_are_tried_as_a_table_would_judge_them(page, agent):
    agent.environment["TZ"] = "Europe/Berlin"
    log = harness.Log(agent.directory / "app.log")
    log.path.write_text("2026-11-20T06:03:09Z web1 app[1]: first\n2026-11-20 06:03:09 second\n")
    agent.follow(log, timezone="America/New_York", start="beginning")
    agent.start()
    agent.wait_open(log)
    page.on(agent, "try")
    page.wait_text("100% of the lines fit")
    assert "type = 'text'" in page.text_of("//*[@aria-label='Table']")
    page.type("Lines", "2026-11-20 06:03:09 ERROR payment: Card declined")
    page.type("Time zone", "UTC")
    page.wait_text("timezone = 'UTC'")
    page.wait_text("2026-11-20 07:03:09")
    page.type("Time zone", "Nowhere/Town")
    page.wait_text("'Nowhere/Town' is not a time zone of this machine")
    page.pictures("try-table")
    page.open(f"try?log={log}")
    page.wait_text("50% of the lines fit")
    page.wait_text("The line is in no form that system loggers write")
    page.wait_text("timezone = 'America/New_York'")
    assert page.text_of("//*[@aria-label='Table']").startswith(f"[[log]]\npath = '{log}'")
    assert [mark.text for mark in page.all(".lines mark.f2")] == ["app[1]"]
    page.pictures("try-syslog")
    page.choose("Judge as", "Line of the log configuration")
    page.wait_text("0% of the lines fit")
    page.expect_complaints()


def test_a_report_shows_the_files_that_it_has_read(page, followed):
    app = followed.app
    app.append("no syslog line\n")
    with gzip.open(f"{app}.1.gz", "wt", encoding="ascii") as stream:
        stream.write(failed_login(3))
    page.on(followed, "reports")
    page.run_report(app.path, "2 entries")
    page.wait_text("2 of 3 files read, 1 line passed over")
    page.wait_text(f"{app}.1.gz")
    page.wait_text("not read completely: it is damaged")
    page.pictures("report-files")


def test_a_log_that_is_not_a_file_is_not_shown_as_one(page, agent):
    agent.agent_keys["log_config"] = None
    agent.tables.append({"type": "command", "command": ["sh", "-c", "echo one; exec sleep 1000"], "name": "kernel"})
    agent.situation()
    agent.sink = agent.directory / "events"
    agent.start()
    agent.wait_events(1)
    page.on(agent)
    page.wait_text("Running")
    assert "No file" not in page.text() and "follows 1 file" not in page.text()
    page.open_log("kernel")
    fact = "//dt[.='{}']/following-sibling::dd"
    assert page.text_of(fact.format("Kind")) == "Command"
    assert page.text_of(fact.format("State")) == "reading"
    for name in ("Size", "Generation", "Position"):
        assert f"\n{name}\n" not in page.text(), name
