#include "host/framework/TraceRecord.h"

#include "host/base/Utf8.h"
#include "host/framework/TraceClock.h"

#include <algorithm>
#include <cstdio>
#include <cstring>

namespace zrm::host {

namespace {

constexpr std::size_t longestEscape = 6;

/// Whether a byte is shown by every terminal as it is, or is a line end or tab.
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
    // The place of the terminator is the newline's at last.
    m_size += std::min(static_cast<std::size_t>(std::max(length, 0)), room - 1);
}

std::string_view TraceRecord::finish() noexcept {
    if (m_text[m_size - 1] != '\n') {
        m_text[m_size++] = '\n';
    }
    return std::all_of(m_text, m_text + m_size, isPlain) ? std::string_view(m_text, m_size)
                                                         : escaped();
}

/// The record with escapes in the place of what steers a terminal, cut where it becomes too long.
std::string_view TraceRecord::escaped() noexcept {
    std::size_t size = 0;
    for (std::string_view rest(m_text, m_size - 1); !rest.empty();) {
        const Utf8::Sequence sequence = Utf8::firstSequence(rest);
        const std::string_view bytes = rest.substr(0, sequence.length);
        rest.remove_prefix(sequence.length);
        // A byte that belongs to no character may be a control in the terminal's own code page.
        const char32_t character =
            sequence.valid ? Utf8::character(bytes) : static_cast<unsigned char>(bytes.front());
        const bool isShown =
            (bytes.size() == 1 && isPlain(bytes.front())) || !Utf8::isSteering(character);
        if (size + std::max<std::size_t>(bytes.size(), longestEscape) >= maxSize) {
            break;
        }
        if (isShown) {
            std::memcpy(m_escaped + size, bytes.data(), bytes.size());
            size += bytes.size();
        } else {
            size += static_cast<std::size_t>(
                std::snprintf(m_escaped + size, longestEscape + 1,
                              character < 0x80 || !sequence.valid ? "\\x%02x" : "\\u%04x",
                              static_cast<unsigned>(character)));
        }
    }
    m_escaped[size++] = '\n';
    return {m_escaped, size};
}

} // namespace zrm::host
