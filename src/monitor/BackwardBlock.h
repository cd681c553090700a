#ifndef ZRM_BACKWARD_BLOCK_H
#define ZRM_BACKWARD_BLOCK_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string_view>
#include <vector>

namespace zrm {

class Generation;
class LineJoin;

/// The part of a plain file that is in memory, cut into entries from its end to its beginning. The
/// entries are those of EntryBlock: lines of any length, of which the first 2046 bytes are given,
/// without NUL bytes at their beginning; the lines that a LineJoin joins; or records. Where more
/// than 128 KiB of lines would be joined without the join's limits, the entries may end at other
/// lines than those of EntryBlock. Memory is bounded whatever the file has. One thread.
class BackwardBlock {
public:
    enum class Fill : unsigned char {
        more,
        end,     ///< the beginning of the file is reached
        changed, ///< the file was truncated
        failed,  ///< errno says why
    };

    /// `recordLength`: bytes of a record; 0: the entries are lines. `join` as for EntryBlock.
    /// Throws std::bad_alloc.
    explicit BackwardBlock(std::size_t recordLength, const LineJoin* join = nullptr);
    BackwardBlock(const BackwardBlock&) = delete;
    BackwardBlock& operator=(const BackwardBlock&) = delete;

    /// Begins at the end of a file of this size. An incomplete record is left out.
    void start(std::int64_t size) noexcept;
    /// Reads the bytes before those in memory.
    Fill fill(Generation& file) noexcept;
    /// The entry before the last one, or null if more must be read. A line ends with newline and
    /// NUL; of several lines it is the first. It is valid until the next call. Throws
    /// std::bad_alloc if there is a join.
    char* next();
    /// The text of the last entry, and whether the entry is longer, as EntryBlock gives them.
    std::string_view text() const noexcept { return m_text; }
    bool isTextCut() const noexcept { return m_isTextCut; }
    /// The offset of the oldest byte in memory.
    std::int64_t offset() const noexcept { return m_offset; }

private:
    char* nextRecord() noexcept;
    char* line(std::size_t begin, std::size_t end) noexcept;
    char* copyLine(std::string_view line) noexcept;
    std::size_t behindNewlineBefore(std::size_t end) const noexcept;
    std::size_t superfluousZeros() const noexcept;
    void keepBeginning() noexcept;

    // Entries of several lines (BackwardBlockJoin.cpp). A run is a row of lines of which each
    // continues the one before it; the limits make entries of it, counted from its beginning.
    char* nextJoined();
    bool findRun() noexcept;
    bool isContinued(std::size_t begin) const noexcept;
    std::size_t zerosFrom(std::size_t begin) const noexcept;
    std::string_view lineAt(std::size_t begin) const noexcept;
    void cutRun();
    char* lines(std::size_t begin) noexcept;

    static constexpr std::size_t longestLine = 2046; ///< as it is given, without its newline
    static constexpr std::size_t longestRun = 128 * 1024;
    /// Of what is kept while more is read: a run whose last line has made it too long.
    static constexpr std::size_t roomForRun = 2 * longestRun;

    const std::size_t m_recordLength;
    const LineJoin* const m_join;
    const std::size_t m_blockSize;
    /// Room for a block, the beginning of a line, and a terminator.
    const std::unique_ptr<char[]> m_block;
    const std::unique_ptr<char[]> m_line; ///< a line that cannot be terminated in its place
    std::size_t m_end = 0;                ///< one past the last byte not given yet
    std::int64_t m_offset = 0;
    bool m_isCut = false; ///< the line before m_end is longer than what is in memory
    std::string_view m_text;
    bool m_isTextCut = false;
    std::size_t m_run = 0; ///< bytes of the run that ends at m_end, as far as it is known
    std::vector<std::size_t> m_begins; ///< of the entries of a whole run, oldest first
};

} // namespace zrm

#endif
