#include "host/silences/Silencer.h"

#include "host/base/TimeText.h"
#include "host/events/Episode.h"
#include "host/events/Event.h"
#include "host/silences/Silences.h"

#include <algorithm>

namespace zrm::host {

namespace {

/// Candidates that are remembered for all kinds of events together.
constexpr std::size_t mostRemembered = 100'000;

/// An empty pattern matches everything.
bool isMatch(const Wildcard& pattern, std::string_view text) {
    return pattern.pattern().empty() || pattern.matches(text);
}

} // namespace

Silencer::Active::Active(const Silence& silence)
    : id(silence.id), end(silence.end()), situation(silence.match.situation),
      log(silence.match.log, Wildcard::Kind::PATH), severity(silence.match.severity),
      node(silence.match.node) {
    for (const auto& [name, value] : silence.match.group) {
        group.emplace_back(name, Wildcard(value));
    }
}

Silencer::Silencer(const Silences& silences, std::string node, Stored stored)
    : m_silences(silences), m_node(std::move(node)), m_stored(std::move(stored)) {}

bool Silencer::isOfThisNode(const Wildcard& pattern) const {
    return isMatch(pattern, m_node) || pattern.matches(m_node.substr(0, m_node.find(':')));
}

void Silencer::refresh() {
    m_version = m_silences.version(); // first: what changes now is seen with the next event
    m_candidates.clear();
    m_remembered = 0;
    m_active.clear();
    m_end = 0;
    for (const Silence& silence : m_silences.active(WallClock::now())) {
        Active active(silence);
        if (isOfThisNode(active.node)) {
            m_end = std::max(m_end, active.end);
            m_active.push_back(std::move(active));
        }
    }
}

const Silencer::Candidates& Silencer::candidates(const SilenceSubject& event) {
    m_key.assign(event.situation).append(1, '\0').append(event.severity);
    m_key.append(1, '\0').append(event.log);
    if (const auto known = m_candidates.find(m_key); known != m_candidates.end()) {
        return known->second;
    }
    Candidates found;
    for (const Active& active : m_active) {
        if (isMatch(active.severity, event.severity) &&
            isMatch(active.situation, event.situation) && isMatch(active.log, event.log)) {
            found.push_back(&active);
        }
    }
    if (m_remembered > mostRemembered) {
        m_candidates.clear();
        m_remembered = 0;
    }
    m_remembered += found.size() + 1;
    return m_candidates.emplace(m_key, std::move(found)).first->second;
}

bool Silencer::isOfGroup(const Active& silence, const SilenceSubject& event) {
    return std::all_of(silence.group.begin(), silence.group.end(), [&](const auto& wanted) {
        return std::any_of(event.group.begin(), event.group.end(), [&](const auto& given) {
            return given.name == wanted.first && wanted.second.matches(given.value);
        });
    });
}

std::uint64_t Silencer::of(const Event& event, std::string_view log) {
    if (event.judgement == nullptr) {
        return find({event.situation->name, event.situation->severity, log, {}, event.raised});
    }
    const EventJudgement& judgement = *event.judgement;
    if (judgement.state == EventJudgement::RESOLVED) {
        return ofBeginning(judgement.episode->value());
    }
    const std::uint64_t silence = find(
        {event.situation->name, event.situation->severity, log, judgement.group, event.raised});
    if (silence != 0 && judgement.state == EventJudgement::RAISED) {
        m_episodes[event.id] = silence;
    }
    return silence;
}

/// The silence of the event that began an episode, perhaps in an earlier run: its id is that
/// event's.
std::uint64_t Silencer::ofBeginning(std::uint64_t episode) {
    if (const auto begun = m_episodes.extract(episode); !begun.empty()) {
        return begun.mapped();
    }
    return m_stored ? m_stored(episode) : 0;
}

std::uint64_t Silencer::find(const SilenceSubject& event) {
    if (m_version != m_silences.version()) {
        refresh();
    }
    if (event.raised >= m_end) {
        return 0;
    }
    for (const Active* const silence : candidates(event)) {
        if (event.raised < silence->end && isOfGroup(*silence, event)) {
            return silence->id;
        }
    }
    return 0;
}

} // namespace zrm::host
