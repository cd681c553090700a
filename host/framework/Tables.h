#ifndef ZRM_HOST_TABLES_H
#define ZRM_HOST_TABLES_H

#include <string_view>

class TableManager;

namespace zrm::host {

/// The tables that the agent has registered. Any thread; neither locks nor allocates.
namespace Tables {

/// Makes a table known (TableManager::RegisterWithManager); returns 0 or a status.
unsigned add(TableManager* manager) noexcept;

/// Forgets a table; nothing happens when it is not known.
void remove(const TableManager* manager) noexcept;

/// The manager of this table ("RMLOGENT", "RMMONLOG"), or null.
TableManager* find(std::string_view table) noexcept;

/// Forgets every table; for an orderly end.
void clear() noexcept;

} // namespace Tables

} // namespace zrm::host

#endif
