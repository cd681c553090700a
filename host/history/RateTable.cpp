#include "host/history/RateTable.h"

#include <algorithm>
#include <cstddef>
#include <vector>

namespace zrm::host {

namespace {

constexpr std::int64_t millisecondsPerMinute = 60'000;
constexpr std::int64_t minutesKept = 24 * 60;

constexpr const char* forget = " WHERE minute < ? OR minute > ?";

/// The steps of a window, in minutes.
struct Steps {
    std::int64_t start;
    std::int64_t each;
    std::size_t count;

    std::size_t at(std::int64_t minute) const {
        return static_cast<std::size_t>((minute - start) / each);
    }
    std::int64_t end() const { return start + static_cast<std::int64_t>(count) * each; }
};

Steps stepsOf(std::int64_t from, std::int64_t to, std::int64_t step) {
    const std::int64_t each = std::max<std::int64_t>(step / millisecondsPerMinute, 1);
    const std::int64_t length = each * millisecondsPerMinute;
    const std::int64_t start = from / length;
    const std::int64_t end = std::max((to + length - 1) / length, start);
    return {start * each, each, static_cast<std::size_t>(end - start)};
}

/// Counts of zero for watched minutes, none for others.
LogRates::Counts watchedCounts(Database& database, const Steps& steps) {
    LogRates::Counts counts(steps.count);
    Statement minutes(database, "SELECT minute FROM minutes WHERE minute >= ? AND minute < ?");
    minutes.bind(1, steps.start).bind(2, steps.end());
    while (minutes.step()) {
        counts[steps.at(minutes.integer(0))] = 0;
    }
    return counts;
}

void addTo(std::optional<std::uint64_t>& count, std::int64_t more) {
    count = count.value_or(0) + static_cast<std::uint64_t>(more);
}

} // namespace

RateTable::RateTable(Database& database)
    : m_add(database, "INSERT INTO rates (minute, log, entries, events) VALUES (?, ?, ?, ?)"
                      " ON CONFLICT (minute, log) DO UPDATE SET"
                      " entries = entries + excluded.entries, events = events + excluded.events"),
      m_watched(database, "INSERT OR IGNORE INTO minutes (minute) VALUES (?)"),
      m_forgetMinutes(database, std::string("DELETE FROM minutes") + forget),
      m_forgetRates(database, std::string("DELETE FROM rates") + forget) {}

void RateTable::add(std::int64_t minute, std::int64_t log, std::uint64_t entries,
                    std::uint64_t events) {
    m_add.bind(1, minute).bind(2, log).bind(3, entries).bind(4, events).run();
}

void RateTable::watched(std::int64_t minute) {
    m_watched.bind(1, minute).run();
    for (Statement* const statement : {&m_forgetMinutes, &m_forgetRates}) {
        // Minutes far ahead were counted by a clock that has since been corrected.
        statement->bind(1, minute - minutesKept).bind(2, minute + minutesKept).run();
    }
}

Rates RateTable::read(Database& database, std::int64_t from, std::int64_t to, std::int64_t step) {
    const Steps steps = stepsOf(from, to, step);
    Rates rates;
    rates.start = steps.start * millisecondsPerMinute;
    rates.step = steps.each * millisecondsPerMinute;
    const LogRates::Counts none = watchedCounts(database, steps);
    Statement rows(database, "SELECT path, minute, entries, events FROM rates JOIN logs ON id = log"
                             " WHERE minute >= ? AND minute < ? ORDER BY path");
    rows.bind(1, steps.start).bind(2, steps.end());
    while (rows.step()) {
        if (rates.logs.empty() || rates.logs.back().log != rows.text(0)) {
            rates.logs.push_back({std::string(rows.text(0)), none, none});
        }
        const std::size_t index = steps.at(rows.integer(1));
        addTo(rates.logs.back().entries[index], rows.integer(2));
        addTo(rates.logs.back().events[index], rows.integer(3));
    }
    return rates;
}

} // namespace zrm::host
