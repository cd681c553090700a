#ifndef ZRM_HOST_HISTORY_DIRECTORY_H
#define ZRM_HOST_HISTORY_DIRECTORY_H

#include <cstdint>
#include <memory>
#include <string>
#include <variant>

namespace zrm::host {

/// The directory in which a history lives, locked against other processes as long as the object
/// lives. Used by one thread at a time, but file and bytes by any.
class HistoryDirectory {
public:
    /// Makes the directory when only it is missing, locks it, and sees that the history's file can
    /// be written. Gives what is wrong and its cure instead when that cannot be.
    static std::variant<std::unique_ptr<HistoryDirectory>, std::string>
    open(const std::string& directory);

    ~HistoryDirectory();
    HistoryDirectory(const HistoryDirectory&) = delete;
    HistoryDirectory& operator=(const HistoryDirectory&) = delete;

    /// The path of the history's file.
    const std::string& file() const noexcept { return m_file; }

    /// Bytes on disk, of the file and of those that SQLite keeps beside it.
    std::uint64_t bytes() const;

    /// Makes anew what is missing: the directory, the lock's file, an empty history. Returns what
    /// went wrong, empty when nothing did.
    std::string restore();

    /// Ids of events are reserved this many at a time.
    static constexpr std::uint64_t idsAtOnce = 65536;

    /// Keeps, in the lock's file, that ids up to this one may have been given to events, so that
    /// they are not given again when the history's file is lost.
    void reserveIds(std::uint64_t last) const;
    /// The id up to which ids may have been given; 0 when that is not known.
    std::uint64_t reservedIds() const;

    /// Renames the file to one that says when it was found corrupt, and makes an empty one. Nobody
    /// has it open. Says so; returns what went wrong, empty when nothing did.
    std::string moveAside(const std::string& why) const;

private:
    HistoryDirectory(const std::string& directory, int lock);

    /// Makes the file where it is missing; returns what went wrong, empty when nothing did.
    std::string makeFile() const;
    std::string lockPath() const { return m_directory + "/history.lock"; }
    bool hasLock() const;

    const std::string m_directory;
    const std::string m_file;
    int m_lock; ///< descriptor of the file that is locked
};

} // namespace zrm::host

#endif
