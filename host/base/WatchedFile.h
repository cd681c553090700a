#ifndef ZRM_HOST_WATCHED_FILE_H
#define ZRM_HOST_WATCHED_FILE_H

#include <optional>
#include <string>

#include <sys/types.h>
#include <time.h>

namespace zrm::host {

/// Detects that a file was written or replaced. Used by one thread.
class WatchedFile {
public:
    /// Remembers the file's current state. An empty path means no file, which never changes.
    explicit WatchedFile(std::string path);

    const std::string& path() const noexcept { return m_path; }

    /// True once after a change, when the file has not changed since the previous call: a file that
    /// is still being written is left alone until the writer has finished.
    bool hasChanged();

private:
    struct Version {
        dev_t device;
        ino_t inode;
        off_t size;
        time_t seconds;
        long nanoseconds;
        bool operator==(const Version&) const = default;
    };
    std::optional<Version> look() const;

    std::string m_path;
    std::optional<Version> m_known; ///< none: the file was not there
    std::optional<Version> m_seen;  ///< at the last check
};

} // namespace zrm::host

#endif
