#include "host/events/RowJson.h"

#include "host/events/RowText.h"

#include <string>

namespace zrm::host {

RowJson::RowJson(const RowLayout& layout) {
    for (const RowColumn& column : layout.columns()) {
        m_columns.push_back({JsonKey(column.name), column});
    }
}

void RowJson::write(JsonWriter& json, const char* row) const {
    json.beginObject();
    writeMembers(json, row);
    json.endObject();
}

void RowJson::writeMembers(JsonWriter& json, const char* row) const {
    std::string room;
    for (const auto& [key, column] : m_columns) {
        json.key(key);
        if (column.isInteger()) {
            json.value(column.integer(row));
        } else {
            json.value(RowText::of(column, row, room));
        }
    }
}

} // namespace zrm::host
