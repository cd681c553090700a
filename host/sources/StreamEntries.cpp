#include "host/sources/StreamEntries.h"

#include "framework/LogEntry.h"

#include <algorithm>
#include <cstring>

namespace zrm::host {

namespace {

constexpr std::size_t longestText = EntryKeep::longestText;
constexpr std::size_t roomForLines = 2 * longestText;

} // namespace

StreamLines::StreamLines() : m_room(roomForLines + 1) {}

char* StreamLines::next() noexcept {
    for (;;) {
        char* const begin = m_room.data() + m_begin;
        const std::size_t length = m_end - m_begin;
        auto* const end = static_cast<char*>(std::memchr(begin, '\n', length));
        if (end == nullptr) {
            return length > longestText ? cut() : nullptr;
        }
        m_begin += static_cast<std::size_t>(end - begin) + 1;
        if (!std::exchange(m_isSkipping, false)) {
            return give(begin, static_cast<std::size_t>(end - begin));
        }
    }
}

char* StreamLines::rest() noexcept {
    char* const begin = m_room.data() + m_begin;
    const std::size_t length = m_end - m_begin;
    const bool isLine = length > 0 && !m_isSkipping;
    clear();
    return isLine ? give(begin, length) : nullptr;
}

std::pair<char*, std::size_t> StreamLines::room() noexcept {
    std::memmove(m_room.data(), m_room.data() + m_begin, m_end - m_begin);
    m_end -= std::exchange(m_begin, 0);
    return {m_room.data() + m_end, roomForLines - m_end};
}

/// The line is longer than any text: what follows is passed over.
char* StreamLines::cut() noexcept {
    char* const begin = m_room.data() + m_begin;
    const std::size_t length = m_end - m_begin;
    m_begin = m_end;
    return std::exchange(m_isSkipping, true) ? nullptr : give(begin, length);
}

char* StreamLines::give(char* begin, std::size_t length) noexcept {
    length -= length > 0 && begin[length - 1] == '\r' ? 1 : 0;
    m_isCut = length > longestText;
    length = std::min(length, longestText);
    begin[length] = '\0';
    m_text = {begin, length};
    return begin;
}

void StreamEntries::begin() noexcept {
    m_lines.clear();
    m_text.clear();
    m_count = 0;
    m_hasEnded = m_isComplete = false;
}

char* StreamEntries::nextLine() noexcept {
    char* const line = m_lines.next();
    return line == nullptr && m_hasEnded ? m_lines.rest() : line;
}

/// Whether a line belongs to the entry that is being built.
bool StreamEntries::takes(std::string_view line) const {
    constexpr std::size_t lineEnds = 2; // both lines have one
    const LineJoin::Limits& limits = m_join->limits();
    return !m_isComplete && !m_isCut && !m_lines.isCut() && m_count < limits.lines &&
           m_text.size() + line.size() + lineEnds <= limits.bytes &&
           m_join->joins(std::string_view(m_text).substr(m_last), line);
}

void StreamEntries::append(std::string_view line) {
    m_text.append(m_count > 0 ? "\n" : "");
    m_last = m_text.size();
    m_text.append(line);
    ++m_count;
    m_isCut = m_lines.isCut();
    m_isComplete = !m_join->isOpen(line);
    m_since = {};
}

char* StreamEntries::give() noexcept {
    m_given.swap(m_text);
    m_text.clear();
    m_count = 0;
    m_isGivenCut = m_isCut;
    m_isComplete = false;
    return m_given.data();
}

char* StreamEntries::next() {
    if (m_join == nullptr) {
        return nextLine();
    }
    while (!m_isComplete) {
        if (nextLine() == nullptr) {
            break;
        }
        const std::string_view line = m_lines.text();
        if (m_count > 0 && !takes(line)) {
            char* const entry = give();
            append(line);
            return entry;
        }
        append(line);
    }
    if (m_count == 0) {
        return nullptr;
    }
    const Clock::time_point now = Clock::now();
    if (m_since == Clock::time_point()) {
        m_since = now; // the clock is read only when there are no further lines
    }
    const bool isOver = m_isComplete || m_hasEnded || now - m_since >= m_join->limits().wait;
    return isOver ? give() : nullptr;
}

std::chrono::milliseconds StreamEntries::patience(std::chrono::milliseconds most) const noexcept {
    using std::chrono::milliseconds;
    if (m_join == nullptr || m_count == 0) {
        return most;
    }
    const auto left = m_since + m_join->limits().wait - Clock::now();
    return std::clamp(std::chrono::ceil<milliseconds>(left), milliseconds(0), most);
}

} // namespace zrm::host
