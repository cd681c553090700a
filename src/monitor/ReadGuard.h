#ifndef ZRM_READ_GUARD_H
#define ZRM_READ_GUARD_H

#include <array>
#include <cstddef>
#include <cstdint>

namespace zrm {

/// The last bytes before the position up to which a log was read. They show whether the file
/// still contains what was read, even if it was truncated and grew past that position again
/// between two checks. Costs one read per check of a log that has grown, nothing per line. One
/// thread.
class ReadGuard {
public:
    /// Remembers the bytes of the file before `end`, or nothing if they cannot be read.
    void take(int fd, std::int64_t end) noexcept;
    /// False if the file no longer contains these bytes. True if nothing is remembered.
    bool holds(int fd) const noexcept;

    /// The number of bytes after the guard in a copy of the old file, that is, bytes appended after
    /// the last read and before the truncation. The copy is a file in the directory of `path` whose
    /// name begins with the log's name, as log rotation creates it. -1 if there is none.
    std::int64_t unreadInCopy(int fd, const char* path) const noexcept;

private:
    static constexpr std::size_t size = 256;
    using Bytes = std::array<char, size>;

    bool isAt(int fd) const noexcept;

    Bytes m_bytes{};
    std::size_t m_length = 0;
    std::int64_t m_from = 0; ///< offset of the first byte
};

} // namespace zrm

#endif
