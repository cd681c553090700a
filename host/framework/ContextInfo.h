#ifndef ZRM_HOST_CONTEXT_INFO_H
#define ZRM_HOST_CONTEXT_INFO_H

class ctreq;

namespace zrm::host {

class RequestCounts;

/// Receives what a request dispatches. For a situation it is called on a log's thread under the
/// table manager's lock and may wait while the event queue is full; for a report, on the thread
/// that takes the sample.
class RowReceiver {
public:
    virtual ~RowReceiver() = default;
    /// Takes `count` contiguous rows of request.rowSize bytes each; copies what it keeps. Returns 0
    /// or a status.
    virtual unsigned receive(const ctreq& request, const char* rows, unsigned count) = 0;
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

#endif
