#ifndef ZRM_HOST_EXPLANATION_JSON_H
#define ZRM_HOST_EXPLANATION_JSON_H

#include "host/analysis/Explanation.h"

#include <nlohmann/json_fwd.hpp>

namespace zrm::host {

/// Explanations as JSON objects. Stateless.
class ExplanationJson {
public:
    static nlohmann::ordered_json of(const Explanation& explanation);
};

} // namespace zrm::host

#endif
