#include "host/cli/Context.h"

#include "host/base/Result.h"
#include "host/base/TimeText.h"
#include "host/cli/CliError.h"
#include "host/cli/DisplayText.h"
#include "host/cli/JsonText.h"
#include "host/cli/TimeDisplay.h"
#include "host/cli/TimeInput.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <ctime>
#include <optional>

#include <nlohmann/json.hpp>

namespace zrm::host {

Context::Context(const CommonOptions& options, const Terminal& terminal)
    : m_options(options), m_terminal(terminal) {}

Context::~Context() = default;

const AgentAccess& Context::access() {
    if (m_access == nullptr) {
        m_access = std::make_unique<AgentAccess>(AgentAccess::find(m_options));
    }
    return *m_access;
}

AgentClient& Context::client() {
    if (m_client == nullptr) {
        m_client = std::make_unique<AgentClient>(access());
    }
    return *m_client;
}

void Context::print(std::string_view text) const {
    if (std::fwrite(text.data(), 1, text.size(), stdout) != text.size() ||
        std::fflush(stdout) != 0) {
        throw CliError(CliStatus::REFUSED, because("cannot write", errno));
    }
}

void Context::printJson(const nlohmann::ordered_json& value) const {
    print(JsonText::dump(value, !m_terminal.isTerminal) + '\n');
}

void Context::note(const std::string& text) {
    std::string lines;
    for (std::size_t from = 0; from <= text.size();) {
        const std::size_t end = std::min(text.find('\n', from), text.size());
        lines += "zrmctl: " + DisplayText::visible(text.substr(from, end - from)) + '\n';
        from = end + 1;
    }
    std::fwrite(lines.data(), 1, lines.size(), stderr);
}

void Context::noteReach(const nlohmann::ordered_json& answer) {
    if (JsonText::text(answer, "complete") != "false") {
        return;
    }
    const std::string reached = JsonText::text(answer, "reached");
    note("not everything was read: " + JsonText::text(answer, "reason") +
         (reached.empty() ? "" : "; read back to " + TimeDisplay::stamp(reached)));
}

std::string Context::time(const std::string& option, const std::string& text) {
    const std::optional<std::string> time = TimeInput::toIso(text, WallClock::seconds());
    if (!time) {
        throw CliError(CliStatus::USAGE,
                       option + ": '" + text + "' is not a time; write " + TimeInput::forms);
    }
    return *time;
}

} // namespace zrm::host
