#ifndef TEST_AGENT_H
#define TEST_AGENT_H

#include "host/cli/AgentAccess.h"
#include "host/http/HttpServer.h"
#include "host/http/Router.h"

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>

using namespace zrm::host;

/// An agent that answers as a test wants: the agent's own server with other routes, which are added
/// before `begin`.
class TestAgent {
public:
    ~TestAgent() { end(); }

    Router& routes() { return *m_router; }

    /// Begins to serve, at the previous port if there was one.
    void begin() {
        m_server = std::make_unique<HttpServer>(*m_router);
        m_server->start({"127.0.0.1", m_port}, ApiToken("the-token"));
        m_port = m_server->port();
    }
    /// Stops and drops its routes.
    void end() {
        if (m_server != nullptr) {
            m_server->stop(HttpServer::Clock::now() + std::chrono::seconds(10));
        }
        m_server.reset();
        m_router = std::make_unique<Router>();
    }
    AgentAccess connection() const {
        return {"http://127.0.0.1:" + std::to_string(m_port), "the-token", "its file"};
    }

private:
    std::unique_ptr<Router> m_router = std::make_unique<Router>();
    std::unique_ptr<HttpServer> m_server;
    std::uint16_t m_port = 0;
};

#endif
