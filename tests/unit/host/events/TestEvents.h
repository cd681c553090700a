#ifndef ZRM_TESTS_TEST_EVENTS_H
#define ZRM_TESTS_TEST_EVENTS_H

#include "host/events/Event.h"
#include "host/events/EventJson.h"
#include "host/framework/Request.h"
#include "host/framework/RowLayout.h"
#include "unit/host/framework/TestTable.h"

#include <deque>
#include <memory>
#include <string>
#include <vector>

using namespace zrm::host;

/// The layout of the test table's rows.
inline RowLayout testLayout() {
    TestManager manager;
    TestReceiver receiver;
    RequestDetail detail;
    detail.name = "layout";
    detail.sampleType = SAMPLE_REPORT;
    const Request request(manager, detail, receiver);
    return RowLayout(*request.get());
}

/// Events with rows of the test table, as a queue would return them.
class TestEvents {
public:
    /// Adds the next event; its row has this text.
    void add(const std::string& text) {
        m_rows.emplace_back("/var/log/", "app.log", text, 7);
        Event event;
        event.id = m_events.size() + 1;
        event.raised = 1'795'158'189'412;
        event.situation = m_label;
        event.row = m_rows.back().bytes();
        m_events.push_back(event);
    }
    const std::vector<Event>& all() const { return m_events; }

    /// The same events as records.
    const std::vector<EventRecord>& records() {
        const EventJson json(testLayout());
        m_records.clear();
        m_texts.clear();
        for (const Event& event : m_events) {
            json.append(m_texts.emplace_back(), event);
            m_records.push_back(
                {event.id, event.raised, "watch", "minor", "/var/log/app.log", m_texts.back()});
        }
        return m_records;
    }

    /// The line of the event with this id and text.
    static std::string line(int id, const std::string& text) {
        return R"({"id":)" + std::to_string(id) +
               R"(,"situation":"watch","severity":"minor","raised":"2026-11-20T07:03:09.412Z",)" +
               R"("row":{"LOGPATH":"/var/log/","LOGNAME":"app.log","TEXT":")" + text +
               R"(","NUMBER":7}})" + "\n";
    }

private:
    std::shared_ptr<const SituationLabel> m_label =
        std::make_shared<const SituationLabel>(SituationLabel{"watch", "minor"});
    std::deque<TestRow> m_rows;
    std::vector<Event> m_events;
    std::deque<std::string> m_texts;
    std::vector<EventRecord> m_records;
};

#endif
