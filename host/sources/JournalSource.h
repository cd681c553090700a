#ifndef ZRM_HOST_JOURNAL_SOURCE_H
#define ZRM_HOST_JOURNAL_SOURCE_H

#include "host/config/SourceConfig.h"
#include "logs/EntrySource.h"

#include <memory>
#include <string>

namespace zrm::host {

/// The entries of a journal. A position is the cursor of an entry.
class JournalSource final : public EntrySource {
public:
    explicit JournalSource(JournalConfig config);

    std::unique_ptr<Reading> reading() const override;
    std::unique_ptr<Past> past() const override;
    const std::string& definition() const noexcept override { return m_definition; }

private:
    const JournalConfig m_config;
    const std::string m_definition;
};

} // namespace zrm::host

#endif
