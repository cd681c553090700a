#include "monitor/LogFile.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "framework/LogPositions.h"
#include "logs/FollowSettings.h"
#include "monitor/FileFollower.h"
#include "monitor/FollowedEntry.h"
#include "monitor/GenerationNames.h"
#include "monitor/Interruption.h"

#include <algorithm>
#include <utility>
#include <vector>

#include <sys/select.h>

namespace zrm {

// Follows a log through rotations and restarts on the log's own thread.

namespace {

TRC1_Anchor anchor{"LogFileFollow.cpp"};

constexpr timeval lookInterval{1, 0};
constexpr std::chrono::seconds noteInterval{1};
constexpr unsigned entriesPerClock = 1024; ///< entries between two looks at the clock

FileFollower::Options optionsFor(const FollowSettings& settings, std::size_t recordLength,
                                 const char* log) {
    FileFollower::Options options;
    options.owners = &FileOwners::ofProcess();
    options.log = log;
    options.byName = settings.follow == FollowSettings::Follow::name;
    options.fromBeginning =
        settings.isNewcomer || settings.start == FollowSettings::Start::beginning;
    options.rotateWait = settings.rotateWait;
    options.rotatedTo = settings.rotatedTo;
    options.recordLength = recordLength;
    options.join = settings.join.value;
    return options;
}

/// Traces what has been lost since `known` losses. Returns how many there are now.
std::int64_t traceLosses(const FollowLedger& ledger, const char* file, std::int64_t known) {
    TraceScope trace(anchor);
    const std::int64_t losses = ledger.losses();
    if (losses == known) {
        return losses;
    }
    const std::vector<FollowLedger::Lost> kept = ledger.lost();
    const auto added = std::min<std::size_t>(static_cast<std::size_t>(losses - known), kept.size());
    for (std::size_t i = kept.size() - added; i < kept.size(); ++i) {
        const FollowLedger::Lost& lost = kept[i];
        const auto from = static_cast<long long>(lost.from);
        const auto to = static_cast<long long>(lost.to);
        if (isCompressedName(lost.source)) {
            trace.error()("Lines of %s were lost: %s cannot be read from byte %lld of its contents "
                          "on. A damaged file is not read at all.",
                          file, lost.source.c_str(), from);
        } else if (!lost.source.empty()) {
            trace.error()("Lines of %s were lost: bytes %lld to %lld of %s cannot be read.", file,
                          from, to, lost.source.c_str());
        } else if (from < to) {
            trace.error()("Lines of %s were lost: bytes %lld to %lld were removed before they were "
                          "read, or cannot be read, and no copy has them.",
                          file, from, to);
        } else {
            trace.error()("Lines of %s may have been lost: the file in which reading stopped at "
                          "byte %lld is gone or cannot be read, with what was written to it after "
                          "that.",
                          file, from);
        }
    }
    return losses;
}

/// Records how far the files were read that reading has left.
void noteLeft(FileFollower& follower, LogPositions& positions) {
    for (const LateLines::Left& left : follower.takeLeft()) {
        positions.left(left.position, left.isWatched);
    }
}

} // namespace

void LogFile::followLog(std::size_t recordLength) {
    TraceScope trace(anchor);
    const FollowSettings& settings = *followSettings();
    FileFollower follower(fileNameLocal(), optionsFor(settings, recordLength, fileNameUTF8()),
                          *m_followLedger);
    LogPositions positions(fileNameUTF8());
    FollowedEntry current(*this, follower, recordLength == 0);
    const LogEntry::Offer offer(current);
    // A log that is followed again, with other settings for example, continues in any case.
    const bool continues = settings.resume || !positions.isFirstOfRun();
    const auto stored = continues ? positions.stored() : std::nullopt;
    if (stored) {
        follower.resumeAt(*stored);
    }
    const Interruption interruption([this] {
        m_pulse.work("searches a compressed file");
        return isReadingOver();
    });
    std::int64_t losses = 0;
    bool isRecountDue = stored.has_value() && positions.isFirstOfRun();
    for (bool isLast = false; !isLast;) {
        // What is there when the log is to end is still read.
        isLast = monitorStatus() != MONITOR_RUNNING;
        if (isLast && !settings.resume) {
            follower.waitNoLonger(); // otherwise the next run reads what waits
        }
        m_pulse.work("looks at the log");
        positions.beginLook();
        const bool isQuiet = !isLast && follower.isQuiet();
        if (!isQuiet && follower.look(FileFollower::Moment::now())) {
            noteFollowed(follower, positions); // where a log begins is known before it is read
            if (std::exchange(isRecountDue, false)) {
                recount(follower, recordLength);
            }
            if (!readEntries(follower, positions, current)) {
                // Who follows the log next judges this entry, and none of those before it again.
                if (follower.takeBack()) {
                    noteFollowed(follower, positions);
                }
                break;
            }
            noteFollowed(follower, positions);
        }
        if (!isQuiet) {
            noteFollowFailure();
            losses = traceLosses(*m_followLedger, fileNameLocal(), losses);
        }
        m_pulse.rest();
        if (!isLast) {
            positions.endLook();
            timeval interval = lookInterval;
            select(0, nullptr, nullptr, nullptr, &interval);
        }
    }
    endFollowing(follower, positions);
}

/// Whoever comes to follow the files under other names continues where this log has left them.
void LogFile::endFollowing(FileFollower& follower, LogPositions& positions) {
    m_ledger.noteFile(std::nullopt);
    for (const LateLines::Left& left : follower.takeLeft()) {
        positions.left(left.position, false);
    }
    if (const auto position = follower.position()) {
        positions.left(*position, false);
    }
}

/// Judges what there is to read. False if the log has to end before an entry was judged, which then
/// is not behind the position.
bool LogFile::readEntries(FileFollower& follower, LogPositions& positions, FollowedEntry& current) {
    TraceScope trace(anchor);
    m_pulse.work("reads the log");
    const std::int64_t entriesBefore = numEvents();
    auto noted = std::chrono::steady_clock::now();
    bool isJudged = true;
    for (unsigned entries = 1;; ++entries) {
        char* const entry = follower.next();
        if (entry == nullptr) {
            if (!follower.isPaused() || isReadingOver()) {
                break;
            }
            m_pulse.work("reads the log");
            noteFollowed(follower, positions);
            continue;
        }
        current.begin();
        positions.beginEntry();
        isJudged = !isReadingOver() && deliverEntry(entry);
        if (!isJudged) {
            break;
        }
        if (positions.hasEvents()) {
            positions.endEntry(*follower.position());
            if (follower.isLate()) {
                noteLeft(follower, positions);
            }
        }
        if (entries % entriesPerClock == 0 &&
            std::chrono::steady_clock::now() - noted >= noteInterval) {
            noted = std::chrono::steady_clock::now();
            noteFollowed(follower, positions);
        }
    }
    if (numEvents() != entriesBefore) {
        m_ledger.noteEntries();
    }
    return trace.result(isJudged);
}

void LogFile::readFields(std::string_view /*text*/, EntryFields& /*fields*/) const {}

/// The time of the entry that the row was just made of, in seconds since 1970-01-01 UTC.
std::int64_t LogFile::timeOf(zrm_rmlogent_data_t& row) {
    const std::int64_t time = m_clock.next(lastEntryMoment, row.entrytime);
    if (!m_clock.hadTime()) [[unlikely]] {
        noteMissingTime();
    }
    return time;
}

/// Apart from what runs for each entry.
[[gnu::noinline]] void LogFile::noteMissingTime() {
    if (!std::exchange(m_isMissingTimeTraced, true)) {
        TraceScope trace(anchor);
        trace.error()("Entry without a time that can be read in file %s. Such entries count with "
                      "the time of the entry before them. Further ones are not traced.",
                      fileNameLocal());
    }
}

/// Records how far the log was read.
void LogFile::noteFollowed(FileFollower& follower, LogPositions& positions) {
    if (const auto position = follower.position()) {
        positions.reached(*position);
    }
    noteLeft(follower, positions);
    m_ledger.noteFile(follower.file());
    m_ledger.addBytes(follower.takeBytesRead());
    follower.noteProgress();
}

/// Traces a failure once, however often the call is tried again, and its end.
void LogFile::noteFollowFailure() {
    TraceScope trace(anchor);
    const auto failure = m_followLedger->failure();
    if (failure && !m_isFailureTraced) {
        const ErrorText error(failure->number);
        trace.error()(
            "Error while following file %s: %s%s%s failed and is tried again. errno = %d; %s",
            fileNameLocal(), failure->call, failure->file.empty() ? "" : " of ",
            failure->file.c_str(), error.number(), error.text());
    } else if (!failure && m_isFailureTraced) {
        trace.error()("File %s is read again.", fileNameLocal());
    }
    m_isFailureTraced = failure.has_value();
}

} // namespace zrm
