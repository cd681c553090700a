#include "host/diagnose/LogStateEvents.h"

#include "base/TraceScope.h"
#include "host/events/AgentNode.h"
#include "host/events/Episode.h"
#include "host/events/PositionBook.h"

#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"LogStateEvents.cpp"};

constexpr std::int64_t second = 1000; // milliseconds
constexpr const char* severity = "warning";
constexpr const char* isNotWatched = "the log is no longer watched for it";

// In the order of LogState::Kind.
constexpr std::array<const char*, LogState::kinds> ends = {
    "an entry has come", "there is a file that can be read", "most lines match the format again"};

std::shared_ptr<const SituationLabel> labelOf(LogState::Kind kind) {
    return std::make_shared<const SituationLabel>(
        SituationLabel{LogState::situationOf(kind), severity});
}

} // namespace

LogStateEvents::LogStateEvents(EventQueue& queue, Clock::time_point now)
    : m_queue(queue), m_labels{labelOf(LogState::Kind::QUIET), labelOf(LogState::Kind::DEAD),
                               labelOf(LogState::Kind::UNPARSED)} {
    for (std::size_t kind = 0; kind < LogState::kinds; ++kind) {
        for (StoredEpisode& stored : PositionBook::current()->takeEpisodes(m_labels[kind]->name)) {
            m_episodes.emplace(Key{static_cast<LogState::Kind>(kind), std::move(stored.log)},
                               Lasting{std::make_shared<EpisodeId>(stored.id, stored.raised),
                                       stored.first, std::move(stored.node), now});
        }
    }
}

void LogStateEvents::judge(const std::vector<LogState>& states, Clock::time_point now,
                           std::int64_t wall) {
    TraceScope trace(anchor);
    for (const LogState& state : states) {
        const auto found = m_episodes.find({state.kind, state.log});
        if (found == m_episodes.end()) {
            if (state.holds == true) {
                raise(state, now, wall);
            }
            continue;
        }
        found->second.seen = now;
        if (state.holds == false) {
            resolve(found->first, found->second, wall, ends[static_cast<std::size_t>(state.kind)]);
            m_episodes.erase(found);
        }
    }
    std::erase_if(m_episodes, [&](const auto& one) {
        const bool isOver = now - one.second.seen >= longestGap;
        if (isOver) {
            resolve(one.first, one.second, wall, isNotWatched);
        }
        return isOver;
    });
}

void LogStateEvents::raise(const LogState& state, Clock::time_point now, std::int64_t wall) {
    Lasting episode{std::make_shared<EpisodeId>(), wall / second - state.since.count(),
                    AgentNode::name(), now};
    auto judgement = std::make_shared<EventJudgement>();
    judgement->state = EventJudgement::RAISED;
    judgement->episode = episode.id;
    judgement->first = episode.first;
    judgement->last = wall / second;
    judgement->text = state.text;
    judgement->log = state.log;
    judgement->node = episode.node;
    if (m_queue.push(m_labels[static_cast<std::size_t>(state.kind)], nullptr, judgement)) {
        m_episodes.emplace(Key{state.kind, state.log}, std::move(episode));
    }
}

void LogStateEvents::resolve(const Key& key, const Lasting& episode, std::int64_t wall,
                             const char* reason) {
    auto judgement = std::make_shared<EventJudgement>();
    judgement->state = EventJudgement::RESOLVED;
    judgement->episode = episode.id;
    judgement->first = episode.first;
    judgement->last = wall / second;
    judgement->reason = reason;
    judgement->log = key.log;
    judgement->node = episode.node;
    m_queue.push(m_labels[static_cast<std::size_t>(key.kind)], nullptr, judgement);
}

} // namespace zrm::host
