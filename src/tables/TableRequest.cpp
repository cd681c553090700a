#include "tables/TableRequest.h"

#include "base/TraceScope.h"
#include "framework/TableManager.h"

#include <cstring>

namespace zrm {

namespace {

TRC1_Anchor anchor{"TableRequest.cpp"};

std::int32_t integerAt(const char* row, const TableColumn& column) {
    std::int32_t value;
    std::memcpy(&value, row + column.offset, sizeof value);
    return value;
}

void printColumn(const TraceScope& trace, const TableColumn& column, const char* row) {
    if (column.type == COLUMN_INTEGER) {
        trace.detail()("\t\t%s=%d\n", column.internalName, integerAt(row, column));
    } else {
        trace.detail()("\t\t%s=\"%.*s\"\n", column.internalName, static_cast<int>(column.width),
                       row + column.offset);
    }
}

} // namespace

TableRequest::TableRequest(RequestDetail* detail, ContextInfo* context, TableManager* manager,
                           const TableDescription& table)
    : ctreq(detail, context, manager), m_table(table) {
    rowSize = table.rowSize;
    allocSize = table.allocSize;
}

void TableRequest::PrintSelf() {
    const TraceScope trace(anchor);
    if (!trace.isOn(TRC1_DETAIL)) {
        return;
    }
    trace.detail()("%s @%p <%u,%u>\n", m_table.className, static_cast<void*>(this), identifier(),
                   handle());
    trace.detail()("\t::appl=%s,table=%s,interval=%d,samptype=%d\n", manager()->application(),
                   manager()->table(), static_cast<int>(interval() * 1000),
                   static_cast<int>(sampleType()));
    DumpThresholds();
    trace.detail()("\t_data {\n");
    trace.detail()("\t\tcount=%d, allocated=%d, allocSize=%d\n", static_cast<int>(count),
                   static_cast<int>(allocated), static_cast<int>(allocSize));
    for (unsigned i = 0; i < count; ++i) {
        trace.detail()("\t\t{\n");
        for (const TableColumn& column : m_table.columns) {
            // A dispatch on a log's thread may empty the array during the dump.
            if (i < count) {
                printColumn(trace, column, rows() + std::size_t{i} * rowSize);
            }
        }
        trace.detail()("\t\t}\n");
    }
}

int TableRequest::NumColumns() {
    TraceScope trace(anchor);
    return trace.result(m_table.numColumns());
}

unsigned TableRequest::GetColumnInfo(ColumnInfo* info, int index) {
    TraceScope trace(anchor);
    return trace.result(m_table.describe(info, index));
}

unsigned TableRequest::ColumnIsException(char* row, char* columnName, _IntfOper op, char* value) {
    TraceScope trace(anchor);
    const TableColumn* const column = m_table.find(columnName);
    if (column == nullptr) {
        return trace.result(0U);
    }
    const int holds =
        column->type == COLUMN_INTEGER
            ? IsException(op, integerAt(row, *column), value)
            : IsException(op, row + column->offset, value, static_cast<int>(column->width));
    return trace.result(static_cast<unsigned>(holds));
}

bool TableRequest::isTraced() {
    return tracesRows(anchor);
}

bool TableRequest::tracesRows(TRC1_Anchor& anchorOfFile) {
    const TraceScope trace(anchorOfFile);
    return trace.isOn(TRC1_FLOW) || trace.isOn(TRC1_FINE);
}

unsigned TableRequest::addRows(char* rows, int count) {
    TraceScope trace(anchor);
    unsigned status = 0;
    char* row = rows;
    for (int i = 0; i < count && status == 0; ++i, row += rowSize) {
        if (CheckForException(row) != 0) {
            trace.fine()("Passing row %d to InsertRow().", i);
            status = InsertRow(row);
        }
    }
    return trace.result(status);
}

} // namespace zrm
