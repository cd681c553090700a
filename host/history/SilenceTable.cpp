#include "host/history/SilenceTable.h"

#include "host/base/Say.h"
#include "host/silences/SilenceJson.h"

#include <cinttypes>
#include <string>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

/// The columns of a silence, in the order of Column.
constexpr const char* columns =
    "id, match, created, until, who, why, expired, expired_by, events, last";
enum class Column { ID, MATCH, CREATED, UNTIL, WHO, WHY, EXPIRED, EXPIRED_BY, EVENTS, LAST };

std::int64_t integer(const Statement& row, Column column) {
    return row.integer(static_cast<int>(column));
}

std::string text(const Statement& row, Column column) {
    return std::string(row.text(static_cast<int>(column)));
}

Silence silenceOf(const Statement& row) {
    Silence silence;
    silence.id = static_cast<std::uint64_t>(integer(row, Column::ID));
    silence.created = integer(row, Column::CREATED);
    silence.until = integer(row, Column::UNTIL);
    silence.who = text(row, Column::WHO);
    silence.why = text(row, Column::WHY);
    if (!row.isNull(static_cast<int>(Column::EXPIRED))) {
        silence.expired = integer(row, Column::EXPIRED);
    }
    silence.expiredBy = text(row, Column::EXPIRED_BY);
    silence.events = static_cast<std::uint64_t>(integer(row, Column::EVENTS));
    silence.last = integer(row, Column::LAST);
    return silence;
}

} // namespace

SilenceTable::SilenceTable(Database& database)
    : m_keep(database, std::string("INSERT INTO silences (") + columns +
                           ") VALUES (?, ?, ?, ?, ?, ?, nullif(?, 0), ?, ?, ?) ON CONFLICT (id)"
                           " DO UPDATE SET expired = excluded.expired,"
                           " expired_by = excluded.expired_by"),
      m_count(database, "UPDATE silences SET events = events + ?, last = max(last, ?)"
                        " WHERE id = ?"),
      m_remove(database, "DELETE FROM silences WHERE id = ?") {}

void SilenceTable::keep(const Silence& silence) {
    const std::string match = SilenceJson::match(silence.match);
    m_keep.bind(1, silence.id)
        .bind(2, std::string_view(match))
        .bind(3, silence.created)
        .bind(4, silence.until)
        .bind(5, std::string_view(silence.who))
        .bind(6, std::string_view(silence.why))
        .bind(7, silence.expired.value_or(0))
        .bind(8, std::string_view(silence.expiredBy))
        .bind(9, silence.events)
        .bind(10, silence.last)
        .run();
}

void SilenceTable::count(const SilencedEvents& events) {
    m_count.bind(1, events.events).bind(2, events.last).bind(3, events.silence).run();
}

void SilenceTable::remove(const std::vector<std::uint64_t>& ids) {
    for (const std::uint64_t id : ids) {
        m_remove.bind(1, id).run();
    }
}

KeptSilences SilenceTable::read(Database& database) {
    KeptSilences kept;
    kept.lastId = static_cast<std::uint64_t>(
        database.number("SELECT seq FROM sqlite_sequence WHERE name = 'silences'"));
    Statement rows(database, std::string("SELECT ") + columns + " FROM silences");
    while (rows.step()) {
        Silence silence = silenceOf(rows);
        if (auto match = SilenceJson::parseMatch(text(rows, Column::MATCH))) {
            silence.match = std::move(*match);
            kept.silences.push_back(std::move(silence));
        } else {
            say("silence %" PRIu64 " is damaged in the history and no longer holds; create it "
                "again",
                silence.id);
        }
    }
    return kept;
}

} // namespace zrm::host
