#ifndef ZRM_FRAMEWORK_LOG_POSITIONS_H
#define ZRM_FRAMEWORK_LOG_POSITIONS_H

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace zrm {

struct LogPosition;

/// Where reading has left files of a log to which a late writer may still write. Values do not
/// change; copies share them, since one goes with each event.
class LatePositions {
public:
    LatePositions() = default;
    explicit LatePositions(std::vector<LogPosition> files);

    /// The file that was left first comes first.
    const std::vector<LogPosition>& files() const noexcept;

    bool operator==(const LatePositions& other) const noexcept;

private:
    std::shared_ptr<const std::vector<LogPosition>> m_files; ///< null: none
};

/// Where the next entry of a followed log begins.
struct LogPosition {
    std::uint64_t device = 0;
    std::uint64_t inode = 0;
    std::int64_t offset = 0;       ///< bytes before the next entry
    std::uint64_t guard = 0;       ///< hash of the last `guardLength` bytes before the offset
    std::uint32_t guardLength = 0; ///< bytes; 0 at the beginning of a file
    std::int64_t modified = 0;     ///< latest modification of what was read, ns since the epoch;
                                   ///< 0: unknown
    /// Of a log that is not a file: what its source calls the position (EntrySource). Nothing else
    /// is set then.
    std::string cursor{};
    LatePositions late{};

    bool operator==(const LogPosition&) const = default;
};

inline LatePositions::LatePositions(std::vector<LogPosition> files)
    : m_files(files.empty() ? nullptr
                            : std::make_shared<const std::vector<LogPosition>>(std::move(files))) {}

inline const std::vector<LogPosition>& LatePositions::files() const noexcept {
    static const std::vector<LogPosition> none;
    return m_files ? *m_files : none;
}

inline bool LatePositions::operator==(const LatePositions& other) const noexcept {
    return m_files == other.m_files || files() == other.files();
}

/// The position of one followed log in the framework's store of events. The events of an entry and
/// the position behind it are stored together or not at all. Created, used and destroyed on the
/// log's thread; one object per thread at a time. A newer object for the same log takes over: the
/// older one stores nothing more, so that an entry that both read is stored once.
class LogPositions {
public:
    /// `log` is the log's name in UTF-8.
    explicit LogPositions(const char* log);
    LogPositions(const LogPositions&) = delete;
    LogPositions& operator=(const LogPositions&) = delete;
    /// The events of an entry that was not ended are dropped.
    ~LogPositions();

    /// Whether positions survive the process. If not, the log has no position when it is followed
    /// for the first time after a start.
    bool areKept() const noexcept;

    /// True if this run had no position of the log when the object was created: what is before the
    /// stored one was judged by an earlier run.
    bool isFirstOfRun() const noexcept;

    /// The newest position that this run or an earlier one has stored or is about to store. None
    /// for a new log.
    std::optional<LogPosition> stored() const;

    /// The events that this thread raises from now on are those of one entry. Events of an entry
    /// that was begun and not ended are dropped.
    void beginEntry() noexcept;
    /// Whether the entry has raised an event. Costs next to nothing; call it after every entry.
    bool hasEvents() const noexcept;
    /// Ends an entry that has raised events: gives them to the store together with the position
    /// behind the entry. While the process ends, neither is taken any more, nor is any later
    /// position; the next run judges the entry again.
    void endEntry(const LogPosition& behind);
    /// Everything before the position has been judged. Stored within about a second, never before
    /// the events of earlier entries. Call it at most once a second, and when reading ends.
    void reached(const LogPosition& position);
    /// The thread begins to look for what is new in the log.
    void beginLook() noexcept;
    /// What was in the log when the look began has been judged, and the position behind it was
    /// given to `reached`; or there is no log that can be read.
    void endLook() noexcept;
    /// Reading has left a file at the position. If the file has come to have the name of another
    /// log of the list, that log continues there once it is followed. `isWatched`: this log still
    /// reads what is written to the file. If it does not, and its own position is in the file, that
    /// becomes the beginning of whatever has its name next.
    void left(const LogPosition& position, bool isWatched);

private:
    class State;
    std::unique_ptr<State> m_state;
};

} // namespace zrm

#endif
