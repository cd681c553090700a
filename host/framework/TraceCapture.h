#ifndef ZRM_HOST_TRACE_CAPTURE_H
#define ZRM_HOST_TRACE_CAPTURE_H

#include <cstdarg>
#include <string>

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

#endif
