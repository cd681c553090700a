#ifndef ZRM_SOURCE_ENTRY_H
#define ZRM_SOURCE_ENTRY_H

#include "base/EntryFields.h"
#include "framework/LogEntry.h"
#include "logs/EntrySource.h"

#include <string_view>

namespace zrm {

/// The entry that a source has given last, for conditions and events. One thread.
class SourceEntry final : public LogEntry {
public:
    /// Both outlive the object.
    SourceEntry(EntrySource::Entry& entry, const EntryKeep& keep) : m_entry(entry), m_keep(keep) {}

    /// The source has given the next entry.
    void begin() noexcept { m_hasFields = false; }

    std::string_view text() const override { return m_entry.text(); }
    bool isCut() const override { return m_entry.isTextCut(); }
    const EntryFields& fields() override {
        if (!m_hasFields) {
            m_fields.clear();
            m_entry.readFields(m_fields);
            m_hasFields = true;
        }
        return m_fields;
    }
    const EntryKeep& keep() const override { return m_keep; }

private:
    EntrySource::Entry& m_entry;
    const EntryKeep& m_keep;
    EntryFields m_fields;
    bool m_hasFields = false;
};

} // namespace zrm

#endif
