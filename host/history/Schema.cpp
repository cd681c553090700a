#include "host/history/Schema.h"

#include <array>
#include <cstddef>
#include <string>

namespace zrm::host {

namespace {

/// Each entry upgrades the previous version to the version of its position in the table. Published
/// entries never change; a new version is a new entry.
constexpr std::array<const char*, 14> steps = {
    // 1: events. Labels intern what many events share; one narrow index serves all filters on them,
    // and the marks narrow a time window, so that storing an event costs one row and one index
    // entry.
    "CREATE TABLE logs (id INTEGER PRIMARY KEY, path TEXT NOT NULL UNIQUE);"
    "CREATE TABLE labels (id INTEGER PRIMARY KEY, situation TEXT NOT NULL,"
    " severity TEXT NOT NULL, log INTEGER NOT NULL REFERENCES logs,"
    " UNIQUE (situation, severity, log));"
    "CREATE TABLE events (id INTEGER PRIMARY KEY, raised INTEGER NOT NULL,"
    " label INTEGER NOT NULL REFERENCES labels, json TEXT NOT NULL);"
    "CREATE INDEX events_by_label ON events (label);"
    "CREATE TABLE marks (part INTEGER PRIMARY KEY, earliest INTEGER NOT NULL,"
    " latest INTEGER NOT NULL);"
    // The event ids of an empty history follow the origin, if there is one.
    "CREATE TABLE origin (event INTEGER NOT NULL);"
    "CREATE TABLE cursors (sink TEXT PRIMARY KEY, event INTEGER NOT NULL,"
    " used INTEGER NOT NULL) WITHOUT ROWID;",
    // 2: entries and events per minute and log. A minute without a row in `minutes` was not
    // watched; a watched one without a count had no entries.
    "CREATE TABLE minutes (minute INTEGER PRIMARY KEY);"
    "CREATE TABLE rates (minute INTEGER NOT NULL, log INTEGER NOT NULL REFERENCES logs,"
    " entries INTEGER NOT NULL, events INTEGER NOT NULL, PRIMARY KEY (minute, log))"
    " WITHOUT ROWID;",
    // 3: labels also have the situation's text.
    "CREATE TABLE labels_with_text (id INTEGER PRIMARY KEY, situation TEXT NOT NULL,"
    " severity TEXT NOT NULL, log INTEGER NOT NULL REFERENCES logs, text TEXT NOT NULL,"
    " UNIQUE (situation, severity, log, text));"
    "INSERT INTO labels_with_text SELECT id, situation, severity, log, '' FROM labels;"
    "DROP TABLE labels;"
    "ALTER TABLE labels_with_text RENAME TO labels;",
    // 4: events have a checksum (EventChecksum.h); those stored before have none.
    "ALTER TABLE events ADD COLUMN checksum INTEGER;",
    // 5: where the next entry of each followed log begins.
    "CREATE TABLE log_positions (log TEXT PRIMARY KEY, device INTEGER NOT NULL,"
    " inode INTEGER NOT NULL, offset INTEGER NOT NULL, guard INTEGER NOT NULL,"
    " guard_length INTEGER NOT NULL, noted INTEGER NOT NULL) WITHOUT ROWID;",
    // 6: when the file of a position was modified, and when the files of each path or glob of the
    // configuration all had positions last (milliseconds since 1970).
    "ALTER TABLE log_positions ADD COLUMN modified INTEGER NOT NULL DEFAULT 0;"
    "CREATE TABLE watched_paths (path TEXT PRIMARY KEY, watched INTEGER NOT NULL) WITHOUT ROWID;",
    // 7: the position of a log that is not a file is a text of its source.
    "ALTER TABLE log_positions ADD COLUMN cursor TEXT NOT NULL DEFAULT '';",
    // 8: the older files of a log to which late lines may come, and where these begin (JSON).
    "ALTER TABLE log_positions ADD COLUMN late TEXT NOT NULL DEFAULT '';",
    // 9: silences, and labels with the id of the silence that holds their events back (0: none).
    // An id is not given again.
    "CREATE TABLE silences (id INTEGER PRIMARY KEY AUTOINCREMENT, match TEXT NOT NULL,"
    " created INTEGER NOT NULL, until INTEGER NOT NULL, who TEXT NOT NULL, why TEXT NOT NULL,"
    " expired INTEGER, expired_by TEXT NOT NULL, events INTEGER NOT NULL, last INTEGER NOT NULL);"
    "CREATE TABLE labels_with_silence (id INTEGER PRIMARY KEY, situation TEXT NOT NULL,"
    " severity TEXT NOT NULL, log INTEGER NOT NULL REFERENCES logs, text TEXT NOT NULL,"
    " silence INTEGER NOT NULL, UNIQUE (situation, severity, log, text, silence));"
    "INSERT INTO labels_with_silence SELECT id, situation, severity, log, text, 0 FROM labels;"
    "DROP TABLE labels;"
    "ALTER TABLE labels_with_silence RENAME TO labels;",
    // 10: episodes, whose id is that of the event that raised them, and what each log has added to
    // one, in seconds since 1970. The state is open, resolved, or pause: no episode, but a group
    // that cools down. An open one is counted in episode_logs.
    "CREATE TABLE episodes (id INTEGER PRIMARY KEY, state TEXT NOT NULL, situation TEXT NOT NULL,"
    " severity TEXT NOT NULL, definition INTEGER NOT NULL, log TEXT NOT NULL, node TEXT NOT NULL,"
    " groups TEXT NOT NULL, raised INTEGER NOT NULL, count INTEGER NOT NULL,"
    " first INTEGER NOT NULL, last INTEGER NOT NULL, resolved INTEGER, resolved_by INTEGER,"
    " reason TEXT NOT NULL DEFAULT '');"
    "CREATE INDEX episodes_that_last ON episodes (situation, groups) WHERE state <> 'resolved';"
    "CREATE TABLE episode_logs (episode INTEGER NOT NULL, log TEXT NOT NULL,"
    " count INTEGER NOT NULL, first INTEGER NOT NULL, last INTEGER NOT NULL,"
    " PRIMARY KEY (episode, log)) WITHOUT ROWID;",
    // 11: the longest silence of each log that touched an hour (since 1970, of local time),
    // seconds.
    "CREATE TABLE rhythms (log INTEGER NOT NULL REFERENCES logs, hour INTEGER NOT NULL,"
    " silence INTEGER NOT NULL, PRIMARY KEY (log, hour)) WITHOUT ROWID;",
    // 12: who has acknowledged an episode, and when (milliseconds since 1970; null: nobody).
    "ALTER TABLE episodes ADD COLUMN acknowledged INTEGER;"
    "ALTER TABLE episodes ADD COLUMN acknowledged_by TEXT NOT NULL DEFAULT '';"
    "ALTER TABLE episodes ADD COLUMN note TEXT NOT NULL DEFAULT '';",
    // 13: what the text of an episode's end says of the entry that raised it.
    "ALTER TABLE episodes ADD COLUMN text_values TEXT NOT NULL DEFAULT '{}';",
    // 14: the groups from which situations expect entries, when each had its last one, by the
    // watched time (milliseconds in which an agent ran) and by the clock (seconds since 1970), and
    // the watched time.
    "CREATE TABLE expected_groups (situation TEXT NOT NULL, key BLOB NOT NULL,"
    " definition INTEGER NOT NULL, seen INTEGER NOT NULL, since INTEGER NOT NULL,"
    " log TEXT NOT NULL, node TEXT NOT NULL, PRIMARY KEY (situation, key)) WITHOUT ROWID;"
    "CREATE TABLE watched_time (id INTEGER PRIMARY KEY, milliseconds INTEGER NOT NULL);",
};

} // namespace

const int Schema::version = static_cast<int>(steps.size());

void Schema::bringUpToDate(Database& database) {
    const std::int64_t found = database.number("PRAGMA user_version");
    if (found < 0 || found > version) {
        throw SchemaTooNew("it has version " + std::to_string(found) +
                           ", and this program knows versions up to " + std::to_string(version));
    }
    for (auto next = static_cast<std::size_t>(found); next < steps.size(); ++next) {
        Transaction transaction(database);
        database.run(steps[next]);
        database.run("PRAGMA user_version = " + std::to_string(next + 1));
        transaction.commit();
    }
}

} // namespace zrm::host
