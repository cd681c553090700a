#ifndef ZRM_TESTS_SCRIPTED_SERVER_H
#define ZRM_TESTS_SCRIPTED_SERVER_H

#include <chrono>
#include <cstdint>
#include <functional>
#include <list>
#include <mutex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

/// An HTTP server on a free port of this machine that sends exactly the bytes a test wants.
class ScriptedServer {
public:
    struct Request {
        std::string line;    ///< the first line
        std::string headers; ///< the following lines, in lower case
        std::string body;
        int connection = 0; ///< counted from 1

        /// The value of a header (its name in lower case); empty when it is missing.
        std::string header(const std::string& name) const;
    };
    struct Reply {
        std::string bytes;
        enum Then { KEEP, CLOSE, HOLD } then = KEEP; ///< HOLD: it does nothing more
        std::string endless = {};                    ///< sent repeatedly until the client leaves
        std::chrono::milliseconds pause{0};          ///< before each time
    };
    /// Called for each request, one at a time.
    using Script = std::function<Reply(const Request& request)>;

    explicit ScriptedServer(Script script);
    ~ScriptedServer();
    ScriptedServer(const ScriptedServer&) = delete;
    ScriptedServer& operator=(const ScriptedServer&) = delete;

    /// Answers with this status.
    static Reply status(int status, const std::string& body = "", const std::string& headers = "");

    /// Changes a variable that the script reads.
    template <typename Type, typename Value> void set(Type& variable, Value&& value) {
        const std::lock_guard guard(m_mutex);
        variable = std::forward<Value>(value);
    }

    std::string url(const std::string& path = "") const;
    std::uint16_t port() const { return m_port; }

    /// The requests so far.
    std::vector<Request> requests() const;
    /// The bodies of the requests so far.
    std::vector<std::string> bodies() const;

private:
    void accept();
    void serve(int socket, int number);

    const Script m_script;
    int m_listener = -1;
    std::uint16_t m_port = 0;
    mutable std::mutex m_mutex;
    bool m_ending = false;
    std::vector<Request> m_requests;
    std::vector<int> m_sockets;
    std::list<std::jthread> m_threads;
    std::jthread m_acceptor;
};

#endif
