#include "host/analysis/KeptEntry.h"

namespace zrm::host {

KeptEntry::KeptEntry(std::string text, Fields fields)
    : m_text(std::move(text)), m_texts(std::move(fields)) {
    addFields();
}

KeptEntry::KeptEntry(LogEntry& entry, bool withFields)
    : m_text(entry.text()), m_isCut(entry.isCut()), m_keep(entry.keep()) {
    if (withFields) {
        for (const auto& [name, value] : entry.fields().all()) {
            m_texts.emplace_back(name, value);
        }
    }
    addFields();
}

void KeptEntry::addFields() {
    for (const auto& [name, value] : m_texts) {
        m_fields.add(name, value);
    }
}

} // namespace zrm::host
