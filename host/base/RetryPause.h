#ifndef ZRM_HOST_RETRY_PAUSE_H
#define ZRM_HOST_RETRY_PAUSE_H

#include <chrono>
#include <random>

namespace zrm::host {

/// The pauses between tries at something that fails: each twice as long as the one before, up to a
/// longest, and each cut by a random part, at most a quarter. Many agents whose receiver was down
/// for all of them would otherwise come back to it at the same moments. One thread's.
class RetryPause {
public:
    using Duration = std::chrono::milliseconds;

    RetryPause(Duration first, Duration longest);

    /// The length of the next pause.
    Duration next();

    /// The next pause is the first again.
    void reset() noexcept { m_whole = m_first; }

private:
    const Duration m_first;
    const Duration m_longest;
    Duration m_whole; ///< of the next pause, uncut
    std::minstd_rand m_random;
};

} // namespace zrm::host

#endif
