#include "host/analysis/Reach.h"

#include <nlohmann/json.hpp>

namespace zrm::host {

void Reach::addTo(nlohmann::ordered_json& object) const {
    const auto orNull = [](const std::string& text) {
        return text.empty() ? nlohmann::ordered_json() : nlohmann::ordered_json(text);
    };
    object["complete"] = isComplete();
    object["reached"] = orNull(reached);
    object["reason"] = orNull(reason);
}

} // namespace zrm::host
