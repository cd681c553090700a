#ifndef ZRM_HOST_REQUEST_H
#define ZRM_HOST_REQUEST_H

#include "framework/ctreq.h"
#include "host/framework/Condition.h"

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

class TableManager;
class ctreq;

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

/// Receives what a request dispatches. For a situation it is called on a log's thread under the
/// table manager's lock and may wait while the event queue is full; for a report, on the thread
/// that takes the sample.
class RowReceiver {
public:
    virtual ~RowReceiver() = default;
    /// Takes `count` contiguous rows of request.rowSize bytes each; copies what it keeps. Returns 0
    /// or a status.
    virtual unsigned receive(const ctreq& request, const char* rows, unsigned count) = 0;
    /// For how many seconds before a log's stored position it counts entries; 0: it counts none.
    virtual std::int64_t earlierPeriod() const { return 0; }
    /// Counts a row that meets the conditions and that an earlier run has judged.
    virtual void receiveEarlier(const ctreq& /*request*/, const char* /*row*/) {}
    /// The agent has marked the request as stopped (reason of ctreq::Stopped).
    virtual void stopped(const ctreq& request, unsigned reason) = 0;
};

} // namespace zrm::host

/// The context of a request: where its rows go and where it counts. Must outlive the request.
class ContextInfo {
public:
    /// Without counts from its opener, which must outlive it, the request keeps its own.
    explicit ContextInfo(zrm::host::RowReceiver& receiver,
                         zrm::host::RequestCounts* counts = nullptr)
        : m_receiver(receiver), m_counts(counts) {}
    zrm::host::RowReceiver& receiver() const noexcept { return m_receiver; }
    zrm::host::RequestCounts* counts() const noexcept { return m_counts; }

private:
    zrm::host::RowReceiver& m_receiver;
    zrm::host::RequestCounts* m_counts;
};

/// What a request asks for: its name, kind and conditions. Built by the opener of a request and
/// kept alive until the request is destroyed; does not change in between.
class RequestDetail {
public:
    std::string name; ///< the situation's name, or the report's label
    SampleType sampleType = SAMPLE_SITUATION;
    unsigned interval = 0;                        ///< sampling interval, seconds; 0: event-driven
    std::vector<zrm::host::Condition> conditions; ///< all must hold
};

namespace zrm::host {

/// One open request on a table, from its creation to its destruction. A situation receives rows
/// from construction on; a report is sampled through get()->TakeSample(). Opened, used and closed
/// by one thread at a time; many requests may be opened and closed at once.
///
/// The table manager's lock is held only while a situation is linked or unlinked. Creation, sample
/// and destruction run without it: they may wait for the log manager, whose refresh waits for
/// threads that wait for this lock. For the same reason a request is not closed from within a
/// RowReceiver, which runs under that lock.
class Request {
public:
    /// Opens the request; isOpen() says whether the table provided one. The receiver, and the
    /// counts if there are any, must outlive it. A situation's receiver may be called before the
    /// constructor returns.
    Request(TableManager& manager, RequestDetail detail, RowReceiver& receiver,
            RequestCounts* counts = nullptr);
    /// Closes the request: no row reaches the receiver any more. Waits until no other thread works
    /// on it.
    ~Request();
    Request(const Request&) = delete;
    Request& operator=(const Request&) = delete;

    bool isOpen() const noexcept { return m_request != nullptr; }
    /// The table's request object; null when it is not open.
    ctreq* get() const noexcept { return m_request.get(); }
    const RequestDetail& detail() const noexcept { return m_detail; }

private:
    bool isSituation() const noexcept { return m_detail.sampleType == SAMPLE_SITUATION; }

    TableManager& m_manager;
    RequestDetail m_detail;
    ContextInfo m_context;
    std::unique_ptr<ctreq> m_request;
};

} // namespace zrm::host

#endif
