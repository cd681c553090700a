#include "monitor/EntryRow.h"

#include "base/RowBytes.h"
#include "base/TraceScope.h"
#include "logs/EntryClock.h"
#include "monitor/LogFile.h"

namespace zrm {

namespace {

TRC1_Anchor anchor{"LogFile.cpp"}; // the trace shows these as operations of the log

constexpr std::size_t entryBegin = offsetof(zrm_rmlogent_data_t, entrytime);
constexpr std::size_t descriptionBegin = offsetof(zrm_rmlogent_data_t, entrydesc);
constexpr std::size_t entryInUTF8Begin = offsetof(zrm_rmlogent_data_t, uentrysrc);
constexpr std::size_t descriptionInUTF8Begin = offsetof(zrm_rmlogent_data_t, uentrydesc);

} // namespace

EntryRow::EntryRow(LogFile& log, void* row)
    : m_log(log), m_columns(*static_cast<zrm_rmlogent_data_t*>(row)),
      m_own(row == log.ownRow() ? &log.m_ownRow : nullptr) {
    TraceScope trace(anchor);
    char* const bytes = static_cast<char*>(row);
    lastEntryMoment = {};
    // While the flow class is traced, fillCommonColumns must run for each row.
    if (m_own != nullptr && m_own->m_isReusable && !trace.isOn(TRC1_FLOW)) {
        RowBytes::blank(bytes + entryBegin,
                        descriptionBegin - entryBegin + m_own->m_descriptionLength);
        RowBytes::blank(bytes + entryInUTF8Begin, descriptionInUTF8Begin - entryInUTF8Begin +
                                                      m_own->m_descriptionLengthInUTF8);
        LogFile::fillChangingColumns(&m_columns);
    } else {
        RowBytes::blank(bytes, sizeof m_columns);
        log.fillCommonColumns(&m_columns);
    }
    if (m_own != nullptr) {
        m_own->m_isReusable = true;
        m_own->m_descriptionLength = sizeof m_columns.entrydesc;
        m_own->m_descriptionLengthInUTF8 = sizeof m_columns.uentrydesc;
    }
}

void EntryRow::restoreCommonColumns() {
    TraceScope trace(anchor);
    m_log.fillCommonColumns(&m_columns);
    if (m_own != nullptr) {
        m_own->m_isReusable = false; // the overrun left text where the next row must be blank
    }
}

void EntryRow::reject() {
    TraceScope trace(anchor);
    RowBytes::blank(reinterpret_cast<char*>(&m_columns), sizeof m_columns);
    if (m_own != nullptr) {
        m_own->m_isReusable = false;
    }
}

} // namespace zrm
