#ifndef ZRM_HOST_DATABASE_H
#define ZRM_HOST_DATABASE_H

#include <cstdint>
#include <stdexcept>
#include <string>

struct sqlite3;

namespace zrm::host {

/// A failed database call; what() is its message with that of the system error.
class DatabaseError : public std::runtime_error {
public:
    /// For the last call on this connection, which returned `code`. The connection may be null.
    DatabaseError(sqlite3* connection, int code);

    /// Whether the file's content is not, or no longer, a database.
    bool isCorruption() const noexcept;

private:
    int m_code;
};

/// One connection to a SQLite file. Used by one thread at a time. Every failure throws
/// DatabaseError.
class Database {
public:
    enum class Use {
        WRITE, ///< creates the file if it is missing
        READ,  ///< changes nothing
    };

    Database(const std::string& path, Use use);
    ~Database();
    Database(const Database&) = delete;
    Database& operator=(const Database&) = delete;

    /// Runs statements that return no rows.
    void run(const std::string& sql);

    /// The first column of the first row; 0 when there is none.
    std::int64_t number(const std::string& sql);

    sqlite3* handle() noexcept { return m_connection; }

private:
    sqlite3* m_connection = nullptr;
};

/// A transaction; rolled back unless committed. Nothing is locked before the first write.
class Transaction {
public:
    explicit Transaction(Database& database);
    ~Transaction();
    Transaction(const Transaction&) = delete;
    Transaction& operator=(const Transaction&) = delete;

    void commit();

private:
    Database& m_database;
    bool m_open = true;
};

} // namespace zrm::host

#endif
