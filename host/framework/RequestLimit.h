#ifndef ZRM_HOST_REQUEST_LIMIT_H
#define ZRM_HOST_REQUEST_LIMIT_H

#include <chrono>
#include <functional>

namespace zrm::host {

/// While it exists, reading by the agent on the constructing thread ends early when the time is up
/// or the work is no longer wanted (CTX1_IsCancelled). If a thread has several, the latest applies.
class RequestLimit {
public:
    using Clock = std::chrono::steady_clock;

    /// `isUnwanted` is called often, on this thread, until it has returned true; may be empty.
    RequestLimit(Clock::time_point deadline, std::function<bool()> isUnwanted);
    ~RequestLimit();
    RequestLimit(const RequestLimit&) = delete;
    RequestLimit& operator=(const RequestLimit&) = delete;

    /// Whether the work must end now; once true, always true.
    bool isReached() noexcept;
    /// Whether isReached has returned true: something was ended early.
    bool wasReached() const noexcept { return m_isReached; }

    /// The calling thread's, or null.
    static RequestLimit* current() noexcept;

private:
    const Clock::time_point m_deadline;
    const std::function<bool()> m_isUnwanted;
    bool m_isReached = false;
    RequestLimit* const m_outer; ///< applies again when this one ends
};

} // namespace zrm::host

#endif
