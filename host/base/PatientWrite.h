#ifndef ZRM_HOST_PATIENT_WRITE_H
#define ZRM_HOST_PATIENT_WRITE_H

#include <string_view>

namespace zrm::host {

/// Writes records to a descriptor whose reader may not be reading. Any thread; neither locks nor
/// allocates.
namespace PatientWrite {

/// Writes a record, in a single write when the system takes all of it. Waits for a slow reader for
/// at most one second; after that, what the reader does not take at once is lost until it reads
/// again and gets a line saying how much was lost. Leaves the descriptor's mode unchanged, since
/// other processes may share it.
void toStandardError(std::string_view record) noexcept;

/// The same for a file that this process has opened with O_NONBLOCK.
void toFile(int fd, std::string_view record) noexcept;

} // namespace PatientWrite

} // namespace zrm::host

#endif
