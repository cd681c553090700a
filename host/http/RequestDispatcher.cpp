#include "host/http/RequestDispatcher.h"

#include "agent/TraceScope.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"
#include "host/http/UrlText.h"

#include <algorithm>
#include <exception>
#include <string_view>
#include <utility>

#include <strings.h>

namespace {

TRC1_Anchor anchor{"RequestDispatcher.cpp"};

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

/// True for application/json, with or without parameters.
bool isJson(const std::string& contentType) {
    constexpr std::string_view json = "application/json";
    const std::string_view type =
        std::string_view(contentType)
            .substr(0, std::min(contentType.find_first_of("; \t"), contentType.size()));
    return type.size() == json.size() && strncasecmp(type.data(), json.data(), json.size()) == 0;
}

void readBodyOf(IncomingRequest& incoming, const BodyReader& readBody) {
    constexpr std::size_t most = RequestDispatcher::largestBody;
    if (!incoming.hasBody) {
        return;
    }
    if (incoming.length.value_or(0) > most) {
        throw RequestDispatcher::tooLong();
    }
    if (!isJson(incoming.contentType)) {
        throw RequestRefused(415, "send the body as application/json", "Content-Type");
    }
    incoming.request.body = readBody(most);
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

HttpAnswer RequestDispatcher::answerOf(const Problem& problem) {
    HttpAnswer answer{problem.status, "application/problem+json", problem.json()};
    if (problem.status == 401) {
        answer.headers.emplace_back("WWW-Authenticate", "Bearer");
    }
    return answer;
}

HttpAnswer RequestDispatcher::refuse(const Problem& problem) {
    m_statistics.count("", "", problem.status, {});
    return answerOf(problem);
}

HttpAnswer RequestDispatcher::answer(IncomingRequest incoming, const BodyReader& readBody) {
    TraceScope trace(anchor);
    const auto begin = std::chrono::steady_clock::now();
    const std::string method = incoming.request.method;
    std::string route;
    HttpAnswer answer = answerOrProblem(incoming, readBody, route);
    m_statistics.count(method, route, answer.status, std::chrono::steady_clock::now() - begin);
    return answer;
}

HttpAnswer RequestDispatcher::answerOrProblem(IncomingRequest& incoming, const BodyReader& readBody,
                                              std::string& route) {
    TraceScope trace(anchor);
    try {
        return tryAnswer(incoming, readBody, route);
    } catch (const RequestRefused& refused) {
        const Problem& problem = refused.problem();
        trace.detail()("Request for %s refused: %s.", incoming.request.path.c_str(),
                       problem.detail.c_str());
        return answerOf(problem);
    } catch (const std::exception& exception) {
        trace.error()("Request for %s failed: %s", incoming.request.path.c_str(), exception.what());
    }
    return answerOf({500, "the request failed", ""});
}

HttpAnswer RequestDispatcher::tryAnswer(IncomingRequest& incoming, const BodyReader& readBody,
                                        std::string& route) {
    HttpRequest& request = incoming.request;
    if (incoming.problem) {
        throw RequestRefused(*incoming.problem);
    }
    const Router::Match match = m_router.match(request.method, request.path);
    route = match.pattern;
    const bool isPublic = match.handler != nullptr && match.access == Router::PUBLIC;
    if (std::optional<Problem> problem = m_guard->refuse(incoming.headers, isPublic)) {
        throw RequestRefused(std::move(*problem));
    }
    if (match.handler == nullptr) {
        return unrouted(match);
    }
    decodeCaptures(match, request);
    decodeQuery(incoming);
    if (!isRead(request.method)) {
        QueryFields(request).refuseUnknown(); // what changes something is told by bodies alone
    }
    readBodyOf(incoming, readBody);
    const ActiveRequests::Guard active(m_active);
    if (!active) {
        throw RequestRefused(503, "the agent is ending", "");
    }
    if (request.method == "HEAD") {
        request.method = "GET";
    }
    return (*match.handler)(request);
}

void RequestDispatcher::stream(const HttpAnswer::Stream& stream, const BodyWriter& write,
                               const std::stop_token& stop) {
    TraceScope trace(anchor);
    const ActiveRequests::Guard active(m_active);
    if (!active) {
        return;
    }
    try {
        stream(write, stop);
    } catch (const std::exception& exception) {
        trace.error()("A stream broke off: %s", exception.what());
    }
}
