#ifndef ZRM_HOST_ENTRY_COLUMN_H
#define ZRM_HOST_ENTRY_COLUMN_H

#include "host/base/Result.h"
#include "logs/EntryFormat.h"

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// The columns that a format fills, as configurations name them.
enum class EntryColumn : unsigned char { time, system, source, type, entryClass, description };

inline constexpr std::string_view entryColumnNames[] = {"time", "system", "source",
                                                        "type", "class",  "description"};
/// None if no column has this name.
inline std::optional<EntryColumn> entryColumnOf(std::string_view name) noexcept {
    for (std::size_t i = 0; i < std::size(entryColumnNames); ++i) {
        if (entryColumnNames[i] == name) {
            return static_cast<EntryColumn>(i);
        }
    }
    return std::nullopt;
}

/// A column that a description names. `key` is the key under which it does, for the problem.
inline Result<EntryColumn> columnNamed(const std::string& name, const std::string& key) {
    if (const std::optional<EntryColumn> column = entryColumnOf(name)) {
        return *column;
    }
    return refused("'" + name + "' is not a column",
                   "the columns are time, system, source, type, class and description",
                   key + "." + name);
}

/// The text of a column; null for the time, which is not a text.
inline std::string_view* textOf(EntryColumns& columns, EntryColumn column) noexcept {
    switch (column) {
    case EntryColumn::system:
        return &columns.system;
    case EntryColumn::source:
        return &columns.source;
    case EntryColumn::type:
        return &columns.type;
    case EntryColumn::entryClass:
        return &columns.entryClass;
    case EntryColumn::description:
        return &columns.description;
    case EntryColumn::time:
        break;
    }
    return nullptr;
}

} // namespace zrm::host

#endif
