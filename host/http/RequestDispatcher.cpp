#include "host/http/RequestDispatcher.h"

#include "agent/TraceScope.h"
#include "host/http/RequestRefused.h"
#include "host/http/UrlText.h"

#include <exception>
#include <utility>

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

void readBodyOf(IncomingRequest& incoming, const BodyReader& readBody) {
    if (!incoming.hasBody) {
        return;
    }
    constexpr std::size_t most = RequestDispatcher::largestBody;
    std::optional<std::string> body =
        incoming.length.value_or(0) > most ? std::nullopt : readBody(most);
    if (!body) {
        throw RequestRefused(
            413, "the body has more than " + std::to_string(most) + " bytes, or did not come whole",
            "body");
    }
    if (!body->empty() && !incoming.contentType.starts_with("application/json")) {
        throw RequestRefused(415, "send the body as application/json", "Content-Type");
    }
    incoming.request.body = std::move(*body);
}

/// Why no handler answers.
void refuseUnrouted(const Router::Match& match, HttpAnswer& answer) {
    if (match.pattern.empty()) {
        answer = RequestDispatcher::answerOf({404, "there is nothing at this path", ""});
        return;
    }
    answer = RequestDispatcher::answerOf(
        {405, "this path answers " + match.allow + ", not this method", ""});
    answer.headers.emplace_back("Allow", match.allow);
}

} // namespace

HttpAnswer RequestDispatcher::answerOf(const Problem& problem) {
    HttpAnswer answer{problem.status, "application/problem+json", problem.json()};
    if (problem.status == 401) {
        answer.headers.emplace_back("WWW-Authenticate", "Bearer");
    }
    return answer;
}

HttpAnswer RequestDispatcher::answer(IncomingRequest incoming, const BodyReader& readBody) {
    TraceScope trace(anchor);
    try {
        return tryAnswer(incoming, readBody);
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

HttpAnswer RequestDispatcher::tryAnswer(IncomingRequest& incoming, const BodyReader& readBody) {
    HttpRequest& request = incoming.request;
    if (!incoming.problem.empty()) {
        throw RequestRefused(400, incoming.problem, "");
    }
    const Router::Match match = m_router.match(request.method, request.path);
    const bool isPublic = match.handler != nullptr && match.access == Router::PUBLIC;
    if (std::optional<Problem> problem = m_guard->refuse(incoming.headers, isPublic)) {
        throw RequestRefused(std::move(*problem));
    }
    if (match.handler == nullptr) {
        HttpAnswer answer;
        refuseUnrouted(match, answer);
        return answer;
    }
    decodeCaptures(match, request);
    decodeQuery(incoming);
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
