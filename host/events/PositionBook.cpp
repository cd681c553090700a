#include "host/events/PositionBook.h"

#include "host/events/EventQueue.h"

#include <algorithm>
#include <iterator>
#include <limits>
#include <utility>

namespace zrm::host {

FollowedLog::Follower FollowedLog::begin() {
    const std::lock_guard guard(m_mutex);
    m_follower = ++m_followers;
    m_isTakenOver = false;
    m_caughtUp = 0;
    return m_follower;
}

void FollowedLog::end(Follower follower) {
    const std::lock_guard guard(m_mutex);
    if (m_follower == follower) {
        m_follower = 0;
    }
}

void FollowedLog::beginAnew(Follower follower, std::int64_t modified) {
    const std::lock_guard guard(m_mutex);
    if (follower == m_follower && !m_hasRefused) {
        LogPosition position;
        position.modified = modified;
        m_newest = m_reached = position;
        m_isOfRun = true;
    }
}

void FollowedLog::takeOver(const LogPosition& position, std::uint64_t event, bool isWatched) {
    const std::lock_guard guard(m_mutex);
    if (m_follower != 0) {
        return;
    }
    m_isTakenOver = true;
    m_isWatched = isWatched;
    m_isOfRun = true; // whoever follows the log next continues in any case
    if (position != m_newest) {
        m_newest = m_reached = position;
        m_lastEvent = std::max(m_lastEvent, event);
    }
}

std::optional<LogPosition> FollowedLog::takenOver() const {
    const std::lock_guard guard(m_mutex);
    return m_isTakenOver && !m_isWatched ? m_newest : std::nullopt;
}

std::uint64_t FollowedLog::lastEvent() const {
    const std::lock_guard guard(m_mutex);
    return m_lastEvent;
}

bool FollowedLog::isFollowed() const {
    const std::lock_guard guard(m_mutex);
    return m_follower != 0;
}

std::optional<LogPosition> FollowedLog::newest() const {
    const std::lock_guard guard(m_mutex);
    return m_newest;
}

bool FollowedLog::isOfRun() const {
    const std::lock_guard guard(m_mutex);
    return m_isOfRun;
}

bool FollowedLog::isStored() const {
    const std::lock_guard guard(m_mutex);
    return m_isSaved && m_kept;
}

void FollowedLog::push(Follower follower, EventQueue* queue, EntryEvents& events,
                       const std::shared_ptr<FollowedLog>& self, const LogPosition& behind) {
    const std::lock_guard guard(m_mutex);
    if (follower != m_follower || m_hasRefused) {
        return;
    }
    std::optional<PositionValue> before;
    if (m_reached) {
        before = reachedValue();
    }
    // What is still to be stored up to the position before goes with the event as well.
    for (EpisodeShare& share : events.shares()) {
        m_shares.insert_or_assign(share.episode.get(), std::move(share));
    }
    std::vector<EpisodeShare> shares;
    for (const auto& [id, share] : m_shares) {
        shares.push_back(share);
    }
    const std::uint64_t last =
        queue == nullptr ? 0 : queue->pushEntry(events, self, behind, std::move(shares));
    if (last == 0) {
        m_hasRefused = true;
        return;
    }
    events.forgetShares();
    m_shares.clear();
    if (before) {
        m_passed.push_back({m_lastEvent, last, std::move(*before)});
    }
    m_lastEvent = last;
    m_newest = behind;
    m_isOfRun = true;
    m_reached.reset();
}

bool FollowedLog::reached(Follower follower, const LogPosition& position, EntryEvents& events) {
    const std::lock_guard guard(m_mutex);
    if (follower != m_follower || m_hasRefused) {
        return false;
    }
    m_isOfRun = true;
    for (EpisodeShare& share : events.shares()) {
        m_shares.insert_or_assign(share.episode.get(), std::move(share));
    }
    events.forgetShares();
    if (position == m_newest && m_shares.empty()) {
        return false;
    }
    const bool isFirst = !m_newest;
    m_newest = m_reached = position;
    return isFirst;
}

void FollowedLog::caughtUp(Follower follower, std::int64_t time) {
    const std::lock_guard guard(m_mutex);
    if (follower == m_follower) {
        m_caughtUp = time;
    }
}

std::optional<std::int64_t> FollowedLog::judgedUntil() const {
    const std::lock_guard guard(m_mutex);
    return m_follower != 0 && !m_hasRefused ? std::optional(m_caughtUp) : std::nullopt;
}

std::optional<PositionValue> FollowedLog::unsavedReached(std::uint64_t event) {
    const std::lock_guard guard(m_mutex);
    std::erase_if(m_passed, [event](const Passed& passed) { return passed.to <= event; });
    if (m_reached && m_lastEvent <= event) {
        return reachedValue();
    }
    const auto passed = std::find_if(m_passed.rbegin(), m_passed.rend(),
                                     [event](const Passed& one) { return one.from <= event; });
    return passed != m_passed.rend() ? std::optional(passed->value) : std::nullopt;
}

std::optional<PositionValue> FollowedLog::unsaved(std::uint64_t event) {
    if (std::optional<PositionValue> reached = unsavedReached(event)) {
        return reached;
    }
    const std::lock_guard guard(m_mutex);
    return m_isSaved || !m_kept ? std::nullopt : std::optional(PositionValue{m_name, *m_kept});
}

/// What was reached last, with all that is to be stored with it. With m_mutex held.
PositionValue FollowedLog::reachedValue() const {
    PositionValue value{m_name, *m_reached};
    for (const auto& [id, share] : m_shares) {
        value.shares.push_back(share);
    }
    return value;
}

void FollowedLog::saved(const PositionValue& value) {
    const std::lock_guard guard(m_mutex);
    m_kept = value.position;
    m_isSaved = true;
    for (const EpisodeShare& share : value.shares) {
        const auto found = m_shares.find(share.episode.get());
        if (found != m_shares.end() && found->second == share) { // has not grown meanwhile
            m_shares.erase(found);
        }
    }
    if (m_reached == value.position && m_shares.empty()) {
        m_reached.reset();
    }
}

void FollowedLog::forgetSaved() {
    const std::lock_guard guard(m_mutex);
    m_isSaved = false;
}

namespace {

struct Current {
    std::mutex mutex;
    std::shared_ptr<PositionBook> book = PositionBook::unkept();
};

/// Never destroyed: logs may still be followed while the process exits.
Current& theCurrent() {
    static auto* const current = new Current;
    return *current;
}

} // namespace

std::shared_ptr<PositionBook> PositionBook::current() {
    const std::lock_guard guard(theCurrent().mutex);
    return theCurrent().book;
}

void PositionBook::makeCurrent(std::shared_ptr<PositionBook> book) {
    const std::lock_guard guard(theCurrent().mutex);
    theCurrent().book = std::move(book);
}

PositionBook::PositionBook(const PositionValues& stored, bool isKept)
    : m_isKept(isKept), m_paths(stored.paths), m_expected(isKept) {
    for (const PositionValue& value : stored.logs) {
        m_logs.emplace(value.log, std::make_shared<FollowedLog>(value.log, value.position));
    }
}

void PositionBook::setQueue(EventQueue* queue) {
    m_queue.store(queue);
    if (queue != nullptr && m_isKept) {
        queue->wake(); // there may be positions already
    }
}

std::shared_ptr<FollowedLog> PositionBook::log(std::string_view name) {
    const std::lock_guard guard(m_mutex);
    auto found = m_logs.find(name);
    if (found == m_logs.end()) {
        found = m_logs.emplace(name, std::make_shared<FollowedLog>(std::string(name), std::nullopt))
                    .first;
    }
    return found->second;
}

std::map<std::string, LogPosition> PositionBook::positions() const {
    std::map<std::string, LogPosition> positions;
    const std::lock_guard guard(m_mutex);
    for (const auto& [name, log] : m_logs) {
        if (const std::optional<LogPosition> newest = log->newest()) {
            positions.emplace(name, *newest);
        }
    }
    return positions;
}

bool PositionBook::isStored(std::string_view log) const {
    const std::lock_guard guard(m_mutex);
    const auto found = m_logs.find(log);
    return found != m_logs.end() && found->second->isStored();
}

void PositionBook::setRenamed(std::map<File, std::string> renamed) {
    const std::lock_guard guard(m_mutex);
    m_renamed = std::move(renamed);
}

void PositionBook::left(FollowedLog& by, FollowedLog::Follower follower,
                        const LogPosition& position, bool isWatched) {
    std::string name;
    {
        const std::lock_guard guard(m_mutex);
        const auto renamed = m_renamed.find({position.device, position.inode});
        if (renamed == m_renamed.end() || renamed->second == by.name()) {
            return;
        }
        name = renamed->second;
    }
    LogPosition taken = position;
    taken.late = {}; // those files stay this log's
    log(name)->takeOver(taken, by.lastEvent(), isWatched);
    const std::optional<LogPosition> own = by.newest();
    if (!isWatched && own && own->device == position.device && own->inode == position.inode) {
        by.beginAnew(follower, position.modified);
    }
}

LatePositions PositionBook::lateOf(std::string_view log, const LatePositions& late) const {
    if (late.files().empty()) {
        return late;
    }
    const std::lock_guard guard(m_mutex);
    const auto isOfAnother = [&](const LogPosition& file) {
        return std::any_of(m_logs.begin(), m_logs.end(), [&](const auto& one) {
            const std::optional<LogPosition> position = one.second->newest();
            return one.first != log && position && position->device == file.device &&
                   position->inode == file.inode;
        });
    };
    std::vector<LogPosition> files = late.files();
    std::erase_if(files, isOfAnother);
    return LatePositions(std::move(files));
}

std::optional<LogPosition> PositionBook::takenOver(std::string_view log) const {
    const std::lock_guard guard(m_mutex);
    const auto found = m_logs.find(log);
    return found == m_logs.end() ? std::nullopt : found->second->takenOver();
}

std::vector<PositionValue> PositionBook::unsaved(std::uint64_t event) const {
    std::vector<PositionValue> values;
    const std::lock_guard guard(m_mutex);
    for (const auto& [name, log] : m_logs) {
        if (std::optional<PositionValue> value = log->unsaved(event)) {
            values.push_back(std::move(*value));
        }
    }
    return values;
}

void PositionBook::saved(const std::vector<PositionValue>& values) {
    const std::lock_guard guard(m_mutex);
    for (const PositionValue& value : values) {
        if (const auto found = m_logs.find(value.log); found != m_logs.end()) {
            found->second->saved(value);
        }
    }
}

std::vector<PositionValue> PositionBook::unsavedReached(std::uint64_t event) const {
    std::vector<PositionValue> values;
    const std::lock_guard guard(m_mutex);
    for (const auto& [name, log] : m_logs) {
        if (std::optional<PositionValue> value = log->unsavedReached(event)) {
            values.push_back(std::move(*value));
        }
    }
    return values;
}

std::vector<EpisodeShare> PositionBook::takeShares() {
    const std::lock_guard guard(m_mutex);
    return std::exchange(m_shares, {});
}

void PositionBook::note(std::vector<EpisodeShare> shares) {
    if (!m_isKept) {
        return; // nobody takes them
    }
    const std::lock_guard guard(m_mutex);
    std::move(shares.begin(), shares.end(), std::back_inserter(m_shares));
}

void PositionBook::setEpisodes(std::vector<StoredEpisode> episodes) {
    const std::lock_guard guard(m_mutex);
    m_episodes = std::move(episodes);
}

std::vector<StoredEpisode> PositionBook::takeEpisodes(const std::optional<std::string>& situation) {
    std::vector<StoredEpisode> taken;
    const std::lock_guard guard(m_mutex);
    std::erase_if(m_episodes, [&](StoredEpisode& episode) {
        const bool isTaken = !situation || episode.situation == *situation;
        if (isTaken) {
            taken.push_back(std::move(episode));
        }
        return isTaken;
    });
    return taken;
}

std::int64_t PositionBook::judgedUntil(const std::optional<std::string>& log) const {
    std::int64_t until = std::numeric_limits<std::int64_t>::max();
    const std::lock_guard guard(m_mutex);
    for (const auto& [name, one] : m_logs) {
        const auto judged = log && name != *log ? std::nullopt : one->judgedUntil();
        until = std::min(until, judged.value_or(until));
    }
    return until;
}

bool PositionBook::isFollowed(std::string_view log) const {
    const std::lock_guard guard(m_mutex);
    const auto found = m_logs.find(log);
    return found != m_logs.end() && found->second->isFollowed();
}

void PositionBook::forgetSaved() {
    m_paths.forgetSaved();
    m_expected.forgetSaved();
    const std::lock_guard guard(m_mutex);
    for (const auto& [name, log] : m_logs) {
        log->forgetSaved();
    }
}

void PositionBook::renewFollowed() {
    const std::lock_guard guard(m_mutex);
    for (const auto& [name, log] : m_logs) {
        if (log->isFollowed()) {
            log->forgetSaved();
        }
    }
}

void PositionBook::removed(const std::vector<std::string>& logs) {
    const std::lock_guard guard(m_mutex);
    for (const std::string& name : logs) {
        const auto found = m_logs.find(name);
        if (found == m_logs.end()) {
            continue;
        }
        if (found->second->isFollowed()) {
            found->second->forgetSaved();
        } else {
            m_logs.erase(found);
        }
    }
}

} // namespace zrm::host
