#ifndef TEST_AGENT_H
#define TEST_AGENT_H

#include "host/cli/AgentAccess.h"

#include <memory>
#include <string>
#include <thread>

#include <httplib.h>

/// A server that answers as a test says. Routes are added before `begin`.
class TestAgent {
public:
    ~TestAgent() { end(); }

    httplib::Server& routes() { return *m_server; }

    /// Begins to serve, at the port of the time before when there was one.
    void begin() {
        m_server->set_keep_alive_timeout(1);
        m_port = m_port == 0 ? m_server->bind_to_any_port("127.0.0.1")
                             : (m_server->bind_to_port("127.0.0.1", m_port) ? m_port : -1);
        m_thread = std::thread([this] { m_server->listen_after_bind(); });
        while (!m_server->is_running()) {
            std::this_thread::yield();
        }
    }
    /// Ends, and forgets its routes.
    void end() {
        if (m_thread.joinable()) {
            m_server->stop();
            m_thread.join();
        }
        m_server = std::make_unique<httplib::Server>();
    }
    AgentAccess connection() const {
        return {"http://127.0.0.1:" + std::to_string(m_port), "the-token", "its file"};
    }

private:
    std::unique_ptr<httplib::Server> m_server = std::make_unique<httplib::Server>();
    int m_port = 0;
    std::thread m_thread;
};

#endif
