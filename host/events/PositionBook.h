#ifndef ZRM_HOST_POSITION_BOOK_H
#define ZRM_HOST_POSITION_BOOK_H

#include "framework/LogPositions.h"
#include "host/events/Episode.h"
#include "host/events/ExpectedGroups.h"
#include "host/events/WatchedPaths.h"

#include <atomic>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm::host {

class EntryEvents;
class EventQueue;

/// The position of one log as the store has it or is to have it.
struct PositionValue {
    std::string log; ///< its name
    LogPosition position;
    std::vector<EpisodeShare> shares = {}; ///< what it has added to episodes up to there
    bool operator==(const PositionValue&) const = default;
};

/// What the store keeps of logs between two runs.
struct PositionValues {
    std::vector<PositionValue> logs;
    std::vector<WatchedPath> paths;
    std::vector<EpisodeShare> shares = {}; ///< of logs without positions
    bool operator==(const PositionValues&) const = default;
};

/// What is known of one followed log's position. Any thread.
class FollowedLog {
public:
    FollowedLog(std::string name, std::optional<LogPosition> stored)
        : m_name(std::move(name)), m_newest(stored), m_kept(stored) {}
    FollowedLog(const FollowedLog&) = delete;
    FollowedLog& operator=(const FollowedLog&) = delete;

    const std::string& name() const noexcept { return m_name; }

    // For the log's thread.

    /// Identifies who follows the log; what others say of its position is ignored from now on.
    using Follower = std::uint64_t;
    Follower begin();
    /// True if the newest position is one of this run.
    bool isOfRun() const;
    void end(Follower follower);
    /// The newest position that the queue has or that was reached.
    std::optional<LogPosition> newest() const;
    /// True if the store has a position of the log.
    bool isStored() const;
    /// Gives the events to the queue. When it does not take them, because it is closed or null,
    /// later positions are ignored. `self` is this object.
    void push(Follower follower, EventQueue* queue, EntryEvents& events,
              const std::shared_ptr<FollowedLog>& self, const LogPosition& behind);
    /// True if it is the log's first position, which should be stored at once. Takes what the log
    /// has added to episodes.
    bool reached(Follower follower, const LogPosition& position, EntryEvents& events);
    /// What was in the log at this time (milliseconds since 1970, UTC) has been judged, and given
    /// to push or reached.
    void caughtUp(Follower follower, std::int64_t time);
    /// That time; 0 if nobody has followed the log so far. None while nobody does.
    std::optional<std::int64_t> judgedUntil() const;
    /// Begins anew with what comes after the files that were modified up to this time.
    void beginAnew(Follower follower, std::int64_t modified);

    // For whoever has read a file that has this log's name now.

    /// The log continues at this position, which stands behind the events up to `event`, unless it
    /// is followed already. `isWatched`: the file is still read.
    void takeOver(const LogPosition& position, std::uint64_t event, bool isWatched);
    /// The position that it has taken over in a file that nobody reads any more.
    std::optional<LogPosition> takenOver() const;
    /// The last event in the queue.
    std::uint64_t lastEvent() const;

    // For the writer of the store.

    bool isFollowed() const;
    /// A position without events that is to be stored and stands behind events up to `event` only.
    /// `event` never decreases.
    std::optional<PositionValue> unsavedReached(std::uint64_t event);
    /// The same, or the one stored last if the store has lost it.
    std::optional<PositionValue> unsaved(std::uint64_t event);
    void saved(const PositionValue& value);
    /// The store has no longer what it had.
    void forgetSaved();

private:
    PositionValue reachedValue() const;

    const std::string m_name;
    mutable std::mutex m_mutex; ///< guards what follows
    Follower m_follower = 0;    ///< 0: nobody
    Follower m_followers = 0;   ///< so far
    bool m_isOfRun = false;     ///< m_newest was set in this run
    bool m_isTakenOver = false; ///< m_newest is a position that another log has left
    bool m_isWatched = false;   ///< by that log
    bool m_hasRefused = false;  ///< the queue did not take its events: later positions are void
    std::optional<LogPosition> m_newest;
    std::optional<LogPosition> m_reached; ///< without events, behind those up to m_lastEvent
    std::map<const EpisodeId*, EpisodeShare> m_shares; ///< up to m_reached, still to be stored
    /// A position without events that was not stored before the log's next event came.
    struct Passed {
        std::uint64_t from; ///< the event before it
        std::uint64_t to;   ///< the event after it
        PositionValue value;
    };
    std::vector<Passed> m_passed; ///< oldest first
    std::int64_t m_caughtUp = 0;
    std::uint64_t m_lastEvent = 0;     ///< the log's last event in the queue
    std::optional<LogPosition> m_kept; ///< stored last
    bool m_isSaved = true;             ///< the store still has m_kept
};

/// The positions of all followed logs, between the logs' threads and the writer of the store.
class PositionBook {
public:
    /// A file's device and inode.
    using File = std::pair<std::uint64_t, std::uint64_t>;

    /// `isKept`: what the writer is given survives the process.
    PositionBook(const PositionValues& stored, bool isKept);

    /// The book that logs are followed with. One that keeps nothing at first. Any thread.
    static std::shared_ptr<PositionBook> current();
    static void makeCurrent(std::shared_ptr<PositionBook> book);
    /// A new book whose positions end with the process.
    static std::shared_ptr<PositionBook> unkept() {
        return std::make_shared<PositionBook>(PositionValues{}, false);
    }

    bool isKept() const noexcept { return m_isKept; }

    /// What the position of this log is. Any thread.
    std::shared_ptr<FollowedLog> log(std::string_view name);
    /// The newest position of each log that has one. Any thread.
    std::map<std::string, LogPosition> positions() const;
    /// True if the store has a position of this log. Any thread.
    bool isStored(std::string_view log) const;

    /// The files that have lost the names of their logs, and the names that they have now: of logs
    /// of the list, and not as rotation names files. Any thread.
    void setRenamed(std::map<File, std::string> renamed);
    /// A log that is followed has left a file at the position (LogPositions::left). Any thread.
    void left(FollowedLog& log, FollowedLog::Follower follower, const LogPosition& position,
              bool isWatched);
    /// Of the older files of a log that an earlier run has left, those in which no other log has
    /// its position: that log reads the rest itself. Any thread.
    LatePositions lateOf(std::string_view log, const LatePositions& late) const;
    /// FollowedLog::takenOver of the log. Any thread.
    std::optional<LogPosition> takenOver(std::string_view log) const;

    /// Until when every log that is followed has been judged, or this one: milliseconds since 1970,
    /// UTC. The largest number if none is. Any thread.
    std::int64_t judgedUntil(const std::optional<std::string>& log) const;
    /// Whether somebody follows the log now. Any thread.
    bool isFollowed(std::string_view log) const;

    /// What logs without positions have added to episodes: stored within about a second. Any
    /// thread.
    void note(std::vector<EpisodeShare> shares);

    /// The episodes that an earlier run has left open, of one situation or all. Once for each. Any
    /// thread.
    std::vector<StoredEpisode> takeEpisodes(const std::optional<std::string>& situation);
    void setEpisodes(std::vector<StoredEpisode> episodes);

    WatchedPaths& paths() noexcept { return m_paths; }
    const WatchedPaths& paths() const noexcept { return m_paths; }

    /// The groups from which entries are expected.
    ExpectedGroups& expected() noexcept { return m_expected; }

    /// The queue that takes events, from its creation on; null before and after. It outlives the
    /// logs' threads.
    void setQueue(EventQueue* queue);
    EventQueue* queue() const noexcept { return m_queue.load(); }

    /// No more events or positions are taken: from now on not every situation judges what is read.
    void close() noexcept { m_isClosed.store(true); }
    bool isClosed() const noexcept { return m_isClosed.load(); }

    // For the writer of the store.

    /// Positions that are to be stored once the events up to this one are.
    std::vector<PositionValue> unsaved(std::uint64_t event) const;
    /// Those of them that were reached without events.
    std::vector<PositionValue> unsavedReached(std::uint64_t event) const;
    void saved(const std::vector<PositionValue>& values);
    /// What was noted since the last call.
    std::vector<EpisodeShare> takeShares();
    /// The store has lost what it had: all of it is to be stored again.
    void forgetSaved();
    /// The positions of logs that are followed now are to be stored again, so that they stay new.
    void renewFollowed();
    /// The store has removed the positions of these logs. One that is followed is stored again.
    void removed(const std::vector<std::string>& logs);

private:
    const bool m_isKept;
    WatchedPaths m_paths;
    ExpectedGroups m_expected;
    std::atomic<EventQueue*> m_queue{nullptr};
    std::atomic<bool> m_isClosed{false};
    mutable std::mutex m_mutex; ///< guards the maps
    std::map<std::string, std::shared_ptr<FollowedLog>, std::less<>> m_logs;
    std::map<File, std::string> m_renamed;
    std::vector<StoredEpisode> m_episodes;
    std::vector<EpisodeShare> m_shares; ///< of logs without positions
};

} // namespace zrm::host

#endif
