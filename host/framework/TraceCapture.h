#ifndef ZRM_HOST_TRACE_CAPTURE_H
#define ZRM_HOST_TRACE_CAPTURE_H

#include <cstdarg>
#include <string>

namespace zrm::host {

/// While it lives, the errors that the constructing thread traces are kept here and not written,
/// whatever the trace levels are; other threads trace as always. For what is only tried: the agent
/// says why it refuses something, and the operator's trace stays free of it. Of several on
/// a thread the latest keeps them.
class TraceCapture {
public:
    TraceCapture();
    ~TraceCapture();
    TraceCapture(const TraceCapture&) = delete;
    TraceCapture& operator=(const TraceCapture&) = delete;

    /// The errors since the last call, a blank between them; empty without any.
    std::string take();

    // For the trace facility.

    /// That of the calling thread, or null.
    static TraceCapture* current() noexcept;
    /// True while any thread has one: levels are asked for at each operation then.
    static bool exists() noexcept;
    void add(const char* format, std::va_list arguments) noexcept
        __attribute__((format(printf, 2, 0)));

private:
    TraceCapture* m_outer; ///< goes on when this one ends
    std::string m_errors;
};

/// While it lives, nothing that the constructing thread traces is written; other threads trace as
/// always, and at the same cost. For entries that are judged again to answer a question: the trace
/// of what is monitored stays free of them.
class TraceSilence {
public:
    TraceSilence() noexcept;
    ~TraceSilence();
    TraceSilence(const TraceSilence&) = delete;
    TraceSilence& operator=(const TraceSilence&) = delete;

    /// Whether the calling thread has one. For the trace facility.
    static bool isOn() noexcept;
};

} // namespace zrm::host

#endif
