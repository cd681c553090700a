#ifndef ZRM_TESTS_TEST_HISTORY_H
#define ZRM_TESTS_TEST_HISTORY_H

#include "host/history/HistoryReader.h"

#include <algorithm>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <optional>
#include <stop_token>
#include <string>
#include <vector>

using namespace zrm::host;

/// A history for tests: the added events, oldest first. It records the last query.
class TestHistory : public HistoryReader {
public:
    void add(std::uint64_t id, const std::string& situation = "s") {
        {
            const std::lock_guard guard(m_mutex);
            m_events.push_back(
                {id, 0, situation, "info", "/log", "{\"id\":" + std::to_string(id) + "}"});
        }
        m_changed.notify_all();
    }
    /// From now on reading the file fails.
    void fail() {
        const std::lock_guard guard(m_mutex);
        m_fails = true;
    }
    EventFilter lastFilter() const {
        const std::lock_guard guard(m_mutex);
        return m_filter;
    }

    Result<EventPage> query(const EventFilter& filter) override {
        const std::lock_guard guard(m_mutex);
        if (m_fails) {
            return refused("disk I/O error");
        }
        m_filter = filter;
        std::vector<StoredEvent> found;
        for (const StoredEvent& event : m_events) {
            const auto& names = filter.situations;
            const bool isNamed = names.empty() || std::find(names.begin(), names.end(),
                                                            event.situation) != names.end();
            if (event.id > filter.after && (!filter.before || event.id < *filter.before) &&
                isNamed) {
                found.push_back(event);
            }
        }
        if (filter.newestFirst) {
            std::reverse(found.begin(), found.end());
        }
        found.resize(std::min(found.size(), filter.limit));
        return EventPage{std::move(found), damaged, reached};
    }
    Result<std::optional<StoredEvent>> event(std::uint64_t id) override {
        const std::lock_guard guard(m_mutex);
        if (m_fails) {
            return refused("disk I/O error");
        }
        for (const StoredEvent& event : m_events) {
            if (event.id == id) {
                return event;
            }
        }
        return std::nullopt;
    }
    Result<std::vector<EpisodeRecord>> episodes(const EpisodeFilter& filter) override {
        const std::lock_guard guard(m_mutex);
        if (m_fails) {
            return refused("disk I/O error");
        }
        episodeFilter = filter;
        return storedEpisodes;
    }
    Result<std::uint64_t> acknowledgedEpisodes() override { return 1; }
    std::uint64_t newest() const override {
        const std::lock_guard guard(m_mutex);
        return m_events.empty() ? 0 : m_events.back().id;
    }
    std::uint64_t waitBeyond(std::uint64_t id, Clock::time_point limit,
                             const std::stop_token& stop) override {
        std::unique_lock lock(m_mutex);
        m_changed.wait_until(lock, stop, limit,
                             [&] { return !m_events.empty() && m_events.back().id > id; });
        return m_events.empty() ? 0 : m_events.back().id;
    }
    HistoryState state() override {
        const std::lock_guard guard(m_mutex);
        HistoryState state;
        state.oldest = m_events.empty() ? 0 : m_events.front().id;
        state.newest = m_events.empty() ? 0 : m_events.back().id;
        return state;
    }
    Result<Rates> rates(std::int64_t from, std::int64_t to, std::int64_t step) override {
        const std::lock_guard guard(m_mutex);
        if (m_fails) {
            return refused("disk I/O error");
        }
        ratesFrom = from;
        ratesTo = to;
        return Rates{from, step, {{"/a", {1, std::nullopt}, {0, std::nullopt}}, {"/b", {}, {}}}};
    }

    std::vector<std::uint64_t> damaged; ///< what queries report as damaged
    std::vector<EpisodeRecord> storedEpisodes;
    EpisodeFilter episodeFilter;          ///< of the last query for episodes
    std::optional<std::uint64_t> reached; ///< where queries report that they stopped
    std::int64_t ratesFrom = 0;
    std::int64_t ratesTo = 0;

private:
    mutable std::mutex m_mutex;
    std::condition_variable_any m_changed;
    std::vector<StoredEvent> m_events;
    EventFilter m_filter;
    bool m_fails = false;
};

#endif
