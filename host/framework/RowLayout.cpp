#include "host/framework/RowLayout.h"

#include "framework/ctreq.h"
#include "host/framework/ColumnText.h"

#include <algorithm>
#include <cstring>

namespace zrm::host {

namespace {

/// The tables return internal names, which are the public ones in lower case.
std::string upperCase(std::string_view name) {
    std::string result(name);
    std::transform(result.begin(), result.end(), result.begin(), [](char c) {
        return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c;
    });
    return result;
}

} // namespace

std::int32_t RowColumn::integer(const char* row) const noexcept {
    std::int32_t value;
    std::memcpy(&value, row + offset, sizeof value);
    return value;
}

std::string_view RowColumn::text(const char* row) const noexcept {
    return ColumnText::unpadded(row + offset, width);
}

RowLayout::RowLayout(ctreq& request) {
    const int count = request.NumColumns();
    for (int index = 0; index < count; ++index) {
        ColumnInfo info{};
        if (request.GetColumnInfo(&info, index) == 0) {
            m_columns.push_back({upperCase(info.name), static_cast<std::size_t>(info.offset),
                                 static_cast<std::size_t>(info.length),
                                 static_cast<ColumnType>(info.type)});
        }
    }
}

const RowColumn* RowLayout::find(std::string_view name) const noexcept {
    const auto found =
        std::find_if(m_columns.begin(), m_columns.end(),
                     [name](const RowColumn& column) { return column.name == name; });
    return found != m_columns.end() ? &*found : nullptr;
}

} // namespace zrm::host
