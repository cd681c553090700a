#ifndef ZRM_TABLE_REQUEST_H
#define ZRM_TABLE_REQUEST_H

#include "framework/ctreq.h"
#include "framework/trace.h"
#include "tables/TableDescription.h"

namespace zrm {

/// What the row holders of both tables share: everything that follows from the description of the
/// table's columns. Adds no virtual operation, so that a row holder's AddData takes the slot right
/// behind those of ctreq. Owned by the framework; used by one thread at a time, under the table
/// manager's lock where rows arrive as events.
class TableRequest : public ctreq {
public:
    /// Dumps the request and the rows that it holds, when the detail class is on.
    void PrintSelf() override;
    int NumColumns() override;
    /// See TableDescription::describe.
    unsigned GetColumnInfo(ColumnInfo* info, int index) override;
    /// 0 also for a column that the table does not have.
    unsigned ColumnIsException(char* row, char* column, _IntfOper op, char* value) override;

protected:
    /// `table` outlives the object.
    TableRequest(RequestDetail* detail, ContextInfo* context, TableManager* manager,
                 const TableDescription& table);

    /// Passes each of `count` rows, back to back, that meets the request's conditions to
    /// InsertRow, up to the first non-zero status, which it returns; otherwise 0.
    unsigned addRows(char* rows, int count);

    /// True when it shows in this file's trace, or in that of a derived class with `anchor`, that
    /// rows are offered.
    static bool isTraced();
    static bool tracesRows(TRC1_Anchor& anchor);

private:
    const TableDescription& m_table;
};

} // namespace zrm

#endif
