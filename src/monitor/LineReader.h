#ifndef ZRM_LINE_READER_H
#define ZRM_LINE_READER_H

#include <cstddef>
#include <memory>

namespace zrm {

/// Reads the lines behind a descriptor in the pieces that fgets with a buffer of 2048 bytes gives:
/// at most 2047 characters each, the newline kept, a last line without one as it stands. Reads
/// large blocks and terminates each piece in place, so that a line costs neither a copy nor a lock.
/// The block is allocated by the first read, since most logs of a machine never grow. One thread;
/// the descriptor is the caller's and stands behind the last byte given once `next` returned null.
class LineReader {
public:
    LineReader() = default;
    LineReader(const LineReader&) = delete;
    LineReader& operator=(const LineReader&) = delete;

    /// Reads from the descriptor's position on; forgets what was read before.
    void start(int fd) noexcept;
    /// The next piece, terminated and changeable until the next call; null at the end of input or
    /// when reading failed.
    char* next() noexcept;
    /// errno of the read that failed; 0 when the end of input was reached.
    int error() const noexcept { return m_error; }
    /// Gives the block's memory back.
    void release() noexcept;

private:
    bool fill() noexcept;
    char* take(std::size_t length) noexcept;

    std::unique_ptr<char[]> m_block;
    char* m_begin = nullptr; ///< first byte that was not given yet
    char* m_end = nullptr;   ///< behind the last byte read; the block has room for one more
    char m_behind = '\0';    ///< the byte at m_begin, where the last piece's terminator stands
    bool m_isTerminated = false;
    bool m_isAtEnd = false;
    int m_fd = -1;
    int m_error = 0;
};

} // namespace zrm

#endif
