#include "host/framework/TraceRecord.h"

#include "host/base/SteeringText.h"
#include "host/framework/TraceClock.h"

#include <algorithm>
#include <cstdio>
#include <cstring>

namespace zrm::host {

namespace {

/// Whether every terminal shows a byte as it is, or it is a line end or tab.
bool isPlain(char c) {
    return (c >= ' ' && c < 0x7f) || c == '\n' || c == '\t';
}

} // namespace

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
    const std::size_t room = maxSize - m_size;
    const int length = std::vsnprintf(m_text + m_size, room, format, arguments);
    // The newline finally replaces the terminator.
    m_size += std::min(static_cast<std::size_t>(std::max(length, 0)), room - 1);
}

std::string_view TraceRecord::finish() noexcept {
    if (m_text[m_size - 1] != '\n') {
        m_text[m_size++] = '\n';
    }
    return std::all_of(m_text, m_text + m_size, isPlain) ? std::string_view(m_text, m_size)
                                                         : escaped();
}

/// The record with terminal controls escaped, cut if it becomes too long.
std::string_view TraceRecord::escaped() noexcept {
    std::size_t size =
        SteeringText::copyVisible({m_text, m_size - 1}, m_escaped, sizeof m_escaped - 1);
    m_escaped[size++] = '\n';
    return {m_escaped, size};
}

} // namespace zrm::host
