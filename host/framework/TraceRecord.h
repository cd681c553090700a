#ifndef ZRM_HOST_TRACE_RECORD_H
#define ZRM_HOST_TRACE_RECORD_H

#include <cstdarg>
#include <cstddef>
#include <ctime>
#include <string_view>

namespace zrm::host {

/// One trace record: local time with microseconds, thread, unit and line, text, and a final
/// newline. Terminal control characters are escaped, except line ends and tabs, which the agent's
/// own texts contain. What does not fit is cut off. Lives on the stack of one thread; neither locks
/// nor allocates.
class TraceRecord {
public:
    static constexpr std::size_t maxSize = 16384; ///< bytes, including the newline

    TraceRecord(const std::timespec& moment, long thread, const char* unit, int line) noexcept;

    /// Adds the text.
    void addList(const char* format, std::va_list arguments) noexcept
        __attribute__((format(printf, 2, 0)));
    void add(const char* format, ...) noexcept __attribute__((format(printf, 2, 3)));

    /// Completes the record and returns it; valid as long as the object lives.
    std::string_view finish() noexcept;

private:
    std::string_view escaped() noexcept;

    std::size_t m_size = 0;
    char m_text[maxSize];
    char m_escaped[maxSize]; ///< used when something must be escaped
};

} // namespace zrm::host

#endif
