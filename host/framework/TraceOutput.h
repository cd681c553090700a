#ifndef ZRM_HOST_TRACE_OUTPUT_H
#define ZRM_HOST_TRACE_OUTPUT_H

#include <ctime>
#include <string_view>

namespace zrm::host {

/// Where trace records go: standard error until a file is opened. Any thread.
namespace TraceOutput {

/// From now on appends to this file, which is created if necessary, or writes to standard error
/// when the path is empty. Returns 0, or errno, in which case nothing changes.
int open(const char* path);

/// Writes one record, in a single write when the system takes all of it; a record that cannot be
/// written is lost. A file that was moved or removed is recreated within a second, unless a forked
/// child writes. Neither locks nor allocates.
void write(std::string_view record, std::time_t now) noexcept;

} // namespace TraceOutput

} // namespace zrm::host

#endif
