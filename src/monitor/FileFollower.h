#ifndef ZRM_FILE_FOLLOWER_H
#define ZRM_FILE_FOLLOWER_H

#include "framework/LogPositions.h"
#include "logs/LineJoin.h"
#include "monitor/EntryBlock.h"
#include "monitor/FileOwners.h"
#include "monitor/FollowLedger.h"
#include "monitor/Generation.h"
#include "monitor/GenerationNames.h"
#include "monitor/LateLines.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm {

/// Reads the entries of a log in order, each once, through rotations and restarts: which file is
/// read, from where, and when the next one takes over.
///
/// A file that has lost the log's name is read to its end and until it has been quiet for a while;
/// then the generations between it and the present file are read, then that. What is written to an
/// older file after that is read between the entries of the present one (LateLines). After a
/// truncation the rest of the old contents is looked for in the copies beside the log. A position
/// is found again by the file's identity and the bytes before it, or by the bytes alone. A call
/// that fails is tried again after growing pauses, without end; a generation that cannot be read is
/// lost after half a minute. Searching large compressed files obeys Interruption. Has no thread and
/// traces nothing. One thread.
class FileFollower {
public:
    struct Options {
        bool byName = true;         ///< false: the file that was opened, whatever its name
        bool fromBeginning = false; ///< for a log without a position whose file is there already
        std::chrono::milliseconds rotateWait{2000};
        std::string rotatedTo;                  ///< see FollowSettings
        std::size_t recordLength = 0;           ///< 0: the entries are lines
        std::shared_ptr<const LineJoin> join{}; ///< which lines make an entry; null: each is one
        FileOwners* owners = nullptr;           ///< null: no other log reads these files
        std::string log{};                      ///< by which the owners know this one
    };
    struct Moment {
        std::chrono::steady_clock::time_point steady;
        std::int64_t wall; ///< ns since the epoch

        static Moment now() noexcept;
    };

    /// The ledger outlives the follower.
    FileFollower(std::string path, const Options& options, FollowLedger& ledger);
    FileFollower(const FileFollower&) = delete;
    FileFollower& operator=(const FileFollower&) = delete;
    /// Another log goes on with its files where this one has left them.
    ~FileFollower();

    /// Continues at the position. Call it before the first look.
    void resumeAt(const LogPosition& stored) noexcept { m_stored = stored; }
    /// Looks at the file and at the name, about once a second. True if there may be entries.
    bool look(const Moment& now);
    /// True if a look can be left out, because the file is as it was at the last one: its status
    /// shows that it was renamed or removed. It does not show that one of the path's directories
    /// was exchanged, so every fifth call asks for the status of what has the name. Costs one
    /// system call.
    bool isQuiet() noexcept;
    /// The next entry as EntryBlock gives it, or null if there is none until the next look, or if
    /// many megabytes had none: isPaused says so, and the next call goes on. Lines at the end of
    /// the file that others may continue wait for these, but not for long (LineJoin::Limits). A
    /// line that comes later begins an entry.
    char* next();
    /// Gives such lines at once from now on.
    void waitNoLonger() noexcept { m_waits = false; }
    /// True if the last call of next has stopped before the end, for the caller's other duties.
    bool isPaused() const noexcept { return m_isPaused; }
    /// Takes back the entry that next has just given, so that the position is before it. False if
    /// it cannot.
    bool takeBack() noexcept;
    /// The text of the last entry, and whether the entry is longer, as EntryBlock gives them.
    std::string_view text() const noexcept { return m_isLate ? m_late.text() : m_block.text(); }
    bool isTextCut() const noexcept { return m_isLate ? m_late.isTextCut() : m_block.isTextCut(); }
    /// Behind the last entry of the file that is read. None before a file has been opened. Entries
    /// that come late to an older file move only the position that it has for that file.
    std::optional<LogPosition> position() const noexcept;
    /// True if the last entry came late to an older file.
    bool isLate() const noexcept { return m_isLate; }
    /// How far the older files were read to which late lines may come.
    std::vector<LateLines::Left> takeLeft();
    /// The file that is read, and where in it the next entry begins. None while there is no file.
    struct Place {
        Generation& file;
        std::int64_t offset;
    };
    std::optional<Place> place() const noexcept;
    /// How many bytes were read since the last call.
    std::int64_t takeBytesRead() noexcept {
        return std::exchange(m_bytesRead, 0) + m_late.takeBytesRead();
    }
    /// Updates the position in the ledger, and which files are this log's.
    void noteProgress();
    /// The file that is read, if any.
    std::optional<FileIdentity> file() const noexcept;

private:
    /// A file that is read or will be.
    struct Member {
        std::unique_ptr<Generation> file;
        std::int64_t from = 0;
        Tail tail{};             ///< the bytes before that
        bool hadName = false;    ///< it is or was the present file
        bool isComplete = false; ///< nothing is added to it any more
        bool isRecovery = false; ///< read instead of what a truncation removed
        bool isLeft = false;     ///< another log has read what is before `from`
    };
    struct Found {
        /// A generation that cannot be read.
        struct Unreadable {
            GenerationFile file;
            const char* call; ///< that failed
            int number;       ///< errno
        };

        std::optional<Member> holder;       ///< the file that has the position
        std::vector<Member> younger;        ///< the generations after it, without the present file
        bool isAll = true;                  ///< false: there are more of them
        std::optional<Unreadable> awaited;  ///< tried again before those after it are read
        std::vector<GenerationFile> lost{}; ///< given up
        bool isInterrupted = false;         ///< nothing is known
    };
    /// Counts how long to leave alone what has failed.
    struct Retry {
        std::chrono::steady_clock::time_point at{};
        std::chrono::seconds pause{0};
        int failures = 0;
    };
    enum class Search : unsigned char { byIdentity, byContents };
    enum class Missed : unsigned char { nothing, inserted, awaited };
    /// A file and what it is recognised by, since inodes are used again: its first bytes, as far as
    /// they were read. Those of a compressed file are not.
    struct Older {
        FileIdentity identity;
        bool isCompressed;
        Tail head{};
    };
    /// A generation that could not be read for so long that it counts as lost.
    struct GivenUp {
        FileIdentity identity;
        std::int64_t modified;

        bool operator==(const GivenUp&) const = default;
    };

    // Which files there are (FileFollowerSearch.cpp).
    std::unique_ptr<Generation> openNamed();
    Found find(const LogPosition& position, Search search, Generation* named);
    Found findYounger(const GenerationReference& reference, Generation* named);
    bool tryFind(const LogPosition& position, Search search, Generation* named, Found& found);
    std::optional<Member> findHolder(const LogPosition& position, Search search, Generation* named,
                                     const std::vector<GenerationFile>& files, bool& vanished);
    bool openYounger(const GenerationReference& reference, const std::vector<GenerationFile>& files,
                     Generation* named, Found& found);
    void noteUnreadable(const Found::Unreadable& unreadable,
                        const std::vector<GenerationFile>& files, Found& found) const;
    bool isCountedLost(const GenerationFile& file) const noexcept;
    void giveUp(const GivenUp& file);
    void takeUnreadable(const Found& found, std::int64_t from = 0, std::int64_t to = 0);
    bool isKnown(const FileIdentity& file, const Generation* named) const noexcept;
    std::vector<GenerationFile> generations(const std::vector<ino_t>& inodes = {});

    // Files that other logs have, or get (FileFollowerOwner.cpp).
    void leaveToOthers(LogPosition& stored);
    void giveAway();
    void giveFirstAway();
    void giveUpAt(const LogPosition& left);
    bool beginWhereLeft(Member& member) const;

    // What is read, and in which order (FileFollowerChain.cpp).
    void extend(std::unique_ptr<Generation> named);
    bool isOlder(Generation& file) const;
    bool hasLostName() const noexcept;
    void dropYoungerThanFirst(Found& found);
    Missed insertMissed();
    void noteHead();
    std::optional<std::int64_t> dropShortCopy(Found& found, std::int64_t offset) const;
    bool hasCopyOfWaiting();
    char* recover();
    void prepend(Found& found);
    void continueIn(Member& next);

    bool begin();
    void beginFirst(std::unique_ptr<Generation> named);
    void noteOlder(bool isEmpty);
    void takeUp(const LogPosition& stored, std::unique_ptr<Generation> named);
    void takeUpLate(const LogPosition& stored, const Generation* named);
    bool takeUpLate(const LogPosition& left, const std::string& path);
    Member memberOf(std::unique_ptr<Generation> named);
    void checkName();
    bool checkFile();
    bool isFinished() const noexcept;
    void noteModified(std::int64_t time) noexcept;
    void noteSame() noexcept;
    LogPosition positionInBlock() const noexcept;
    bool switchToNext();
    char* nextInOrder();
    char* nextLate();
    char* give(char* entry) noexcept;
    bool hasWaitedEnough() noexcept;
    bool isGivenUp() const noexcept;
    bool handleFailedRead();
    char* finish();
    void enter();
    void notePresent();
    bool mayTry(const Retry& retry) const noexcept { return m_now.steady >= retry.at; }
    void fail(Retry& retry, const char* call, int number, const std::string& file = {});
    static std::string sourceOf(const Member& member);
    void succeed(Retry& retry);

    static constexpr int mostReadFailures = 5;      ///< of a file that others follow
    static constexpr std::size_t mostGivenUp = 256; ///< that are remembered
    static constexpr int nameInterval = 5;          ///< looks from one at the name to the next

    const std::string m_path;
    const Options m_options;
    FollowLedger& m_ledger;
    std::optional<LogPosition> m_stored;
    Moment m_now{};
    bool m_wasAbsent = false;   ///< nothing had the name at an earlier look
    bool m_isTakenUp = false;   ///< files rotated before the start are read
    bool m_isGivenAway = false; ///< another log has got the only file that was read
    /// What had contents beside the first file, if that was empty: older, whenever it was written
    /// to.
    std::vector<Older> m_older;
    std::deque<Member> m_chain; ///< the first is read; the last has the name, unless it lost it
    EntryBlock m_block;
    LateLines m_late;
    FileOwner m_owner;
    std::vector<LogPosition> m_given; ///< files that no other log has a position in yet
    bool m_isLate = false;            ///< the last entry is of m_late
    LogPosition m_before;             ///< m_position before that
    LogPosition m_position;           ///< if it is not in the block
    bool m_hasPosition = false;
    bool m_wasInBlock = false; ///< m_isInBlock before the last entry
    bool m_isInBlock = false;  ///< the position is the block's, in the file that is read
    Tail m_head;               ///< the first bytes of the file that is read
    bool m_isAtEnd = false;    ///< the last read found the end of the file
    bool m_isPaused = false;
    Generation::Status m_seen{}; ///< of the file that is read, at the last look
    std::int64_t m_known = 0;    ///< size that its present contents had for certain
    bool m_hasSeen = false;
    std::int64_t m_readModified = 0; ///< of the contents that were read of this file; 0: unknown
    bool m_hadName = false;          ///< itself, not by a link, at the last look
    bool m_mayLeaveOut = false;      ///< looks, while the status is m_seen
    int m_leftOut = 0;               ///< looks since the last one at the name
    std::int64_t m_modified = INT64_MAX; ///< latest of what was read; INT64_MAX: unknown
    std::chrono::steady_clock::time_point m_active{}; ///< when the file grew or lost its name
    bool m_waits = true;           ///< for lines that continue those at the end of the file
    std::int64_t m_waitingTo = -1; ///< how far those went at the last look
    std::chrono::steady_clock::time_point m_waitingSince{}; ///< when the last of them came
    std::chrono::steady_clock::time_point m_lookBegan{};    ///< by the clock itself
    std::int64_t m_bytesRead = 0;
    Retry m_nameRetry;
    Retry m_readRetry;
    Retry m_youngerRetry;     ///< of a generation that cannot be read
    bool m_isAwaited = false; ///< the file that is read comes after that generation
    std::vector<GivenUp> m_givenUp;
    std::string m_siblings; ///< the log's path without symbolic links, as last known
};

} // namespace zrm

#endif
