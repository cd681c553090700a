#ifndef ZRM_HOST_PATIENT_WRITE_H
#define ZRM_HOST_PATIENT_WRITE_H

#include <string_view>

namespace zrm::host {

/// Writes of records to a descriptor at whose other end somebody may not read. Any thread; neither
/// locks nor allocates.
namespace PatientWrite {

/// Writes a record, in one write when the system takes it whole. A reader that is slow is waited
/// for, for a second at most; from then on what it does not take at once is lost, until it reads
/// again and gets a line that says how much. The descriptor's own mode is not changed, which
/// other processes may share.
void toStandardError(std::string_view record) noexcept;

/// The same for a file that this process has opened without waiting (O_NONBLOCK).
void toFile(int fd, std::string_view record) noexcept;

} // namespace PatientWrite

} // namespace zrm::host

#endif
