#include "host/situations/EpisodeJudge.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <map>
#include <random>
#include <set>
#include <string>
#include <tuple>
#include <vector>

using namespace zrm::host;

namespace {

using Decision = EpisodeJudge::Decision;
using Entry = EpisodeJudge::Entry;

struct PlainEpisode {
    std::int64_t first;
    std::int64_t last;
    std::vector<std::pair<std::string, std::int64_t>> entries; ///< log and time
    std::size_t used;

    auto summary(const std::string& group) const {
        return std::tuple(group, first, last, entries.size());
    }
};
using Summary = std::tuple<std::string, std::int64_t, std::int64_t, std::size_t>;

/// The same by plain lists. How thresholds count is held by the model of EntryWindows.
class PlainJudge {
public:
    explicit PlainJudge(JudgementConfig rules) : m_rules(std::move(rules)) {}

    Decision judge(const Entry& entry) {
        const std::string group(entry.group);
        auto& times = m_times[group];
        const bool isAfterOthers = !m_rules.then.empty() && entry.mayRaise;
        if (!isAfterOthers) {
            times.emplace_back(entry.time, std::string(entry.distinct));
        }
        ++m_step;
        const std::int64_t newest = std::max(
            entry.time,
            times.empty() ? entry.time : std::max_element(times.begin(), times.end())->first);
        auto [count, first] = countIn(m_windows[group], entry, isAfterOthers);
        counted = m_rules.frequency == 0     ? 0
                  : m_rules.distinct.empty() ? count
                                             : different(times, newest);
        const bool isMet =
            m_rules.frequency == 0 ||
            (entry.mayRaise &&
             (m_rules.isUpperBound ? counted <= m_rules.frequency : counted >= m_rules.frequency));
        if (m_rules.resolveAfter == 0) {
            return isMet && !cools(group, entry.time) ? Decision::RAISES : Decision::NONE;
        }
        for (PlainEpisode& episode : m_open[group]) {
            if (entry.time < episode.last + m_rules.resolveAfter &&
                entry.time > episode.first - m_rules.resolveAfter) {
                episode.entries.emplace_back(entry.log, entry.time);
                episode.first = std::min(episode.first, entry.time);
                episode.last = std::max(episode.last, entry.time);
                episode.used = m_step;
                return Decision::CONTINUES;
            }
        }
        std::erase_if(m_open[group], [&](const PlainEpisode& episode) {
            const bool isOver =
                episode.last + m_rules.resolveAfter <= entry.time &&
                std::all_of(episode.entries.begin(), episode.entries.end(),
                            [&](const auto& one) { return one.first == entry.log; });
            if (isOver) {
                ended.insert(episode.summary(group));
            }
            return isOver;
        });
        if (!isMet) {
            return Decision::NONE;
        }
        const auto entries = m_rules.frequency == 0
                                 ? std::size_t{1}
                                 : static_cast<std::size_t>(count) + (isAfterOthers ? 1 : 0);
        if (m_open[group].size() == EpisodeJudge::mostEpisodes) {
            const auto least =
                std::min_element(m_open[group].begin(), m_open[group].end(),
                                 [](const auto& a, const auto& b) { return a.used < b.used; });
            ended.insert(least->summary(group));
            m_open[group].erase(least);
        }
        m_open[group].push_back({m_rules.frequency == 0 ? entry.time : first, entry.time,
                                 std::vector<std::pair<std::string, std::int64_t>>(
                                     entries, {std::string(entry.log), 0}),
                                 m_step});
        return Decision::RAISES;
    }

    std::multiset<Summary> open() const {
        std::multiset<Summary> all;
        for (const auto& [group, episodes] : m_open) {
            for (const PlainEpisode& episode : episodes) {
                all.insert(episode.summary(group));
            }
        }
        return all;
    }

    std::multiset<Summary> ended;
    std::int64_t counted = 0;

private:
    using Times = std::vector<std::pair<std::int64_t, std::string>>;

    /// How many entries there are, and the time of the first.
    std::pair<std::int64_t, std::int64_t> countIn(zrm::EntryWindows& windows, const Entry& entry,
                                                  bool isAfterOthers) const {
        if (m_rules.frequency == 0) {
            return {0, entry.time};
        }
        if (isAfterOthers) {
            const auto others = windows.within(entry.time, m_rules.period);
            return {others.entries, others.first};
        }
        const std::int64_t count = windows.add(entry.time, m_rules.period);
        return {count, windows.counted(entry.time, m_rules.period).first};
    }
    std::int64_t different(const Times& times, std::int64_t end) const {
        std::set<std::string> values;
        for (const auto& [time, value] : times) {
            if (time > end - m_rules.period && time <= end) {
                values.insert(value);
            }
        }
        return static_cast<std::int64_t>(values.size());
    }
    bool cools(const std::string& group, std::int64_t time) {
        auto& raised = m_raised[group];
        if (m_rules.cooldown > 0 && std::any_of(raised.begin(), raised.end(), [&](auto one) {
                return std::abs(one - time) < m_rules.cooldown;
            })) {
            return true;
        }
        if (raised.size() == EpisodeJudge::mostPauses) {
            raised.erase(raised.begin());
        }
        raised.push_back(time);
        return false;
    }

    const JudgementConfig m_rules;
    std::map<std::string, Times> m_times;
    std::map<std::string, zrm::EntryWindows> m_windows;
    std::map<std::string, std::vector<PlainEpisode>> m_open;
    std::map<std::string, std::vector<std::int64_t>> m_raised;
    std::size_t m_step = 0;
};

JudgementConfig randomRules(std::mt19937& random) {
    JudgementConfig rules;
    if (random() % 4 != 0) {
        rules.groupBy = {"ip"};
    }
    if (random() % 3 != 0) {
        rules.frequency = 1 + static_cast<std::int64_t>(random() % 6);
        rules.period = std::vector<std::int64_t>{5, 60, 600}[random() % 3];
        rules.isUpperBound = random() % 5 == 0;
        rules.distinct = random() % 4 == 0 ? "user" : "";
        rules.then = random() % 3 == 0 ? "result=good" : "";
    }
    switch (random() % 3) {
    case 0:
        rules.resolveAfter = std::vector<std::int64_t>{1, 30, 900}[random() % 3];
        break;
    case 1:
        rules.cooldown = std::vector<std::int64_t>{1, 30, 900}[random() % 3];
        break;
    default:
        break;
    }
    return rules;
}

void compareEntries(std::mt19937& random, int entries) {
    const JudgementConfig rules = randomRules(random);
    EpisodeJudge judge(rules);
    PlainJudge plain(rules);
    std::vector<EndedEpisode> ended;
    std::multiset<Summary> found;
    std::int64_t now = 1'800'000'000;
    const auto below = [&random](std::int64_t limit) {
        return static_cast<std::int64_t>(random() % static_cast<std::uint64_t>(limit));
    };
    // Late by less than a period, so that no group's values fall apart.
    const std::int64_t latest = rules.frequency > 0 ? rules.period : 2000;
    std::map<std::string, std::int64_t> newest;
    for (int number = 0; number < entries && !testing::Test::HasFailure(); ++number) {
        now += random() % 10 == 0 ? below(2000) : below(4);
        const std::string group = rules.groupBy.empty() ? "" : std::to_string(random() % 5);
        const std::string user = std::to_string(random() % 4);
        const std::string log = random() % 4 == 0 ? "/b" : "/a";
        std::int64_t time = random() % 5 == 0 ? now - below(latest) : now;
        auto& of = newest[group];
        time = std::max(time, of - latest + 1);
        of = std::max(of, time);
        const bool mayRaise = rules.then.empty() || random() % 4 == 0;
        const Entry entry{time, group, user, log, mayRaise};
        const EpisodeJudge::Verdict verdict = judge.judge(entry, ended);
        ASSERT_EQ(static_cast<int>(verdict.decision), static_cast<int>(plain.judge(entry)))
            << "entry " << number;
        ASSERT_EQ(verdict.count, plain.counted) << "entry " << number;
    }
    for (const EndedEpisode& one : ended) {
        found.emplace(one.group, one.episode.first, one.episode.last, one.episode.count);
    }
    EXPECT_EQ(found, plain.ended);
    ended.clear();
    found.clear();
    const std::size_t open = judge.episodes();
    judge.takeOver([](const Episode&) { return true; }, ended);
    EXPECT_EQ(ended.size(), open);
    for (const EndedEpisode& one : ended) {
        found.emplace(one.group, one.episode.first, one.episode.last, one.episode.count);
        std::uint64_t ofLogs = 0;
        for (const auto& share : one.episode.shares) {
            ofLogs += share->count;
        }
        EXPECT_EQ(ofLogs, one.episode.count) << "the logs' shares are the whole";
    }
    EXPECT_EQ(found, plain.open());
}

TEST(EpisodeModel, AgreesWithPlainLists) {
    const char* const given = std::getenv("ZRM_TEST_SEED");
    const unsigned first =
        given != nullptr ? static_cast<unsigned>(std::atol(given)) : std::random_device{}();
    const unsigned seeds = given != nullptr ? 1 : 3000;
    for (unsigned seed = first; seed != first + seeds && !HasFailure(); ++seed) {
        SCOPED_TRACE("ZRM_TEST_SEED=" + std::to_string(seed));
        std::mt19937 random(seed);
        compareEntries(random, 120);
    }
}

} // namespace
