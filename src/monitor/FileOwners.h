#ifndef ZRM_FILE_OWNERS_H
#define ZRM_FILE_OWNERS_H

#include "framework/LogPositions.h"
#include "monitor/FileIdentity.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace zrm {

/// Which of the followed logs reads which file: each file is one log's, whatever names it has come
/// to have. A log that finds another's file under its own name asks for it. The owner gives it up
/// once it has lost the owner's name, and the other log continues where the owner has left it. Any
/// thread. Not for each line.
class FileOwners {
public:
    static constexpr std::size_t mostLeft = 1024; ///< files that are remembered, the latest
    /// How long a file waits for the log that is expected to go on with it.
    static constexpr std::chrono::seconds patience{60};

    FileOwners() = default;
    FileOwners(const FileOwners&) = delete;
    FileOwners& operator=(const FileOwners&) = delete;

    /// Those of the logs that this process follows. Never destroyed.
    static FileOwners& ofProcess();

    /// A log that is to be followed, and its stored position.
    using Expected = std::pair<std::string, LogPosition>;
    /// The files of these positions are kept for their logs until these are followed. Of two logs
    /// with a position in one file, the one that has read more of it gets it. Takes the place of
    /// what was expected before.
    void expect(const std::vector<Expected>& logs);

private:
    friend class FileOwner;
    static constexpr std::chrono::seconds asksFor{5}; ///< how long after it has asked
    using Clock = std::chrono::steady_clock;
    using Key = std::pair<dev_t, ino_t>;
    struct File {
        std::string owner;         ///< empty: none
        std::uint64_t reader = 0;  ///< of the owner's files; 0: it is expected
        Clock::time_point until{}; ///< for how long
        Clock::time_point asked{}; ///< when another log has asked for it last
        std::string askedBy{};
        bool isSettled = false; ///< the owner's position is in it
        std::optional<LogPosition> left{};
        std::string leftBy{};
        std::uint64_t order = 0; ///< grows from one that was left to the next
    };

    static Key keyOf(const FileIdentity& file) noexcept { return {file.device, file.inode}; }
    static bool isAskedFor(const File& file) noexcept;
    static bool isAnothers(const File& file, const std::string& log) noexcept;
    void free(std::map<Key, File>::iterator file);
    void noteLeft(const Key& key, File& file, const LogPosition& position, const std::string& log);

    std::mutex m_mutex; ///< guards the members below
    std::map<Key, File> m_files;
    std::deque<std::pair<std::uint64_t, Key>> m_left; ///< by File::order
    std::uint64_t m_readers = 0;
    std::uint64_t m_order = 0;
};

/// The files of one followed log. One thread.
class FileOwner {
public:
    /// Without `owners`, every file is the log's.
    FileOwner(FileOwners* owners, std::string log);
    FileOwner(const FileOwner&) = delete;
    FileOwner& operator=(const FileOwner&) = delete;
    /// The files are nobody's then.
    ~FileOwner();

    /// Makes the file this log's. False if it is another's.
    bool take(const FileIdentity& file);
    /// The same, and asks for it if it is another's. Ask again every second.
    bool ask(const FileIdentity& file);
    /// True if another log is asking for the file.
    bool isAskedFor(const FileIdentity& file) const;
    /// Gives up the file of the position, to the log that is asking for it if one is. Whoever takes
    /// it continues there.
    void leave(const LogPosition& position);
    /// Gives up all files but these.
    void keep(const std::vector<FileIdentity>& files);
    /// The log's position, as it was given to LogPositions, is in the file.
    void settle(const FileIdentity& file);
    /// True if the position of the log that has got the file is in it, or was.
    bool isSettledByAnother(const FileIdentity& file) const;
    /// Where another log has left the file, if one has.
    std::optional<LogPosition> left(const FileIdentity& file) const;

private:
    bool take(const FileIdentity& file, bool asks);
    bool has(const FileIdentity& file) const noexcept;

    FileOwners* const m_owners;
    const std::string m_log;
    std::uint64_t m_reader = 0;
    std::vector<FileIdentity> m_files;
    std::optional<FileIdentity> m_settled;
};

} // namespace zrm

#endif
