#include "monitor/FollowLedger.h"

#include "base/LockGuard.h"
#include "base/WallTime.h"

#include <algorithm>
#include <utility>

namespace zrm {

void FollowLedger::noteFailure(const char* call, int number, const std::string& file) {
    const LockGuard guard(&m_lock);
    m_failure = Failure{call, number, m_failure ? m_failure->since : wallTime(), file};
}

void FollowLedger::noteProblem(std::string text) {
    const LockGuard guard(&m_lock);
    m_failure = Failure{"", 0, m_failure ? m_failure->since : wallTime(), "", std::move(text)};
}

void FollowLedger::clearFailure() {
    const LockGuard guard(&m_lock);
    m_failure.reset();
}

std::optional<FollowLedger::Failure> FollowLedger::failure() const {
    const LockGuard guard(&m_lock);
    return m_failure;
}

void FollowLedger::noteGeneration(const FileIdentity& identity, const std::string& path) {
    m_count.fetch_add(1, std::memory_order_relaxed);
    const LockGuard guard(&m_lock);
    m_generation = Generation{identity, path};
}

std::optional<FollowLedger::Generation> FollowLedger::generation() const {
    const LockGuard guard(&m_lock);
    return m_generation;
}

void FollowLedger::notePosition(std::int64_t offset, std::int64_t behind) noexcept {
    m_offset.store(offset, std::memory_order_relaxed);
    m_behind.store(std::max<std::int64_t>(behind, 0), std::memory_order_relaxed);
}

void FollowLedger::noteRecovered(const std::string& source, std::int64_t from, std::int64_t to) {
    m_recoveredBytes.fetch_add(to - from, std::memory_order_relaxed);
    const LockGuard guard(&m_lock);
    Recovered* const newest = m_recovered.newest();
    if (newest != nullptr && newest->source == source && newest->to == from) {
        newest->to = to;
    } else if (Recovered* const next = m_recovered.next()) {
        *next = {wallTime(), source, from, to};
    }
}

void FollowLedger::noteLost(std::int64_t from, std::int64_t to, const std::string& source) {
    m_lostBytes.fetch_add(to - from, std::memory_order_relaxed);
    m_losses.fetch_add(1, std::memory_order_relaxed);
    const LockGuard guard(&m_lock);
    if (Lost* const lost = m_lost.next()) {
        *lost = {wallTime(), source, from, to};
    }
}

void FollowLedger::noteLost(std::string text) {
    m_losses.fetch_add(1, std::memory_order_relaxed);
    const LockGuard guard(&m_lock);
    if (Lost* const lost = m_lost.next()) {
        *lost = {wallTime(), "", 0, 0, std::move(text)};
    }
}

std::vector<FollowLedger::Recovered> FollowLedger::recovered() const {
    const LockGuard guard(&m_lock);
    return m_recovered.all();
}

std::vector<FollowLedger::Lost> FollowLedger::lost() const {
    const LockGuard guard(&m_lock);
    return m_lost.all();
}

const char* followStateText(FollowLedger::State state) noexcept {
    switch (state) {
    case FollowLedger::State::waiting:
        break;
    case FollowLedger::State::reading:
        return "reading";
    case FollowLedger::State::finishing:
        return "finishing";
    case FollowLedger::State::missing:
        return "missing";
    case FollowLedger::State::notAFile:
        return "not a file";
    case FollowLedger::State::taken:
        return "taken";
    }
    return "waiting";
}

} // namespace zrm
