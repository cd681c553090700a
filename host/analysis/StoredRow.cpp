#include "host/analysis/StoredRow.h"

#include "host/events/RowText.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <string>

#include <nlohmann/json.hpp>

namespace zrm::host {

bool StoredRow::fill(zrm_rmlogent_data_t& row, const RowLayout& layout, std::string_view event) {
    constexpr bool throwsErrors = false;
    const auto document = nlohmann::json::parse(event, nullptr, throwsErrors);
    if (!document.is_object() || !document.contains("row") || !document["row"].is_object()) {
        return false;
    }
    const auto& columns = document["row"];
    char* const bytes = reinterpret_cast<char*>(&row);
    std::memset(bytes, 0, sizeof row);
    for (const RowColumn& column : layout.columns()) {
        const auto found = columns.find(column.name);
        char* const field = bytes + column.offset;
        if (column.isInteger()) {
            const std::int32_t number = found != columns.end() && found->is_number_integer()
                                            ? found->get<std::int32_t>()
                                            : 0;
            std::memcpy(field, &number, sizeof number);
        } else {
            std::memset(field, ' ', column.width);
            if (found != columns.end() && found->is_string()) {
                const auto& text = found->get_ref<const std::string&>();
                text.copy(field, column.width);
            }
        }
    }
    return true;
}

std::optional<std::string> StoredRow::entryText(std::string_view event) {
    const auto document = nlohmann::json::parse(event, nullptr, false);
    const auto entry = document.is_object() ? document.find("entry") : document.end();
    return entry != document.end() && entry->is_string() ? std::optional(entry->get<std::string>())
                                                         : std::nullopt;
}

KeptEntry::Fields StoredRow::entryFields(std::string_view event) {
    KeptEntry::Fields fields;
    const auto document = nlohmann::json::parse(event, nullptr, false);
    const auto found = document.is_object() ? document.find("fields") : document.end();
    if (found == document.end() || !found->is_object()) {
        return fields;
    }
    for (const auto& [name, value] : found->items()) {
        if (value.is_string()) {
            fields.emplace_back(name, value.get<std::string>());
        }
    }
    return fields;
}

bool StoredRow::isSameEntry(const RowLayout& layout, const zrm_rmlogent_data_t& left,
                            const zrm_rmlogent_data_t& right) {
    const auto* const leftBytes = reinterpret_cast<const char*>(&left);
    const auto* const rightBytes = reinterpret_cast<const char*>(&right);
    return std::all_of(layout.columns().begin(), layout.columns().end(),
                       [&](const RowColumn& column) {
                           if (column.isInteger() || column.name == "TIMESTAMP") {
                               return true; // not part of the entry
                           }
                           // As in the event's JSON.
                           std::string leftRoom;
                           std::string rightRoom;
                           return RowText::of(column, leftBytes, leftRoom) ==
                                  RowText::of(column, rightBytes, rightRoom);
                       });
}

} // namespace zrm::host
