#ifndef ZRM_HOST_SAY_H
#define ZRM_HOST_SAY_H

/// Writes one line for the operator, "zrmagent: TEXT", to standard error; whatever the trace
/// level. Any thread.
void say(const char* format, ...) __attribute__((format(printf, 1, 2)));

#endif
