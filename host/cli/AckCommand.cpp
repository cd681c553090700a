#include "host/base/UrlText.h"
#include "host/cli/Context.h"
#include "host/cli/DisplayText.h"
#include "host/cli/EpisodesCommand.h"
#include "host/cli/JsonText.h"
#include "host/cli/SilenceCommands.h"

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

using Json = JsonText::Json;

AckCommand::AckCommand(CLI::App& program)
    : m_command(program.add_subcommand(
          "ack", "Acknowledge an episode: others see who works on it, and sinks change nothing")) {
    m_command->add_option("ID", m_id, "The episode's id")->required();
    CLI::Option* const note =
        m_command->add_option("--note", m_note, "A note for others to read")->type_name("TEXT");
    CLI::Option* const who =
        m_command->add_option("--who", m_who, "Your name (default: that of your account)")
            ->type_name("NAME");
    m_command->add_flag("--withdraw", m_isWithdrawn, "Withdraw what was acknowledged")
        ->excludes(note)
        ->excludes(who);
}

bool AckCommand::isChosen() const {
    return m_command->parsed();
}

CliStatus AckCommand::run(Context& context) {
    const std::string route = "/api/v1/episodes/" + UrlText::encode(m_id) + "/ack";
    Json body;
    if (!m_isWithdrawn) {
        body = {{"who", m_who.empty() ? operatorName() : m_who}, {"note", m_note}};
    }
    const Json episode = context.client().send(m_isWithdrawn ? "DELETE" : "POST", route, body);
    if (context.options().json) {
        context.printJson(episode);
    } else {
        const Json& by = JsonText::member(episode, "acknowledged");
        context.print("episode " + JsonText::text(episode, "id") +
                      (m_isWithdrawn ? " is no longer acknowledged\n"
                                     : " is acknowledged by " +
                                           DisplayText::visible(JsonText::text(by, "who")) + '\n'));
    }
    return CliStatus::DONE;
}

} // namespace zrm::host
