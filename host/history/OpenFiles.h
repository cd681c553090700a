#ifndef ZRM_HOST_OPEN_FILES_H
#define ZRM_HOST_OPEN_FILES_H

#include <array>
#include <optional>
#include <string>

#include <sys/types.h>

namespace zrm::host {

/// The files of an open database, as they were when it was opened: its own, the write-ahead log and
/// the log's index. Tells whether the names still lead to them. Immutable.
class OpenFiles {
public:
    enum class State {
        IN_PLACE,
        WITHOUT_LOG, ///< the database is there, its log or index is not
        REMOVED,     ///< the database was removed, or another file has its name
    };

    explicit OpenFiles(std::string path);

    State state() const;

    /// Removes the log and the index where they are still these; they belong to no other database.
    void removeLog() const;

private:
    struct Identity {
        dev_t device;
        ino_t number;
        bool operator==(const Identity&) const = default;
    };
    static constexpr std::array endings = {"", "-wal", "-shm"};

    std::optional<Identity> identity(std::size_t which) const;
    bool isInPlace(std::size_t which) const;

    std::string m_path;
    std::array<std::optional<Identity>, endings.size()> m_opened;
};

} // namespace zrm::host

#endif
