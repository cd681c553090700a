#ifndef ZRM_HOST_REQUEST_DISPATCHER_H
#define ZRM_HOST_REQUEST_DISPATCHER_H

#include "host/http/ActiveRequests.h"
#include "host/http/HttpAnswer.h"
#include "host/http/IncomingRequest.h"
#include "host/http/RequestGuard.h"
#include "host/http/RequestRefused.h"
#include "host/http/RequestStatistics.h"
#include "host/http/Router.h"

#include <chrono>
#include <cstddef>
#include <optional>
#include <stop_token>
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

    /// The answer to a request of which not even the head could be read.
    HttpAnswer refuse(const Problem& problem);

    /// What refuses a body that is too long.
    static RequestRefused tooLong();

    /// The answer that is a problem document.
    static HttpAnswer answerOf(const Problem& problem);

    /// Lets the stream of an answer write until its end. Throws nothing.
    void stream(const HttpAnswer::Stream& stream, const BodyWriter& write,
                const std::stop_token& stop);

    /// Lets no more requests be answered and waits for those under way, at most until the limit.
    void close(std::chrono::steady_clock::time_point limit) { m_active.close(limit); }

    /// What was answered so far.
    const RequestStatistics& statistics() const noexcept { return m_statistics; }

private:
    HttpAnswer answerOrProblem(IncomingRequest& incoming, const BodyReader& readBody,
                               std::string& route);
    HttpAnswer tryAnswer(IncomingRequest& incoming, const BodyReader& readBody, std::string& route);

    const Router& m_router;
    std::optional<RequestGuard> m_guard;
    ActiveRequests m_active;
    RequestStatistics m_statistics;
};

#endif
