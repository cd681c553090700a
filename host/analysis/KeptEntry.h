#ifndef ZRM_HOST_KEPT_ENTRY_H
#define ZRM_HOST_KEPT_ENTRY_H

#include "base/EntryFields.h"
#include "framework/LogEntry.h"

#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm::host {

/// An entry whose source has gone on since, with a text and fields of its own. One thread.
class KeptEntry final : public LogEntry {
public:
    using Fields = std::vector<std::pair<std::string, std::string>>; ///< names and values

    KeptEntry(std::string text, Fields fields);
    /// A copy; `withFields`: somebody will ask for these.
    KeptEntry(LogEntry& entry, bool withFields);

    std::string_view text() const override { return m_text; }
    bool isCut() const override { return m_isCut; }
    const EntryFields& fields() override { return m_fields; }
    const EntryKeep& keep() const override { return m_keep; }

private:
    void addFields();

    const std::string m_text;
    const bool m_isCut = false;
    const EntryKeep m_keep;
    Fields m_texts; ///< of m_fields
    EntryFields m_fields;
};

} // namespace zrm::host

#endif
