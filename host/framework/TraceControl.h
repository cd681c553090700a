#ifndef ZRM_HOST_TRACE_CONTROL_H
#define ZRM_HOST_TRACE_CONTROL_H

#include <string>

namespace zrm::host {

/// What the host sets of the trace facility. Any thread, at any time.
namespace TraceControl {

/// Sets which classes of records are written, in the form of QFW_TRC1 (see TraceLevels); every
/// source file learns its level at its next operation. Returns an empty text, or what is wrong with
/// the given one: then the levels stay as they were, which at start is the errors alone.
std::string configure(const std::string& text);

/// The text that was given to configure last and holds; "error" at the start.
std::string levels();

/// Writes the trace to this file from now on, to standard error when the path is empty. The file is
/// appended to, and made anew when it was moved away. Returns an empty text, or why the file cannot
/// be opened: then everything stays as it was.
std::string openFile(const std::string& path);

/// The level of a source file: a set of TRC1_Class bits. Neither locks nor allocates.
unsigned levelOf(const char* unit) noexcept;

} // namespace TraceControl

} // namespace zrm::host

#endif
