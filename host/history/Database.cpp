#include "host/history/Database.h"

#include "base/ErrorText.h"
#include "host/history/Statement.h"

#include <sqlite3.h>

namespace zrm::host {

namespace {

/// For other programs that have the file open; the agent's own connections never keep each other
/// waiting.
constexpr int busyLimit = 2000; ///< milliseconds

std::string describe(sqlite3* connection, int code) {
    std::string text = connection == nullptr ? sqlite3_errstr(code) : sqlite3_errmsg(connection);
    if (const int number = connection == nullptr ? 0 : sqlite3_system_errno(connection);
        number != 0) {
        const ErrorText error(number);
        text += std::string(" (") + error.text() + ')';
    }
    return text;
}

} // namespace

DatabaseError::DatabaseError(sqlite3* connection, int code)
    : std::runtime_error(describe(connection, code)), m_code(code & 0xff) {}

bool DatabaseError::isCorruption() const noexcept {
    return m_code == SQLITE_CORRUPT || m_code == SQLITE_NOTADB;
}

Database::Database(const std::string& path, Use use) {
    // Readers, too, take part in the write-ahead log's index, which is a file that they write.
    const int flags =
        SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX | (use == Use::WRITE ? SQLITE_OPEN_CREATE : 0);
    const int code = sqlite3_open_v2(path.c_str(), &m_connection, flags, nullptr);
    try {
        if (code != SQLITE_OK) {
            throw DatabaseError(m_connection, code);
        }
        sqlite3_busy_timeout(m_connection, busyLimit);
        if (use == Use::READ) {
            run("PRAGMA query_only = 1");
        }
    } catch (const DatabaseError&) {
        sqlite3_close(m_connection);
        throw;
    }
}

Database::~Database() {
    sqlite3_close(m_connection);
}

void Database::run(const std::string& sql) {
    if (const int code = sqlite3_exec(m_connection, sql.c_str(), nullptr, nullptr, nullptr);
        code != SQLITE_OK) {
        throw DatabaseError(m_connection, code);
    }
}

std::int64_t Database::number(const std::string& sql) {
    Statement statement(*this, sql);
    return statement.step() ? statement.integer(0) : 0;
}

Transaction::Transaction(Database& database) : m_database(database) {
    m_database.run("BEGIN");
}

Transaction::~Transaction() {
    // A failure may have ended the transaction already.
    if (m_open && sqlite3_get_autocommit(m_database.handle()) == 0) {
        sqlite3_exec(m_database.handle(), "ROLLBACK", nullptr, nullptr, nullptr);
    }
}

void Transaction::commit() {
    m_database.run("COMMIT");
    m_open = false;
}

} // namespace zrm::host
