#ifndef ZRM_TESTS_TEST_CLIENT_H
#define ZRM_TESTS_TEST_CLIENT_H

#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

/// A client of a server on this machine that waits for each answer. One thread.
class TestClient {
public:
    using Headers = std::vector<std::pair<std::string, std::string>>;

    struct Reply {
        int status = 0;
        std::string body;
        std::multimap<std::string, std::string> headers; ///< names in lower case
        std::string header(const std::string& name) const {
            const auto found = headers.find(name);
            return found == headers.end() ? "" : found->second;
        }
    };

    /// `token`: empty for none.
    TestClient(std::string host, std::uint16_t port, std::string token = "");
    ~TestClient();
    TestClient(TestClient&&) noexcept;

    /// Sends over the connection of the previous request if that is still open. None when no
    /// complete answer arrives.
    std::optional<Reply> ask(const std::string& method, const std::string& path,
                             const std::string& body = "", const Headers& headers = {});
    std::optional<Reply> get(const std::string& path, const Headers& headers = {}) {
        return ask("GET", path, "", headers);
    }
    std::optional<Reply> post(const std::string& path, const std::string& body,
                              const std::string& type = "application/json") {
        return ask("POST", path, body, {{"Content-Type", type}});
    }

    /// Follows an answer as it arrives; `take` gets each new part of the body until it returns
    /// false.
    std::optional<Reply> follow(const std::string& path,
                                const std::function<bool(std::string_view)>& take);

    /// Sends bytes unchanged over a new connection, and returns everything that arrives until the
    /// server closes.
    std::string raw(const std::string& bytes);

    /// A connection of its own: a descriptor, which the caller closes.
    static int connected(std::uint16_t port);

private:
    class Connection;
    std::string m_host;
    std::uint16_t m_port;
    std::string m_token;
    std::unique_ptr<Connection> m_connection;
};

#endif
