#ifndef ZRM_HOST_SOURCE_READER_H
#define ZRM_HOST_SOURCE_READER_H

#include "host/config/ConfigSection.h"
#include "host/config/LogConfig.h"

#include <string_view>

namespace zrm::host {

/// Reads [[log]] tables whose entries do not come from files: the journal, and the output of a
/// command.
namespace SourceReader {

constexpr const char* journal = "journal";
constexpr const char* command = "command";

/// Whether the type is one of these.
bool isSource(std::string_view type) noexcept;

/// Reads the name and the keys of the log's type, and refuses those that only files have. Records
/// what is wrong in the section's problems.
void read(ConfigSection& section, LogConfig& log);

} // namespace SourceReader

} // namespace zrm::host

#endif
