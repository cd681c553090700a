#ifndef ZRM_HOST_REACH_H
#define ZRM_HOST_REACH_H

#include <nlohmann/json_fwd.hpp>

#include <string>

namespace zrm::host {

/// How far logs were read and why the reading ended.
struct Reach {
    std::string reached; ///< ENTRYTIME of the oldest entry read; empty: there was none
    std::string reason;  ///< why the reading ended early, a clause; empty: everything was read

    bool isComplete() const noexcept { return reason.empty(); }
    /// Adds `complete`, `reached` and `reason` to a JSON object.
    void addTo(nlohmann::ordered_json& object) const;
};

} // namespace zrm::host

#endif
