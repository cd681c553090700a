#ifndef ZRM_TESTS_TEST_BATCH_H
#define ZRM_TESTS_TEST_BATCH_H

#include "host/history/EventBatch.h"

#include <cstdint>
#include <initializer_list>
#include <memory>
#include <string>
#include <vector>

using namespace zrm::host;

/// When test events are raised: 2026-11-20, UTC.
inline constexpr std::int64_t testTime = 1'795'158'189'412;

/// An event for tests; its text need not be JSON for a history.
inline EventRecord testEvent(std::uint64_t id, std::int64_t raised = testTime,
                             std::string_view situation = "watch",
                             std::string_view log = "/var/log/app.log",
                             std::string_view severity = "minor") {
    return {id, raised, situation, severity, log, "{}"};
}

inline std::shared_ptr<const EventBatch> batchOf(const std::vector<EventRecord>& events) {
    auto batch = std::make_shared<EventBatch>();
    for (const EventRecord& event : events) {
        batch->add(event);
    }
    batch->seal();
    return batch;
}

/// Events with ids from `first` to `last`, all raised at the same time.
inline std::shared_ptr<const EventBatch> batchOf(std::uint64_t first, std::uint64_t last,
                                                 std::int64_t raised = testTime) {
    std::vector<EventRecord> events;
    for (std::uint64_t id = first; id <= last; ++id) {
        events.push_back(testEvent(id, raised));
    }
    return batchOf(events);
}

/// The numbers from `first` to `last`.
inline std::vector<std::uint64_t> idsFrom(std::uint64_t first, std::uint64_t last) {
    std::vector<std::uint64_t> ids;
    for (std::uint64_t id = first; id <= last; ++id) {
        ids.push_back(id);
    }
    return ids;
}

#endif
