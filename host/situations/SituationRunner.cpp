#include "host/situations/SituationRunner.h"

#include "base/TraceScope.h"
#include "host/base/TimeText.h"
#include "host/events/PositionBook.h"
#include "host/situations/LiveJudge.h"

#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"SituationRunner.cpp"};

/// How often episodes are looked at.
constexpr std::chrono::milliseconds tickInterval{200};

/// After the start; until then situations that continue with their episodes may still be opened.
constexpr std::int64_t timeUntilOpen = 10'000; // milliseconds

constexpr const char* isStopped = "the situation was stopped or removed";
constexpr const char* isChanged = "the situation was changed";
constexpr const char* wasRemoved =
    "the situation was stopped or removed while the agent was not running";

} // namespace

SituationRunner::SituationRunner(TableManager& entries, EventQueue& queue)
    : m_entries(entries), m_queue(queue), m_begin(WallClock::now()), m_thread([this] { work(); }) {}

SituationRunner::~SituationRunner() {
    close();
}

void SituationRunner::start(const std::string& key, SituationConfig config,
                            std::shared_ptr<SituationCounts> counts) {
    const std::lock_guard guard(m_mutex);
    if (m_ends) {
        return;
    }
    Slot& slot = m_slots[key];
    slot.config = std::move(config);
    slot.counts = std::move(counts);
    slot.asked = ++m_starts;
    enqueue(key, slot);
}

void SituationRunner::stop(const std::string& key) {
    const std::lock_guard guard(m_mutex);
    const auto found = m_slots.find(key);
    if (found != m_slots.end()) {
        found->second.counts.reset();
        enqueue(key, found->second);
    }
}

void SituationRunner::enqueue(const std::string& key, Slot& slot) {
    if (slot.situation != nullptr) {
        slot.situation->silence();
    }
    m_pending.push_back(key);
    m_changed.notify_one();
}

bool SituationRunner::settle(std::chrono::milliseconds limit) {
    std::unique_lock lock(m_mutex);
    return m_settled.wait_for(lock, limit, [&] { return m_pending.empty() && !m_isWorking; });
}

SituationRunner::State SituationRunner::state(const std::string& key) const {
    const std::lock_guard guard(m_mutex);
    const auto found = m_slots.find(key);
    if (found == m_slots.end() || found->second.counts == nullptr) {
        return State::ABSENT;
    }
    const Slot& slot = found->second;
    if (slot.situation == nullptr || slot.running != slot.asked) {
        return State::OPENING;
    }
    if (!slot.situation->isOpen()) {
        return State::REFUSED;
    }
    return slot.situation->stopReason() != 0 ? State::ENDED : State::OPEN;
}

void SituationRunner::close() {
    TraceScope trace(anchor);
    const std::lock_guard closing(m_closing);
    {
        const std::lock_guard guard(m_mutex);
        m_ends = true;
        for (auto& [key, slot] : m_slots) {
            slot.counts.reset();
            enqueue(key, slot);
        }
        m_changed.notify_one();
    }
    if (m_thread.joinable()) {
        m_thread.join();
    }
}

void SituationRunner::work() {
    TraceScope trace(anchor);
    std::unique_lock lock(m_mutex);
    for (;;) {
        m_changed.wait_for(lock, tickInterval, [&] { return !m_pending.empty() || m_ends; });
        if (m_pending.empty()) {
            if (m_ends) {
                return;
            }
            tick();
            continue;
        }
        const std::string key = std::move(m_pending.front());
        m_pending.pop_front();
        m_isWorking = true;
        bringToState(lock, key);
        m_isWorking = false;
        if (m_pending.empty()) {
            m_settled.notify_all();
        }
    }
}

/// Raises and resolves what is due.
void SituationRunner::tick() {
    const std::int64_t now = WallClock::now();
    for (const auto& [key, slot] : m_slots) {
        if (slot.situation != nullptr) {
            slot.situation->tick(now);
        }
    }
    if (m_hasLeftEpisodes && now >= m_begin + timeUntilOpen) {
        for (const StoredEpisode& episode : PositionBook::current()->takeEpisodes(std::nullopt)) {
            LiveJudge::resolve(m_queue, episode, wasRemoved);
        }
        PositionBook::current()->expected().forgetLeft();
        m_hasLeftEpisodes = false;
    }
}

JudgeCounts SituationRunner::judgeCounts() const {
    JudgeCounts all;
    const std::lock_guard guard(m_mutex);
    all.droppedGroups = m_droppedGroups;
    for (const auto& [key, slot] : m_slots) {
        if (slot.situation != nullptr) {
            const JudgeCounts one = slot.situation->judgeCounts();
            all.episodes += one.episodes;
            all.groups += one.groups;
            all.droppedGroups += one.droppedGroups;
        }
    }
    return all;
}

/// Opens or closes with the lock released. Slots are removed only here, so the slot stays valid.
void SituationRunner::bringToState(std::unique_lock<std::mutex>& lock, const std::string& key) {
    TraceScope trace(anchor);
    const auto found = m_slots.find(key);
    if (found == m_slots.end()) {
        return;
    }
    Slot& slot = found->second;
    if (slot.situation != nullptr && (slot.counts == nullptr || slot.running != slot.asked)) {
        std::unique_ptr<Situation> ending = std::move(slot.situation);
        const char* const reason = slot.counts == nullptr ? isStopped : isChanged;
        m_droppedGroups += ending->judgeCounts().droppedGroups;
        const bool isEnd = m_ends; // the next run continues with the episodes
        lock.unlock();
        trace.detail()("Closing situation %s.", ending->name().c_str());
        ending->close();
        if (!isEnd) {
            ending->resolveAll(reason);
        }
        ending.reset();
        lock.lock();
    }
    if (slot.counts == nullptr) {
        m_slots.erase(found);
    } else if (slot.situation == nullptr) {
        const std::uint64_t asked = slot.asked;
        SituationConfig config = slot.config;
        std::shared_ptr<SituationCounts> counts = slot.counts;
        lock.unlock();
        trace.detail()("Opening situation %s.", config.name.c_str());
        auto situation =
            std::make_unique<Situation>(std::move(config), m_entries, m_queue, std::move(counts));
        lock.lock();
        slot.situation = std::move(situation);
        slot.running = asked;
        if (slot.counts == nullptr || slot.asked != asked) {
            slot.situation->silence(); // changed meanwhile and pending again
        }
    }
}

} // namespace zrm::host
