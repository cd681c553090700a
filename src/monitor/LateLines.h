#ifndef ZRM_LATE_LINES_H
#define ZRM_LATE_LINES_H

#include "framework/LogPositions.h"
#include "monitor/EntryBlock.h"
#include "monitor/FollowLedger.h"
#include "monitor/Generation.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm {

/// The files of a followed log that reading has left for their successors. A writer that was not
/// told of the rotation still writes to such a file: it stays open, and what comes late is given,
/// until it has been quiet for `watchedFor` or has lost its last name. One thread.
class LateLines {
public:
    using Time = std::chrono::steady_clock::time_point;
    static constexpr std::chrono::minutes watchedFor{10};
    static constexpr std::size_t mostFiles = 4; ///< the latest
    static constexpr std::size_t mostDue = 16;  ///< of files that have something to read

    /// The ledger outlives the object. `recordLength`, `join`: as of EntryBlock.
    LateLines(std::size_t recordLength, std::shared_ptr<const LineJoin> join, FollowLedger& ledger)
        : m_ledger(ledger), m_join(std::move(join)), m_block(recordLength, m_join.get()) {}

    /// A file that was read up to the offset, which has the bytes of `tail` before it. Nothing is
    /// added any more to a compressed one, which is read to its end.
    void add(std::unique_ptr<Generation> file, std::int64_t offset, const Tail& tail, Time now);
    bool has(const FileIdentity& file) const noexcept;
    /// True if the file is a copy of one of them, like the compressed one.
    bool hasOriginalOf(Generation& file) const;
    /// Ends the watch over a file, if it is one of them. Returns where reading has left it.
    std::optional<LogPosition> remove(const FileIdentity& file);
    /// Ends the watch over all files, to free their descriptors.
    void clear();

    /// Looks at the files. True if there may be entries.
    bool look(Time now);
    /// Those that are watched.
    std::vector<FileIdentity> files() const;
    /// True if no file is watched.
    bool isEmpty() const noexcept { return m_files.empty(); }
    /// The next entry, as EntryBlock gives it; null if there is none until the next look.
    char* next();
    /// Takes back the entry that next has just given. False if it cannot.
    bool takeBack() noexcept;
    std::string_view text() const noexcept { return m_block.text(); }
    bool isTextCut() const noexcept { return m_block.isTextCut(); }
    /// Behind the entry that next has just given, in its file.
    LogPosition position() const { return positionIn(*m_read); }
    /// Where reading has left all of them. Costs nothing unless something was read or has changed.
    const LatePositions& positions() const;
    /// How many bytes were read since the last call.
    std::int64_t takeBytesRead() noexcept { return std::exchange(m_bytesRead, 0); }
    /// Latest modification of what was read, in ns since the epoch.
    std::int64_t modified() const noexcept { return m_modified; }

    /// How far the files were read.
    struct Left {
        LogPosition position;
        bool isWatched; ///< false: it was until the last call
    };
    std::vector<Left> takeLeft();

private:
    struct File {
        std::unique_ptr<Generation> file;
        std::int64_t offset = 0; ///< where the next entry begins
        Tail tail{};
        Generation::Status seen{};
        Time grown{};       ///< when it was last seen to have grown
        bool isDue = false; ///< has grown since it was read, or has lines that wait for others
    };

    bool checkFile(File& file, Time now);
    void leaveSurplus();
    void leave(const File& file);
    LogPosition positionIn(const File& file) const;
    char* nextOf(File& file);
    char* give(char* entry, const File& file) noexcept;
    void stopReading();

    FollowLedger& m_ledger;
    const std::shared_ptr<const LineJoin> m_join;
    Time m_now{}; ///< of the last look
    std::deque<File> m_files;
    EntryBlock m_block;
    File* m_read = nullptr; ///< the file in the block
    std::int64_t m_bytesRead = 0;
    std::int64_t m_modified = 0;
    std::vector<LogPosition> m_left; ///< of files that are no longer watched
    mutable LatePositions m_positions;
    mutable bool m_hasMoved = false; ///< m_positions is older
};

} // namespace zrm

#endif
