#ifndef ZRM_HOST_REQUEST_LIMIT_H
#define ZRM_HOST_REQUEST_LIMIT_H

#include <chrono>
#include <functional>

namespace zrm::host {

/// While it lives, what the constructing thread has the agent read ends early when the time is over
/// or the work is no longer wanted (CTX1_IsCancelled). Of several on a thread the latest counts.
class RequestLimit {
public:
    using Clock = std::chrono::steady_clock;

    /// `isUnwanted` is asked often, on this thread, until it has been true once; may be empty.
    RequestLimit(Clock::time_point deadline, std::function<bool()> isUnwanted);
    ~RequestLimit();
    RequestLimit(const RequestLimit&) = delete;
    RequestLimit& operator=(const RequestLimit&) = delete;

    /// Whether the work is to end now. Once it is, it stays so.
    bool isReached() noexcept;
    /// Whether isReached has been true: something was ended early.
    bool wasReached() const noexcept { return m_isReached; }

    /// That of the calling thread, or null.
    static RequestLimit* current() noexcept;

private:
    const Clock::time_point m_deadline;
    const std::function<bool()> m_isUnwanted;
    bool m_isReached = false;
    RequestLimit* const m_outer; ///< counts again when this one ends
};

} // namespace zrm::host

#endif
