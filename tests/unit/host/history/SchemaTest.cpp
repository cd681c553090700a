#include "host/history/Schema.h"

#include "host/history/Statement.h"
#include "support/FaultyDisk.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <string>

#include <sqlite3.h>

using namespace zrm::host;

namespace {

/// A file as the first version of the schema left it, with one event.
constexpr const char* firstVersion =
    "CREATE TABLE logs (id INTEGER PRIMARY KEY, path TEXT NOT NULL UNIQUE);"
    "CREATE TABLE labels (id INTEGER PRIMARY KEY, situation TEXT NOT NULL,"
    " severity TEXT NOT NULL, log INTEGER NOT NULL REFERENCES logs,"
    " UNIQUE (situation, severity, log));"
    "CREATE TABLE events (id INTEGER PRIMARY KEY, raised INTEGER NOT NULL,"
    " label INTEGER NOT NULL REFERENCES labels, json TEXT NOT NULL);"
    "CREATE INDEX events_by_label ON events (label);"
    "CREATE TABLE marks (part INTEGER PRIMARY KEY, earliest INTEGER NOT NULL,"
    " latest INTEGER NOT NULL);"
    "CREATE TABLE origin (event INTEGER NOT NULL);"
    "CREATE TABLE cursors (sink TEXT PRIMARY KEY, event INTEGER NOT NULL,"
    " used INTEGER NOT NULL) WITHOUT ROWID;"
    "INSERT INTO logs VALUES (1, '/var/log/app.log');"
    "INSERT INTO labels VALUES (1, 'watch', 'minor', 1);"
    "INSERT INTO events VALUES (41, 1795158189412, 1, '{}');"
    "INSERT INTO cursors VALUES ('jsonl:out', 40, 1795158189412);"
    "PRAGMA user_version = 1";

/// What the third version added to labels.
constexpr const char* labelTexts = "ALTER TABLE labels ADD COLUMN text TEXT NOT NULL DEFAULT '';";

/// A table of positions, with the columns that came after its first and with one row.
std::string positions(const std::string& laterColumns, const std::string& laterValues) {
    return "CREATE TABLE log_positions (log TEXT PRIMARY KEY, device INTEGER NOT NULL,"
           " inode INTEGER NOT NULL, offset INTEGER NOT NULL, guard INTEGER NOT NULL,"
           " guard_length INTEGER NOT NULL, noted INTEGER NOT NULL" +
           laterColumns +
           ") WITHOUT ROWID; INSERT INTO log_positions VALUES ('/log', 1, 2, 3, 4, 5, 6" +
           laterValues + ");";
}

class SchemaTest : public testing::Test {
protected:
    static bool hasTable(Database& database, const std::string& name) {
        return database.number("SELECT count(*) FROM sqlite_schema WHERE name = '" + name + "'") ==
               1;
    }
    static std::int64_t versionOf(Database& database) {
        return database.number("PRAGMA user_version");
    }

    /// Makes a file as a version since the fourth left it, and brings it up to date.
    void bringUpToDateFrom(int oldVersion, const std::string& further) {
        database.run(firstVersion);
        database.run(labelTexts + ("ALTER TABLE events ADD COLUMN checksum INTEGER;" + further) +
                     "PRAGMA user_version = " + std::to_string(oldVersion));
        Schema::bringUpToDate(database);
        EXPECT_EQ(versionOf(database), Schema::version);
    }

    FaultyDisk disk;
    TemporaryDirectory directory;
    Database database{directory.file("history.db"), Database::Use::WRITE};
};

TEST_F(SchemaTest, CreatesTheTablesOfANewFile) {
    Schema::bringUpToDate(database);
    EXPECT_EQ(versionOf(database), Schema::version);
    for (const char* const table :
         {"events", "labels", "logs", "marks", "origin", "cursors", "minutes", "rates",
          "log_positions", "watched_paths", "silences", "episodes", "episode_logs", "rhythms",
          "expected_groups", "watched_time"}) {
        EXPECT_TRUE(hasTable(database, table)) << table;
    }
    Schema::bringUpToDate(database);
    EXPECT_EQ(versionOf(database), Schema::version);
}

TEST_F(SchemaTest, UpgradesAFileOfTheFirstVersion) {
    database.run(firstVersion);
    ASSERT_FALSE(hasTable(database, "rates"));
    Schema::bringUpToDate(database);
    EXPECT_EQ(versionOf(database), Schema::version);
    EXPECT_TRUE(hasTable(database, "rates"));
    EXPECT_EQ(database.number("SELECT id FROM events"), 41);
    EXPECT_EQ(database.number("SELECT event FROM cursors"), 40);
}

TEST_F(SchemaTest, UpgradesAFileOfTheSecondVersion) {
    database.run(firstVersion);
    database.run(
        "CREATE TABLE minutes (minute INTEGER PRIMARY KEY);"
        "CREATE TABLE rates (minute INTEGER NOT NULL, log INTEGER NOT NULL REFERENCES logs,"
        " entries INTEGER NOT NULL, events INTEGER NOT NULL, PRIMARY KEY (minute, log))"
        " WITHOUT ROWID;"
        "INSERT INTO rates VALUES (29919303, 1, 5, 1);"
        "PRAGMA user_version = 2");
    Schema::bringUpToDate(database);
    EXPECT_EQ(versionOf(database), Schema::version);
    Statement event(database, "SELECT situation, severity, path, text FROM events"
                              " JOIN labels ON labels.id = label JOIN logs ON logs.id = log");
    ASSERT_TRUE(event.step());
    EXPECT_EQ(event.text(0), "watch");
    EXPECT_EQ(event.text(1), "minor");
    EXPECT_EQ(event.text(2), "/var/log/app.log");
    EXPECT_EQ(event.text(3), "");
    EXPECT_FALSE(event.isNull(3));
    EXPECT_FALSE(event.step());
    EXPECT_EQ(database.number("SELECT entries FROM rates"), 5);
    database.run("PRAGMA foreign_keys = ON");
    EXPECT_EQ(database.number("SELECT count(*) FROM pragma_foreign_key_check"), 0);
    database.run("INSERT INTO events VALUES (42, 1795158189412, 1, '{}', NULL)");
    EXPECT_THROW(database.run("INSERT INTO events VALUES (43, 1795158189412, 2, '{}', NULL)"),
                 DatabaseError)
        << "events still refer to labels";
}

TEST_F(SchemaTest, UpgradesAFileOfTheThirdVersion) {
    database.run(firstVersion);
    database.run("CREATE TABLE minutes (minute INTEGER PRIMARY KEY);"
                 "CREATE TABLE rates (minute INTEGER NOT NULL, log INTEGER NOT NULL,"
                 " entries INTEGER NOT NULL, events INTEGER NOT NULL, PRIMARY KEY (minute, log))"
                 " WITHOUT ROWID;"
                 "ALTER TABLE labels ADD COLUMN text TEXT NOT NULL DEFAULT '';"
                 "PRAGMA user_version = 3");
    Schema::bringUpToDate(database);
    EXPECT_EQ(versionOf(database), Schema::version);
    Statement event(database, "SELECT id, json, checksum FROM events");
    ASSERT_TRUE(event.step());
    EXPECT_EQ(event.integer(0), 41);
    EXPECT_EQ(event.text(1), "{}");
    EXPECT_TRUE(event.isNull(2)) << "an older event has no checksum";
}

TEST_F(SchemaTest, BringsAFileOfTheFourthVersionUpToDate) {
    bringUpToDateFrom(4, "");
    EXPECT_EQ(database.number("SELECT id FROM events"), 41);
    database.run("INSERT INTO log_positions VALUES ('/log', 1, 2, 3, 4, 5, 6, 7, 'c', '')");
    EXPECT_EQ(database.number("SELECT offset FROM log_positions"), 3);
}

TEST_F(SchemaTest, BringsAFileOfTheFifthVersionUpToDate) {
    bringUpToDateFrom(5, positions("", ""));
    EXPECT_EQ(database.number("SELECT offset FROM log_positions"), 3);
    EXPECT_EQ(database.number("SELECT modified FROM log_positions"), 0) << "unknown";
    EXPECT_EQ(database.number("SELECT count(*) FROM watched_paths"), 0);
}

TEST_F(SchemaTest, BringsAFileOfTheSixthVersionUpToDate) {
    bringUpToDateFrom(6, positions(", modified INTEGER NOT NULL DEFAULT 0", ", 7"));
    Statement position(database, "SELECT offset, cursor FROM log_positions");
    ASSERT_TRUE(position.step());
    EXPECT_EQ(position.integer(0), 3);
    EXPECT_EQ(position.text(1), "") << "it is that of a file";
}

TEST_F(SchemaTest, BringsAFileOfTheSeventhVersionUpToDate) {
    bringUpToDateFrom(7, positions(", modified INTEGER NOT NULL DEFAULT 0,"
                                   " cursor TEXT NOT NULL DEFAULT ''",
                                   ", 7, ''"));
    Statement position(database, "SELECT offset, late FROM log_positions");
    ASSERT_TRUE(position.step());
    EXPECT_EQ(position.integer(0), 3);
    EXPECT_EQ(position.text(1), "") << "no older file was watched";
}

TEST_F(SchemaTest, BringsAFileOfTheEighthVersionUpToDate) {
    bringUpToDateFrom(8, "INSERT INTO labels VALUES (2, 'other', 'minor', 1, 'a text');"
                         "INSERT INTO events VALUES (42, 1795158189412, 2, '{}', 7);");
    Statement event(database, "SELECT text, silence, checksum FROM events"
                              " JOIN labels ON labels.id = label WHERE events.id = 42");
    ASSERT_TRUE(event.step());
    EXPECT_EQ(event.text(0), "a text");
    EXPECT_EQ(event.integer(1), 0) << "nothing was silenced";
    EXPECT_EQ(event.integer(2), 7);
    EXPECT_EQ(database.number("SELECT count(*) FROM events JOIN labels ON labels.id = label"), 2);
    EXPECT_EQ(database.number("SELECT count(*) FROM silences"), 0);
}

TEST_F(SchemaTest, AFailedStepLeavesTheOlderVersionIntact) {
    database.run(firstVersion);
    disk.failWrites(SQLITE_FULL);
    EXPECT_THROW(Schema::bringUpToDate(database), DatabaseError);
    disk.failWrites(0);
    EXPECT_EQ(versionOf(database), 1);
    EXPECT_FALSE(hasTable(database, "minutes"));
    Schema::bringUpToDate(database);
    EXPECT_EQ(versionOf(database), Schema::version);
    EXPECT_EQ(database.number("SELECT id FROM events"), 41);
}

TEST_F(SchemaTest, RefusesAFileOfALaterVersion) {
    database.run("PRAGMA user_version = " + std::to_string(Schema::version + 1));
    try {
        Schema::bringUpToDate(database);
        FAIL() << "the file was accepted";
    } catch (const SchemaTooNew& error) {
        EXPECT_STREQ(error.what(),
                     ("it has version " + std::to_string(Schema::version + 1) +
                      ", and this program knows versions up to " + std::to_string(Schema::version))
                         .c_str());
    }
}

} // namespace
