#ifndef ZRM_HOST_AGENT_CLIENT_H
#define ZRM_HOST_AGENT_CLIENT_H

#include "host/cli/AgentAccess.h"

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <string_view>

#include <nlohmann/json_fwd.hpp>

namespace zrm::host {

/// Requests to the agent's HTTP API. One thread, except stop. Failures are thrown as CliError:
/// no answer, a rejected token, or the text of a problem document.
class AgentClient {
public:
    using Json = nlohmann::ordered_json;
    using Query = std::multimap<std::string, std::string>;

    explicit AgentClient(AgentAccess access);
    AgentClient(const AgentClient&) = delete;
    AgentClient& operator=(const AgentClient&) = delete;
    ~AgentClient();

    Json get(const std::string& path, const Query& query = {});
    /// Sends a body (null: none) with a method; null when the answer has none.
    Json send(const std::string& method, const std::string& path, const Json& body);

    /// Sends a body and passes on the answer, an object on each line, as it arrives. Throws also
    /// when the answer ends before its last object, which has the member `last`.
    void lines(const std::string& path, const Json& body, const std::string& last,
               const std::function<void(Json&&)>& receiver);

    /// Reads an endless answer and passes its pieces on. Returns when it is interrupted or after
    /// stop; throws CliError when it does not begin.
    void stream(const std::string& path, const Query& query,
                const std::function<void(std::string_view)>& receiver);
    /// Ends the request in progress, and every later one before it begins. Any thread.
    void stop();

private:
    class Implementation;
    std::unique_ptr<Implementation> m_implementation;
};

} // namespace zrm::host

#endif
