#include "host/history/HistoryFile.h"

#include "host/base/TimeText.h"
#include "host/history/Schema.h"

#include <algorithm>
#include <optional>

namespace zrm::host {

namespace {

constexpr std::int64_t millisecondsPerMinute = 60'000;
constexpr std::int64_t millisecondsPerDay = 24 * 60 * millisecondsPerMinute;
constexpr std::size_t removedAtOnce = 1024;

/// Free pages that are kept for new events.
constexpr std::int64_t mostFreePages = 1024;
constexpr int pagesAtOnce = 64;

/// Sets up the writer's connection. Page size and vacuum mode apply to a file created here: pages
/// large enough for many events, and free pages that can be returned.
Database& prepare(Database& database) {
    if (database.number("PRAGMA page_count") == 0) { // otherwise they would be written anyway
        database.run("PRAGMA page_size = 16384");
        database.run("PRAGMA auto_vacuum = INCREMENTAL");
    }
    database.run("PRAGMA journal_mode = WAL");
    // A commit survives a crash of the process; a power failure may lose the last ones.
    database.run("PRAGMA synchronous = NORMAL");
    database.run("PRAGMA journal_size_limit = 67108864");
    database.run("PRAGMA cache_size = -8192");
    Schema::bringUpToDate(database);
    return database;
}

/// An event cannot be older than the one before it, nor be raised in the future: if the clock was
/// wrong, the neighbours bound the time. Returns the latest time at which the oldest event can have
/// been raised; none when all times seem wrong.
std::optional<std::int64_t> timeOfOldest(const std::vector<EventTable::Moment>& oldest,
                                         EventTable& events, std::int64_t now) {
    for (const EventTable::Moment& event : oldest) {
        if (event.raised <= now) {
            return event.raised;
        }
    }
    return oldest.empty() ? std::nullopt : events.firstMomentFrom(oldest.back().id + 1, now);
}

} // namespace

HistoryFile::HistoryFile(const std::string& path)
    : m_database(path, Database::Use::WRITE), m_labels(prepare(m_database)), m_events(m_database),
      m_cursors(m_database), m_positions(m_database), m_episodes(m_database),
      m_expected(m_database), m_rates(m_database), m_rhythms(m_database), m_silences(m_database),
      m_files(path), m_oldest(m_events.oldest()),
      m_newest(std::max(m_events.newest(), static_cast<std::uint64_t>(m_database.number(
                                               "SELECT max(event) FROM origin")))) {
    m_labels.removeUnused();
    m_database.number("SELECT count(*) FROM cursors"); // detects a corrupt table now
}

template <class Work> void HistoryFile::inTransaction(Work&& work) {
    try {
        Transaction transaction(m_database);
        work();
        transaction.commit();
    } catch (const DatabaseError&) {
        m_labels.forget();
        throw;
    }
}

void HistoryFile::continueAfter(std::uint64_t id) {
    inTransaction([&] {
        Statement(m_database, "DELETE FROM origin").run();
        Statement(m_database, "INSERT INTO origin (event) VALUES (?)").bind(1, id).run();
    });
    m_newest = std::max(m_newest, id);
}

void HistoryFile::putEvents(const EventBatch& batch) {
    std::map<std::pair<std::int64_t, std::int64_t>, std::uint64_t> counts; // by minute and log
    m_labelIds.clear();
    for (const EventRecord& event : batch.records()) {
        const LabelTable::Label label = m_labels.of(event);
        m_labelIds.push_back(label.id);
        ++counts[{event.raised / millisecondsPerMinute, label.log}];
    }
    m_events.append(batch.records(), m_labelIds);
    for (const auto& [key, count] : counts) {
        m_rates.add(key.first, key.second, 0, count);
    }
    for (const SilencedEvents& silenced : batch.silenced()) {
        m_silences.count(silenced);
    }
}

void HistoryFile::store(const EventBatch& batch, const std::vector<CursorValue>& cursors,
                        const std::vector<PositionValue>& positions,
                        const std::vector<EpisodeChange>& episodes) {
    inTransaction([&] {
        putEvents(batch);
        for (const EpisodeChange& change : episodes) {
            m_episodes.keep(change);
        }
        putCursors(cursors);
        putPositions(positions);
    });
    m_newest = batch.last();
    if (m_oldest == 0) {
        m_oldest = batch.first();
    }
}

void HistoryFile::putCursors(const std::vector<CursorValue>& cursors) {
    for (const CursorValue& cursor : cursors) {
        m_cursors.keep(cursor.sink, cursor.event, WallClock::now());
    }
}

void HistoryFile::keepCursors(const std::vector<CursorValue>& cursors) {
    inTransaction([&] { putCursors(cursors); });
}

void HistoryFile::removeOldCursors(int days) {
    m_cursors.removeUnusedSince(WallClock::now() - days * millisecondsPerDay);
}

void HistoryFile::putPositions(const std::vector<PositionValue>& positions) {
    for (const PositionValue& position : positions) {
        m_positions.keep(position, WallClock::now());
        for (const EpisodeShare& share : position.shares) {
            m_episodes.keep(share);
        }
    }
}

void HistoryFile::keepPositions(const PositionValues& positions) {
    inTransaction([&] {
        putPositions(positions.logs);
        for (const WatchedPath& path : positions.paths) {
            m_positions.keep(path);
        }
        for (const EpisodeShare& share : positions.shares) {
            m_episodes.keep(share);
        }
    });
}

AcknowledgementChange HistoryFile::acknowledge(std::uint64_t episode, const Acknowledgement& by) {
    auto change = AcknowledgementChange::UNKNOWN;
    inTransaction([&] { change = m_episodes.acknowledge(episode, by); });
    return change;
}

AcknowledgementChange HistoryFile::withdraw(std::uint64_t episode) {
    auto change = AcknowledgementChange::UNKNOWN;
    inTransaction([&] { change = m_episodes.withdraw(episode); });
    return change;
}

std::vector<std::string> HistoryFile::removeOldPositions(std::int64_t time) {
    std::vector<std::string> logs;
    inTransaction([&] { logs = m_positions.removeNotedBefore(time); });
    return logs;
}

void HistoryFile::keepExpected(const ExpectedValues& values) {
    inTransaction([&] { m_expected.keep(values); });
}

void HistoryFile::keepSilences(const std::vector<Silence>& silences) {
    inTransaction([&] {
        for (const Silence& silence : silences) {
            m_silences.keep(silence);
        }
    });
}

std::uint64_t HistoryFile::silenceOf(std::uint64_t event) {
    Statement label(m_database, "SELECT silence FROM events JOIN labels ON labels.id = label"
                                " WHERE events.id = ?");
    return label.bind(1, event).step() ? static_cast<std::uint64_t>(label.integer(0)) : 0;
}

void HistoryFile::removeSilences(const std::vector<std::uint64_t>& ids) {
    inTransaction([&] { m_silences.remove(ids); });
}

void HistoryFile::addEntries(const std::vector<MinuteCounts>& minutes) {
    inTransaction([&] {
        for (const MinuteCounts& counts : minutes) {
            for (const auto& [log, entries] : counts.entries) {
                m_rates.add(counts.minute, m_labels.log(log), entries, 0);
            }
            for (const LogSilence& silence : counts.silences) {
                m_rhythms.keep(m_labels.log(silence.log), silence.hour);
            }
            m_rates.watched(counts.minute);
        }
    });
}

std::uint64_t HistoryFile::lastExpired(const Limits& limits) {
    const std::vector<EventTable::Moment> oldest = m_events.oldestMoments(removedAtOnce);
    std::optional<std::int64_t> time = timeOfOldest(oldest, m_events, limits.now);
    std::uint64_t last = 0;
    for (const EventTable::Moment& event : oldest) {
        if (event.raised <= limits.now) {
            time = std::max(event.raised, time.value_or(event.raised));
        }
        const bool tooMany = m_newest - event.id >= limits.events;
        const bool tooOld = time && *time < limits.time;
        if ((!tooMany && !tooOld) || event.id == m_newest) {
            break;
        }
        last = event.id;
    }
    return last;
}

bool HistoryFile::expire(const Limits& limits) {
    const std::uint64_t last = m_oldest == 0 ? 0 : lastExpired(limits);
    if (last == 0) {
        return false;
    }
    inTransaction([&] {
        m_events.removeUntil(last);
        m_episodes.removeUntil(last);
    });
    m_oldest = last + 1;
    return true;
}

void HistoryFile::emptyLog() {
    m_database.number("PRAGMA wal_checkpoint(TRUNCATE)");
}

bool HistoryFile::shrink() {
    const std::int64_t free = m_database.number("PRAGMA freelist_count");
    if (free <= mostFreePages || free < m_database.number("PRAGMA page_count") / 4) {
        return false;
    }
    Statement vacuum(m_database, "PRAGMA incremental_vacuum(" + std::to_string(pagesAtOnce) + ')');
    while (vacuum.step()) {
    }
    return true;
}

} // namespace zrm::host
