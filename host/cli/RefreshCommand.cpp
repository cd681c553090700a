#include "host/cli/Commands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

RefreshCommand::RefreshCommand(CLI::App& program)
    : m_command(program.add_subcommand("refresh", "Make the agent re-read its log configuration")) {
}

bool RefreshCommand::isChosen() const {
    return m_command->parsed();
}

CliStatus RefreshCommand::run(Context& context) {
    const auto answer = context.client().send("POST", "/api/v1/refresh", nullptr);
    if (context.options().json) {
        context.printJson(answer);
    }
    return CliStatus::DONE;
}

} // namespace zrm::host
