#ifndef ZRM_TESTS_TEST_ROUTER_H
#define ZRM_TESTS_TEST_ROUTER_H

#include "host/base/UrlText.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"

#include <string>

using namespace zrm::host;

/// Sends requests to a resource without a server.
class TestRouter {
public:
    explicit TestRouter(Resource& resource) { resource.addRoutes(m_router); }

    /// The answer to a request; `url` may have a query. A refusal becomes an answer whose body is
    /// "FIELD: DETAIL".
    HttpAnswer ask(const std::string& method, const std::string& url, const std::string& body = "",
                   const std::string& lastEventId = "") const {
        HttpRequest request;
        request.method = method;
        request.path = url.substr(0, url.find('?'));
        request.body = body;
        request.lastEventId = lastEventId;
        const Router::Match match = m_router.match(method, request.path);
        if (match.handler == nullptr) {
            return {404, "", "no route"};
        }
        for (const std::string& capture : match.captures) {
            request.captures.push_back(UrlText::decode(capture).value());
        }
        if (url.find('?') != std::string::npos) {
            request.query = UrlText::query(url.substr(url.find('?') + 1)).value();
        }
        try {
            return (*match.handler)(request);
        } catch (const RequestRefused& refused) {
            return {refused.refusal().status, "",
                    refused.problem().field + ": " + refused.problem().text()};
        }
    }

private:
    Router m_router;
};

#endif
