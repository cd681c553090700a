#include "host/http/RequestDispatcher.h"

#include "base/TraceScope.h"
#include "host/base/UrlText.h"
#include "host/framework/RequestLimit.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"
#include "host/http/TimedWork.h"

#include <algorithm>
#include <chrono>
#include <exception>
#include <iterator>
#include <string_view>
#include <utility>

#include <strings.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"RequestDispatcher.cpp"};

/// Requests of this thread: a thread that ends the process must not wait for itself.
thread_local int ownRequests = 0;

} // namespace

ActiveRequests::Guard::Guard(ActiveRequests& requests) : m_requests(requests) {
    const std::lock_guard guard(m_requests.m_mutex);
    m_isCounted = !m_requests.m_isClosed;
    if (m_isCounted) {
        ++m_requests.m_count;
        ++ownRequests;
    }
}

ActiveRequests::Guard::~Guard() {
    if (!m_isCounted) {
        return;
    }
    --ownRequests;
    {
        const std::lock_guard guard(m_requests.m_mutex);
        --m_requests.m_count;
    }
    m_requests.m_ended.notify_all();
}

void ActiveRequests::close(std::chrono::steady_clock::time_point limit) {
    std::unique_lock lock(m_mutex);
    m_isClosed = true;
    m_ended.wait_until(lock, limit, [&] { return m_count <= ownRequests; });
}

namespace {

void decodeCaptures(const Router::Match& match, HttpRequest& request) {
    for (const std::string& capture : match.captures) {
        std::optional<std::string> decoded = UrlText::decode(capture);
        if (!decoded) {
            throw RequestRefused(400, "write the path as UTF-8 with percent-encoding", "path");
        }
        request.captures.push_back(std::move(*decoded));
    }
}

void decodeQuery(IncomingRequest& incoming) {
    auto query = UrlText::query(incoming.rawQuery);
    if (!query) {
        throw RequestRefused(400, "write the query as UTF-8 with percent-encoding", "query");
    }
    incoming.request.query = std::move(*query);
}

bool isRead(std::string_view method) {
    return method == "GET" || method == "HEAD";
}

bool mayHaveBody(std::string_view method) {
    return method == "POST" || method == "PUT" || method == "PATCH" || method == "DELETE";
}

/// True for application/json, with or without parameters.
bool isJson(const std::string& contentType) {
    constexpr std::string_view json = "application/json";
    const std::string_view type =
        std::string_view(contentType)
            .substr(0, std::min(contentType.find_first_of("; \t"), contentType.size()));
    return type.size() == json.size() && strncasecmp(type.data(), json.data(), json.size()) == 0;
}

/// Refuses a body before it is read.
void checkBody(const IncomingRequest& incoming) {
    if (!incoming.hasBody) {
        return;
    }
    if (incoming.length.value_or(0) > RequestDispatcher::largestBody) {
        throw RequestDispatcher::tooLong();
    }
    if (!isJson(incoming.contentType)) {
        throw RequestRefused(415, "send the body as application/json", "Content-Type");
    }
}

/// Requests that may read a whole log get more time than others before they are ended.
bool mayBeLong(std::string_view pattern) {
    constexpr std::string_view patterns[] = {"/api/v1/reports", "/api/v1/explain",
                                             "/api/v1/backtest", "/api/v1/tables/{table}/sample"};
    return std::ranges::find(patterns, pattern) != std::end(patterns);
}

/// Does part of the work on a request; what it throws becomes the answer.
template <class Work> std::optional<HttpAnswer> problemOf(const HttpRequest& request, Work work) {
    TraceScope trace(anchor);
    try {
        return work();
    } catch (const RequestRefused& refused) {
        trace.detail()("Request for %s refused: %s.", request.path.c_str(),
                       refused.problem().text().c_str());
        return RequestDispatcher::answerOf(refused.refusal());
    } catch (const std::exception& exception) {
        trace.error()("Request for %s failed: %s", request.path.c_str(), exception.what());
    }
    return RequestDispatcher::answerOf({500, "the request failed", ""});
}

/// Ends the handler's reading when the time is up or the answer is no longer needed.
HttpAnswer answerInTime(const Router::Handler& handler, const HttpRequest& request,
                        std::string_view pattern, ActiveRequests& active) {
    const std::chrono::milliseconds limit =
        mayBeLong(pattern) ? RequestDispatcher::longLimit : RequestDispatcher::limit;
    const auto read = [&handler, limit, &active](const HttpRequest& request) {
        // On this thread: a handler that ends the process must not wait for itself.
        const ActiveRequests::Guard guard(active);
        if (!guard) {
            throw RequestRefused(503, "the agent is stopping", "");
        }
        RequestLimit reading(RequestLimit::Clock::now() + limit,
                             [&] { return request.cancelled.stop_requested(); });
        HttpAnswer answer = handler(request);
        if (reading.wasReached()) {
            throw RequestRefused(503, "the request took too long and was ended: ask for less", "");
        }
        return answer;
    };
    const auto work = [request, read] {
        return *problemOf(request, [&]() -> std::optional<HttpAnswer> { return read(request); });
    };
    return TimedWork::answer(work, limit + RequestDispatcher::endingTime);
}

/// The answer to a request that has no handler.
HttpAnswer unrouted(const Router::Match& match) {
    if (match.pattern.empty()) {
        throw RequestRefused(404, "there is nothing at this path", "");
    }
    HttpAnswer answer = RequestDispatcher::answerOf(
        {405, "this path answers " + match.allow + ", not this method", ""});
    answer.headers.emplace_back("Allow", match.allow);
    return answer;
}

} // namespace

RequestRefused RequestDispatcher::tooLong() {
    return {413, "the body has more than " + std::to_string(largestBody) + " bytes", "body"};
}

HttpAnswer RequestDispatcher::answerOf(const Refusal& refusal) {
    HttpAnswer answer{refusal.status, "application/problem+json", refusal.json()};
    if (refusal.status == 401) {
        answer.headers.emplace_back("WWW-Authenticate", "Bearer");
    }
    return answer;
}

HttpAnswer RequestDispatcher::refuse(const Refusal& refusal) {
    m_statistics.count("", "", refusal.status, {});
    return answerOf(refusal);
}

HttpAnswer RequestDispatcher::refuse(const Admission& admission, const Refusal& refusal) {
    HttpAnswer answer = answerOf(refusal);
    count(admission, answer);
    return answer;
}

void RequestDispatcher::count(const Admission& admission, const HttpAnswer& answer) {
    if (!admission.isCounted->exchange(true)) {
        m_statistics.count(admission.method, admission.route, answer.status,
                           std::chrono::steady_clock::now() - admission.begin);
    }
}

void RequestDispatcher::setGuard(RequestGuard guard) {
    auto next = std::make_shared<const RequestGuard>(std::move(guard));
    const std::lock_guard lock(m_mutex);
    m_guard.swap(next);
}

std::shared_ptr<const RequestGuard> RequestDispatcher::guard() {
    const std::lock_guard lock(m_mutex);
    return m_guard;
}

RequestDispatcher::Admission RequestDispatcher::admit(IncomingRequest incoming) {
    TraceScope trace(anchor);
    Admission admission;
    admission.begin = std::chrono::steady_clock::now();
    admission.method = incoming.request.method;
    admission.refusal = problemOf(incoming.request, [&]() -> std::optional<HttpAnswer> {
        tryAdmit(incoming, admission);
        return std::move(admission.refusal);
    });
    admission.request = std::move(incoming.request);
    if (admission.refusal) {
        count(admission, *admission.refusal);
    }
    return admission;
}

void RequestDispatcher::tryAdmit(IncomingRequest& incoming, Admission& admission) {
    HttpRequest& request = incoming.request;
    if (incoming.refusal) {
        throw RequestRefused(*incoming.refusal);
    }
    if (incoming.hasBody && !mayHaveBody(request.method)) {
        throw RequestRefused(400, "this method has no body", "");
    }
    const Router::Match match = m_router.match(request.method, request.path);
    admission.route = match.pattern;
    const bool isPublic = match.handler != nullptr && match.access == Router::PUBLIC;
    if (const auto allowed = guard()->check(incoming.headers, isPublic); !allowed) {
        throw RequestRefused(allowed.error());
    }
    if (match.handler == nullptr) {
        admission.refusal = unrouted(match);
        return;
    }
    decodeCaptures(match, request);
    decodeQuery(incoming);
    if (!isRead(request.method)) {
        QueryFields(request).refuseUnknown(); // changes take their parameters from the body only
    }
    checkBody(incoming);
    if (request.method == "HEAD") {
        request.method = "GET";
    }
    admission.handler = match.handler;
    admission.lane = match.lane;
}

HttpAnswer RequestDispatcher::answer(Admission& admission) {
    TraceScope trace(anchor);
    const HttpRequest& request = admission.request;
    std::optional<HttpAnswer> answer = problemOf(request, [&]() -> std::optional<HttpAnswer> {
        return admission.lane == Router::QUICK
                   ? (*admission.handler)(request)
                   : answerInTime(*admission.handler, request, admission.route, m_active);
    });
    count(admission, *answer);
    return std::move(*answer);
}

} // namespace zrm::host
