#ifndef ZRM_HOST_CLI_CONTEXT_H
#define ZRM_HOST_CLI_CONTEXT_H

#include "host/cli/AgentAccess.h"
#include "host/cli/AgentClient.h"
#include "host/cli/Terminal.h"

#include <memory>
#include <string>
#include <string_view>

namespace zrm::host {

/// What a command works with: the agent, standard output and standard error. One thread.
class Context {
public:
    Context(const CommonOptions& options, const Terminal& terminal);
    ~Context();

    const CommonOptions& options() const noexcept { return m_options; }
    const Terminal& terminal() const noexcept { return m_terminal; }

    /// The agent; its address and token are determined by the first call. Throws CliError.
    AgentClient& client();
    const AgentAccess& access();

    /// Writes to standard output at once. Throws CliError when it cannot be written.
    void print(std::string_view text) const;
    /// Writes JSON, indented on a terminal, otherwise on one line.
    void printJson(const nlohmann::ordered_json& value) const;
    /// Writes a message for the operator to standard error: "zrmctl: TEXT".
    static void note(const std::string& text);
    /// Writes how far the logs of an answer with `complete`, `reached` and `reason` were read;
    /// nothing when they were read completely.
    static void noteReach(const nlohmann::ordered_json& answer);

    /// Converts a time typed by an operator to a form that the agent reads. Throws a CliError that
    /// names the option.
    static std::string time(const std::string& option, const std::string& text);

private:
    const CommonOptions& m_options;
    Terminal m_terminal;
    std::unique_ptr<AgentAccess> m_access;
    std::unique_ptr<AgentClient> m_client;
};

} // namespace zrm::host

#endif
