#ifndef ZRM_HOST_REQUEST_DISPATCHER_H
#define ZRM_HOST_REQUEST_DISPATCHER_H

#include "host/http/ActiveRequests.h"
#include "host/http/HttpAnswer.h"
#include "host/http/IncomingRequest.h"
#include "host/http/RequestGuard.h"
#include "host/http/Router.h"

#include <chrono>
#include <cstddef>
#include <optional>
#include <string>
#include <utility>

/// Holds the rules of access against requests and lets the router's handlers answer them. What
/// goes wrong becomes a problem document. Any thread.
class RequestDispatcher {
public:
    /// The largest body: bytes.
    static constexpr std::size_t largestBody = 1024 * 1024;

    /// `router` outlives the object.
    explicit RequestDispatcher(const Router& router) : m_router(router) {}

    /// Before the first request.
    void setGuard(RequestGuard guard) { m_guard.emplace(std::move(guard)); }

    /// Answers a request, whose body is read only when nothing speaks against the rest of it.
    /// Throws nothing.
    HttpAnswer answer(IncomingRequest incoming, const BodyReader& readBody);

    /// The answer that is a problem document.
    static HttpAnswer answerOf(const Problem& problem);

    /// For streams: while it lives, the end of the process waits.
    ActiveRequests& active() noexcept { return m_active; }

    /// Lets no more requests be answered and waits for those under way, at most until the limit.
    void close(std::chrono::steady_clock::time_point limit) { m_active.close(limit); }

private:
    HttpAnswer tryAnswer(IncomingRequest& incoming, const BodyReader& readBody);

    const Router& m_router;
    std::optional<RequestGuard> m_guard;
    ActiveRequests m_active;
};

#endif
