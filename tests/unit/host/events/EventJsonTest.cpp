#include "host/events/EventJson.h"

#include "TestEvents.h"

#include <gtest/gtest.h>

#include <string>

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

TEST(EventJson, NamesTheLogByItsFullPath) {
    TestEvents events;
    events.add("");
    std::string text = "log ";
    EventJson(testLayout()).appendLog(text, events.all()[0]);
    EXPECT_EQ(text, "log /var/log/app.log");
}

} // namespace
