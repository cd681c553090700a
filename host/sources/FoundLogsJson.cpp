#include "host/sources/FoundLogsJson.h"

#include <nlohmann/json.hpp>

namespace zrm::host {

nlohmann::ordered_json foundLogsJson(const FoundLogs& found) {
    using Json = nlohmann::ordered_json;
    Json tables = Json::array();
    for (const FoundLogs::Source& source : found.sources) {
        Json passedOver = Json::array();
        for (const FoundLogs::PassedOver& one : source.passedOver) {
            passedOver.push_back({{"file", one.file}, {"reason", one.reason + '.'}});
        }
        Json table{{"line", source.line},
                   {"path", source.paths},
                   {"files", source.files},
                   {"passed_over", std::move(passedOver)},
                   {"passed_over_count", source.passedOverCount},
                   {"problem", nullptr}};
        if (!source.problem.empty()) {
            table["problem"] = source.problem + '.';
        }
        tables.push_back(std::move(table));
    }
    return tables;
}

} // namespace zrm::host
