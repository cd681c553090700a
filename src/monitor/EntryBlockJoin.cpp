#include "framework/LogEntry.h"
#include "logs/LineJoin.h"
#include "monitor/EntryBlock.h"

#include <algorithm>
#include <cstring>
#include <utility>

namespace zrm {

// Entries of several lines. Which line begins the next one is known only when that line is whole,
// so the last lines of a file wait (isWaiting) until somebody says that nothing more comes.

void EntryBlock::skipZeros() noexcept {
    while (m_begin < m_end && m_block[m_begin] == '\0') {
        ++m_begin;
        m_nextLength = unknown;
    }
}

/// The whole line behind those of the entry. False if there is none.
bool EntryBlock::findLine(std::string_view& line) noexcept {
    const std::size_t available = m_end - m_begin - m_length;
    if (available == 0) {
        return false;
    }
    const char* const begin = m_block.get() + m_begin + m_length;
    if (m_nextLength == unknown) {
        const void* const newline = std::memchr(begin, '\n', available);
        if (newline == nullptr) {
            return false;
        }
        m_nextLength = static_cast<std::size_t>(static_cast<const char*>(newline) - begin);
    }
    line = {begin, m_nextLength};
    return true;
}

/// True if the entry has no room for so many further bytes.
bool EntryBlock::isFull(std::size_t more) const noexcept {
    const LineJoin::Limits& limits = m_join->limits();
    return m_lines >= limits.lines || m_length + more > limits.bytes;
}

/// Whether the line behind those of the entry belongs to it.
bool EntryBlock::takes(std::string_view line) const noexcept {
    const char* const behind = m_block.get() + m_begin + m_length;
    return !isFull(line.size() + 1) &&
           m_join->joins({behind - 1 - m_lastLength, m_lastLength}, line);
}

char* EntryBlock::nextJoined() noexcept {
    if (m_isInLongLine) {
        return restOfLongLine();
    }
    if (m_lines == 0) {
        skipZeros();
    }
    for (std::string_view line; findLine(line); m_nextLength = unknown) {
        if (m_lines > 0 && !takes(line)) {
            return endJoined();
        }
        ++m_lines;
        m_length += line.size() + 1;
        m_lastLength = line.size();
        if (!m_join->isOpen(line)) {
            m_nextLength = unknown;
            return endJoined();
        }
    }
    const char* const unfinished = m_block.get() + m_begin + m_length;
    const std::size_t available = m_end - m_begin - m_length;
    if (m_lines == 0) {
        if (available > EntryKeep::longestText) {
            beginLongLine();
        }
        return nullptr;
    }
    const bool isOver = isFull(available + 1) || (available > 0 && *unfinished == '\0');
    return isOver ? endJoined() : nullptr;
}

/// Gives the whole lines of the entry.
char* EntryBlock::endJoined() noexcept {
    m_given = m_begin;
    const std::size_t length = std::exchange(m_length, 0);
    if (std::exchange(m_lines, 0) == 1) {
        return giveLine(m_block.get() + m_begin, length - 1);
    }
    return giveLines(length);
}

/// Gives several lines, of which the last may have no newline, and copies the first.
char* EntryBlock::giveLines(std::size_t length) noexcept {
    const char* const text = m_block.get() + m_begin;
    const auto* const newline = static_cast<const char*>(std::memchr(text, '\n', length));
    const auto first = static_cast<std::size_t>(newline - text);
    const std::size_t given = std::min(first, longestLine);
    std::memcpy(longLine(), text, given);
    setText(text, length - (text[length - 1] == '\n' ? 1 : 0));
    char* const entry = endLong(given, given < first);
    m_given = std::exchange(m_begin, m_begin + length);
    return entry;
}

std::int64_t EntryBlock::waitingTo() const noexcept {
    return offset() + static_cast<std::int64_t>(m_length);
}

char* EntryBlock::endWaiting() noexcept {
    restore();
    m_isCut = false;
    m_nextLength = unknown;
    return endJoined();
}

char* EntryBlock::restJoined() noexcept {
    if (m_isInLongLine) {
        return restOfLine();
    }
    if (m_lines == 0) {
        skipZeros();
        return restOfLine();
    }
    const std::size_t length = m_end - m_begin;
    const std::string_view line(m_block.get() + m_begin + m_length, length - m_length);
    if (line.empty() || !takes(line)) {
        return endJoined();
    }
    m_lines = m_length = 0;
    return giveLines(length);
}

} // namespace zrm
