"""Lines that no system logger should write, and text in other code pages."""

import subprocess

import pytest

from conftest import descriptions, syslog_line


@pytest.fixture
def started(agent):
    def start(locale=None, **environment):
        if locale is not None:
            agent.environment["LC_ALL"] = locale
        agent.environment.update(environment)
        log = agent.log()
        agent.situation(log=log)
        agent.start()
        return log

    return start


@pytest.fixture(scope="session")
def latin1_locale(tmp_path_factory):
    """A locale of code page ISO-8859-1, and where the C library finds it."""
    directory = tmp_path_factory.mktemp("locales")
    name = "de_DE.ISO-8859-1"
    subprocess.run(
        ["localedef", "--no-archive", "-i", "de_DE", "-f", "ISO-8859-1", str(directory / name)],
        check=True,
        capture_output=True,
    )
    return name, str(directory)


ODD_LINES = {
    "empty": b"\n",
    "blanks": b"      \n",
    "shorter than a time stamp": b"Oct  5\n",
    "a time and nothing else": b"Oct  5 07:03:09\n",
    "no month": b"Okt  5 07:03:09 web1 app: no\n",
    "a month where none stands": b"anF  5 07:03:09 web1 app: no\n",
    "a NUL byte first": b"\0Oct  5 07:03:09 web1 app: no\n",
}


@pytest.mark.parametrize("case", ODD_LINES)
def test_an_odd_line_yields_a_row_and_the_next_line_is_whole(agent, started, case):
    log = started()
    log.append(ODD_LINES[case] + syslog_line("next").encode())
    odd, following = agent.wait_events(2)
    assert odd["row"]["ENTRYDESC"] == odd["row"]["UENTRYDESC"] == ""
    assert odd["row"]["ENTRYSYS"] == odd["row"]["ENTRYSRC"] == ""
    assert odd["row"]["LOGNAME"] == "app.log"
    assert following["row"]["ENTRYDESC"] == "next"


def test_a_nul_byte_ends_the_text_of_its_line(agent, started):
    log = started()
    log.append(b"Oct  5 07:03:09 web1 app: one\0two\n" + syslog_line("next").encode())
    # What is before the NUL is the line; its description still loses its last byte.
    assert descriptions(agent.wait_events(2)) == ["on", "next"]


def test_host_and_source_longer_than_their_columns_run_on(agent, started):
    log = started()
    log.append(syslog_line("fine", host="h" * 300, source="s" * 300) + syslog_line("next"))
    row, following = (event["row"] for event in agent.wait_events(2))
    assert row["ENTRYSYS"] == "h" * 32
    assert row["ENTRYSRC"] == "s" * 32
    # 299 characters of the source: 32 + 16 + 16 in the columns before the description.
    assert row["ENTRYDESC"] == "fine" + "s" * (299 - 64 - 4)
    assert row["UENTRYDESC"] == "fine"
    assert row["LOGNAME"] == "app.log"
    assert following["ENTRYDESC"] == "next"


def test_a_line_of_nothing_but_a_host(agent, started):
    log = started()
    log.append(b"Oct  5 07:03:09 web1\n" + syslog_line("next").encode())
    odd, following = agent.wait_events(2)
    assert odd["row"]["ENTRYSYS"] == "web1"
    assert following["row"]["ENTRYDESC"] == "next"


def test_bytes_that_are_not_utf8_in_a_utf8_locale(agent, started):
    log = started("C.UTF-8")
    log.append(syslog_line("caf?? ends").encode().replace(b"??", b"\xe9\xff"))
    log.append(syslog_line("na\u00efve \u20ac"))
    broken, whole = agent.wait_events(2)
    for column in ("ENTRYDESC", "UENTRYDESC"):
        assert broken["row"][column].startswith("caf")
        assert broken["row"][column].endswith(" ends")
        assert whole["row"][column] == "na\u00efve \u20ac"
    assert all(line.decode("utf-8") for line in agent.stdout())


def test_a_multibyte_character_at_the_edge_of_the_description(agent, started):
    log = started("C.UTF-8")
    log.append(syslog_line("x" * 255 + "\u00e9" + "tail"))
    (event,) = agent.wait_events(1)
    assert event["row"]["ENTRYDESC"].startswith("x" * 255)
    assert all(line.decode("utf-8") for line in agent.stdout())


def test_latin1_text_in_a_latin1_locale(agent, started, latin1_locale):
    name, directory = latin1_locale
    log = started(name, LOCPATH=directory)
    log.append("caf\u00e9 \u00fc".join(syslog_line("!").split("!")).encode("latin-1"))
    (event,) = agent.wait_events(1)
    assert event["row"]["UENTRYDESC"] == "caf\u00e9 \u00fc"
    assert event["row"]["ENTRYDESC"] == "caf\u00e9 \u00fc"


def test_256_latin1_characters_fill_the_wide_column(agent, started, latin1_locale):
    name, directory = latin1_locale
    log = started(name, LOCPATH=directory)
    log.append(syslog_line("!").replace("!", "\u00e9" * 300).encode("latin-1"))
    (event,) = agent.wait_events(1)
    assert event["row"]["UENTRYDESC"] == "\u00e9" * 256
