#ifndef ZRM_HOST_ROW_JSON_H
#define ZRM_HOST_ROW_JSON_H

#include "host/base/JsonWriter.h"
#include "host/framework/RowLayout.h"

#include <vector>

namespace zrm::host {

/// Writes the rows of a table as JSON, fast enough for every event. Immutable, so any thread.
class RowJson {
public:
    explicit RowJson(const RowLayout& layout);

    /// Writes one row as an object: the columns under their upper-case names in table order,
    /// character columns as returned by RowText, integers as numbers.
    void write(JsonWriter& json, const char* row) const;
    /// The same without the object's begin and end, for one that has more members.
    void writeMembers(JsonWriter& json, const char* row) const;

private:
    struct Column {
        JsonKey key;
        RowColumn column;
    };
    std::vector<Column> m_columns;
};

} // namespace zrm::host

#endif
