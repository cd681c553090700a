#ifndef ZRM_COLUMNS_ROW_H
#define ZRM_COLUMNS_ROW_H

#include "logs/EntryFormat.h"

namespace zrm {

class EntryRow;
class EntryStamp;

/// Makes rows of what formats and sources read from entries.
namespace ColumnsRow {

/// Fills a row, whose own columns are blank: texts are cut to the columns' widths, and line ends in
/// them become blanks. `newest` as in EntryReader; null: the entry is read as it comes, and one
/// without a time has the present. False if ENTRYTIME cannot show the time; then the row is
/// rejected.
bool fill(EntryRow& row, const EntryColumns& entry, EntryStamp& stamp, const char* newest);

} // namespace ColumnsRow

} // namespace zrm

#endif
