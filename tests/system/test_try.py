"""POST /api/v1/try: a format on lines, judged by the agent's own parser."""

import pytest
from api import Api
from conftest import wait_until

FORMAT = 'A , "%d-%d-%d %d:%d:%d %s %64[^:]: %256[^\\n]" , year month day hour minute second type source description'
LINE = "2026-11-20 07:03:09 ERROR payment: Card declined"


@pytest.fixture
def serving(agent):
    agent.listen = "127.0.0.1:0"
    agent.watched = agent.log(
        "user.log", b"".join(b"%d number %d\n" % (day, day) for day in range(1, 30)), ' ;N ;U ;A , "%d %s" , day type'
    )
    agent.situations = [{"name": "any", "log": str(agent.watched)}]
    agent.start()
    agent.api = Api(agent)
    return agent


def attempt(agent, status=200, **body):
    """The answer. An agent on a busy machine may refuse what takes it longer than its limit."""

    def answered():
        got, _, answer = agent.api.request("POST", "/api/v1/try", body)
        is_busy = got == 503 and answer["detail"].startswith("the agent is busy: ")
        return None if is_busy else (got, answer)

    got, answer = wait_until(answered, "an agent that is not busy")
    assert got == status, answer
    return answer


def test_a_line_that_fits(serving):
    answer = attempt(serving, format=FORMAT, lines=[LINE])
    assert answer["accepted"] and answer["reason"] is None and answer["position"] is None
    assert answer["coverage"] == {"lines": 1, "matched": 1, "percent": 100.0}
    assert answer["configuration_line"] == "/path/to/the.log ;N ;U ;" + FORMAT
    for directive in answer["directives"]:
        assert FORMAT[directive["from"] : directive["to"]] == directive["text"]
    assert [each["column"] for each in answer["directives"]] == ["ENTRYTIME"] * 6 + [
        "ENTRYTYPE",
        "ENTRYSRC",
        "ENTRYDESC",
    ]
    (line,) = answer["lines"]
    assert line["row"]["ENTRYTIME"] == "1261120070309000"
    assert line["row"]["ENTRYDESC"] == "Card declined"
    assert {LINE[each["from"] : each["to"]] for each in line["fields"]} >= {"ERROR", "payment"}


def test_a_line_that_does_not_fit(serving):
    (line,) = attempt(serving, format=FORMAT, lines=["2026-11-20 07:03 ERROR"])["lines"]
    assert not line["matched"] and line["row"] is None
    assert (line["failed_at"], line["directive"]) == (16, 5)
    assert line["reason"] == 'The text ":" of the format is expected here.'
    assert len(line["fields"]) == 5


def test_a_format_that_is_refused_leaves_the_trace_alone(serving):
    before = serving.trace("convcode")
    answer = attempt(serving, format='A , "%d %q" , day', lines=[LINE])
    assert not answer["accepted"]
    assert answer["position"] == 9
    assert answer["reason"].startswith("Invalid convcode or receiving variable size specified")
    assert answer["lines"] == [] and answer["configuration_line"] is None
    assert serving.trace("convcode") == before


def test_the_last_lines_of_a_monitored_log(serving):
    answer = attempt(
        serving, format='A , "%d %*s %d" , day class', log=str(serving.watched), last=3
    )
    assert [each["line"] for each in answer["lines"]] == [f"{day} number {day}" for day in (27, 28, 29)]
    assert answer["coverage"]["percent"] == 100.0
    assert answer["configuration_line"].startswith(f"{serving.watched} ;N ;U ;A")


def test_only_the_file_that_is_monitored_is_read(serving):
    """The log's name may by now be a link to anything."""
    log = serving.watched.path
    log.rename(log.with_suffix(".1"))
    log.symlink_to("/etc/passwd")
    answer = attempt(serving, 409, format='A , "%s" , type', log=str(log), last=3)
    assert answer["field"] == "log"
    assert "another file" in answer["detail"]
    status, _, answer = serving.api.request("POST", "/api/v1/explain", {"situation": "any", "log": str(log), "last": 3})
    assert status == 409 and "another file" in answer["detail"]
    window = {"from": "2000-01-01", "to": "2099-01-01"}
    request = {"definition": {"log": str(log)}, **window}
    status, _, answer = serving.api.request("POST", "/api/v1/backtest", request)
    assert (status, answer["entries"], answer["complete"]) == (200, 0, False)
    assert "another file" in answer["reason"]
    log.unlink()
    log.symlink_to(log.with_suffix(".1"))
    answer = attempt(serving, format='A , "%d %*s %d" , day class', log=str(log), last=1)
    assert answer["coverage"]["percent"] == 100.0


def test_answers_are_bounded(serving):
    """Each directive yields a value for each line."""
    format = 'A , "' + "%1c" * 100 + '" , ' + " ".join(["type"] * 100)
    assert attempt(serving, format=format, lines=["x" * 200] * 500)["coverage"]["percent"] == 100.0
    answer = attempt(serving, 400, format=format, lines=["x" * 200] * 501)
    assert answer["field"] == "lines" and "may be 500 pieces" in answer["detail"]
    attempt(serving, 400, format=format, lines=["x" * 2047 * 8] * 60)


@pytest.mark.parametrize(
    "body, field",
    [
        ({}, "format"),
        ({"format": 1}, "format"),
        ({"format": "A", "lines": "x"}, "lines"),
        ({"format": "A", "lines": ["x"] * 1001}, "lines"),
        ({"format": "A", "lines": ["x", "x" * 16385]}, "lines[1]"),
        ({"format": "A", "lines": ["a\nb"]}, "lines[0]"),
        ({"format": "A", "lines": ["x"], "log": "/x", "last": 1}, "last"),
        ({"format": "A", "last": 1}, "log"),
        ({"format": "A", "log": "/etc/passwd", "last": 1}, "log"),
        ({"format": "A", "log": "", "last": 1}, "log"),
        ({"format": "A", "log": "/x", "last": 1001}, "last"),
        ({"format": "A", "more": 1}, "more"),
    ],
)
def test_invalid_trials_are_refused(serving, body, field):
    assert attempt(serving, 400, **body)["field"] == field


def test_odd_names_and_formats(serving):
    for text in ("'; DROP TABLE x; --", "\u00e9\U0001f600", '"\\', "%", "${@}" * 200, "x" * 5000):
        answer = attempt(serving, format=f'A , "{text}%s" , type', lines=[text, ""], log="/\u00e9 \"'")
        assert answer["coverage"]["lines"] in (0, 2, 3, 4)
    assert serving.running()
