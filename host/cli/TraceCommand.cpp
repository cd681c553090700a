#include "host/cli/Commands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/DisplayText.h"
#include "host/cli/JsonText.h"

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

TraceCommand::TraceCommand(CLI::App& program)
    : m_command(program.add_subcommand("trace", "Show or set what the agent traces")) {
    m_command->add_option("LEVELS", m_levels,
                          "error, flow, detail, fine, all, none, or for one source file "
                          "\"error,LogManager=error+detail\"");
}

bool TraceCommand::isChosen() const {
    return m_command->parsed();
}

CliStatus TraceCommand::run(Context& context) {
    const auto answer = m_levels.empty()
                            ? context.client().get("/api/v1/status")
                            : context.client().send("PUT", "/api/v1/trace", {{"levels", m_levels}});
    const std::string levels = JsonText::text(answer, m_levels.empty() ? "trace" : "levels");
    if (context.options().json) {
        context.printJson({{"levels", levels}});
    } else {
        context.print(DisplayText::visible(levels) + '\n');
    }
    return CliStatus::DONE;
}

} // namespace zrm::host
