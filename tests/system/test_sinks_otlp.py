"""Events become OpenTelemetry log records, checked against the published JSON mapping of OTLP."""

import re

import pytest

from conftest import syslog_line, wait_until
from receiver import Receiver

# opentelemetry/proto: for each message its fields in lowerCamelCase and what their JSON is. A 64-bit
# integer is a decimal text, an enumeration a number; a message is named, [X] is a list of X.
MESSAGES = {
    "ExportLogsServiceRequest": {"resourceLogs": ["ResourceLogs"]},
    "ResourceLogs": {"resource": "Resource", "scopeLogs": ["ScopeLogs"], "schemaUrl": "text"},
    "Resource": {"attributes": ["KeyValue"], "droppedAttributesCount": "number"},
    "ScopeLogs": {
        "scope": "InstrumentationScope",
        "logRecords": ["LogRecord"],
        "schemaUrl": "text",
    },
    "InstrumentationScope": {
        "name": "text",
        "version": "text",
        "attributes": ["KeyValue"],
        "droppedAttributesCount": "number",
    },
    "LogRecord": {
        "timeUnixNano": "unsigned",
        "observedTimeUnixNano": "unsigned",
        "severityNumber": "severity",
        "severityText": "text",
        "body": "AnyValue",
        "attributes": ["KeyValue"],
        "droppedAttributesCount": "number",
        "flags": "number",
        "traceId": "text",
        "spanId": "text",
    },
    "KeyValue": {"key": "text", "value": "AnyValue"},
    "AnyValue": {
        "stringValue": "text",
        "boolValue": "truth",
        "intValue": "signed",
        "doubleValue": "number",
        "arrayValue": "ArrayValue",
        "kvlistValue": "KeyValueList",
        "bytesValue": "text",
    },
    "ArrayValue": {"values": ["AnyValue"]},
    "KeyValueList": {"values": ["KeyValue"]},
}

SCALARS = {
    "text": lambda value: isinstance(value, str),
    "truth": lambda value: isinstance(value, bool),
    "number": lambda value: isinstance(value, (int, float)) and not isinstance(value, bool),
    "signed": lambda value: isinstance(value, str)
    and re.fullmatch(r"-?\d+", value)
    and -(2**63) <= int(value) < 2**63,
    "unsigned": lambda value: isinstance(value, str)
    and re.fullmatch(r"\d+", value)
    and int(value) < 2**64,
    "severity": lambda value: type(value) is int and 0 <= value <= 24,
}


def check(value, kind, place="body"):
    """Fails when the value is not JSON of this kind."""
    if isinstance(kind, list):
        assert isinstance(value, list), place
        for index, item in enumerate(value):
            check(item, kind[0], f"{place}[{index}]")
    elif kind in SCALARS:
        assert SCALARS[kind](value), f"{place} is {value!r}, which is no {kind}"
    else:
        assert isinstance(value, dict), place
        for key, item in value.items():
            assert key in MESSAGES[kind], f"{place} has {key!r}, which {kind} has not"
            check(item, MESSAGES[kind][key], f"{place}.{key}")
        if kind == "AnyValue":
            assert len(value) == 1, place


def plain(attributes):
    """Attributes as a dictionary; none occurs twice."""
    names = [attribute["key"] for attribute in attributes]
    assert len(set(names)) == len(names)
    return {
        attribute["key"]: int(value["intValue"]) if "intValue" in value else value["stringValue"]
        for attribute in attributes
        for value in [attribute["value"]]
    }


class Collector(Receiver):
    """Accepts only what the mapping allows, and answers as the protocol requires."""

    def __init__(self):
        super().__init__()
        self.problems = []
        self.reply = b"{}"

        def answer(request):
            try:
                assert request.path == "/v1/logs"
                assert request.headers["Content-Type"] == "application/json"
                check(request.json, "ExportLogsServiceRequest")
            except AssertionError as problem:
                self.problems.append(str(problem))
                return 400, b"{}"
            return 200, self.reply

        self.answer = answer

    def records(self):
        return [
            record
            for request in list(self.taken)
            for resource in request.json["resourceLogs"]
            for scope in resource["scopeLogs"]
            for record in scope["logRecords"]
        ]


@pytest.fixture
def collector():
    with Collector() as collector:
        yield collector


def wait_for(collector, count, agent):
    return wait_until(
        lambda: collector.records() if len(collector.records()) >= count else None,
        lambda: f"{count} records; {collector.problems}: {agent.stderr.text()[-2000:]}",
    )


def test_log_records_follow_the_mapping_and_say_what_the_event_says(agent, collector):
    log = agent.log()
    for severity in ("info", "minor", "warning", "major", "critical"):
        agent.situation(f"is-{severity}", log=log, severity=severity)
    agent.more_sinks.append(
        {
            "type": "otlp",
            "url": collector.url,
            "attributes": {"deployment.environment": "test"},
        }
    )
    agent.start()
    log.append(syslog_line('na\u00efve "quoted" \\ text'))
    records = wait_for(collector, 5, agent)
    events = agent.wait_events(5)
    assert collector.problems == []
    numbers = {"info": 9, "minor": 10, "warning": 13, "major": 17, "critical": 21}
    for record, event in zip(records, events):
        assert record["severityNumber"] == numbers[event["severity"]]
        assert record["severityText"] == event["severity"]
        assert record["body"] == {"stringValue": event["row"]["UENTRYDESC"]}
        attributes = plain(record["attributes"])
        assert attributes.pop("zrm.id") == event["id"]
        assert attributes.pop("zrm.situation") == event["situation"]
        assert attributes.pop("log.file.path") == str(log)
        columns = {k: v for k, v in event["row"].items() if v != ""}
        assert attributes == {"zrm.column." + name: value for name, value in columns.items()}
        assert record["timeUnixNano"] == record["observedTimeUnixNano"]
        assert len(record["timeUnixNano"]) == 19
    (resource,) = collector.taken[0].json["resourceLogs"]
    assert plain(resource["resource"]["attributes"]) == {
        "service.name": "zrmagent",
        "host.name": events[0]["row"]["ORIGINNODE"].rpartition(":")[0],
        "deployment.environment": "test",
    }
    assert agent.stop() == 0


def test_rejected_records_are_reported_and_not_sent_again(agent, collector):
    collector.reply = (
        b'{"partialSuccess": {"rejectedLogRecords": "1", "errorMessage": "no room for them"}}'
    )
    log = agent.log()
    agent.situation(log=log)
    agent.more_sinks.append({"type": "otlp", "url": collector.url, "name": "collector"})
    agent.start()
    log.append(syslog_line("one"))
    agent.wait_trace("collector has rejected 1 of 1 events for good: no room for them")
    collector.reply = b"{}"
    log.append(syslog_line("two"))
    records = wait_for(collector, 2, agent)
    assert [record["body"]["stringValue"] for record in records] == ["one", "two"]
    assert agent.stop() == 0
