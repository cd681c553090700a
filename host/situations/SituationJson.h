#ifndef ZRM_HOST_SITUATION_JSON_H
#define ZRM_HOST_SITUATION_JSON_H

#include "host/config/HostConfig.h"

#include <string>

#include <nlohmann/json_fwd.hpp>

namespace zrm::host {

struct SituationStatus;

/// Situations as JSON objects. Stateless.
class SituationJson {
public:
    /// The fields of a situation as written; null for one that was left out.
    static nlohmann::ordered_json definition(const SituationConfig& situation);

    /// Sixteen characters that change with the definition, and that every run gives it.
    static std::string version(const SituationConfig& situation);

    /// The definition with its version and the state of the situation.
    static nlohmann::ordered_json status(const SituationStatus& status);

    /// A value as text; bytes that are not UTF-8 are replaced.
    static std::string text(const nlohmann::ordered_json& value);
};

} // namespace zrm::host

#endif
