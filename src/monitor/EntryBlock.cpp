#include "monitor/EntryBlock.h"

#include "framework/LogEntry.h"
#include "logs/LineJoin.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <new>

namespace zrm {

namespace {

constexpr std::size_t longestText = EntryKeep::longestText;

} // namespace

void EntryBlock::start(std::int64_t offset, const Tail& tail) noexcept {
    m_begin = m_end = 0;
    m_readTo = offset;
    m_tail = tail;
    m_isTailAside = true;
    m_isInLongLine = false;
    m_isTerminated = false;
    m_lines = m_length = 0;
    m_nextLength = unknown;
    setText(nullptr, 0);
}

bool EntryBlock::allocate() noexcept {
    // An entry that waits and an unfinished line leave room to read.
    static_assert(LineJoin::mostBytes + longestText + 2 * Tail::size < blockSize);
    if (!m_block) {
        // Behind the block there is room for a terminator, for a long line and for its text.
        m_block.reset(new (std::nothrow) char[blockSize + 1 + longestLine + 2 + longestText]);
        if (!m_block) {
            errno = ENOMEM;
            return false;
        }
    }
    return true;
}

char* EntryBlock::longLine() const noexcept {
    return m_block.get() + blockSize + 1;
}

char* EntryBlock::longText() const noexcept {
    return longLine() + longestLine + 2;
}

std::string_view EntryBlock::text() const noexcept {
    std::string_view text(m_text, std::min(m_textLength, longestText));
    text.remove_suffix(m_recordLength == 0 && !isTextCut() && text.ends_with('\r') ? 1 : 0);
    return text;
}

bool EntryBlock::isTextCut() const noexcept {
    return m_textLength > longestText;
}

void EntryBlock::setText(const char* text, std::size_t length) noexcept {
    m_text = text;
    m_textLength = length;
}

void EntryBlock::restore() noexcept {
    if (m_isTerminated) {
        m_block[m_begin] = m_behind;
        m_isTerminated = false;
    }
}

/// Moves what was not given yet to the front, with the bytes before it.
void EntryBlock::compact() noexcept {
    if (m_end == 0 && !m_isInLongLine) {
        std::memcpy(m_block.get(), m_tail.bytes.data(), m_tail.length);
        m_begin = m_end = m_tail.length;
        m_isTailAside = false;
        return;
    }
    const std::size_t kept = std::min(m_begin, Tail::size);
    const std::size_t from = m_begin - kept;
    std::memmove(m_block.get(), m_block.get() + from, m_end - from);
    m_begin -= from;
    m_end -= from;
}

EntryBlock::Fill EntryBlock::fill(Generation& file) noexcept {
    if (!allocate()) {
        return Fill::failed;
    }
    restore();
    compact();
    const std::size_t overlap = file.isCompressed() ? 0 : std::min(m_end, Tail::size);
    const std::size_t from = m_end - overlap;
    std::array<char, Tail::size> known;
    std::memcpy(known.data(), m_block.get() + from, overlap);
    const std::int64_t at = m_readTo - static_cast<std::int64_t>(overlap);
    const auto room = std::min(static_cast<std::int64_t>(blockSize - from), m_readMost - at);
    const std::ptrdiff_t count =
        file.readAt(m_block.get() + from, static_cast<std::size_t>(room), at);
    const bool isSame = count >= static_cast<std::ptrdiff_t>(overlap) &&
                        std::memcmp(known.data(), m_block.get() + from, overlap) == 0;
    if (!isSame) {
        std::memcpy(m_block.get() + from, known.data(), overlap);
        return count < 0 ? Fill::failed : Fill::changed;
    }
    const std::size_t added = static_cast<std::size_t>(count) - overlap;
    m_end += added;
    m_readTo += static_cast<std::int64_t>(added);
    return added > 0 ? Fill::more : Fill::end;
}

char* EntryBlock::next() noexcept {
    restore();
    m_isCut = false;
    m_given = m_begin;
    if (!m_isPlain) {
        return m_join != nullptr ? nextJoined() : nextRecord();
    }
    if (m_isInLongLine) {
        return restOfLongLine();
    }
    while (m_begin < m_end && m_block[m_begin] == '\0') {
        ++m_begin;
    }
    char* const line = m_block.get() + m_begin;
    const std::size_t available = m_end - m_begin;
    if (available == 0) {
        return nullptr;
    }
    if (const void* const newline = std::memchr(line, '\n', available)) {
        const auto length = static_cast<std::size_t>(static_cast<const char*>(newline) - line);
        return giveLine(line, length);
    }
    if (available > longestText) {
        beginLongLine();
    }
    return nullptr;
}

/// Keeps the beginning of the unfinished line at m_begin, which is too long to be kept whole.
void EntryBlock::beginLongLine() noexcept {
    const char* const line = m_block.get() + m_begin;
    m_longLineBegin = offset();
    m_tail = tail();
    m_isTailAside = true;
    std::memcpy(longLine(), line, longestLine);
    std::memcpy(longText(), line, longestText);
    m_isInLongLine = true;
    m_begin = m_end;
}

char* EntryBlock::nextRecord() noexcept {
    if (m_end - m_begin < m_recordLength) {
        return nullptr;
    }
    char* const record = m_block.get() + m_begin;
    m_begin += m_recordLength;
    setText(record, m_recordLength);
    return record;
}

char* EntryBlock::restOfLongLine() noexcept {
    if (m_begin == m_end) {
        return nullptr;
    }
    const char* const text = m_block.get() + m_begin;
    const void* const newline = std::memchr(text, '\n', m_end - m_begin);
    if (newline == nullptr) {
        m_begin = m_end;
        return nullptr;
    }
    m_begin += static_cast<std::size_t>(static_cast<const char*>(newline) - text) + 1;
    setText(longText(), longestText + 1);
    return endLong(longestLine, true);
}

/// Ends the line that stands behind the block.
char* EntryBlock::endLong(std::size_t length, bool isCut) noexcept {
    m_isCut = isCut;
    m_given = notInBlock;
    m_isInLongLine = false;
    m_isTailAside = false;
    longLine()[length] = '\n';
    longLine()[length + 1] = '\0';
    return longLine();
}

char* EntryBlock::rest() noexcept {
    restore();
    m_isCut = false;
    return m_join != nullptr ? restJoined() : restOfLine();
}

char* EntryBlock::restOfLine() noexcept {
    const std::size_t length = m_end - m_begin;
    if (m_isInLongLine) {
        m_begin = m_end;
        setText(longText(), longestText + 1);
        return endLong(longestLine, true);
    }
    if (length == 0 || m_recordLength != 0) {
        m_begin = m_end;
        return nullptr;
    }
    const std::size_t given = std::min(length, longestLine);
    setText(m_block.get() + m_begin, length);
    std::memcpy(longLine(), m_text, given);
    m_begin = m_end;
    return endLong(given, given < length);
}

bool EntryBlock::takeBack() noexcept {
    if (m_given == notInBlock) {
        return false;
    }
    restore();
    m_begin = m_given;
    m_lines = m_length = 0;
    m_nextLength = unknown;
    return true;
}

void EntryBlock::release() noexcept {
    if (m_block && !m_isInLongLine) {
        restore();
        start(offset(), tail());
        m_block.reset();
    }
}

std::int64_t EntryBlock::offset() const noexcept {
    return m_isInLongLine ? m_longLineBegin : m_readTo - static_cast<std::int64_t>(m_end - m_begin);
}

Tail EntryBlock::tail() const noexcept {
    if (m_isTailAside) {
        return m_tail;
    }
    Tail tail;
    tail.assign(m_block.get(), m_begin);
    return tail;
}

} // namespace zrm
