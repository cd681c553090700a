#ifndef ZRM_FOLLOW_SETTINGS_H
#define ZRM_FOLLOW_SETTINGS_H

#include "framework/LogEntry.h"
#include "logs/EntryFormat.h"
#include "logs/EntrySource.h"
#include "logs/LineJoin.h"

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace zrm {

/// Shares something that does not change and that has a definition. Two are equal if their
/// definitions are, whether they share one object or not.
template <class T> struct Defined {
    std::shared_ptr<const T> value;

    explicit operator bool() const noexcept { return value != nullptr; }
    const T* operator->() const noexcept { return value.get(); }
    bool operator==(const Defined& other) const {
        return value == other.value ||
               (value && other.value && value->definition() == other.value->definition());
    }
};

/// The difference between a zone's time and UTC from a moment on.
struct ZoneOffset {
    std::int64_t since; ///< seconds since 1970-01-01 UTC
    std::int32_t seconds;

    bool operator==(const ZoneOffset&) const = default;
};

/// When the framework calls a log quiet. The monitor makes nothing of it.
struct QuietRule {
    bool isLearned = false;        ///< by the rhythm of the weeks before
    std::chrono::seconds after{0}; ///< without an entry; 0: never, or learned

    explicit operator bool() const noexcept { return isLearned || after.count() > 0; }
    bool operator==(const QuietRule&) const = default;
};

/// How a log that is followed through rotations and restarts is read. A log without such settings
/// is a line of the log configuration and is read as that file's logs always are. Not changed after
/// it was made: shared by all threads without a lock.
struct FollowSettings {
    enum class Follow : unsigned char {
        name, ///< what has the log's path, through rotation
        file, ///< the file that was opened, whatever it is called later
    };
    enum class Start : unsigned char { end, beginning };

    Follow follow = Follow::name;
    /// Where a file without a stored position begins if it was there when monitoring started.
    Start start = Start::end;
    /// Continue at the stored position.
    bool resume = true;
    /// The file appeared after monitoring started: it begins at its beginning, whatever `start` is,
    /// unless a position is stored.
    bool isNewcomer = false;
    /// How long a rotated file must have been quiet before its successor is read.
    std::chrono::milliseconds rotateWait{2000};
    /// A directory to which rotation moves older files, absolute or seen from the log's own. Empty:
    /// they stay in the log's directory.
    std::string rotatedTo;
    /// What times without a zone mean, as a name of the time zone database. Empty: local time.
    std::string timezone;
    std::vector<ZoneOffset> zone; ///< the offsets of `timezone`, oldest first
    EntryKeep keep;               ///< in events
    QuietRule quiet;
    /// How entries are taken apart, for logs that have no kind of their own. None: the kind of the
    /// log says it.
    Defined<EntryFormat> format;
    Defined<LineJoin> join; ///< which lines make an entry; none: each is one
    /// Where the entries come from if the log is not a file. None: from the file of its name.
    Defined<EntrySource> source;

    /// Logs of equal settings need no new monitor.
    bool operator==(const FollowSettings&) const = default;
};

} // namespace zrm

#endif
