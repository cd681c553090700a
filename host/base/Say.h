#ifndef ZRM_HOST_SAY_H
#define ZRM_HOST_SAY_H

namespace zrm::host {

/// Writes one line for the operator, "zrmagent: TEXT", to standard error, whatever the trace level.
/// Any thread.
void say(const char* format, ...) __attribute__((format(printf, 1, 2)));

} // namespace zrm::host

#endif
