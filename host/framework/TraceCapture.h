#ifndef ZRM_HOST_TRACE_CAPTURE_H
#define ZRM_HOST_TRACE_CAPTURE_H

#include "framework/traceSilence.h"

#include <cstdarg>
#include <string>

namespace zrm::host {

/// While it exists, the errors that the constructing thread traces are collected here instead of
/// being written, whatever the trace levels are; other threads trace as usual. Used for trials: the
/// agent says why it refuses something without filling the operator's trace. If a thread has
/// several, the latest collects them.
class TraceCapture {
public:
    TraceCapture();
    ~TraceCapture();
    TraceCapture(const TraceCapture&) = delete;
    TraceCapture& operator=(const TraceCapture&) = delete;

    /// The errors since the last call, separated by blanks; empty if there were none.
    std::string take();

    // For the trace facility.

    /// The one of the calling thread, or null.
    static TraceCapture* current() noexcept;
    /// True while any thread has one; levels are then looked up at each operation.
    static bool exists() noexcept;
    void add(const char* format, std::va_list arguments) noexcept
        __attribute__((format(printf, 2, 0)));

private:
    TraceCapture* m_outer; ///< active again when this one ends
    std::string m_errors;
};

/// For entries that are judged again to answer a query.
using TraceSilence = TRC1_Silence;

} // namespace zrm::host

#endif
