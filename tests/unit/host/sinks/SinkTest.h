#ifndef ZRM_TESTS_SINK_TEST_H
#define ZRM_TESTS_SINK_TEST_H

#include "host/base/TimeText.h"
#include "host/config/ConfigFile.h"
#include "host/events/Event.h"

#include <gtest/gtest.h>

#include <deque>
#include <string>
#include <utility>
#include <vector>

using namespace zrm::host;

/// The sink that this text configures, placed after [[sink]].
inline SinkConfig sinkConfig(const std::string& text) {
    const ConfigFile::Result result = ConfigFile::parse("[[sink]]\n" + text, "zrm.toml");
    if (!result) {
        ADD_FAILURE() << result.error().front();
        return {};
    }
    return result->sinks.front();
}

/// Events of the Log Entries table as records, one second after the other.
class EntryEvents {
public:
    struct Entry {
        std::string description = "Failed password for root";
        std::string situation = "ssh-bruteforce";
        std::string severity = "critical";
        std::string log = "/var/log/auth.log";
        std::string text = {};        ///< of the situation
        std::string more = {};        ///< further members of the JSON, each behind a comma
        std::string column = "short"; ///< ENTRYDESC
    };
    static constexpr std::int64_t raisedAt = 1'795'158'189'412; ///< of the first event

    /// Adds an event; its texts need no escaping in JSON.
    void add(const Entry& entry) {
        m_entries.push_back(entry);
        const Entry& kept = m_entries.back();
        const std::uint64_t id = m_records.size() + 1;
        const std::int64_t raised = raisedAt + 1000 * static_cast<std::int64_t>(id - 1);
        m_texts.push_back(R"({"id":)" + std::to_string(id) + R"(,"situation":")" + kept.situation +
                          R"(","severity":")" + kept.severity + R"(","raised":")" +
                          UtcTime::text(raised) +
                          R"(","row":{"ORIGINNODE":"web1:ZRM","ENTRYSRC":"sshd","ENTRYDESC":")" +
                          kept.column + R"(","SAMPLENO":3,"UENTRYSRC":"","UENTRYDESC":")" +
                          kept.description + R"("})" + kept.more + "}");
        m_records.push_back(
            {id, raised, kept.situation, kept.severity, kept.log, m_texts.back(), kept.text});
    }
    const std::vector<EventRecord>& records() const { return m_records; }

    /// Adds an event that no entry raised: `members` of its JSON, each behind a comma.
    void addWithoutRow(const std::string& members) {
        const std::uint64_t id = m_records.size() + 1;
        m_texts.push_back(R"({"id":)" + std::to_string(id) + members + "}");
        m_records.push_back({id,
                             raisedAt + 3'600'000,
                             "ssh-bruteforce",
                             "critical",
                             "/var/log/auth.log",
                             m_texts.back(),
                             {}});
    }
    /// Members of an event's JSON for an episode of 74 entries of one address.
    static std::string episode(const std::string& state) {
        return R"(,"state":")" + state +
               R"(","episode":{"id":1,"raised":"2026-11-20T07:03:09.412Z","count":74,)"
               R"("first":"2026-11-20T07:00:00.000Z","last":"2026-11-20T07:01:00.000Z"},)"
               R"("group":{"ip":"10.0.0.1"})";
    }
    static constexpr const char* withoutRow = R"(,"log":"/var/log/auth.log","node":"web1:ZRM")";

private:
    std::deque<Entry> m_entries;
    std::deque<std::string> m_texts;
    std::vector<EventRecord> m_records;
};

/// A config whose requests take no longer than this.
inline SinkConfig within(std::chrono::milliseconds limit, SinkConfig config) {
    config.options.insert_or_assign("timeout", limit);
    return config;
}

#endif
