#include "host/cli/Program.h"

#include "host/cli/CliError.h"
#include "host/cli/Commands.h"
#include "host/cli/Context.h"
#include "host/cli/EpisodesCommand.h"
#include "host/cli/FormatCommands.h"
#include "host/cli/SilenceCommands.h"
#include "host/cli/Terminal.h"

#include <new>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

/// What is wrong with a command line, including the word in place of a command.
std::string problemOf(const CLI::App& app, const CLI::ParseError& error) {
    if (!app.get_subcommands().empty()) {
        return error.what();
    }
    const std::vector<std::string> rest = app.remaining();
    return rest.empty() ? "name a command" : '\'' + rest.front() + "' is not a command";
}

/// Where the operator finds the usage of the command.
std::string hintOf(const CLI::App& app) {
    std::string command = "zrmctl";
    for (const CLI::App* at = &app; !at->get_subcommands().empty();) {
        at = at->get_subcommands().front();
        command += ' ' + at->get_name();
    }
    return "; " + command + " --help lists " +
           (app.get_subcommands().empty() ? "commands and options" : "its options");
}

} // namespace

Program::Program()
    : m_app(std::make_unique<CLI::App>("Works with the log-monitoring agent zrmagent.", "zrmctl")) {
    m_app->set_version_flag("--version", "zrmctl " ZRM_VERSION, "Print the version and exit");
    m_app->set_help_flag("-h,--help", "Print this help and exit; also after a command");
    m_app
        ->add_option("--config", m_options.config,
                     "The agent's configuration (default /etc/zrm/zrm.toml), for address and token")
        ->type_name("FILE");
    m_app->add_option("--url", m_options.url, "The agent's address (default: ZRM_URL)")
        ->type_name("URL");
    m_app
        ->add_option("--token-file", m_options.tokenFile,
                     "The file with the token (default: ZRM_TOKEN)")
        ->type_name("FILE");
    m_app
        ->add_option("--ca-file", m_options.caFile,
                     "Certificates to trust besides the system's (default: ZRM_CA_FILE)")
        ->type_name("FILE");
    m_app->add_flag("--json", m_options.json, "Print JSON");
    m_app->fallthrough(); // these options may also follow the command
    m_app->require_subcommand(1);
    m_app->footer("Exit status: 0 done, 1 refused or nothing found, 2 unusable command line or\n"
                  "configuration, 3 no agent answered, 4 no permission.");
    m_commands.push_back(std::make_unique<StatusCommand>(*m_app));
    m_commands.push_back(std::make_unique<LogsCommand>(*m_app));
    m_commands.push_back(std::make_unique<EventsCommand>(*m_app));
    m_commands.push_back(std::make_unique<EpisodesCommand>(*m_app));
    m_commands.push_back(std::make_unique<AckCommand>(*m_app));
    m_commands.push_back(std::make_unique<ReportCommand>(*m_app));
    m_commands.push_back(std::make_unique<SituationsCommand>(*m_app));
    m_commands.push_back(std::make_unique<SilenceCommand>(*m_app));
    m_commands.push_back(std::make_unique<ExplainCommand>(*m_app));
    m_commands.push_back(std::make_unique<BacktestCommand>(*m_app));
    m_commands.push_back(std::make_unique<RefreshCommand>(*m_app));
    m_commands.push_back(std::make_unique<TraceCommand>(*m_app));
    m_commands.push_back(std::make_unique<CheckCommand>(*m_app));
    m_commands.push_back(std::make_unique<TryCommand>(*m_app));
    m_commands.push_back(std::make_unique<FormatsCommand>(*m_app));
    m_commands.push_back(std::make_unique<RulesCommand>(*m_app));
    m_commands.push_back(std::make_unique<SuggestCommand>(*m_app));
}

Program::~Program() = default;

CliStatus Program::run(int argc, const char* const* argv) {
    try {
        m_app->parse(argc, argv);
    } catch (const CLI::Success& wish) { // --help, --version
        m_app->exit(wish);               // prints the text
        return CliStatus::DONE;
    } catch (const CLI::ParseError& error) {
        Context::note(problemOf(*m_app, error) + hintOf(*m_app));
        return CliStatus::USAGE;
    }
    try {
        return runCommand();
    } catch (const CliError& error) {
        Context::note(error.what());
        return error.status();
    } catch (const nlohmann::json::exception&) {
        Context::note(
            "what answers is not a zrmagent of this version: its answer has a different form");
        return CliStatus::UNREACHABLE;
    } catch (const std::bad_alloc&) {
        Context::note("not enough memory for the answer");
        return CliStatus::REFUSED;
    }
}

CliStatus Program::runCommand() {
    Context context(m_options, Terminal::ofStandardOutput());
    for (const std::unique_ptr<Command>& command : m_commands) {
        if (command->isChosen()) {
            return command->run(context);
        }
    }
    return CliStatus::USAGE;
}

} // namespace zrm::host
