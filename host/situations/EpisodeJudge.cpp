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
    const bool isOver = m_rules.period == 0 || group.windows.isOver(time, m_rules.period);
    return isOver && group.episodes.empty() &&
           std::all_of(group.raised.begin(), group.raised.end(),
                       [&](std::int64_t raised) { return time - raised >= m_rules.cooldown; });
}

Group& EpisodeJudge::groupOf(const Entry& entry, std::vector<EndedEpisode>& ended) {
    if (Group* const group = m_groups.find(entry.group)) {
        return *group;
    }
    if (m_groups.isFull()) {
        Group& oldest = m_groups.oldest();
        m_dropped += isIdle(oldest, entry.time) ? 0 : 1;
        for (Episode& episode : oldest.episodes) {
            const bool isOver = episode.last + m_rules.resolveAfter <= entry.time;
            ended.push_back({std::move(episode), oldest.key, !isOver});
            --m_episodes;
        }
        m_groups.removeOldest();
    }
    return m_groups.add(entry.group);
}

/// Counts the entry. Whether the threshold, if there is one, is met.
bool EpisodeJudge::count(Group& group, const Entry& entry, Verdict& verdict) const {
    verdict.first = entry.time;
    if (m_rules.frequency == 0) {
        return true;
    }
    if (!m_rules.distinct.empty() && group.values == nullptr) {
        group.values = std::make_unique<DistinctValues>();
    }
    if (isAfterOthers(entry)) {
        verdict.count = group.windows.within(entry.time, m_rules.period).entries;
        if (!m_rules.distinct.empty()) {
            verdict.count = group.values->within(entry.time, m_rules.period);
        }
    } else {
        verdict.count = group.windows.add(entry.time, m_rules.period);
        if (!m_rules.distinct.empty()) {
            verdict.count = group.values->add(entry.time, m_rules.period, entry.distinct);
        }
    }
    const bool isMet = m_rules.isUpperBound ? verdict.count <= m_rules.frequency
                                            : verdict.count >= m_rules.frequency;
    return isMet && entry.mayRaise;
}

/// The entries that the threshold has counted, with this one.
EntryWindows::Counted EpisodeJudge::countedWith(const Group& group, const Entry& entry) const {
    if (!isAfterOthers(entry)) {
        return group.windows.counted(entry.time, m_rules.period);
    }
    EntryWindows::Counted counted = group.windows.within(entry.time, m_rules.period);
    ++counted.entries;
    return counted;
}

EpisodeJudge::Verdict EpisodeJudge::judge(const Entry& entry, std::vector<EndedEpisode>& ended) {
    Verdict verdict;
    Group& group = groupOf(entry, ended);
    ++group.entries;
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
    const auto lasting =
        std::find_if(group.episodes.begin(), group.episodes.end(), [&](const Episode& episode) {
            return entry.time < episode.last + m_rules.resolveAfter &&
                   entry.time > episode.first - m_rules.resolveAfter;
        });
    if (lasting != group.episodes.end()) {
        lasting->used = group.entries;
        verdict.share = addTo(*lasting, entry, 1, entry.time);
        verdict.episode = &*lasting;
        verdict.decision = Decision::CONTINUES;
        return;
    }
    endEarlier(group, entry, ended);
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
    episode.used = group.entries;
    episode.first = verdict.first;
    episode.last = entry.time;
    verdict.share = addTo(episode, entry, entries, verdict.first);
    verdict.episode = &episode;
    verdict.decision = Decision::RAISES;
    m_earliestLast = std::min(m_earliestLast, entry.time);
}

/// Ends what has had nothing for long enough, as far as this entry's log can say so.
void EpisodeJudge::endEarlier(Group& group, const Entry& entry, std::vector<EndedEpisode>& ended) {
    std::erase_if(group.episodes, [&](Episode& episode) {
        const bool isOver = entry.time >= episode.last + m_rules.resolveAfter &&
                            std::all_of(episode.shares.begin(), episode.shares.end(),
                                        [&](const auto& share) { return share->log == entry.log; });
        if (isOver) {
            ended.push_back({std::move(episode), group.key});
            --m_episodes;
        }
        return isOver;
    });
}

/// A new episode of the group.
Episode& EpisodeJudge::begin(Group& group, std::vector<EndedEpisode>& ended) {
    if (group.episodes.size() == mostEpisodes) {
        const auto least =
            std::min_element(group.episodes.begin(), group.episodes.end(),
                             [](const Episode& a, const Episode& b) { return a.used < b.used; });
        ended.push_back({std::move(*least), group.key, true});
        group.episodes.erase(least);
        --m_episodes;
    }
    ++m_episodes;
    return group.episodes.emplace_back();
}

/// Whether an event of the group was raised less than the cooldown before or after this time. If
/// not, one is raised now.
bool EpisodeJudge::cools(Group& group, std::int64_t time) const {
    if (m_rules.cooldown == 0) {
        return false;
    }
    for (const std::int64_t raised : group.raised) {
        if (time < raised + m_rules.cooldown && time > raised - m_rules.cooldown) {
            return true;
        }
    }
    if (group.raised.size() == mostPauses) {
        group.raised.erase(group.raised.begin());
    }
    group.raised.push_back(time);
    return false;
}

void EpisodeJudge::restore(std::string_view key, Episode episode,
                           std::vector<EndedEpisode>& ended) {
    Group& group = groupOf({.group = key}, ended);
    m_earliestLast = std::min(m_earliestLast, episode.last);
    group.episodes.push_back(std::move(episode));
    ++m_episodes;
}

void EpisodeJudge::restorePause(std::string_view key, std::int64_t raised,
                                std::vector<EndedEpisode>& ended) {
    groupOf({.group = key}, ended).raised.push_back(raised);
}

void EpisodeJudge::takeOver(const std::function<bool(Episode&)>& isOver,
                            std::vector<EndedEpisode>& ended) {
    m_earliestLast = none;
    if (m_episodes == 0) {
        return;
    }
    for (Group& group : m_groups.all()) {
        std::erase_if(group.episodes, [&](Episode& episode) {
            if (!isOver(episode)) {
                m_earliestLast = std::min(m_earliestLast, episode.last);
                return false;
            }
            ended.push_back({std::move(episode), group.key});
            --m_episodes;
            return true;
        });
    }
}

} // namespace zrm::host
