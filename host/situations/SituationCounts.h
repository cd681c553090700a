#ifndef ZRM_HOST_SITUATION_COUNTS_H
#define ZRM_HOST_SITUATION_COUNTS_H

#include "host/framework/RequestCounts.h"

#include <atomic>
#include <cstdint>

namespace zrm::host {

/// What a situation has done so far; outlives its requests, so that it goes on when the situation
/// is stopped and started. Log threads count, one at a time; any thread reads, without a lock.
class SituationCounts {
public:
    /// Of its requests: entries handed to it and those that met its conditions.
    RequestCounts requests;

    std::uint64_t raised() const noexcept { return m_raised.load(std::memory_order_relaxed); }
    /// Milliseconds since 1970, UTC; 0: never.
    std::int64_t lastRaised() const noexcept {
        return m_lastRaised.load(std::memory_order_relaxed);
    }

    void countRaised(std::uint64_t count, std::int64_t now) noexcept {
        m_raised.store(raised() + count, std::memory_order_relaxed);
        m_lastRaised.store(now, std::memory_order_relaxed);
    }

private:
    std::atomic<std::uint64_t> m_raised{0};
    std::atomic<std::int64_t> m_lastRaised{0};
};

} // namespace zrm::host

#endif
