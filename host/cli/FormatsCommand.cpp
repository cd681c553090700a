#include "host/cli/FormatCommands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/DisplayText.h"
#include "host/cli/Table.h"
#include "host/config/ConfigFile.h"
#include "host/config/ReadyFormats.h"
#include "host/diagnose/FormatSamples.h"

#include <filesystem>
#include <utility>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = nlohmann::ordered_json;

/// The outcome of one format's samples.
struct Outcome {
    std::string path;
    std::size_t samples = 0;
    std::vector<std::string> failures; ///< "PATH:LINE: TEXT"
};

Outcome testOf(const ReadyFormats::Place& place) {
    Outcome outcome;
    outcome.path = place.path;
    const auto ready = ReadyFormats::load(place);
    if (!ready) {
        outcome.failures = ready.error();
        return outcome;
    }
    outcome.samples = ready->samples.size();
    for (const FormatSamples::Failure& failure : FormatSamples::check(*ready)) {
        outcome.failures.push_back(place.path +
                                   (failure.line == 0 ? "" : ':' + std::to_string(failure.line)) +
                                   ": " + failure.text);
    }
    return outcome;
}

/// A name of a format, or a path with a '/' or the ending ".toml".
ReadyFormats::Place placeOf(const ReadyFormats& formats, const std::string& name) {
    if (name.find('/') != std::string::npos || name.ends_with(".toml")) {
        return {std::filesystem::path(name).stem().string(), name};
    }
    Result<ReadyFormat> ready = formats.find(name);
    if (!ready) {
        throw CliError(CliStatus::REFUSED, "formats: " + ready.error().text());
    }
    return {name, ready->path};
}

} // namespace

ReadyFormats readyFormatsOf(const std::string& config, std::vector<std::string> directories) {
    const std::string path = config.empty() ? "/etc/zrm/zrm.toml" : config;
    if (const ConfigFile::Result agent = ConfigFile::loadAccess(path)) {
        directories.insert(directories.end(), agent->formatDirectories.begin(),
                           agent->formatDirectories.end());
    } else if (!config.empty()) {
        throw CliError(CliStatus::USAGE, agent.error().front());
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
    if (context.options().json) {
        context.printJson({{"name", ready->name}, {"path", ready->path}, {"toml", ready->text}});
        return CliStatus::DONE;
    }
    std::string text = "# " + DisplayText::visible(ready->path) + '\n';
    for (std::string_view rest = ready->text; !rest.empty();) {
        const std::size_t end = std::min(rest.find('\n'), rest.size() - 1);
        text += DisplayText::visible(rest.substr(0, end)) + '\n';
        rest.remove_prefix(end + 1);
    }
    context.print(text);
    return CliStatus::DONE;
}

CliStatus FormatsCommand::test(Context& context) {
    const ReadyFormats formats = this->formats(context);
    std::vector<ReadyFormats::Place> places;
    for (const std::string& name : m_names) {
        places.push_back(placeOf(formats, name));
    }
    std::size_t samples = 0;
    std::size_t failed = 0;
    Json all = Json::array();
    for (const ReadyFormats::Place& place : m_names.empty() ? formats.list() : places) {
        const Outcome outcome = testOf(place);
        samples += outcome.samples;
        failed += outcome.failures.empty() ? 0 : 1;
        all.push_back({{"name", place.name},
                       {"path", place.path},
                       {"samples", outcome.samples},
                       {"failures", outcome.failures}});
        for (const std::string& failure : outcome.failures) {
            if (!context.options().json) {
                context.print(
                    context.terminal().coloured(DisplayText::visible(failure), Colour::BAD) + '\n');
            }
        }
    }
    if (context.options().json) {
        context.printJson({{"formats", all}});
    } else {
        context.print(std::to_string(all.size()) + " formats, " + std::to_string(samples) +
                      " samples, " + std::to_string(failed) + " formats failed\n");
    }
    return failed > 0 || all.empty() ? CliStatus::REFUSED : CliStatus::DONE;
}

} // namespace zrm::host
