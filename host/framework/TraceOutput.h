#ifndef ZRM_HOST_TRACE_OUTPUT_H
#define ZRM_HOST_TRACE_OUTPUT_H

#include <ctime>
#include <string_view>

namespace zrm::host {

/// Where trace records go: standard error until a file was opened. Any thread.
namespace TraceOutput {

/// Appends from now on to this file, made when it does not exist, or to standard error when the
/// path is empty. Returns 0, or errno: then everything stays as it was.
int open(const char* path);

/// Writes one record, in one write when the system takes it whole; a record that cannot be written
/// is lost. A file that was moved away or removed is made anew within a second, unless a forked
/// child writes. Neither locks nor allocates.
void write(std::string_view record, std::time_t now) noexcept;

} // namespace TraceOutput

} // namespace zrm::host

#endif
