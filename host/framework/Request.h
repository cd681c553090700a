#ifndef ZRM_HOST_REQUEST_H
#define ZRM_HOST_REQUEST_H

#include "host/framework/ContextInfo.h"
#include "host/framework/RequestDetail.h"

#include <memory>

class TableManager;
class ctreq;

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
    /// Opens the request; isOpen() tells whether the table gave one. The receiver outlives the
    /// request; a situation's may be called before the constructor returns. So do the counts, into
    /// which the request counts where there are any.
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
