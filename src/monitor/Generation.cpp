#include "monitor/Generation.h"

#include "monitor/DescriptorReserve.h"
#include "monitor/GenerationNames.h"
#include "monitor/GenerationReader.h"
#include "monitor/Interruption.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>
#include <vector>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm {

namespace {

constexpr std::size_t comparedBytes = 4096; ///< at either end, to recognise a copy
/// Of contents that are compressed, which have no end to look at. A limit, since they may be very
/// much longer than their file.
constexpr std::int64_t mostComparedBytes = 64 * 1024 * 1024;
constexpr std::int64_t bytesPerCheck = 1024 * 1024; ///< passed over between two interruptions

std::int64_t nanoseconds(const timespec& time) noexcept {
    return static_cast<std::int64_t>(time.tv_sec) * 1'000'000'000 + time.tv_nsec;
}

} // namespace

void Tail::assign(const char* data, std::size_t count) noexcept {
    length = std::min(count, size);
    std::memcpy(bytes.data(), data + (count - length), length);
}

std::uint64_t Tail::hash() const noexcept {
    std::uint64_t hash = 0xcbf29ce484222325;
    for (std::size_t i = 0; i < length; ++i) {
        hash = (hash ^ static_cast<unsigned char>(bytes[i])) * 0x100000001b3;
    }
    return hash;
}

LogPosition positionOf(const FileIdentity& file, std::int64_t offset, const Tail& tail) noexcept {
    LogPosition position;
    position.device = file.device;
    position.inode = file.inode;
    position.offset = offset;
    position.guard = tail.hash();
    position.guardLength = static_cast<std::uint32_t>(tail.length);
    return position;
}

std::unique_ptr<Generation> Generation::open(const std::string& path) {
    // Only a regular file is opened: opening a device may have effects.
    struct stat status;
    if (stat(path.c_str(), &status) != 0) {
        return nullptr;
    }
    const bool isCompressed = isCompressedName(path);
    if (!S_ISREG(status.st_mode) || (isCompressed && GenerationReader::open() == nullptr)) {
        errno = ENOENT;
        return nullptr;
    }
    const int descriptor = DescriptorReserve::openLog(path.c_str());
    if (descriptor < 0) {
        return nullptr;
    }
    if (fstat(descriptor, &status) != 0 || !S_ISREG(status.st_mode)) {
        ::close(descriptor);
        errno = ENOENT;
        return nullptr;
    }
    return std::unique_ptr<Generation>(
        new Generation(descriptor, path, {status.st_dev, status.st_ino}, isCompressed));
}

Generation::Generation(int descriptor, std::string path, FileIdentity identity, bool isCompressed)
    : m_descriptor(descriptor), m_path(std::move(path)), m_identity(identity),
      m_isCompressed(isCompressed) {}

Generation::~Generation() {
    m_reader.reset();
    ::close(m_descriptor);
}

Generation::Status Generation::Status::of(const struct stat& found) noexcept {
    return {found.st_size, nanoseconds(found.st_mtim), nanoseconds(found.st_ctim),
            found.st_nlink > 0};
}

bool Generation::status(Status& status) const noexcept {
    struct stat found;
    if (fstat(m_descriptor, &found) != 0) {
        return false;
    }
    status = Status::of(found);
    return true;
}

void Generation::showPosition(std::int64_t offset) noexcept {
    if (!m_isCompressed) {
        lseek(m_descriptor, static_cast<off_t>(offset), SEEK_SET);
    }
}

std::int64_t Generation::compressedBytesRead() const noexcept {
    return std::max<std::int64_t>(lseek(m_descriptor, 0, SEEK_CUR), 0);
}

std::ptrdiff_t Generation::readAt(char* buffer, std::size_t room, std::int64_t offset) noexcept {
    return m_isCompressed ? readCompressed(buffer, room, offset)
                          : pread(m_descriptor, buffer, room, static_cast<off_t>(offset));
}

bool Generation::restart() noexcept {
    m_reader.reset();
    m_readTo = 0;
    const auto open = GenerationReader::open();
    if (open != nullptr && lseek(m_descriptor, 0, SEEK_SET) == 0) {
        m_reader = open(m_descriptor);
    }
    return m_reader != nullptr;
}

std::ptrdiff_t Generation::readCompressed(char* buffer, std::size_t room,
                                          std::int64_t offset) noexcept {
    errno = 0;
    if ((m_reader == nullptr || offset < m_readTo) && !restart()) {
        errno = errno == ENOMEM ? ENOMEM : EIO;
        return -1;
    }
    std::array<char, 16384> passedOver;
    for (;;) {
        const std::int64_t before = offset - m_readTo;
        const std::ptrdiff_t count =
            before > 0
                ? m_reader->read(passedOver.data(),
                                 std::min(passedOver.size(), static_cast<std::size_t>(before)))
                : m_reader->read(buffer, room);
        if (count < 0) {
            const int number = errno == ENOMEM ? ENOMEM : EIO;
            m_reader.reset();
            errno = number;
            return -1;
        }
        const std::int64_t from = m_readTo;
        m_readTo += count;
        if (count == 0 || before <= 0) {
            return count;
        }
        if (from / bytesPerCheck != m_readTo / bytesPerCheck && Interruption::isDue()) {
            errno = ECANCELED;
            return -1;
        }
    }
}

bool Generation::verifyCompressed() noexcept {
    std::array<char, 16384> contents;
    for (;;) {
        const std::int64_t from = m_readTo;
        const std::ptrdiff_t count = readCompressed(contents.data(), contents.size(), from);
        if (count <= 0) {
            m_isVerified = count == 0;
            return m_isVerified;
        }
        if (from / bytesPerCheck != m_readTo / bytesPerCheck && Interruption::isDue()) {
            errno = ECANCELED;
            return false;
        }
    }
}

/// Reads until `count` bytes or the end are reached.
std::ptrdiff_t Generation::readWhole(char* buffer, std::size_t count,
                                     std::int64_t offset) noexcept {
    std::size_t done = 0;
    while (done < count) {
        const std::ptrdiff_t part =
            readAt(buffer + done, count - done, offset + static_cast<std::int64_t>(done));
        if (part < 0) {
            return -1;
        }
        if (part == 0) {
            break;
        }
        done += static_cast<std::size_t>(part);
    }
    return static_cast<std::ptrdiff_t>(done);
}

bool Generation::readTail(std::int64_t offset, Tail& tail) noexcept {
    const std::size_t wanted = static_cast<std::size_t>(
        std::min<std::int64_t>(std::max<std::int64_t>(offset, 0), Tail::size));
    const std::ptrdiff_t count =
        readWhole(tail.bytes.data(), wanted, offset - static_cast<std::int64_t>(wanted));
    tail.length = count == static_cast<std::ptrdiff_t>(wanted) ? wanted : 0;
    if (count >= 0 && tail.length != wanted) {
        errno = ENODATA;
    }
    return tail.length == wanted;
}

std::size_t Generation::readHead(Tail& head) noexcept {
    const std::ptrdiff_t count = readWhole(head.bytes.data(), Tail::size, 0);
    head.length = count > 0 ? static_cast<std::size_t>(count) : 0;
    return head.length;
}

bool Generation::holds(const LogPosition& position, Tail& tail) {
    if (position.guardLength > Tail::size || position.offset < position.guardLength) {
        return false;
    }
    Status now;
    if (!m_isCompressed && (!status(now) || now.size < position.offset)) {
        return false;
    }
    const std::int64_t from = position.offset - position.guardLength;
    const std::ptrdiff_t count = readWhole(tail.bytes.data(), position.guardLength, from);
    tail.length = count > 0 ? static_cast<std::size_t>(count) : 0;
    return tail.length == position.guardLength && tail.hash() == position.guard;
}

/// True if all that can be read of the contents is at the beginning of the other's. A file that is
/// still being compressed cannot be read to its end.
bool Generation::isBeginningOf(Generation& other) {
    std::vector<char> mine(comparedBytes);
    std::vector<char> theirs(comparedBytes);
    std::int64_t offset = 0;
    while (offset < mostComparedBytes) {
        const std::ptrdiff_t length = readWhole(mine.data(), comparedBytes, offset);
        if (length <= 0) {
            return offset > 0;
        }
        if (other.readWhole(theirs.data(), static_cast<std::size_t>(length), offset) != length ||
            std::memcmp(mine.data(), theirs.data(), static_cast<std::size_t>(length)) != 0) {
            return false;
        }
        offset += length;
        if (offset % bytesPerCheck == 0 && Interruption::isDue()) {
            return false;
        }
    }
    return true;
}

bool Generation::isCopyOf(Generation& other) {
    if (m_isCompressed || other.m_isCompressed) {
        return isBeginningOf(other);
    }
    std::vector<char> mine(comparedBytes);
    std::vector<char> theirs(comparedBytes);
    const std::ptrdiff_t length = readWhole(mine.data(), comparedBytes, 0);
    const std::ptrdiff_t otherLength = other.readWhole(theirs.data(), comparedBytes, 0);
    if (length <= 0 || length > otherLength ||
        std::memcmp(mine.data(), theirs.data(), static_cast<std::size_t>(length)) != 0) {
        return false;
    }
    Status now;
    if (!status(now)) {
        return false;
    }
    const std::int64_t end =
        std::max<std::int64_t>(now.size - static_cast<std::int64_t>(comparedBytes), 0);
    const std::ptrdiff_t rest = readWhole(mine.data(), comparedBytes, end);
    return rest > 0 &&
           other.readWhole(theirs.data(), static_cast<std::size_t>(rest), end) == rest &&
           std::memcmp(mine.data(), theirs.data(), static_cast<std::size_t>(rest)) == 0;
}

} // namespace zrm
