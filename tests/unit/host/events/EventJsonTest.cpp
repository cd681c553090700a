#include "host/events/EventJson.h"

#include "TestEvents.h"
#include "host/base/TimeText.h"
#include "host/events/Episode.h"
#include "host/events/RowText.h"
#include "support/AllocationCount.h"

#include <gtest/gtest.h>

#include <random>
#include <string>

#include <nlohmann/json.hpp>

using namespace zrm::host;

namespace {

TEST(EventJson, WritesAnEventAsOneObject) {
    TestEvents events;
    events.add("Failed password");
    std::string text = "before ";
    EventJson(testLayout()).append(text, events.all()[0]);
    EXPECT_EQ(text + "\n", "before " + TestEvents::line(1, "Failed password"));
}

TEST(EventJson, QuotesTheSituation) {
    TestEvents events;
    events.add("");
    Event event = events.all()[0];
    event.situation =
        std::make_shared<const SituationLabel>(SituationLabel{"a \"quoted\" name", "info"});
    event.raised = 5;
    std::string text;
    EventJson(testLayout()).append(text, event);
    EXPECT_EQ(text, R"({"id":1,"situation":"a \"quoted\" name","severity":"info",)"
                    R"("raised":"1970-01-01T00:00:00.005Z","row":{"LOGPATH":"/var/log/",)"
                    R"("LOGNAME":"app.log","TEXT":"","NUMBER":7}})");
}

/// An event's JSON by plain means.
std::string model(const Event& event) {
    const RowLayout layout = testLayout();
    const auto quoted = [](std::string_view text) {
        constexpr auto replace = nlohmann::json::error_handler_t::replace;
        return nlohmann::json(text).dump(-1, ' ', false, replace);
    };
    std::string row;
    std::string room;
    for (const RowColumn& column : layout.columns()) {
        row += (row.empty() ? "\"" : ",\"") + column.name + "\":" +
               (column.isInteger() ? std::to_string(column.integer(event.row))
                                   : quoted(RowText::of(column, event.row, room)));
    }
    return "{\"id\":" + std::to_string(event.id) +
           ",\"situation\":" + quoted(event.situation->name) +
           ",\"severity\":" + quoted(event.situation->severity) + ",\"raised\":\"" +
           UtcTime::text(event.raised) + "\",\"row\":{" + row + "}}";
}

TEST(EventJson, WritesWhatPlainMeansGive) {
    std::mt19937 random(20261122);
    const auto text = [&](std::size_t longest) {
        std::string result(random() % (longest + 1), ' ');
        for (char& c : result) {
            c = static_cast<char>(random() % 4 == 0 ? random() % 0x7f : 'a' + random() % 26);
        }
        return result;
    };
    for (int round = 0; round < 5000; ++round) {
        TestRow row(text(16), text(12), text(32), static_cast<std::int32_t>(random()));
        const auto label =
            std::make_shared<const SituationLabel>(SituationLabel{text(80), text(10)});
        Event event;
        event.id = random();
        event.raised = static_cast<std::int64_t>(random());
        event.situation = label;
        event.row = row.bytes();
        std::string written;
        EventJson(testLayout()).append(written, event);
        ASSERT_EQ(written, model(event));
    }
}

TEST(EventJson, WritesWhatTheSituationAdds) {
    TestEvents events;
    events.add("");
    Event event = events.all()[0];
    SituationLabel label{"a", "info", "{count} \"times\""};
    label.runbook = "https://wiki/a";
    label.labels = R"({"team":"web"})";
    event.situation = std::make_shared<const SituationLabel>(label);
    auto judgement = std::make_shared<EventJudgement>();
    judgement->text = "5 \"times\"";
    event.judgement = judgement;
    std::string text;
    EventJson(testLayout()).append(text, event);
    EXPECT_NE(text.find(R"(412Z","text":"5 \"times\"","runbook":"https://wiki/a",)"
                        R"("labels":{"team":"web"},"row":{)"),
              std::string::npos)
        << text;
}

TEST(EventJson, AllocatesNothingForAnEvent) {
    TestEvents events;
    events.add("a \"quoted\" text");
    const EventJson format(testLayout());
    std::string text;
    text.reserve(2000);
    format.append(text, events.all()[0]); // reads the time zone
    const long before = allocationCount();
    format.append(text, events.all()[0]);
    EXPECT_EQ(allocationCount(), before);
}

TEST(EventJson, NamesTheLogByItsFullPath) {
    TestEvents events;
    events.add("");
    std::string text = "log ";
    EventJson(testLayout()).appendLog(text, events.all()[0]);
    EXPECT_EQ(text, "log /var/log/app.log");
}

} // namespace
