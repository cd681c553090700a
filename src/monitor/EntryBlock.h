#ifndef ZRM_ENTRY_BLOCK_H
#define ZRM_ENTRY_BLOCK_H

#include "monitor/Generation.h"

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <string_view>

namespace zrm {

class LineJoin;

/// The part of a followed file that is in memory, cut into entries. Only whole entries are given: a
/// line with its newline, the lines that a LineJoin joins, or a record. Lines of any length are one
/// entry, of which the first 2046 bytes are given; NUL bytes that a line begins with are not part
/// of it, since a writer that does not append leaves them after a truncation. Each read begins with
/// the bytes before it and finds out whether the file still has them. An entry needs neither a copy
/// nor memory; of several lines the first is copied. One thread.
class EntryBlock {
public:
    enum class Fill : unsigned char {
        more,    ///< bytes were read
        end,     ///< there are no more
        changed, ///< the file no longer has what was read: it was truncated or written anew
        failed,  ///< errno says why
    };

    /// `recordLength`: bytes of a record; 0: the entries are lines. `join` says which lines make an
    /// entry, and outlives the block; null: each is one.
    explicit EntryBlock(std::size_t recordLength, const LineJoin* join = nullptr) noexcept
        : m_recordLength(recordLength), m_join(recordLength == 0 ? join : nullptr),
          m_isPlain(recordLength == 0 && join == nullptr) {}
    EntryBlock(const EntryBlock&) = delete;
    EntryBlock& operator=(const EntryBlock&) = delete;

    /// Begins at an offset of a file, which has the bytes of `tail` before it.
    void start(std::int64_t offset, const Tail& tail) noexcept;
    /// What the file has from this offset on is not read.
    void endAt(std::int64_t offset) noexcept { m_readMost = offset; }
    /// Reads more.
    Fill fill(Generation& file) noexcept;
    /// The next whole entry, or null if more must be read. A line ends with newline and NUL and has
    /// at most 2047 bytes; of several lines it is the first. It is valid until the next call.
    char* next() noexcept;
    /// After next has returned null: whether there are whole lines that further ones may continue.
    bool isWaiting() const noexcept { return m_lines > 0; }
    /// How far these lines go.
    std::int64_t waitingTo() const noexcept;
    /// Gives these lines as an entry, without what may follow.
    char* endWaiting() noexcept;
    /// What is left at the end of a file to which nothing is added any more, as an entry: waiting
    /// lines, an unfinished line. Null if there is nothing more; an unfinished record is dropped.
    char* rest() noexcept;
    /// Takes back the entry that next has just given, which the next call gives again. False if it
    /// cannot: the beginning of a long line, or the rest of a file.
    bool takeBack() noexcept;
    /// Frees the memory and forgets an unfinished line, which is read again. Keeps it in the middle
    /// of a line that is too long to be read again.
    void release() noexcept;

    /// The text of the last entry in full, without its line end; the first EntryKeep::longestText
    /// bytes of a longer one. A record is its own text. Valid as long as the entry.
    std::string_view text() const noexcept;
    /// True if the last entry is longer than its text.
    bool isTextCut() const noexcept;

    /// Where the next entry begins.
    std::int64_t offset() const noexcept;
    /// The bytes before that.
    Tail tail() const noexcept;
    /// How far the file was read.
    std::int64_t readTo() const noexcept { return m_readTo; }
    /// True if the last entry is only the beginning of a line.
    bool isCut() const noexcept { return m_isCut; }

private:
    static constexpr std::size_t notInBlock = SIZE_MAX;
    static constexpr std::size_t unknown = SIZE_MAX;
    static constexpr std::size_t blockSize = 256 * 1024;
    static constexpr std::size_t longestLine = 2046; ///< as it is given, without its newline

    bool allocate() noexcept;
    void compact() noexcept;
    void restore() noexcept;
    char* nextRecord() noexcept;
    char* giveLine(char* line, std::size_t length) noexcept;
    void beginLongLine() noexcept;
    char* restOfLongLine() noexcept;
    char* restOfLine() noexcept;
    char* endLong(std::size_t length, bool isCut) noexcept;
    char* longLine() const noexcept;
    char* longText() const noexcept;
    void setText(const char* text, std::size_t length) noexcept;

    // Entries of several lines (EntryBlockJoin.cpp).
    void skipZeros() noexcept;
    bool findLine(std::string_view& line) noexcept;
    bool takes(std::string_view line) const noexcept;
    bool isFull(std::size_t more) const noexcept;
    char* nextJoined() noexcept;
    char* endJoined() noexcept;
    char* restJoined() noexcept;
    char* giveLines(std::size_t length) noexcept;

    const std::size_t m_recordLength;
    const LineJoin* const m_join;
    const bool m_isPlain; ///< each line is an entry
    std::unique_ptr<char[]> m_block;
    std::size_t m_begin = 0; ///< the first byte not given yet
    std::size_t m_end = 0;   ///< one past the last byte read
    std::size_t m_given = 0; ///< where the entry begins that was given last; notInBlock: elsewhere
    std::int64_t m_readTo = 0;
    std::int64_t m_readMost = INT64_MAX;
    Tail m_tail;
    bool m_isTailAside = true; ///< m_tail has the bytes before the next entry; the block need not
    bool m_isInLongLine = false;
    std::int64_t m_longLineBegin = 0;
    bool m_isTerminated = false; ///< m_behind is to be put back at m_begin
    char m_behind = '\0';
    bool m_isCut = false;
    const char* m_text = nullptr; ///< of the last entry, m_textLength bytes as far as they are kept
    std::size_t m_textLength = 0;
    // The entry that begins at m_begin, as far as it is known.
    std::size_t m_lines = 0;            ///< whole lines
    std::size_t m_length = 0;           ///< bytes of these
    std::size_t m_lastLength = 0;       ///< of the last of these, without its newline
    std::size_t m_nextLength = unknown; ///< of the line behind them, if its newline was found
};

/// Gives a line that is at m_begin.
inline char* EntryBlock::giveLine(char* line, std::size_t length) noexcept {
    m_begin += length + 1;
    setText(line, length);
    if (length > longestLine) {
        std::memcpy(longLine(), line, longestLine);
        return endLong(longestLine, true);
    }
    m_behind = m_block[m_begin];
    m_block[m_begin] = '\0';
    m_isTerminated = true;
    return line;
}

} // namespace zrm

#endif
