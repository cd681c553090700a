#ifndef ZRM_READ_GUARD_H
#define ZRM_READ_GUARD_H

#include <array>
#include <cstddef>
#include <cstdint>

namespace zrm {

/// The last bytes in front of the place to which a log has been read. They tell whether the file
/// still holds what was read, even when it was truncated and has grown past that place again
/// between two looks. Costs one read per look at a log that has grown, nothing per line. One
/// thread.
class ReadGuard {
public:
    /// Remembers the bytes of the file in front of `end`; nothing where they cannot be read.
    void take(int fd, std::int64_t end) noexcept;
    /// False when the file no longer holds these bytes; true also when nothing is remembered.
    bool holds(int fd) const noexcept;

    /// The number of bytes behind the guard in a copy of the file as it was: what was appended
    /// after the last read and before the truncation. The copy is a file beside `path` whose name
    /// begins with that of the log, as log rotation makes one. -1 when there is none.
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
