#ifndef ZRM_HOST_REQUEST_COUNTS_H
#define ZRM_HOST_REQUEST_COUNTS_H

#include <atomic>
#include <cstdint>

namespace zrm::host {

/// The number of rows that a request has judged so far. Written by one thread at a time, the one
/// that uses the request; read by any thread.
class RequestCounts {
public:
    /// Includes the rows that the request was not offered because it would have refused them.
    std::uint64_t judged() const noexcept {
        return m_judged.load(std::memory_order_relaxed) + spared();
    }
    /// Rows that met every condition.
    std::uint64_t matched() const noexcept { return m_matched.load(std::memory_order_relaxed); }

    void countJudged() noexcept { count(m_judged); }
    void countMatched() noexcept { count(m_matched); }

    // While a situation is open, its table's Audience counts the rows of all logs and those that
    // the situation was offered; the difference was skipped.

    /// From now on rows are counted in `rows`; a second call changes nothing.
    void joinAudience(const std::atomic<std::uint64_t>& rows) noexcept {
        if (m_rows.load(std::memory_order_relaxed) == nullptr) {
            m_offered.store(rows.load(std::memory_order_relaxed), std::memory_order_relaxed);
            m_rows.store(&rows, std::memory_order_release);
        }
    }
    void leaveAudience() noexcept {
        const std::uint64_t rows = spared();
        m_rows.store(nullptr, std::memory_order_relaxed);
        m_judged.store(m_judged.load(std::memory_order_relaxed) + rows, std::memory_order_relaxed);
    }
    void countOffered() noexcept {
        m_offered.store(m_offered.load(std::memory_order_relaxed) + 1, std::memory_order_release);
    }

private:
    /// A row is counted before it is offered, so it is read here in reverse order: never negative.
    std::uint64_t spared() const noexcept {
        const std::atomic<std::uint64_t>* const rows = m_rows.load(std::memory_order_acquire);
        const std::uint64_t offered = m_offered.load(std::memory_order_acquire);
        return rows != nullptr ? rows->load(std::memory_order_relaxed) - offered : 0;
    }

    /// Needs no locked instruction, since there is only one writer.
    static void count(std::atomic<std::uint64_t>& counter) noexcept {
        counter.store(counter.load(std::memory_order_relaxed) + 1, std::memory_order_relaxed);
    }

    std::atomic<const std::atomic<std::uint64_t>*> m_rows{nullptr};
    std::atomic<std::uint64_t> m_offered{0};
    std::atomic<std::uint64_t> m_judged{0};
    std::atomic<std::uint64_t> m_matched{0};
};

} // namespace zrm::host

#endif
