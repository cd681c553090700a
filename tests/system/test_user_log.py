"""Text logs with a format specifier, end to end."""

import time

from api import Api
from conftest import descriptions

SPECIFIER = (
    'A,"%d-%d-%dT%d:%d:%d %s %s [%15[^]]] %255[^\\n]" , '
    "year month day hour minute second system type class description"
)


def watch(agent, specifier=SPECIFIER, name="app.log"):
    log = agent.log(name, content=b"old\n", fields=f";N ;U ;{specifier}")
    agent.situation(log.path.stem, log=log)
    return log


def test_fields_become_columns(agent):
    log = watch(agent)
    agent.start()
    log.append("2026-03-09T04:05:06 db1 ERROR [pool] connection lost, retrying\n")
    (event,) = agent.wait_events(1)
    row = event["row"]
    assert row["ENTRYTIME"] == "1260309040506000"
    assert row["ENTRYSYS"] == "db1"
    assert row["ENTRYTYPE"] == "ERROR"
    assert row["ENTRYCLASS"] == "pool"
    assert row["ENTRYDESC"] == row["UENTRYDESC"] == "connection lost, retrying"
    assert row["ENTRYSRC"] == ""


def test_lines_that_do_not_fit_are_counted_and_dropped(agent):
    log = watch(agent)
    agent.listen = "127.0.0.1:0"
    agent.start()
    log.append(
        "no such line\n\n2026-03-09T04:05:06 db1 ERROR [pool] first\n"
        "2026-03-09T04:05:99 db1 ERROR [pool] a bad second is 00\n"
        "2026-03-09 and so on\n"
    )
    events = agent.wait_events(2)
    assert descriptions(events) == ["first", "a bad second is 00"]
    assert events[1]["row"]["ENTRYTIME"] == "1260309040500000"
    row = Api(agent).logs()["app.log"]
    assert (row["NUMEVENTS"], row["NUMERRORS"], row["LOGTYPE"]) == (5, 3, "U")
    assert row["FORMATTER"] == SPECIFIER[:256]
    assert agent.stop() == 0
    assert len(agent.events()) == 2


def test_a_format_that_cannot_be_learned_stops_its_log_only(agent):
    bad = agent.log("bad.log", fields=';N ;U ;A,"%q" , day')
    good = watch(agent, name="good.log")
    agent.listen = "127.0.0.1:0"
    agent.start(wait=False)
    message = (
        f"Error occurred while interpreting format command for file {bad}; monitoring not started. "
    )
    (record,) = agent.wait_trace(message)
    assert record.endswith(message)
    agent.wait_open(good)
    good.append("2026-03-09T04:05:06 db1 INFO [x] goes on\n")
    assert descriptions(agent.wait_events(1)) == ["goes on"]
    logs = Api(agent).logs()
    assert logs["bad.log"]["MONSTATUS"] == "Error: format command"
    assert logs["good.log"]["MONSTATUS"] == "Running"
    assert agent.stop() == 0


def test_a_format_without_time_takes_the_clock(agent):
    log = watch(agent, 'A,"%255[^\\n]" , description')
    agent.start()
    before = time.strftime("%m%d%H%M", time.localtime())
    log.append("anything at all\n")
    (event,) = agent.wait_events(1)
    after = time.strftime("%m%d%H%M", time.localtime())
    assert before <= event["row"]["ENTRYTIME"][3:11] <= after
    assert event["row"]["ENTRYTIME"][11:] == "00000"
    assert event["row"]["ENTRYDESC"] == "anything at all"


def test_print_directives_shape_the_columns(agent):
    log = watch(
        agent,
        'A,"%d %s %d %127[^\\n]" , type = "rc=%03d" source class = "<%x>" description = "said: %s"',
    )
    agent.start()
    log.append("7 worker 255 done\n")
    (event,) = agent.wait_events(1)
    row = event["row"]
    assert (row["ENTRYTYPE"], row["ENTRYSRC"]) == ("rc=007", "worker")
    assert (row["ENTRYCLASS"], row["ENTRYDESC"]) == ("<ff>", "said: done")


def test_a_report_over_a_user_log(agent):
    log = watch(agent)
    agent.listen = "127.0.0.1:0"
    agent.start()
    log.append(
        "".join(f"2026-03-09T04:{i // 60:02}:{i % 60:02} db1 INFO [x] number {i}\n" for i in range(300))
    )
    agent.wait_events(300)
    answer = Api(agent).report(
        log, "2026-03-09T04:01:00", "2026-03-09T04:01:09", ("ENTRYTYPE", "=", "INFO")
    )
    assert [row["ENTRYDESC"] for row in answer["rows"]] == [
        f"number {i}" for i in range(69, 59, -1)
    ]


def test_the_name_of_the_log_is_in_the_procedure(agent):
    log = watch(agent, 'A,"%63[^\\n]" , description = "${@}: %s"')
    agent.start()
    log.append("text\n")
    (event,) = agent.wait_events(1)
    assert event["row"]["ENTRYDESC"] == f"{log}: text"
