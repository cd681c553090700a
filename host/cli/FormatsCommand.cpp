#include "host/cli/FormatCommands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/ReadyFilesText.h"
#include "host/cli/Table.h"
#include "host/config/ConfigFile.h"
#include "host/config/ReadyFormats.h"
#include "host/diagnose/FormatSamples.h"

#include <utility>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = nlohmann::ordered_json;

SampleOutcome testOf(const ReadyFormats::Place& place) {
    SampleOutcome outcome{place};
    const auto ready = ReadyFormats::load(place);
    if (!ready) {
        outcome.failures = ready.error();
        return outcome;
    }
    outcome.samples = ready->samples.size();
    outcome.add(FormatSamples::check(*ready));
    return outcome;
}

/// A name of a format, or the path of a file.
ReadyFormats::Place placeOf(const ReadyFormats& formats, const std::string& name) {
    ReadyFormats::Place place = placeOfFile(name);
    if (place.path.empty()) {
        const Result<ReadyFormat> ready = formats.find(name);
        if (!ready) {
            throw CliError(CliStatus::REFUSED, "formats: " + ready.error().text());
        }
        place.path = ready->path;
    }
    return place;
}

} // namespace

ConfigFile::Result agentAccess(const std::string& config) {
    ConfigFile::Result agent =
        ConfigFile::loadAccess(config.empty() ? "/etc/zrm/zrm.toml" : config);
    if (!agent && !config.empty()) {
        throw CliError(CliStatus::USAGE, agent.error().front());
    }
    return agent;
}

ReadyFormats readyFormatsOf(const std::string& config, std::vector<std::string> directories) {
    if (const ConfigFile::Result agent = agentAccess(config)) {
        directories.insert(directories.end(), agent->formatDirectories.begin(),
                           agent->formatDirectories.end());
    }
    return ReadyFormats(std::move(directories));
}

FormatsCommand::FormatsCommand(CLI::App& program)
    : m_command(program.add_subcommand("formats", "Ready formats of logs; needs no agent")) {
    m_command->require_subcommand(0, 1);
    m_command->add_option("--directory", m_directories, "Look here for formats first; repeatable")
        ->type_name("DIR")
        ->allow_extra_args(false);
    m_command->add_subcommand("list", "All formats (the default)");
    m_show = m_command->add_subcommand("show", "What a format says");
    m_show->add_option("NAME", m_name, "The format's name")->required();
    m_test = m_command->add_subcommand("test", "Hold formats to their samples");
    m_test->add_option("NAME", m_names, "Names of formats, or files; none: all formats");
}

bool FormatsCommand::isChosen() const {
    return m_command->parsed();
}

ReadyFormats FormatsCommand::formats(const Context& context) const {
    return readyFormatsOf(context.options().config, m_directories);
}

CliStatus FormatsCommand::run(Context& context) {
    if (m_show->parsed()) {
        return show(context);
    }
    return m_test->parsed() ? test(context) : list(context);
}

CliStatus FormatsCommand::list(Context& context) {
    Table table({{"FORMAT", Table::FIXED}, {"TYPE", Table::FIXED}, {"OF"}});
    Json all = Json::array();
    for (const ReadyFormats::Place& place : formats(context).list()) {
        const auto ready = ReadyFormats::load(place);
        const std::string about = ready ? ready->about : ready.error().front();
        const std::string type = ready ? ready->format.type : "";
        table.add({place.name, type, {about, ready ? Colour::NONE : Colour::BAD}});
        all.push_back({{"name", place.name},
                       {"type", type},
                       {"description", ready ? about : ""},
                       {"path", place.path},
                       {"problem", ready ? "" : about}});
    }
    if (context.options().json) {
        context.printJson({{"formats", all}});
    } else if (!table.empty()) {
        context.print(table.text(context.terminal()));
    }
    if (table.empty()) {
        Context::note("there are no ready formats; --directory names a directory with some");
        return CliStatus::REFUSED;
    }
    return CliStatus::DONE;
}

CliStatus FormatsCommand::show(Context& context) {
    const Result<ReadyFormat> ready = formats(context).find(m_name);
    if (!ready) {
        throw CliError(CliStatus::REFUSED, "formats: " + ready.error().text());
    }
    printFile(context, {ready->name, ready->path}, ready->text);
    return CliStatus::DONE;
}

CliStatus FormatsCommand::test(Context& context) {
    const ReadyFormats formats = this->formats(context);
    std::vector<ReadyFormats::Place> places;
    for (const std::string& name : m_names) {
        places.push_back(placeOf(formats, name));
    }
    std::vector<SampleOutcome> outcomes;
    for (const ReadyFormats::Place& place : m_names.empty() ? formats.list() : places) {
        outcomes.push_back(testOf(place));
    }
    return printOutcomes(context, "formats", outcomes);
}

} // namespace zrm::host
