#include "host/cli/ReadyFilesText.h"

#include "host/cli/Context.h"
#include "host/cli/DisplayText.h"

#include <algorithm>
#include <filesystem>
#include <string_view>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = nlohmann::ordered_json;

} // namespace

void SampleOutcome::add(const std::vector<SampleFailure>& found) {
    for (const SampleFailure& failure : found) {
        failures.push_back(place.path +
                           (failure.line == 0 ? "" : ':' + std::to_string(failure.line)) + ": " +
                           failure.text);
    }
}

CliStatus printOutcomes(Context& context, const std::string& kind,
                        const std::vector<SampleOutcome>& outcomes) {
    std::size_t samples = 0;
    std::size_t failed = 0;
    Json all = Json::array();
    for (const SampleOutcome& outcome : outcomes) {
        samples += outcome.samples;
        failed += outcome.failures.empty() ? 0 : 1;
        all.push_back({{"name", outcome.place.name},
                       {"path", outcome.place.path},
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
        context.printJson({{kind, all}});
    } else {
        context.print(std::to_string(outcomes.size()) + ' ' + kind + ", " +
                      std::to_string(samples) + " samples, " + std::to_string(failed) + ' ' + kind +
                      " failed\n");
    }
    return failed > 0 || outcomes.empty() ? CliStatus::REFUSED : CliStatus::DONE;
}

void printFile(Context& context, const ReadyFiles::Place& place, const std::string& file) {
    if (context.options().json) {
        context.printJson({{"name", place.name}, {"path", place.path}, {"toml", file}});
        return;
    }
    std::string text = "# " + DisplayText::visible(place.path) + '\n';
    for (std::string_view rest = file; !rest.empty();) {
        const std::size_t end = std::min(rest.find('\n'), rest.size() - 1);
        text += DisplayText::visible(rest.substr(0, end)) + '\n';
        rest.remove_prefix(end + 1);
    }
    context.print(text);
}

ReadyFiles::Place placeOfFile(const std::string& name) {
    const bool isFile = name.find('/') != std::string::npos || name.ends_with(".toml");
    return {isFile ? std::filesystem::path(name).stem().string() : name, isFile ? name : ""};
}

} // namespace zrm::host
