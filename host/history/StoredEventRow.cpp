#include "host/history/StoredEventRow.h"

#include "host/history/EventChecksum.h"

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

enum Column { ID, RAISED, SITUATION, SEVERITY, LOG, JSON, TEXT, LABEL, CHECKSUM };

} // namespace

const char* const StoredEventRow::select =
    "SELECT events.id, raised, situation, severity, path, json, text, label, checksum FROM events"
    " LEFT JOIN labels ON labels.id = label LEFT JOIN logs ON logs.id = log WHERE ";

EventRecord StoredEventRow::record() const {
    return {static_cast<std::uint64_t>(m_row.integer(ID)),
            m_row.integer(RAISED),
            m_row.text(SITUATION),
            m_row.text(SEVERITY),
            m_row.text(LOG),
            m_row.text(JSON),
            m_row.text(TEXT)};
}

bool StoredEventRow::isIntact() const {
    return m_row.isNull(CHECKSUM)
               ? nlohmann::json::accept(m_row.text(JSON))
               : m_row.integer(CHECKSUM) == eventChecksum(m_row.integer(ID), m_row.integer(RAISED),
                                                          m_row.integer(LABEL), m_row.text(JSON));
}

} // namespace zrm::host
