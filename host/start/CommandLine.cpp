#include "host/start/CommandLine.h"

#include <algorithm>
#include <cstddef>
#include <optional>
#include <string_view>
#include <vector>

#include <CLI/CLI.hpp>

namespace zrm::host {

namespace {

/// The values of the options.
struct Values {
    std::string config;
    std::string traceFile;
    bool version = false;
    bool help = false;
};

/// The options, in the order in which they are listed. Each may be given again; the last one
/// counts.
void addOptions(CLI::App& app, Values& values) {
    app.set_help_flag(); // so that what is wrong beside --help is reported
    app.add_option("--config", values.config,
                   "host configuration (default /etc/zrm/zrm.toml if it exists)")
        ->type_name("FILE")
        ->expected(0, 1) // what is missing is reported below
        ->take_last();
    app.add_option("--trace-file", values.traceFile,
                   "append the trace to FILE instead of standard error")
        ->type_name("FILE")
        ->expected(0, 1) // what is missing is reported below
        ->take_last();
    app.add_flag("--version", values.version, "print the version and exit")
        ->disable_flag_override()
        ->take_last();
    app.add_flag("--help", values.help, "print this help and exit")
        ->disable_flag_override()
        ->take_last();
}

/// The name of an option that has no value, or an empty one.
std::optional<std::string> withoutValue(const CLI::App& app) {
    for (const CLI::Option* const option : app.get_options()) {
        const bool takesFile = option->get_expected_max() > 0;
        const std::vector<std::string>& values = option->results();
        if (takesFile && option->count() > 0 && (values.empty() || values.back().empty())) {
            return option->get_name();
        }
    }
    return std::nullopt;
}

/// The name of a flag that was given a value.
std::string flagWithValue(const CLI::App& app, std::span<const char* const> arguments) {
    for (const CLI::Option* const option : app.get_options()) {
        const std::string begin = option->get_name() + '=';
        if (option->get_expected_max() == 0 &&
            std::any_of(arguments.begin(), arguments.end(), [&](const char* argument) {
                return std::string_view(argument).starts_with(begin);
            })) {
            return option->get_name();
        }
    }
    return "an option";
}

} // namespace

Result<CommandLine> CommandLine::parse(std::span<const char* const> arguments) {
    CLI::App app;
    Values values;
    addOptions(app, values);
    try {
        app.parse(std::vector<std::string>(arguments.rbegin(), arguments.rend())); // last one first
    } catch (const CLI::ExtrasError&) {
        return refused("unknown argument '" + app.remaining().front() + "'");
    } catch (const CLI::ArgumentMismatch&) {
        return refused(flagWithValue(app, arguments) + " takes no value");
    } catch (const CLI::ParseError& error) {
        return refused(error.what());
    }
    if (const std::optional<std::string> name = withoutValue(app)) {
        return refused(*name + " needs a file name");
    }
    CommandLine commandLine;
    commandLine.m_config = values.config;
    commandLine.m_traceFile = values.traceFile;
    commandLine.m_version = values.version;
    commandLine.m_help = values.help;
    return commandLine;
}

std::string CommandLine::help() {
    CLI::App app;
    Values values;
    addOptions(app, values);
    std::string text = "Usage: zrmagent [OPTION]...\n"
                       "Watches log files and reports their new entries as events.\n\n";
    for (const CLI::Option* const option : app.get_options()) {
        constexpr std::size_t column = 22;
        std::string left = "  " + option->get_name();
        if (option->get_expected_max() > 0) {
            left += ' ' + option->get_type_name();
        }
        left.resize(std::max(left.size() + 2, column), ' ');
        text += left + option->get_description() + '\n';
    }
    return text + "\nSignals: HUP re-reads the log configuration, INT and TERM stop the "
                  "agent.\nExit status: 0 after an orderly stop, 2 for an unusable command line or "
                  "configuration,\n255 after a failure.\n";
}

} // namespace zrm::host
