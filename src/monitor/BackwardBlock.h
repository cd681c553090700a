#ifndef ZRM_BACKWARD_BLOCK_H
#define ZRM_BACKWARD_BLOCK_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string_view>

namespace zrm {

class Generation;

/// The part of a plain file that is in memory, cut into entries from its end to its beginning. The
/// entries are those of EntryBlock: lines of any length, of which the first 2046 bytes are given,
/// without NUL bytes at their beginning; or records. Memory is bounded whatever the file has. One
/// thread.
class BackwardBlock {
public:
    enum class Fill : unsigned char {
        more,
        end,     ///< the beginning of the file is reached
        changed, ///< the file was truncated
        failed,  ///< errno says why
    };

    /// `recordLength`: bytes of a record; 0: the entries are lines. Throws std::bad_alloc.
    explicit BackwardBlock(std::size_t recordLength);
    BackwardBlock(const BackwardBlock&) = delete;
    BackwardBlock& operator=(const BackwardBlock&) = delete;

    /// Begins at the end of a file of this size. An incomplete record is left out.
    void start(std::int64_t size) noexcept;
    /// Reads the bytes before those in memory.
    Fill fill(Generation& file) noexcept;
    /// The entry before the last one, or null if more must be read. A line ends with newline and
    /// NUL. It is valid until the next call.
    char* next() noexcept;
    /// The text of the last entry, and whether the entry is longer, as EntryBlock gives them.
    std::string_view text() const noexcept { return m_text; }
    bool isTextCut() const noexcept { return m_isTextCut; }
    /// The offset of the oldest byte in memory.
    std::int64_t offset() const noexcept { return m_offset; }

private:
    char* nextRecord() noexcept;
    char* line(std::size_t begin, std::size_t end) noexcept;
    void keepBeginning() noexcept;

    const std::size_t m_recordLength;
    const std::size_t m_blockSize;
    /// Room for a block, the beginning of a line, and a terminator.
    const std::unique_ptr<char[]> m_block;
    const std::unique_ptr<char[]> m_line; ///< a line that cannot be terminated in its place
    std::size_t m_end = 0;                ///< one past the last byte not given yet
    std::int64_t m_offset = 0;
    bool m_isCut = false; ///< the line before m_end is longer than what is in memory
    std::string_view m_text;
    bool m_isTextCut = false;
};

} // namespace zrm

#endif
