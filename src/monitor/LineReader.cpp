#include "monitor/LineReader.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <new>

#include <unistd.h>

namespace zrm {

namespace {

constexpr std::size_t blockSize = 256 * 1024;
constexpr std::size_t longestPiece = 2047;

} // namespace

void LineReader::start(int fd) noexcept {
    m_fd = fd;
    m_error = 0;
    m_isAtEnd = false;
    m_isTerminated = false;
    m_begin = m_end = m_block.get();
}

void LineReader::release() noexcept {
    m_block.reset();
    start(-1);
}

char* LineReader::next() noexcept {
    if (m_isTerminated) {
        *m_begin = m_behind;
        m_isTerminated = false;
    }
    std::size_t searched = 0;
    for (;;) {
        const std::size_t available = static_cast<std::size_t>(m_end - m_begin);
        const std::size_t reach = std::min(available, longestPiece);
        if (reach > searched) {
            if (const void* newline = std::memchr(m_begin + searched, '\n', reach - searched)) {
                return take(
                    static_cast<std::size_t>(static_cast<const char*>(newline) - m_begin + 1));
            }
            searched = reach;
        }
        if (reach == longestPiece) {
            return take(longestPiece);
        }
        if (!fill()) {
            return m_error == 0 && reach > 0 ? take(reach) : nullptr;
        }
    }
}

/// Moves the unfinished line to the start of the block and reads more after it. Returns false if
/// there is no more or the read failed.
bool LineReader::fill() noexcept {
    if (m_isAtEnd || m_error != 0) {
        return false;
    }
    if (!m_block) {
        m_block.reset(new (std::nothrow) char[blockSize + 1]);
        if (!m_block) {
            m_error = ENOMEM;
            return false;
        }
        m_begin = m_end = m_block.get();
    }
    const std::size_t unfinished = static_cast<std::size_t>(m_end - m_begin);
    std::memmove(m_block.get(), m_begin, unfinished);
    m_begin = m_block.get();
    m_end = m_begin + unfinished;
    const ssize_t count = read(m_fd, m_end, blockSize - unfinished);
    if (count < 0) {
        m_error = errno;
        return false;
    }
    m_end += count;
    m_isAtEnd = count == 0;
    return !m_isAtEnd;
}

char* LineReader::take(std::size_t length) noexcept {
    char* const piece = m_begin;
    m_begin += length;
    m_behind = *m_begin;
    *m_begin = '\0';
    m_isTerminated = true;
    return piece;
}

} // namespace zrm
