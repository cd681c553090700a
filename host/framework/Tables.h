#ifndef ZRM_HOST_TABLES_H
#define ZRM_HOST_TABLES_H

#include <string_view>

class TableManager;

namespace zrm::host {

/// The tables that the agent has registered. Any thread; neither locks nor allocates.
namespace Tables {

/// Registers a table (TableManager::RegisterWithManager); returns 0 or a status.
unsigned add(TableManager* manager) noexcept;

/// Removes a table; does nothing when it is not registered.
void remove(const TableManager* manager) noexcept;

/// The manager of the table with this name ("RMLOGENT", "RMMONLOG"), or null.
TableManager* find(std::string_view table) noexcept;

/// Removes all tables, for an orderly shutdown.
void clear() noexcept;

} // namespace Tables

} // namespace zrm::host

#endif
