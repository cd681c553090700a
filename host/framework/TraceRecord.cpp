#include "host/framework/TraceRecord.h"

#include "host/framework/TraceClock.h"

#include <algorithm>
#include <cstdio>

TraceRecord::TraceRecord(const std::timespec& moment, long thread, const char* unit,
                         int line) noexcept {
    const TraceClock::Time time = TraceClock::local(moment);
    add("%04ld-%02u-%02u %02d:%02d:%02d.%06ld %ld %s:%d ", time.year, time.month, time.day,
        time.hour, time.minute, time.second, time.microsecond, thread, unit, line);
}

void TraceRecord::add(const char* format, ...) noexcept {
    std::va_list arguments;
    va_start(arguments, format);
    addList(format, arguments);
    va_end(arguments);
}

void TraceRecord::addList(const char* format, std::va_list arguments) noexcept {
    const std::size_t room = kMaxSize - m_size;
    const int length = std::vsnprintf(m_text + m_size, room, format, arguments);
    // The place of the terminator is the newline's at last.
    m_size += std::min(static_cast<std::size_t>(std::max(length, 0)), room - 1);
}

std::string_view TraceRecord::finish() noexcept {
    if (m_text[m_size - 1] != '\n') {
        m_text[m_size++] = '\n';
    }
    return {m_text, m_size};
}
