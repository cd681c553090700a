#ifndef ZRM_HOST_HISTORY_DIRECTORY_H
#define ZRM_HOST_HISTORY_DIRECTORY_H

#include "host/base/Result.h"

#include <cstdint>
#include <memory>
#include <string>

namespace zrm::host {

/// The directory of a history, locked against other processes while the object exists. Used by one
/// thread at a time, except file and bytes, which any thread may call.
class HistoryDirectory {
public:
    /// Creates the directory if only its last part is missing, locks it, and checks that the
    /// history file is writable.
    static Result<std::unique_ptr<HistoryDirectory>> open(const std::string& directory);

    ~HistoryDirectory();
    HistoryDirectory(const HistoryDirectory&) = delete;
    HistoryDirectory& operator=(const HistoryDirectory&) = delete;

    /// The path of the history's file.
    const std::string& file() const noexcept { return m_file; }

    /// Size on disk in bytes, of the file and SQLite's files next to it.
    std::uint64_t bytes() const;

    /// Recreates what is missing: the directory, the lock file, an empty history.
    Result<void> restore();

    /// Ids of events are reserved this many at a time.
    static constexpr std::uint64_t idsAtOnce = 65536;

    /// Records in the lock file that ids up to this one may be in use, so that they are not reused
    /// if the history file is lost.
    void reserveIds(std::uint64_t last) const;
    /// The last id that may be in use; 0 when unknown.
    std::uint64_t reservedIds() const;
    /// The same of a directory that cannot be opened, and that this process does not have open: a
    /// lock of this process would be lost.
    static std::uint64_t reservedIdsIn(const std::string& directory);

    /// Renames the file to a name with the time it was found corrupt, creates an empty one, and
    /// logs it. Nobody may have the file open.
    Result<void> moveAside(const std::string& why) const;

private:
    HistoryDirectory(const std::string& directory, int lock);

    /// Takes the lock of the lock file, which is created if it is missing.
    Result<void> lock();
    /// Creates the file if it is missing.
    Result<void> makeFile() const;
    std::string lockPath() const { return lockPathIn(m_directory); }
    static std::string lockPathIn(const std::string& directory) {
        return directory + "/history.lock";
    }
    bool hasLock() const;

    const std::string m_directory;
    const std::string m_file;
    int m_lock; ///< descriptor of the locked file
};

} // namespace zrm::host

#endif
