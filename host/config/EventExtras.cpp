#include "host/config/EventExtras.h"

#include "host/base/Utf8.h"
#include "host/config/HttpUrl.h"

#include <algorithm>
#include <array>
#include <string_view>

namespace zrm::host {

namespace {

/// Labels that receivers get from the event itself.
constexpr std::array<std::string_view, 4> eventLabels = {"alertname", "severity", "log", "node"};
constexpr std::string_view groupPrefix = "group_";

bool isLetter(char c) {
    return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || c == '_';
}

bool isLabelName(std::string_view name) {
    return !name.empty() && name.size() <= EventExtras::longestLabelName &&
           isLetter(name.front()) && std::all_of(name.begin(), name.end(), [](char c) {
               return isLetter(c) || (c >= '0' && c <= '9');
           });
}

bool isOfEvents(std::string_view name) {
    return name.starts_with(groupPrefix) ||
           std::find(eventLabels.begin(), eventLabels.end(), name) != eventLabels.end();
}

bool isLabelValue(std::string_view value) {
    if (value.empty() || value.size() > EventExtras::longestLabelValue ||
        Utf8::validPrefix(value) != value.size()) {
        return false;
    }
    while (!value.empty()) {
        const std::size_t length = Utf8::firstSequence(value).length;
        if (Utf8::isSteering(Utf8::character(value.substr(0, length)))) {
            return false;
        }
        value.remove_prefix(length);
    }
    return true;
}

/// A fragment has the characters of a query.
bool isFragment(std::string_view text) {
    return HttpUrl::parse("http://localhost/?" + std::string(text)).has_value();
}

} // namespace

Result<void> EventExtras::checkRunbook(const std::string& url) {
    const std::size_t hash = std::min(url.find('#'), url.size());
    const bool isUrl = url.size() <= longestRunbook && HttpUrl::parse(url.substr(0, hash)) &&
                       (hash == url.size() || isFragment(url.substr(hash + 1)));
    return isUrl ? Result<void>()
                 : refused("is not the URL of a page",
                           "write one of at most 2048 bytes that begins with http:// or https://, "
                           "without a user name",
                           "runbook");
}

Result<void> EventExtras::checkLabels(const Labels& labels) {
    const auto refuse = [](std::string what, std::string cure) {
        return refused(std::move(what), std::move(cure), "labels");
    };
    if (labels.size() > mostLabels) {
        return refuse("has " + std::to_string(labels.size()) + " labels",
                      "write at most " + std::to_string(mostLabels));
    }
    for (const auto& [name, value] : labels) {
        if (!isLabelName(name)) {
            return refuse("'" + name.substr(0, longestLabelName) + "' is not the name of a label",
                          "write letters, digits and '_', at most 64 of them, not beginning with a "
                          "digit");
        }
        if (isOfEvents(name)) {
            return refuse("'" + name + "' is a label that events have anyway", "choose another");
        }
        if (!isLabelValue(value)) {
            return refuse("the value of '" + name + "' is not usable",
                          "write 1 to 256 bytes of UTF-8 without control characters");
        }
    }
    return {};
}

} // namespace zrm::host
