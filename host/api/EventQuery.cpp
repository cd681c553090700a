#include "host/api/EventQuery.h"

#include <algorithm>
#include <array>
#include <string>

namespace zrm::host {

namespace {

constexpr std::array severities = {"info", "minor", "warning", "major", "critical"};
constexpr std::size_t mostNames = 100;   ///< names of one kind
constexpr std::size_t longestText = 256; ///< bytes

void limitNames(const std::vector<std::string>& names, const char* field) {
    if (names.size() > mostNames) {
        throw RequestRefused(400, "the parameter appears more than 100 times", field);
    }
}

} // namespace

HistoryReader& EventQuery::history(HistoryReader* reader) {
    if (reader == nullptr) {
        throw RequestRefused(409, "the history is off", "");
    }
    return *reader;
}

void EventQuery::readKinds(QueryFields& query, EventFilter& filter) {
    filter.situations = query.texts("situation");
    filter.logs = query.texts("log");
    filter.severities = query.texts("severity");
    if (const auto silenced = query.text("silenced")) {
        if (*silenced != "true" && *silenced != "false") {
            throw RequestRefused(400, "write true or false", "silenced");
        }
        filter.silenced = *silenced == "true";
    }
    filter.text = query.text("text").value_or("");
    if (filter.text.size() > longestText) {
        throw RequestRefused(400, "write at most 256 bytes", "text");
    }
    limitNames(filter.situations, "situation");
    limitNames(filter.logs, "log");
    limitNames(filter.severities, "severity");
    for (const std::string& severity : filter.severities) {
        if (std::find(severities.begin(), severities.end(), severity) == severities.end()) {
            throw RequestRefused(
                400,
                "'" + severity +
                    "' is not a severity; the severities are info, minor, warning, "
                    "major, critical",
                "severity");
        }
    }
}

} // namespace zrm::host
