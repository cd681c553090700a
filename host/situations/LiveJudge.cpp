#include "host/situations/LiveJudge.h"

#include "base/TraceScope.h"
#include "framework/LogEntry.h"
#include "host/base/TimeText.h"
#include "host/events/PositionBook.h"
#include "host/events/RowText.h"
#include "host/situations/GroupKey.h"
#include "logs/EntryClock.h"

#include <algorithm>
#include <utility>

#include <xxhash.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"LiveJudge.cpp"};

constexpr std::int64_t second = 1000; // milliseconds

/// Every episode is looked at this often, for times that are ahead of the clock.
constexpr std::int64_t longestLook = 10 * second;

/// How long after the start a log of an earlier run may take until it is followed.
constexpr std::int64_t timeUntilFollowed = 10 * second;

constexpr const char* noRoom = "its group made room for others";
constexpr const char* isChanged = "the situation was changed while the agent was not running";

std::shared_ptr<EventJudgement> resolvedJudgement(Episode episode, std::vector<GroupValue> group,
                                                  const std::string& reason) {
    auto judgement = std::make_shared<EventJudgement>();
    judgement->state = EventJudgement::RESOLVED;
    judgement->episode = std::move(episode.id);
    judgement->count = episode.count;
    judgement->first = episode.first;
    judgement->last = episode.last;
    judgement->group = std::move(group);
    judgement->values = std::move(episode.values);
    judgement->reason = reason;
    judgement->log = std::move(episode.log);
    judgement->node = std::move(episode.node);
    return judgement;
}

/// What the text of the event may say. Refers to the judgement.
TextFacts factsOf(const EventJudgement& judgement) {
    TextFacts facts;
    facts.count = judgement.count;
    facts.first = judgement.first * second;
    facts.last = judgement.last * second;
    facts.log = judgement.log;
    facts.group = judgement.group;
    facts.values = judgement.values;
    return facts;
}

Episode episodeOf(const StoredEpisode& stored) {
    Episode episode;
    episode.id = std::make_shared<EpisodeId>(stored.id, stored.raised);
    episode.log = stored.log;
    episode.node = stored.node;
    episode.values = stored.values;
    for (const EpisodeShare& share : stored.shares) {
        const auto shared = std::make_shared<GrowingShare>(share);
        shared->episode = episode.id;
        episode.first = episode.count == 0 ? share.first : std::min(episode.first, share.first);
        episode.last = episode.count == 0 ? share.last : std::max(episode.last, share.last);
        episode.count += share.count;
        episode.shares.push_back(shared);
    }
    return episode;
}

} // namespace

std::int64_t LiveJudge::definitionOf(const SituationConfig& config) {
    const JudgementConfig& rules = config.judgement;
    std::string text = config.log.value_or("");
    const auto add = [&text](std::string_view part) { (text += '\0') += part; };
    for (const std::string& condition : config.when) {
        add(condition);
    }
    for (const std::string& name : rules.groupBy) {
        add("group " + name);
    }
    for (const std::int64_t number : {rules.frequency, std::int64_t{rules.isUpperBound},
                                      rules.period, rules.resolveAfter, rules.cooldown}) {
        add(std::to_string(number));
    }
    add(rules.distinct);
    if (!rules.then.empty()) {
        add("then " + rules.then);
    }
    if (rules.absent > 0) {
        add("absent " + std::to_string(rules.absent));
    }
    return static_cast<std::int64_t>(XXH3_64bits(text.data(), text.size()));
}

LiveJudge::LiveJudge(const SituationConfig& config, std::shared_ptr<const SituationLabel> label,
                     EventQueue& queue)
    : m_config(config), m_label(std::move(label)), m_queue(queue), m_texts(config),
      m_opened(WallClock::now()), m_judge(config.judgement), m_values(config) {
    TraceScope trace(anchor);
    for (const StoredEpisode& stored : PositionBook::current()->takeEpisodes(m_config.name)) {
        continueWith(stored);
    }
    pushResolved();
}

void LiveJudge::continueWith(const StoredEpisode& stored) {
    if (stored.definition != m_label->definition) {
        resolve(m_queue, stored, isChanged);
        return;
    }
    const std::string key = GroupKey::of(stored.group, m_config.judgement.groupBy);
    if (stored.isPause) {
        m_judge.restorePause(key, stored.last, m_ended);
    } else {
        m_judge.restore(key, episodeOf(stored), m_ended);
    }
}

void LiveJudge::resolve(EventQueue& queue, const StoredEpisode& stored, const std::string& reason) {
    if (!stored.isPause) {
        SituationLabel label{stored.situation, stored.severity};
        label.definition = stored.definition;
        queue.push(std::make_shared<const SituationLabel>(std::move(label)), nullptr,
                   resolvedJudgement(episodeOf(stored), stored.group, reason));
    }
}

/// What is judged of the row. Valid until the next call.
EpisodeJudge::Entry LiveJudge::entryOf(const RowLayout& layout, const char* row) {
    m_values.read(layout, row, LogEntry::ofThisThread);
    const EntryEvents* const events = EntryEvents::ofThisThread;
    if (events == nullptr) {
        m_log.clear();
        LogPath::append(m_log, layout, row);
    }
    const auto& instant = EntryInstant::ofThisThread();
    return {instant ? *instant : WallClock::now() / second, m_values.group(), m_values.distinct(),
            events == nullptr ? m_log : events->log(), m_values.mayRaise()};
}

std::optional<unsigned> LiveJudge::judge(const RowLayout& layout, const char* row) {
    const std::lock_guard guard(m_mutex);
    const EpisodeJudge::Entry entry = entryOf(layout, row);
    const EpisodeJudge::Verdict verdict = m_judge.judge(entry, m_ended);
    if (!m_ended.empty() && !pushResolved()) {
        return std::nullopt;
    }
    if (verdict.decision == EpisodeJudge::Decision::RAISES) {
        if (verdict.episode != nullptr) {
            LogPath::append(verdict.episode->log, layout, row);
            if (const RowColumn* const node = layout.find("ORIGINNODE")) {
                verdict.episode->node = RowText::of(*node, row, m_utf8);
            }
        }
        if (!push(row, entry, verdict)) {
            return std::nullopt;
        }
    }
    if (verdict.share != nullptr) {
        if (EntryEvents* const events = EntryEvents::ofThisThread) {
            events->note(verdict.share);
        } else if (!verdict.share->isNoted.exchange(true)) {
            m_shares.push_back(verdict.share);
        }
    }
    return verdict.decision == EpisodeJudge::Decision::RAISES ? 1U : 0U;
}

bool LiveJudge::push(const char* row, const EpisodeJudge::Entry& entry,
                     const EpisodeJudge::Verdict& verdict) {
    const JudgementConfig& rules = m_config.judgement;
    auto judgement = std::make_shared<EventJudgement>();
    judgement->count = static_cast<std::uint64_t>(verdict.count);
    judgement->first = verdict.first;
    judgement->last = entry.time;
    judgement->group = GroupKey::values(entry.group, rules.groupBy);
    if (verdict.episode != nullptr) {
        judgement->state = EventJudgement::RAISED;
        judgement->episode = verdict.episode->id;
        judgement->count = verdict.episode->count;
    } else if (rules.cooldown > 0) {
        judgement->state = EventJudgement::PAUSED;
    }
    if (m_texts.isNeeded()) {
        TextFacts facts = factsOf(*judgement);
        if (!rules.then.empty()) { // an episode has this entry, too
            facts.count = static_cast<std::uint64_t>(verdict.count);
        }
        facts.count = std::max<std::uint64_t>(facts.count, 1);
        facts.log = entry.log;
        judgement->text = m_texts.text(m_values.reading(), facts);
        if (verdict.episode != nullptr) {
            judgement->values = m_texts.values(m_values.reading());
            verdict.episode->values = judgement->values;
        }
    }
    return m_queue.push(m_label, row, judgement);
}

/// Resolves m_ended. False when the queue is closed.
bool LiveJudge::pushResolved(const std::string& reason) {
    bool isTaken = true;
    for (EndedEpisode& ended : m_ended) {
        if (ended.episode.id->value() == 0) {
            continue; // the queue, which is closed, did not take the event that raised it
        }
        const auto judgement = resolvedJudgement(
            std::move(ended.episode), GroupKey::values(ended.group, m_config.judgement.groupBy),
            ended.isDropped ? noRoom : reason);
        if (m_texts.isNeeded()) {
            judgement->text = m_texts.text(factsOf(*judgement));
        }
        isTaken = m_queue.push(m_label, nullptr, judgement) && isTaken;
    }
    m_ended.clear();
    return isTaken;
}

void LiveJudge::recount(const RowLayout& layout, const char* row) {
    const std::lock_guard guard(m_mutex);
    m_judge.recount(entryOf(layout, row));
}

/// Whether a log of the episode, of an earlier run, is still to be followed.
bool LiveJudge::mayBeFollowed(const Episode& episode, std::int64_t now) const {
    const std::shared_ptr<PositionBook> book = PositionBook::current();
    return now < m_opened + timeUntilFollowed &&
           std::any_of(episode.shares.begin(), episode.shares.end(),
                       [&](const auto& share) { return !book->isFollowed(share->log); });
}

bool LiveJudge::isOver(Episode& episode, std::int64_t now, std::int64_t judgedUntil) const {
    // A time ahead of the clock, which was set back since, counts as the present.
    if (episode.last > now / second) {
        episode.cap = episode.cap == 0 ? now / second : std::min(episode.cap, now / second);
    }
    const std::int64_t last = episode.cap == 0 ? episode.last : std::min(episode.last, episode.cap);
    const std::int64_t end = (last + m_config.judgement.resolveAfter) * second;
    return now >= end && judgedUntil >= end && !mayBeFollowed(episode, now) &&
           std::none_of(episode.shares.begin(), episode.shares.end(),
                        [](const auto& share) { return share->isNoted.load(); });
}

unsigned LiveJudge::tick(std::int64_t now) {
    const std::lock_guard guard(m_mutex);
    noteShares();
    const bool isDue = m_judge.episodes() > 0 &&
                       (now >= m_nextLook ||
                        m_judge.earliestLast() <= now / second - m_config.judgement.resolveAfter);
    if (!isDue) {
        return 0;
    }
    m_nextLook = now + longestLook;
    const std::int64_t judgedUntil = PositionBook::current()->judgedUntil(m_config.log);
    m_judge.takeOver([&](Episode& episode) { return isOver(episode, now, judgedUntil); }, m_ended);
    pushResolved();
    return 0; // what it has raised came with entries
}

/// Hands over what logs without positions have added to episodes.
void LiveJudge::noteShares() {
    std::vector<EpisodeShare> shares;
    for (const auto& share : m_shares) {
        share->isNoted = false;
        shares.push_back(*share);
    }
    m_shares.clear();
    if (!shares.empty()) {
        PositionBook::current()->note(std::move(shares));
    }
}

void LiveJudge::resolveAll(const std::string& reason) {
    const std::lock_guard guard(m_mutex);
    noteShares();
    m_judge.takeOver([](const Episode&) { return true; }, m_ended);
    pushResolved(reason);
}

JudgeCounts LiveJudge::counts() const {
    const std::lock_guard guard(m_mutex);
    return {m_judge.episodes(), m_judge.groups(), m_judge.droppedGroups()};
}

} // namespace zrm::host
