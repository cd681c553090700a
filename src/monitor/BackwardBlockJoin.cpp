#include "logs/LineJoin.h"
#include "monitor/BackwardBlock.h"

#include <algorithm>
#include <cstring>

namespace zrm {

// Entries of several lines. Which of them the limits separate depends on where the run of lines
// begins, so a run is given when all of it is in memory.

char* BackwardBlock::nextJoined() {
    if (m_begins.empty()) {
        if (!findRun()) {
            return nullptr;
        }
        cutRun();
    }
    const std::size_t begin = m_begins.back();
    m_begins.pop_back();
    char* const entry = lines(begin);
    m_run -= m_end - begin;
    m_end = begin;
    return entry;
}

/// Looks for the beginning of the run that ends at m_end. False if more must be read.
bool BackwardBlock::findRun() noexcept {
    const bool isFirstByteKnown = m_offset == 0;
    while (m_end > 0) {
        const std::size_t runBegin = m_end - m_run;
        if (m_run >= longestRun || (runBegin == 0 && isFirstByteKnown)) {
            return true;
        }
        const std::size_t begin = runBegin == 0 ? 0 : behindNewlineBefore(runBegin - 1);
        if (begin == 0 && !isFirstByteKnown) {
            // A line that is longer than an entry of several lines may be has no other.
            return m_run > 0 && runBegin - superfluousZeros() > m_join->limits().bytes + 1;
        }
        if (m_run == 0 && zerosFrom(begin) == m_end) {
            m_end = begin; // the end of the file has only NUL bytes
            continue;
        }
        if (m_run > 0 && !isContinued(begin)) {
            return true;
        }
        m_run = m_end - begin;
    }
    return false;
}

/// The position of the first byte that is not NUL.
std::size_t BackwardBlock::zerosFrom(std::size_t begin) const noexcept {
    while (begin < m_end && m_block[begin] == '\0') {
        ++begin;
    }
    return begin;
}

std::string_view BackwardBlock::lineAt(std::size_t begin) const noexcept {
    const char* const line = m_block.get() + begin;
    const auto* const newline = static_cast<const char*>(std::memchr(line, '\n', m_end - begin));
    return {line, newline != nullptr ? static_cast<std::size_t>(newline - line) : m_end - begin};
}

/// Whether the line that begins here is continued by the run behind it.
bool BackwardBlock::isContinued(std::size_t begin) const noexcept {
    const std::string_view before = lineAt(zerosFrom(begin));
    const std::string_view line = lineAt(m_end - m_run);
    return before.size() + 1 + line.size() + 1 <= m_join->limits().bytes &&
           m_join->joins(before, line);
}

/// Finds the entries of the run.
void BackwardBlock::cutRun() {
    const LineJoin::Limits& limits = m_join->limits();
    m_begins.push_back(m_end - m_run);
    std::size_t lines = 0;
    std::size_t bytes = 0;
    for (std::size_t at = zerosFrom(m_begins.back()); at < m_end;) {
        const std::size_t more = lineAt(at).size() + 1;
        if (lines > 0 && (lines >= limits.lines || bytes + more > limits.bytes)) {
            m_begins.push_back(at);
            lines = bytes = 0;
        }
        ++lines;
        bytes += more;
        at += more;
    }
}

/// Gives the lines from `begin` to m_end.
char* BackwardBlock::lines(std::size_t begin) noexcept {
    const std::size_t first = std::min(zerosFrom(begin), m_end - 1);
    const std::string_view firstLine = lineAt(first);
    if (first + firstLine.size() + 1 >= m_end) {
        return line(begin, m_end);
    }
    m_isTextCut = false;
    m_text = std::string_view(m_block.get() + first, m_end - first);
    m_text.remove_suffix(m_text.ends_with('\n') ? 1 : 0);
    m_text.remove_suffix(m_text.ends_with('\r') ? 1 : 0);
    return copyLine(firstLine);
}

} // namespace zrm
