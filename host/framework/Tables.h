#ifndef ZRM_HOST_TABLES_H
#define ZRM_HOST_TABLES_H

#include <string_view>

class TableManager;

/// The tables that the agent has registered. Written by TableManager::RegisterWithManager while the
/// agent's loader runs, read-only afterwards.
namespace Tables {

/// The manager of this table ("RMLOGENT", "RMMONLOG"), or null.
TableManager* find(std::string_view table) noexcept;

/// Forgets every table; for an orderly end.
void clear() noexcept;

} // namespace Tables

#endif
