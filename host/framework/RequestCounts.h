#ifndef ZRM_HOST_REQUEST_COUNTS_H
#define ZRM_HOST_REQUEST_COUNTS_H

#include <atomic>
#include <cstdint>

/// What a request has judged so far. One thread counts at a time, the one that the request is used
/// by; any thread reads.
class RequestCounts {
public:
    std::uint64_t judged() const noexcept { return m_judged.load(std::memory_order_relaxed); }
    /// Rows that met every condition.
    std::uint64_t matched() const noexcept { return m_matched.load(std::memory_order_relaxed); }

    void countJudged() noexcept { count(m_judged); }
    void countMatched() noexcept { count(m_matched); }

private:
    /// Without a locked instruction: there is one writer.
    static void count(std::atomic<std::uint64_t>& counter) noexcept {
        counter.store(counter.load(std::memory_order_relaxed) + 1, std::memory_order_relaxed);
    }

    std::atomic<std::uint64_t> m_judged{0};
    std::atomic<std::uint64_t> m_matched{0};
};

#endif
