#ifndef ZRM_HOST_TRACE_CONTROL_H
#define ZRM_HOST_TRACE_CONTROL_H

#include "host/base/Result.h"

#include <string>

namespace zrm::host {

/// The host's control of the trace facility. Any thread, at any time.
namespace TraceControl {

/// Sets which classes of records are written, in the form of QFW_TRC1 (see TraceLevels); every
/// source file picks up its level at its next operation. Leaves the levels unchanged when the text
/// is refused. At start only errors are traced.
Result<void> configure(const std::string& text);

/// The text last accepted by configure; "error" at the start.
std::string levels();

/// Writes the trace to this file from now on, or to standard error when the path is empty. Appends
/// to the file, and recreates it if it is moved away. Nothing changes when it cannot be opened.
Result<void> openFile(const std::string& path);

/// The level of a source file: a set of TRC1_Class bits. Neither locks nor allocates.
unsigned levelOf(const char* unit) noexcept;

} // namespace TraceControl

} // namespace zrm::host

#endif
