#ifndef ZRM_GENERATION_H
#define ZRM_GENERATION_H

#include "framework/LogPositions.h"
#include "monitor/FileIdentity.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

#include <sys/stat.h>

namespace zrm {

class GenerationReader;

/// The last bytes before a position in a file, by which the position is recognised.
struct Tail {
    static constexpr std::size_t size = 256;

    std::array<char, size> bytes{};
    std::size_t length = 0;

    /// Keeps the last of the bytes.
    void assign(const char* data, std::size_t count) noexcept;
    /// FNV-1a of 64 bits.
    std::uint64_t hash() const noexcept;
};

/// The position behind these bytes.
LogPosition positionOf(const FileIdentity& file, std::int64_t offset, const Tail& tail) noexcept;

inline FileIdentity identityOf(const LogPosition& position) noexcept {
    return {static_cast<dev_t>(position.device), static_cast<ino_t>(position.inode)};
}

/// An open file of a followed log: the present one or an older one, plain or compressed. Offsets
/// are those of the contents. One thread.
class Generation {
public:
    struct Status {
        std::int64_t size;     ///< bytes of the file, not of its contents
        std::int64_t modified; ///< last modification, ns since the epoch
        std::int64_t changed;  ///< last change of file or name, ns since the epoch
        bool hasName;          ///< false: removed, and gone when it is closed

        static Status of(const struct stat& found) noexcept;
        bool operator==(const Status&) const = default;
    };

    /// Null with errno if the path is not a regular file that can be read; ENOENT also if its
    /// compression cannot be read. EMFILE leaves descriptors for everything else.
    static std::unique_ptr<Generation> open(const std::string& path);
    Generation(const Generation&) = delete;
    Generation& operator=(const Generation&) = delete;
    ~Generation();

    /// Reads at most `room` bytes at an offset. 0 at the end; -1 and errno if that fails. Contents
    /// of a compressed file are read forward; going back begins again. ECANCELED if passing over
    /// them was interrupted (Interruption).
    std::ptrdiff_t readAt(char* buffer, std::size_t room, std::int64_t offset) noexcept;
    /// True if all contents can be read and their checksums fit. Compressed contents are read to
    /// their end for that, once. False with errno as of readAt.
    bool verify() noexcept { return !m_isCompressed || m_isVerified || verifyCompressed(); }
    /// True if the contents have the position's guard before its offset, which then are in `tail`.
    bool holds(const LogPosition& position, Tail& tail);
    /// True if the contents of the other file begin with all contents of this one. Of plain files
    /// both ends are compared; of compressed ones all that can be read, at most 64 MB.
    bool isCopyOf(Generation& other);
    /// The bytes before the offset. False and errno if they cannot be read.
    bool readTail(std::int64_t offset, Tail& tail) noexcept;

    /// The first bytes. Returns how many there are, 0 if they cannot be read.
    std::size_t readHead(Tail& head) noexcept;

    /// Moves the descriptor's own position, which nothing here reads, so that the system's tools
    /// show how far a plain file was read.
    void showPosition(std::int64_t offset) noexcept;
    /// How many bytes of a compressed file were read so far.
    std::int64_t compressedBytesRead() const noexcept;
    /// False and errno if it cannot be found out.
    bool status(Status& status) const noexcept;
    const FileIdentity& identity() const noexcept { return m_identity; }
    const std::string& path() const noexcept { return m_path; }
    bool isCompressed() const noexcept { return m_isCompressed; }

private:
    Generation(int descriptor, std::string path, FileIdentity identity, bool isCompressed);

    bool isBeginningOf(Generation& other);
    std::ptrdiff_t readWhole(char* buffer, std::size_t count, std::int64_t offset) noexcept;
    std::ptrdiff_t readCompressed(char* buffer, std::size_t room, std::int64_t offset) noexcept;
    bool restart() noexcept;
    bool verifyCompressed() noexcept;

    const int m_descriptor;
    const std::string m_path;
    const FileIdentity m_identity;
    const bool m_isCompressed;
    std::unique_ptr<GenerationReader> m_reader; ///< of a compressed file
    std::int64_t m_readTo = 0;                  ///< how much the reader has given
    bool m_isVerified = false;
};

} // namespace zrm

#endif
