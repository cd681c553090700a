#include "host/cli/FormatCommands.h"

#include "host/base/Result.h"
#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/DisplayText.h"
#include "host/cli/InputFile.h"
#include "host/config/ReadyFormats.h"
#include "host/diagnose/FormatSuggestion.h"
#include "host/diagnose/FormatTrial.h"
#include "host/diagnose/LastLines.h"

#include <cerrno>
#include <cstdio>
#include <deque>
#include <filesystem>
#include <optional>
#include <system_error>
#include <utility>

#include <CLI/CLI.hpp>
#include <fcntl.h>
#include <nlohmann/json.hpp>
#include <unistd.h>

namespace zrm::host {

namespace {

using Json = nlohmann::ordered_json;

/// The last lines of standard input.
std::vector<std::string> lastOfInput() {
    InputFile file("-");
    std::deque<std::string> lines;
    while (std::optional<std::string> line = file.line()) {
        line->resize(std::min(line->size(), FormatSuggestion::longestLine));
        lines.push_back(std::move(*line));
        if (lines.size() > FormatSuggestion::mostLines) {
            lines.pop_front();
        }
    }
    return {std::make_move_iterator(lines.begin()), std::make_move_iterator(lines.end())};
}

std::vector<std::string> lastOf(const std::string& path) {
    if (path == "-") {
        return lastOfInput();
    }
    std::error_code error;
    if (std::filesystem::exists(path, error) && !std::filesystem::is_regular_file(path, error)) {
        throw CliError(CliStatus::USAGE, path + " is not a regular file; write - in its place to "
                                                "give the lines on standard input");
    }
    const int fd = open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    std::optional<std::vector<std::string>> lines;
    if (fd != -1) {
        lines = LastLines::read(fd, FormatSuggestion::mostLines);
        const int number = errno;
        close(fd);
        errno = number;
    }
    if (!lines) {
        throw CliError(errno == EACCES ? CliStatus::FORBIDDEN : CliStatus::USAGE,
                       because("cannot read " + path, errno));
    }
    return std::move(*lines);
}

/// The path that the configuration names.
std::string logOf(const std::string& file) {
    std::error_code error;
    const std::filesystem::path path = std::filesystem::absolute(file, error);
    return file == "-" || error ? std::string(FormatTrial::someLog)
                                : path.lexically_normal().string();
}

std::string percent(std::size_t part, std::size_t whole) {
    const double share = whole == 0 ? 0 : static_cast<double>(part) / static_cast<double>(whole);
    char text[16];
    std::snprintf(text, sizeof text, "%.1f %%",
                  static_cast<double>(static_cast<int>(share * 1000)) / 10);
    return text;
}

std::string nameOf(const FormatSuggestion::Choice& choice) {
    std::string name;
    for (const std::string& one : choice.names) {
        name += (name.empty() ? "" : ", ") + one;
    }
    return name.empty() ? choice.about : name + ": " + choice.about;
}

std::string equalsText(const FormatSuggestion::Choice& choice) {
    std::string names;
    for (const std::string& one : choice.equals) {
        names += (names.empty() ? "" : ", ") + one;
    }
    return names.empty() ? "" : "        fits equally: " + DisplayText::visible(names) + '\n';
}

std::string textOf(const FormatSuggestion::Choice& choice, const Terminal& terminal) {
    const FormatFit& fit = choice.fit;
    const bool isGood = fit.share() >= FormatSuggestion::leastShare;
    return terminal.coloured(percent(fit.fitting, fit.lines) + " of " + std::to_string(fit.lines) +
                                 " lines",
                             isGood ? Colour::GOOD : Colour::NOTICE) +
           "  " + DisplayText::visible(nameOf(choice)) + "\n        entries with a time " +
           percent(fit.withTime, fit.entries) + ", a type " + percent(fit.withType, fit.entries) +
           ", a source " + percent(fit.withSource, fit.entries) + '\n' + equalsText(choice);
}

/// A table with its line ends.
std::string tableOf(const FormatSuggestion::Choice& choice) {
    std::string text = "\n";
    for (std::string_view rest = choice.table; !rest.empty();) {
        const std::size_t end = std::min(rest.find('\n'), rest.size() - 1);
        text += DisplayText::visible(rest.substr(0, end)) + '\n';
        rest.remove_prefix(end + 1);
    }
    return text;
}

} // namespace

SuggestCommand::SuggestCommand(CLI::App& program)
    : m_command(
          program.add_subcommand("suggest", "Which ready format fits a file; needs no agent")) {
    m_command
        ->add_option("FILE", m_file,
                     "The file, whose last 1000 lines are looked at; - is standard input")
        ->required();
    m_command->add_option("--directory", m_directories, "Look here for formats first; repeatable")
        ->type_name("DIR")
        ->allow_extra_args(false);
}

bool SuggestCommand::isChosen() const {
    return m_command->parsed();
}

CliStatus SuggestCommand::run(Context& context) {
    const ReadyFormats formats = readyFormatsOf(context.options().config, m_directories);
    const FormatSuggestion suggestion =
        FormatSuggestion::of(formats, lastOf(m_file), logOf(m_file));
    const std::optional<FormatSuggestion::Choice>& proposal = suggestion.proposal();
    const FormatSuggestion::Choice* const best = proposal ? &*proposal
                                                 : suggestion.ready().empty()
                                                     ? nullptr
                                                     : &suggestion.ready().front();
    const CliStatus status = best != nullptr && best->fit.share() >= FormatSuggestion::leastShare
                                 ? CliStatus::DONE
                                 : CliStatus::REFUSED;
    if (context.options().json) {
        context.printJson(Json::parse(suggestion.json()));
        return status;
    }
    if (suggestion.lines() == 0) {
        Context::note(m_file + " has no lines");
    } else if (best == nullptr) {
        Context::note("no format fits these lines, and they have no shape in common");
    }
    std::string text;
    for (const FormatSuggestion::Choice& choice : suggestion.ready()) {
        text += textOf(choice, context.terminal());
    }
    if (proposal) {
        text += textOf(*proposal, context.terminal());
    }
    context.print(text + (best == nullptr ? "" : tableOf(*best)));
    return status;
}

} // namespace zrm::host
