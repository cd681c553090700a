#include "host/situations/EpisodeJudge.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

namespace {

/// Adds an entry to the share of its log, which is made if there is none.
std::shared_ptr<GrowingShare> addTo(Episode& episode, const EpisodeJudge::Entry& entry,
                                    std::uint64_t entries, std::int64_t first) {
    auto found = std::find_if(episode.shares.begin(), episode.shares.end(),
                              [&](const auto& share) { return share->log == entry.log; });
    if (found == episode.shares.end()) {
        episode.shares.push_back(std::make_shared<GrowingShare>(
            EpisodeShare{episode.id, std::string(entry.log), 0, first, entry.time}));
        found = std::prev(episode.shares.end());
    }
    EpisodeShare& share = **found;
    share.count += entries;
    share.first = std::min(share.first, first);
    share.last = std::max(share.last, entry.time);
    episode.count += entries;
    episode.first = std::min(episode.first, first);
    episode.last = std::max(episode.last, entry.time);
    episode.cap = 0;
    return *found;
}

} // namespace

EpisodeJudge::EpisodeJudge(JudgementConfig rules)
    : m_rules(std::move(rules)), m_groups(m_rules.groupBy.empty() ? 1 : m_rules.maxGroups) {}

/// Whether the group counts nothing that an entry of this time could add to.
bool EpisodeJudge::isIdle(const Group& group, std::int64_t time) const {
    const bool isOver = m_rules.period == 0 || group.windows().isOver(time, m_rules.period);
    const Group::Extra* const extra = group.extra();
    return isOver &&
           (extra == nullptr ||
            (extra->episodes.empty() &&
             std::all_of(extra->events.begin(), extra->events.end(),
                         [&](std::int64_t event) { return time - event >= m_rules.cooldown; })));
}

Group& EpisodeJudge::groupOf(const Entry& entry, std::vector<EndedEpisode>& ended) {
    if (Group* const group = m_groups.find(entry.group)) {
        return *group;
    }
    if (m_groups.isFull()) {
        Group& oldest = m_groups.oldest();
        m_dropped += isIdle(oldest, entry.time) ? 0 : 1;
        if (Group::Extra* const extra = oldest.extra()) {
            for (Episode& episode : extra->episodes) {
                const bool isOver = episode.last + m_rules.resolveAfter <= entry.time;
                end(oldest, episode, ended, !isOver);
            }
        }
    }
    return m_groups.add(entry.group);
}

/// Counts the entry. Whether the threshold, if there is one, is met.
bool EpisodeJudge::count(Group& group, const Entry& entry, Verdict& verdict) const {
    verdict.first = entry.time;
    if (m_rules.frequency == 0) {
        return true;
    }
    DistinctValues* const values = m_rules.distinct.empty() ? nullptr : &group.makeExtra().values;
    if (isAfterOthers(entry)) {
        verdict.count = group.windows().within(entry.time, m_rules.period).entries;
        if (values != nullptr) {
            verdict.count = values->within(entry.time, m_rules.period);
        }
    } else {
        verdict.count = group.windows().add(entry.time, m_rules.period);
        if (values != nullptr) {
            verdict.count = values->add(entry.time, m_rules.period, entry.distinct);
        }
    }
    const bool isMet = m_rules.isUpperBound ? verdict.count <= m_rules.frequency
                                            : verdict.count >= m_rules.frequency;
    return isMet && entry.mayRaise;
}

/// The entries that the threshold has counted, with this one.
EntryWindows::Counted EpisodeJudge::countedWith(const Group& group, const Entry& entry) const {
    if (!isAfterOthers(entry)) {
        return group.windows().counted(entry.time, m_rules.period);
    }
    EntryWindows::Counted counted = group.windows().within(entry.time, m_rules.period);
    ++counted.entries;
    return counted;
}

EpisodeJudge::Verdict EpisodeJudge::judge(const Entry& entry, std::vector<EndedEpisode>& ended) {
    Verdict verdict;
    Group& group = groupOf(entry, ended);
    ++m_entries;
    const bool isMet = count(group, entry, verdict);
    if (m_rules.resolveAfter > 0) {
        judgeEpisode(group, entry, isMet, verdict, ended);
    } else if (isMet && !cools(group, entry.time)) {
        verdict.decision = Decision::RAISES;
        if (verdict.count > 0) {
            verdict.first = countedWith(group, entry).first;
        }
    }
    return verdict;
}

void EpisodeJudge::recount(const Entry& entry) {
    std::vector<EndedEpisode> ended;
    // A full table takes no further groups: which ones the earlier run had is not known.
    if (m_groups.find(entry.group) != nullptr || !m_groups.isFull()) {
        Verdict verdict;
        count(groupOf(entry, ended), entry, verdict);
    }
}

void EpisodeJudge::judgeEpisode(Group& group, const Entry& entry, bool isMet, Verdict& verdict,
                                std::vector<EndedEpisode>& ended) {
    if (group.extra() != nullptr) {
        if (Episode* const lasting = lastingAt(*group.extra(), entry.time)) {
            lasting->used = m_entries;
            verdict.share = addTo(*lasting, entry, 1, entry.time);
            verdict.episode = lasting;
            verdict.decision = Decision::CONTINUES;
            return;
        }
        endEarlier(group, entry, ended);
    }
    if (!isMet) {
        return;
    }
    std::uint64_t entries = 1;
    if (m_rules.frequency > 0) {
        const auto counted = countedWith(group, entry);
        entries = static_cast<std::uint64_t>(counted.entries);
        verdict.first = counted.first;
    }
    Episode& episode = begin(group, ended);
    episode.used = m_entries;
    episode.first = verdict.first;
    episode.last = entry.time;
    verdict.share = addTo(episode, entry, entries, verdict.first);
    verdict.episode = &episode;
    verdict.decision = Decision::RAISES;
    m_earliestLast = std::min(m_earliestLast, entry.time);
}

/// The episode that an entry of this time belongs to; null if there is none.
Episode* EpisodeJudge::lastingAt(Group::Extra& extra, std::int64_t time) const {
    const auto found =
        std::find_if(extra.episodes.begin(), extra.episodes.end(), [&](const Episode& episode) {
            return time < episode.last + m_rules.resolveAfter &&
                   time > episode.first - m_rules.resolveAfter;
        });
    return found == extra.episodes.end() ? nullptr : &*found;
}

/// Gives away an episode, which its group then forgets.
void EpisodeJudge::end(const Group& group, Episode& episode, std::vector<EndedEpisode>& ended,
                       bool isDropped) {
    ended.push_back({std::move(episode), std::string(group.key()), isDropped});
    --m_episodes;
}

/// Ends what has had nothing for long enough, as far as this entry's log can say so. Only if the
/// group has raised something.
void EpisodeJudge::endEarlier(Group& group, const Entry& entry, std::vector<EndedEpisode>& ended) {
    std::erase_if(group.extra()->episodes, [&](Episode& episode) {
        const bool isOver = entry.time >= episode.last + m_rules.resolveAfter &&
                            std::all_of(episode.shares.begin(), episode.shares.end(),
                                        [&](const auto& share) { return share->log == entry.log; });
        if (isOver) {
            end(group, episode, ended);
        }
        return isOver;
    });
}

/// A new episode of the group.
Episode& EpisodeJudge::begin(Group& group, std::vector<EndedEpisode>& ended) {
    std::vector<Episode>& episodes = group.makeExtra().episodes;
    if (episodes.size() == mostEpisodes) {
        const auto least =
            std::min_element(episodes.begin(), episodes.end(),
                             [](const Episode& a, const Episode& b) { return a.used < b.used; });
        end(group, *least, ended, true);
        episodes.erase(least);
    }
    ++m_episodes;
    return episodes.emplace_back();
}

/// Whether an event of the group was raised less than the cooldown before or after this time. If
/// not, one is raised now.
bool EpisodeJudge::cools(Group& group, std::int64_t time) const {
    if (m_rules.cooldown == 0) {
        return false;
    }
    std::vector<std::int64_t>& events = group.makeExtra().events;
    for (const std::int64_t raised : events) {
        if (time < raised + m_rules.cooldown && time > raised - m_rules.cooldown) {
            return true;
        }
    }
    if (events.size() == mostPauses) {
        events.erase(events.begin());
    }
    events.push_back(time);
    return false;
}

void EpisodeJudge::restore(std::string_view key, Episode episode,
                           std::vector<EndedEpisode>& ended) {
    Group& group = groupOf({.group = key}, ended);
    m_earliestLast = std::min(m_earliestLast, episode.last);
    group.makeExtra().episodes.push_back(std::move(episode));
    ++m_episodes;
}

void EpisodeJudge::restorePause(std::string_view key, std::int64_t raised,
                                std::vector<EndedEpisode>& ended) {
    groupOf({.group = key}, ended).makeExtra().events.push_back(raised);
}

void EpisodeJudge::takeOver(const std::function<bool(Episode&)>& isOver,
                            std::vector<EndedEpisode>& ended) {
    m_earliestLast = none;
    if (m_episodes == 0) {
        return;
    }
    m_groups.visitAll([&](Group& group) {
        if (group.extra() == nullptr) {
            return;
        }
        std::erase_if(group.extra()->episodes, [&](Episode& episode) {
            if (!isOver(episode)) {
                m_earliestLast = std::min(m_earliestLast, episode.last);
                return false;
            }
            end(group, episode, ended);
            return true;
        });
    });
}

} // namespace zrm::host
