#include "logtypes/ColumnsRow.h"

#include "base/TraceScope.h"
#include "logtypes/EntryStamp.h"
#include "monitor/EntryRow.h"

#include <algorithm>
#include <cstring>

namespace zrm {

namespace {

TRC1_Anchor anchor{"ColumnsRow.cpp"};

bool breaksLine(char character) noexcept {
    return character == '\n' || character == '\r' || character == '\0';
}

/// Fills a blank column with as much of the text as it takes, on one line, and returns how much
/// that is.
template <std::size_t width> std::size_t fillColumn(char (&column)[width], std::string_view text) {
    const std::size_t length = text.copy(column, width);
    std::replace_if(column, column + length, breaksLine, ' ');
    return length;
}

/// False if ENTRYTIME cannot show the time.
bool fillTime(EntryRow& row, const EntryColumns& entry, EntryStamp& stamp, const char* newest) {
    if (entry.hasTime) {
        return stamp.write(entry, newest, row->entrytime);
    }
    if (entry.hasTimeOfDay) {
        return stamp.writeTimeOfDay(entry, newest, row->entrytime);
    }
    if (newest == nullptr) {
        EntryStamp::writePresent(row->entrytime);
    } else {
        std::memcpy(row->entrytime, newest, sizeof row->entrytime);
    }
    return true;
}

} // namespace

bool ColumnsRow::fill(EntryRow& row, const EntryColumns& entry, EntryStamp& stamp,
                      const char* newest) {
    TraceScope trace(anchor);
    if (!fillTime(row, entry, stamp, newest)) {
        row.reject();
        return trace.result(false);
    }
    fillColumn(row->entrysys, entry.system);
    const std::size_t sourceLength = fillColumn(row->entrysrc, entry.source);
    fillColumn(row->entrytype, entry.type);
    fillColumn(row->entryclass, entry.entryClass);
    const std::size_t length = fillColumn(row->entrydesc, entry.description);
    row.fillInUTF8({row->entrysrc, sourceLength}, {row->entrydesc, length});
    return trace.result(true);
}

} // namespace zrm
