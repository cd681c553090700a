#include "monitor/FollowLedger.h"

#include <algorithm>

namespace zrm {

namespace {

class LedgerGuard {
public:
    explicit LedgerGuard(SYS1_Lock& lock) : m_lock(lock) { SYS1_GetLock(&m_lock); }
    ~LedgerGuard() { SYS1_ReleaseLock(&m_lock); }
    LedgerGuard(const LedgerGuard&) = delete;
    LedgerGuard& operator=(const LedgerGuard&) = delete;

private:
    SYS1_Lock& m_lock;
};

std::timespec now() noexcept {
    std::timespec time{};
    clock_gettime(CLOCK_REALTIME, &time);
    return time;
}

template <typename Range> void keep(std::vector<Range>& ranges, Range range) {
    if (ranges.size() == FollowLedger::mostKept) {
        ranges.erase(ranges.begin());
    }
    ranges.push_back(std::move(range));
}

} // namespace

void FollowLedger::noteFailure(const char* call, int number) {
    const LedgerGuard guard(m_lock);
    m_failure = Failure{call, number, m_failure ? m_failure->since : now()};
}

void FollowLedger::clearFailure() {
    const LedgerGuard guard(m_lock);
    m_failure.reset();
}

std::optional<FollowLedger::Failure> FollowLedger::failure() const {
    const LedgerGuard guard(m_lock);
    return m_failure;
}

void FollowLedger::noteGeneration(const FileIdentity& identity, const std::string& path) {
    m_count.fetch_add(1, std::memory_order_relaxed);
    const LedgerGuard guard(m_lock);
    m_generation = Generation{identity, path};
}

std::optional<FollowLedger::Generation> FollowLedger::generation() const {
    const LedgerGuard guard(m_lock);
    return m_generation;
}

void FollowLedger::notePosition(std::int64_t offset, std::int64_t behind) noexcept {
    m_offset.store(offset, std::memory_order_relaxed);
    m_behind.store(std::max<std::int64_t>(behind, 0), std::memory_order_relaxed);
}

void FollowLedger::noteRecovered(const std::string& source, std::int64_t from, std::int64_t to) {
    m_recoveredBytes.fetch_add(to - from, std::memory_order_relaxed);
    const LedgerGuard guard(m_lock);
    if (!m_recovered.empty() && m_recovered.back().source == source &&
        m_recovered.back().to == from) {
        m_recovered.back().to = to;
    } else {
        keep(m_recovered, Recovered{now(), source, from, to});
    }
}

void FollowLedger::noteLost(std::int64_t from, std::int64_t to) {
    m_lostBytes.fetch_add(to - from, std::memory_order_relaxed);
    m_losses.fetch_add(1, std::memory_order_relaxed);
    const LedgerGuard guard(m_lock);
    keep(m_lost, Lost{now(), from, to});
}

std::vector<FollowLedger::Recovered> FollowLedger::recovered() const {
    const LedgerGuard guard(m_lock);
    return m_recovered;
}

std::vector<FollowLedger::Lost> FollowLedger::lost() const {
    const LedgerGuard guard(m_lock);
    return m_lost;
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
    }
    return "waiting";
}

} // namespace zrm
