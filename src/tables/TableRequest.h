#ifndef ZRM_TABLE_REQUEST_H
#define ZRM_TABLE_REQUEST_H

#include "framework/ctreq.h"
#include "framework/trace.h"
#include "tables/TableDescription.h"

namespace zrm {

/// The common part of both tables' row holders: everything that follows from the table's columns.
/// Adds no virtual function, so a row holder's AddData takes the slot directly after those of
/// ctreq. Owned by the framework. Used by one thread at a time, under the table manager's lock if
/// rows arrive as events.
class TableRequest : public ctreq {
public:
    /// Dumps the request and its rows if the detail class is on.
    void PrintSelf() override;
    int NumColumns() override;
    /// See TableDescription::describe.
    unsigned GetColumnInfo(ColumnInfo* info, int index) override;
    /// Also returns 0 for a column that the table does not have.
    unsigned ColumnIsException(char* row, char* column, _IntfOper op, char* value) override;

protected:
    /// `table` must outlive the object.
    TableRequest(RequestDetail* detail, ContextInfo* context, TableManager* manager,
                 const TableDescription& table);

    /// Passes each of `count` contiguous rows that meets the request's conditions to InsertRow.
    /// Stops at the first non-zero status and returns it; otherwise returns 0.
    unsigned addRows(char* rows, int count);

    /// True if this file's trace, or the trace of a derived class with `anchor`, shows that rows
    /// are offered.
    static bool isTraced();
    static bool tracesRows(TRC1_Anchor& anchor);

private:
    const TableDescription& m_table;
};

} // namespace zrm

#endif
