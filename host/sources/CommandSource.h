#ifndef ZRM_HOST_COMMAND_SOURCE_H
#define ZRM_HOST_COMMAND_SOURCE_H

#include "host/config/SourceConfig.h"
#include "logs/EntrySource.h"
#include "logs/FollowSettings.h"

#include <memory>
#include <string>

namespace zrm::host {

/// The lines that a command prints, each an entry, or joined to entries. A command that ends is
/// started again after a pause. What it has printed cannot be read again, so there are no
/// positions.
class CommandSource final : public EntrySource {
public:
    /// `format`: how lines are taken apart. None: a line is a description, and its time is the
    /// present. `join`: which lines make an entry; none: each is one.
    CommandSource(CommandConfig config, Defined<EntryFormat> format, Defined<LineJoin> join);

    std::unique_ptr<Reading> reading() const override;
    std::unique_ptr<Past> past() const override { return nullptr; }
    const std::string& definition() const noexcept override { return m_definition; }

private:
    const CommandConfig m_config;
    const Defined<EntryFormat> m_format;
    const Defined<LineJoin> m_join;
    const std::string m_definition;
};

} // namespace zrm::host

#endif
