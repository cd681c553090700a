#include "host/sources/FoundLogs.h"

#include "host/base/JsonWriter.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

void FoundLogs::Source::passOver(std::string file, std::string reason) {
    ++passedOverCount;
    if (passedOver.size() < mostPassedOver) {
        passedOver.push_back({std::move(file), std::move(reason)});
    }
}

bool FoundLogs::Source::mentions(std::string_view file) const {
    return std::find(files.begin(), files.end(), file) != files.end() ||
           std::any_of(passedOver.begin(), passedOver.end(),
                       [file](const PassedOver& one) { return one.file == file; });
}

void FoundLogs::Source::write(JsonWriter& json) const {
    json.beginObject()
        .member("line", line)
        .member("format", format)
        .member("path", paths)
        .member("files", files);
    json.key("passed_over").beginArray();
    for (const PassedOver& one : passedOver) {
        json.beginObject().member("file", one.file).member("reason", one.reason + '.').endObject();
    }
    json.endArray().member("passed_over_count", passedOverCount);
    json.textOrNull("problem", problem.empty() ? "" : problem + '.').endObject();
}

std::vector<FoundLogs::Source>
FoundLogs::sourcesBeside(const std::set<std::string>& configured) const {
    std::vector<Source> beside = sources;
    for (Source& source : beside) {
        std::vector<std::string> followed;
        for (std::string& file : source.files) {
            if (configured.contains(file)) {
                source.passOver(std::move(file), "The log configuration names it, too, and its "
                                                 "line applies");
            } else {
                followed.push_back(std::move(file));
            }
        }
        source.files = std::move(followed);
    }
    return beside;
}

} // namespace zrm::host
