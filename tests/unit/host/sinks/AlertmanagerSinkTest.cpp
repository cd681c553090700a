#include "host/sinks/AlertmanagerSink.h"

#include "ScriptedServer.h"
#include "SinkTest.h"
#include "support/RecordingTrace.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

using namespace zrm::host;

namespace {

using Json = nlohmann::ordered_json;
using Request = ScriptedServer::Request;

class AlertmanagerSinkTest : public testing::Test {
protected:
    SinkConfig config(const std::string& keys = "") const {
        return sinkConfig("type = 'alertmanager'\nurl = '" + server.url("/prefix/") + "'\n" + keys);
    }
    std::size_t deliver(AlertmanagerSink& sink) {
        return sink.deliver(events.records(), giveUp.get_token());
    }
    Json sent() const { return Json::parse(server.requests().back().body); }

    RecordingTrace trace{0};
    EntryEvents events;
    int status = 200;
    ScriptedServer server{[this](const Request&) { return ScriptedServer::status(status); }};
    std::stop_source giveUp;
};

TEST_F(AlertmanagerSinkTest, RaisesAnAlertForEachEvent) {
    events.add({});
    events.add({.description = "caf\xc3\xa9",
                .situation = "watch",
                .severity = "info",
                .text = "The door was opened"});
    AlertmanagerSink sink(config());
    EXPECT_EQ(deliver(sink), 2u);
    EXPECT_EQ(server.requests()[0].line, "POST /prefix/api/v2/alerts HTTP/1.1");
    EXPECT_EQ(server.requests()[0].body, Json::parse(R"([
        {"labels": {"alertname": "ssh-bruteforce", "severity": "critical",
                    "log": "/var/log/auth.log", "node": "web1"},
         "annotations": {"summary": "ssh-bruteforce in /var/log/auth.log",
                         "description": "Failed password for root", "source": "sshd",
                         "event": "1"},
         "startsAt": "2026-11-20T07:03:09.412Z", "endsAt": "2026-11-20T07:08:09.412Z"},
        {"labels": {"alertname": "watch", "severity": "info",
                    "log": "/var/log/auth.log", "node": "web1"},
         "annotations": {"summary": "The door was opened in /var/log/auth.log",
                         "description": "caf\u00e9", "source": "sshd", "event": "2"},
         "startsAt": "2026-11-20T07:03:10.412Z", "endsAt": "2026-11-20T07:08:10.412Z"}])")
                                             .dump());
}

TEST_F(AlertmanagerSinkTest, AnnotationsHaveTheEntryAndItsFields) {
    events.add({.more = R"(,"fields":{"user":"root","a.b":"1","a-b":"2"},"entry":"the line")"});
    AlertmanagerSink sink(config());
    EXPECT_EQ(deliver(sink), 1u);
    const Json annotations = sent()[0]["annotations"];
    EXPECT_EQ(annotations["entry"], "the line");
    EXPECT_EQ(annotations["field_user"], "root");
    EXPECT_EQ(annotations["field_a_b"], "1") << "the first of those whose names become the same";
    EXPECT_EQ(annotations.size(), 7u);
}

TEST_F(AlertmanagerSinkTest, AnEpisodeIsOneAlertThatEndsWhenItIsResolved) {
    events.add({.more = EntryEvents::episode("raised")});
    events.addWithoutRow(EntryEvents::episode("resolved") + EntryEvents::withoutRow);
    AlertmanagerSink sink(config("labels = { team = 'ops' }\n"));
    EXPECT_EQ(deliver(sink), 2u);
    const Json raised = sent().at(0);
    const Json resolved = sent().at(1);
    EXPECT_EQ(raised.at("labels").at("group_ip"), "10.0.0.1");
    EXPECT_EQ(raised.at("labels"), resolved.at("labels")) << "they identify the alert";
    EXPECT_EQ(raised.at("startsAt"), resolved.at("startsAt"));
    EXPECT_EQ(raised.at("endsAt"), "2026-12-20T07:03:09.412Z");
    EXPECT_EQ(resolved.at("endsAt"), "2026-11-20T08:03:09.412Z");
    EXPECT_EQ(resolved.at("annotations").at("summary"),
              "Resolved: " + raised.at("annotations").at("summary").get<std::string>());
    EXPECT_EQ(resolved.at("annotations").at("count"), "74");
    EXPECT_EQ(resolved.at("annotations").at("episode"), "1");
    EXPECT_EQ(resolved.at("annotations").at("description"),
              "resolved; 74 entries from 2026-11-20T07:00:00.000Z to 2026-11-20T07:01:00.000Z");
}

TEST_F(AlertmanagerSinkTest, AddsTheConfiguredLabels) {
    events.add({});
    AlertmanagerSink sink(config("resolve_after = '1d'\nlabels = { team = 'ops', _x1 = 'y' }\n"
                                 "generator_url = 'https://web1/console'\n"));
    EXPECT_EQ(deliver(sink), 1u);
    const Json alert = sent().at(0);
    EXPECT_EQ(alert.at("labels").dump(),
              R"({"alertname":"ssh-bruteforce","severity":"critical","log":"/var/log/auth.log",)"
              R"("node":"web1","_x1":"y","team":"ops"})");
    EXPECT_EQ(alert.at("generatorURL"), "https://web1/console");
    EXPECT_EQ(alert.at("endsAt"), "2026-11-21T07:03:09.412Z");
}

TEST_F(AlertmanagerSinkTest, AlertsHaveTheSituationsTextRunbookAndLabels) {
    events.add({.text = "{count} logins",
                .more = R"(,"text":"5 logins","runbook":"https://wiki/a#b",)"
                        R"("labels":{"team":"web","tier":"2"})"});
    AlertmanagerSink sink(config("labels = { team = 'ops', site = 'a' }\n"));
    EXPECT_EQ(deliver(sink), 1u);
    const Json alert = sent().at(0);
    EXPECT_EQ(alert.at("labels").dump(),
              R"({"alertname":"ssh-bruteforce","severity":"critical","log":"/var/log/auth.log",)"
              R"("node":"web1","team":"web","tier":"2","site":"a"})");
    EXPECT_EQ(alert.at("annotations").at("summary"), "5 logins");
    EXPECT_EQ(alert.at("annotations").at("runbook_url"), "https://wiki/a#b");
    EXPECT_EQ(alert.at("annotations").at("description"), "Failed password for root");
}

TEST_F(AlertmanagerSinkTest, ARefusalFailsTheWholeDelivery) {
    events.add({});
    events.add({});
    AlertmanagerSink sink(config());
    server.set(status, 400);
    EXPECT_EQ(deliver(sink), 0u);
    EXPECT_EQ(sink.error(),
              "127.0.0.1:" + std::to_string(server.port()) + " answered with status 400");
    server.set(status, 200);
    EXPECT_EQ(deliver(sink), 2u);
}

TEST_F(AlertmanagerSinkTest, IsNamedAfterItsHost) {
    const AlertmanagerSink sink(config());
    EXPECT_EQ(sink.name(), "alertmanager 127.0.0.1:" + std::to_string(server.port()));
}

} // namespace
