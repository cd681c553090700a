#include "monitor/BackwardBlock.h"

#include "framework/LogEntry.h"
#include "monitor/Generation.h"

#include <algorithm>
#include <cstring>

namespace zrm {

namespace {

constexpr std::size_t largestBlock = 256 * 1024;
constexpr std::size_t longestText = EntryKeep::longestText;

} // namespace

BackwardBlock::BackwardBlock(std::size_t recordLength, const LineJoin* join)
    : m_recordLength(recordLength), m_join(recordLength == 0 ? join : nullptr),
      m_blockSize(recordLength == 0 ? largestBlock : largestBlock - largestBlock % recordLength),
      m_block(new char[largestBlock + longestText + 2 + (join != nullptr ? roomForRun : 0)]),
      m_line(new char[longestLine + 2]) {}

void BackwardBlock::start(std::int64_t size) noexcept {
    m_end = m_run = 0;
    m_begins.clear();
    m_isCut = false;
    m_offset = m_recordLength == 0 ? size : size - size % static_cast<std::int64_t>(m_recordLength);
}

/// How many NUL bytes at the beginning of the block need not be kept. One stays: if the line began
/// earlier, its text ends there.
std::size_t BackwardBlock::superfluousZeros() const noexcept {
    const std::size_t end = m_end - m_run;
    std::size_t zeros = 0;
    while (zeros < end && m_block[zeros] == '\0') {
        ++zeros;
    }
    return zeros - (zeros > 0 ? 1 : 0);
}

/// Drops all but the beginning of the line that is in memory, unless lines behind it may belong to
/// it.
void BackwardBlock::keepBeginning() noexcept {
    const std::size_t zeros = superfluousZeros();
    std::memmove(m_block.get(), m_block.get() + zeros, m_end - zeros);
    m_end -= zeros;
    if (m_run == 0 && m_end > longestText + 1) {
        m_end = longestText + 1;
        m_isCut = true;
    }
}

BackwardBlock::Fill BackwardBlock::fill(Generation& file) noexcept {
    if (m_offset == 0) {
        return Fill::end;
    }
    keepBeginning();
    const auto length = static_cast<std::size_t>(
        std::min<std::int64_t>(static_cast<std::int64_t>(m_blockSize), m_offset));
    std::memmove(m_block.get() + length, m_block.get(), m_end);
    const std::int64_t from = m_offset - static_cast<std::int64_t>(length);
    for (std::size_t done = 0; done < length;) {
        const std::ptrdiff_t count = file.readAt(m_block.get() + done, length - done,
                                                 from + static_cast<std::int64_t>(done));
        if (count <= 0) {
            m_end = m_run = 0;
            return count < 0 ? Fill::failed : Fill::changed;
        }
        done += static_cast<std::size_t>(count);
    }
    m_offset = from;
    m_end += length;
    return Fill::more;
}

char* BackwardBlock::next() {
    if (m_recordLength != 0) {
        return nextRecord();
    }
    if (m_join != nullptr) {
        return nextJoined();
    }
    while (m_end > 0) {
        // The newline before m_end is the line's own, and does not begin it.
        const std::size_t begin = behindNewlineBefore(m_end - 1);
        if (begin == 0 && m_offset > 0) {
            return nullptr;
        }
        const std::size_t end = m_end;
        m_end = begin;
        if (char* const text = line(begin, end)) {
            return text;
        }
    }
    return nullptr;
}

/// The position behind the last newline before `end`; 0 if there is none.
std::size_t BackwardBlock::behindNewlineBefore(std::size_t end) const noexcept {
    while (end > 0 && m_block[end - 1] != '\n') {
        --end;
    }
    return end;
}

char* BackwardBlock::nextRecord() noexcept {
    if (m_end < m_recordLength) {
        return nullptr;
    }
    m_end -= m_recordLength;
    m_text = std::string_view(m_block.get() + m_end, m_recordLength);
    return m_block.get() + m_end;
}

/// Terminates a line. Null if it has only NUL bytes.
char* BackwardBlock::line(std::size_t begin, std::size_t end) noexcept {
    char* const text = m_block.get();
    while (begin < end && text[begin] == '\0') {
        ++begin;
    }
    if (begin == end) {
        return nullptr;
    }
    const bool hasNewline = text[end - 1] == '\n' && !m_isCut;
    const std::size_t length = end - begin - (hasNewline ? 1 : 0);
    m_isTextCut = m_isCut || length > longestText;
    m_isCut = false;
    m_text = std::string_view(text + begin, std::min(length, longestText));
    m_text.remove_suffix(!m_isTextCut && m_text.ends_with('\r') ? 1 : 0);
    if (hasNewline && length <= longestLine) {
        text[end] = '\0'; // the first byte of a line that was given before
        return text + begin;
    }
    return copyLine({text + begin, length});
}

char* BackwardBlock::copyLine(std::string_view line) noexcept {
    const std::size_t given = line.copy(m_line.get(), longestLine);
    m_line[given] = '\n';
    m_line[given + 1] = '\0';
    return m_line.get();
}

} // namespace zrm
