#ifndef ZRM_HOST_LINE_ENTRY_H
#define ZRM_HOST_LINE_ENTRY_H

#include "base/EntryFields.h"
#include "framework/LogEntry.h"
#include "logs/FollowSettings.h"
#include "monitor/LogFile.h"

#include <string_view>

namespace zrm::host {

/// A line that a log has or might have, as its monitor would give it to conditions. Lines of the
/// log configuration's logs have no fields. One thread.
class LineEntry final : public LogEntry {
public:
    /// Both outlive the object; a null log gives no fields.
    LineEntry(const LogFile* log, std::string_view line) : LineEntry(log, line, line) {}
    /// A record, which is not a text.
    static LineEntry ofRecord(const LogFile* log, std::string_view record) {
        return {log, record, {}};
    }

    std::string_view text() const override { return m_text; }
    /// What the fields are read from: the text, or the record.
    std::string_view entry() const noexcept { return m_entry; }
    bool isCut() const override { return false; }
    const EntryFields& fields() override {
        if (!m_hasFields && m_log != nullptr && m_log->followSettings() != nullptr) {
            m_log->readFields(m_entry, m_fields);
        }
        m_hasFields = true;
        return m_fields;
    }
    const EntryKeep& keep() const override { return m_keep; }

private:
    LineEntry(const LogFile* log, std::string_view entry, std::string_view text)
        : m_log(log), m_entry(entry), m_text(text) {}

    const LogFile* const m_log;
    const std::string_view m_entry;
    const std::string_view m_text;
    const EntryKeep m_keep;
    EntryFields m_fields;
    bool m_hasFields = false;
};

} // namespace zrm::host

#endif
