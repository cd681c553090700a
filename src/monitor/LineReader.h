#ifndef ZRM_LINE_READER_H
#define ZRM_LINE_READER_H

#include <cstddef>
#include <memory>

namespace zrm {

/// Reads lines from a descriptor in the pieces that fgets with a 2048-byte buffer would return: at
/// most 2047 characters each, newline included, a last line without a newline unchanged. Reads
/// large blocks and terminates each piece in place, so a line needs neither a copy nor a lock. The
/// first read allocates the block, because most logs never grow. One thread. The caller owns the
/// descriptor, which is positioned after the last byte returned once `next` returned null.
class LineReader {
public:
    LineReader() = default;
    LineReader(const LineReader&) = delete;
    LineReader& operator=(const LineReader&) = delete;

    /// Reads from the descriptor's current position. Discards what was read before.
    void start(int fd) noexcept;
    /// Returns the next piece, terminated and writable until the next call. Null at the end of
    /// input or on a read error.
    char* next() noexcept;
    /// errno of the failed read, or 0 if the end of input was reached.
    int error() const noexcept { return m_error; }
    /// Frees the block.
    void release() noexcept;

private:
    bool fill() noexcept;
    char* take(std::size_t length) noexcept;

    std::unique_ptr<char[]> m_block;
    char* m_begin = nullptr; ///< first byte not returned yet
    char* m_end = nullptr;   ///< one past the last byte read; the block has room for one more
    char m_behind = '\0';    ///< the byte at m_begin, overwritten by the last piece's terminator
    bool m_isTerminated = false;
    bool m_isAtEnd = false;
    int m_fd = -1;
    int m_error = 0;
};

} // namespace zrm

#endif
