#include "host/situations/LiveAbsence.h"

#include "base/TraceScope.h"
#include "framework/LogEntry.h"
#include "host/base/TimeText.h"
#include "host/events/AgentNode.h"
#include "host/events/RowText.h"
#include "host/framework/RowLayout.h"
#include "host/situations/GroupKey.h"
#include "host/situations/LiveJudge.h"
#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"

#include <algorithm>
#include <limits>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"LiveAbsence.cpp"};

constexpr std::int64_t second = 1000; // milliseconds

/// How long after its start the agent may take until a log is followed.
constexpr std::int64_t timeUntilFollowed = 10 * second;

/// How long the history may take to store what it was given.
constexpr std::int64_t timeUntilStored = 2 * second;

constexpr const char* hasCome = "an entry has come";
constexpr const char* noRoom = "its group made room for others";
constexpr const char* isChanged = "the situation was changed while the agent was not running";

/// Whether every entry that was written to the log while no agent ran is read at the next start.
bool isResumed(const std::string& log, const PositionBook& book) {
    const auto logs = FurtherLogs::published();
    return logs != nullptr && book.isStored(log) &&
           std::any_of(logs->begin(), logs->end(), [&](const FurtherLog& one) {
               return one.name == log && one.settings->resume;
           });
}

} // namespace

LiveAbsence::LiveAbsence(const SituationConfig& config, std::shared_ptr<const SituationLabel> label,
                         EventQueue& queue)
    : m_config(config), m_label(std::move(label)), m_queue(queue), m_book(PositionBook::current()),
      m_texts(config),
      m_noteEvery(std::clamp(config.judgement.absent * second / 10, second, 10 * second)),
      m_opened(m_book->expected().watched()),
      m_judge(config.judgement.absent * second,
              config.judgement.groupBy.empty() ? 1 : config.judgement.maxGroups),
      m_values(config), m_noted(m_opened), m_losses(m_book->expected().losses()) {
    TraceScope trace(anchor);
    restore();
}

LiveAbsence::~LiveAbsence() {
    const std::lock_guard guard(m_mutex);
    noteSeen(m_book->expected().watched());
}

/// The groups that an earlier run expected entries from. What it has seen last may not have been
/// stored, so that a silence counts from a little later.
std::vector<AbsenceJudge::Group> LiveAbsence::storedGroups(std::int64_t watched) {
    std::vector<Group> groups;
    for (ExpectedGroup& stored : m_book->expected().take(m_config.name, m_label->definition)) {
        const bool isProved = isResumed(stored.log, *m_book);
        Group& group = groups.emplace_back();
        group.key = std::move(stored.key);
        group.seen = isProved && stored.seen >= 0
                         ? std::min(stored.seen + m_noteEvery + timeUntilStored, watched)
                         : watched;
        group.since = stored.since;
        group.log = std::move(stored.log);
        group.node = std::move(stored.node);
    }
    return groups;
}

void LiveAbsence::restore() {
    const std::int64_t watched = m_opened;
    std::vector<Group> groups = storedGroups(watched);
    for (const StoredEpisode& stored : m_book->takeEpisodes(m_config.name)) {
        if (stored.definition != m_label->definition) {
            LiveJudge::resolve(m_queue, stored, isChanged);
            continue;
        }
        const std::string key = GroupKey::of(stored.group, m_config.judgement.groupBy);
        auto group = std::find_if(groups.begin(), groups.end(),
                                  [&](const Group& one) { return one.key == key; });
        if (group == groups.end()) {
            group = groups.insert(groups.end(), Group{key, watched});
        }
        group->absence = std::make_shared<EpisodeId>(stored.id, stored.raised);
        group->since = stored.first;
        group->log = stored.log;
        group->node = stored.node;
    }
    if (groups.empty() && m_config.judgement.groupBy.empty()) {
        groups.push_back({"", watched, nullptr, WallClock::now() / second});
    }
    std::stable_sort(groups.begin(), groups.end(),
                     [](const Group& a, const Group& b) { return a.seen < b.seen; });
    for (Group& group : groups) {
        m_judge.expect(std::move(group), m_dropped);
    }
    resolveDropped();
}

std::optional<unsigned> LiveAbsence::judge(const RowLayout& layout, const char* row) {
    const std::lock_guard guard(m_mutex);
    m_values.read(layout, row, LogEntry::ofThisThread);
    Group& group = m_judge.came(m_values.group(), m_book->expected().watched(), m_dropped);
    resolveDropped();
    noteSource(group, layout, row);
    const std::shared_ptr<EpisodeId> absence = std::exchange(group.absence, nullptr);
    const bool isTaken = absence == nullptr || resolve(group, absence, hasCome);
    group.since = WallClock::now() / second;
    if (absence != nullptr) {
        note(group);
    }
    return isTaken ? std::optional(0U) : std::nullopt;
}

/// Records where the entry of a group has come from.
void LiveAbsence::noteSource(Group& group, const RowLayout& layout, const char* row) {
    const EntryEvents* const events = EntryEvents::ofThisThread;
    if (events == nullptr) {
        m_log.clear();
        LogPath::append(m_log, layout, row);
    }
    const std::string& log = events == nullptr ? m_log : events->log();
    if (group.log != log || group.node.empty()) {
        group.log = log;
        if (const RowColumn* const node = layout.find("ORIGINNODE")) {
            group.node = RowText::of(*node, row, m_utf8);
        }
    }
}

unsigned LiveAbsence::tick(std::int64_t now) {
    const std::lock_guard guard(m_mutex);
    const std::int64_t watched = m_book->expected().watched();
    if (watched - m_noted >= m_noteEvery) {
        noteSeen(watched);
    }
    if (m_judge.nextDue() > watched) {
        m_due.reset();
        return 0;
    }
    if (!m_due) {
        m_due = {watched, now};
    }
    m_due->time = std::min(m_due->time, now); // the clock may have been set back
    if (!isReadUntil(m_due->time, watched)) {
        return 0;
    }
    unsigned raised = 0;
    const std::int64_t due = std::exchange(m_due, std::nullopt)->watched;
    while (Group* const group = m_judge.takeDue(due)) {
        raised += raise(*group, watched, now) ? 1 : 0;
    }
    return raised;
}

/// Whether the logs of the situation have been read to the end at this time or later. One that does
/// not exist holds nothing up.
bool LiveAbsence::isReadUntil(std::int64_t due, std::int64_t watched) {
    const bool mayBeFollowed = watched < m_opened + timeUntilFollowed &&
                               !(m_config.log && m_book->isFollowed(*m_config.log));
    return !mayBeFollowed && m_book->judgedUntil(m_config.log) >= due;
}

bool LiveAbsence::raise(Group& group, std::int64_t watched, std::int64_t now) {
    const std::int64_t silence = (watched - group.seen) / second;
    group.since = std::min(group.since, now / second - silence);
    group.absence = std::make_shared<EpisodeId>();
    auto judgement = std::make_shared<EventJudgement>();
    judgement->state = EventJudgement::RAISED;
    judgement->episode = group.absence;
    judgement->first = group.since;
    judgement->last = now / second;
    judgement->group = GroupKey::values(group.key, m_config.judgement.groupBy);
    judgement->log = group.log.empty() ? m_config.log.value_or("") : group.log;
    judgement->node = group.node.empty() ? AgentNode::name() : group.node;
    note(group);
    return push(judgement);
}

/// False when the queue is closed.
bool LiveAbsence::resolve(const Group& group, std::shared_ptr<EpisodeId> absence,
                          const std::string& reason) {
    if (absence->value() == 0) {
        return true; // the queue, which is closed, did not take the event that raised it
    }
    auto judgement = std::make_shared<EventJudgement>();
    judgement->state = EventJudgement::RESOLVED;
    judgement->episode = std::move(absence);
    judgement->first = group.since;
    judgement->last = WallClock::now() / second;
    judgement->group = GroupKey::values(group.key, m_config.judgement.groupBy);
    judgement->reason = reason;
    judgement->log = group.log.empty() ? m_config.log.value_or("") : group.log;
    judgement->node = group.node.empty() ? AgentNode::name() : group.node;
    return push(judgement);
}

bool LiveAbsence::push(const std::shared_ptr<EventJudgement>& judgement) {
    if (m_texts.isNeeded()) {
        TextFacts facts;
        facts.count = 0;
        facts.first = judgement->first * second;
        facts.last = judgement->last * second;
        facts.log = judgement->log;
        facts.group = judgement->group;
        judgement->text = m_texts.text(facts);
    }
    return m_queue.push(m_label, nullptr, judgement);
}

void LiveAbsence::resolveDropped() {
    for (Group& group : m_dropped) {
        if (group.absence != nullptr) {
            resolve(group, std::exchange(group.absence, nullptr), noRoom);
        }
        m_book->expected().forget(m_config.name, group.key);
    }
    m_dropped.clear();
}

/// Hands a group over to be stored.
void LiveAbsence::note(const Group& group) {
    m_book->expected().note({m_config.name, group.key, m_label->definition,
                             group.absence == nullptr ? group.seen : -1, group.since, group.log,
                             group.node});
}

/// Hands over what has been seen since it was done last, or everything if the store has lost it.
void LiveAbsence::noteSeen(std::int64_t watched) {
    const std::uint64_t losses = m_book->expected().losses();
    const bool isAll = std::exchange(m_losses, losses) != losses;
    for (const Group& group : m_judge.present()) {
        if (!isAll && group.seen < m_noted) {
            break;
        }
        note(group);
    }
    for (auto group = m_judge.absent().begin(); isAll && group != m_judge.absent().end(); ++group) {
        note(*group);
    }
    m_noted = watched;
}

void LiveAbsence::resolveAll(const std::string& reason) {
    const std::lock_guard guard(m_mutex);
    while (Group* const group = m_judge.takeDue(std::numeric_limits<std::int64_t>::max())) {
        m_book->expected().forget(m_config.name, group->key);
    }
    for (const Group& group : m_judge.absent()) {
        if (group.absence != nullptr) {
            resolve(group, group.absence, reason);
            m_book->expected().forget(m_config.name, group.key);
        }
    }
}

JudgeCounts LiveAbsence::counts() const {
    const std::lock_guard guard(m_mutex);
    return {m_judge.absent().size(), m_judge.groups(), m_judge.droppedGroups()};
}

} // namespace zrm::host
