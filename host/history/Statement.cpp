#include "host/history/Statement.h"

#include <utility>

#include <sqlite3.h>

namespace zrm::host {

Statement::Statement(Database& database, const std::string& sql) : m_database(&database) {
    if (const int code =
            sqlite3_prepare_v2(database.handle(), sql.c_str(), -1, &m_statement, nullptr);
        code != SQLITE_OK) {
        throw DatabaseError(database.handle(), code);
    }
}

Statement::~Statement() {
    sqlite3_finalize(m_statement);
}

Statement::Statement(Statement&& other) noexcept
    : m_database(other.m_database), m_statement(std::exchange(other.m_statement, nullptr)) {}

void Statement::fail(int code) {
    // The message is the connection's last one, and a reset would overwrite it.
    const DatabaseError error(m_database->handle(), code);
    reset();
    throw error;
}

Statement& Statement::bind(int parameter, std::int64_t value) {
    if (const int code = sqlite3_bind_int64(m_statement, parameter, value); code != SQLITE_OK) {
        fail(code);
    }
    return *this;
}

Statement& Statement::bind(int parameter, std::uint64_t value) {
    return bind(parameter, static_cast<std::int64_t>(value));
}

Statement& Statement::bind(int parameter, std::string_view text) {
    if (const int code =
            sqlite3_bind_text64(m_statement, parameter, text.data() == nullptr ? "" : text.data(),
                                text.size(), SQLITE_STATIC, SQLITE_UTF8);
        code != SQLITE_OK) {
        fail(code);
    }
    return *this;
}

bool Statement::step() {
    const int code = sqlite3_step(m_statement);
    if (code != SQLITE_ROW && code != SQLITE_DONE) {
        fail(code);
    }
    return code == SQLITE_ROW;
}

void Statement::run() {
    step();
    reset();
}

void Statement::reset() noexcept {
    sqlite3_reset(m_statement);
}

std::int64_t Statement::integer(int column) const noexcept {
    return sqlite3_column_int64(m_statement, column);
}

std::string_view Statement::text(int column) const noexcept {
    const auto* const text =
        reinterpret_cast<const char*>(sqlite3_column_text(m_statement, column));
    const auto size = static_cast<std::size_t>(sqlite3_column_bytes(m_statement, column));
    return text == nullptr ? std::string_view() : std::string_view(text, size);
}

bool Statement::isNull(int column) const noexcept {
    return sqlite3_column_type(m_statement, column) == SQLITE_NULL;
}

} // namespace zrm::host
