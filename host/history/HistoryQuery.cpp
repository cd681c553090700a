#include "host/history/HistoryQuery.h"

#include "host/history/EventTable.h"

#include <algorithm>
#include <deque>
#include <limits>
#include <queue>
#include <string>
#include <string_view>
#include <utility>

namespace {

constexpr auto noBound = static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max());
constexpr auto partSize = static_cast<std::int64_t>(EventTable::partSize);

/// Columns in the order in which take reads them.
constexpr const char* selectEvents =
    "SELECT events.id, raised, situation, severity, path, json FROM events"
    " JOIN labels ON labels.id = label JOIN logs ON logs.id = log WHERE ";

std::string condition(std::string_view column, std::size_t values) {
    std::string text = " AND " + std::string(column) + " IN (?";
    for (std::size_t more = 1; more < values; ++more) {
        text += ",?";
    }
    return text + ')';
}

} // namespace

HistoryQuery::HistoryQuery(Database& database, const EventFilter& filter)
    : m_database(database), m_filter(filter),
      m_first(static_cast<std::int64_t>(std::min(filter.after, noBound - 1) + 1)),
      m_last(static_cast<std::int64_t>(std::min(filter.before.value_or(noBound), noBound)) - 1) {}

std::vector<StoredEvent> HistoryQuery::run() {
    if (m_filter.from || m_filter.to) {
        narrowToTime();
    }
    if (m_first > m_last || full()) {
        return {};
    }
    if (hasLabelFilter()) {
        walkLabels(labels());
    } else {
        walkAll();
    }
    return std::move(m_found);
}

/// Narrows the bounds to the parts that have events of the window.
void HistoryQuery::narrowToTime() {
    Statement parts(m_database, "SELECT min(part), max(part) FROM marks"
                                " WHERE latest >= ? AND earliest <= ?");
    parts.bind(1, m_filter.from.value_or(std::numeric_limits<std::int64_t>::min()));
    parts.bind(2, m_filter.to.value_or(std::numeric_limits<std::int64_t>::max()));
    if (!parts.step() || parts.isNull(0)) {
        m_last = 0;
        return;
    }
    m_first = std::max(m_first, parts.integer(0) * partSize);
    m_last = std::min(m_last, (parts.integer(1) + 1) * partSize - 1);
}

bool HistoryQuery::hasLabelFilter() const noexcept {
    return !m_filter.situations.empty() || !m_filter.logs.empty() || !m_filter.severities.empty();
}

std::vector<std::int64_t> HistoryQuery::labels() {
    const std::pair<const char*, const std::vector<std::string>*> filters[] = {
        {"situation", &m_filter.situations},
        {"severity", &m_filter.severities},
        {"path", &m_filter.logs},
    };
    std::string sql = "SELECT labels.id FROM labels JOIN logs ON logs.id = log WHERE 1";
    for (const auto& [column, values] : filters) {
        if (!values->empty()) {
            sql += condition(column, values->size());
        }
    }
    Statement found(m_database, sql);
    int parameter = 0;
    for (const auto& [column, values] : filters) {
        for (const std::string& value : *values) {
            found.bind(++parameter, std::string_view(value));
        }
    }
    std::vector<std::int64_t> ids;
    while (found.step()) {
        ids.push_back(found.integer(0));
    }
    return ids;
}

void HistoryQuery::walkAll() {
    Statement events(m_database, std::string(selectEvents) +
                                     "events.id BETWEEN ? AND ? ORDER BY events.id" + direction());
    events.bind(1, m_first).bind(2, m_last);
    while (!full() && events.step()) {
        take(events);
    }
}

void HistoryQuery::walkLabels(const std::vector<std::int64_t>& labels) {
    Statement event(m_database, std::string(selectEvents) + "events.id = ?");
    const std::string sql = std::string("SELECT id FROM events INDEXED BY events_by_label"
                                        " WHERE label = ? AND id BETWEEN ? AND ? ORDER BY id") +
                            direction();
    // Each label has a walk of its own; the one whose next event is first in order is taken.
    std::deque<Statement> walks;
    std::priority_queue<std::pair<std::int64_t, std::size_t>> nexts; // rank and walk
    const auto advance = [&](std::size_t walk) {
        if (walks[walk].step()) {
            const std::int64_t id = walks[walk].integer(0);
            nexts.emplace(m_filter.newestFirst ? id : -id, walk);
        }
    };
    for (const std::int64_t label : labels) {
        walks.emplace_back(m_database, sql).bind(1, label).bind(2, m_first).bind(3, m_last);
        advance(walks.size() - 1);
    }
    while (!full() && !nexts.empty()) {
        const auto [rank, walk] = nexts.top();
        nexts.pop();
        if (event.bind(1, m_filter.newestFirst ? rank : -rank).step()) {
            take(event);
        }
        event.reset();
        advance(walk);
    }
}

void HistoryQuery::take(Statement& event) {
    const std::int64_t raised = event.integer(1);
    // The parts of a window have others beside its events.
    if ((m_filter.from && raised < *m_filter.from) || (m_filter.to && raised > *m_filter.to)) {
        return;
    }
    m_found.push_back({static_cast<std::uint64_t>(event.integer(0)), raised,
                       std::string(event.text(2)), std::string(event.text(3)),
                       std::string(event.text(4)), std::string(event.text(5))});
}
