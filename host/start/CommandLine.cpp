#include "host/start/CommandLine.h"

#include <algorithm>
#include <array>
#include <string_view>

namespace {

struct Option {
    std::string_view name;
    std::string_view argument; ///< empty: the option takes none
    std::string_view help;
};

enum OptionIndex { CONFIG, TRACE_FILE, VERSION, HELP };

constexpr std::array<Option, 4> options = {{
    {"--config", "FILE", "host configuration (default /etc/zrm/zrm.toml when it exists)"},
    {"--trace-file", "FILE", "append the trace to FILE instead of standard error"},
    {"--version", "", "print the version and end"},
    {"--help", "", "print this help and end"},
}};

} // namespace

CommandLine::CommandLine(std::span<const char* const> arguments) {
    for (std::size_t at = 0; at < arguments.size() && m_error.empty(); ++at) {
        const std::string_view argument = arguments[at];
        const std::size_t equals = argument.find('=');
        const std::string_view name = argument.substr(0, equals);
        const auto option = std::find_if(options.begin(), options.end(),
                                         [&](const Option& known) { return known.name == name; });
        if (option == options.end()) {
            m_error = "unknown argument '" + std::string(argument) + "'";
            return;
        }
        const bool hasValue = equals != std::string_view::npos;
        std::string value;
        if (option->argument.empty()) {
            m_error = hasValue ? std::string(name) + " takes no value" : "";
        } else if (hasValue) {
            value = argument.substr(equals + 1);
        } else if (at + 1 < arguments.size()) {
            value = arguments[++at];
        }
        if (!option->argument.empty() && value.empty()) {
            m_error = std::string(name) + " needs a file name";
        }
        switch (static_cast<OptionIndex>(option - options.begin())) {
        case CONFIG:
            m_config = value;
            break;
        case TRACE_FILE:
            m_traceFile = value;
            break;
        case VERSION:
            m_version = true;
            break;
        case HELP:
            m_help = true;
            break;
        }
    }
}

std::string CommandLine::help() {
    std::string text = "Usage: zrmagent [OPTION]...\n"
                       "Watches log files and reports their new entries as events.\n\n";
    for (const Option& option : options) {
        std::string left = "  " + std::string(option.name);
        if (!option.argument.empty()) {
            left += ' ' + std::string(option.argument);
        }
        left.resize(std::max<std::size_t>(left.size() + 2, 22), ' ');
        text += left + std::string(option.help) + '\n';
    }
    return text + "\nSignals: HUP re-reads the configuration of the logs, INT and TERM end the "
                  "agent.\nExit status: 0 after an orderly end, 2 for an unusable command line or "
                  "configuration,\n255 after a failure.\n";
}
