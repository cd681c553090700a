#ifndef ZRM_HOST_STATEMENT_H
#define ZRM_HOST_STATEMENT_H

#include "host/history/Database.h"

#include <cstdint>
#include <string>
#include <string_view>

struct sqlite3_stmt;

namespace zrm::host {

/// A prepared statement. Used by its connection's thread; the connection must outlive it.
/// Parameters and columns are numbered as in SQLite: parameters from 1, columns from 0. Every
/// failure throws DatabaseError.
class Statement {
public:
    Statement(Database& database, const std::string& sql);
    ~Statement();
    Statement(const Statement&) = delete;
    Statement& operator=(const Statement&) = delete;
    Statement(Statement&& other) noexcept;
    Statement& operator=(Statement&&) = delete;

    Statement& bind(int parameter, std::int64_t value);
    Statement& bind(int parameter, std::uint64_t value);
    /// The text must stay unchanged until the statement is reset.
    Statement& bind(int parameter, std::string_view text);

    /// Moves to the next row; false when there is none.
    bool step();

    /// Runs a statement that returns no rows, and resets it.
    void run();

    /// Ends the current execution; the parameters keep their values.
    void reset() noexcept;

    std::int64_t integer(int column) const noexcept;
    /// A view valid until the next step or reset.
    std::string_view text(int column) const noexcept;
    bool isNull(int column) const noexcept;

private:
    [[noreturn]] void fail(int code);

    Database* m_database;
    sqlite3_stmt* m_statement = nullptr;
};

} // namespace zrm::host

#endif
