#ifndef ZRM_HOST_RETRY_PAUSE_H
#define ZRM_HOST_RETRY_PAUSE_H

#include <chrono>
#include <random>

namespace zrm::host {

/// Pauses between retries: each twice as long as the one before, up to a maximum, and shortened by
/// a random part of at most a quarter. Otherwise many agents whose receiver was down would all
/// return to it at the same moments. Used by one thread.
class RetryPause {
public:
    using Duration = std::chrono::milliseconds;

    RetryPause(Duration first, Duration longest);

    /// The length of the next pause.
    Duration next();

    /// Starts over with the first pause.
    void reset() noexcept { m_whole = m_first; }

private:
    const Duration m_first;
    const Duration m_longest;
    Duration m_whole; ///< of the next pause, not shortened
    std::minstd_rand m_random;
};

} // namespace zrm::host

#endif
