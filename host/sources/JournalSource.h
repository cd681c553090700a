#ifndef ZRM_HOST_JOURNAL_SOURCE_H
#define ZRM_HOST_JOURNAL_SOURCE_H

#include "host/config/SourceConfig.h"
#include "host/formats/MessageFormat.h"
#include "logs/EntrySource.h"
#include "logs/FollowSettings.h"
#include "logs/LineJoin.h"

#include <memory>
#include <string>

namespace zrm::host {

/// The entries of a journal. A position is the cursor of an entry; where entries are joined, also
/// what was read behind it already (JournalJoin).
class JournalSource final : public EntrySource {
public:
    /// `messages`: what is read from them; none: they are taken as they are. `join`: which of one
    /// writer make one entry; none: each is one.
    explicit JournalSource(JournalConfig config, Defined<MessageFormat> messages = {},
                           Defined<LineJoin> join = {});

    std::unique_ptr<Reading> reading() const override;
    std::unique_ptr<Past> past() const override;
    const std::string& definition() const noexcept override { return m_definition; }

private:
    const JournalConfig m_config;
    const Defined<MessageFormat> m_messages;
    const Defined<LineJoin> m_join;
    const std::string m_definition;
};

} // namespace zrm::host

#endif
