#include "host/history/EventTable.h"

#include <algorithm>

#include <xxhash.h>

#include <nlohmann/json.hpp>

namespace zrm::host {

std::int64_t eventChecksum(std::int64_t id, std::int64_t raised, std::int64_t label,
                           std::string_view json) noexcept {
    // Odd multipliers: different values of one number always give different seeds, on any machine.
    const std::uint64_t seed = static_cast<std::uint64_t>(id) * 0x9e3779b97f4a7c15 +
                               static_cast<std::uint64_t>(raised) * 0xc2b2ae3d27d4eb4f +
                               static_cast<std::uint64_t>(label) * 0x165667b19e3779f9;
    return static_cast<std::int64_t>(XXH3_64bits_withSeed(json.data(), json.size(), seed));
}

namespace {

/// The columns of StoredEventRow::select.
enum class Column { ID, RAISED, SITUATION, SEVERITY, LOG, JSON, TEXT, SILENCE, LABEL, CHECKSUM };

std::int64_t integer(const Statement& row, Column column) {
    return row.integer(static_cast<int>(column));
}

std::string_view text(const Statement& row, Column column) {
    return row.text(static_cast<int>(column));
}

} // namespace

const char* const StoredEventRow::select =
    "SELECT events.id, raised, situation, severity, path, json, text, silence, label,"
    " checksum FROM events"
    " LEFT JOIN labels ON labels.id = label LEFT JOIN logs ON logs.id = log WHERE ";

EventRecord StoredEventRow::record() const {
    return {static_cast<std::uint64_t>(integer(m_row, Column::ID)),
            integer(m_row, Column::RAISED),
            text(m_row, Column::SITUATION),
            text(m_row, Column::SEVERITY),
            text(m_row, Column::LOG),
            text(m_row, Column::JSON),
            text(m_row, Column::TEXT),
            static_cast<std::uint64_t>(integer(m_row, Column::SILENCE))};
}

bool StoredEventRow::isIntact() const {
    return m_row.isNull(static_cast<int>(Column::CHECKSUM))
               ? nlohmann::json::accept(text(m_row, Column::JSON))
               : integer(m_row, Column::CHECKSUM) ==
                     eventChecksum(integer(m_row, Column::ID), integer(m_row, Column::RAISED),
                                   integer(m_row, Column::LABEL), text(m_row, Column::JSON));
}

EventTable::EventTable(Database& database)
    : m_database(database),
      m_insert(database, "INSERT INTO events (id, raised, label, json, checksum)"
                         " VALUES (?, ?, ?, ?, ?)"),
      m_mark(database, "INSERT INTO marks (part, earliest, latest) VALUES (?, ?, ?)"
                       " ON CONFLICT (part) DO UPDATE SET"
                       " earliest = min(earliest, excluded.earliest),"
                       " latest = max(latest, excluded.latest)"),
      m_oldestMoments(database, "SELECT id, raised FROM events ORDER BY id LIMIT ?"),
      m_firstMoment(database, "SELECT earliest FROM marks WHERE part >= ? AND earliest <= ?"
                              " ORDER BY part LIMIT 1"),
      m_remove(database, "DELETE FROM events WHERE id <= ?"),
      m_removeMarks(database, "DELETE FROM marks WHERE part < ?") {}

void EventTable::append(std::span<const EventRecord> events, std::span<const std::int64_t> labels) {
    for (std::size_t index = 0; index < events.size(); ++index) {
        const EventRecord& event = events[index];
        m_insert.bind(1, event.id).bind(2, event.raised).bind(3, labels[index]).bind(4, event.json);
        m_insert.bind(5, eventChecksum(static_cast<std::int64_t>(event.id), event.raised,
                                       labels[index], event.json));
        m_insert.run();
    }
    while (!events.empty()) {
        const std::uint64_t part = events.front().id / partSize;
        const auto end =
            std::partition_point(events.begin(), events.end(), [part](const EventRecord& event) {
                return event.id / partSize == part;
            });
        const auto count = static_cast<std::size_t>(end - events.begin());
        mark(events.first(count));
        events = events.subspan(count);
    }
}

void EventTable::mark(std::span<const EventRecord> events) {
    const auto [earliest, latest] = std::minmax_element(
        events.begin(), events.end(),
        [](const EventRecord& a, const EventRecord& b) { return a.raised < b.raised; });
    m_mark.bind(1, events.front().id / partSize);
    m_mark.bind(2, earliest->raised).bind(3, latest->raised).run();
}

std::uint64_t EventTable::oldest() {
    return static_cast<std::uint64_t>(m_database.number("SELECT min(id) FROM events"));
}

std::uint64_t EventTable::newest() {
    return static_cast<std::uint64_t>(m_database.number("SELECT max(id) FROM events"));
}

std::vector<EventTable::Moment> EventTable::oldestMoments(std::size_t most) {
    std::vector<Moment> moments;
    m_oldestMoments.bind(1, std::uint64_t{most});
    while (m_oldestMoments.step()) {
        moments.push_back(
            {static_cast<std::uint64_t>(m_oldestMoments.integer(0)), m_oldestMoments.integer(1)});
    }
    m_oldestMoments.reset();
    return moments;
}

std::optional<std::int64_t> EventTable::firstMomentFrom(std::uint64_t id, std::int64_t time) {
    std::optional<std::int64_t> moment;
    if (m_firstMoment.bind(1, id / partSize).bind(2, time).step()) {
        moment = m_firstMoment.integer(0);
    }
    m_firstMoment.reset();
    return moment;
}

void EventTable::removeUntil(std::uint64_t id) {
    m_remove.bind(1, id).run();
    // The part of the next event keeps its marks, also those of removed events: a mark may cover
    // more than its events.
    m_removeMarks.bind(1, (id + 1) / partSize).run();
}

} // namespace zrm::host
