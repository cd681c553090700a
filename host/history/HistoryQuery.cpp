#include "host/history/HistoryQuery.h"

#include "host/history/EventTable.h"

#include <algorithm>
#include <deque>
#include <limits>
#include <queue>
#include <string>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

constexpr auto noBound = static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max());
constexpr auto partSize = static_cast<std::int64_t>(EventTable::partSize);

/// A page ends once its events have this many bytes.
constexpr std::size_t mostBytes = std::size_t{8} * 1024 * 1024;

/// A search checks the clock once per this many events.
constexpr std::size_t eventsBetweenLooksAtTheClock = 64;

std::string condition(std::string_view column, std::size_t values) {
    std::string text = " AND " + std::string(column) + " IN (?";
    for (std::size_t more = 1; more < values; ++more) {
        text += ",?";
    }
    return text + ')';
}

} // namespace

HistoryQuery::HistoryQuery(Database& database, const EventFilter& filter,
                           std::chrono::milliseconds longest)
    : m_database(database), m_filter(filter),
      m_first(static_cast<std::int64_t>(std::min(filter.after, noBound - 1) + 1)),
      m_last(static_cast<std::int64_t>(std::min(filter.before.value_or(noBound), noBound)) - 1),
      m_text(filter.text), m_searchLimit(Clock::now() + longest) {}

EventPage HistoryQuery::run() {
    if (m_filter.from || m_filter.to) {
        narrowToTime();
    }
    if (m_first > m_last || m_filter.limit == 0) {
        return {};
    }
    if (hasLabelFilter()) {
        walkLabels(labels());
    } else {
        walkAll();
    }
    return std::move(m_found);
}

/// Narrows the bounds to the parts with events in the time window.
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
    return !m_filter.situations.empty() || !m_filter.logs.empty() || !m_filter.severities.empty() ||
           m_filter.silenced.has_value();
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
    if (m_filter.silenced) {
        sql += *m_filter.silenced ? " AND silence <> 0" : " AND silence = 0";
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
    Statement events(m_database, std::string(StoredEventRow::select) +
                                     "events.id BETWEEN ? AND ? ORDER BY events.id" + direction());
    events.bind(1, m_first).bind(2, m_last);
    while (!isDone() && events.step()) {
        look(events);
    }
}

void HistoryQuery::walkLabels(const std::vector<std::int64_t>& labels) {
    Statement event(m_database, std::string(StoredEventRow::select) + "events.id = ?");
    const std::string sql = std::string("SELECT id FROM events INDEXED BY events_by_label"
                                        " WHERE label = ? AND id BETWEEN ? AND ? ORDER BY id") +
                            direction();
    // Each label has its own cursor; take the one whose next event comes first.
    std::deque<Statement> walks;
    std::priority_queue<std::pair<std::int64_t, std::size_t>> nexts; // rank and index of the cursor
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
    while (!isDone() && !nexts.empty()) {
        const auto [rank, walk] = nexts.top();
        nexts.pop();
        if (event.bind(1, m_filter.newestFirst ? rank : -rank).step()) {
            look(event);
        }
        event.reset();
        advance(walk);
    }
}

/// Whether the page is complete or the search time is up.
bool HistoryQuery::isDone() const noexcept {
    return m_found.events.size() >= m_filter.limit || m_found.reached;
}

/// Takes the event if it is wanted, and ends the search when its time is up.
void HistoryQuery::look(const Statement& statement) {
    const StoredEventRow row(statement);
    const EventRecord event = row.record();
    if (isWanted(event)) {
        if (row.isIntact()) {
            m_bytes += event.json.size();
            m_found.events.push_back({event.id, event.raised, std::string(event.situation),
                                      std::string(event.severity), std::string(event.log),
                                      std::string(event.json)});
        } else {
            m_found.damaged.push_back(event.id);
        }
    }
    if (m_bytes > mostBytes ||
        (!m_text.isEmpty() && ++m_looked % eventsBetweenLooksAtTheClock == 0 &&
         Clock::now() >= m_searchLimit)) {
        m_found.reached = event.id;
    }
}

bool HistoryQuery::isWanted(const EventRecord& event) const {
    // The parts of a window also contain events outside of it.
    return (!m_filter.from || event.raised >= *m_filter.from) &&
           (!m_filter.to || event.raised <= *m_filter.to) &&
           (m_text.isEmpty() || m_text.isIn(event.log, event.json));
}

} // namespace zrm::host
