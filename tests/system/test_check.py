"""POST /api/v1/check: a log configuration, judged as the agent's start would."""

import pytest
from api import Api


@pytest.fixture
def serving(agent):
    agent.listen = "127.0.0.1:0"
    agent.watched = agent.log()
    agent.start()
    agent.api = Api(agent)
    return agent


def judge(agent, config, status=200):
    got, _, answer = agent.api.request("POST", "/api/v1/check", {"config": config})
    assert got == status, answer
    return answer


def test_every_line_has_its_verdict(serving):
    missing = serving.watched.path.parent / "none"
    answer = judge(serving, f"# logs\n{serving.watched} ;N ;S\n\n{missing} ;N\n{serving.watched}\n")
    assert [(each["line"], each["verdict"], each["cause"]) for each in answer["lines"]] == [
        (1, "ignored", None),
        (2, "accepted", None),
        (3, "ignored", None),
        (4, "refused", "file"),
        (5, "refused", "text"),
    ]
    assert (answer["accepted"], answer["refused"]) == (1, 2)
    assert answer["lines"][4]["reason"] == f"Duplicate {serving.watched} entry found; entry ignored."


def test_a_file_outside_the_logs_directories_is_only_outside(serving):
    """The agent does not reveal to a token's holder which files exist."""
    inside = serving.watched.path.parent / "none.log"
    config = f"/etc/passwd ;N\n/etc/none\n{serving.watched.path.parent}/../x\n{inside}\n"
    answer = judge(serving, config)
    verdicts = [(each["verdict"], each["cause"]) for each in answer["lines"]]
    assert verdicts == [("outside", None)] * 3 + [("refused", "file")]
    assert len({each["reason"] for each in answer["lines"][:3]}) == 1
    assert (answer["accepted"], answer["refused"]) == (0, 1)


def test_the_logs_name_in_many_places_costs_nothing(serving):
    """The format's length includes the names in it, and its directives take no stack."""
    directory = serving.watched.path.parent
    name = directory / ("%c" * 120)
    name.write_bytes(b"")
    config = f'{name} ;N ;U ;A , "{"${@}" * 150}" , type\n'
    assert len(config) < 1023
    (line,) = judge(serving, config)["lines"]
    assert line["verdict"] == "refused" and "it may have 1022" in line["reason"]
    status, _, answer = serving.api.request(
        "POST", "/api/v1/try", {"format": 'A , "' + "${@}" * 7000, "log": "/" + "%c" * 13000}
    )
    assert status == 200 and "would have" in answer["reason"]
    assert serving.stop() == 0


def test_the_agent_agrees_at_its_next_start(serving, agents):
    """The accepted lines are the logs that an agent with this configuration monitors."""
    other = agents()
    names = [serving.watched.path.parent / f"{number}.log" for number in range(4)]
    for name in names:
        name.write_bytes(b"")
    config = [
        f"{names[0]} ;N ;S",
        f"{names[1]} ;Q ;X",
        f'{names[2]} ;Y ;U ;A , "%s" , type',
        "relative.log",
        f"{names[3]};N",
        f"{names[0]} ;Y",
    ]
    answer = judge(serving, "\n".join(config) + "\n")
    other.configure(*config, append=False)
    other.listen = "127.0.0.1:0"
    other.start(wait=False)
    status, _, logs = Api(other).request("GET", "/api/v1/logs")
    assert status == 200
    assert [each["log"] for each in logs["logs"]] == [
        each["log"] for each in answer["lines"] if each["verdict"] == "accepted"
    ]
    for each in answer["lines"]:
        if each["cause"] == "text":
            assert other.trace(each["reason"].split(". ")[-1])


def test_nothing_is_monitored_and_nothing_traced(serving):
    config = f"{serving.watched} ;N ;Z\n"
    assert judge(serving, config)["refused"] == 1
    assert not serving.trace("Log type of Z")
    _, _, logs = serving.api.request("GET", "/api/v1/logs")
    assert [each["log"] for each in logs["logs"]] == [str(serving.watched)]


def test_what_cannot_be_checked(serving):
    assert judge(serving, 7, 400)["field"] == "config"
    assert judge(serving, "a\0b", 400)["field"] == "config"
    assert judge(serving, "#\n" * 10001, 400)["field"] == "config"
    assert judge(serving, "#\n" * 10000)["accepted"] == 0
