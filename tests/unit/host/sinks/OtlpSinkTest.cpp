#include "host/sinks/OtlpSink.h"

#include "ScriptedServer.h"
#include "SinkTest.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

using namespace zrm::host;

namespace {

using Json = nlohmann::ordered_json;
using Request = ScriptedServer::Request;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class OtlpSinkTest : public testing::Test {
protected:
    OtlpSinkTest() { events.add({}); }
    SinkConfig config(const std::string& keys = "") const {
        return sinkConfig("type = 'otlp'\nurl = '" + server.url() + "'\nname = 'collector'\n" +
                          keys);
    }
    std::size_t deliver(OtlpSink& sink) {
        return sink.deliver(events.records(), giveUp.get_token());
    }

    RecordingTrace trace{TRC1_ERROR};
    EntryEvents events;
    int status = 200;
    std::string answer = "{}";
    ScriptedServer server{
        [this](const Request&) { return ScriptedServer::status(status, answer); }};
    std::stop_source giveUp;
};

TEST_F(OtlpSinkTest, RecordsHaveTheEntryAndItsFields) {
    events.add({.more = R"(,"fields":{"user":"root"},"entry":"the line")"});
    OtlpSink sink(config());
    ASSERT_GE(deliver(sink), 1u);
    const Json sent = Json::parse(server.requests()[0].body);
    const Json& records = sent["resourceLogs"][0]["scopeLogs"][0]["logRecords"];
    std::map<std::string, std::string> texts;
    for (const Json& attribute : records[records.size() - 1]["attributes"]) {
        texts[attribute["key"]] = attribute["value"].value("stringValue", "");
    }
    EXPECT_EQ(texts["zrm.field.user"], "root");
    EXPECT_EQ(texts["zrm.entry"], "the line");
}

TEST_F(OtlpSinkTest, RecordsHaveTheSituationsTextRunbookAndLabels) {
    events.add({.more = R"(,"text":"5 logins","runbook":"https://wiki/","labels":{"team":"web"})"});
    OtlpSink sink(config());
    ASSERT_GE(deliver(sink), 1u);
    const Json sent = Json::parse(server.requests()[0].body);
    const Json& records = sent["resourceLogs"][0]["scopeLogs"][0]["logRecords"];
    const Json& record = records[records.size() - 1];
    EXPECT_EQ(record["body"]["stringValue"], "5 logins");
    const std::string attributes = record["attributes"].dump();
    EXPECT_NE(attributes.find(R"({"key":"zrm.runbook","value":{"stringValue":"https://wiki/"}})"),
              std::string::npos)
        << attributes;
    EXPECT_NE(attributes.find(R"({"key":"zrm.label.team","value":{"stringValue":"web"}})"),
              std::string::npos)
        << attributes;
}

TEST_F(OtlpSinkTest, RecordsCarryTheStateOfAnEpisode) {
    events.addWithoutRow(EntryEvents::episode("resolved") + EntryEvents::withoutRow);
    OtlpSink sink(config());
    ASSERT_EQ(deliver(sink), 2u);
    const Json sent = Json::parse(server.requests()[0].body);
    const Json& record = sent["resourceLogs"][0]["scopeLogs"][0]["logRecords"][1];
    std::map<std::string, std::string> texts;
    for (const Json& attribute : record["attributes"]) {
        texts[attribute["key"]] = attribute["value"].begin()->get<std::string>();
    }
    EXPECT_EQ(texts["zrm.state"], "resolved");
    EXPECT_EQ(texts["zrm.episode.id"], "1");
    EXPECT_EQ(texts["zrm.episode.count"], "74");
    EXPECT_EQ(texts["zrm.group.ip"], "10.0.0.1");
}

TEST_F(OtlpSinkTest, SendsLogRecords) {
    events.add({.description = "caf\xc3\xa9", .severity = "minor"});
    OtlpSink sink(
        config("service_name = 'logs'\nattributes = { 'deployment.environment' = 'test' }"));
    EXPECT_EQ(deliver(sink), 2u);
    EXPECT_EQ(server.requests()[0].line, "POST /v1/logs HTTP/1.1");
    EXPECT_EQ(server.requests()[0].header("content-type"), "application/json");
    const auto record = [](const char* id, const char* time, int number, const char* severity,
                           const char* text) {
        const auto attribute = [](const char* key, const char* type, const char* value) {
            return Json{{"key", key}, {"value", {{type, value}}}};
        };
        return Json{{"timeUnixNano", time},
                    {"observedTimeUnixNano", time},
                    {"severityNumber", number},
                    {"severityText", severity},
                    {"body", {{"stringValue", text}}},
                    {"attributes",
                     Json::array({attribute("zrm.id", "intValue", id),
                                  attribute("zrm.situation", "stringValue", "ssh-bruteforce"),
                                  attribute("log.file.path", "stringValue", "/var/log/auth.log"),
                                  attribute("zrm.column.ORIGINNODE", "stringValue", "web1:ZRM"),
                                  attribute("zrm.column.ENTRYSRC", "stringValue", "sshd"),
                                  attribute("zrm.column.ENTRYDESC", "stringValue", "short"),
                                  attribute("zrm.column.SAMPLENO", "intValue", "3"),
                                  attribute("zrm.column.UENTRYDESC", "stringValue", text)})}};
    };
    Json expected = Json::parse(R"({"resourceLogs": [{
        "resource": {"attributes": [
            {"key": "service.name", "value": {"stringValue": "logs"}},
            {"key": "host.name", "value": {"stringValue": "web1"}},
            {"key": "deployment.environment", "value": {"stringValue": "test"}}]},
        "scopeLogs": [{"scope": {"name": "zrmagent"}, "logRecords": []}]}]})");
    Json& records = expected["resourceLogs"][0]["scopeLogs"][0]["logRecords"];
    records.push_back(
        record("1", "1795158189412000000", 21, "critical", "Failed password for root"));
    records.push_back(record("2", "1795158190412000000", 10, "minor", "caf\xc3\xa9"));
    EXPECT_EQ(server.requests()[0].body, expected.dump());
}

TEST_F(OtlpSinkTest, NeitherBreaksTheBodyNorSteersATerminalWithATextOfALog) {
    events.add({.description = R"(\"\u001b[31m\u009b\u202e\u007f)", .log = "/x\"\xff\x7f"});
    OtlpSink sink(config());
    EXPECT_EQ(deliver(sink), 2u);
    const std::string body = server.requests()[0].body;
    EXPECT_THAT(body, HasSubstr(R"("stringValue":"\"\u001b[31m\u009b\u202e\u007f")"));
    EXPECT_THAT(body, HasSubstr("\"/x\\\"\xef\xbf\xbd\\u007f\""));
    EXPECT_TRUE(Json::accept(body));
}

TEST_F(OtlpSinkTest, ReportsRecordsThatTheReceiverRejected) {
    OtlpSink sink(config());
    for (const char* const count : {"\"1\"", "1"}) {
        trace.clear();
        server.set(answer, std::string(R"({"partialSuccess":{"rejectedLogRecords":)") + count +
                               R"(,"errorMessage":"too old"}})");
        EXPECT_EQ(deliver(sink), 1u) << "they must not be sent again";
        EXPECT_THAT(trace.messages(),
                    ElementsAre("collector has rejected 1 of 1 events for good: too old"));
    }
}

TEST_F(OtlpSinkTest, AMessageWithoutRejectionIsADetail) {
    server.set(answer, R"({"partialSuccess":{"errorMessage":"be gentle"}})");
    OtlpSink sink(config());
    EXPECT_EQ(deliver(sink), 1u);
    EXPECT_THAT(trace.messages(), IsEmpty());
    trace.setLevel(TRC1_DETAIL);
    server.set(answer,
               R"({"partialSuccess":{"rejectedLogRecords":"0","errorMessage":"be gentle"}})");
    EXPECT_EQ(deliver(sink), 1u);
    EXPECT_THAT(trace.messages(), ElementsAre("collector says: be gentle"));
}

TEST_F(OtlpSinkTest, AnAnswerOfAnotherFormIsStillASuccess) {
    OtlpSink sink(config());
    for (const char* const body :
         {"", "ok", "[]", "null", R"({"partialSuccess":null})", R"({"partialSuccess":{}})",
          R"({"partialSuccess":{"rejectedLogRecords":"0","errorMessage":5}})"}) {
        server.set(answer, body);
        EXPECT_EQ(deliver(sink), 1u) << body;
    }
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(OtlpSinkTest, AHostileAnswerDoesNoHarm) {
    OtlpSink sink(config());
    const std::string deep = std::string(20'000, '[') + std::string(20'000, ']');
    server.set(answer, R"({"partialSuccess":{"rejectedLogRecords":)" + deep + "}}");
    EXPECT_EQ(deliver(sink), 1u);
    EXPECT_THAT(trace.messages(), IsEmpty()) << "that is not a count";
    server.set(answer, R"({"partialSuccess":{"rejectedLogRecords":"1","errorMessage":"two\nlines)" +
                           std::string(1000, 'x') + R"("}})");
    EXPECT_EQ(deliver(sink), 1u);
    EXPECT_THAT(trace.messages(),
                ElementsAre("collector has rejected 1 of 1 events for good: two lines" +
                            std::string(191, 'x')));
}

TEST_F(OtlpSinkTest, ARefusalIsAFailure) {
    OtlpSink sink(config());
    server.set(status, 503);
    server.set(answer, "");
    EXPECT_EQ(deliver(sink), 0u);
    EXPECT_EQ(sink.error(),
              "127.0.0.1:" + std::to_string(server.port()) + " answered with status 503");
    EXPECT_EQ(sink.name(), "collector");
}

} // namespace
