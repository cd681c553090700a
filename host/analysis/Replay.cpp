#include "host/analysis/Replay.h"

#include "base/TraceScope.h"
#include "framework/LogEntry.h"
#include "host/events/RowText.h"
#include "host/framework/Request.h"
#include "host/situations/GroupKey.h"
#include "logs/EntryClock.h"
#include "tables/Timestamp.h"
#include "tables/zrm_rmlogent_agent.h"

#include <algorithm>
#include <cstring>
#include <new>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"Replay.cpp"};

/// Never called: nothing is dispatched.
class NoReceiver : public RowReceiver {
public:
    unsigned receive(const ctreq&, const char*, unsigned) override { return 0; }
    void stopped(const ctreq&, unsigned) override {}
};

/// A 16-character local time in seconds since 1970; none if it is not a time.
std::optional<std::int64_t> localTime(const char* entryTime) {
    Timestamp* chain = nullptr;
    const Timestamp time(&chain, entryTime);
    return time.eventTime() < 0 ? std::nullopt : std::optional(time.eventTime());
}

} // namespace

struct Replay::Surroundings {
    explicit Surroundings(const SituationConfig& situation) {
        detail.name = situation.name;
        detail.sampleType = SAMPLE_SITUATION;
        detail.conditions = situation.conditions;
    }

    RequestDetail detail;
    NoReceiver receiver;
    ContextInfo context{receiver};
};

class Replay::Request : public zrm_rmlogent_agent {
public:
    using zrm_rmlogent_agent::zrm_rmlogent_agent;

    unsigned InsertRow(char* row) override {
        matched = true;
        return isCounting ? zrm_rmlogent_agent::InsertRow(row) : 0;
    }
    const _RequestThresholds& inForce() const noexcept { return thresholdsInForce(); }

    bool isCounting = false;
    bool matched = false;
    std::optional<long> frequency;

protected:
    long countEvents(Timestamp& newest, long period) override {
        frequency = newest.countEvents(period, newest.eventTime());
        return *frequency;
    }
    long countFollowed(std::int64_t instant) override {
        frequency = zrm_rmlogent_agent::countFollowed(instant);
        return *frequency;
    }
};

Replay::Replay(const SituationConfig& situation, TableManager& entries)
    : m_rules(situation.judgement), m_surroundings(std::make_unique<Surroundings>(situation)) {
    TraceScope trace(anchor);
    if (m_rules.isUsed()) {
        m_values.emplace(situation);
        if (isOfAbsence()) {
            m_absence.emplace(m_rules.absent, m_rules.groupBy.empty() ? 1 : m_rules.maxGroups);
        } else {
            m_judge.emplace(m_rules);
        }
    }
    m_request.reset(new (std::nothrow)
                        Request(&m_surroundings->detail, &m_surroundings->context, &entries));
    if (m_request != nullptr && m_request->handle() == 0) {
        m_request.reset(); // the limit of requests is reached
    }
    if (m_request != nullptr) {
        m_request->TakeSampleConstructor();
        m_layout.emplace(*m_request);
    }
}

Replay::~Replay() = default;

bool Replay::hasThresholds() const noexcept {
    return frequency() != 0 && periodSeconds() != 0;
}

std::int64_t Replay::frequency() const noexcept {
    return isJudged() ? (m_rules.isUpperBound ? -m_rules.frequency : m_rules.frequency)
                      : m_request->inForce().freqThreshold;
}

std::int64_t Replay::periodSeconds() const noexcept {
    return isJudged() ? m_rules.period : m_request->inForce().periodThreshold;
}

bool Replay::matches(zrm_rmlogent_data_t& row) {
    m_request->isCounting = false;
    m_request->matched = false;
    m_request->AddData(&row, 1);
    return m_request->matched;
}

Replay::Verdict Replay::judge(zrm_rmlogent_data_t& row) {
    if (isJudged()) {
        return matches(row) ? count(row.entrytime, valuesOf(row)) : Verdict();
    }
    m_request->isCounting = true;
    m_request->matched = false;
    m_request->frequency.reset();
    m_request->AddData(&row, 1);
    return take();
}

Replay::Verdict Replay::count(const char* entryTime, const Values& values) {
    if (isJudged()) {
        Verdict verdict{true, false, std::nullopt};
        const auto& instant = EntryInstant::ofThisThread();
        const auto time = instant ? instant : localTime(entryTime);
        if (time && isOfAbsence()) {
            judgeAbsence(*time, values, verdict);
        } else if (time) {
            judgeGroup(*time, values, verdict);
        }
        return verdict;
    }
    zrm_rmlogent_data_t row{};
    std::memcpy(row.entrytime, entryTime, sizeof row.entrytime);
    m_request->isCounting = true;
    m_request->frequency.reset();
    m_request->InsertRow(reinterpret_cast<char*>(&row));
    return take();
}

Replay::Verdict Replay::take() {
    const Verdict verdict{m_request->matched, m_request->count > 0, m_request->frequency};
    m_request->count = 0;
    return verdict;
}

void Replay::judgeGroup(std::int64_t time, const Values& values, Verdict& verdict) {
    using enum EpisodeJudge::Decision;
    const EpisodeJudge::Verdict found =
        m_judge->judge({time, values.group, values.distinct, values.log, values.mayRaise}, m_ended);
    verdict.isRaised = found.decision == RAISES;
    if (hasThresholds()) {
        verdict.frequency = static_cast<long>(found.count);
    }
    Judged& judged = verdict.judged.emplace();
    judged.decision = found.decision;
    judged.mayRaise = values.mayRaise;
    judged.group = groupValues(values.group);
    if (found.episode != nullptr) {
        judged.hasEpisode = true;
        judged.first = found.episode->first;
        judged.count = found.episode->count;
    }
}

void Replay::judgeAbsence(std::int64_t time, const Values& values, Verdict& verdict) {
    m_newest = std::max(m_newest, time); // what comes late still shows that something comes
    endAt(m_newest);
    std::vector<AbsenceJudge::Group> dropped;
    AbsenceJudge::Group& group = m_absence->came(values.group, m_newest, dropped);
    Judged& judged = verdict.judged.emplace();
    judged.group = groupValues(values.group);
    if (std::exchange(group.absence, nullptr) != nullptr) {
        judged.absence = m_newest - group.since;
        endAbsence(group, m_newest);
    }
    group.since = m_newest;
    for (const AbsenceJudge::Group& one : dropped) {
        if (one.absence != nullptr) {
            endAbsence(one, m_newest);
        }
    }
}

void Replay::endAbsence(const AbsenceJudge::Group& group, std::int64_t time) {
    EndedEpisode& ended = m_ended.emplace_back();
    ended.episode.first = group.since;
    ended.episode.last = time;
    ended.group = group.key;
}

void Replay::beginAt(std::int64_t time) {
    m_newest = time;
    if (m_rules.groupBy.empty()) {
        std::vector<AbsenceJudge::Group> dropped;
        m_absence->expect({.key = "", .seen = time, .since = time}, dropped);
    }
}

void Replay::endAt(std::int64_t time) {
    while (AbsenceJudge::Group* const group = m_absence->takeDue(time)) {
        group->absence = std::make_shared<EpisodeId>();
        m_raised.push_back({group->since, group->since + m_rules.absent});
    }
    m_newest = std::max(m_newest, time);
}

std::vector<FoundAbsence> Replay::takeRaised() {
    return std::exchange(m_raised, {});
}

std::optional<std::int64_t> Replay::timeOf(const std::string& stamp) {
    return localTime(stamp.c_str());
}

Replay::Values Replay::valuesOf(const zrm_rmlogent_data_t& row) {
    const char* const bytes = reinterpret_cast<const char*>(&row);
    m_values->read(layout(), bytes, LogEntry::ofThisThread);
    return {m_values->group(), m_values->distinct(), LogPath::of(layout(), bytes),
            m_values->mayRaise()};
}

std::vector<GroupValue> Replay::groupValues(std::string_view key) const {
    return GroupKey::values(key, m_rules.groupBy);
}

std::vector<EndedEpisode> Replay::takeEnded() {
    return std::exchange(m_ended, {});
}

std::vector<EndedEpisode> Replay::takeLasting() {
    if (m_absence) {
        for (const AbsenceJudge::Group& group : m_absence->absent()) {
            endAbsence(group, m_newest);
        }
        return takeEnded();
    }
    m_judge->takeOver([](const Episode&) { return true; }, m_ended);
    return takeEnded();
}

} // namespace zrm::host
